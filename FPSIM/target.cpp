// The target's formats: IEEE single and double precision, as bits.
#include "FPSIM/fpsim_impl.h"
#include "TYPES/type.h"

#include <cmath>

namespace {
struct FORMAT {
    int mant_bits; // with the leading one
    int bias;
    uint64_t infinity;
    uint64_t sign_bit;
};
const FORMAT single_format = {24, 127, 0x7F800000u, 0x80000000u};
const FORMAT double_format = {53, 1023, uint64_t{0x7FF} << 52, uint64_t{1} << 63};
} // namespace

// Rounds to nearest, ties to even, in one step for normal and subnormal results.
static int encode(const simul_fval* x, const FORMAT& f, uint64_t* bits) {
    uint64_t sign = x->sign ? f.sign_bit : 0;
    if (f_is_zero(x)) {
        *bits = sign;
        return 0;
    }
    if (is_special(x)) {
        *bits = sign | f.infinity | (f_is_nan(x) ? uint64_t{1} << (f.mant_bits - 2) : 0);
        return 0;
    }
    UWIDE m = digits_of(x);
    int top = x->exp - 97 + bit_length(m); // 2^top <= |x| < 2^(top + 1)
    int least = 1 - f.bias;
    int field = top < least ? 0 : top - least;
    int unit = (top < least ? least : top) - (f.mant_bits - 1); // weight of the candidate's last bit
    int shift = unit - (x->exp - 96);
    uint64_t candidate = 0;
    if (shift <= 0) {
        candidate = static_cast<uint64_t>(m << -shift);
    } else if (shift <= 97) {
        candidate = static_cast<uint64_t>(m >> shift);
        bool guard = m >> (shift - 1) & 1;
        bool sticky = (m & ((UWIDE{1} << (shift - 1)) - 1)) != 0;
        candidate += guard && (sticky || (candidate & 1));
    }
    // The leading one of a normal candidate adds 1 to the exponent field, and so does a carry out of the fraction.
    uint64_t magnitude =
        field > 2 * f.bias ? f.infinity : (static_cast<uint64_t>(field) << (f.mant_bits - 1)) + candidate;
    if (magnitude >= f.infinity) {
        *bits = sign | f.infinity;
        return fp_mark(FPE_OVER);
    }
    *bits = sign | magnitude;
    return 0;
}

static int decode(uint64_t bits, const FORMAT& f, simul_fval* x) {
    int sign = (bits & f.sign_bit) != 0;
    uint64_t magnitude = bits & (f.sign_bit - 1);
    if (magnitude == f.infinity) return set_inf(x, sign);
    if (magnitude > f.infinity) {
        *x = a_nan;
        return 0;
    }
    uint64_t hidden = uint64_t{1} << (f.mant_bits - 1);
    uint64_t fraction = magnitude & (hidden - 1);
    int field = static_cast<int>(magnitude >> (f.mant_bits - 1));
    if (field) fraction |= hidden;
    return pack(x, sign, fraction, (field ? field : 1) - f.bias - (f.mant_bits - 1), false);
}

int ieee_cvt_ftos(uint32_t bits, simul_fval* x) { return decode(bits, single_format, x); }
int ieee_cvt_dtos(uint32_t hi, uint32_t lo, simul_fval* x) {
    return decode(static_cast<uint64_t>(hi) << 32 | lo, double_format, x);
}

int ieee_cvt_stof(const simul_fval* x, uint32_t* bits) {
    uint64_t wide;
    int result = encode(x, single_format, &wide);
    *bits = static_cast<uint32_t>(wide);
    return result;
}

int ieee_cvt_stod(const simul_fval* x, uint32_t* hi, uint32_t* lo) {
    uint64_t wide;
    int result = encode(x, double_format, &wide);
    *hi = static_cast<uint32_t>(wide >> 32);
    *lo = static_cast<uint32_t>(wide);
    return result;
}

int f_cvt_stot(const simul_fval* x, trg_fval* t, int is_double) {
    if (is_double) return ieee_cvt_stod(x, &t->w[0], &t->w[1]);
    t->w[1] = 0;
    return ieee_cvt_stof(x, &t->w[0]);
}

int f_cvt_ttos(const trg_fval* t, simul_fval* x, int is_double) {
    return is_double ? ieee_cvt_dtos(t->w[0], t->w[1], x) : ieee_cvt_ftos(t->w[0], x);
}

uint32_t get_ieee_flt_fmt(const simul_fval* x) {
    uint32_t bits;
    ieee_cvt_stof(x, &bits);
    return bits;
}

uint64_t get_ieee_dbl_fmt(const simul_fval* x) {
    uint64_t bits;
    encode(x, double_format, &bits);
    return bits;
}

int truncate_fval_to_target(simul_fval* x, const TYPE* type) {
    const TYPE* t = type->real;
    if (t->is_vector()) t = t->raw_elem_type()->real;
    if (t->is_complex()) t = t->part_type()->real;
    trg_fval target;
    int result = f_cvt_stot(x, &target, t->size != 32);
    f_cvt_ttos(&target, x, t->size != 32);
    return result;
}

int f_ftoh(const simul_fval* x, double* out) {
    uint64_t bits;
    int result = encode(x, double_format, &bits);
    uint64_t magnitude = bits & (double_format.sign_bit - 1);
    double v;
    if (magnitude > double_format.infinity)
        v = NAN;
    else if (magnitude == double_format.infinity)
        v = HUGE_VAL;
    else
        __builtin_memcpy(&v, &magnitude, sizeof v);
    *out = x->sign ? -v : v;
    return result;
}
