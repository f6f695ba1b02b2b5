// Compares of what a constant computes: a quotient, a remainder, a shift or a product, against a constant.
//
// What such a value is compared with says which operands it comes from: an interval for a quotient and a right shift,
// the low bits and the sign for a remainder of a power of two, one number for a product with an odd factor, which
// takes each value once as it wraps. The operator itself is removed.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/compare.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>

using namespace rules;

namespace {

using WIDE = __int128;

WIDE wide(INT65 v) { return v.is_negative() ? WIDE(v.value) - (WIDE(1) << 64) : WIDE(v.value); }
bool is_equality(int op) { return op == EQ || op == NEQ; }
bool is_op(int op, int signed_op) { return op == signed_op || op == signed_op + (ULE - LE); }

// The one operand of the left side, which the constant computes; the compare's constants are freed.
NODE* take_operand(NODE* t) {
    NODE* inner = t->left;
    erase_node(inner->right);
    erase_node(t->right);
    erase_node(t);
    return take_left(inner);
}

// ---- x / d rel c, x >> n rel c
struct PREIMAGE {
    WIDE least, greatest; // operands that give c
};

PREIMAGE of_quotient(WIDE c, WIDE d) { return {c > 0 ? c * d : (c - 1) * d + 1, c < 0 ? c * d : (c + 1) * d - 1}; }
PREIMAGE of_shift(WIDE c, int n) { return {c * (WIDE(1) << n), (c + 1) * (WIDE(1) << n) - 1}; }

NODE* compare_quotient(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right)) return nullptr;
    const WIDE c = wide(t->right->u.lval);
    const int n = inner->op == SRL ? shift_count_of(inner) : 0;
    PREIMAGE p;
    if (n)
        p = of_shift(c, n);
    else if (is_node_with_icon(inner, DIV) && inner->right->u.lval > INT65(1))
        p = of_quotient(c, wide(inner->right->u.lval));
    else
        return nullptr;
    const WIDE min = wide(int_type_min(inner->type)), max = wide(int_type_max(inner->type));
    if (p.greatest < min || p.least > max) return nullptr; // decided by the bounds
    WIDE low = min, high = max;
    const bool inside = t->op != NEQ;
    if (is_equality(t->op))
        low = std::max(p.least, min), high = std::min(p.greatest, max);
    else if (is_op(t->op, LE))
        high = std::min(p.greatest, max);
    else if (is_op(t->op, LT))
        high = std::min(p.least - 1, max);
    else if (is_op(t->op, GE))
        low = std::max(p.least, min);
    else
        low = std::max(p.greatest + 1, min);
    if (n && low > min && high < max) return nullptr; // a shift costs no more than a difference
    TYPE* type = t->type;
    auto to_INT65 = [](WIDE v) { return INT65(v < 0 ? -1 : 0, static_cast<uint64_t>(v)); };
    return coerce_to_type(type, compare_with_interval(take_operand(t), to_INT65(low), to_INT65(high), inside, loop));
}

// ---- x % 2^k rel c of a signed x: with the high bits cleared but for the sign, a number that is not negative is its
// remainder, and a negative one is below zero.
NODE* compare_remainder(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right) || !is_node_with_icon(inner, MOD) || !is_signed(inner->type)) return nullptr;
    TYPE* type = inner->type->stqs();
    const int k = log2_of(inner->right);
    const uint64_t sign = sign_bit(type), low = inner->right->u.lval.value - 1;
    if (k <= 0 || low >= sign) return nullptr;
    INT65 c = t->right->u.lval;
    int op = t->op;
    if (op == LT || op == GE) { // x % m < c is x % m <= c - 1
        op = op == LT ? LE : GT;
        c = c - INT65(1);
    }
    const bool below_zero = !is_equality(op) && c == INT65(-1); // x % m < 0, x % m >= 0
    if (c.is_negative() && !below_zero && !is_equality(op)) return nullptr;
    if (is_equality(op) && c.is_negative()) c = INT65(0, sign | (c.value & low));
    set_icon(inner->right, INT65(0, sign | low));
    inner->op = ANDB;
    NODE* masked = simp_node(inner, loop);
    TYPE* result = t->type;
    erase_node(t->right);
    erase_node(t);
    if (below_zero) { // beyond the sign alone
        TYPE* bits = tp->mk_unsigned(type);
        return coerce_to_type(result, made(op == LE ? UGT : ULE, coerced(bits, masked, loop),
                                           mk_ICON(INT65(0, sign), bits), tp->int_t, loop));
    }
    NODE* bound = mk_ICON(INT65(0), type);
    set_icon(bound, c);
    return coerce_to_type(result, made(op, masked, bound, tp->int_t, loop));
}

