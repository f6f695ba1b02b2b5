// At which distances two addresses can be equal: one linear equation in the iterations of both references.
//
//     a1*x1 + a2*x2 + ... + u - (b1*y1 + b2*y2 + ... + w) = e
//
// x and y are the counts of iterations of the loops around the first and the second reference, u and w values that do
// not change, or that nothing but their bounds is known of, and e runs through the differences at which two accesses
// of their widths overlap. Values that both sides have in common cancel where they are fixed between the two.
//
// For each level, each distance d in its set is put to the test: with y = x + d there must be a solution by the
// greatest common divisor of the coefficients, and by the least and the greatest value that the left side takes over
// the counts that the loops have and the distances that the other levels still have. With one level and nothing unknown
// this is exact: it decides equal coefficients (one distance), a coefficient of 0 on one side (one iteration), opposite
// ones (distances of one parity) and all others alike. With more levels what one level loses narrows the next.
//
// Sound because both conditions are necessary ones of the equation over the integers, and a distance is removed only where
// they fail for every e. All of it is computed in 128 bits, in which nothing here overflows: coefficients have 33 bits,
// counts 64, and there are at most 64 terms. Of sums that may wrap at the width of an address the equation holds modulo
// that, which is one more unknown.
#include "OPT5/dd/reference_form.h"

#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <unordered_map>

struct LOOP* loop_of_level(struct LOOP* loop, int level) {
    while (loop->level > level) loop = loop->parent;
    return loop;
}

static thread_local std::unordered_map<const struct LOOP*, WIDE> trip_limits; // looked up alone

void limit_trips(const struct LOOP* loop, WIDE most) { trip_limits[loop] = most; }
static thread_local std::unordered_map<const struct LOOP*, std::vector<GIVEN>> givens; // looked up alone

const std::vector<GIVEN>& givens_for_references(const struct LOOP* loop) { return givens[loop]; }
void add_given_for_references(const struct LOOP* loop, GIVEN given) { givens[loop].push_back(std::move(given)); }

void forget_facts_for_references() {
    trip_limits.clear();
    givens.clear();
}

// The count of an iteration that is left before its tail is one more than those that are executed to their ends.
WIDE last_iteration(const struct LOOP* loop) {
    WIDE most = NO_LAST;
    if (loop->maxTrips && loop->maxTrips->op == ICON && loop->maxTrips->u.lval < no_trip_bound())
        most = to_wide(loop->maxTrips->u.lval);
    if (const auto it = trip_limits.find(loop); it != trip_limits.end()) most = std::min(most, it->second);
    if (most >= NO_LAST) return NO_LAST;
    const bool ends_at_tail = loop->is_bottom_tested() && !loop->has(LOOP_early_exit);
    return std::max<WIDE>(0, ends_at_tail ? most - 1 : most);
}

bool bounds_of_count(const SYMTAB* sym, const struct LOOP* loop, int64_t* low, int64_t* high) {
    while (loop && !(loop->VLCV && loop->VLCV->sym == sym)) loop = loop->parent;
    const WIDE last = loop && !loop->is_root() ? last_iteration(loop) : NO_LAST;
    if (last > INT64_MAX) return false;
    *low = 0, *high = static_cast<int64_t>(last);
    return true;
}

namespace {

constexpr int MOST_DIFFERENCES = 64, MOST_ROUNDS = 3;

// What a sum can be: `constant` plus a multiple of `step` (0: nothing), within bounds.
struct SPAN {
    WIDE constant = 0, step = 0;
    WIDE min = 0, max = 0;
    bool has_min = true, has_max = true;

