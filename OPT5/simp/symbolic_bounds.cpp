// Bounds: a walk from the leaves that takes the operands' bounds to the operator's, in arithmetic that wraps. A result
// whose exact bounds lie in one turn of the type is an interval again; one that spans a wrap has the type's limits.
//
// What is asserted of a tree narrows its bounds wherever it occurs, and so does the condition of a conditional in its
// arms. The walk sees a bounded number of nodes; what it does not see has the limits of its type.

#include "OPT5/simp/range.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/target/bif.h"

// ---- Values and types

WIDE to_wide(INT65 v) {
    return static_cast<WIDE>(static_cast<unsigned __int128>(static_cast<WIDE>(v.sign)) << 64 | v.value);
}
INT65 to_int65(WIDE v) { return INT65(static_cast<int32_t>(v >> 64), static_cast<uint64_t>(v)); }

RANGE wrapped(WIDE min, WIDE max, const TYPE* t) {
    const RANGE limits = range_of_type(t);
    if (limits.min <= min && max <= limits.max) return {min, max};
    if (t->is_bool() || t->is_enum()) return limits;
    const WIDE turn = WIDE(1) << t->size;
    if (max - min >= turn) return limits;
    auto wrap = [&](WIDE v) { return ((v - limits.min) & (turn - 1)) + limits.min; };
    const RANGE r{wrap(min), wrap(max)};
    return r.min <= r.max ? r : limits;
}

const NODE* without_wrappers(const NODE* t) {
    for (;;) switch (t->op) {
        case IDENTITY:
        case SSA_USE:
        case SSA_DEF:
        case SSA_MU:
        case SSA_CHI:
            if (!t->left) return t;
            t = t->left;
            break;
        case CSE_DUPE:
        case CSE_ORIG:
            if (!t->right) return t;
            t = t->right;
            break;
        default: return t;
        }
}

bool is_same_value(const NODE* a, const NODE* b) {
    a = without_wrappers(a);
    b = without_wrappers(b);
    return a->op == b->op && trees_are_congruent(a, b, false);
}

RANGE narrowed(const RANGE& r, int op, const RANGE& c) {
    switch (op) {
    case EQ: return both(r, c);
    case NEQ:
        if (c.min != c.max || r.min == r.max) return r;
        return {r.min + (r.min == c.min), r.max - (r.max == c.max)};
    case LT:
    case ULT: return both(r, {r.min, c.max - 1});
    case LE:
    case ULE: return both(r, {r.min, c.max});
    case GT:
    case UGT: return both(r, {c.min + 1, r.max});
    case GE:
    case UGE: return both(r, {c.min, r.max});
    default: return r;
    }
}

namespace {

constexpr int MOST_NODES = 64, MOST_BUILTIN_LEVELS = 3, MOST_GIVEN_LEVELS = 2;
thread_local int builtin_levels = 0;

constexpr WIDE NO_BOUND = WIDE(1) << 120; // beyond every product that is worked with

WIDE times(WIDE a, WIDE b) {
    WIDE r;
    const bool overflows = __builtin_mul_overflow(a, b, &r) || r > NO_BOUND || r < -NO_BOUND;
    return overflows ? ((a < 0) != (b < 0) ? -NO_BOUND : NO_BOUND) : r;
}

// The smallest 2^k - 1 that is not below v.
WIDE mask_over(WIDE v) {
    WIDE m = 0;
    while (m < v) m = m << 1 | 1;
    return m;
}

// A compare reads its operands as signed or not; the values are theirs only if their type does.
bool compares_values(const NODE* t) {
    if (!op_is_int_compare(t->op) || !has_value_range(t->left->type) || !has_value_range(t->right->type)) return false;
    if (t->left->type->size != t->right->type->size || t->left->type->is_enum() || t->right->type->is_enum())
        return false;
    if (wraps_signed(t->left->type) != wraps_signed(t->right->type)) return false;
    return t->op == EQ || t->op == NEQ || (t->op >= ULE) == !wraps_signed(t->left->type);
}

// 1 always holds, 0 never does, -1 neither.
int outcome_of_compare(int op, const RANGE& a, const RANGE& b) {
    switch (op) {
    case EQ: return a.max < b.min || b.max < a.min ? 0 : a.min == a.max && a == b ? 1 : -1;
    case LT:
    case ULT: return a.max < b.min ? 1 : a.min >= b.max ? 0 : -1;
    case LE:
    case ULE: return a.max <= b.min ? 1 : a.min > b.max ? 0 : -1;
    default: break;
    }
    const int opposite = outcome_of_compare(boolean_inv[op], a, b);
    return opposite < 0 ? -1 : !opposite;
}

class WALK {
public:
    explicit WALK(struct LOOP* in) : loop(in) {
        uses_givens = (loop && loop_callbacks.givens) || (currfuninfo && !currfuninfo->givens.empty());
    }

