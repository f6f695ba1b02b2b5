// Sums and differences.
//
// Canonical forms: a constant stands outermost and on the right; constants of a chain are one; a signed difference with
// a constant is a sum with its negative, an unsigned one has the constant of the smaller magnitude; equal terms are one
// product; a sum with a negation is a difference. Pointers: the pointer stands on the left, the constant outermost.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/linear.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

using namespace rules;

namespace {

bool is_sum(const NODE* t) { return (t->op == PLUS || t->op == MINUS) && operands_have_type(t); }
bool has_constant_term(const NODE* t) { return is_sum(t) && is_icon(t->right); }
INT65 constant_term(const NODE* t) { return t->op == PLUS ? t->right->u.lval : -t->right->u.lval; }
// A constant among the terms, also behind a cast from the unsigned type, where it is out of the sum's reach.
bool holds_constant(const NODE* t) {
    if (t->op == SCONV && is_integer(t->left->type) && t->left->type->size == t->type->size) t = t->left;
    return is_sum(t) && (is_icon(t->right) || is_icon(t->left));
}

// The node as x + c of a c that fits or wraps, in the form that the sign of the type wants.
NODE* as_constant_sum(NODE* t, NODE* x, INT65 c, NODE* icon) {
    TYPE* type = t->type;
    c = truncate_to_type(c, type);
    const INT65 half = INT65(0, sign_bit(type));
    const bool subtracts = type->is_unsigned() && c > half;
    set_icon(icon, subtracts ? -c : c);
    return to_binary(t, subtracts ? MINUS : PLUS, x, icon);
}

// ---- Constants
NODE* drop_zero(NODE* t, struct LOOP*) {
    if (!is_icon(t->right, INT65(0))) return nullptr;
    return only_left(t);
}

NODE* canonical_constant(NODE* t, struct LOOP* loop) {
    if (!is_icon(t->right) || !fits_or_wraps(constant_term(t), t->type)) return nullptr;
    const int op = t->op;
    as_constant_sum(t, t->left, constant_term(t), t->right);
    return t->op != op ? simp_node(t, loop) : nullptr;
}

// (x + c1) + c2, (c1 - x) + c2. A signed constant that wraps is not made: the sum would always overflow.
NODE* join_constants(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right) || !is_sum(inner)) return nullptr;
    if (is_icon(inner->right)) {
        const INT65 sum = constant_term(inner) + constant_term(t);
        if (!fits_or_wraps(sum, t->type)) return nullptr;
        NODE* x = inner->left;
        erase_node(inner->right);
        erase_node(inner);
        return simp_node(as_constant_sum(t, x, sum, t->right), loop);
    }
    if (inner->op != MINUS || !is_icon(inner->left)) return nullptr;
    const INT65 sum = inner->left->u.lval + constant_term(t);
    if (!fits_or_wraps(sum, t->type)) return nullptr;
    set_icon(inner->left, sum);
    return simp_node(only_left(t), loop);
}

// c1 - (x + c2), c1 - (c2 - x)
NODE* constant_minus_sum(NODE* t, struct LOOP* loop) {
    NODE* inner = t->right;
    if (t->op != MINUS || !is_icon(t->left) || !is_sum(inner)) return nullptr;
    if (is_icon(inner->right)) {
        const INT65 c = t->left->u.lval - constant_term(inner);
        if (!fits_or_wraps(c, t->type)) return nullptr;
        set_icon(t->left, c);
        t->right = inner->left;
        erase_node(inner->right);
        erase_node(inner);
        return simp_node(t, loop);
    }
    if (inner->op != MINUS || !is_icon(inner->left)) return nullptr;
    const INT65 c = t->left->u.lval - inner->left->u.lval;
    if (!fits_or_wraps(c, t->type)) return nullptr;
    NODE* x = inner->right;
    erase_node(inner->left);
    erase_node(inner);
    return simp_node(as_constant_sum(t, x, c, t->left), loop);
}

// (x + c) op y and x op (y + c): the constant moves outward, where what is left is exact.
NODE* constant_outward(NODE* t, struct LOOP* loop) {
    if (is_icon(t->right)) return nullptr;
    const bool on_left = has_constant_term(t->left);
    if (!on_left && (is_icon(t->left) || !has_constant_term(t->right))) return nullptr;
    NODE* inner = on_left ? t->left : t->right;
    INT65 c = constant_term(inner);
    if (!on_left && t->op == MINUS) c = -c;
    NODE *x = inner->left, *icon = inner->right, *a = on_left ? x : t->left, *b = on_left ? t->right : x;
    if (!fits_or_wraps(c, t->type) || !signed_result_is_exact(t->op, a, b, t->type, loop)) return nullptr;
    erase_node(inner);
    return simp_node(as_constant_sum(t, made(t->op, a, b, t->type, loop), c, icon), loop);
}

