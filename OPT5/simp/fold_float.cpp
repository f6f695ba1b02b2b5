// Constant folding of floating point, through the simulator.
//
// The simulator computes with 81 bits or more and the target rounds to 24 or 53, to nearest even. Rounding twice gives
// another result than rounding once only where the first result lies on a tie of the second rounding, with bits lost
// behind it. Such results are not folded, nor are subnormal ones, where the place of the tie moves, nor what sets
// `fp_error`: the error then shows at run time as the target gives it.

#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/fold.h"

namespace {

constexpr int SIMULATOR_BITS = 81; // significant bits that every operation keeps

bool is_double(const TYPE* t) { return t->size > 32; }
int precision(const TYPE* t) { return is_double(t) ? 53 : 24; }
int least_exponent(const TYPE* t) { return is_double(t) ? -1022 : -126; }

// Significant bits from the highest to the lowest that is set, of a finite number other than 0.
int significant_bits(const simul_fval& x) {
    int first = -1, last = -1;
    for (int i = 0; i < 96; ++i)
        if (x.mant[i / 16] >> (15 - i % 16) & 1) {
            if (first < 0) first = i;
            last = i;
        }
    return last - first + 1;
}

bool is_number(const simul_fval& x) { return !f_is_nan(&x) && !f_is_inf(&x); }

// The operation's result as the target rounds it. False where that isn't certain.
bool round_to_target(simul_fval* r, bool is_exact, const TYPE* type) {
    if (fp_error) return false;
    if (!is_number(*r)) return true;
    if (f_is_zero(r)) return is_exact;
    if (f_findexp(r) < least_exponent(type)) return false;
    if (!is_exact && significant_bits(*r) == precision(type) + 1) return false;
    truncate_fval_to_target(r, type);
    return !fp_error;
}

// ---- Arithmetic. Each tells whether the simulator lost nothing.
bool sum_is_exact(const simul_fval& a, const simul_fval& b) {
    if (!is_number(a) || !is_number(b) || f_is_zero(&a) || f_is_zero(&b)) return true;
    int ea = f_findexp(&a), eb = f_findexp(&b);
    int high = (ea > eb ? ea : eb) + 1;
    int low_a = ea - significant_bits(a) + 1, low_b = eb - significant_bits(b) + 1;
    return high - (low_a < low_b ? low_a : low_b) < SIMULATOR_BITS;
}

bool product_is_exact(const simul_fval& a, const simul_fval& b) {
    if (!is_number(a) || !is_number(b) || f_is_zero(&a) || f_is_zero(&b)) return true;
    return significant_bits(a) + significant_bits(b) <= SIMULATOR_BITS;
}

// 0 + -0 is 0, and only -0 + -0 is -0.
bool add(const simul_fval& a, const simul_fval& b, simul_fval* r) {
    bool exact = sum_is_exact(a, b);
    if (f_is_zero(&a) && f_is_zero(&b)) {
        *r = a.sign && b.sign ? neg_zero : pos_zero;
        return true;
    }
    f_add(&a, &b, r);
    return exact;
}

void negate(const simul_fval& a, simul_fval* r) {
    *r = a;
    if (!f_is_nan(&a)) r->sign = !a.sign;
}

bool multiply(const simul_fval& a, const simul_fval& b, simul_fval* r) {
    bool exact = product_is_exact(a, b);
    f_mul(&a, &b, r);
    return exact;
}

// A quotient of two numbers of the target, and a root of one, never lies on a tie of its format; one that seems to is
// inexact.
bool divide(const simul_fval& a, const simul_fval& b, simul_fval* r) {
    f_div(&a, &b, r);
    return !is_number(a) || !is_number(b) || f_is_zero(&a);
}

bool binary(int op, const simul_fval& a, const simul_fval& b, simul_fval* r, bool* exact) {
    switch (op) {
    case PLUS: *exact = add(a, b, r); return true;
    case MINUS: {
        simul_fval minus_b;
        negate(b, &minus_b);
        *exact = add(a, minus_b, r);
        return true;
    }
    case MULT: *exact = multiply(a, b, r); return true;
    case DIV: *exact = divide(a, b, r); return true;
    default: return false;
    }
}

bool unary(int op, const simul_fval& a, const TYPE* type, simul_fval* r, bool* exact) {
    *exact = true;
    switch (op) {
    case UMINUS: negate(a, r); return true;
    case ABS:
        *r = a;
        if (!f_is_nan(&a)) r->sign = 0;
        return true;
    case SQR: *exact = multiply(a, a, r); return true;
    case SQRT:
        if (f_is_zero(&a)) {
            *r = a;
            return true;
        }
        f_sqrt(&a, r);
        *exact = !is_number(a);
        return true;
    case RECIP: { // where the reciprocal's reciprocal is the number again
        *exact = divide(one, a, r);
        simul_fval rounded = *r, back;
        if (!round_to_target(&rounded, *exact, type)) return false;
        bool back_is_exact = divide(one, rounded, &back);
        return round_to_target(&back, back_is_exact, type) && f_bit_eq(&back, &a);
    }
    default: return false;
    }
}

// ---- Comparison: the outcome as a bit of `float_op_to_micro_ops`
int outcome(const simul_fval& a, const simul_fval& b) {
    if (f_is_nan(&a) || f_is_nan(&b)) return 8;
    if (f_eq(&a, &b)) return 1;
    return f_lt(&a, &b) ? 2 : 4;
}

NODE* fold_comparison(NODE* t) {
    if (t->left->op != FCON || t->right->op != FCON || !op_is_float_compare(t->op)) return t;
    int accepted = float_op_to_micro_ops[t->op - FEQ];
    int o = outcome(*t->left->u.fval, *t->right->u.fval);
    // An ordered compare of a NaN is an invalid operation.
    if (fp_error || (o == 8 && !(accepted & 8) && t->op != FORD)) return t;
    return integer_in_place_of(t, INT65(accepted & o ? 1 : 0), t->type);
}

// ---- Casts
bool integer_to_float(INT65 v, simul_fval* r) {
    if (v.fits<int64_t>())
        f_itof(static_cast<long>(v.fits_in<int64_t>()), r);
    else if (v.fits<uint64_t>())
        f_utof(v.fits_in<uint64_t>(), r);
    else
        return false;
    return true;
}

NODE* float_to_integer(NODE* t) {
    const simul_fval& x = *t->left->u.fval;
    if (f_is_nan(&x) || f_is_inf(&x)) return t;
    if (t->type->is_bool()) return integer_in_place_of(t, INT65(f_is_zero(&x) ? 0 : 1), t->type);
    simul_fval whole;
    f_trunc(&x, &whole);
    INT65 v;
    bool is_negative = !f_is_zero(&whole) && whole.sign;
    simul_fval magnitude = whole;
    magnitude.sign = 0;
    if (!f_is_zero(&whole)) {
        unsigned long u = 0;
        if (f_findexp(&magnitude) > 63 || f_ftou(&magnitude, &u)) return t;
        v = is_negative ? -INT65(u) : INT65(u);
    }
    // A value that the type does not hold has no conversion.
    if (fp_error || truncate_to_type(v, t->type) != v) return t;
    return integer_in_place_of(t, v, t->type);
}

NODE* fold_cast(NODE* t) {
    if (t->left->op == FCON && (t->type->is_int() || t->type->is_enum())) return float_to_integer(t);
    if (!t->type->is_float()) return t;
    simul_fval r;
    if (t->left->op == FCON)
        r = *t->left->u.fval;
    else if (t->left->op != ICON || t->left->type->is_pointer() ||
             !integer_to_float(truncate_to_type(t->left->u.lval, t->left->type), &r))
        return t;
    return round_to_target(&r, true, t->type) ? float_in_place_of(t, r, t->type) : t;
}

} // namespace

NODE* fold_float_node(NODE* t) {
    fp_error = 0;
    if (t->op == SCONV) return fold_cast(t);
    if (boolean_result[t->op]) return t->right ? fold_comparison(t) : t;
    if (!t->type->is_float() || t->left->op != FCON || (t->right && t->right->op != FCON)) return t;
    simul_fval r;
    bool exact;
    bool known = t->right ? binary(t->op, *t->left->u.fval, *t->right->u.fval, &r, &exact)
                          : unary(t->op, *t->left->u.fval, t->type, &r, &exact);
    return known && round_to_target(&r, exact, t->type) ? float_in_place_of(t, r, t->type) : t;
}
