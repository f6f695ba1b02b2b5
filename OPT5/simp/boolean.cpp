// Trees as truth values.
//
// A condition is in control form: it is zero where it does not hold and anything else where it does; compares with
// zero, widening casts and shifts of a single bit that say nothing more are removed.

#include "OPT5/ir/global.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

using namespace rules;

namespace {

constexpr int SHORT_MASK = 16; // bits that a mask may reach to be as cheap as a shift

bool TYPE_IS_SCALAR(const TYPE* t) { return t->is_scalar(); }

NODE* zero_of(TYPE* type) {
    if (!type->is_float()) return mk_ICON(INT65(0), type->stqs());
    NODE* t = new_node(FCON, type->stqs());
    t->u.fval = new simul_fval(pos_zero);
    return t;
}

// `int_op` or its floating form against zero, with the casts that the types need.
NODE* compare_with_zero(NODE* t, int int_op, int float_op, struct LOOP* loop) {
    LS* ls = t->ls;
    if (t->type->is_float()) return simp_node(maketree(float_op, t, zero_of(t->type), tp->int_t, ls), loop);
    NODE* zero = zero_of(t->type->is_pointer() ? tp->long_t : promoted_type(t->type));
    t = coerced(t->type->is_pointer() ? t->type->stqs() : promoted_type(t->type), t, loop);
    return simp_node(maketree(int_op, t, coerce_to_type(t->type->stqs(), zero), tp->int_t, ls), loop);
}

// The lanes of a mask that are zero, as numbers of the lanes' size.
NODE* compare_mask_with_zero(NODE* t) {
    const uint32_t lanes = t->type->real->num_elem();
    const TYPE* etype = nullptr;
    for (TYPE* number : {tp->int_t, tp->long_t, tp->llong_t})
        if (number->size * lanes == t->type->size) etype = number;
    if (!etype) return maketree(NOTB, t, nullptr, t->type, t->ls);
    OPT_ASSERT(TYPE_IS_SCALAR(etype));
    TYPE *mask = t->type, *numbers = tp->mk_vector(const_cast<TYPE*>(etype), false, lanes);
    NODE* zeros = mk_integer_constant(INT65(0), numbers);
    return maketree(EQ, exact_types(mask, numbers) ? t : maketree(VRCONV, t, nullptr, numbers, t->ls), zeros, mask,
                    t->ls);
}

bool is_integral(const NODE* t) { return t->type->is_int() || t->type->is_enum(); }
bool is_scalar_number(const NODE* t) { return t->type->is_scalar() && !t->type->is_float() && !t->type->is_complex(); }

// `t != 0` says what t says. So does a cast that only widens, a cast between pointers, and what only moves or changes
// the sign of a value.
NODE* without_idle_layers(NODE* t) {
    for (;;) {
        const bool is_test = t->op == NEQ && is_icon(t->right, INT65(0)) && is_scalar_number(t->left);
        const bool widens = t->op == SCONV && is_integral(t) && is_integral(t->left) &&
                            (t->left->type->size <= t->type->size || t->type->is_bool()) &&
                            !is_bitfield_access(t->left);
        const bool is_pointer_cast = (t->op == PCONV || t->op == ISP2CHAR) &&
                                     (t->left->type->is_pointer() || t->left->op == ICON) &&
                                     t->left->type->size <= t->type->size;
        const bool keeps_zero = (t->op == UMINUS || t->op == ABS) && is_integer(t->type) && operand_has_type(t);
        if (!is_test && !widens && !is_pointer_cast && !keeps_zero) return t;
        if (t->right) erase_tree(t->right);
        t = take_left(t);
    }
}

NODE* constant_truth(NODE* t, bool value) {
    NODE* effects = peel_for_effect(t);
    return in_sequence(effects, mk_ICON(INT65(value ? 1 : 0), tp->int_t));
}

bool all_bits_are_zero(const NODE* t) { return is_integral(t) && find_known_zeros(t, t->type) == type_mask(t->type); }

// ---- Rules of the control form
NODE* known_truth(NODE* t, struct LOOP* loop) {
    if (t->op == ICON) {
        NODE* truth = mk_ICON(INT65(t->u.lval.is_zero() ? 0 : 1), tp->int_t);
        truth->ls = t->ls;
        erase_tree(t);
        return truth;
    }
    if (t->type->is_pointer()) return pointer_contains_adcon_term(t) ? constant_truth(t, true) : nullptr;
    if (!is_integral(t)) return nullptr;
    if (all_bits_are_zero(t)) return constant_truth(t, false);
    if (!find_known_ones(t, t->type).is_zero() || tree_is_non_zero(t, loop)) return constant_truth(t, true);
    return nullptr;
}

// x % 2^k is zero where the low k bits are, whatever the sign.
NODE* mask_for_MOD(NODE* t, struct LOOP* loop) {
    if (!is_node_with_icon(t, MOD) || log2_of(t->right) < 0) return nullptr;
    t->op = ANDB;
    set_icon(t->right, t->right->u.lval - INT65(1));
    return simp_for_control(simp_node(t, loop), loop);
}

// The bits of `mask`, where the shift has them, as they lie in its operand.
NODE* test_of_bits(NODE* shift, uint64_t mask, struct LOOP* loop) {
    TYPE* type = shift->type->stqs();
    NODE *x = shift->left, *c = mk_ICON(INT65(0), type);
    set_icon(c, INT65(0, mask << shift_count_of(shift)));
    erase_node(shift->right);
    erase_node(shift);
    return without_idle_layers(made(ANDB, x, c, type, loop));
}

// (x >> n) & c, also with a narrowing cast between, and x >> (width - 1), look at some bits of x.
NODE* mask_for_shift(NODE* t, struct LOOP* loop) {
    if (t->op == SRL) {
        const int n = shift_count_of(t);
        return n && n == static_cast<int>(t->type->size) - 1 ? test_of_bits(t, 1, loop) : nullptr;
    }
    if (!is_node_with_icon(t, ANDB)) return nullptr;
    NODE* shift = t->left;
    if (shift->op == SCONV && is_integer(shift->left->type)) shift = shift->left;
    const int n = shift->op == SRL ? shift_count_of(shift) : 0;
    const uint64_t c = bits_of(t->right), room = mask_of(shift->type) >> n;
    if (!n || (c & ~room) != 0) return nullptr;
    if ((c << n) >> SHORT_MASK && promoted_type(shift->type)->size > SHORT_MASK) return nullptr;
    if (shift != t->left) erase_node(t->left);
    erase_node(t->right);
    erase_node(t);
    return test_of_bits(shift, c, loop);
}

// (x ^ m) & p with the single bit p inside m: (x & p) ^ p.
NODE* flip_tested_bit(NODE* t, struct LOOP* loop) {
    if (!is_node_with_icon(t, ANDB) || !is_node_with_icon(t->left, XORB)) return nullptr;
    const uint64_t p = bits_of(t->right), m = bits_of(t->left->right);
    if (power_of_2(INT65(0, p)) < 0 || !(m & p)) return nullptr;
    NODE* flip = t->left;
    set_icon(flip->right, t->right->u.lval);
    t->left = flip->left;
    flip->left = simp_node(t, loop);
    return simp_node(flip, loop);
}

// x - y and x ^ y are zero where x and y are equal.
NODE* compare_for_difference(NODE* t, struct LOOP* loop) {
    if (!is_node(t, MINUS) && !is_node(t, XORB)) return nullptr;
    if (is_node_with_icon(t, XORB) && is_node_with_icon(t->left, ANDB) && bits_of(t->left->right) == bits_of(t->right))
        return nullptr; // a tested bit that is flipped
    t->op = NEQ;
    t->type = tp->int_t;
    return simp_for_control(simp_node(t, loop), loop);
}

// c ? 1 : 0 and c ? 0 : 1 of any constants that differ in truth
NODE* truth_of_arms(NODE* t, struct LOOP* loop) {
    if (t->op != QUEST || t->right->op != COLON) return nullptr;
    NODE *a = t->right->left, *b = t->right->right;
    if (!is_icon(a) || !is_icon(b) || a->u.lval.is_zero() == b->u.lval.is_zero()) return nullptr;
    const bool straight = !a->u.lval.is_zero();
    erase_tree(t->right);
    NODE* condition = simp_for_control(take_left(t), loop);
    return straight ? condition : simp_node(invert_boolean_tree(condition), loop);
}

// What is done before the condition has no part in it.
NODE* truth_behind_effects(NODE* t, struct LOOP* loop) {
    if (t->op != COMMAOP) return nullptr;
    t->right = simp_for_control(t->right, loop);
    t->type = t->right->type;
    return t;
}

// x * c is zero where x is, for an odd c or where nothing wraps.
NODE* truth_of_factor(NODE* t, struct LOOP* loop) {
    if (!is_node_with_icon(t, MULT) || t->right->u.lval.is_zero()) return nullptr;
    if ((t->right->u.lval & INT65(1)).is_zero() && expr_product_may_overflow(t, loop)) return nullptr;
    erase_node(t->right);
    return simp_for_control(take_left(t), loop);
}

const RULE control_rules[] = {known_truth,          mask_for_MOD,           mask_for_shift,
                              flip_tested_bit,      compare_for_difference, truth_of_arms,
                              truth_behind_effects, truth_of_factor};

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
    if (returns_1_or_0(t)) return coerced(tp->int_t, t, loop);
    return compare_with_zero(t, NEQ, FNEQN, loop);
}

