// Conditional values and casts.
//
// Canonical forms: the condition of a QUEST is in control form, and not negated; arms that are truth values make it a
// logical operator, arms of the same cast or sign have it outside; the test of a minimum or maximum is LT or GT of the
// arms in their order. A cast that the operand's bits or the use of the result make idle is removed.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/minmax.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

using namespace rules;

namespace {

NODE*& then_arm(NODE* quest) { return quest->right->left; }
NODE*& else_arm(NODE* quest) { return quest->right->right; }

NODE* in_type(TYPE* type, NODE* value) { return type->is_scalar() ? coerce_to_type(type, value) : value; }

NODE* select_arm(NODE* t, bool then, struct LOOP* loop) {
    NODE *kept = then ? then_arm(t) : else_arm(t), *dropped = then ? else_arm(t) : then_arm(t);
    TYPE* type = t->type;
    erase_tree(dropped);
    erase_node(t->right);
    erase_tree(t->left);
    erase_node(t);
    return type->is_scalar() ? coerced(type, kept, loop) : kept;
}

NODE* constant_condition(NODE* t, struct LOOP* loop) {
    if (!is_icon(t->left)) return nullptr;
    return select_arm(t, !t->left->u.lval.is_zero(), loop);
}

// (x == 0) ? a : b is x ? b : a.
NODE* condition_without_opposite(NODE* t, struct LOOP* loop) {
    NODE* c = t->left;
    const bool is_opposite = c->op == EQ && is_icon(c->right, INT65(0)) && c->left->type->is_scalar() &&
                             !c->left->type->is_float() && !c->left->type->is_complex();
    if (!is_opposite) return nullptr;
    erase_node(c->right);
    t->left = simp_for_control(take_left(c), loop);
    std::swap(then_arm(t), else_arm(t));
    return simp_node(t, loop);
}

NODE* equal_arms(NODE* t, struct LOOP*) {
    if (then_arm(t)->op != else_arm(t)->op || !is_pure(then_arm(t)) || !same_value(then_arm(t), else_arm(t)))
        return nullptr;
    NODE *effects = peel_for_effect(t->left), *value = then_arm(t);
    TYPE* type = t->type;
    erase_tree(else_arm(t));
    erase_node(t->right);
    erase_node(t);
    return in_sequence(effects, in_type(type, value));
}

// x == c ? c : x, x != y ? x : y: the arm that is x in either case.
NODE* arm_by_equality(NODE* t, struct LOOP* loop) {
    NODE* c = t->left;
    if ((c->op != EQ && c->op != NEQ) || !c->left->type->is_int() || !is_pure(c)) return nullptr;
    NODE *same = c->op == EQ ? then_arm(t) : else_arm(t), *other = c->op == EQ ? else_arm(t) : then_arm(t);
    const bool holds = (same_value(c->left, other) && same_value(c->right, same)) ||
                       (same_value(c->right, other) && same_value(c->left, same));
    return holds ? select_arm(t, other == then_arm(t), loop) : nullptr;
}

// x ? x : 0 and the like, in control form: x ? 0 : x is 0.
NODE* arm_by_truth(NODE* t, struct LOOP* loop) {
    NODE* c = t->left;
    if (!is_integer(c->type) || !is_pure(c)) return nullptr;
    if (same_value(c, then_arm(t)) && is_icon(else_arm(t), INT65(0)) && same_integers(c->type, t->type))
        return select_arm(t, true, loop);
    if (same_value(c, else_arm(t)) && is_icon(then_arm(t), INT65(0)) && same_integers(c->type, t->type))
        return select_arm(t, true, loop);
    return nullptr;
}

// c ? (c ? a : b) : d
NODE* condition_asked_again(NODE* t, struct LOOP* loop) {
    if (!is_pure(t->left)) return nullptr;
    for (bool then : {true, false}) {
        NODE*& arm = then ? then_arm(t) : else_arm(t);
        if (arm->op != QUEST || arm->right->op != COLON) continue;
        const bool same = bools_are_congruent(t->left, arm->left, false, false);
        if (!same && !bools_are_congruent(t->left, arm->left, true, false)) continue;
        arm = select_arm(arm, then == same, loop);
        return simp_node(t, loop);
    }
    return nullptr;
}

// ---- Arms that are numbers
// c ? 1 : 0, and what a shift, a sum or a sign makes of that.
NODE* constant_arms(NODE* t, struct LOOP* loop) {
    NODE *a = then_arm(t), *b = else_arm(t);
    if (!is_icon(a) || !is_icon(b) || !is_integer(t->type)) return nullptr;
    const INT65 x = a->u.lval, y = b->u.lval;
    const bool straight = x == INT65(1) && y.is_zero(), inverse = x.is_zero() && y == INT65(1);
    TYPE* type = t->type;
    if (straight || inverse) {
        erase_tree(t->right);
        NODE* condition = make_boolean(take_left(t), loop);
        if (inverse) condition = simp_node(invert_boolean_tree(condition), loop);
        return coerced(type, condition, loop);
    }
    if (!returns_1_or_0(t->left) || !same_integers(a->type, type) || !same_integers(b->type, type)) return nullptr;
    const bool scales = y.is_zero() && (is_all_ones(a) || power_of_2(x) > 0), adds = y + INT65(1) == x;
    if (!scales && !adds) return nullptr;
    erase_tree(t->right);
    NODE* condition = coerced(type, take_left(t), loop);
    return scales ? made(MULT, condition, mk_ICON(x, type), type, loop)
                  : made(PLUS, condition, mk_ICON(y, type), type, loop);
}

// c ? 1 : b is c || b; c ? b : 0 is c && b; and with the condition negated.
NODE* logical_arms(NODE* t, struct LOOP* loop) {
    NODE *a = then_arm(t), *b = else_arm(t);
    if (!is_integer(t->type) || is_icon(a) == is_icon(b)) return nullptr;
    NODE *constant = is_icon(a) ? a : b, *value = is_icon(a) ? b : a;
    if ((!is_icon(constant, INT65(0)) && !is_icon(constant, INT65(1))) || !value->type->is_int() ||
        !returns_1_or_0(value))
        return nullptr;
    const bool one = is_icon(constant, INT65(1));
    TYPE* type = t->type;
    NODE* condition = t->left;
    // The right operand is asked where the constant is not the answer.
    if (one != (constant == a)) condition = simp_node(invert_boolean_tree(condition), loop);
    erase_node(constant);
    erase_node(t->right);
    erase_node(t);
    return coerced(type, made(one ? OROR : ANDAND, condition, value, tp->int_t, loop), loop);
}

// ---- Arms that a bit of the condition selects
// x & p with the single bit p, as the control form has the test of it.
bool tests_single_bit(const NODE* c) {
    return is_node_with_icon(c, ANDB) && power_of_2(INT65(0, bits_of(c->right))) >= 0 && is_pure(c->left);
}

// x & p ? q : 0 of two single bits is x & p moved to the place of q.
NODE* moved_bit(NODE* t, struct LOOP* loop) {
    NODE *c = t->left, *a = then_arm(t), *b = else_arm(t);
    if (!tests_single_bit(c) || !is_icon(a) || !is_icon(b, INT65(0)) || !same_integers(c->type, t->type))
        return nullptr;
    const int from = power_of_2(INT65(0, bits_of(c->right))), to = power_of_2(INT65(0, bits_of(a)));
    if (to == 0 && from != 0) return nullptr; // a truth value is a compare
    if (to < 0 || (from > to && is_signed(t->type) && bits_of(c->right) == sign_bit(t->type))) return nullptr;
    TYPE* type = t->type->stqs();
    erase_tree(t->right);
    NODE* bit = coerced(type, take_left(t), loop);
    if (from == to) return bit;
    return made(from < to ? SLL : SRL, bit, mk_ICON(INT65(from < to ? to - from : from - to), tp->int_t), type, loop);
}

enum BIT_CHANGE { NONE, CLEARED, KEPT, SET };

// What an arm does to the bit p of x, which is known there.
BIT_CHANGE bit_change(const NODE* arm, const NODE* x, uint64_t p, bool is_set) {
    if (same_value(arm, x)) return KEPT;
    if (!arm->right || !is_node_with_icon(arm, arm->op) || !same_value(arm->left, x)) return NONE;
    const uint64_t c = bits_of(arm->right), mask = mask_of(arm->type), minus_p = -p & mask;
    switch (arm->op) {
    case ANDB: return c == (~p & mask) ? CLEARED : NONE;
    case ORB: return c == p ? SET : NONE;
    case XORB: return c != p ? NONE : is_set ? CLEARED : SET;
    case PLUS: return is_set && c == minus_p ? CLEARED : !is_set && c == p ? SET : NONE;
    case MINUS: return is_set && c == p ? CLEARED : !is_set && c == minus_p ? SET : NONE;
    default: return NONE;
    }
}

// x & p ? x - p : x is x & ~p; x & p ? x : x + p is x | p; x & p ? x - p : x + p is x ^ p.
NODE* changed_bit(NODE* t, struct LOOP* loop) {
    NODE* c = t->left;
    if (!tests_single_bit(c) || !same_integers(c->type, t->type)) return nullptr;
    const uint64_t p = bits_of(c->right);
    const BIT_CHANGE of_set = bit_change(then_arm(t), c->left, p, true),
                     of_clear = bit_change(else_arm(t), c->left, p, false);
    if (of_set == NONE || of_clear == NONE) return nullptr;
    const bool stays_set = of_set != CLEARED, becomes_set = of_clear == SET;
    NODE* x = copy_tree(c->left);
    TYPE* type = t->type->stqs();
    erase_tree(t);
    if (stays_set && !becomes_set) return x;
    const int op = stays_set ? ORB : becomes_set ? XORB : ANDB;
    NODE* mask = mk_ICON(INT65(0), type);
    set_icon(mask, INT65(0, op == ANDB ? ~p : p));
    return made(op, x, mask, type, loop);
}

// x < 0 ? -1 : 0 is x >> (width - 1), x < 0 ? -1 : 1 is that | 1.
NODE* arms_by_sign(NODE* t, struct LOOP* loop) {
    NODE *c = t->left, *a = then_arm(t), *b = else_arm(t);
    if ((c->op != LT && c->op != GE) || !is_icon(c->right, INT65(0)) || !is_integer(c->left->type) ||
        !is_signed(c->left->type) || !same_integers(c->left->type, c->right->type) || !is_icon(a) || !is_icon(b) ||
        !is_integer(t->type) || t->type->size < tp->int_t->size)
        return nullptr;
    if (c->op == GE) std::swap(a, b);
    if (!is_all_ones(a) || (!is_icon(b, INT65(0)) && !is_icon(b, INT65(1)))) return nullptr;
    if (!same_integers(a->type, t->type) || !same_integers(b->type, t->type)) return nullptr;
    const bool sets_lowest = is_icon(b, INT65(1));
    TYPE *type = t->type->stqs(), *from = c->left->type->stqs();
    erase_tree(t->right);
    erase_node(c->right);
    NODE* x = take_left(take_left(t));
    NODE* sign = made(SRL, x, mk_ICON(INT65(static_cast<long>(from->size) - 1), tp->int_t), from, loop);
    sign = coerced(type, sign, loop);
    return sets_lowest ? made(ORB, sign, mk_ICON(INT65(1), type), type, loop) : sign;
}

// x ? x * y : 0 is x * y, which is zero for that x, where y may be computed in any case.
NODE* product_without_guard(NODE* t, struct LOOP* loop) {
    NODE *c = t->left, *value = then_arm(t);
    if (!is_icon(else_arm(t), INT65(0)) || (!is_node(value, MULT) && !is_node(value, ANDB)) || !is_pure(value))
        return nullptr;
    if (!same_integers(c->type, value->type) || !same_integers(value->type, t->type)) return nullptr;
    const bool on_left = same_value(value->left, c);
    if (!on_left && !same_value(value->right, c)) return nullptr;
    const NODE* other = on_left ? value->right : value->left;
    while (other->op == SCONV) other = other->left;
    return other->op == NAME || other->op == ICON ? select_arm(t, true, loop) : nullptr;
}

// ---- Arms of the same shape
NODE* common_cast_outward(NODE* t, struct LOOP* loop) {
    NODE *a = then_arm(t), *b = else_arm(t);
    if (a->op != b->op || (a->op != SCONV && a->op != UMINUS && a->op != NOTB)) return nullptr;
    if (!is_integer(a->type) || !same_integers(a->type, b->type) || !same_integers(a->type, t->type)) return nullptr;
    if (!same_integers(a->left->type, b->left->type) || a->left->type->size < tp->int_t->size) return nullptr;
    if (is_bitfield_access(a->left) || is_bitfield_access(b->left)) return nullptr;
    TYPE* inner = a->left->type->stqs();
    then_arm(t) = take_left(a);
    else_arm(t) = b->left;
    t->type = t->right->type = inner;
    b->left = simp_node(t, loop);
    return simp_node(b, loop);
}

// What is computed of the operand that both arms have, in either order where the operator has none.
bool shares_operand(const NODE* a, const NODE* b, bool a_right, bool b_right) {
    const NODE *x = a_right ? a->right : a->left, *y = a_right ? a->left : a->right;
    const NODE *z = b_right ? b->right : b->left, *w = b_right ? b->left : b->right;
    const bool commutes = a->op != MINUS && a->op != SLL && a->op != SRL;
    return (commutes || a_right == b_right) && same_value(x, z) && same_integers(x->type, z->type) &&
           same_integers(y->type, w->type);
}

// c ? x + y : x + z is x + (c ? y : z): either gives the number that the arm gave.
NODE* common_operand_outward(NODE* t, struct LOOP* loop) {
    NODE *a = then_arm(t), *b = else_arm(t);
    if (a->op != b->op || !is_integer(t->type) || !same_integers(a->type, t->type) || !same_integers(b->type, t->type))
        return nullptr;
    switch (a->op) {
    case PLUS:
    case MINUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB:
        if (!operands_have_type(a) || !operands_have_type(b)) return nullptr;
        break;
    case SLL:
    case SRL:
        if (!operand_has_type(a) || !operand_has_type(b)) return nullptr;
        break;
    default: return nullptr;
    }
    for (int side = 0; side < 4; ++side) {
        const bool a_right = (side & 1) != 0, b_right = (side & 2) != 0;
        if (!shares_operand(a, b, a_right, b_right)) continue;
        if (!is_pure(t->left) || !is_pure(a) || !is_pure(b)) return nullptr;
        NODE *&y = a_right ? a->left : a->right, *w = b_right ? b->left : b->right;
        NODE* common = b_right ? b->right : b->left;
        erase_node(b);
        erase_tree(common);
        then_arm(t) = y;
        else_arm(t) = w;
        t->type = t->right->type = w->type->stqs();
        y = simp_node(t, loop);
        return simp_node(a, loop);
    }
    return nullptr;
}

// x < 0 ? -x : x, and its other forms
NODE* absolute_value(NODE* t, struct LOOP* loop) {
    NODE* c = t->left;
    if (!op_is_int_compare(c->op) || !is_icon(c->right) || !is_signed(c->left->type) || !is_pure(c)) return nullptr;
    const INT65 bound = c->right->u.lval;
    const bool negative = (c->op == LT && (bound.is_zero() || bound == INT65(1))) ||
                          (c->op == LE && (bound.is_zero() || bound == INT65(-1)));
    const bool positive = (c->op == GE && (bound.is_zero() || bound == INT65(1))) ||
                          (c->op == GT && (bound.is_zero() || bound == INT65(-1)));
    if (!negative && !positive) return nullptr;
    NODE *if_negative = negative ? then_arm(t) : else_arm(t), *otherwise = negative ? else_arm(t) : then_arm(t);
    const bool negates = is_unary(if_negative, UMINUS); // else the result is the absolute value's negative
    NODE *negation = negates ? if_negative : otherwise, *same = negates ? otherwise : if_negative;
    if (!is_unary(negation, UMINUS) || !same_value(negation->left, same) || !same_value(c->left, same) ||
        !same_integers(same->type, t->type))
        return nullptr;
    NODE* x = copy_tree(same);
    TYPE* type = t->type;
    erase_tree(t);
    x = made(ABS, x, nullptr, type, loop);
    return negates ? x : made_exact(UMINUS, x, nullptr, type, loop);
}

// The test of a minimum or maximum: a < b ? a : b, a > b ? a : b, whatever it was.
NODE* ordered_arms(NODE* t, struct LOOP* loop) {
    NODE* c = t->left;
    if (!op_is_int_compare(c->op) || c->op == EQ || c->op == NEQ || !is_pure(c)) return nullptr;
    const bool straight = same_value(c->left, then_arm(t)) && same_value(c->right, else_arm(t));
    const bool crossed = !straight && same_value(c->left, else_arm(t)) && same_value(c->right, then_arm(t));
    if (!straight && !crossed) return nullptr;
    const int op = c->op;
    const bool keeps_equals = op == LE || op == GE || op == ULE || op == UGE;
    if (straight && !keeps_equals) return nullptr;
    if (crossed) { // the arms in the order of the test
        std::swap(then_arm(t), else_arm(t));
        c->op = boolean_inv[op];
    }
    if (c->op == LE || c->op == ULE)
        c->op += 1;
    else if (c->op == GE || c->op == UGE)
        c->op += 1;
    return crossed || keeps_equals ? simp_node(t, loop) : nullptr;
}

const RULE select_rules[] = {constant_condition,
                             equal_arms,
                             arms_by_sign,
                             moved_bit,
                             changed_bit,
                             product_without_guard,
                             condition_without_opposite,
                             arm_by_equality,
                             arm_by_truth,
                             constant_arms,
                             logical_arms,
                             condition_asked_again,
                             absolute_value,
                             by_pattern,
                             minmax_of_QUEST,
                             ordered_arms,
                             common_cast_outward,
                             common_operand_outward};

// The arm under the operator of `t`, whose other operand, if there is one, is a constant; null where that is no
// constant.
NODE* folded_arm(const NODE* t, bool arms_on_left, const NODE* arm) {
    const NODE* c = arms_on_left ? t->right : t->left;
    NODE *x = copy_tree(arm), *y = c ? copy_tree(c) : nullptr;
    NODE* r = fold_constants(maketree(t->op, arms_on_left ? x : y, arms_on_left ? y : x, t->type, t->ls));
    if (r->op == ICON) return r;
    erase_tree(r);
    return nullptr;
}

} // namespace