// (x + c1) op (y + c2), ((x + c1) op y) + c2: where the constants can't come together in signed sums, they do in
// unsigned ones.
NODE* join_distant_constants(NODE* t, struct LOOP* loop) {
    if (!is_signed(t->type)) return nullptr;
    auto holds_two = [](const NODE* n) { return holds_constant(n->left) && holds_constant(n->right); };
    const NODE* inner = t->left;
    const bool below =
        is_icon(t->right) && is_sum(inner) && (holds_constant(inner->left) || holds_constant(inner->right));
    const bool under_cast = is_icon(t->right) && inner->op == SCONV && holds_constant(inner);
    return holds_two(t) || below || under_cast ? as_wrapping(t, loop) : nullptr;
}

// ---- Negations
NODE* remove_negations(NODE* t, struct LOOP* loop) {
    if (t->op == MINUS && is_icon(t->left, INT65(0))) {
        erase_tree(t->left);
        return simp_node(to_unary(t, UMINUS, t->right), loop);
    }
    if (is_unary(t->right, UMINUS)) {
        t->op = t->op == PLUS ? MINUS : PLUS;
        t->right = take_left(t->right);
        return simp_node(t, loop);
    }
    // -x + y. The operands exchange places only where the order of their effects does not show.
    if (t->op == PLUS && is_unary(t->left, UMINUS) && is_pure(t->left) && is_pure(t->right)) {
        NODE* x = take_left(t->left);
        return simp_node(to_binary(t, MINUS, t->right, x), loop);
    }
    // x - (y - z) of a constant y is (x + z) - y.
    NODE* inner = t->right;
    if (t->op == MINUS && inner->op == MINUS && is_icon(inner->left) && operands_have_type(inner) &&
        !is_icon(t->left) && signed_result_is_exact(PLUS, t->left, inner->right, t->type, loop)) {
        NODE* sum = made(PLUS, t->left, inner->right, t->type, loop);
        NODE* c = inner->left;
        erase_node(inner);
        return simp_node(to_binary(t, MINUS, sum, c), loop);
    }
    return nullptr;
}

NODE* cancel(NODE* t, struct LOOP*) {
    return t->op == MINUS && same_value(t->left, t->right) ? constant_for(t, INT65(0)) : nullptr;
}

// ---- Common factors: x * c1 + x * c2, x + x, x * y + x * z
struct TERM {
    NODE* value;
    INT65 factor;
};

TERM term_of(NODE* t) {
    LINEAR_STEP step;
    const bool multiplies = is_node_with_icon(t, MULT) || shift_count_of(t);
    if (multiplies && linear_step(t, &step)) return {t->left, INT65(step.by_a)};
    return {t, INT65(1)};
}

NODE* join_equal_terms(NODE* t, struct LOOP* loop) {
    if (is_icon(t->right) || is_icon(t->left)) return nullptr;
    const TERM l = term_of(t->left), r = term_of(t->right);
    if (!same_value(l.value, r.value)) return nullptr;
    const INT65 factor = t->op == PLUS ? l.factor + r.factor : l.factor - r.factor;
    if (!fits_or_wraps(factor, t->type)) return nullptr;
    const bool shifts = t->left->op == SLL || t->right->op == SLL; // which wrap where a product may not
    NODE *x = copy_tree(l.value), *icon = icon_of(factor, t);
    icon->u.lval = truncate_to_type(factor, t->type);
    TYPE* type = t->type;
    erase_tree(t);
    return shifts ? made_exact(MULT, x, icon, type, loop) : made(MULT, x, icon, type, loop);
}

NODE* factor_out(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (!is_node(l, MULT) || !is_node(r, MULT) || !is_pure(l) || !is_pure(r)) return nullptr;
    for (int side = 0; side < 4; ++side) {
        NODE *&a = side & 1 ? l->right : l->left, *&b = side & 2 ? r->right : r->left;
        if (is_icon(a) || !same_value(a, b)) continue;
        NODE *common = a, *x = side & 1 ? l->left : l->right, *y = side & 2 ? r->left : r->right;
        if (is_icon(x) != is_icon(y)) return nullptr; // x * c + x * y stays for the pairs of constants
        const bool is_exact = signed_result_is_exact(t->op, x, y, t->type, loop);
        erase_tree(b);
        erase_node(l);
        erase_node(r);
        NODE* sum = maketree(t->op, x, y, t->type, t->ls);
        if (is_exact) return simp_node(to_binary(t, MULT, common, simp_node(sum, loop)), loop);
        return as_wrapping(to_binary(t, MULT, common, sum), loop);
    }
    return nullptr;
}

