// Integers, rounding to integers, and exponents.
#include "FPSIM/fpsim_impl.h"
#include "XINT/xint.h"

#include <climits>

// ---- From and to integers

int f_itof(long v, simul_fval* x) {
    return pack(x, v < 0, v < 0 ? -static_cast<unsigned long>(v) : static_cast<unsigned long>(v), 0, false);
}

int f_utof(unsigned long v, simul_fval* x) { return pack(x, 0, v, 0, false); }

// The magnitude of the integral part, false where it needs more than `bits` bits or the value is no number.
static bool integral_part(const simul_fval* x, int bits, UWIDE* v) {
    *v = 0;
    if (f_is_zero(x)) return true;
    UWIDE m = digits_of(x);
    if (is_special(x) || x->exp + bit_length(m) - 96 > bits) return false;
    int shift = 96 - x->exp;
    *v = shift < 0 ? m << -shift : shift > 127 ? 0 : m >> shift;
    return true;
}

int f_ftoi(const simul_fval* x, long* v) {
    UWIDE m;
    *v = 0;
    if (!integral_part(x, 64, &m)) return fp_mark(FPE_INVALID);
    if (m > static_cast<UWIDE>(LONG_MAX) + (x->sign ? 1 : 0)) return fp_mark(FPE_INVALID);
    *v = static_cast<long>(x->sign ? -static_cast<unsigned long>(m) : static_cast<unsigned long>(m));
    return 0;
}

int f_ftou(const simul_fval* x, unsigned long* v) {
    UWIDE m;
    *v = 0;
    if (!integral_part(x, 64, &m)) return fp_mark(FPE_INVALID);
    *v = x->sign ? -static_cast<unsigned long>(m) : static_cast<unsigned long>(m);
    return 0;
}

int f_int(const simul_fval* x, int* v) {
    long wide;
    *v = 0;
    if (f_ftoi(x, &wide) != 0) return -1;
    if (wide < INT_MIN || wide > INT_MAX) return fp_mark(FPE_INVALID);
    *v = static_cast<int>(wide);
    return 0;
}

int f_xtof(const uint8_t* bytes, simul_fval* x) {
    UWIDE v = 0;
    for (int i = 0; i < 16; ++i) v = v << 8 | bytes[i];
    bool minus = bytes[0] & 0x80;
    return pack(x, minus, minus ? -v : v, 0, false);
}

int f_ftox(const simul_fval* x, uint8_t* bytes) {
    UWIDE v;
    if (!integral_part(x, 127, &v)) {
        XI_asg(x->sign ? xi_minint : xi_maxint, bytes);
        return 0;
    }
    if (x->sign) v = -v;
    for (int i = 15; i >= 0; --i, v >>= 8) bytes[i] = static_cast<uint8_t>(v);
    return 0;
}

// ---- Rounding to integers

int f_trunc(const simul_fval* x, simul_fval* r) {
    if (x != r) *r = *x;
    if (is_special(x) || f_is_zero(x)) return 0;
    if (x->exp < 1) return set_zero(r, x->sign);
    for (int i = r->exp / 16; i < 6; ++i) r->mant[i] = 0;
    return 0;
}

int f_round(const simul_fval* x, simul_fval* r) {
    simul_fval half = one_half;
    half.sign = x->sign;
    // Beyond 80 bits a value may have no bit left for a half.
    if (is_special(x) || f_is_zero(x) || x->exp > 80) {
        *r = *x;
        return f_trunc(x, r);
    }
    simul_fval sum;
    f_add(x, &half, &sum);
    int sign = x->sign;
    f_trunc(&sum, r);
    if (f_is_zero(r)) r->sign = sign;
    return 0;
}

static int step_down(const simul_fval* x, int toward_sign, simul_fval* r) {
    simul_fval whole;
    f_trunc(x, &whole);
    if (x->sign == toward_sign && !is_special(x) && !f_eq(x, &whole))
        return f_add(&whole, toward_sign ? &neg_one : &one, r);
    *r = whole;
    return 0;
}

int f_floor(const simul_fval* x, simul_fval* r) { return step_down(x, 1, r); }
int f_ceil(const simul_fval* x, simul_fval* r) { return step_down(x, 0, r); }

int f_modf(const simul_fval* x, simul_fval* whole, simul_fval* r) {
    simul_fval value = *x;
    f_trunc(&value, whole);
    if (f_is_nan(&value)) {
        *r = value;
        return 0;
    }
    if (f_is_inf(&value)) return set_zero(r, value.sign);
    int result = f_sub(&value, whole, r);
    if (f_is_zero(r)) r->sign = value.sign;
    return result;
}

// ---- Exponents

int f_findexp(const simul_fval* x) {
    if (is_special(x) || f_is_zero(x)) return x->exp;
    return x->exp + bit_length(digits_of(x)) - 97;
}

int f_ldexp(const simul_fval* x, int n, simul_fval* r) {
    if (is_special(x) || f_is_zero(x)) {
        *r = *x;
        return 0;
    }
    return pack(r, x->sign, digits_of(x), int64_t{x->exp} - 96 + n, false);
}

int f_frexp(const simul_fval* x, int* n, simul_fval* r) {
    *n = 0;
    if (!is_special(x) && !f_is_zero(x)) *n = f_findexp(x) + 1;
    return f_ldexp(x, -*n, r);
}
