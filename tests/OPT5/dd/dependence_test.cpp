// Random nests of loops over arrays and pointers, executed by hand: every distance at which two accesses meet must be
// in their vector, in either order; and where nothing but subscripts and counts decides, the vector is to be exact.
#include "../ir/function_fixture.h"

#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

#include <algorithm>
#include <array>
#include <random>
#include <set>

namespace {

constexpr int MOST_LEVELS = 3;
using COUNTS = std::array<int, MOST_LEVELS>; // of iterations, or distances of them, outermost first

// i = from + from_outer * outer; do { ... i += step; } while (i < to), in any order of the sides and either direction.
struct NEST_LEVEL {
    int from, from_outer, step, trips, trips_outer; // `trips` + `trips_outer` times the outer count, at least 1
};
// object[constant + sum of by[l] * i_l], an access of `units` 16-bit units; through a pointer that walks where `walks`.
struct ACCESS {
    int constant;
    COUNTS by;
    int units;
    int level;   // in the innermost loop: the number of loops; at 1 less in the one around it, behind the inner one
    bool walks;
    NODE* tree;
    struct LOOP* loop;
};

// What was found out about pairs.
struct TALLY {
    int misses = 0, independent = 0, proved = 0, vectors = 0, exact = 0;
};

class PROGRAM : public FunctionTest {
public:
    PROGRAM() {
        SetUpTestSuite();
        SetUp();
        static const bool once = (init_BIF_descriptors(), init_simplifier(), true);
        (void)once;
        object = local("a", tp->mk_array(tp->int_t, false, 20000, true));
        out = local("x");
    }
    ~PROGRAM() override {
        if (dependence_analysis_enabled) wrapup_dependence_analysis(false);
        erase_loop_hierarchy();
        TearDown();
    }
    void TestBody() override {}

    // ---- The program

    std::vector<NEST_LEVEL> nest;
    std::vector<ACCESS> accesses; // the first is a store
    std::array<SYMTAB*, MOST_LEVELS> counter{};
    SYMTAB *object, *out;

    static NODE* binary(int op, NODE* a, NODE* b) { return maketree(op, a, b, a->type->stqs()); }
    static NODE* scaled(NODE* t, int by) { return binary(MULT, t, icon(by)); }
    TYPE* type_of(int units) const { return units == 1 ? tp->int_t : units == 2 ? tp->long_t : tp->llong_t; }

