// What relates the terms of two addresses narrows their vector: givens, bounds of loops by counts of loops around, and
// products of a count with an invariant.
//
// Needs: both addresses as sums without wraps. Leaves: nothing changed.
// Sound because each inequality of the system holds for any two iterations in which the addresses overlap, and a
// distance goes only where the system has no solution. A given is used with the values of one side: those that the terms
// have where that reference is, and with shared ones where they are fixed between the two. Of a product of an invariant
// s with counts there is no more in the system than s times the least distance, and the rest with its sign.
#include "OPT5/dd/inequalities.h"
#include "OPT5/dd/reference_form.h"

#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>

namespace {

constexpr long WORK_BY_ANALYSIS = 4000000, WORK_BY_PAIR = 60000;
thread_local long work_left = 0;

enum SIDE { FIRST, SECOND };

// invariant * count of a loop; false for another tree.
bool is_product(const NODE* t, const NODE** invariant, const NODE** count) {
    if (t->op != MULT || t->left->op != NAME) return false;
    *count = t->left;
    *invariant = t->right;
    return true;
}

// A part of the distances of one level: all backward ones, none, or all forward ones.
enum PART { BACKWARD = -1, SAME = 0, FORWARD = 1, ANY = 2 };

class SYSTEM {
public:
    SYSTEM(const REFERENCE& x, const REFERENCE& y, struct LOOP* c, struct LOOP* in, bool fixed_pointers)
        : common(c), fixed(in), pointers_are_fixed(fixed_pointers) {
        for (int l = 1; l <= common->level; ++l) {
            const WIDE last = last_iteration(loop_of_level(common, l));
            iteration.push_back(system.add_variable(0, last));
            distance.push_back(system.add_variable(-last, last));
            INEQUALITIES::SUM later;
            add_count(l, SECOND, 1, &later);
            system.add(later, 0);
            if (last < FAR) system.add(negated(later), last);
        }
        enter(x, FIRST, 1);
        enter(y, SECOND, -1);
        constant = WIDE(x.sum.constant) - y.sum.constant;
        add_givens(x.block->loop, FIRST);
        add_givens(y.block->loop, SECOND);
    }
    bool is_of_use() const { return uses_given || !products.empty(); }

    // The differences of the addresses from `low` to `high`; takes from the level's set what has no solution while the
    // other levels have what is left of theirs. False: nothing is left at all.
    bool narrow(DDEP* v, WIDE low, WIDE high, long* work) {
        if (!cancel_invariant(low, high)) {
            add_term({{system.add_variable(low, high), 1}}, -1, {low, high});
            if (products.empty() && !split_equation()) return false;
        }
        if (v->count() == 1) return may_be(*v, work);
        constexpr int MOST_ROUNDS = 2;
        bool any = true;
        for (int round = 0; round < MOST_ROUNDS && any; ++round) {
            any = false;
            for (int k = 1; k < v->count(); ++k) {
                DVE& at = v->ddve(k);
                const DVE before = at;
                for (PART part : {BACKWARD, SAME, FORWARD})
                    if (has(at, part)) narrow_part(*v, k, part, &at, work);
                if (at.is_independent()) return false;
                any |= at != before && v->count() > 2;
            }
        }
        return true;
    }

private:
    struct VARIABLE {
        const NODE* tree;
        bool is_shared;
        SIDE side;
        int number;
    };
    struct PRODUCT { // by * invariant * (count at the first reference - count at the second)
        WIDE by;
        int invariant;
        const NODE* tree;
        RANGE range;
        int level;
    };

    // by * sum, of which the bounds are known.
    struct ADDEND {
        INEQUALITIES::SUM sum;
        WIDE by;
        RANGE range;
    };

