// Logical operators: the conjunction and disjunction that evaluate their right operand only where it counts.
//
// What is said of OROR holds for ANDAND with the roles of 0 and 1 exchanged. Two compares of one value with constants
// are one compare where a mask or a range says it; two tests that are cheap and cannot trap are one operator on bits.

#include "OPT5/ir/walks.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/compare.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <utility>

using namespace rules;

namespace {

// Operands of a chain that are looked at for a partner.
constexpr int andor_andor_height = 4;

NODE* truth(NODE* t, bool value) { return mk_COMMAOP(peel_for_effect(t), mk_ICON(INT65(value ? 1 : 0), tp->int_t)); }

// ---- Strict operands: what may be computed though the program would not have done so
bool lvalue_is_inherently_strict(const NODE* t) {
    t = without_members(t);
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
// What a test accepts of the value that it looks at: an interval, or all but one.
struct TEST {
    NODE* value; // null for no test of an integer without effects against constants
    INT65 low, high;
    bool inside;
};
constexpr INT65 NONE = 0;

// A number itself, as the control form has the test of what isn't zero.
bool is_value_tested(const NODE* t) {
    return (is_effective_leaf(t) || t->op == UMULT || t->op == STDOT) && is_integer(t->type) && !is_icon(t) &&
           t->type->size >= tp->int_t->size && !is_bitfield_access(t) && is_pure(t);
}

// Which numbers of the type a test accepts.
TEST test_of(NODE* t) {
    const TEST no_test{nullptr, NONE, NONE, false};
    if (is_value_tested(t)) return {t, NONE, NONE, false};
    const bool fits = op_is_int_compare(t->op) && is_icon(t->right) && same_integers(t->left->type, t->right->type) &&
                      t->left->type->size >= tp->int_t->size && is_pure(t->left);
    if (!fits) return no_test;
    TYPE* type = t->left->type;
    const INT65 c = t->right->u.lval;
    TEST test{t->left, int_type_min(type), int_type_max(type), t->op != NEQ};
    if (t->op == EQ || t->op == NEQ) {
        test.low = test.high = c;
        return test;
    }
    if ((t->op >= ULE) != type->is_unsigned()) return no_test;
    switch (t->op) {
    case LT:
    case ULT: test.high = c - INT65(1); break;
    case LE:
    case ULE: test.high = c; break;
    case GT:
    case UGT: test.low = c + INT65(1); break;
    default: test.low = c; break;
    }
    return test;
}

// The same of the value below a difference, a cast or a mask that makes the test one of an interval: (unsigned)x - low
// < n, (x & ~m) == c with ones at the low end of m alone.
TEST test_of_inner_value(NODE* t) {
    TEST test = test_of(t);
    if (!test.value || test.low > test.high) return test;
    NODE* inner = test.value;
    test.value = nullptr;
    TYPE* type = inner->type;
    if (is_node_with_icon(inner, ANDB) && test.low == test.high) {
        const uint64_t m = ~inner->right->u.lval.value & mask_of(type);
        if ((m & (m + 1)) != 0 || (test.low.value & m) != 0 || m >= mask_of(type) >> 1) return test;
        test.high = test.low + INT65(0, m);
        test.value = inner->left;
    } else if ((is_node_with_icon(inner, MINUS) || is_node_with_icon(inner, PLUS) || is_equal_width_cast(inner)) &&
               !is_signed(type)) {
        NODE* x = inner->op == SCONV ? inner : inner->left;
        if (is_equal_width_cast(x)) x = x->left;
        const INT65 c = inner->op == SCONV ? INT65(0) : inner->right->u.lval, shift = inner->op == PLUS ? -c : c;
        const INT65 low = truncate_to_type(test.low + shift, x->type), high = low + (test.high - test.low);
        if (high > int_type_max(x->type)) return test;
        test = {x, low, high, test.inside};
    }
    return test;
}

// x == c1 || x == c2 of constants that differ in one bit: (x & ~bit) == (c1 & c2).
NODE* join_equalities(NODE* t, TEST a, TEST b, struct LOOP* loop) {
    const int wanted = t->op == OROR ? EQ : NEQ;
    if (t->left->op != wanted || t->right->op != wanted) return nullptr;
    TYPE* type = a.value->type->stqs();
    const uint64_t bit = (a.low ^ b.low).value & mask_of(type);
    if (power_of_2(INT65(0, bit)) < 0) return nullptr;
    NODE* x = copy_tree(a.value);
    erase_tree(t);
    NODE* masked = made(ANDB, x, mk_ICON(~INT65(0, bit), type), type, loop);
    return made(wanted, masked, mk_ICON(a.low & b.low, type), tp->int_t, loop);
}

// What both tests accept where that is an interval or all but one; false where it is neither.
bool intersect(TEST* a, TEST b, INT65 min, INT65 max) {
    if (!a->inside && !b.inside) { // what neither excludes
        if (a->low > a->high || b.low > b.high) return false;
        const bool meet = std::max(a->low, b.low) <= std::min(a->high, b.high) + INT65(1);
        if (meet) {
            a->low = std::min(a->low, b.low);
            a->high = std::max(a->high, b.high);
            return true;
        }
        TEST &below = a->low < b.low ? *a : b, &above = a->low < b.low ? b : *a;
        if (below.low > min || above.high < max) return false;
        *a = {a->value, below.high + INT65(1), above.low - INT65(1), true};
        return true;
    }
    if (!a->inside) std::swap(*a, b);
    if (b.inside) {
        a->low = std::max(a->low, b.low);
        a->high = std::min(a->high, b.high);
        return true;
    }
    if (b.low > b.high || b.high < a->low || b.low > a->high) return true;
    if (b.low <= a->low)
        a->low = b.high + INT65(1);
    else if (b.high >= a->high)
        a->high = b.low - INT65(1);
    else
        return false;
    return true;
}

// x >= low && x <= high, x < low || x > high, x == c || x == c + 1, and all that is one interval or all but one.
NODE* join_intervals(NODE* t, TEST a, TEST b, struct LOOP* loop) {
    const bool conjunction = t->op == ANDAND;
    if (!conjunction) { // the opposite of the conjunction of the opposites
        a.inside = !a.inside;
        b.inside = !b.inside;
    }
    NODE* value = a.value;
    if (!intersect(&a, b, int_type_min(value->type), int_type_max(value->type))) return nullptr;
    NODE* x = copy_tree(value);
    erase_tree(t);
    return compare_with_interval(x, a.low, a.high, a.inside == conjunction, loop);
}

bool test_one_value(TEST a, TEST b) {
    return a.value && b.value && same_value(a.value, b.value) && same_integers(a.value->type, b.value->type) &&
           is_pure(a.value);
}

// ---- Two compares of the same pair of values
constexpr int LESS = 1, EQUAL = 2, GREATER = 4;

int outcomes_of(int op) {
    switch (op >= ULE ? op - (ULE - LE) : op) {
    case EQ: return EQUAL;
    case NEQ: return LESS | GREATER;
    case LE: return LESS | EQUAL;
    case LT: return LESS;
    case GE: return EQUAL | GREATER;
    default: return GREATER;
    }
}

// x < y || x == y is x <= y; x <= y && y <= x is x == y.
NODE* join_tests_of_one_pair(NODE* t, struct LOOP*) {
    NODE *a = t->left, *b = t->right;
    if (!op_is_int_compare(a->op) || !op_is_int_compare(b->op) || is_icon(a->right) || !is_pure(a)) return nullptr;
    const bool crossed = !same_value(a->left, b->left);
    if (!same_value(a->left, crossed ? b->right : b->left) || !same_value(a->right, crossed ? b->left : b->right))
        return nullptr;
    const int op_b = crossed ? commute_inv[b->op] : b->op;
    auto is_equality = [](int op) { return op == EQ || op == NEQ; };
    const int order = !is_equality(a->op) ? a->op : op_b; // where neither is an order, any
    if (!is_equality(a->op) && !is_equality(op_b) && (a->op >= ULE) != (op_b >= ULE)) return nullptr;
    const int x = outcomes_of(a->op), y = outcomes_of(op_b), both = t->op == ANDAND ? x & y : x | y;
    if (both == 0 || both == (LESS | EQUAL | GREATER)) return replace_by(t, mk_ICON(INT65(both ? 1 : 0), tp->int_t));
    for (int op : {EQ, NEQ, LE, LT, GE, GT}) {
        if (outcomes_of(op) != both) continue;
        a->op = op >= LE && order >= ULE ? op + (ULE - LE) : op;
        TYPE* type = t->type;
        erase_tree(b);
        return coerce_to_type(type, simp_node(take_left(t), nullptr));
    }
    return nullptr;
}

// ---- Tests of bits of one value: (x & mask) == bits
struct BITS_TEST {
    NODE* value; // null for no such test
    uint64_t mask, bits;
};

// As the condition itself, or as its opposite.
BITS_TEST bits_test_of(NODE* t, bool opposite) {
    const bool compares = (t->op == EQ || t->op == NEQ) && is_icon(t->right) && is_node_with_icon(t->left, ANDB) &&
                          same_integers(t->left->type, t->right->type);
    if (!compares && !is_node_with_icon(t, ANDB)) return {nullptr, 0, 0};
    NODE* masked = compares ? t->left : t;
    const uint64_t mask = bits_of(masked->right), bits = compares ? bits_of(t->right) : 0;
    const bool equals = (compares && t->op == EQ) != opposite;
    if (!is_pure(masked->left) || (bits & ~mask) != 0) return {nullptr, 0, 0};
    if (equals) return {masked->left, mask, bits};
    if ((mask & (mask - 1)) != 0) return {nullptr, 0, 0}; // only of a single bit the opposite is a value
    return {masked->left, mask, bits ^ mask};
}

// x & 4 && !(x & 8) is (x & 12) == 4.
NODE* join_tests_of_bits(NODE* t, struct LOOP* loop) {
    const bool opposite = t->op == OROR;
    const BITS_TEST a = bits_test_of(t->left, opposite), b = bits_test_of(t->right, opposite);
    if (!a.value || !b.value || !same_value(a.value, b.value) || !same_integers(a.value->type, b.value->type))
        return nullptr;
    if ((a.bits ^ b.bits) & a.mask & b.mask) return replace_by(t, mk_ICON(INT65(opposite ? 1 : 0), tp->int_t));
    TYPE *type = a.value->type->stqs(), *result = t->type;
    auto constant = [&](uint64_t bits) {
        NODE* c = mk_ICON(INT65(0), type);
        set_icon(c, INT65(0, bits));
        return c;
    };
    NODE *mask = constant(a.mask | b.mask), *bits = constant(a.bits | b.bits), *x = copy_tree(a.value);
    erase_tree(t);
    NODE* masked = made(ANDB, x, mask, type, loop);
    return coerce_to_type(result, made(opposite ? NEQ : EQ, masked, bits, tp->int_t, loop));
}

} // namespace

NODE* join_tests_of_one_value(NODE* t, struct LOOP* loop) {
    const TEST a = test_of(t->left), b = test_of(t->right);
    if (test_one_value(a, b)) {
        if (NODE* r = join_equalities(t, a, b, loop)) return r;
        if (NODE* r = join_intervals(t, a, b, loop)) return r;
    }
    if (NODE* r = join_tests_of_one_pair(t, loop)) return r;
    if (NODE* r = join_tests_of_bits(t, loop)) return r;
    if (!a.value || !b.value) return nullptr;
    const TEST inner_a = test_of_inner_value(t->left), inner_b = test_of_inner_value(t->right);
    for (const auto& [x, y] : {std::pair(inner_a, b), std::pair(a, inner_b), std::pair(inner_a, inner_b)})
        if (test_one_value(x, y))
            if (NODE* r = join_intervals(t, x, y, loop)) return r;
    return nullptr;
}

namespace {

// ---- Forms without a branch
// Whether an operator on bits may take both as they stand: two values of 0 or 1, and no trap.
bool find_or_make_safe_for_ANDB(const NODE* a, const NODE* b) {
    return returns_1_or_0(a) && returns_1_or_0(b) && strict_expr_allows_strict_expr(a, b);
}

// Two truth values at hand, or two tests of no or all bits that are one: & and | of them.
NODE* simp_strict_operands(NODE* t, struct LOOP* loop) {
    if (!find_or_make_safe_for_ANDB(t->left, t->right)) return nullptr;
    auto is_leaf = [](const NODE* n) { return is_effective_leaf(n) || n->op == STDOT; };
    auto tests_end = [](const NODE* n) {
        return op_is_int_compare(n->op) && (is_icon(n->right, INT65(0)) || is_all_ones(n->right));
    };
    if (is_leaf(t->left) && is_leaf(t->right)) {
        TYPE* type = t->type;
        t->left = coerced(tp->int_t, t->left, loop);
        t->right = coerced(tp->int_t, t->right, loop);
        t->op = t->op == ANDAND ? ANDB : ORB;
        t->type = tp->int_t;
        return coerce_to_type(type, simp_node(t, loop));
    }
    if (!tests_end(t->left) || !tests_end(t->right) || !is_effective_leaf(t->left->left) ||
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
    if (!test_of(t->right).value && !bits_test_of(t->right, false).value) return nullptr;
    NODE** nodes[andor_andor_height]; // of the chain, from the top
    NODE** at = &t->left;
    for (int i = 0; i < andor_andor_height && (*at)->op == t->op; ++i, at = &(*at)->left) {
        NODE* chain = *at;
        nodes[i] = at;
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
            for (int k = i; k >= 0; --k) *nodes[k] = simp_for_control(simp_node(*nodes[k], loop), loop);
            return make_boolean(take_left(t), loop);
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
    inner->left = simp_for_control(simp_node(t, loop), loop);
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
