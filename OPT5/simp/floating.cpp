// Floating point. A rewrite here gives the same number in every case: signs of zeros, infinities, rounding and NaNs
// too. Without `strict_fp` a division by any constant is a multiplication by its rounded reciprocal.

#include "OPT5/ir/global.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/fold.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

using namespace rules;

namespace {

constexpr uint16_t INFINITE_EXPONENT = 32767;

bool is_fcon(const NODE* t) { return is_constant(t, FCON); }
bool is_fcon(const NODE* t, const simul_fval& v) { return is_fcon(t) && f_bit_eq(FCON_value_of_fp_constant(t), &v); }
bool is_float_operand(const NODE* t, const TYPE* type) { return t->type->is_float() && t->type->size == type->size; }
bool operands_are(const NODE* t) { return is_float_operand(t->left, t->type) && is_float_operand(t->right, t->type); }
bool is_negation(const NODE* t, const TYPE* type) {
    return t->op == UMINUS && is_float_operand(t, type) && is_float_operand(t->left, type);
}

NODE* number(const simul_fval& v, const NODE* like) {
    NODE* t = new_node(FCON, like->type->stqs());
    t->u.fval = new simul_fval(v);
    t->ls = like->ls;
    return t;
}

bool is_power_of_2(const simul_fval& x) {
    int bits = 0;
    for (uint16_t word : x.mant) bits += __builtin_popcount(word);
    return bits == 1 && !f_is_nan(&x) && !f_is_inf(&x) && !f_is_zero(&x);
}

// 1 / c as the target has it; false where it is no ordinary number.
bool reciprocal(const simul_fval& c, TYPE* type, simul_fval* r) {
    if (f_is_zero(&c) || f_is_nan(&c) || f_is_inf(&c)) return false;
    fp_error = 0;
    f_div(&one, &c, r);
    truncate_fval_to_target(r, type);
    if (fp_error || f_is_nan(r) || f_is_inf(r) || f_is_zero(r)) return false;
    const int least_exponent = type->size > 32 ? -1022 : -126;
    if (f_findexp(r) < least_exponent) return false;
    if (!strict_fp) return true;
    simul_fval product;
    f_mul(&c, r, &product);
    return !fp_error && f_eq(&product, &one) && is_power_of_2(c);
}

// -x * -y and -x / -y are exact without the signs.
bool drop_two_negations(NODE* t) {
    if (!is_negation(t->left, t->type) || !is_negation(t->right, t->type)) return false;
    t->left = take_left(t->left);
    t->right = take_left(t->right);
    return true;
}

} // namespace

NODE* simp_float_MULT(NODE* t, struct LOOP* loop) {
    if (operands_are(t) && drop_two_negations(t)) return simp_node(t, loop);
    if (!is_fcon(t->right) || !operands_are(t)) return t;
    const simul_fval& c = *FCON_value_of_fp_constant(t->right);
    if (f_is_nan(&c)) {
        NODE* constant = t->right;
        return mk_COMMAOP(peel_for_effect(take_left(t)), constant);
    }
    if (is_fcon(t->right, one)) return only_left(t);
    if (is_fcon(t->right, neg_one)) {
        erase_tree(t->right);
        return simp_node(to_unary(t, UMINUS, t->left), loop);
    }
    if (is_fcon(t->right, two) && !t->left->left && is_pure(t->left)) { // nothing is computed twice
        erase_tree(t->right);
        return simp_node(to_binary(t, PLUS, t->left, copy_tree(t->left)), loop);
    }
    return t;
}

NODE* simp_float_DIV(NODE* t, struct LOOP* loop) {
    if (operands_are(t) && drop_two_negations(t)) return simp_node(t, loop);
    if (t->right->op != FCON || !operands_are(t)) return t;
    simul_fval r;
    if (!reciprocal(*t->right->u.fval, t->type, &r)) return t;
    NODE* factor = number(r, t->right);
    erase_tree(t->right);
    t->right = factor;
    t->op = MULT;
    return simp_node(t, loop);
}

// x + -y, x - -y, -x + y, x - 0.0, x + -0.0, -0.0 - x. A zero of the other sign is not the neutral element.
NODE* simp_float_sum(NODE* t, struct LOOP* loop) {
    if (!operands_are(t)) return t;
    if (t->op == PLUS) order_operands(t);
    if (is_fcon(t->right, t->op == PLUS ? neg_zero : pos_zero)) return only_left(t);
    if (t->op == MINUS && is_fcon(t->left, neg_zero)) {
        erase_tree(t->left);
        return simp_node(to_unary(t, UMINUS, t->right), loop);
    }
    if (is_negation(t->right, t->type)) {
        t->op = t->op == PLUS ? MINUS : PLUS;
        t->right = take_left(t->right);
        return simp_node(t, loop);
    }
    if (t->op == PLUS && is_negation(t->left, t->type) && is_pure(t->left) && is_pure(t->right)) {
        NODE* x = take_left(t->left);
        return simp_node(to_binary(t, MINUS, t->right, x), loop);
    }
    return t;
}

