// Logical operators: the conjunction and disjunction that evaluate their right operand only where it counts.
//
// What is said of OROR holds for ANDAND with the roles of 0 and 1 exchanged. Two compares of one value with constants
// are one compare where a mask or a range says it; two tests that are cheap and cannot trap are one operator on bits.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

using namespace rules;

namespace {

// Operands of a chain that are looked at for a partner.
constexpr int andor_andor_height = 4;

NODE* truth(NODE* t, bool value) { return mk_COMMAOP(peel_for_effect(t), mk_ICON(INT65(value ? 1 : 0), tp->int_t)); }

// ---- Strict operands: what may be computed though the program would not have done so
bool lvalue_is_inherently_strict(const NODE* t) {
    while (t->op == STDOT) t = t->left;
    return t->op == NAME && !lvalue_is_volatile(t);
}

// No effect, no trap, no access that might not be allowed, and little work.
bool is_strict_within(const NODE* t, int* budget) {
    if (--*budget < 0) return false;
    switch (t->op) {
    case ICON: return true;
    case NAME:
    case STDOT: return lvalue_is_inherently_strict(t);
    case ANDB:
    case ORB:
    case XORB:
    case NOTB:
    case SCONV: break;
    default:
        if (!op_is_int_compare(t->op)) return false;
    }
    if (!t->left->type->is_int() && !t->left->type->is_enum()) return false;
    return is_strict_within(t->left, budget) && (!t->right || is_strict_within(t->right, budget));
}

// Whether `b` may be computed along with `a`, which is computed in any case.
bool strict_expr_allows_strict_expr(const NODE* a, const NODE* b) {
    int budget = 3 * andor_andor_height;
    return is_strict_within(a, &budget) && is_strict_within(b, &budget);
}

// ---- One value against two constants
struct TEST {
    NODE* value; // null for no compare of an integer without effects with a constant
    int op;
    INT65 c;
};

TEST test_of(NODE* t) {
    const bool fits = op_is_int_compare(t->op) && is_icon(t->right) && same_integers(t->left->type, t->right->type) &&
                      is_pure(t->left);
    if (!fits) return {nullptr, 0, INT65(0)};
    return {t->left, t->op, t->right->u.lval};
}

// x == c1 || x == c2 of constants that differ in one bit: (x & ~bit) == (c1 & c2).
NODE* join_equalities(NODE* t, TEST a, TEST b, struct LOOP* loop) {
    const int wanted = t->op == OROR ? EQ : NEQ;
    if (a.op != wanted || b.op != wanted) return nullptr;
    TYPE* type = a.value->type->stqs();
    const uint64_t bit = (a.c ^ b.c).value & mask_of(type);
    if (power_of_2(INT65(0, bit)) < 0) return nullptr;
    NODE* x = copy_tree(a.value);
    erase_tree(t);
    NODE* masked = made(ANDB, x, mk_ICON(~INT65(0, bit), type), type, loop);
    return made(wanted, masked, mk_ICON(a.c & b.c, type), tp->int_t, loop);
}

// Which numbers of the type a compare accepts, as one interval; false for NEQ.
bool interval_of(TEST t, INT65* low, INT65* high) {
    TYPE* type = t.value->type;
    *low = int_type_min(type);
    *high = int_type_max(type);
    switch (t.op) {
    case EQ: *low = *high = t.c; return true;
    case LT:
    case ULT: *high = t.c - INT65(1); return true;
    case LE:
    case ULE: *high = t.c; return true;
    case GT:
    case UGT: *low = t.c + INT65(1); return true;
    case GE:
    case UGE: *low = t.c; return true;
    default: return false;
    }
}

NODE* within(NODE* x, INT65 low, INT65 high, bool inside, struct LOOP* loop) {
    TYPE* type = x->type->stqs();
    const INT65 min = int_type_min(type), max = int_type_max(type);
    if (low > high) return truth(x, !inside);
    if (low <= min && high >= max) return truth(x, inside);
    const bool is_unsigned = type->is_unsigned();
    auto relop = [&](int op, NODE* l, INT65 c) {
        const bool unsigned_order = op >= LE && op <= GT && l->type->is_unsigned();
        return made(unsigned_order ? op + (ULE - LE) : op, l, mk_ICON(c, l->type->stqs()), tp->int_t, loop);
    };
    if (low == high) return relop(inside ? EQ : NEQ, x, low);
    if (low <= min) return relop(inside ? LE : GT, x, high);
    if (high >= max) return relop(inside ? GE : LT, x, low);
    // Below `low` the difference wraps to the top.
    TYPE* wraps = is_unsigned ? type : tp->mk_unsigned(type);
    NODE* from_low = made(MINUS, coerced(wraps, x, loop), mk_ICON(low, wraps), wraps, loop);
    return relop(inside ? LT : GE, from_low, high - low + INT65(1));
}

// x >= low && x <= high, x < low || x > high, and all that is one interval or all but one.
NODE* join_intervals(NODE* t, TEST a, TEST b, struct LOOP* loop) {
    const bool conjunction = t->op == ANDAND;
    if (!conjunction) { // the opposite of the conjunction of the opposites
        a.op = boolean_inv[a.op];
        b.op = boolean_inv[b.op];
    }
    TYPE* type = a.value->type;
    const INT65 min = int_type_min(type), max = int_type_max(type);
    INT65 low_a, high_a, low_b, high_b;
    bool of_a = interval_of(a, &low_a, &high_a), of_b = interval_of(b, &low_b, &high_b);
    // x != c is an interval next to one that ends there.
    auto without = [](INT65 c, INT65* low, INT65* high) {
        if (c == *low)
            *low = *low + INT65(1);
        else if (c == *high)
            *high = *high - INT65(1);
        else
            return c < *low || c > *high;
        return true;
    };
    INT65 low, high;
    if (of_a && of_b) {
        low = low_a > low_b ? low_a : low_b;
        high = high_a < high_b ? high_a : high_b;
    } else if (of_a != of_b) {
        low = of_a ? low_a : low_b;
        high = of_a ? high_a : high_b;
        if (!without(of_a ? b.c : a.c, &low, &high)) return nullptr;
    } else {
        low = min, high = max;
        if (!without(a.c, &low, &high) || !without(b.c, &low, &high)) return nullptr;
    }
    NODE* x = copy_tree(a.value);
    erase_tree(t);
    return within(x, low, high, conjunction, loop);
}

NODE* join_tests_of_one_value(NODE* t, struct LOOP* loop) {
    const TEST a = test_of(t->left), b = test_of(t->right);
    if (!a.value || !b.value || !same_value(a.value, b.value) || !same_integers(a.value->type, b.value->type))
        return nullptr;
    if (a.value->type->size < tp->int_t->size) return nullptr;
    auto order_fits = [](TEST x) { return x.op == EQ || x.op == NEQ || (x.op >= ULE) == x.value->type->is_unsigned(); };
    if (!order_fits(a) || !order_fits(b)) return nullptr;
    if (NODE* r = join_equalities(t, a, b, loop)) return r;
    return join_intervals(t, a, b, loop);
}

// ---- Forms without a branch
// Whether an operator on bits may take both as they stand: two values of 0 or 1, and no trap.
bool find_or_make_safe_for_ANDB(const NODE* a, const NODE* b) {
    return returns_1_or_0(a) && returns_1_or_0(b) && strict_expr_allows_strict_expr(a, b);
}

// Two truth values at hand, or two tests of zero that are one: & and | of them.
NODE* simp_strict_operands(NODE* t, struct LOOP* loop) {
    if (!find_or_make_safe_for_ANDB(t->left, t->right)) return nullptr;
    auto is_leaf = [](const NODE* n) { return is_effective_leaf(n) || n->op == STDOT; };
    auto tests_zero = [](const NODE* n) { return op_is_int_compare(n->op) && is_icon(n->right, INT65(0)); };
    if (is_leaf(t->left) && is_leaf(t->right)) {
        TYPE* type = t->type;
        t->left = coerced(tp->int_t, t->left, loop);
        t->right = coerced(tp->int_t, t->right, loop);
        t->op = t->op == ANDAND ? ANDB : ORB;
        t->type = tp->int_t;
        return coerce_to_type(type, simp_node(t, loop));
    }
    if (!tests_zero(t->left) || !tests_zero(t->right) || !is_effective_leaf(t->left->left) ||
        !is_effective_leaf(t->right->left))
        return nullptr;
    const int op = t->op;
    t->op = op == ANDAND ? ANDB : ORB;
    if (NODE* r = join_compares(t, loop)) return r;
    t->op = op;
    return nullptr;
}

// (a || b) || c where c tests the same value as one of the others: joined there. That value is computed before c in any
// case, and what is passed over, which is then asked only if both say nothing, must have no effects.
NODE* join_within_chain(NODE* t, struct LOOP* loop) {
    if (!test_of(t->right).value) return nullptr;
    NODE* chain = t->left;
    for (int i = 0; i < andor_andor_height && chain->op == t->op; ++i, chain = chain->left) {
        NODE** links[] = {&chain->right, chain->left->op == t->op ? nullptr : &chain->left};
        for (NODE** link : links) {
            if (!link) continue;
            if (link == &chain->left && !is_pure(chain->right)) return nullptr;
            NODE* pair = maketree(t->op, *link, t->right, t->type, t->ls);
            NODE* joined = join_tests_of_one_value(pair, loop);
            if (!joined) {
                erase_node(pair);
                continue;
            }
            *link = joined;
            return simp_node(take_left(t), loop);
        }
        if (!is_pure(chain->right)) return nullptr;
    }
    return nullptr;
}

// a || (b || c) is (a || b) || c: chains lean left.
NODE* lean_left(NODE* t, struct LOOP* loop) {
    NODE* inner = t->right;
    if (inner->op != t->op) return nullptr;
    for (int i = 0; i < andor_andor_height && inner->left->op == t->op; ++i) inner = inner->left;
    if (inner->left->op == t->op) return nullptr;
    NODE* chain = t->right;
    t->right = inner->left;
    inner->left = simp_node(t, loop);
    return chain == inner ? simp_node(chain, loop) : chain;
}

NODE* simp_ANDOR_ANDOR(NODE* t, struct LOOP* loop) {
    if (NODE* r = join_within_chain(t, loop)) return r;
    if (NODE* r = simp_strict_operands(t, loop)) return r;
    return lean_left(t, loop);
}

// ---- Constants
// A constant left operand decides, or leaves it to the right one; of a constant right operand the same, with the
// effects of the left.
NODE* decide_by_constant(NODE* t, struct LOOP* loop) {
    auto decides = [t](const NODE* c) { return c->u.lval.is_zero() == (t->op == ANDAND); };
    if (is_icon(t->left)) {
        if (!decides(t->left)) {
            erase_node(t->left);
            return make_boolean(take_right(t), loop);
        }
        NODE* result = mk_ICON(INT65(t->op == OROR ? 1 : 0), tp->int_t);
        result->ls = t->ls;
        erase_tree(t);
        return result;
    }
    if (!is_icon(t->right)) return nullptr;
    const bool decided = decides(t->right);
    const bool value = t->op == OROR;
    erase_node(t->right);
    NODE* left = take_left(t);
    return decided ? truth(left, value) : make_boolean(left, loop);
}

// The right operand says the same as the left one, or its opposite.
NODE* meet_itself(NODE* t, struct LOOP* loop) {
    if (!is_pure(t->left)) return nullptr;
    if (bools_are_congruent(t->left, t->right, false, false)) {
        erase_tree(t->right);
        return make_boolean(take_left(t), loop);
    }
    if (!bools_are_congruent(t->left, t->right, true, false)) return nullptr;
    const bool value = t->op == OROR;
    erase_tree(t->right);
    return truth(take_left(t), value);
}

// x == 0 || y == 0 is (x && y) == 0.
NODE* opposites_outward(NODE* t, struct LOOP* loop) {
    auto is_opposite = [](const NODE* n) {
        return n->op == EQ && is_icon(n->right, INT65(0)) && n->left->type->is_scalar() && !n->left->type->is_float();
    };
    NODE *a = t->left, *b = t->right;
    if (!is_opposite(a) || !is_opposite(b)) return nullptr;
    erase_node(a->right);
    erase_node(b->right);
    t->left = take_left(a);
    t->right = take_left(b);
    t->op = t->op == OROR ? ANDAND : OROR;
    TYPE* type = t->type;
    NODE* r = simp_node(t, loop);
    if (!r->type->is_int()) r = make_boolean(r, loop);
    return coerce_to_type(type, made(EQ, r, mk_ICON(INT65(0), r->type->stqs()), tp->int_t, loop));
}

const RULE logical_rules[] = {decide_by_constant, meet_itself, join_tests_of_one_value, simp_ANDOR_ANDOR,
                              opposites_outward};

} // namespace

NODE* simp_OROR(NODE* t, struct LOOP* loop) {
    if (!t->left->type->is_scalar() || !t->right->type->is_scalar() || t->left->type->is_complex() ||
        t->right->type->is_complex())
        return t;
    t->left = simp_for_control(t->left, loop);
    t->right = simp_for_control(t->right, loop);
    return first_that_applies(logical_rules, t, loop);
}