    RANGE of(const NODE* t) {
        t = without_wrappers(t);
        if (!has_value_range(t->type)) return {-NO_BOUND, NO_BOUND};
        if (t->op == ICON) return constant(t);
        const RANGE limits = range_of_type(t->type);
        if (--nodes_left < 0) return limits;
        RANGE r = both(limits, structural(t));
        auto narrow = [&](const NODE* fact, bool holds) { r = by_fact(r, t, fact, holds); };
        if (uses_givens && given_levels < MOST_GIVEN_LEVELS) for_each_given(loop, narrow);
        for (const FACT* f = facts; f; f = f->next) visit_given(f->condition, f->holds, MOST_FACT_LEVELS, narrow);
        return r;
    }

    // What `q` is where `p` is known: 1, 0, or -1 for neither.
    int outcome_under(const NODE* p, bool holds, const NODE* q) {
        int known = -1;
        const bool q_compares = compares_values(q);
        if (q_compares || has_value_range(q->type)) {
            const FACT fact{p, holds, nullptr};
            facts = &fact;
            if (q_compares)
                known = outcome_of_compare(q->op, of(q->left), of(q->right));
            else {
                const RANGE r = of(q);
                known = r.is(0) ? 0 : r.holds(0) ? -1 : 1;
            }
            facts = nullptr;
        }
        // What never is implies anything.
        const int op_of_p = holds ? p->op : boolean_inv[p->op];
        if (known < 0 && compares_values(p) && outcome_of_compare(op_of_p, of(p->left), of(p->right)) == 0) return 0;
        HOLE asked;
        if (known >= 0 || !hole_of(q, true, &asked)) return known;
        visit_given(p, holds, MOST_FACT_LEVELS, [&](const NODE* fact_of_p, bool is_true) {
            HOLE given;
            const bool is_hole = hole_of(fact_of_p, is_true, &given) && given.is_out && given.value == asked.value &&
                                 is_same_value(given.of, asked.of);
            if (is_hole) known = asked.is_out;
        });
        return known;
    }

    // A cast that keeps every value of its operand.
    static const NODE* without_widening(const NODE* t) {
        while (t->op == SCONV && has_value_range(t->type) && has_value_range(t->left->type) &&
               range_of_type(t->left->type).is_within(range_of_type(t->type)))
            t = without_wrappers(t->left);
        return t;
    }

private:
    // The condition of a conditional, while its arm is looked at.
    struct FACT {
        const NODE* condition;
        bool holds;
        const FACT* next;
    };

    // x != c and x == c; x alone is x != 0.
    struct HOLE {
        const NODE* of = nullptr;
        WIDE value = 0;
        bool is_out = false;
    };
    static bool hole_of(const NODE* t, bool holds, HOLE* h) {
        t = without_wrappers(t);
        if (!op_is_int_compare(t->op)) {
            *h = {t, 0, holds};
            return has_value_range(t->type);
        }
        if ((t->op != EQ && t->op != NEQ) || t->right->op != ICON || !compares_values(t)) return false;
        *h = {t->left, constant(t->right).min, (t->op == NEQ) == holds};
        return true;
    }

    static RANGE constant(const NODE* t) {
        WIDE v = to_wide(t->u.lval);
        if (t->type->is_bool()) v = v != 0;
        return wrapped(v, v, t->type);
    }