// ---- x * c1 == c2, x * c == y * c
uint64_t inverse_of_odd(uint64_t c) { // modulo 2^64: each step doubles the number of right bits
    uint64_t x = c;
    for (int i = 0; i < 5; ++i) x *= 2 - c * x;
    return x;
}

bool is_odd(const NODE* icon) { return (icon->u.lval.value & 1) != 0; }

NODE* compare_product(NODE* t, struct LOOP* loop) {
    NODE *inner = t->left, *r = t->right;
    if (!is_equality(t->op) || !is_node_with_icon(inner, MULT) || inner->right->u.lval.is_zero()) return nullptr;
    const INT65 factor = inner->right->u.lval;
    if (is_icon(r)) {
        if (is_odd(inner->right)) {
            set_icon(r, INT65(0, r->u.lval.value * inverse_of_odd(factor.value)));
        } else {
            if (expr_product_may_overflow(inner, loop)) return nullptr;
            if (!(r->u.lval % factor).is_zero()) return constant_for(t, INT65(t->op == NEQ ? 1 : 0));
            set_icon(r, r->u.lval / factor);
        }
    } else {
        if (!is_node_with_icon(r, MULT) || r->right->u.lval != factor) return nullptr;
        if (!is_odd(inner->right) && (expr_product_may_overflow(inner, loop) || expr_product_may_overflow(r, loop)))
            return nullptr;
        erase_node(r->right);
        t->right = take_left(r);
    }
    erase_node(inner->right);
    t->left = take_left(inner);
    return simp_node(t, loop);
}

// x * c rel 0 of a product that cannot wrap is the sign of c on x.
NODE* sign_of_product(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right, INT65(0)) || !is_node_with_icon(inner, MULT) || inner->right->u.lval.is_zero() ||
        expr_product_may_overflow(inner, loop))
        return nullptr;
    if (inner->right->u.lval.is_negative()) t->op = commute_inv[t->op];
    erase_node(inner->right);
    t->left = take_left(inner);
    return simp_node(t, loop);
}

} // namespace

NODE* compare_computed(NODE* t, struct LOOP* loop) {
    for (RULE rule : {compare_quotient, compare_remainder, compare_product, sign_of_product})
        if (NODE* r = rule(t, loop)) return r;
    return nullptr;
}

// ---- Intervals
NODE* compare_with_interval(NODE* x, INT65 low, INT65 high, bool inside, struct LOOP* loop) {
    TYPE* type = x->type->stqs();
    const INT65 min = int_type_min(type), max = int_type_max(type);
    auto decided = [&](bool value) { return mk_COMMAOP(peel_for_effect(x), mk_ICON(INT65(value ? 1 : 0), tp->int_t)); };
    if (low > high) return decided(!inside);
    if (low <= min && high >= max) return decided(inside);
    auto relop = [&](int op, NODE* l, INT65 c) {
        const bool unsigned_order = op >= LE && op <= GT && l->type->is_unsigned();
        return made(unsigned_order ? op + (ULE - LE) : op, l, mk_ICON(c, l->type->stqs()), tp->int_t, loop);
    };
    if (low == high) return relop(inside ? EQ : NEQ, x, low);
    // One end is the type's: next to zero the bound is zero, otherwise the first number of the upper part.
    if (low <= min || high >= max) {
        const bool below = low <= min, wanted_below = below == inside;
        const INT65 first_above = below ? high + INT65(1) : low;
        if (first_above == INT65(1)) return relop(wanted_below ? LE : GT, x, INT65(0));
        return relop(wanted_below ? LT : GE, x, first_above);
    }
    // Below `low` the difference wraps to the top.
    TYPE* wraps = type->is_unsigned() ? type : tp->mk_unsigned(type);
    NODE* from_low = made(MINUS, coerced(wraps, x, loop), mk_ICON(low, wraps), wraps, loop);
    return relop(inside ? LT : GE, from_low, high - low + INT65(1));
}