    void add_constant(WIDE v) {
        constant += v;
        min += v;
        max += v;
    }
    // A multiple of what lies between `low` and `high`, FAR for no bound.
    void add_multiple(WIDE k, WIDE low, WIDE high) {
        if (k == 0) return;
        if (low == high) return add_constant(k * low);
        step = gcd_of(step, k);
        add_end(k, k > 0 ? low : high, &min, &has_min);
        add_end(k, k > 0 ? high : low, &max, &has_max);
    }
    // The values at corners of an area, and the directions in which it has no end.
    void add_area(const std::vector<WIDE>& corners, const std::vector<WIDE>& directions) {
        min += *std::min_element(corners.begin(), corners.end());
        max += *std::max_element(corners.begin(), corners.end());
        for (WIDE d : directions) {
            has_min = has_min && d >= 0;
            has_max = has_max && d <= 0;
        }
    }
    bool may_be(WIDE v) const {
        if (step ? (v - constant) % step != 0 : v != constant) return false;
        return !(has_min && v < min) && !(has_max && v > max);
    }

private:
    static void add_end(WIDE k, WIDE at, WIDE* sum, bool* has) {
        if (at >= FAR || at <= -FAR)
            *has = false;
        else
            *sum += k * at;
    }
};

struct DISTANCES {
    WIDE low, high; // FAR, -FAR: beyond all
    bool is_zero() const { return low == 0 && high == 0; }
};

DISTANCES hull_of(const DVE& v) {
    DISTANCES d{FAR, -FAR};
    auto hold = [&d](WIDE low, WIDE high) {
        d.low = std::min(d.low, low);
        d.high = std::max(d.high, high);
    };
    if (v.overflow_low) hold(-FAR, -DVE::LIMIT - 1);
    if (v.overflow_high) hold(DVE::LIMIT + 1, FAR);
    if (v.same) hold(0, 0);
    for (int k = 1; k <= DVE::LIMIT; ++k) {
        if (v.bwd >> (k - 1) & 1) hold(-k, -k);
        if (v.fwd >> (k - 1) & 1) hold(k, k);
    }
    return d;
}

// A value that only its bounds are known of, times a number.
struct UNKNOWN {
    WIDE by, low, high;
};

// The counts of one loop in the equation: a*x - b*y.
struct LEVEL_TERM {
    WIDE a = 0, b = 0, last = NO_LAST;
    bool is_there() const { return a != 0 || b != 0; }

    // Adds what it can be at these distances; false where there are no such iterations. `single`: the same term by
    // term.
    bool add_to(SPAN* s, DISTANCES d, std::vector<UNKNOWN>* single) const {
        if (last < FAR) d = {std::max(d.low, -last), std::min(d.high, last)};
        if (d.low > d.high) return false;
        if (!is_there()) return true;
        if (d.low == d.high) {
            s->add_constant(-b * d.low);
            s->add_multiple(a - b, first_x(d.low), last_x(d.low));
            single->push_back({-b, d.low, d.low});
            single->push_back({a - b, first_x(d.low), last_x(d.low)});
            return true;
        }
        single->push_back({a, 0, last});
        single->push_back({-b, 0, last});
        std::vector<WIDE> corners, directions;
        auto corner = [&](WIDE x, WIDE y) {
            if (y - x >= d.low && y - x <= d.high) corners.push_back(a * x - b * y);
        };
        for (WIDE at : {d.low, d.high}) {
            if (at <= -FAR || at >= FAR) continue;
            corner(first_x(at), first_x(at) + at);
            if (last < FAR) corner(last_x(at), last_x(at) + at);
        }
        corner(0, 0);
        if (last < FAR) {
            corner(last, last);
            corner(0, last);
            corner(last, 0);
        } else {
            directions.push_back(a - b);
            if (d.high >= FAR) directions.push_back(-b);
            if (d.low <= -FAR) directions.push_back(a);
        }
        s->step = gcd_of(gcd_of(s->step, a), b);
        s->add_area(corners, directions);
        return true;
    }

private:
    static WIDE first_x(WIDE distance) { return distance < 0 ? -distance : 0; }
    WIDE last_x(WIDE distance) const { return last >= FAR ? FAR : distance > 0 ? last - distance : last; }
};

// A value computed from counts that both sides have: of the same iterations of its loops they are equal.
struct PAIR {
    UNKNOWN a, b;
    uint64_t levels;
};

// Whether the sum of the terms, in descending order of their factors, may be `v`. Where the last terms together cannot
// reach from one multiple of what divides the first ones to the next, the sum falls into two of their own.
bool may_be_sum(const UNKNOWN* begin, const UNKNOWN* end, WIDE v) {
    SPAN all, rest;
    for (const UNKNOWN* u = begin; u != end; ++u) all.add_multiple(u->by, u->low, u->high);
    if (!all.may_be(v)) return false;
    for (const UNKNOWN* u = end; u - 1 > begin;) {
        --u;
        rest.add_multiple(u->by, u->low, u->high);
        if (!rest.has_min || !rest.has_max) return true;
        WIDE g = 0;
        for (const UNKNOWN* h = begin; h != u; ++h) g = gcd_of(g, h->by);
        const WIDE last = floor_div(v - rest.min, g) * g; // of the first terms
        if (last < v - rest.max) return false;
        if (last - g < v - rest.max) return may_be_sum(begin, u, last) && may_be_sum(u, end, v - last);
    }
    return true;
}

class EQUATION {
public:
    EQUATION(const REFERENCE& x, const REFERENCE& y, struct LOOP* c, struct LOOP* in, bool fixed_pointers)
        : common(c), fixed(in), pointersAreFixed(fixed_pointers), levels(static_cast<size_t>(c->level) + 1) {
        for (struct LOOP* l = common; l; l = l->parent) levels[static_cast<size_t>(l->level)].last = last_iteration(l);
        constant = WIDE(x.sum.constant) - y.sum.constant;
        enter(x, y);
        if (!x.sum.is_exact || !y.sum.is_exact) unknowns.push_back({WIDE(1) << ADDRESS_BITS, -FAR, FAR});
    }