    RANGE by_fact(RANGE r, const NODE* t, const NODE* fact, bool holds) {
        if (!compares_values(fact)) {
            if (is_same_value(fact, t)) return holds ? narrowed(r, NEQ, {0, 0}) : both(r, {0, 0});
            return r;
        }
        int op = holds ? fact->op : boolean_inv[fact->op];
        const NODE* other = fact->right;
        if (!is_same_value(without_widening(fact->left), t)) {
            if (!is_same_value(without_widening(fact->right), t)) return r;
            op = commute_inv[op];
            other = fact->left;
        }
        if (given_levels == MOST_GIVEN_LEVELS) return r;
        ++given_levels; // what is known of the other side must not lead back to this one for ever
        r = narrowed(r, op, of(other));
        --given_levels;
        return r;
    }

    // The operand of an operator that computes in `type`.
    RANGE operand(const NODE* t, const TYPE* type) {
        const RANGE r = of(t);
        return has_value_range(t->type) ? converted(r, type) : range_of_type(type);
    }
    static RANGE converted(const RANGE& r, const TYPE* to) {
        if (!to->is_bool()) return wrapped(r.min, r.max, to);
        return r.is(0) ? RANGE{0, 0} : r.holds(0) ? RANGE{0, 1} : RANGE{1, 1};
    }

    RANGE sum(const RANGE& a, const RANGE& b, const TYPE* type) { return wrapped(a.min + b.min, a.max + b.max, type); }
    static RANGE negative(const RANGE& a) { return {-a.max, -a.min}; }

    // Of products, which may have been too large to work with.
    static RANGE in_turn(WIDE min, WIDE max, const TYPE* type) {
        return min == -NO_BOUND || max == NO_BOUND ? range_of_type(type) : wrapped(min, max, type);
    }
    static RANGE product(const RANGE& a, const RANGE& b, const TYPE* type) {
        const WIDE c[] = {times(a.min, b.min), times(a.min, b.max), times(a.max, b.min), times(a.max, b.max)};
        return in_turn(*std::min_element(c, c + 4), *std::max_element(c, c + 4), type);
    }
    static RANGE square(const RANGE& a, const TYPE* type) {
        const WIDE low = times(a.min, a.min), high = times(a.max, a.max);
        return in_turn(a.holds(0) ? 0 : std::min(low, high), std::max(low, high), type);
    }
    static RANGE absolute(const RANGE& a, const TYPE* type) {
        if (a.min >= 0) return a;
        return wrapped(a.max < 0 ? -a.max : 0, std::max(a.max, -a.min), type);
    }

    // By the part of the divisor above zero and the part below; zero is no divisor.
    static RANGE quotient(const RANGE& a, const RANGE& b, const TYPE* type) {
        bool any = false;
        RANGE r{0, 0};
        auto divide_by = [&](WIDE low, WIDE high) {
            if (low > high) return;
            for (WIDE x : {a.min, a.max})
                for (WIDE y : {low, high}) {
                    const RANGE q{x / y, x / y};
                    r = any ? hull(r, q) : q;
                    any = true;
                }
        };
        divide_by(std::max(b.min, WIDE(1)), b.max);
        divide_by(b.min, std::min(b.max, WIDE(-1)));
        return any ? wrapped(r.min, r.max, type) : range_of_type(type);
    }
    // Smaller than the divisor, no further from zero than the dividend, and on its side.
    static RANGE remainder(const RANGE& a, const RANGE& b, const TYPE* type) {
        const WIDE most = std::max(b.max, -b.min) - 1;
        if (most < 0) return range_of_type(type);
        const WIDE least_divisor = b.holds(0) ? 0 : std::min(b.min < 0 ? -b.min : b.min, b.max < 0 ? -b.max : b.max);
        if (std::max(a.max, -a.min) < least_divisor) return a;
        return {a.min < 0 ? std::max(a.min, -most) : 0, a.max > 0 ? std::min(a.max, most) : 0};
    }

