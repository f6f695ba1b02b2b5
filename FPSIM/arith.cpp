// Arithmetic and comparison. Every operation works on the exact result, of which `pack` keeps the digits and whether
// anything was cut off.
#include "FPSIM/fpsim_impl.h"

// A NaN operand is the result as it is, the first one wins.
static bool take_nan(const simul_fval* a, const simul_fval* b, simul_fval* r) {
    if (f_is_nan(a)) {
        *r = *a;
        return true;
    }
    if (f_is_nan(b)) {
        *r = *b;
        return true;
    }
    return false;
}

int compare_magnitudes(const simul_fval* a, const simul_fval* b) {
    if (a->exp != b->exp) return a->exp < b->exp ? -1 : 1;
    UWIDE x = digits_of(a), y = digits_of(b);
    return x < y ? -1 : x > y;
}

// ---- Arithmetic

// Two finite values, neither zero.
static int add_finite(const simul_fval* a, const simul_fval* b, simul_fval* r) {
    int order = compare_magnitudes(a, b);
    const simul_fval *large = order < 0 ? b : a, *small = order < 0 ? a : b;
    // 30 bits below the digits of the larger, and two above for the carry.
    int64_t e = int64_t{large->exp} - 126;
    int64_t distance = int64_t{large->exp} - small->exp;
    UWIDE m = digits_of(large) << 30, s = digits_of(small) << 30;
    bool sticky = false;
    if (distance >= 128) {
        sticky = true;
        s = 0;
    } else if (distance > 0) {
        sticky = (s & ((UWIDE{1} << distance) - 1)) != 0;
        s >>= distance;
    }
    if (large->sign == small->sign) return pack(r, large->sign, m + s, e, sticky);
    if (order == 0) return set_zero(r, 0);
    // What was cut off the smaller is missing from the difference: one unit less, and a remainder.
    return pack(r, large->sign, m - s - sticky, e, sticky);
}

int f_add(const simul_fval* a, const simul_fval* b, simul_fval* r) {
    if (take_nan(a, b, r)) return 0;
    if (f_is_inf(a) && f_is_inf(b) && a->sign != b->sign) return set_invalid(r);
    if (f_is_zero(a) && f_is_zero(b)) return set_zero(r, a->sign && b->sign);
    if (f_is_zero(b) || f_is_inf(a)) {
        *r = *a;
        return 0;
    }
    if (f_is_zero(a) || f_is_inf(b)) {
        *r = *b;
        return 0;
    }
    return add_finite(a, b, r);
}

int f_sub(const simul_fval* a, const simul_fval* b, simul_fval* r) {
    if (take_nan(a, b, r)) return 0;
    simul_fval minus_b = *b;
    minus_b.sign = !b->sign;
    return f_add(a, &minus_b, r);
}

int f_mul(const simul_fval* a, const simul_fval* b, simul_fval* r) {
    if (take_nan(a, b, r)) return 0;
    int sign = a->sign ^ b->sign;
    if (f_is_zero(a) || f_is_zero(b)) {
        if (is_special(a) || is_special(b)) return set_invalid(r);
        return set_zero(r, sign);
    }
    if (is_special(a) || is_special(b)) return set_inf(r, sign);
    UWIDE x = digits_of(a), y = digits_of(b);
    uint64_t x0 = static_cast<uint64_t>(x), x1 = static_cast<uint64_t>(x >> 64);
    uint64_t y0 = static_cast<uint64_t>(y), y1 = static_cast<uint64_t>(y >> 64);
    // The product has 161 to 192 bits; the top 128 of them, and whether the low 64 hold anything.
    UWIDE low = static_cast<UWIDE>(x0) * y0;
    UWIDE middle = static_cast<UWIDE>(x1) * y0 + static_cast<UWIDE>(x0) * y1;
    UWIDE top = (static_cast<UWIDE>(x1) * y1 << 64) + middle + (low >> 64);
    return pack(r, sign, top, int64_t{a->exp} + b->exp - 128, static_cast<uint64_t>(low) != 0);
}

int f_div(const simul_fval* a, const simul_fval* b, simul_fval* r) {
    if (take_nan(a, b, r)) return 0;
    int sign = a->sign ^ b->sign;
    if ((f_is_zero(a) && f_is_zero(b)) || (is_special(a) && is_special(b))) return set_invalid(r);
    if (is_special(b) || f_is_zero(a)) return set_zero(r, sign);
    if (is_special(a)) return set_inf(r, sign);
    if (f_is_zero(b)) {
        set_inf(r, sign);
        return fp_mark(FPE_DIVIDE);
    }
    // Long division for 112 bits behind the point, 32 at a time: the quotient has 97 to 128 bits.
    UWIDE divisor = digits_of(b), rest = digits_of(a);
    UWIDE quotient = rest / divisor;
    rest %= divisor;
    for (int bits : {32, 32, 32, 16}) {
        rest <<= bits;
        quotient = quotient << bits | rest / divisor;
        rest %= divisor;
    }
    return pack(r, sign, quotient, int64_t{a->exp} - b->exp - 112, rest != 0);
}