    // The sum may be `low` to `high`, not just a number.
    void add_slack(int64_t low, int64_t high) { unknowns.push_back({-1, low, high}); }

    // Null where the left side is never `e`.
    DDEP_PTR narrowed(const DDEP& v, WIDE e) const {
        if (!may_be(e, v, 0, {0, 0})) return nullptr;
        auto left = std::make_unique<DDEP>(v);
        const int alone = only_level();
        if (alone > 0 && levels[static_cast<size_t>(alone)].a == levels[static_cast<size_t>(alone)].b)
            return with_one_distance(std::move(left), alone, e);
        for (int round = 0; round < MOST_ROUNDS; ++round) {
            bool any = false;
            for (int k = 1; k < left->count(); ++k) {
                if (!is_concerned(k)) continue;
                if (!narrow_level(left.get(), k, e, &any)) return nullptr;
            }
            if (!any || only_level() > 0) break;
        }
        return left;
    }

private:
    // ---- Setting up

    bool is_fixed(const TERM_FACTS& f, const NODE* t) const { return term_is_fixed(f, t, fixed, pointersAreFixed); }
    bool is_common(const struct LOOP* l) const {
        return l->level <= common->level && loop_of_level(common, l->level) == l;
    }
    static UNKNOWN unknown(WIDE by, const TERM_FACTS& f) {
        if (f.counts) return {by, 0, last_iteration(f.counts)};
        return f.is_bounded ? UNKNOWN{by, f.range.min, f.range.max} : UNKNOWN{by, -FAR, FAR};
    }
    // As residue + modulus * u, where that is known.
    void add_unknown(UNKNOWN u, const TERM_FACTS& f) {
        if (f.modulus > 0) {
            constant += u.by * f.residue;
            u.by *= f.modulus;
            if (u.low > -FAR) u.low = -floor_div(-(u.low - f.residue), f.modulus);
            if (u.high < FAR) u.high = floor_div(u.high - f.residue, f.modulus);
            if (u.low > u.high) u.low = -FAR, u.high = FAR; // nothing is executed where facts contradict each other
        }
        unknowns.push_back(u);
    }
    void enter(const REFERENCE& x, const REFERENCE& y) {
        std::vector<bool> is_matched(y.facts.size());
        size_t i = 0;
        for (const LINEAR_FORM::TERM& t : x.sum) {
            const TERM_FACTS& f = x.facts[i++];
            if (enter_count(f, t.coefficient, &LEVEL_TERM::a)) continue;
            const LINEAR_FORM::TERM* other = f.counts ? nullptr : y.sum.find(t.tree);
            const size_t j = other ? static_cast<size_t>(other - y.sum.begin()) : 0;
            if (other && match(f, y.facts[j], t, other->coefficient))
                is_matched[j] = true;
            else
                add_unknown(unknown(t.coefficient, f), f);
        }
        i = 0;
        for (const LINEAR_FORM::TERM& t : y.sum) {
            const size_t j = i++;
            if (!is_matched[j] && !enter_count(y.facts[j], t.coefficient, &LEVEL_TERM::b))
                add_unknown(unknown(-WIDE(t.coefficient), y.facts[j]), y.facts[j]);
        }
    }
    bool enter_count(const TERM_FACTS& f, int64_t k, WIDE LEVEL_TERM::*side) {
        if (!f.counts || !is_common(f.counts)) return false;
        levels[static_cast<size_t>(f.counts->level)].*side += k;
        return true;
    }
    bool match(const TERM_FACTS& f, const TERM_FACTS& g, const LINEAR_FORM::TERM& t, int64_t k_of_other) {
        if (!is_fixed(f, t.tree) || !is_fixed(g, t.tree) || f.levels != g.levels) return false;
        if (common->level + 1 < MOST_LEVELS && f.levels >> (common->level + 1)) return false; // of loops that are not around both
        const UNKNOWN a = unknown(t.coefficient, f), b = unknown(-WIDE(k_of_other), g);
        if (f.levels)
            pairs.push_back({a, b, f.levels});
        else if (a.by + b.by)
            add_unknown(joined(a, b), f);
        return true;
    }
    static UNKNOWN joined(const UNKNOWN& a, const UNKNOWN& b) { // of one value
        const WIDE low = std::max(a.low, b.low), high = std::min(a.high, b.high);
        return low <= high ? UNKNOWN{a.by + b.by, low, high} : UNKNOWN{a.by + b.by, a.low, a.high};
    }