    static RANGE common_bits(const RANGE& a, const RANGE& b) {
        if (a.min >= 0 && b.min >= 0) return {0, std::min(a.max, b.max)};
        if (a.min >= 0) return {0, a.max};
        if (b.min >= 0) return {0, b.max};
        const WIDE least = -mask_over(-std::min(a.min, b.min) - 1) - 1;
        const bool all_negative = a.max < 0 && b.max < 0;
        return {least, all_negative ? std::min(a.max, b.max) : std::max(a.max, b.max)};
    }
    static RANGE united_bits(const RANGE& a, const RANGE& b) {
        const WIDE most = mask_over(std::max(a.max, b.max));
        if (a.min >= 0 && b.min >= 0) return {std::max(a.min, b.min), most};
        const bool is_negative = a.max < 0 || b.max < 0;
        WIDE least = std::min(a.min, b.min);
        if (a.max < 0 && b.max < 0) least = std::max(a.min, b.min);
        return {least, is_negative ? WIDE(-1) : most};
    }
    static RANGE differing_bits(const RANGE& a, const RANGE& b) {
        const WIDE mask = mask_over(std::max(std::max(a.max, b.max), -std::min(a.min, b.min) - 1));
        if (a.min >= 0 && b.min >= 0) return {0, mask};
        if (a.max < 0 && b.max < 0) return {0, mask};
        const bool is_negative = (a.max < 0 && b.min >= 0) || (b.max < 0 && a.min >= 0);
        return {-mask - 1, is_negative ? WIDE(-1) : mask};
    }

    RANGE shifted(const NODE* t) {
        const TYPE* type = t->type;
        const RANGE limits = range_of_type(type);
        const TYPE* from = t->left->type;
        const bool same = has_value_range(from) && from->size == type->size && wraps_signed(from) == wraps_signed(type);
        if (!same || type->is_bool() || type->is_enum() || !has_value_range(t->right->type)) return limits;
        const RANGE n = both({0, static_cast<WIDE>(type->size) - 1}, of(t->right)); // other counts are undefined
        const RANGE a = of(t->left);
        if (t->op == SRL)
            return {a.min >> static_cast<int>(a.min < 0 ? n.min : n.max),
                    a.max >> static_cast<int>(a.max < 0 ? n.max : n.min)};
        auto up = [](WIDE v, WIDE by) { return v * (WIDE(1) << static_cast<int>(by)); }; // at most 2^64 * 2^63
        if (n.min == n.max) return wrapped(up(a.min, n.min), up(a.max, n.min), type);
        return product(a, {WIDE(1) << static_cast<int>(n.min), WIDE(1) << static_cast<int>(n.max)}, type);
    }

    static RANGE member(const NODE* t) {
        const RANGE limits = range_of_type(t->type);
        const fkMDATA* m = t->right && t->right->op == FIELD ? t->right->mval : nullptr;
        if (!m || !m->is_bitfld || m->width == 0 || m->width > 64) return limits;
        return converted(range_of_field(m), t->type);
    }
    static RANGE range_of_field(const fkMDATA* m) {
        const WIDE turn = WIDE(1) << m->width;
        if (m->type->is_bool() || m->type->is_unsigned()) return {0, turn - 1};
        if (m->type->is_signed()) return {-turn / 2, turn / 2 - 1};
        return {-turn / 2, turn - 1};
    }

    // A stored value as its place then holds it.
    RANGE stored(const NODE* t) {
        const NODE* place = without_wrappers(t->left);
        if (!has_value_range(place->type)) return range_of_type(t->type);
        const bool is_member = (place->op == STDOT || place->op == STREF) && place->right && place->right->op == FIELD;
        const fkMDATA* m = is_member ? place->right->mval : nullptr;
        RANGE held = range_of_type(place->type);
        if (m && m->is_bitfld && m->width >= 1 && m->width <= 64) held = range_of_field(m);
        if (t->op == ASG && has_value_range(t->right->type)) {
            const RANGE v = place->type->is_bool() ? operand(t->right, place->type) : of(t->right);
            if (v.is_within(held)) held = v;
        }
        return converted(held, t->type);
    }

    RANGE chosen(const NODE* t) {
        if (t->right->op != COLON) return range_of_type(t->type);
        const NODE* condition = without_wrappers(t->left);
        const bool tells = is_pure_within(condition, &pure_nodes_left);
        auto arm = [&](const NODE* a, bool holds) {
            const FACT fact{condition, holds, facts};
            const FACT* const outer = facts;
            // What the arm writes before it reads is another value.
            if (tells && is_pure_within(a, &pure_nodes_left)) facts = &fact;
            const RANGE r = operand(a, t->type);
            facts = outer;
            return r;
        };
        const RANGE a = arm(t->right->left, true);
        return hull(a, arm(t->right->right, false));
    }