    static INEQUALITIES::SUM negated(INEQUALITIES::SUM s) {
        for (INEQUALITIES::TERM& t : s) t.by = -t.by;
        return s;
    }
    void add_count(int level, SIDE side, WIDE by, INEQUALITIES::SUM* sum) const {
        sum->push_back({iteration[static_cast<size_t>(level) - 1], by});
        if (side == SECOND) sum->push_back({distance[static_cast<size_t>(level) - 1], by});
    }
    bool is_common(const struct LOOP* l) const {
        return l->level <= common->level && loop_of_level(common, l->level) == l;
    }
    int find(const NODE* tree, bool is_shared, SIDE side) const {
        for (const VARIABLE& v : values)
            if (v.is_shared == is_shared && (is_shared || v.side == side) && is_same_value(v.tree, tree) &&
                v.tree->type->size == tree->type->size)
                return v.number;
        return -1;
    }
    int variable_of(const NODE* tree, const TERM_FACTS& f, SIDE side) {
        const bool is_shared = !f.counts && !f.levels && term_is_fixed(f, tree, fixed, pointers_are_fixed);
        int number = find(tree, is_shared, side);
        if (number >= 0) return number;
        number = f.counts       ? system.add_variable(0, last_iteration(f.counts))
                 : f.is_bounded ? system.add_variable(f.range.min, f.range.max)
                                : system.add_variable();
        values.push_back({tree, is_shared, side, number});
        return number;
    }

    // ---- The equation

    void enter(const REFERENCE& r, SIDE side, WIDE sign) {
        size_t i = 0;
        for (const LINEAR_FORM::TERM& t : r.sum) {
            const TERM_FACTS& f = r.facts[i++];
            const WIDE by = sign * t.coefficient;
            if (f.counts && is_common(f.counts)) {
                INEQUALITIES::SUM count;
                add_count(f.counts->level, side, 1, &count);
                add_term(count, by, {0, last_iteration(f.counts)});
            } else if (!enter_product(t.tree, f, side, by))
                add_value(t.tree, f, side, by);
        }
        for (const HALF& h : halves) // of one side alone
            if (side == SECOND) add_value(h.tree, h.facts, FIRST, h.by);
    }
    void add_value(const NODE* t, const TERM_FACTS& f, SIDE side, WIDE by) {
        const RANGE range = f.counts ? RANGE{0, last_iteration(f.counts)} : f.is_bounded ? f.range : RANGE{-FAR, FAR};
        add_term({{variable_of(t, f, side), 1}}, by, range);
    }
    void add_term(const INEQUALITIES::SUM& sum, WIDE by, const RANGE& range) {
        for (const INEQUALITIES::TERM& t : sum) equation.push_back({t.variable, t.by * by});
        for (ADDEND& a : addends)
            if (a.sum.size() == 1 && sum.size() == 1 && a.sum[0].variable == sum[0].variable) {
                a.by += by;
                return;
            }
        addends.push_back({sum, by, range});
    }

    // ---- Parts of the equation
    //
    // Where the terms with small factors together cannot reach from one multiple of what divides the other factors to
    // the next, the equation falls into one of each.

    bool split_equation() {
        for (const ADDEND& a : addends)
            if (a.by != 0) sorted.push_back(a);
        std::stable_sort(sorted.begin(), sorted.end(), [](const ADDEND& x, const ADDEND& y) {
            return std::max(x.by, -x.by) > std::max(y.by, -y.by);
        });
        return split(0, sorted.size(), constant, true);
    }
    bool split(size_t begin, size_t end, WIDE known, bool is_whole) {
        WIDE low = 0, high = 0; // of what is behind `at`
        for (size_t at = end; at > begin + 1;) {
            const ADDEND& a = sorted[--at];
            if (a.range.min <= -FAR || a.range.max >= FAR) break;
            low += a.by > 0 ? a.by * a.range.min : a.by * a.range.max;
            high += a.by > 0 ? a.by * a.range.max : a.by * a.range.min;
            WIDE g = 0;
            for (size_t i = begin; i < at; ++i) g = gcd_of(g, sorted[i].by);
            const WIDE most = -known - low, least = -known - high, rest = most % g, last = most - rest - (rest < 0 ? g : 0);
            if (last < least) return false;
            if (last - g < least) {
                if (print_debug >= 3) {
                    const char* const told = is_whole ? "~~~#TDS#4\tTesting final decoupled subscripts %d:%d\n"
                                                      : "~~~#TDS#3\tTesting decoupled subscripts %d:%d\n";
                    debug_printf(told, static_cast<int>(at), static_cast<int>(end) - 1);
                }
                return split(begin, at, -last, false) && split(at, end, known + last, false);
            }
        }
        if (is_whole) return true;
        INEQUALITIES::SUM part;
        for (size_t i = begin; i < end; ++i)
            for (const INEQUALITIES::TERM& t : sorted[i].sum) part.push_back({t.variable, t.by * sorted[i].by});
        system.add_equality(part, known);
        return true;
    }
    static WIDE gcd_of(WIDE a, WIDE b) {
        while (b) {
            const WIDE r = a % b;
            a = b, b = r;
        }
        return a < 0 ? -a : a;
    }