    // ---- Asking

    // Whether the left side may be `e` while level `k` has the distances `d`, the others those that are left.
    bool may_be(WIDE e, const DDEP& v, int k, DISTANCES d) const {
        SPAN s;
        s.add_constant(constant);
        std::vector<UNKNOWN> single;
        auto add = [&](const UNKNOWN& u) {
            s.add_multiple(u.by, u.low, u.high);
            single.push_back(u);
        };
        uint64_t in_step = 0; // levels at which the iterations are the same
        for (int l = 1; l < v.count(); ++l) {
            const DISTANCES at = l == k ? d : hull_of(v.dve[static_cast<size_t>(l)]);
            if (at.is_zero()) in_step |= level_bit(l);
            if (!levels[static_cast<size_t>(l)].add_to(&s, at, &single)) return false;
        }
        for (const UNKNOWN& u : unknowns) add(u);
        for (const PAIR& p : pairs) {
            if (p.levels & ~in_step) {
                add(p.a);
                add(p.b);
            } else {
                add(joined(p.a, p.b));
            }
        }
        return s.may_be(e) && (single.size() < 3 || may_be_term_by_term(&single, e - constant));
    }
    // Of values that are known nothing is left but their sum.
    static bool may_be_term_by_term(std::vector<UNKNOWN>* terms, WIDE v) {
        auto is_known = [&v](const UNKNOWN& u) {
            if (u.by && u.low != u.high) return false;
            v -= u.by ? u.by * u.low : 0;
            return true;
        };
        terms->erase(std::remove_if(terms->begin(), terms->end(), is_known), terms->end());
        auto size = [](WIDE w) { return w < 0 ? -w : w; };
        std::stable_sort(terms->begin(), terms->end(),
                         [&](const UNKNOWN& x, const UNKNOWN& y) { return size(x.by) > size(y.by); });
        return may_be_sum(terms->data(), terms->data() + terms->size(), v);
    }

    // There are terms that make up for whatever the others are, up to `e`, while the iterations are the same at `in_step`.
    bool has_free_terms(WIDE e, uint64_t in_step) const {
        SPAN free, others;
        others.add_constant(constant - e);
        const auto add = [&](const UNKNOWN& u) {
            (u.by == 1 || u.by == -1 ? free : others).add_multiple(u.by, u.low, u.high);
        };
        for (const UNKNOWN& u : unknowns) add(u);
        for (const PAIR& p : pairs) {
            if (p.levels & ~in_step)
                add(p.a), add(p.b);
            else
                add(joined(p.a, p.b));
        }
        for (const LEVEL_TERM& l : levels) {
            others.add_multiple(l.a, 0, l.last);
            others.add_multiple(-l.b, 0, l.last);
        }
        return (!free.has_min || (others.has_max && free.min <= -others.max)) &&
               (!free.has_max || (others.has_min && free.max >= -others.min)) && (free.min < free.max || !free.has_max);
    }
    bool is_concerned(int level) const {
        return levels[static_cast<size_t>(level)].is_there() ||
               std::any_of(pairs.begin(), pairs.end(), [level](const PAIR& p) { return p.levels & level_bit(level); });
    }
    // The level that alone is in the equation, with nothing unknown; 0 for none.
    int only_level() const {
        if (!unknowns.empty() || !pairs.empty()) return 0;
        int found = 0;
        for (size_t l = 1; l < levels.size(); ++l)
            if (levels[l].is_there()) {
                if (found) return 0;
                found = static_cast<int>(l);
            }
        return found;
    }

