// Trees as truth values.

#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"

namespace {

NODE* drop_node(NODE* t) {
    NODE* operand = t->left;
    t->left = nullptr;
    erase_tree(t);
    return operand;
}

NODE* zero_of(TYPE* type) {
    if (!type->is_float()) return mk_ICON(INT65(0), type->is_pointer() ? tp->long_t : type->stqs());
    NODE* t = new_node(FCON, type->stqs());
    t->u.fval = new simul_fval(pos_zero);
    return t;
}

// `int_op` or its floating form against zero, with the casts that the types need.
NODE* compare_with_zero(NODE* t, int int_op, int float_op, struct LOOP* loop) {
    int op = t->type->is_float() ? float_op : int_op;
    NODE* test = maketree(op, t, zero_of(t->type), tp->int_t, t->ls);
    return simp_node(insert_mandatory_casts(test), loop);
}

bool is_integer(const NODE* t) { return t->type->is_int() || t->type->is_enum(); }
bool is_icon(const NODE* t, INT65 v) { return t->op == ICON && t->u.lval == v; }

// `t != 0` says what t says. So does a cast that only widens, and a cast between pointers.
NODE* without_tests_and_casts(NODE* t) {
    for (;;) {
        bool is_test = t->op == NEQ && is_icon(t->right, INT65(0)) && t->left->type->is_scalar() &&
                       !t->left->type->is_float() && !t->left->type->is_complex();
        bool widens = t->op == SCONV && is_integer(t) && is_integer(t->left) && t->left->type->size <= t->type->size;
        bool is_pointer_cast =
            (t->op == PCONV || t->op == ISP2CHAR) && (t->left->type->is_pointer() || t->left->op == ICON);
        // A bit-field is read through a cast.
        if (widens && (t->left->op == STDOT || t->left->op == STREF)) return t;
        if (!is_test && !widens && !is_pointer_cast) return t;
        if (is_pointer_cast && t->left->op == ICON && t->left->type->size > t->type->size) return t;
        t = drop_node(t);
    }
}

NODE* constant_truth(NODE* t, bool value) {
    NODE* effects = peel_for_effect(t);
    return mk_COMMAOP(effects, mk_ICON(INT65(value ? 1 : 0), tp->int_t));
}

// x % 2^k is zero where the low k bits are, whatever the sign.
NODE* mask_for_MOD(NODE* t) {
    if (t->op != MOD || t->right->op != ICON || !is_integer(t) || power_of_2(t->right->u.lval) < 0) return t;
    t->op = ANDB;
    t->right->u.lval = truncate_to_type(t->right->u.lval - INT65(1), t->right->type);
    return t;
}

// (x >> n) & 1, and x >> (width - 1), look at one bit.
NODE* mask_for_shift(NODE* t) {
    bool tests_low_bit = t->op == ANDB && is_icon(t->right, INT65(1)) && t->left->op == SRL;
    NODE* shift = tests_low_bit ? t->left : t;
    if (shift->op != SRL || !is_integer(shift) || shift->right->op != ICON) return t;
    INT65 n = shift->right->u.lval, width(shift->left->type->size);
    bool in_range = !n.is_negative() && n < width && equiv_mtypes(shift->left->type, shift->type) &&
                    (!tests_low_bit || equiv_mtypes(shift->type, t->type));
    if (!in_range || (!tests_low_bit && n != width - INT65(1))) return t;
    TYPE* type = shift->type->stqs();
    NODE* bit = maketree(ANDB, shift->left, mk_ICON(INT65(1) << n, type), type, t->ls);
    shift->left = nullptr;
    erase_tree(t);
    return bit;
}

bool all_bits_are_zero(const NODE* t) {
    if (!type_ops_seams.find_known_zeros || !is_integer(t)) return false;
    INT65 mask = type_mask(t->type);
    return (mask & ~type_ops_seams.find_known_zeros(t, t->type)).is_zero();
}

} // namespace

NODE* make_boolean(NODE* t, struct LOOP* loop) {
    const NODE* value = t;
    while ((value->op == PCONV || value->op == ISP2CHAR) && value->left->op == ICON) value = value->left;
    if (value->op == ICON && !(t->type->is_pointer() && value->type->size > t->type->size)) {
        NODE* truth = mk_ICON(INT65(value->u.lval.is_zero() ? 0 : 1), tp->int_t);
        truth->ls = t->ls;
        erase_tree(t);
        return truth;
    }
    if (t->op == MIXVALUE && reinterpret_cast<uintptr_t>(t->u.rval) <= 1) return t;
    if (returns_1_or_0(t)) return coerce_to_type(tp->int_t, t);
    return compare_with_zero(t, NEQ, FNEQN, loop);
}

NODE* invert_boolean_tree(NODE* t) {
    bool is_test = t->op == EQ && is_icon(t->right, INT65(0)) && !t->left->type->is_pointer();
    if (is_test && returns_1_or_0(t->left)) return coerce_to_type(tp->int_t, drop_node(t));
    if (tree_is_trivially_invertible(t)) {
        t->op = boolean_inv[t->op];
        return t;
    }
    OPT_ASSERT(t->type->is_scalar());
    return compare_with_zero(t, EQ, FEQ, nullptr);
}

NODE* simp_for_control(NODE* t, struct LOOP* loop) {
    t = without_tests_and_casts(t);
    if (t->op == ICON) {
        NODE* truth = mk_ICON(INT65(t->u.lval.is_zero() ? 0 : 1), tp->int_t);
        erase_tree(t);
        return truth;
    }
    if (t->type->is_pointer() && pointer_contains_adcon_term(t)) return constant_truth(t, true);
    if (all_bits_are_zero(t)) return constant_truth(t, false);
    return simp_node(mask_for_shift(mask_for_MOD(t)), loop);
}