    NODE* reference(const ACCESS& a) {
        NODE* index = icon(a.constant);
        for (size_t l = 0; l < nest.size(); ++l)
            if (a.by[l]) index = binary(PLUS, index, scaled(mk_NAME(counter[l]), a.by[l]));
        NODE* p = maketree(PCONV, address(object), nullptr, tp->mk_ptr(tp->int_t));
        p = maketree(PLUS, p, maketree(SCONV, index, nullptr, tp->long_t), p->type);
        TYPE* type = type_of(a.units);
        if (a.units > 1) p = maketree(PCONV, p, nullptr, tp->mk_ptr(type));
        return maketree(UMULT, p, nullptr, type);
    }
    void add_access(ACCESS& a, bool is_store) {
        a.tree = reference(a);
        if (is_store)
            add(maketree(ASG, a.tree, icon(0, a.tree->type), a.tree->type));
        else
            add(maketree(ASG, mk_NAME(out), a.tree->type == tp->int_t ? a.tree : maketree(SCONV, a.tree, nullptr, tp->int_t), tp->int_t));
    }
    void open_loop(size_t l) {
        const NEST_LEVEL& n = nest[l];
        NODE* from = icon(n.from);
        if (l && n.from_outer) from = binary(PLUS, from, scaled(mk_NAME(counter[l - 1]), n.from_outer));
        add(mk_ASG(mk_NAME(counter[l]), from));
        define(static_cast<int>(10 + l));
    }
    // The limit is the value behind the last iteration. Counters of outer loops are the numbers of their iterations
    // where inner loops look at them.
    void close_loop(size_t l) {
        const NEST_LEVEL& n = nest[l];
        add(maketree(PLUSASG, mk_NAME(counter[l]), icon(n.step), tp->int_t));
        NODE* limit = icon(n.from + n.trips * n.step);
        const int per_outer = n.from_outer + n.trips_outer * n.step;
        if (l && per_outer) limit = binary(PLUS, limit, scaled(mk_NAME(counter[l - 1]), per_outer));
        const int label_in = static_cast<int>(10 + l), label_out = static_cast<int>(20 + l);
        add(mk_IF(maketree(n.step > 0 ? LT : GT, mk_NAME(counter[l]), limit, tp->int_t), ref(label_in), ref(label_out)));
        define(label_out);
    }
    void make_program() {
        for (size_t l = 0; l < nest.size(); ++l) counter[l] = local(("i" + std::to_string(l)).c_str());
        for (size_t l = 0; l < nest.size(); ++l) open_loop(l);
        bool is_store = true;
        for (ACCESS& a : accesses) {
            if (a.level == static_cast<int>(nest.size())) add_access(a, is_store);
            is_store = false;
        }
        for (size_t l = nest.size(); l-- > 0;) {
            close_loop(l);
            is_store = true;
            for (ACCESS& a : accesses) {
                if (a.level == static_cast<int>(l) && a.level < static_cast<int>(nest.size())) add_access(a, is_store);
                is_store = false;
            }
        }
        ret(out);
        build();
        normalize_all_trees();
        build_loop_hierarchy(false, false, false, 1);
        init_dependence_analysis();
        find_references();
    }
    // The trees that the references became.
    void find_references() {
        size_t next = 0;
        std::vector<ACCESS*> in_order;
        for (int level = static_cast<int>(nest.size()); level >= 0; --level)
            for (ACCESS& a : accesses)
                if (a.level == level) in_order.push_back(&a);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest)
                for_each_node(s->first, [&](NODE* t) {
                    if (t->op != UMULT || next >= in_order.size()) return;
                    in_order[next]->tree = t;
                    in_order[next++]->loop = bb->loop;
                });
        ASSERT_EQ(next, accesses.size());
    }

    // ---- Its execution

    int trips_of(size_t l, const COUNTS& at) const {
        const NEST_LEVEL& n = nest[l];
        return std::max(1, n.trips + (l ? n.trips_outer * value(l - 1, at) : 0));
    }
    int value(size_t l, const COUNTS& at) const {
        const NEST_LEVEL& n = nest[l];
        return n.from + (l ? n.from_outer * value(l - 1, at) : 0) + n.step * at[l];
    }
    template <class F>
    void for_each_iteration(int levels, const F& visit, COUNTS at = {}, size_t l = 0) const {
        if (l == static_cast<size_t>(levels)) return visit(at);
        const int trips = trips_of(l, at);
        for (at[l] = 0; at[l] < trips; ++at[l]) for_each_iteration(levels, visit, at, l + 1);
    }
    int place(const ACCESS& a, const COUNTS& at) const {
        int index = a.constant;
        for (size_t l = 0; l < nest.size(); ++l) {
            if (!a.by[l]) continue;
            // Behind a loop its counter is one step further than in the last iteration.
            COUNTS behind = at;
            if (static_cast<int>(l) >= a.level) behind[l] = trips_of(l, at);
            index += a.by[l] * value(l, behind);
        }
        return index;
    }

    // The distances at which the two meet.
    std::set<COUNTS> meetings(const ACCESS& a, const ACCESS& b) const {
        std::map<int, std::vector<COUNTS>> at_unit;
        for_each_iteration(b.level, [&](const COUNTS& y) {
            for (int u = 0; u < b.units; ++u) at_unit[place(b, y) + u].push_back(y);
        });
        const int common = std::min(a.level, b.level);
        std::set<COUNTS> found;
        for_each_iteration(a.level, [&](const COUNTS& x) {
            for (int u = 0; u < a.units; ++u)
                for (const COUNTS& y : at_unit[place(a, x) + u]) {
                    COUNTS d{};
                    for (int l = 0; l < common; ++l) d[l] = y[l] - x[l];
                    found.insert(d);
                }
        });
        return found;
    }

