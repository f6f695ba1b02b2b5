// Conditional values and casts.
//
// Canonical forms: the condition of a QUEST is in control form, and not negated; arms that are truth values make it a
// logical operator, arms of the same cast or sign have it outside; the test of a minimum or maximum is LT or GT of the
// arms in their order. A cast that the operand's bits or the use of the result make idle is gone.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/known_bits.h"
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
    constant_condition, equal_arms,   condition_without_opposite, arm_by_equality, arm_by_truth,
    constant_arms,      logical_arms, condition_asked_again,      absolute_value,  ordered_arms,
    common_cast_outward};

} // namespace

NODE* simp_QUEST(NODE* t, struct LOOP* loop) {
    if (t->right->op != COLON) return t;
    const TYPE* c = t->left->type;
    const bool held_effects = t->left->op == COMMAOP;
    if (c->is_scalar() && !c->is_complex() && !c->is_vector()) t->left = simp_for_control(t->left, loop);
    if (t->left->op == COMMAOP && !held_effects) return simp_node(t, loop); // what is done before it comes out
    return first_that_applies(select_rules, t, loop);
}

// ---- Casts

namespace {

NODE* drop_cast(NODE* t) {
    TYPE* type = t->type;
    return coerce_to_type(type, take_left(t));
}

// A cast of a cast to no fewer bits than the outer one keeps: only the outer counts. The bits that it keeps are the
// operand's own, or copies of its sign that either cast would make. A bit-field keeps the cast that reads it.
NODE* integer_cast_of_cast(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (inner->op != SCONV || !t->type->is_int() || !inner->type->is_int() || !inner->left->type->is_int() ||
        is_bitfield_access(inner->left))
        return nullptr;
    TYPE *to = t->type, *middle = inner->type, *from = inner->left->type;
    bool superfluous;
    if (to->is_bool())
        superfluous = !middle->is_bool() && middle->size >= from->size; // nothing is lost on the way
    else if (middle->is_bool())
        superfluous = false;
    else
        superfluous = middle->size >= to->size ||
                      (from->is_bool() || (middle->size > from->size && !(is_signed(from) && !is_signed(middle))));
    if (!superfluous) return nullptr;
    erase_node(t);
    NODE* operand = take_left(inner);
    return coerced(to, operand, loop);
}

// What the narrower type drops need not be computed.
NODE* narrow_under_cast(NODE* t, struct LOOP* loop) {
    NODE* operand = t->left;
    if (!is_integer(t->type) || !is_integer(operand->type) || t->type->size >= operand->type->size) return nullptr;
    t->left = prop_mask_into_subtree(operand, type_mask(t->type));
    return t->left == operand ? nullptr : simp_node(t, loop);
}

// An operator on bits, or on unsigned numbers, whose operands come from the narrower type: computed there.
NODE* compute_narrow(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    TYPE *type = t->type->stqs(), *wide = inner->type;
    if (!is_integer(type) || type->size < tp->int_t->size || type->size >= wide->size) return nullptr;
    const bool bitwise = inner->op == ANDB || inner->op == ORB || inner->op == XORB;
    const bool wraps = inner->op == PLUS || inner->op == MINUS || inner->op == MULT;
    if ((!bitwise && !(wraps && type->is_unsigned())) || !operands_have_type(inner)) return nullptr;
    auto comes_from_below = [&](const NODE* n) {
        return is_icon(n) || (n->op == SCONV && is_integer(n->left->type) && n->left->type->size <= type->size &&
                              !is_bitfield_access(n->left));
    };
    if (!comes_from_below(inner->left) || !comes_from_below(inner->right)) return nullptr;
    auto narrowed = [&](NODE* n) { return coerced(type, n, loop); };
    inner->left = narrowed(inner->left);
    inner->right = narrowed(inner->right);
    inner->type = type;
    erase_node(t);
    return simp_node(inner, loop);
}

// Between numbers and floating point: casts on the way that lose nothing.
NODE* floating_cast_of_cast(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (inner->op != SCONV || is_bitfield_access(inner->left) || inner->left->type->is_bool()) return nullptr;
    TYPE *to = t->type, *middle = inner->type, *from = inner->left->type;
    auto significant_bits = [](const TYPE* f) { return f->size > 32 ? 53u : 24u; };
    bool superfluous = false;
    if (to->is_float() && middle->is_float() && from->is_float())
        superfluous = middle->size >= from->size;
    else if (to->is_float() && middle->is_int() && from->is_int() && !middle->is_bool())
        superfluous = middle->size > from->size && !(is_signed(from) && !is_signed(middle));
    else if (to->is_int() && !to->is_bool() && middle->is_float() && from->is_int())
        superfluous =
            from->size <= significant_bits(middle) && to->size >= from->size && is_signed(to) == is_signed(from);
    if (!superfluous) return nullptr;
    erase_node(t);
    NODE* operand = take_left(inner);
    return coerced(to, operand, loop);
}

// (T)(x + c) of a sum that the bounds of x keep in its type.
NODE* cast_of_exact_sum(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    TYPE* type = t->type->stqs();
    if (!is_integer(type) || !is_node_with_icon(inner, PLUS) || type->size <= inner->type->size || is_icon(inner->left))
        return nullptr;
    if (is_signed(inner->type) && !is_signed(type)) return nullptr;
    INT65 min, max;
    const INT65 c = inner->right->u.lval;
    if (!calculate_bounds(inner->left, loop, &min, &max) || truncate_to_type(min + c, inner->type) != min + c ||
        truncate_to_type(max + c, inner->type) != max + c)
        return nullptr;
    erase_node(inner->right);
    t->left = take_left(inner);
    return made(PLUS, simp_node(t, loop), mk_ICON(c, type), type, loop);
}

const RULE cast_rules[] = {integer_cast_of_cast, floating_cast_of_cast, narrow_under_cast, compute_narrow,
                           cast_of_exact_sum};

} // namespace

// A cast to the type that the value has is none. A bit-field keeps its cast.
NODE* simp_SCONV(NODE* t, struct LOOP* loop) {
    if (t->left->op == STDOT || t->left->op == STREF) return t;
    if (compatible_types(t->type, t->left->type, true)) return drop_cast(t);
    if (t->type->is_vector() || t->left->type->is_vector() || !t->type->is_scalar() || !t->left->type->is_scalar())
        return t;
    t = first_that_applies(cast_rules, t, loop);
    return t->op == SCONV ? simp_by_known_bits(t) : t;
}

// Casts between pointers are of the address alone: the last one counts.
NODE* simp_PCONV(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (t->op == PCONV && compatible_types(t->type, inner->type, true)) return take_left(t);
    if (inner->op == PCONV && t->op == PCONV && inner->type->size == t->type->size && inner->left->type->is_pointer() &&
        inner->left->type->size == t->type->size) {
        t->left = take_left(inner);
        return simp_node(t, loop);
    }
    return t;
}