    // a*x - a*(x + d) + constant = e. `may_be` has seen that it is divisible.
    DDEP_PTR with_one_distance(DDEP_PTR v, int level, WIDE e) const {
        const LEVEL_TERM& t = levels[static_cast<size_t>(level)];
        if ((constant - e) % t.a) return nullptr;
        const WIDE d = (constant - e) / t.a;
        if (t.last < FAR && (d > t.last || d < -t.last)) return nullptr;
        DVE& at = v->dve[static_cast<size_t>(level)];
        at.keep_sole_distance(to_int65(d));
        return at.is_dependent() ? std::move(v) : nullptr;
    }

    bool narrow_level(DDEP* v, int k, WIDE e, bool* any) const {
        DVE& at = v->dve[static_cast<size_t>(k)];
        const DVE before = at;
        auto goes = [&](WIDE low, WIDE high) { return !may_be(e, *v, k, {low, high}); };
        uint64_t in_step = level_bit(k);
        for (int l = 1; l < v->count(); ++l)
            if (v->dve[static_cast<size_t>(l)].has_only_SAME_dir()) in_step |= level_bit(l);
        if (has_free_terms(e, in_step)) return true;
        if (at.same && goes(0, 0)) at.same = false;
        *any |= at != before;
        if (has_free_terms(e, in_step & ~level_bit(k))) return at.is_dependent();
        for (int d = -DVE::LIMIT; d <= DVE::LIMIT; ++d)
            if (d && at.has_distance(INT65(d)) && goes(d, d)) at.clr_distance(INT65(d));
        if (at.overflow_high && goes(DVE::LIMIT + 1, FAR)) at.overflow_high = false;
        if (at.overflow_low && goes(-FAR, -DVE::LIMIT - 1)) at.overflow_low = false;
        *any |= at != before;
        return at.is_dependent();
    }

    struct LOOP *common, *fixed;
    bool pointersAreFixed;
    std::vector<LEVEL_TERM> levels;
    std::vector<UNKNOWN> unknowns;
    std::vector<PAIR> pairs;
    WIDE constant = 0;
};

} // namespace

struct LOOP* loop_of_differences(const DDEP& v, struct LOOP* common) {
    int level = 1;
    while (level < v.count() && v.dve[static_cast<size_t>(level)].has_only_SAME_dir()) ++level;
    return loop_of_level(common, std::min(level, static_cast<int>(common->level)));
}

bool term_is_fixed(const TERM_FACTS& f, const NODE* term, const struct LOOP* in, bool pointersAreFixed) {
    return (pointersAreFixed && term->type->is_pointer()) || (f.fixed_in && f.fixed_in->level <= in->level);
}

DDEP_PTR narrow_by_addresses(DDEP_PTR v, const REFERENCE& a, EXTENT ea, const REFERENCE& b, EXTENT eb,
                             struct LOOP* common, bool pointersAreFixed) {
    EQUATION equation(a, b, common, loop_of_differences(*v, common), pointersAreFixed);
    int64_t low = eb.low - ea.high + 1, high = eb.high - ea.low - 1;
    if (high - low >= MOST_DIFFERENCES) {
        equation.add_slack(low, high);
        low = high = 0;
    }
    DDEP_PTR all;
    for (int64_t e = low; e <= high; ++e) {
        DDEP_PTR one = equation.narrowed(*v, e);
        if (all)
            all->set_union(one.get());
        else
            all = std::move(one);
    }
    if (!all && print_debug >= 3) {
        debug_printf("~~~#TDS#z INDEPENDENT (1) v1: %s\n", tree_to_infix(a.root).c_str());
        debug_printf("~~~#TDS#z INDEPENDENT (1) v2: %s\n", tree_to_infix(b.root).c_str());
    }
    if (!all || !a.sum.is_exact || !b.sum.is_exact) return all;
    return narrow_by_givens(std::move(all), a, b, common, eb.low - ea.high + 1, eb.high - ea.low - 1, pointersAreFixed);
}