    RANGE called(const NODE* t) {
        if (is_def_assert_ICALL_tree(t)) return operand(arg_list_lookup(t->left, 0), t->type);
        const RANGE limits = range_of_type(t->type);
        if (builtin_levels >= MOST_BUILTIN_LEVELS || t->type->is_enum()) return limits;
        ++builtin_levels;
        const RANGE r{to_wide(calculate_minval_for_BIF_call(t, loop)), to_wide(calculate_maxval_for_BIF_call(t, loop))};
        --builtin_levels;
        return r.min <= r.max ? both(limits, r) : limits;
    }

    // Of an operator whose operands and result have one width and sign.
    RANGE arithmetic(const NODE* t) {
        const TYPE* type = t->type;
        const RANGE limits = range_of_type(type);
        auto fits = [type](const NODE* n) {
            return !n || (has_value_range(n->type) && n->type->size == type->size && !n->type->is_enum() &&
                          wraps_signed(n->type) == wraps_signed(type) && n->type->is_bool() == type->is_bool());
        };
        if (!fits(t->left) || !fits(t->right) || type->is_bool() || type->is_enum()) return limits;
        const RANGE b = t->right ? of(t->right) : limits; // what is short stands on the right
        const RANGE a = of(t->left);
        switch (t->op) {
        case PLUS: return sum(a, b, type);
        case MINUS: return sum(a, negative(b), type);
        case MULT: return is_same_value(t->left, t->right) ? square(a, type) : product(a, b, type);
        case DIV: return quotient(a, b, type);
        case MOD: return remainder(a, b, type);
        case ANDB: return common_bits(a, b);
        case ORB: return united_bits(a, b);
        case XORB: return differing_bits(a, b);
        case UMINUS: return wrapped(-a.max, -a.min, type);
        case NOTB: return wrapped(-1 - a.max, -1 - a.min, type);
        case ABS: return absolute(a, type);
        case SQR: return square(a, type);
        }
        return limits;
    }

    RANGE structural(const NODE* t) {
        if (boolean_result[t->op]) return {0, 1};
        switch (t->op) {
        case PLUS:
        case MINUS:
        case MULT:
        case DIV:
        case MOD:
        case ANDB:
        case ORB:
        case XORB:
        case UMINUS:
        case NOTB:
        case ABS:
        case SQR: return arithmetic(t);
        case SLL:
        case SRL: return shifted(t);
        case QUEST: return chosen(t);
        case ASG: return stored(t);
        case COMMAOP: return operand(t->right, t->type);
        case SCONV: return operand(t->left, t->type);
        case STDOT:
        case STREF: return member(t);
        case NAME: return named(t);
        case ICALL:
        case UICALL:
        case MCALL: return called(t);
        }
        if (op_of_opASG[t->op] != ILLOP) return stored(t);
        return range_of_type(t->type);
    }

    RANGE named(const NODE* t) const {
        RANGE limits = range_of_type(t->type);
        int64_t low, high;
        if (loop && loop_callbacks.bounds_of_count && loop_callbacks.bounds_of_count(t->u.sym, loop, &low, &high))
            return both(limits, {low, high});
        INT65 min, max;
        if (values_of_variables && t->u.sym && values_of_variables->bounds_of_variable(t->u.sym, &min, &max) &&
            t->u.sym->type->size == t->type->size && wraps_signed(t->u.sym->type) == wraps_signed(t->type))
            limits = both(limits, {to_wide(min), to_wide(max)});
        const SYM_RANGE* known = currfuninfo && currfuninfo->widened ? find_widened_symbol_entry(t->u.sym) : nullptr;
        return known ? both(limits, {to_wide(known->min), to_wide(known->max)}) : limits;
    }

    struct LOOP* const loop;
    bool uses_givens;
    int given_levels = 0;
    const FACT* facts = nullptr;
    int nodes_left = MOST_NODES, pure_nodes_left = 2 * MOST_NODES;
};

RANGE range_of_bits(const KNOWN_BITS& k, const TYPE* t) {
    const uint64_t mask = type_mask(t).value, sign = uint64_t(1) << (t->size - 1);
    const WIDE least = static_cast<WIDE>(k.ones), most = static_cast<WIDE>(~k.zeros & mask), turn = WIDE(1) << t->size;
    if (t->is_enum()) return range_of_type(t);
    if (!wraps_signed(t) || k.zeros & sign) return {least, most};
    if (k.ones & sign) return {least - turn, most - turn};
    return {least + static_cast<WIDE>(sign) - turn, most - static_cast<WIDE>(sign)};
}

bool is_plain(const NODE* t) { return t->op == NAME || t->op == ICON || t->op == UMULT || op_is_call(t->op); }

} // namespace

