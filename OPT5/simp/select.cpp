// Conditional values and casts.
//
// Canonical forms: the condition of a QUEST is in control form, and not negated; arms that are truth values make it a
// logical operator, arms of the same cast or sign have it outside; the test of a minimum or maximum is LT or GT of the
// arms in their order. A cast that the operand's bits or the use of the result make idle is gone.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/minmax.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

using namespace rules;

namespace {

NODE*& then_arm(NODE* quest) { return quest->right->left; }
NODE*& else_arm(NODE* quest) { return quest->right->right; }

NODE* in_type(TYPE* type, NODE* value) { return type->is_scalar() ? coerce_to_type(type, value) : value; }

NODE* select_arm(NODE* t, bool then) {
    NODE *kept = then ? then_arm(t) : else_arm(t), *dropped = then ? else_arm(t) : then_arm(t);
    TYPE* type = t->type;
    erase_tree(dropped);
    erase_node(t->right);
    erase_tree(t->left);
    erase_node(t);
    return in_type(type, kept);
}

NODE* constant_condition(NODE* t, struct LOOP*) {
    if (!is_icon(t->left)) return nullptr;
    return select_arm(t, !t->left->u.lval.is_zero());
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
    return mk_COMMAOP(effects, in_type(type, value));
}

// x == c ? c : x, x != y ? x : y: the arm that is x in either case.
NODE* arm_by_equality(NODE* t, struct LOOP*) {
    NODE* c = t->left;
    if ((c->op != EQ && c->op != NEQ) || !c->left->type->is_int() || !is_pure(c)) return nullptr;
    NODE *same = c->op == EQ ? then_arm(t) : else_arm(t), *other = c->op == EQ ? else_arm(t) : then_arm(t);
    const bool holds = (same_value(c->left, other) && same_value(c->right, same)) ||
                       (same_value(c->right, other) && same_value(c->left, same));
    return holds ? select_arm(t, other == then_arm(t)) : nullptr;
}

// x ? x : 0 and the like, in control form: x ? 0 : x is 0.
NODE* arm_by_truth(NODE* t, struct LOOP*) {
    NODE* c = t->left;
    if (!is_integer(c->type) || !is_pure(c)) return nullptr;
    if (same_value(c, then_arm(t)) && is_icon(else_arm(t), INT65(0)) && same_integers(c->type, t->type))
        return select_arm(t, true);
    if (same_value(c, else_arm(t)) && is_icon(then_arm(t), INT65(0)) && same_integers(c->type, t->type))
        return select_arm(t, true);
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
        arm = select_arm(arm, then == same);
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
        return coerce_to_type(type, condition);
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
    return coerce_to_type(type, made(one ? OROR : ANDAND, condition, value, tp->int_t, loop));
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
    if (!is_unary(if_negative, UMINUS) || !same_value(if_negative->left, otherwise) ||
        !same_value(c->left, otherwise) || !same_integers(otherwise->type, t->type))
        return nullptr;
    NODE* x = copy_tree(otherwise);
    TYPE* type = t->type;
    erase_tree(t);
    return made(ABS, x, nullptr, type, loop);
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

const RULE select_rules[] = {
    constant_condition, equal_arms,         condition_without_opposite, arm_by_equality, arm_by_truth,
    constant_arms,      logical_arms,       condition_asked_again,      absolute_value,  minmax_of_QUEST,
    ordered_arms,       common_cast_outward};

} // namespace

NODE* simp_QUEST(NODE* t, struct LOOP* loop) {
    if (t->right->op != COLON) return t;
    const TYPE* c = t->left->type;
    const bool held_effects = t->left->op == COMMAOP;
    if (c->is_scalar() && !c->is_complex() && !c->is_vector()) t->left = simp_for_control(t->left, loop);
    if (t->left->op == COMMAOP && !held_effects) return simp_node(t, loop); // what is done before it comes out
    return first_that_applies(select_rules, t, loop);
}
