// Operators on bits: and, or, exclusive or, complement.
//
// Canonical forms: a constant outermost and on the right; complements outermost; a common operand or shift of both
// sides taken out; casts that only widen outside. What the bits decide is decided.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/compare.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

using namespace rules;

namespace {

bool is_bit_op(int op) { return op == ANDB || op == ORB || op == XORB; }

INT65 combined(int op, INT65 a, INT65 b) { return op == ANDB ? a & b : op == ORB ? a | b : a ^ b; }

// ---- Constants
NODE* join_constants(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_node_with_icon(inner, t->op)) return nullptr;
    if (is_icon(t->right)) {
        set_icon(t->right, combined(t->op, inner->right->u.lval, t->right->u.lval));
        erase_node(inner->right);
        t->left = take_left(inner);
        return simp_node(t, loop);
    }
    std::swap(t->right, inner->right); // (x op c) op y: the constant moves outward
    t->left = simp_node(inner, loop);
    return simp_node(t, loop);
}

NODE* constant_of_right_operand_outward(NODE* t, struct LOOP* loop) {
    NODE* inner = t->right;
    if (is_icon(t->left) || !is_node_with_icon(inner, t->op)) return nullptr;
    NODE* c = inner->right;
    t->right = take_left(inner);
    TYPE* type = t->type;
    const int op = t->op;
    return made(op, simp_node(t, loop), c, type, loop);
}

NODE* trivial_constant(NODE* t, struct LOOP* loop) {
    if (!is_icon(t->right)) return nullptr;
    const bool zero = is_icon(t->right, INT65(0)), ones = is_all_ones(t->right);
    if (t->op == ANDB && zero) return constant_for(t, INT65(0));
    if (t->op == ORB && ones) return constant_for(t, INT65(-1));
    if (t->op == ANDB ? ones : zero) return only_left(t);
    if (t->op != XORB || !ones) return nullptr;
    erase_node(t->right);
    return simp_node(to_unary(t, NOTB, t->left), loop);
}

// Bits that the constant decides do not count below it; bits that are known need no constant.
NODE* constant_against_known_bits(NODE* t, struct LOOP* loop) {
    if (!is_icon(t->right) || t->op == XORB) return nullptr;
    const uint64_t mask = mask_of(t->type), c = bits_of(t->right);
    const KNOWN_BITS k = known_bits(t->left);
    if (t->op == ANDB ? ((k.zeros | c) & mask) == mask : (c & ~k.ones) == 0) return only_left(t);
    return narrow_to_mask(&t->left, t->op == ANDB ? c : mask & ~c) ? simp_node(t, loop) : nullptr;
}

// The terms of a chain of ors: one is masked by a constant, the others lie inside of `c` or are constants.
bool one_term_is_masked(const NODE* t, uint64_t c, int* masked, int* terms) {
    if (is_node(t, ORB)) {
        return one_term_is_masked(t->left, c, masked, terms) && one_term_is_masked(t->right, c, masked, terms);
    }
    constexpr int MOST_TERMS = 8;
    if (++*terms > MOST_TERMS) return false;
    if (is_icon(t) || ((known_bits(t).zeros | c) & mask_of(t->type)) == mask_of(t->type)) return true;
    return is_node_with_icon(t, ANDB) && ++*masked == 1;
}

NODE* masked_terms(NODE* t, uint64_t c, struct LOOP* loop) {
    if (is_node(t, ORB)) {
        t->left = masked_terms(t->left, c, loop);
        t->right = masked_terms(t->right, c, loop);
        return simp_node(t, loop);
    }
    if (is_icon(t)) {
        set_icon(t, t->u.lval & INT65(0, c));
        return t;
    }
    if (((known_bits(t).zeros | c) & mask_of(t->type)) == mask_of(t->type)) return t;
    set_icon(t->right, t->right->u.lval & INT65(0, c));
    return simp_node(t, loop);
}

// ((x & c1) | y) & c2 with y inside of c2: the mask joins the one below. So fields of a word are set in turn.
NODE* mask_into_or(NODE* t, struct LOOP* loop) {
    if (t->op != ANDB || !is_icon(t->right) || !is_node(t->left, ORB) || !operands_have_type(t->left)) return nullptr;
    const uint64_t c = bits_of(t->right);
    int masked = 0, terms = 0;
    if (!one_term_is_masked(t->left, c, &masked, &terms) || masked != 1) return nullptr;
    erase_node(t->right);
    return masked_terms(take_left(t), c, loop);
}

NODE* meet_itself(NODE* t, struct LOOP*) {
    if (!same_value(t->left, t->right)) return nullptr;
    return t->op == XORB ? constant_for(t, INT65(0)) : only_left(t);
}

// (x & y) op (x & z) is x & (y op z), and for | and & exchanged.
NODE* factor_out(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (l->op != r->op || (l->op != ANDB && l->op != ORB) || l->op == t->op || !operands_have_type(l) ||
        !operands_have_type(r))
        return nullptr;
    if ((l->op == ORB && t->op != ANDB) || !is_pure(l) || !is_pure(r)) return nullptr;
    for (int side = 0; side < 4; ++side) {
        NODE *&a = side & 1 ? l->right : l->left, *&b = side & 2 ? r->right : r->left;
        if (is_icon(a) != is_icon(b) || !same_value(a, b)) continue;
        NODE *common = a, *x = side & 1 ? l->left : l->right, *y = side & 2 ? r->left : r->right;
        const int outer = l->op;
        erase_tree(b);
        erase_node(l);
        erase_node(r);
        NODE* inner = made(t->op, x, y, t->type, loop);
        return simp_node(to_binary(t, outer, common, inner), loop);
    }
    return nullptr;
}