NODE* simp_float_unary(NODE* t) {
    if (t->op != UMINUS || !is_negation(t->left, t->type)) return t;
    TYPE* type = t->type;
    return coerce_to_type(type, take_left(take_left(t)));
}

namespace {

// Whether the format has every number of the integer type.
bool holds_exactly(const TYPE* format, const TYPE* type) {
    const uint64_t digits = format->size > 32 ? 53 : 24;
    return is_integer(type) && type->size - (is_signed(type) ? 1 : 0) <= digits;
}

// -x rel -y and -x rel c: exact, with the sides exchanged.
bool compare_without_signs(NODE* t) {
    NODE *l = t->left, *r = t->right;
    if (!is_negation(l, l->type) || commute_inv[t->op] == ILLOP) return false;
    if (is_negation(r, l->type)) {
        t->right = take_left(r);
    } else {
        if (r->op != FCON || f_is_nan(r->u.fval)) return false;
        NODE* c = fold_constants(maketree(UMINUS, copy_tree(r), nullptr, r->type, r->ls));
        if (c->op != FCON) {
            erase_tree(c);
            return false;
        }
        erase_tree(r);
        t->right = c;
    }
    t->left = take_left(l);
    t->op = commute_inv[t->op];
    return true;
}

// The compare of integers that an ordered compare of two converted ones is, or ILLOP. Neither is a NaN.
int integer_relop(int op, const TYPE* type) {
    const int outcomes = float_op_to_micro_ops[op - FEQ] & 7; // equal, less, greater
    const bool is_unsigned = type->is_unsigned();
    switch (outcomes) {
    case 1: return EQ;
    case 6: return NEQ;
    case 2: return is_unsigned ? ULT : LT;
    case 3: return is_unsigned ? ULE : LE;
    case 4: return is_unsigned ? UGT : GT;
    case 5: return is_unsigned ? UGE : GE;
    default: return ILLOP;
    }
}

bool is_exact_conversion(const NODE* t) {
    return t->op == SCONV && t->type->is_float() && holds_exactly(t->type, t->left->type) &&
           t->left->type->size >= tp->int_t->size && !is_bitfield_access(t->left);
}

// The integer type that holds the values of both, or null.
TYPE* type_of_both(TYPE* a, TYPE* b) {
    if (same_integers(a, b)) return a->stqs();
    TYPE *wide = a->size > b->size ? a : b, *narrow = wide == a ? b : a;
    if (wide->size == narrow->size) wide = wide->size < tp->long_t->size ? tp->long_t : tp->llong_t;
    const bool fits = wide->size > narrow->size && (is_signed(wide) || !is_signed(narrow));
    if (fits) return wide->stqs();
    return wide->size < tp->llong_t->size ? tp->llong_t : nullptr;
}

// The integers next to a number, which are one where it is an integer.
struct NEIGHBOURS {
    INT65 below, above;
};

// False for what is no number, or beyond 63 bits.
bool neighbours(const NODE* number, NEIGHBOURS* n) {
    const simul_fval& v = *number->u.fval;
    if (f_is_nan(&v) || f_is_inf(&v)) return false;
    NODE* c = fold_constants(maketree(SCONV, copy_tree(number), nullptr, tp->llong_t, number->ls)); // toward zero
    NODE* back = fold_constants(maketree(SCONV, copy_tree(c), nullptr, number->type, number->ls));
    const bool is_known = c->op == ICON && back->op == FCON;
    if (is_known) {
        n->below = n->above = c->u.lval;
        if (f_lt(back->u.fval, &v)) n->above = n->above + INT65(1);
        if (f_lt(&v, back->u.fval)) n->below = n->below - INT65(1);
    }
    erase_tree(c);
    erase_tree(back);
    return is_known;
}

// x rel c: the relation to an integer next to c, or decided.
NODE* compare_with_number(NODE* t, int op, NEIGHBOURS n, TYPE* type, struct LOOP* loop) {
    const bool is_above = n.below >= int_type_max(type) && n.above > int_type_max(type),
               is_below = n.above <= int_type_min(type) && n.below < int_type_min(type), between = n.below != n.above;
    const bool less = op == LT || op == ULT || op == LE || op == ULE;
    if (op == EQ || op == NEQ) {
        if (between || is_above || is_below) return constant_for(t, INT65(op == NEQ ? 1 : 0));
    } else if (is_above || is_below) {
        return constant_for(t, INT65(less == is_above ? 1 : 0));
    }
    const bool upward = op == LT || op == GE || op == ULT || op == UGE;
    erase_tree(t->right);
    t->right = mk_ICON(upward ? n.above : n.below, type);
    t->left = take_left(t->left);
    t->op = op;
    return simp_node(t, loop);
}

// (float)x rel (float)y and (float)x rel c of integers that the format has: compared as integers.
NODE* compare_as_integers(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (!is_exact_conversion(l)) return nullptr;
    TYPE* type = l->left->type->stqs();
    if (r->op == FCON) {
        NEIGHBOURS n;
        const int op = integer_relop(t->op, type);
        return op != ILLOP && neighbours(r, &n) ? compare_with_number(t, op, n, type, loop) : nullptr;
    }
    if (!is_exact_conversion(r) || r->type->size != l->type->size) return nullptr;
    type = type_of_both(type, r->left->type);
    const int op = type ? integer_relop(t->op, type) : ILLOP;
    if (op == ILLOP) return nullptr;
    t->left = coerced(type, take_left(l), loop);
    t->right = coerced(type, take_left(r), loop);
    t->op = op;
    return simp_node(t, loop);
}

bool widens(const NODE* n) {
    return n->op == SCONV && n->type->is_float() && n->left->type->is_float() && n->left->type->size < n->type->size;
}

// The number in a shorter format that has it as an ordinary one; else null.
NODE* short_constant(const NODE* number, TYPE* narrow) {
    simul_fval v = *number->u.fval;
    fp_error = 0;
    truncate_fval_to_target(&v, narrow);
    if (fp_error || f_is_nan(&v) || !f_bit_eq(&v, number->u.fval)) return nullptr;
    if (!f_is_zero(&v) && !f_is_inf(&v) && f_findexp(&v) < -126) return nullptr;
    NODE* c = new_node(FCON, narrow);
    c->u.fval = new simul_fval(v);
    c->ls = number->ls;
    return c;
}

} // namespace

