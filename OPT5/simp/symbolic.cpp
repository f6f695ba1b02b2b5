// Signs, zero, single values and overflow, by bounds, known bits and linear forms.

#include "OPT5/simp/symbolic.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/linear_value.h"
#include "OPT5/simp/range.h"
#include "OPT5/target/bif.h"

#include <numeric>

namespace {

constexpr int MOST_LEVELS = 3; // of operators that are looked through for a value other than zero

// A product beyond so many levels of questions about products counts as one that may overflow.
constexpr int MOST_PRODUCT_LEVELS = 8;
thread_local int product_levels = 0;

bool is_plain_conversion(const NODE* t) {
    return t->op == SCONV && has_value_range(t->left->type) &&
           (t->type->is_bool() || t->type->size >= t->left->type->size);
}

// By form: what keeps a value other than zero as one.
bool is_non_zero(const NODE* t, struct LOOP* loop, int levels) {
    t = without_wrappers(t);
    if (!has_value_range(t->type)) return false;
    if (!range_of_tree(t, loop).holds(0) || known_bits(t).ones) return true;
    if (levels == 0) return false;
    auto operand = [&](const NODE* n) { return is_non_zero(n, loop, levels - 1); };
    switch (t->op) {
    case UMINUS:
    case ABS: return has_value_range(t->left->type) && t->left->type->size == t->type->size && operand(t->left);
    case SCONV: return is_plain_conversion(t) && operand(t->left);
    case ORB:
        return t->left->type->size == t->type->size && t->right->type->size == t->type->size &&
               (operand(t->left) || operand(t->right));
    case MULT: return operand(t->left) && operand(t->right) && !expr_product_may_overflow(t, loop);
    case QUEST:
        return t->right->op == COLON && t->right->left->type->size <= t->type->size &&
               t->right->right->type->size <= t->type->size && operand(t->right->left) && operand(t->right->right);
    case COMMAOP: return t->right->type->size <= t->type->size && operand(t->right);
    case MINUS:
    case XORB: return tree_values_are_not_equal(t->left, t->right, loop);
    default: return false;
    }
}

} // namespace

// ---- Sign and zero

bool tree_is_non_negative(const NODE* tree, struct LOOP* loop) {
    if (!has_value_range(tree->type)) return false;
    return range_of_type(tree->type).min >= 0 || range_of_tree(tree, loop).min >= 0;
}

bool tree_is_negative(const NODE* tree, struct LOOP* loop) {
    if (!has_value_range(tree->type) || range_of_type(tree->type).min >= 0) return false;
    return range_of_tree(tree, loop).max < 0;
}

bool tree_is_positive(const NODE* tree, struct LOOP* loop) {
    return tree_is_non_negative(tree, loop) && tree_is_non_zero(tree, loop);
}

bool tree_is_zero(const NODE* tree, struct LOOP* loop) { return tree_is_ivalue(tree, 0, loop); }

bool tree_is_non_zero(const NODE* tree, struct LOOP* loop) { return is_non_zero(tree, loop, MOST_LEVELS); }

int sign_of_integer_expression(const NODE* tree, struct LOOP* loop, bool non_negative_counts) {
    if (non_negative_counts ? tree_is_non_negative(tree, loop) : tree_is_positive(tree, loop)) return 1;
    return tree_is_negative(tree, loop) ? -1 : 0;
}

// ---- Values

bool tree_is_ivalue(const NODE* tree, INT65 value, struct LOOP* loop) {
    if (!has_value_range(tree->type)) return false;
    if (range_of_tree(tree, loop).is(to_wide(value))) return true;
    const LINEAR_VALUE form(tree, loop);
    return form.is_constant() && range_of_type(tree->type).holds(to_wide(value)) && form.constant_is(value);
}

bool tree_is_not_ivalue(const NODE* tree, INT65 value, struct LOOP* loop) {
    if (!has_value_range(tree->type)) return false;
    if (!range_of_tree(tree, loop).holds(to_wide(value))) return true;
    if (value.is_zero()) return tree_is_non_zero(tree, loop);
    const KNOWN_BITS k = known_bits(tree);
    const uint64_t bits = value.value & type_mask(tree->type).value;
    return (bits & k.zeros) || (~bits & k.ones);
}

bool tree_difference_is_ivalue(const NODE* a, const NODE* b, INT65 value, struct LOOP* loop) {
    if (value.is_zero() && a->type->size == b->type->size && is_same_value(a, b)) return true;
    if (!LINEAR_VALUE::takes(a) || !LINEAR_VALUE::takes(b) || a->type->size != b->type->size) return false;
    LINEAR_VALUE difference(a, loop);
    difference.subtract(b);
    return difference.is_constant() && difference.constant_is(value);
}

bool tree_values_are_not_equal(const NODE* a, const NODE* b, struct LOOP* loop) {
    if (has_value_range(a->type) && has_value_range(b->type)) {
        const RANGE x = range_of_tree(a, loop), y = range_of_tree(b, loop);
        if (x.max < y.min || y.max < x.min) return true;
        const bool one_form = a->type->size == b->type->size && wraps_signed(a->type) == wraps_signed(b->type);
        const KNOWN_BITS p = known_bits(a), q = known_bits(b);
        if (one_form && ((p.ones & q.zeros) || (p.zeros & q.ones))) return true;
    }
    if (!LINEAR_VALUE::takes(a) || !LINEAR_VALUE::takes(b) || a->type->size != b->type->size) return false;
    LINEAR_VALUE difference(a, loop);
    difference.subtract(b);
    return difference.cannot_be_zero();
}

// ---- Overflow

bool expr_product_may_overflow(const NODE* tree, struct LOOP* loop) {
    const NODE* t = without_wrappers(tree);
    if (t->op != MULT || !has_value_range(t->type) || t->type->is_enum() || product_levels > MOST_PRODUCT_LEVELS)
        return true;
    if (!has_value_range(t->left->type) || !has_value_range(t->right->type)) return true;
    if (t->right->op == ICON && t->right->u.lval.is_zero()) return false;
    ++product_levels;
    const RANGE a = range_of_tree(t->left, loop), b = range_of_tree(t->right, loop);
    --product_levels;
    for (WIDE x : {a.min, a.max})
        for (WIDE y : {b.min, b.max})
            if (prod_may_overflow(to_int65(x), to_int65(y), t->type)) return true;
    return false;
}

// ---- Callbacks

void install_symbolic_callbacks() {
    type_ops_callbacks.calculate_bounds = calculate_bounds;
    type_ops_callbacks.constant_divides_expr = [](INT65 constant, const NODE* tree) {
        return constant_divides_expr(constant, tree->type, tree, nullptr);
    };
    bif_callbacks.calculate_bounds = calculate_bounds;
}

// ---- Helpers

uint32_t clp2(uint32_t v) {
    if (v > 0x80000000u) return 0;
    uint32_t p = v ? 1 : 0;
    while (p < v) p <<= 1;
    return p;
}

uint32_t uint_gcd(uint32_t a, uint32_t b) { return std::gcd(a, b); }

uint32_t uint_lcm(uint32_t a, uint32_t b) {
    if (!a || !b) return 0;
    const uint64_t m = uint64_t(a) / std::gcd(a, b) * b;
    return m > 0xFFFFFFFFu ? 0 : static_cast<uint32_t>(m);
}

int compare_SLLONG_values(INT65 a, INT65 b, TYPE* type) {
    a = truncate_to_type(a, type);
    b = truncate_to_type(b, type);
    return a < b ? -1 : b < a ? 1 : 0;
}