// (x << n) op (y << n) is (x op y) << n, and for right shifts.
NODE* common_shift_outward(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    const int n = shift_count_of(l);
    if (!n || l->op != r->op || shift_count_of(r) != n) return nullptr;
    t->left = l->left;
    t->right = take_left(r);
    l->left = simp_node(t, loop);
    return simp_node(l, loop);
}

// (T)x op (T)y, and (T)x op c: the operator is as well applied to what is cast, with a constant that it has the bits
// of.
NODE* cast_outward(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (l->op != SCONV || !is_integer(l->left->type) || is_bitfield_access(l->left)) return nullptr;
    TYPE *from = l->left->type->stqs(), *type = t->type;
    if (from->size < tp->int_t->size || from->size > type->size) return nullptr;
    if (is_icon(r)) {
        const bool same_bits = from->size == type->size;
        const uint64_t below = is_signed(from) ? mask_of(from) >> 1 : mask_of(from);
        if (!same_bits && (t->op != ANDB || (bits_of(r) & ~below) != 0)) return nullptr;
        r->type = from;
        set_icon(r, r->u.lval);
    } else if (r->op == SCONV && same_integers(r->left->type, from) && !is_bitfield_access(r->left)) {
        r = take_left(r);
    } else {
        return nullptr;
    }
    l->left = made(t->op, l->left, r, from, loop);
    erase_node(t);
    return coerce_to_type(type, simp_node(l, loop));
}

// A compare under ^ 1 is the opposite compare.
NODE* invert_compare(NODE* t, struct LOOP* loop) {
    if (t->op != XORB || !is_icon(t->right, INT65(1)) || !tree_is_trivially_invertible(t->left) ||
        t->left->op == EXCLAIM)
        return nullptr;
    TYPE* type = t->type;
    erase_node(t->right);
    return coerce_to_type(type, simp_node(invert_boolean_tree(take_left(t)), loop));
}

const RULE bit_rules[] = {trivial_constant,
                          join_constants,
                          constant_of_right_operand_outward,
                          mask_into_or,
                          constant_against_known_bits,
                          meet_itself,
                          by_pattern,
                          invert_compare,
                          factor_out,
                          common_shift_outward,
                          cast_outward,
                          join_compares};

// ---- Unary operators
// -(x < 0) is x >> (width - 1).
NODE* negated_sign_test(NODE* t, struct LOOP* loop) {
    NODE* test = t->left->op == SCONV ? t->left->left : t->left;
    if (test->op != LT || !is_icon(test->right, INT65(0)) || !same_integers(test->left->type, test->right->type) ||
        !is_signed(test->left->type) || test->left->type->size < tp->int_t->size)
        return nullptr;
    TYPE *type = t->type->stqs(), *from = test->left->type->stqs();
    NODE* x = test->left;
    if (test != t->left) erase_node(t->left);
    erase_node(test->right);
    erase_node(test);
    erase_node(t);
    return coerced(type, made(SRL, x, mk_ICON(INT65(static_cast<long>(from->size) - 1), tp->int_t), from, loop), loop);
}

// ~(T)x is (T)~x.
NODE* complement_under_cast(NODE* t, struct LOOP* loop) {
    if (!is_equal_width_cast(t->left)) return nullptr;
    TYPE* type = t->type;
    NODE* x = take_left(take_left(t));
    TYPE* from = x->type->stqs();
    return coerced(type, made(NOTB, x, nullptr, from, loop), loop);
}

} // namespace

NODE* simp_bitop(NODE* t, struct LOOP* loop) {
    if (!operands_have_type(t)) return t;
    order_operands(t);
    t = first_that_applies(bit_rules, t, loop);
    return is_bit_op(t->op) ? simp_by_known_bits(t) : t;
}

NODE* simp_unary(NODE* t, struct LOOP* loop) {
    if (t->type->is_float()) return simp_float_unary(t);
    if (!operand_has_type(t)) return t;
    TYPE* type = t->type;
    if (is_unary(t->left, t->op)) {
        NODE* operand = take_left(take_left(t));
        return coerce_to_type(type, operand);
    }
    if (NODE* r = by_pattern(t, loop)) return r;
    if (NODE* r = t->op == UMINUS ? negated_sign_test(t, loop) : complement_under_cast(t, loop)) return r;
    return simp_by_known_bits(t);
}

NODE* simp_by_known_bits(NODE* t) {
    if (!is_integer(t->type) || is_icon(t) || lowest_bit_is_unknown(t)) return t;
    const KNOWN_BITS k = known_bits(t);
    if ((k.zeros | k.ones) != mask_of(t->type)) return t;
    return constant_for(t, truncate_to_type(INT65(0, k.ones), t->type));
}
