// Random nests of loops over arrays and pointers, executed by hand: every distance at which two accesses meet must be
// in their vector, in either order; and where nothing but subscripts and counts decides, the vector is to be exact.
#include "../ir/function_fixture.h"

#include "OPT5/dd/dd.h"
#include "OPT5/dd/dependence_graph.h"
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
    bool limit_by_unknown = false;                  // the limit is written with k
};
enum FORM { INDEXED, BY_TEMPORARY, WALKING };
// base[constant + sum of by[l] * i_l + by_unknown * k + by_product * k * i_0], an access of `units` 16-bit units. A walking one is made through
// a pointer that is set ahead of the loop `set_ahead_of`, and moved by the innermost factor in each innermost
// iteration.
struct ACCESS {
    int constant;
    COUNTS by;
    int by_unknown, units;
    int level;    // of the loop it stands in; where that is not the innermost one, behind the inner loops
    int part;     // in which of the inner nests behind the shared loops
    bool is_late; // behind the update of the innermost counter
    FORM form;
    int set_ahead_of;
    int base;       // 0: the object; 1, 2: pointers into it, of which nothing is known but what is asserted
    int by_product;

    NODE *tree, *statement;
    struct LOOP* loop;
    int position; // in the text
    SYMTAB* pointer;
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
        unknown = local("k");
        other = local("m");
        for (int n : {1, 2}) pointers[n] = local(n == 1 ? "p" : "q", tp->mk_ptr(tp->int_t), SC_PARM);
    }
    ~PROGRAM() override {
        if (dependence_analysis_enabled) wrapup_dependence_analysis(false);
        erase_loop_hierarchy();
        TearDown();
    }
    void TestBody() override {}

    // ---- The program

    std::vector<NEST_LEVEL> nest;
    size_t shared = MOST_LEVELS;  // so many loops are around two nests of the other levels
    bool is_unsigned = false;     // counters are
    std::vector<ACCESS> accesses; // the first is a store
    int k = 7, m = 3, pointer_at[3] = {0, 0, 0};
    std::vector<NODE*> facts; // asserted ahead of the nest
    bool speaks_of_unknowns = false;

    NODE* compare(int op, NODE* a, NODE* b) { return maketree(op, a, b, tp->int_t); }
    NODE* value_of(bool of_k) { return mk_NAME(of_k ? unknown : other); }
    NODE* distance(int from, int to) {
        return maketree(MINUS, mk_NAME(pointers[to]), mk_NAME(pointers[from]), tp->long_t);
    }
    NODE* low_bits(int pointer, int mask) {
        return maketree(ANDB, maketree(PCONV, mk_NAME(pointers[pointer]), nullptr, tp->long_t), icon(mask, tp->long_t),
                        tp->long_t);
    }

    void make_program() {
        for (size_t l = 0; l < nest.size(); ++l)
            counter[l] = local(("i" + std::to_string(l)).c_str(), is_unsigned ? tp->uint_t : tp->int_t);
        for (NODE* fact : facts) add(maketree(NASSERT, fact, nullptr, tp->int_t));
        emit(0, {0, 1});
        ret(out);
        build();
        normalize_all_trees();
        build_loop_hierarchy(false, false, false, 1);
        init_dependence_analysis();
        find_references();
    }