    // ---- Products

    // Both sides have it with the same factor.
    bool enter_product(const NODE* t, const TERM_FACTS& f, SIDE side, WIDE by) {
        const NODE *invariant, *count;
        if (!is_product(t, &invariant, &count) || !term_is_fixed(f, t, fixed, pointers_are_fixed)) return false;
        struct LOOP* loop = common;
        while (loop && !(loop->VLCV && loop->VLCV->sym == count->u.sym)) loop = loop->parent;
        if (!loop || loop->is_root() || f.levels != level_bit(loop->level)) return false;
        if (side == FIRST) {
            halves.push_back({t, f, by});
            return true;
        }
        const auto half = std::find_if(halves.begin(), halves.end(), [&](const HALF& h) {
            return h.by == -by && is_same_value(h.tree, t);
        });
        if (half == halves.end()) return false;
        TERM_FACTS of_invariant;
        of_invariant.fixed_in = f.fixed_in;
        const NODE* plain = invariant;
        while (plain->op == SCONV && range_of_type(plain->left->type).is_within(range_of_type(plain->type)))
            plain = plain->left;
        of_invariant.is_bounded = true;
        of_invariant.range = range_of_tree(plain, common);
        products.push_back({half->by, variable_of(plain, of_invariant, side), plain, of_invariant.range, loop->level});
        halves.erase(half);
        return true;
    }

    // s * (sum of distances and numbers) = difference: without s, where that is farther from 0 than the difference.
    bool cancel_invariant(WIDE low, WIDE high) {
        if (products.empty() || constant != 0) return false;
        const PRODUCT& first = products[0];
        WIDE multiple = 0;
        for (const INEQUALITIES::TERM& t : equation) {
            if (t.variable != first.invariant) return false;
            multiple += t.by;
        }
        for (const PRODUCT& p : products)
            if (p.invariant != first.invariant) return false;
        WIDE least = std::max(first.range.min, -first.range.max);
        if (least <= 0 && tree_is_non_zero(first.tree, common)) least = 1;
        if (std::max(-low, high) >= least) return false;
        equation.clear();
        for (const PRODUCT& p : products) equation.push_back({distance[static_cast<size_t>(p.level) - 1], -p.by});
        constant = multiple;
        products.clear();
        return true;
    }

    // ---- Givens

    void add_givens(struct LOOP* loop, SIDE side) {
        for (; loop; loop = loop->parent)
            for (const GIVEN& g : givens_for_references(loop))
                if (!g.ranges.empty() && g.sum->sum.is_exact) add_given(g, side);
    }
    void add_given(const GIVEN& g, SIDE side) {
        INEQUALITIES::SUM sum;
        size_t i = 0, counts = 0;
        for (const LINEAR_FORM::TERM& t : g.sum->sum) {
            const TERM_FACTS& f = g.sum->facts[i++];
            counts += f.counts != nullptr;
            if (f.counts && is_common(f.counts)) {
                add_count(f.counts->level, side, t.coefficient, &sum);
                continue;
            }
            const bool is_shared = !f.counts && !f.levels && term_is_fixed(f, t.tree, fixed, pointers_are_fixed);
            int variable = find(t.tree, is_shared, side);
            if (variable < 0) return;
            sum.push_back({variable, t.coefficient});
        }
        uses_given = true;
        if (g.ranges.size() == 1) return add_range(&system, sum, g.sum->sum.constant, g.ranges[0]);
        if (alternatives.size() < MOST_ALTERNATIVES) alternatives.push_back({sum, g.sum->sum.constant, g.ranges});
    }
    static void add_range(INEQUALITIES* to, const INEQUALITIES::SUM& sum, WIDE constant, const RANGE& r) {
        if (r.min > -FAR) to->add(sum, constant - r.min);
        if (r.max < FAR) to->add(negated(sum), r.max - constant);
    }

