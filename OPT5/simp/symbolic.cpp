// Signs, zero and single values: what the bounds and the known bits of a tree say.

#include "OPT5/simp/symbolic.h"

#include "OPT5/simp/known_bits.h"

#include <numeric>

LOOP_SEAMS loop_seams;

namespace {

bool is_integer(const TYPE* t) { return (t->is_int() || t->is_enum()) && t->size >= 1 && t->size <= 64; }
uint64_t sign_bit(const TYPE* t) { return uint64_t(1) << (t->size - 1); }
bool is_signed(const TYPE* t) { return !t->is_bool() && !t->is_unsigned(); }

} // namespace

bool calculate_bounds(const NODE* tree, struct LOOP*, INT65* min, INT65* max) {
    if (!is_integer(tree->type)) return false;
    *min = int_type_min(tree->type);
    *max = int_type_max(tree->type);
    return true;
}

INT65 calculate_minval_for_tree(const NODE* tree, struct LOOP* loop) {
    INT65 min, max;
    return calculate_bounds(tree, loop, &min, &max) ? min : int_type_min(tp->llong_t);
}

INT65 calculate_maxval_for_tree(const NODE* tree, struct LOOP* loop) {
    INT65 min, max;
    return calculate_bounds(tree, loop, &min, &max) ? max : int_type_max(tp->ullong_t);
}

bool tree_is_non_negative(const NODE* tree, struct LOOP*) {
    if (!is_integer(tree->type)) return false;
    return !is_signed(tree->type) || (known_bits(tree).zeros & sign_bit(tree->type)) != 0;
}

bool tree_is_negative(const NODE* tree, struct LOOP*) {
    return is_integer(tree->type) && is_signed(tree->type) && (known_bits(tree).ones & sign_bit(tree->type)) != 0;
}

bool tree_is_positive(const NODE* tree, struct LOOP* loop) {
    return tree_is_non_negative(tree, loop) && tree_is_non_zero(tree, loop);
}

bool tree_is_zero(const NODE* tree, struct LOOP*) {
    return is_integer(tree->type) && known_bits(tree).zeros == type_mask(tree->type).value;
}

bool tree_is_non_zero(const NODE* tree, struct LOOP*) { return is_integer(tree->type) && known_bits(tree).ones != 0; }

int sign_of_integer_expression(const NODE* tree, struct LOOP* loop, bool non_negative_counts) {
    if (non_negative_counts ? tree_is_non_negative(tree, loop) : tree_is_positive(tree, loop)) return 1;
    return tree_is_negative(tree, loop) ? -1 : 0;
}

INT65 max_ICON_factor(const NODE* tree, struct LOOP*, bool) {
    if (!is_integer(tree->type)) return 1;
    const uint64_t zeros = known_bits(tree).zeros, mask = type_mask(tree->type).value;
    int n = 0;
    while (n < static_cast<int>(tree->type->size) - 1 && (zeros & mask) >> n & 1) ++n;
    return INT65(1) << INT65(n);
}

bool expr_product_may_overflow(const NODE*, struct LOOP*) { return true; }

bool tree_is_ivalue(const NODE* tree, INT65 value, struct LOOP* loop) {
    INT65 min, max;
    return calculate_bounds(tree, loop, &min, &max) && min == value && max == value;
}

bool tree_is_not_ivalue(const NODE* tree, INT65 value, struct LOOP* loop) {
    INT65 min, max;
    return calculate_bounds(tree, loop, &min, &max) && (value < min || max < value);
}

bool constant_divides_expr(INT65 value, TYPE* type, const NODE* tree, struct LOOP* loop) {
    return is_integer(tree->type) && type->size >= tree->type->size && (max_ICON_factor(tree, loop) % value).is_zero();
}

bool integer_DIV_is_exact(const NODE* tree, struct LOOP* loop) {
    return tree->op == DIV && is_integer(tree->type) && tree->right->op == ICON && !tree->right->u.lval.is_zero() &&
           constant_divides_expr(tree->right->u.lval, tree->type, tree->left, loop);
}