private:
    std::array<SYMTAB*, MOST_LEVELS> counter{};
    SYMTAB *object, *out, *unknown, *other, *pointers[3];
    std::vector<ACCESS*> in_text;
    std::map<COUNTS, int> sequence; // of the innermost iterations
    int labels = 10;

    bool is_innermost(const ACCESS& a) const { return a.level == static_cast<int>(nest.size()); }
    static NODE* binary(int op, NODE* a, NODE* b) { return maketree(op, a, b, a->type->stqs()); }
    static NODE* number(long v, TYPE* type) { return mk_ICON(truncate_to_type(INT65(v), type), type); }
    static NODE* times(NODE* t, int by) { return binary(MULT, t, number(by, t->type)); }
    TYPE* type_of(int units) const { return units == 1 ? tp->int_t : units == 2 ? tp->long_t : tp->llong_t; }
    NODE* start(const ACCESS& a) const {
        return a.base ? mk_NAME(pointers[a.base]) : maketree(PCONV, address(object), nullptr, tp->mk_ptr(tp->int_t));
    }
    static NODE* moved(NODE* p, NODE* by) {
        TYPE* type = p->type;
        return maketree(PLUS, p, maketree(SCONV, by, nullptr, tp->long_t), type);
    }
    // Of the counters of the first loops.
    NODE* index(const ACCESS& a, size_t loops) const {
        NODE* t = number(a.constant, counter[0]->type);
        if (a.by_unknown) t = binary(PLUS, t, times(mk_NAME(unknown), a.by_unknown));
        if (a.by_product && loops)
            t = binary(PLUS, t, times(binary(MULT, mk_NAME(unknown), mk_NAME(counter[0])), a.by_product));
        for (size_t l = 0; l < loops; ++l)
            if (a.by[l]) t = binary(PLUS, t, times(mk_NAME(counter[l]), a.by[l]));
        t->type = counter[0]->type;
        return t;
    }
    NODE* pointer_of(ACCESS& a) {
        if (a.form == WALKING) return mk_NAME(a.pointer);
        NODE* t = index(a, nest.size());
        if (a.form == BY_TEMPORARY) {
            SYMTAB* temporary = local(("t" + std::to_string(labels++)).c_str(), t->type);
            add(mk_ASG(mk_NAME(temporary), t));
            t = mk_NAME(temporary);
        }
        return moved(start(a), t);
    }
    void emit_access(ACCESS& a) {
        NODE* p = pointer_of(a);
        TYPE* type = type_of(a.units);
        if (a.units > 1) p = maketree(PCONV, p, nullptr, tp->mk_ptr(type));
        NODE* t = maketree(UMULT, p, nullptr, type);
        if (&a == &accesses[0])
            add(maketree(ASG, t, icon(0, type), type));
        else
            add(mk_ASG(mk_NAME(out), a.units == 1 ? t : maketree(SCONV, t, nullptr, tp->int_t)));
        a.position = static_cast<int>(in_text.size());
        in_text.push_back(&a);
    }
    template <class P>
    void emit_accesses(const std::vector<int>& parts, const P& wanted) {
        for (ACCESS& a : accesses)
            if ((is_common(a) || parts.front() == a.part || parts.back() == a.part) && wanted(a)) emit_access(a);
    }
    bool is_common(const ACCESS& a) const { return a.level <= static_cast<int>(shared); }
    void set_pointers(size_t l, const std::vector<int>& parts) {
        for (ACCESS& a : accesses) {
            if (a.form != WALKING || a.set_ahead_of != static_cast<int>(l)) continue;
            if (parts.size() == 1 && parts[0] != a.part) continue;
            if (!a.pointer) a.pointer = local(("p" + std::to_string(labels++)).c_str(), tp->mk_ptr(tp->int_t));
            add(mk_ASG(mk_NAME(a.pointer), moved(start(a), index(a, l))));
        }
    }
    void emit(size_t l, const std::vector<int>& parts) {
        if (l == nest.size())
            return emit_accesses(parts, [&](const ACCESS& a) { return is_innermost(a) && !a.is_late; });
        if (l != shared || parts.size() == 1) return emit_loop(l, parts);
        for (int part : parts) emit_loop(l, {part});
    }
    // i = from; do { ... i += step; } while (i < limit): the limit is the value behind the last iteration.
    void emit_loop(size_t l, const std::vector<int>& parts) {
        const NEST_LEVEL& n = nest[l];
        TYPE* type = counter[l]->type;
        set_pointers(l, parts);
        NODE* from = number(n.from, type);
        if (l && n.from_outer) from = binary(PLUS, from, times(mk_NAME(counter[l - 1]), n.from_outer));
        add(mk_ASG(mk_NAME(counter[l]), from));
        const int head = labels++, behind = labels++;
        define(head);
        emit(l + 1, parts);
        const int level = static_cast<int>(l) + 1;
        emit_accesses(parts, [&](const ACCESS& a) { return a.level == level && !is_innermost(a); });
        add(maketree(PLUSASG, mk_NAME(counter[l]), number(n.step, type), type));
        if (l + 1 == nest.size()) end_of_body(parts);
        NODE* limit = number(n.from + n.trips * n.step, type);
        if (n.limit_by_unknown)
            limit = binary(PLUS, number(n.from + (n.trips - k) * n.step, type), times(mk_NAME(unknown), n.step));
        const int per_outer = n.from_outer + n.trips_outer * n.step;
        if (l && per_outer) limit = binary(PLUS, limit, times(mk_NAME(counter[l - 1]), per_outer));
        const int op = is_unsigned ? (n.step > 0 ? ULT : UGT) : n.step > 0 ? LT : GT;
        add(mk_IF(maketree(op, mk_NAME(counter[l]), limit, tp->int_t), ref(head), ref(behind)));
        define(behind);
    }
    void end_of_body(const std::vector<int>& parts) {
        emit_accesses(parts, [&](const ACCESS& a) { return is_innermost(a) && a.is_late; });
        for (ACCESS& a : accesses)
            if (a.form == WALKING && (is_common(a) || parts.front() == a.part || parts.back() == a.part))
                add(maketree(PLUSASG, mk_NAME(a.pointer), icon(a.by[nest.size() - 1], tp->long_t), a.pointer->type));
    }
    // The trees that the references became.
    void find_references() {
        size_t next = 0;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest)
                for_each_node(s->first, [&](NODE* t) {
                    if (t->op != UMULT || next >= in_text.size()) return;
                    in_text[next]->tree = t;
                    in_text[next]->statement = s->first;
                    in_text[next++]->loop = bb->loop;
                });
        ASSERT_EQ(next, accesses.size());
    }