    static bool holds(const DDEP* v, const COUNTS& d) {
        if (!v) return false;
        for (int l = 1; l < v->count(); ++l)
            if (!v->ddve(l).has_distance(INT65(d[static_cast<size_t>(l) - 1]))) return false;
        return true;
    }
    static std::string text(const DDEP* v) { return v ? v->text() : "independent"; }
    std::string program() const {
        std::string all = statements();
        for (const ACCESS& a : accesses) all += tree_to_infix(a.tree) + "; ";
        return all;
    }
    static int sign(const COUNTS& d) {
        for (int k : d)
            if (k) return k;
        return 0;
    }

    void check(const ACCESS& a, const ACCESS& b, int order, TALLY* tally) const {
        const std::set<COUNTS> met = meetings(a, b);
        const DDEP_PTR full = compute_full_dependence_vector(a.tree, a.loop, b.tree, b.loop);
        DDEP_PTR f, back;
        compute_dependence_vectors(&f, &back, order, a.tree, a.loop, b.tree, b.loop, false, 0);
        for (const COUNTS& d : met) {
            const int ahead = sign(d) ? sign(d) : order;
            COUNTS inverted;
            std::transform(d.begin(), d.end(), inverted.begin(), [](int k) { return -k; });
            const bool is_same_access = &a == &b && sign(d) == 0;
            const bool is_told = holds(full.get(), d) && (is_same_access || (ahead >= 0 ? holds(f.get(), d) : true)) &&
                                 (is_same_access || (ahead <= 0 ? holds(back.get(), inverted) : true));
            if (!is_told && ++tally->misses < 5)
                ADD_FAILURE() << "distance " << d[0] << " " << d[1] << " " << d[2] << " is missing in " << text(full.get())
                              << ", " << text(f.get()) << ", " << text(back.get()) << ": " << program();
        }
        if (met.empty()) {
            ++tally->independent;
            tally->proved += !full;
            return;
        }
        // The vector as a product of the sets of its levels.
        ++tally->vectors;
        DDEP least(full ? full->count() - 1 : 0, false);
        for (const COUNTS& d : met)
            for (int l = 1; l < least.count(); ++l) least.ddve(l).set_distance(INT65(d[static_cast<size_t>(l) - 1]));
        tally->exact += full && *full == least;
    }
};

class RandomNests : public testing::TestWithParam<int> {
protected:
    std::mt19937 random;
    int pick(int low, int high) { return low + static_cast<int>(random() % static_cast<unsigned>(high - low + 1)); }

    void choose(PROGRAM* p) {
        const int levels = pick(1, 3);
        for (int l = 0; l < levels; ++l) {
            NEST_LEVEL n{pick(-3, 3), 0, pick(0, 2) ? pick(1, 3) : -pick(1, 3), pick(1, levels == 1 ? 45 : 7), 0};
            if (l && !pick(0, 3)) n.from_outer = pick(-1, 1);
            p->nest.push_back(n);
        }
        for (int n = 0; n < 2; ++n) {
            ACCESS a{};
            a.constant = 5000 + pick(-4, 40);
            a.units = 1 << (pick(0, 2) ? 0 : pick(0, 2));
            a.level = pick(0, 4) || levels == 1 ? levels : levels - 1;
            for (int l = 0; l < levels; ++l) a.by[static_cast<size_t>(l)] = pick(0, 3) ? pick(-2, 4) : pick(0, 1) ? 0 : pick(8, 20);
            if (n && pick(0, 1)) a.by = p->accesses[0].by;
            if (n && pick(0, 1)) a.constant = p->accesses[0].constant + pick(-6, 6);
            p->accesses.push_back(a);
        }
    }
};

TEST_P(RandomNests, EveryMeetingIsInTheVector) {
    random.seed(static_cast<unsigned>(GetParam()));
    TALLY tally;
    for (int n = 0; n < 400; ++n) {
        PROGRAM p;
        choose(&p);
        p.make_program();
        const ACCESS &a = p.accesses[0], &b = p.accesses[1];
        p.check(a, b, a.level >= b.level ? 1 : -1, &tally);
        p.check(a, a, 0, &tally);
        ASSERT_LT(tally.misses, 5);
    }
    EXPECT_GE(tally.proved * 100, tally.independent * 75);
}
INSTANTIATE_TEST_SUITE_P(Seeds, RandomNests, testing::Range(1, 4));

} // namespace
