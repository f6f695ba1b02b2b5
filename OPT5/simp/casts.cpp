// Casts: one that changes nothing is removed, of two only the outer one counts where the inner loses nothing that it
// keeps, and what a narrower type drops is not computed.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

using namespace rules;

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
        superfluous = !middle->is_bool() && middle->size >= from->size; // the middle type loses nothing
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
    return narrow_to_mask(&t->left, mask_of(t->type)) ? simp_node(t, loop) : nullptr;
}

// A complement, negation or shift to the left by a constant whose result is cut to a narrower type: computed there.
NODE* compute_unary_narrow(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    TYPE* type = t->type->stqs();
    const bool shifts =
        inner->op == SLL && shift_count_of(inner) && shift_count_of(inner) < static_cast<int>(type->size);
    if (!shifts && !is_unary(inner, NOTB) && !is_unary(inner, UMINUS)) return nullptr;
    TYPE* computed = inner->op == UMINUS && is_signed(type) ? tp->mk_unsigned(type) : type;
    inner->left = coerced(computed, inner->left, loop);
    inner->type = computed;
    erase_node(t);
    return coerced(type, simp_node(inner, loop), loop);
}

// An operator whose result is cut to a narrower type: computed there. One operand of an operator on bits may be any
// with a constant beside it; other operators, which wrap in the narrower type, compute in its unsigned form.
NODE* compute_narrow(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    TYPE *type = t->type->stqs(), *wide = inner->type;
    if (!is_integer(type) || type->size < tp->int_t->size || type->size >= wide->size) return nullptr;
    if (NODE* r = compute_unary_narrow(t, loop)) return r;
    const bool bitwise = inner->op == ANDB || inner->op == ORB || inner->op == XORB;
    const bool wraps = inner->op == PLUS || inner->op == MINUS || inner->op == MULT;
    if ((!bitwise && !wraps) || !operands_have_type(inner)) return nullptr;
    auto comes_from_below = [&](const NODE* n) {
        return is_icon(n) || (n->op == SCONV && is_integer(n->left->type) && n->left->type->size <= type->size &&
                              !is_bitfield_access(n->left));
    };
    const bool left = comes_from_below(inner->left), right = comes_from_below(inner->right);
    if (!right || (!left && !(bitwise && is_icon(inner->right)))) return nullptr;
    TYPE* computed = bitwise || !is_signed(type) ? type : tp->mk_unsigned(type);
    inner->left = coerced(computed, inner->left, loop);
    inner->right = coerced(computed, inner->right, loop);
    inner->type = computed;
    erase_node(t);
    return coerced(type, simp_node(inner, loop), loop);
}

// Between numbers and floating point: casts in between that lose nothing.
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

const RULE cast_rules[] = {integer_cast_of_cast, floating_cast_of_cast, narrow_under_cast,
                           compute_narrow,       cast_of_exact_sum,     compute_in_short_format};

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