const RULE sum_rules[] = {drop_zero, canonical_constant, join_constants,   constant_minus_sum,     remove_negations,
                          cancel,    by_pattern,         constant_outward, join_distant_constants, join_equal_terms,
                          factor_out};

NODE* simp_integer_sum(NODE* t, struct LOOP* loop) {
    if (!operands_have_type(t)) return t;
    if (t->op == PLUS) order_operands(t);
    t = first_that_applies(sum_rules, t, loop);
    return t->op == PLUS || t->op == MINUS ? simp_by_known_bits(t) : t;
}

// ---- Pointers: arithmetic in address units, at the width of an address
bool is_address_cast(const NODE* t) {
    return (t->op == PCONV || t->op == ISP2CHAR) && t->left->type->is_pointer() && t->left->type->size == t->type->size;
}
bool is_offset(const TYPE* t) { return is_integer(t); }
bool is_pointer_sum(const NODE* t) {
    return (t->op == PLUS || t->op == MINUS) && t->type->is_pointer() && t->left->type->is_pointer() &&
           is_offset(t->right->type);
}

// (p + c1) + c2, also with casts of the pointer between: one constant.
NODE* join_offsets(NODE* t, struct LOOP* loop) {
    if (!is_icon(t->right)) return nullptr;
    NODE** link = &t->left;
    while (is_address_cast(*link)) link = &(*link)->left;
    NODE* inner = *link;
    if (!is_pointer_sum(inner) || !is_icon(inner->right)) return nullptr;
    const INT65 sum = constant_term(inner) + constant_term(t);
    if (truncate_to_type(sum, tp->long_t) != sum) return nullptr;
    const bool fits = t->right->type->is_signed() && truncate_to_type(sum, t->right->type) == sum;
    TYPE* type = fits ? t->right->type->stqs() : tp->long_t;
    erase_tree(t->right);
    erase_node(inner->right);
    TYPE* former = inner->type;
    NODE* p = take_left(inner);
    *link = compatible_types(p->type, former, true) ? p : coerce_to_type(former, p);
    t->op = PLUS;
    t->right = mk_ICON(sum, type);
    if (is_address_cast(t->left)) t->left = simp_node(t->left, loop);
    return simp_node(t, loop);
}

// Whether x op c, computed in its own width, is the same number as computed in an address's.
bool sum_is_exact(const NODE* t, struct LOOP* loop) {
    if (t->type->size >= tp->void_ptr_t->size) return true;
    INT65 min, max;
    if (!calculate_bounds(t->left, loop, &min, &max)) return false;
    const INT65 c = constant_term(t);
    return min + c >= int_type_min(t->type) && max + c <= int_type_max(t->type);
}

// (p + c) + i is (p + i) + c; so is p + (i + c) where that sum is exact.
NODE* offset_outward(NODE* t, struct LOOP* loop) {
    if (is_icon(t->right)) return nullptr;
    NODE* inner = t->left;
    if (is_pointer_sum(inner) && is_icon(inner->right)) {
        std::swap(t->right, inner->right);
        std::swap(t->op, inner->op);
        t->left = simp_node(inner, loop);
        return simp_node(t, loop);
    }
    inner = t->right;
    if (!has_constant_term(inner) || !sum_is_exact(inner, loop)) return nullptr;
    const INT65 c = t->op == PLUS ? constant_term(inner) : -constant_term(inner);
    if (truncate_to_type(c, tp->long_t) != c) return nullptr;
    TYPE *type = t->type,
         *offset = inner->type->is_signed() && truncate_to_type(c, inner->type) == c ? inner->type->stqs() : tp->long_t;
    erase_node(inner->right);
    t->right = take_left(inner);
    return made(PLUS, simp_node(t, loop), mk_ICON(c, offset), type, loop);
}

// p + (x + c) * k, p + ((x + c) + y), in the width of an address: the constant moves outward. What a pointer is moved
// by lies within an object, which is smaller than FAR, and so what is left of it without a constant below FAR is exact.
constexpr int64_t FAR = int64_t(1) << 30;

NODE* constant_of_offset_outward(NODE* t, struct LOOP* loop) {
    NODE* r = t->right;
    if (r->type->size != tp->void_ptr_t->size || !is_signed(r->type) || !r->right || !operands_have_type(r))
        return nullptr;
    const bool scales = is_node_with_icon(r, MULT) && has_constant_term(r->left);
    const bool on_left = is_sum(r) && has_constant_term(r->left), on_right = is_sum(r) && has_constant_term(r->right);
    if (!scales && !on_left && !on_right) return nullptr;
    NODE*& place = scales || on_left ? r->left : r->right;
    INT65 c = constant_term(place);
    if (scales) c = c * r->right->u.lval;
    if ((t->op == MINUS) != (!scales && !on_left && r->op == MINUS)) c = -c;
    if (c >= INT65(FAR) || c <= INT65(-FAR)) return nullptr;
    erase_node(place->right);
    place = take_left(place);
    t->right = simp_node(r, loop);
    TYPE* type = t->type;
    return made(PLUS, simp_node(t, loop), mk_ICON(c, tp->long_t), type, loop);
}