    // ---- Asking

    static bool has(const DVE& v, PART part) {
        return part == BACKWARD ? v.has_BWD_dirs() : part == SAME ? v.has_SAME_dir() : v.has_FWD_dirs();
    }
    static PART part_of(const DVE& v) {
        return v.has_compound_dirs() ? ANY : v.has_BWD_dirs() ? BACKWARD : v.has_SAME_dir() ? SAME : FORWARD;
    }
    // Adds the equation and the directions. Of level `k`, distances at least that far from 0.
    void restrict(INEQUALITIES* s, const DDEP& v, int k, PART part, WIDE from_of_k) const {
        for (int l = 1; l < v.count(); ++l) {
            const PART p = l == k ? part : part_of(v.ddve(l));
            const int d = distance[static_cast<size_t>(l) - 1];
            const WIDE from = l == k ? from_of_k : 1;
            if (l != k && v.ddve(l).has_exact_distance()) s->add_equality({{d, 1}}, -v.ddve(l).exact_distance());
            if (p == FORWARD) s->add({{d, 1}}, -from);
            if (p == BACKWARD) s->add({{d, -1}}, -from);
            if (p == SAME) s->add_equality({{d, 1}}, 0);
        }
        // -by * invariant * distance: of a forward distance from + z it is -by * (from * invariant + w), w the product
        // of the invariant and z.
        INEQUALITIES::SUM sum = equation;
        for (const PRODUCT& p : products) {
            const PART at = p.level == k ? part : part_of(v.ddve(p.level));
            if (at == SAME) continue;
            if (p.level != k && v.ddve(p.level).has_exact_distance()) {
                sum.push_back({p.invariant, -p.by * v.ddve(p.level).exact_distance()});
                continue;
            }
            if (at == ANY) {
                sum.push_back({s->add_variable(), 1});
                continue;
            }
            const int d = distance[static_cast<size_t>(p.level) - 1], w = s->add_variable();
            const WIDE sign = at == FORWARD ? 1 : -1, from = p.level == k ? from_of_k : 1;
            sum.push_back({p.invariant, -p.by * sign * from});
            sum.push_back({w, -p.by * sign});
            // w lies between the bounds of the invariant times z = sign * distance - from, which is not negative.
            if (p.range.min > -FAR) s->add({{w, 1}, {d, -p.range.min * sign}}, p.range.min * from);
            if (p.range.max < FAR) s->add({{w, -1}, {d, p.range.max * sign}}, -p.range.max * from);
        }
        s->add_equality(sum, constant);
    }
    template <class VISIT> // each choice among the ranges of the givens that have two
    void for_each_choice(const INEQUALITIES& s, size_t from, const VISIT& visit) const {
        if (from == alternatives.size()) return visit(s);
        for (const RANGE& r : alternatives[from].ranges) {
            INEQUALITIES chosen = s;
            add_range(&chosen, alternatives[from].sum, alternatives[from].constant, r);
            for_each_choice(chosen, from + 1, visit);
        }
    }
    bool may_be(const DDEP& v, long* work) const {
        INEQUALITIES s = system;
        restrict(&s, v, 0, ANY, 1);
        bool any = false;
        for_each_choice(s, 0, [&](const INEQUALITIES& chosen) {
            WIDE low = -FAR, high = FAR;
            any |= chosen.bound(INEQUALITIES::MOST_VARIABLES - 1, &low, &high, work);
        });
        return any;
    }
    // Of the distances at level `k` that are `from` or more from 0, in the direction; least > most: there are none.
    RANGE distances(const DDEP& v, int k, PART part, WIDE from, long* work) const {
        INEQUALITIES s = system;
        restrict(&s, v, k, part, from);
        RANGE all{FAR, -FAR};
        for_each_choice(s, 0, [&](const INEQUALITIES& chosen) {
            WIDE low = part == FORWARD ? from : -FAR, high = part == BACKWARD ? -from : FAR;
            if (!chosen.bound(distance[static_cast<size_t>(k) - 1], &low, &high, work)) return;
            all.min = std::min(all.min, low);
            all.max = std::max(all.max, high);
        });
        return all;
    }
    void narrow_part(const DDEP& v, int k, PART part, DVE* at, long* work) const {
        RANGE all = distances(v, k, part, 1, work);
        // Of products more is known once the least distance is.
        const WIDE nearest = part == FORWARD ? all.min : -all.max;
        if (part != SAME && all.min <= all.max && nearest <= DVE::LIMIT && std::any_of(products.begin(), products.end(),
            [k](const PRODUCT& p) { return p.level == k; })) {
            const RANGE farther = distances(v, k, part, nearest + 1, work);
            if (farther.min > farther.max) all.min = all.max = part == FORWARD ? nearest : -nearest;
        }
        const WIDE least = all.min, most = all.max;
        DVE left;
        if (part == FORWARD) left.set_FWD_dirs();
        if (part == BACKWARD) left.set_BWD_dirs();
        if (part == SAME) left.set_SAME_dir();
        const DVE whole = left;
        if (least > most)
            left.clr_ALL_dirs();
        else if (part != SAME) {
            if (least > (part == FORWARD ? WIDE(1) : -FAR)) left.keep_min_distance(to_int65(std::max(least, -FAR)));
            if (most < (part == BACKWARD ? WIDE(-1) : FAR)) left.keep_max_distance(to_int65(std::min(most, FAR)));
        }
        if (left == whole) return;
        DVE others = *at;
        if (part == FORWARD) others.clr_FWD_dirs();
        if (part == BACKWARD) others.clr_BWD_dirs();
        if (part == SAME) others.clr_SAME_dir();
        left &= *at;
        *at = others |= left;
    }