NODE* apply_to_constant_arms(NODE* t, struct LOOP* loop) {
    auto has_constant_arms = [](const NODE* n) {
        return n->op == QUEST && n->right->op == COLON && is_icon(n->right->left) && is_icon(n->right->right) &&
               same_integers(n->right->left->type, n->type) && same_integers(n->right->right->type, n->type);
    };
    if (!is_integer(t->type) || t->type->size < tp->int_t->size) return t;
    const bool on_left = has_constant_arms(t->left) && (!t->right || is_icon(t->right));
    if (!on_left && !(t->right && is_icon(t->left) && has_constant_arms(t->right))) return t;
    NODE* quest = on_left ? t->left : t->right;
    NODE *a = folded_arm(t, on_left, then_arm(quest)), *b = a ? folded_arm(t, on_left, else_arm(quest)) : nullptr;
    if (!b) {
        erase_tree(a);
        return t;
    }
    erase_tree(quest->right);
    quest->right = maketree(COLON, a, b, t->type, quest->ls);
    quest->type = t->type->stqs();
    erase_tree(on_left ? t->right : t->left);
    erase_node(t);
    return simp_node(quest, loop);
}

NODE* simp_QUEST(NODE* t, struct LOOP* loop) {
    if (t->right->op != COLON) return t;
    const TYPE* c = t->left->type;
    const bool held_effects = t->left->op == COMMAOP;
    if (c->is_scalar() && !c->is_complex() && !c->is_vector()) t->left = simp_for_control(t->left, loop);
    if (t->left->op == COMMAOP && !held_effects) return simp_node(t, loop); // what is done before it comes out
    return first_that_applies(select_rules, t, loop);
}