int f_sqrt(const simul_fval* a, simul_fval* r) {
    if (f_is_nan(a) || f_is_zero(a)) {
        *r = *a;
        return 0;
    }
    if (a->sign) {
        set_zero(r, 0);
        return fp_mark(FPE_INVALID);
    }
    if (is_special(a)) return set_inf(r, 0);
    // The exact root of digits * 2^114, bit by bit: 98 to 105 bits and the remainder.
    UWIDE m = digits_of(a), root = 0, rest = 0;
    for (int i = 104; i >= 0; --i) {
        rest = rest << 2 | (i >= 57 ? static_cast<unsigned>(m >> (2 * (i - 57))) & 3 : 0);
        UWIDE trial = root << 2 | 1;
        root <<= 1;
        if (rest >= trial) {
            rest -= trial;
            root |= 1;
        }
    }
    return pack(r, 0, root, (int64_t{a->exp} - 96) / 2 - 57, rest != 0);
}

// Exact: the remainder of the digits by long division.
int f_fmod(const simul_fval* a, const simul_fval* b, simul_fval* r) {
    if (take_nan(a, b, r)) return 0;
    if (is_special(a) || f_is_zero(b)) return set_invalid(r);
    if (is_special(b) || f_is_zero(a) || compare_magnitudes(a, b) < 0) {
        *r = *a;
        return 0;
    }
    UWIDE divisor = digits_of(b), rest = digits_of(a) % divisor;
    int64_t e = int64_t{b->exp} - 96;
    int sign = a->sign;
    for (int left = a->exp - b->exp; left > 0 && rest; left -= 32) rest = (rest << (left < 32 ? left : 32)) % divisor;
    return pack(r, sign, rest, e, false);
}

int f_neg(const simul_fval* a, simul_fval* r) {
    *r = *a;
    r->sign = !a->sign;
    return 0;
}

int f_abs(const simul_fval* a, simul_fval* r) {
    *r = *a;
    r->sign = 0;
    return 0;
}

int f_cvf(const simul_fval* a, simul_fval* r) {
    *r = *a;
    return 0;
}

// ---- Compare

// -1, 0 or 1 of two values that are no NaN.
static int order(const simul_fval* a, const simul_fval* b) {
    if (f_is_zero(a) && f_is_zero(b)) return 0;
    if (a->sign != b->sign) return a->sign ? -1 : 1;
    int magnitudes = compare_magnitudes(a, b);
    return a->sign ? -magnitudes : magnitudes;
}

static bool unordered(const simul_fval* a, const simul_fval* b) {
    if (!f_is_nan(a) && !f_is_nan(b)) return false;
    fp_error |= FPE_INVALID;
    return true;
}

int f_eq(const simul_fval* a, const simul_fval* b) { return !unordered(a, b) && order(a, b) == 0; }
int f_ne(const simul_fval* a, const simul_fval* b) { return !f_eq(a, b); }
int f_lt(const simul_fval* a, const simul_fval* b) { return !unordered(a, b) && order(a, b) < 0; }
int f_le(const simul_fval* a, const simul_fval* b) { return !unordered(a, b) && order(a, b) <= 0; }
int f_gt(const simul_fval* a, const simul_fval* b) { return f_lt(b, a); }
int f_ge(const simul_fval* a, const simul_fval* b) { return f_le(b, a); }

int f_bit_eq(const simul_fval* a, const simul_fval* b) {
    return a->sign == b->sign && a->exp == b->exp && digits_of(a) == digits_of(b);
}

int f_sgn(const simul_fval* a) {
    if (f_is_nan(a) || f_is_zero(a)) return 0;
    return a->sign ? -1 : 1;
}

static const simul_fval* pick_nan(const simul_fval* a, const simul_fval* b, int flag) {
    if (f_is_nan(a)) return flag ? b : a;
    if (f_is_nan(b)) return flag ? a : b;
    return nullptr;
}

const simul_fval* f_max(const simul_fval* a, const simul_fval* b, int flag) {
    const simul_fval* nan = pick_nan(a, b, flag);
    return nan ? nan : order(a, b) < 0 ? b : a;
}

const simul_fval* f_min(const simul_fval* a, const simul_fval* b, int flag) {
    const simul_fval* nan = pick_nan(a, b, flag);
    return nan ? nan : order(b, a) < 0 ? b : a;
}