// (double)x rel (double)y and (double)x rel c of an x that is float, with a c that is one.
NODE* simp_float_relop(NODE* t, struct LOOP* loop) {
    if (compare_without_signs(t)) return simp_node(t, loop);
    if (NODE* r = compare_as_integers(t, loop)) return r;
    NODE *l = t->left, *r = t->right;
    if (!widens(l)) return t;
    TYPE* narrow = l->left->type->stqs();
    if (r->op == FCON && r->type->is_float()) {
        NODE* c = short_constant(r, narrow);
        if (!c) return t;
        erase_tree(r);
        t->right = c;
    } else if (widens(r) && is_float_operand(r->left, narrow)) {
        t->right = take_left(r);
    } else {
        return t;
    }
    t->left = take_left(l);
    return simp_node(t, loop);
}

NODE* simp_ABS(NODE* t, struct LOOP* loop) {
    NODE* x = t->left;
    const bool is_float = t->type->is_float() && is_float_operand(x, t->type);
    if (!is_float && !operand_has_type(t)) return t;
    TYPE* type = t->type;
    const bool same = is_float ? (x->op == ABS || x->op == UMINUS) && is_float_operand(x->left, type)
                               : is_unary(x, ABS) || (is_unary(x, UMINUS) && is_signed(type));
    if (same && x->op == ABS) return coerce_to_type(type, take_left(t));
    if (same) {
        t->left = take_left(x);
        return simp_node(t, loop);
    }
    if (is_float) return t;
    if (tree_is_non_negative(x, loop)) return coerce_to_type(type, take_left(t));
    if (tree_is_negative(x, loop)) return kept_exact(to_unary(t, UMINUS, x), loop);
    return t;
}

// The sign of what is squared does not count.
NODE* simp_SQR(NODE* t, struct LOOP* loop) {
    NODE* x = t->left;
    if (x->op != UMINUS && x->op != ABS) return t;
    const bool fits = t->type->is_float() ? is_float_operand(x, t->type) && is_float_operand(x->left, t->type)
                                          : operand_has_type(t) && operand_has_type(x);
    if (!fits) return t;
    t->left = take_left(x);
    return simp_node(t, loop);
}

// 1 / -x is -(1 / x).
NODE* simp_RECIP(NODE* t, struct LOOP* loop) {
    if (!t->type->is_float() || !is_negation(t->left, t->type)) return t;
    t->left = take_left(t->left);
    TYPE* type = t->type;
    return made(UMINUS, simp_node(t, loop), nullptr, type, loop);
}

// (float)((double)x op (double)y) of floats and short constants: the wider format has more than twice the digits, so
// that its result is exact or rounds to what the short one gives.
NODE* compute_in_short_format(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    TYPE *narrow = t->type->stqs(), *wide = inner->type;
    if (!narrow->is_float() || !wide->is_float() || narrow->size != 32 || wide->size != 64) return nullptr;
    const bool two = inner->op == PLUS || inner->op == MINUS || inner->op == MULT;
    if (!two && inner->op != UMINUS && inner->op != ABS) return nullptr;
    auto fits = [&](const NODE* n) { return widens(n) && n->type->size == wide->size && n->left->type->size == 32; };
    if (!fits(inner->left)) return nullptr;
    NODE* c = two && inner->right->op == FCON ? short_constant(inner->right, narrow) : nullptr;
    if (two && !c && !fits(inner->right)) return nullptr;
    inner->left = take_left(inner->left);
    if (c) erase_tree(inner->right);
    if (two) inner->right = c ? c : take_left(inner->right);
    inner->type = narrow;
    erase_node(t);
    return simp_node(inner, loop);
}