NODE* invert_boolean_tree(NODE* t) {
    bool is_test = t->op == EQ && is_icon(t->right, INT65(0)) && !t->left->type->is_pointer();
    if (is_test && returns_1_or_0(t->left)) {
        erase_node(t->right);
        return coerce_to_type(tp->int_t, take_left(t));
    }
    if (tree_is_trivially_invertible(t)) {
        t->op = boolean_inv[t->op];
        return t;
    }
    if (t->type->is_vector()) return compare_mask_with_zero(t);
    const TYPE* etype = t->type;
    OPT_ASSERT(TYPE_IS_SCALAR(etype));
    return compare_with_zero(t, EQ, FEQ, nullptr);
}

NODE* simp_for_control(NODE* t, struct LOOP* loop) {
    t = without_idle_layers(t);
    for (RULE rule : control_rules)
        if (NODE* r = rule(t, loop)) return r;
    // A chain was simplified as it was built; to walk it again from each of its nodes would be quadratic.
    const bool is_chain = t->op == OROR || t->op == ANDAND || t->op == QUEST || t->op == COMMAOP;
    return is_chain ? t : simp_node(t, loop);
}

NODE* simp_EXCLAIM(NODE* t, struct LOOP* loop) {
    if (!t->left->type->is_scalar() || t->left->type->is_complex()) return t;
    TYPE* type = t->type;
    NODE* inverse = invert_boolean_tree(simp_for_control(take_left(t), loop));
    return coerce_to_type(type, simp_node(inverse, loop));
}