public:
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
    int place(const ACCESS& a, const COUNTS& at) {
        int index = a.constant + a.by_unknown * k;
        const size_t loops = a.form == WALKING ? static_cast<size_t>(a.set_ahead_of) : nest.size();
        for (size_t l = 0; l < loops; ++l) {
            // Behind a loop its counter is one step further than in the last iteration.
            COUNTS behind = at;
            if (static_cast<int>(l) >= a.level) behind[l] = trips_of(l, at);
            if (a.is_late && l + 1 == nest.size()) ++behind[l];
            index += a.by[l] * value(l, behind);
            if (l == 0) index += a.by_product * k * value(l, behind);
        }
        if (is_unsigned) index &= 0xFFFF;
        index += pointer_at[a.base];
        if (a.form != WALKING) return index;
        if (sequence.empty())
            for_each_iteration(static_cast<int>(nest.size()), [&](const COUNTS& c) {
                sequence.insert({c, static_cast<int>(sequence.size())});
            });
        COUNTS first = at;
        for (size_t l = loops; l < nest.size(); ++l) first[l] = 0;
        return index + (sequence[at] - sequence[first]) * a.by[nest.size() - 1];
    }
    int common_loops(const ACCESS& a, const ACCESS& b) const {
        const int deepest = a.part == b.part || &a == &b ? static_cast<int>(nest.size()) : static_cast<int>(shared);
        return std::min({a.level, b.level, deepest});
    }

    // The distances at which the two meet.
    std::set<COUNTS> meetings(const ACCESS& a, const ACCESS& b) {
        std::map<int, std::vector<COUNTS>> at_unit;
        for_each_iteration(b.level, [&](const COUNTS& y) {
            for (int u = 0; u < b.units; ++u) at_unit[place(b, y) + u].push_back(y);
        });
        const int common = common_loops(a, b);
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
    static bool is_zero(const COUNTS& d, int levels) {
        return std::all_of(d.begin(), d.begin() + levels, [](int k) { return k == 0; });
    }
    // The other questions about a pair that meets at this distance, the first of which is a store.
    bool effects_are_told(const ACCESS& a, const ACCESS& b, const COUNTS& d) const {
        const int common = common_loops(a, b);
        for (int level = 1; level <= common; ++level) {
            if (!is_zero(d, level - 1)) continue;
            struct LOOP* loop = a.loop;
            while (loop->level > level) loop = loop->parent;
            DVE at;
            compute_distances_for_loop(&at, a.tree, b.tree, loop);
            const int distance = d[static_cast<size_t>(level) - 1];
            if (!at.has_distance(INT65(distance))) return false;
            if (!lvalues_have_non_carried_dDeps_in_loop(a.tree, b.tree, loop)) return false;
            if (distance == 0 && !lvalues_collide_in_iteration(b.tree, a.tree, loop)) return false;
        }
        if (!lvalues_are_dependent(a.tree, b.tree, a.loop, b.loop)) return false;
        for (bool same : {false, true}) {
            if (same && (a.loop != b.loop || !is_zero(d, common))) continue;
            if (!tree_touches_lvalue(b.statement, a.tree, b.loop, a.loop, same)) return false;
            if (!trees_are_dependent(b.statement, a.statement, b.loop, a.loop, same)) return false;
            if (&a != &b && !tree_affects_tree(a.statement, b.statement, a.loop, b.loop, same)) return false;
        }
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

    // Canonical subscripts have the value of the difference, modulo its width; what has one value in which loops.
    template <class PICK>
    void check_subscripts(const ACCESS& a, const ACCESS& b, const PICK& pick) {
        NODE *x = index(a, nest.size()), *y = index(b, nest.size());
        const auto canonical = [&](const NODE* of, const NODE* less) {
            const bool simplify = pick() > 0;
            return less ? canonicalize_ss_delta(of, less, a.loop, simplify) : canonicalize_symbolic_ss(of, a.loop, simplify);
        };
        NODE *one = canonical(x, nullptr), *both = canonical(x, y);
        for (int n = 0; n < 8; ++n) {
            std::map<const SYMTAB*, int64_t> values{{unknown, pick()}};
            for (size_t l = 0; l < nest.size(); ++l) values[counter[l]] = pick();
            const auto low_bits = [](int64_t v) { return static_cast<uint16_t>(v); };
            EXPECT_EQ(low_bits(value_in(one, values)), low_bits(value_in(x, values)));
            EXPECT_EQ(low_bits(value_in(both, values)), low_bits(value_in(x, values) - value_in(y, values)));
        }
        for (NODE* t : {x, y, one, both}) erase_tree(t);
        for (int level = 1; level <= a.loop->level; ++level) {
            NODE* name = mk_NAME(counter[static_cast<size_t>(level) - 1]);
            DDEP vector(a.loop->level, true);
            for (int k = 1; k <= level; ++k) vector.ddve(k).clr_FWD_BWD_dirs();
            EXPECT_EQ(tree_is_RC_in_loop_nest(name, a.loop, &vector), level < a.loop->level);
            vector.ddve(level).set_ALL_dirs();
            EXPECT_FALSE(tree_is_RC_in_loop_nest(name, a.loop, &vector));
            EXPECT_EQ(tree_is_RC_in_common_loop(name, a.loop, b.loop), level < innermost_common_loop(a.loop, b.loop)->level);
            erase_tree(name);
        }
    }
    static int64_t value_in(const NODE* t, const std::map<const SYMTAB*, int64_t>& values) {
        if (!t) return 0;
        switch (t->op) {
        case ICON: return static_cast<int64_t>(t->u.lval.value);
        case NAME: return values.at(t->u.sym);
        case PLUS: return value_in(t->left, values) + value_in(t->right, values);
        case MINUS: return value_in(t->left, values) - value_in(t->right, values);
        case MULT: return value_in(t->left, values) * value_in(t->right, values);
        case UMINUS: return -value_in(t->left, values);
        case SLL: return value_in(t->left, values) << value_in(t->right, values);
        case SCONV: return value_in(t->left, values);
        default: ADD_FAILURE() << tree_to_infix(t); return 0;
        }
    }

    void check(const ACCESS& a, const ACCESS& b, TALLY* tally) {
        const int order = (b.position > a.position) - (b.position < a.position);
        const std::set<COUNTS> met = meetings(a, b);
        const DDEP_PTR full = compute_full_dependence_vector(a.tree, a.loop, b.tree, b.loop);
        DDEP_PTR f, back;
        compute_dependence_vectors(&f, &back, order, a.tree, a.loop, b.tree, b.loop, false, 0);
        int asked = 0;
        for (const COUNTS& d : met) {
            const int ahead = sign(d) ? sign(d) : order;
            COUNTS inverted;
            std::transform(d.begin(), d.end(), inverted.begin(), [](int k) { return -k; });
            const bool is_same_access = &a == &b && sign(d) == 0;
            const bool is_told = holds(full.get(), d) && (is_same_access || (ahead >= 0 ? holds(f.get(), d) : true)) &&
                                 (is_same_access || (ahead <= 0 ? holds(back.get(), inverted) : true));
            if (!(is_told && (++asked > 3 || effects_are_told(a, b, d))) && ++tally->misses < 5)
                ADD_FAILURE() << "distance " << d[0] << " " << d[1] << " " << d[2] << " is missing in "
                              << text(full.get()) << ", " << text(f.get()) << ", " << text(back.get()) << ": "
                              << program();
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

    bool one_in(int n) { return pick(1, n) == 1; }

    void choose(PROGRAM* p) {
        const int levels = pick(1, 3);
        p->is_unsigned = one_in(6);
        for (int l = 0; l < levels; ++l) {
            NEST_LEVEL n{pick(-3, 3), 0, one_in(3) ? -pick(1, 3) : pick(1, 3), pick(1, levels == 1 ? 45 : 7), 0};
            if (p->is_unsigned) n.from = pick(0, 9), n.step = pick(1, 3);
            if (l && one_in(4) && !p->is_unsigned) n.from_outer = pick(-1, 1);
            if (l && one_in(4) && !p->is_unsigned) n.trips_outer = pick(0, 1);
            p->nest.push_back(n);
        }
        if (levels > 1 && one_in(4)) p->shared = static_cast<size_t>(pick(0, levels - 1));
        for (int n = 0; n < 2; ++n) p->accesses.push_back(access(*p, levels, n));
        if (one_in(2)) choose_unknowns(p);
    }
    // Values that are not in the program, and true assertions about them.
    void choose_unknowns(PROGRAM* p) {
        if (p->is_unsigned) return;
        p->speaks_of_unknowns = true;
        p->k = pick(-2, 9);
        p->m = pick(-1, 9);
        ACCESS &a = p->accesses[0], &b = p->accesses[1];
        if (one_in(2)) b.by = a.by, b.constant = a.constant + pick(-3, 3);
        if (one_in(2)) a.by_unknown = pick(-1, 2), b.by_unknown = pick(-1, 2);
        if (one_in(3)) a.by_product = b.by_product = pick(1, 3), a.by[0] = b.by[0];
        if (one_in(8)) b.by_product = pick(-1, 2);
        if (one_in(3))
            for (NEST_LEVEL& n : p->nest) n.limit_by_unknown = one_in(2);
        if (one_in(4)) {
            a.base = pick(1, 2), b.base = pick(1, 2);
            a.units = b.units = a.form == WALKING || b.form == WALKING ? 1 : a.units; // types tell others apart
            p->pointer_at[1] = pick(0, 60), p->pointer_at[2] = pick(0, 60);
        }
        for (int n = pick(0, 3); n > 0; --n) p->facts.push_back(fact(p));
        if (a.by_product && p->k && one_in(2))
            p->facts.push_back(p->compare(p->k > 0 ? GT : LT, p->value_of(true), mk_ICON(INT65(0), tp->int_t)));
    }
    NODE* fact(PROGRAM* p) {
        const auto number = [](int v) { return mk_ICON(INT65(v), tp->int_t); };
        const int v = p->k, w = p->m, d = p->pointer_at[2] - p->pointer_at[1], which = pick(1, 2), mask = 1 << pick(1, 2);
        switch (pick(0, 7)) {
        case 0: return p->compare(GE, p->value_of(true), number(v - pick(0, 3)));
        case 1: return p->compare(LE, p->value_of(true), number(v + pick(0, 3)));
        case 2: return p->compare(NEQ, p->value_of(true), number(v ? 0 : 1));
        case 3: return p->compare(v > w ? GT : v < w ? LT : EQ, p->value_of(true), p->value_of(false));
        case 4:
            return p->compare(EQ, maketree(MOD, p->value_of(true), number(one_in(2) ? 3 : -3), tp->int_t), number(v % 3));
        case 5:
            return p->compare(GE, maketree(MINUS, p->value_of(true), p->value_of(false), tp->int_t), number(v - w - pick(0, 2)));
        case 6:
            return p->compare(EQ, p->low_bits(which, mask - 1),
                              mk_ICON(INT65(p->pointer_at[which] & (mask - 1)), tp->long_t));
        default: {
            const auto at_least = [&](int from, int to, int c) {
                return p->compare(GE, p->distance(from, to), mk_ICON(INT65(c), tp->long_t));
            };
            if (d == 0 || one_in(3)) return d >= 0 ? at_least(1, 2, d - pick(0, d)) : at_least(2, 1, -d);
            const int c = pick(1, std::abs(d));
            return maketree(ORB, at_least(1, 2, c), at_least(2, 1, c), tp->int_t);
        }
        }
    }
    ACCESS access(const PROGRAM& p, int levels, int n) {
        ACCESS a{};
        a.constant = (p.is_unsigned && one_in(3) ? 65500 : 5000) + pick(-4, 40);
        a.part = n;
        a.level = one_in(5) && levels > 1 ? levels - 1 : levels;
        a.form = a.level < levels || one_in(2) ? INDEXED : one_in(2) ? BY_TEMPORARY : WALKING;
        a.is_late = a.level == levels && one_in(4);
        if (a.form == WALKING) a.set_ahead_of = pick(std::min(levels - 1, static_cast<int>(p.shared)), levels - 1);
        a.units = a.form == WALKING || !one_in(3) ? 1 : 1 << pick(0, 2);
        a.by_unknown = one_in(8) ? pick(-1, 2) : 0;
        for (int l = 0; l < levels; ++l)
            a.by[static_cast<size_t>(l)] = pick(0, 3) ? pick(-2, 4) : one_in(2) ? 0 : pick(8, 20);
        if (n && one_in(2)) a.by = p.accesses[0].by, a.by_unknown = p.accesses[0].by_unknown;
        if (n && one_in(2)) a.constant = p.accesses[0].constant + pick(-6, 6);
        return a;
    }
};

TEST_P(RandomNests, EveryMeetingIsInTheVector) {
    random.seed(static_cast<unsigned>(GetParam()));
    TALLY plain, others; // where values decide that are not in the program, what one run does is not all
    const char* more = std::getenv("NESTS");
    for (int n = more ? std::atoi(more) : 1500; n > 0; --n) {
        PROGRAM p;
        choose(&p);
        p.make_program();
        const ACCESS &a = p.accesses[0], &b = p.accesses[1];
        TALLY& tally = p.speaks_of_unknowns ? others : plain;
        p.check(a, b, &tally);
        p.check(a, a, &tally);
        ASSERT_LT(tally.misses, 5);
    }
    // The rest are mostly loops whose number of iterations nobody can know, and values behind such loops.
    EXPECT_GE(plain.proved * 100, plain.independent * 65);
    EXPECT_GE(plain.exact * 100, plain.vectors * 75);
}
INSTANTIATE_TEST_SUITE_P(Seeds, RandomNests, testing::Range(1, 4));

// ---- The graph, and subscripts as trees

TEST_P(RandomNests, GraphAndSubscriptsAgreeWithTheVectors) {
    random.seed(static_cast<unsigned>(GetParam()) + 100);
    for (int n = 0; n < 60; ++n) {
        PROGRAM p;
        choose(&p);
        p.make_program();
        const ACCESS *a = &p.accesses[0], *b = &p.accesses[1];
        p.check_subscripts(*a, *b, [this] { return pick(-9, 9); });
        if (a->position > b->position) std::swap(a, b);
        DDGRAPH graph;
        graph.build(loop_root(), false, 0);
        DDEP_PTR forward, backward;
        compute_dependence_vectors(&forward, &backward, 1, a->tree, a->loop, b->tree, b->loop, false, 0, false);
        for (bool back : {false, true}) {
            const NODE *from = back ? b->tree : a->tree, *to = back ? a->tree : b->tree;
            const DDEP* expected = back ? backward.get() : forward.get();
            const DDEP* told = graph.get_dep_edge(from, to, 0);
            if (expected && told) {
                EXPECT_EQ(told->text(), expected->text());
                EXPECT_EQ(graph.get_dep_edge(from, to, 1), nullptr);
                graph.remove_dep_edge(from, to, 0);
                EXPECT_EQ(graph.get_dep_edge(from, to, 0), nullptr);
            } else // by their types, which the graph does not always go by
                EXPECT_EQ(told, nullptr) << p.program();
        }
    }
}

// ---- Where the vector is to be exact

struct PAIR_OF_ACCESSES {
    std::vector<NEST_LEVEL> nest;
    int constant;
    COUNTS by;
    int units;
    int other_constant;
    COUNTS by_other;
    int other_units;
};
const NEST_LEVEL FOUR{0, 0, 1, 4, 0}, ELEVEN{0, 0, 1, 11, 0}, TWELVE{0, 0, 1, 12, 0}, FIFTY{0, 0, 1, 50, 0},
    SEVENTY{0, 0, 1, 70, 0}, DOWN{20, 0, -1, 20, 0}, BY_TWO{0, 0, 2, 15, 0};
const PAIR_OF_ACCESSES EXACT[] = {
    {{FIFTY}, 1, {1}, 1, 0, {1}, 1}, // one distance, either sign
    {{FIFTY}, 0, {1}, 1, 1, {1}, 1},
    {{DOWN}, 1, {1}, 1, 0, {1}, 1},
    {{BY_TWO}, 4, {3}, 1, 1, {3}, 1},
    {{FIFTY}, 0, {2}, 1, 1, {2}, 1}, // none
    {{FIFTY}, 0, {1}, 1, 100, {0}, 1},
    {{FIFTY}, 0, {1}, 1, 50, {1}, 1},
    {{FIFTY}, 0, {1}, 1, 49, {0}, 1}, // in the last iteration alone
    {{FIFTY}, 0, {1}, 1, 0, {0}, 1},
    {{ELEVEN}, 0, {1}, 1, 20, {-1}, 1}, // they cross in the last one
    {{ELEVEN}, 0, {1}, 1, 10, {-1}, 1}, // even distances, odd ones
    {{TWELVE}, 0, {1}, 1, 11, {-1}, 1},
    {{SEVENTY}, 0, {1}, 1, 69, {-1}, 1},
    {{FIFTY}, 0, {3}, 1, 1, {5}, 1},
    {{FIFTY}, 7, {-4}, 1, 1, {6}, 1},
    {{SEVENTY}, 0, {1}, 1, 40, {1}, 1}, // beyond the exact distances
    {{FOUR}, 0, {0}, 1, 0, {0}, 1},
    {{FIFTY}, 0, {2}, 2, 1, {2}, 1}, // 32 bits and the halves: of this one, of the next
    {{FIFTY}, 0, {2}, 2, 2, {2}, 1},
    {{FIFTY}, 0, {4}, 4, 7, {4}, 1},
    {{FIFTY}, 0, {1}, 4, 3, {1}, 2},
    {{ELEVEN, TWELVE}, 20, {20, 1}, 1, 1, {20, 1}, 1}, // (1, -1)
    {{ELEVEN, TWELVE}, 20, {20, 1}, 1, 0, {20, 1}, 1},
    {{ELEVEN, TWELVE}, 0, {40, 1}, 1, 20, {40, 1}, 1},
    {{FOUR, ELEVEN, TWELVE}, 0, {800, 40, 2}, 1, 2, {800, 40, 2}, 2},
    {{ELEVEN, TWELVE}, 0, {0, 1}, 1, 0, {0, 1}, 1},
    {{ELEVEN, TWELVE}, 0, {1, 0}, 1, 3, {1, 0}, 1},
};

TEST(Dependence, IsExactWhereSubscriptsDecide) {
    for (const PAIR_OF_ACCESSES& row : EXACT) {
        PROGRAM p;
        p.nest = row.nest;
        for (bool other : {false, true}) {
            ACCESS a{};
            a.constant = 1000 + (other ? row.other_constant : row.constant);
            a.by = other ? row.by_other : row.by;
            a.units = other ? row.other_units : row.units;
            a.level = static_cast<int>(row.nest.size());
            p.accesses.push_back(a);
        }
        p.make_program();
        TALLY t;
        p.check(p.accesses[0], p.accesses[1], &t);
        EXPECT_EQ(t.proved + t.exact, 1) << p.program();
    }
}

// Unlike the analysis itself, the questions are put from outside of it too: nothing but the alias rules is known then.
TEST(Dependence, IsAssumedOutsideOfTheAnalysis) {
    PROGRAM p;
    p.nest = {FIFTY};
    for (int n : {0, 1}) {
        ACCESS a{};
        a.constant = 1000;
        a.by = {n ? 1 : 2};
        a.units = a.level = 1;
        p.accesses.push_back(a);
    }
    p.make_program();
    const ACCESS &a = p.accesses[0], &b = p.accesses[1];
    ASSERT_NE(get_DDEPNODE_from_tree(a.tree), nullptr);
    EXPECT_EQ(get_loop_from_DDEPNODE_tree(b.tree), b.loop);
    wrapup_dependence_analysis(false);
    EXPECT_EQ(get_DDEPNODE_from_tree(a.tree), nullptr);
    DVE at;
    compute_distances_for_loop(&at, a.tree, b.tree, a.loop);
    EXPECT_TRUE(at.is_ALL_dirs());
    EXPECT_TRUE(lvalues_collide_in_iteration(a.tree, b.tree, a.loop));
    EXPECT_TRUE(lvalues_are_dependent(a.tree, b.tree, a.loop, b.loop));
}

} // namespace