    struct HALF {
        const NODE* tree;
        TERM_FACTS facts;
        WIDE by;
    };
    struct ALTERNATIVE {
        INEQUALITIES::SUM sum;
        WIDE constant;
        std::vector<RANGE> ranges;
    };
    static constexpr size_t MOST_ALTERNATIVES = 2;

    struct LOOP *common, *fixed;
    const bool pointers_are_fixed;
    INEQUALITIES system;
    std::vector<int> iteration, distance; // by level, from 1: of the first reference, and to the second
    std::vector<VARIABLE> values;
    std::vector<ADDEND> addends, sorted; // the equation without products, the largest factors first
    std::vector<HALF> halves;
    std::vector<PRODUCT> products;
    std::vector<ALTERNATIVE> alternatives;
    INEQUALITIES::SUM equation;
    WIDE constant = 0;
    bool uses_given = false;
};

void tell(const REFERENCE& a, const DDEP& given, const DDEP* left) {
    debug_printf("\tSYMBOLIC SUBSCRIPT TEST FOR %s", tree_to_infix(a.root).c_str());
    if (!left)
        debug_printf("\n~~~#SYMBOLIC#z    ! WIN !\n\n");
    else if (*left != given)
        debug_printf("\n~~~#SSIV#z  WIN\n");
    else
        debug_printf("\n~~~#SYMBOLIC#3  LOSE  %s\n\n", left->text().c_str());
}

} // namespace

void allow_work_on_givens() { work_left = WORK_BY_ANALYSIS; }

DDEP_PTR narrow_by_givens(DDEP_PTR v, const REFERENCE& a, const REFERENCE& b, struct LOOP* common, int64_t low,
                          int64_t high, bool pointersAreFixed) {
    if (work_left <= 0) return v;
    SYSTEM system(a, b, common, loop_of_differences(*v, common), pointersAreFixed);
    if (!system.is_of_use()) return v;
    long work = std::min(work_left, WORK_BY_PAIR);
    const long before = work;
    const DDEP given = *v;
    const bool is_left = system.narrow(v.get(), low, high, &work);
    work_left -= before - work + 100;
    if (print_debug >= 3) tell(a, given, is_left ? v.get() : nullptr);
    return is_left ? std::move(v) : nullptr;
}