const VARIABLE_VALUES* values_of_variables = nullptr;
VALUE_WALK value_walk;

RANGE range_of_tree(const NODE* tree, struct LOOP* loop) {
    const RANGE r = WALK(loop).of(tree);
    return is_plain(tree) || r.min == r.max ? r : both(r, range_of_bits(known_bits(tree), tree->type));
}

namespace {

// Without a look at more than the roots of what they compare: whether two conditions may be about one value.
bool may_meet(const NODE* p, const NODE* q) {
    auto is_alike = [](const NODE* a, const NODE* b) {
        a = WALK::without_widening(a);
        b = WALK::without_widening(b);
        return a->op == b->op && a->op != ICON && (a->op != NAME || a->u.sym == b->u.sym);
    };
    auto has_constant = [](const NODE* t) { return t->left->op == ICON || t->right->op == ICON; };
    const bool p_compares = op_is_int_compare(p->op), q_compares = op_is_int_compare(q->op);
    if (!values_of_variables && ((p_compares && !has_constant(p)) || (q_compares && !has_constant(q)))) return false;
    auto meets = [&](const NODE* a) { return is_alike(a, q_compares ? q->left : q) || (q_compares && is_alike(a, q->right)); };
    return meets(p_compares ? p->left : p) || (p_compares && meets(p->right));
}

} // namespace

int outcome_under(const NODE* p, bool holds, const NODE* q, struct LOOP* loop) {
    p = without_wrappers(p);
    q = without_wrappers(q);
    const bool is_number = op_is_int_compare(p->op) || has_value_range(p->type);
    if (!is_number || !may_meet(p, q) || !is_small_and_pure(p) || !is_small_and_pure(q)) return -1;
    return WALK(loop).outcome_under(p, holds, q);
}

bool operation_is_exact(const NODE* t, struct LOOP* loop) {
    return operation_is_exact(t->op, t->left, t->right, t->type, loop);
}

bool operation_is_exact(int op, const NODE* x, const NODE* y, const TYPE* type, struct LOOP* loop) {
    if (!has_value_range(x->type) || (y && !has_value_range(y->type))) return false;
    const RANGE limits = range_of_type(type);
    const RANGE a = range_of_tree(x, loop);
    auto fits = [&](WIDE low, WIDE high) { return limits.min <= low && high <= limits.max; };
    if (op == UMINUS) return fits(-a.max, -a.min);
    const RANGE b = range_of_tree(y, loop);
    switch (op) {
    case PLUS: return fits(a.min + b.min, a.max + b.max);
    case MINUS: return fits(a.min - b.max, a.max - b.min);
    case MULT:
    case SLL: {
        if (op == SLL && (b.min < 0 || b.max >= static_cast<WIDE>(type->size))) return false;
        const bool shifts = op == SLL;
        for (WIDE v : {a.min, a.max})
            for (WIDE w : {b.min, b.max}) {
                const WIDE p = times(v, shifts ? WIDE(1) << static_cast<int>(w) : w);
                if (!fits(p, p)) return false;
            }
        return true;
    }
    default: return false;
    }
}

// ---- Interfaces

bool calculate_bounds(const NODE* tree, struct LOOP* loop, INT65* min, INT65* max) {
    if (!has_value_range(tree->type)) return false;
    const RANGE r = range_of_tree(tree, loop);
    *min = to_int65(r.min);
    *max = to_int65(r.max);
    return true;
}

INT65 calculate_minval_for_tree(const NODE* tree, struct LOOP* loop) {
    return to_int65(has_value_range(tree->type) ? range_of_tree(tree, loop).min : range_of_type(tp->llong_t).min);
}
INT65 calculate_maxval_for_tree(const NODE* tree, struct LOOP* loop) {
    return to_int65(has_value_range(tree->type) ? range_of_tree(tree, loop).max : range_of_type(tp->ullong_t).max);
}