// The pointer on the left, a positive operator where that is one: i + p, p + -i, p - c.
NODE* canonical_pointer_sum(NODE* t, struct LOOP* loop) {
    if (t->op == PLUS && t->right->type->is_pointer() && is_offset(t->left->type)) {
        if (!is_steady_leaf(t->left) && !is_steady_leaf(t->right) && !(is_pure(t->left) && is_pure(t->right)))
            return nullptr;
        std::swap(t->left, t->right);
        return simp_node(t, loop);
    }
    if (!is_pointer_sum(t)) return nullptr;
    if (is_icon(t->right, INT65(0))) return only_left(t);
    if (t->op == MINUS && is_icon(t->right)) {
        const INT65 c = -t->right->u.lval;
        if (t->right->type->is_signed() && truncate_to_type(c, t->right->type) == c) {
            t->op = PLUS;
            t->right->u.lval = c;
            return simp_node(t, loop);
        }
    }
    // The negation must be exact to be a negation of the address's own width.
    if (is_unary(t->right, UMINUS) && (t->right->type->size >= tp->void_ptr_t->size || is_signed(t->right->type)) &&
        (t->right->type->size >= tp->void_ptr_t->size ||
         tree_is_not_ivalue(t->right->left, int_type_min(t->right->type), loop))) {
        t->op = t->op == PLUS ? MINUS : PLUS;
        t->right = take_left(t->right);
        return simp_node(t, loop);
    }
    return nullptr;
}

const RULE pointer_rules[] = {canonical_pointer_sum, join_offsets, offset_outward, constant_of_offset_outward};

// ---- Differences of pointers, in address units
const NODE* base_of(const NODE* t) {
    while (is_address_cast(t)) t = t->left;
    return t;
}

NODE* offset_as_long(NODE* sum, struct LOOP* loop) {
    NODE* offset = coerced(tp->long_t, copy_tree(sum->right), loop);
    return sum->op == MINUS ? made_exact(UMINUS, offset, nullptr, tp->long_t, loop) : offset;
}

// (p + i) - (p + j) is i - j; (p + c) - q is (p - q) + c.
NODE* simp_pointer_difference(NODE* t, struct LOOP* loop) {
    if (t->type->size != tp->long_t->size || !is_integer(t->type)) return t;
    const NODE *l = base_of(t->left), *r = base_of(t->right);
    NODE *a = const_cast<NODE*>(l), *b = const_cast<NODE*>(r);
    const bool l_is_sum = is_pointer_sum(l), r_is_sum = is_pointer_sum(r);
    if (!is_pure(l) || !is_pure(r)) return t;
    if (same_value(l, r)) return constant_for(t, INT65(0));
    TYPE* type = t->type;
    NODE* value = nullptr;
    if (l_is_sum && r_is_sum && same_value(base_of(l->left), base_of(r->left)))
        value = made_exact(MINUS, offset_as_long(a, loop), offset_as_long(b, loop), tp->long_t, loop);
    else if (l_is_sum && same_value(base_of(l->left), r))
        value = offset_as_long(a, loop);
    else if (r_is_sum && same_value(l, base_of(r->left)))
        value = made_exact(UMINUS, offset_as_long(b, loop), nullptr, tp->long_t, loop);
    if (value) {
        erase_tree(t);
        return coerce_to_type(type, value);
    }
    return t;
}

NODE* simp_address(NODE* t, struct LOOP* loop) {
    if (t->left->type->is_pointer() && t->right->type->is_pointer())
        return t->op == MINUS ? simp_pointer_difference(t, loop) : t;
    return t->type->is_pointer() ? first_that_applies(pointer_rules, t, loop) : t;
}

bool has_pointer(const NODE* t) {
    return t->type->is_pointer() || t->left->type->is_pointer() || t->right->type->is_pointer();
}

NODE* simp_sum(NODE* t, struct LOOP* loop) {
    return has_pointer(t) ? simp_address(t, loop) : simp_integer_sum(t, loop);
}

} // namespace

NODE* simp_PLUS(NODE* t, struct LOOP* loop) { return simp_sum(t, loop); }
NODE* simp_MINUS(NODE* t, struct LOOP* loop) { return simp_sum(t, loop); }
