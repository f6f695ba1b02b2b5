// Elementary functions.
//
// Each is computed in 256 bits by a reduction to a small argument and a power series, and comes back rounded to odd, so
// that the float or double of the target is the correctly rounded one: an error of 2^-230 decides no rounding of a
// double's function value that is not exact, and exact values are recognised. Special values follow the C standard's
// Annex F; what it calls an invalid operation or a pole marks `fp_error`, so that nothing is folded.
//
// The trigonometric functions take arguments up to 2^1300, beyond every double, and are invalid above.
#include "FPSIM/bigfloat_constants.h"

// Terms below this, relative to the sum, don't reach the result.
static const int64_t negligible = -262;

static int take_nan(const simul_fval* x, simul_fval* r) {
    *r = *x;
    return 0;
}

// ---- Kernels

// Sum of x^n / n! over n = first, first + 2 and so on, the signs alternating if `alternate`.
static BIGF factorial_series(const BIGF& x, int first, bool alternate) {
    BIGF square = x * x, term = first ? x : big_one, sum = term;
    if (alternate) square.neg = 1;
    for (uint64_t n = first;; n += 2) {
        term = big_div_small(term * square, (n + 1) * (n + 2));
        if (term.is_zero() || term.exp < sum.exp + negligible) return sum;
        sum = sum + term;
    }
}

// Sum of x^n / n over odd n: the inverse hyperbolic tangent, or with alternating signs the inverse tangent.
static BIGF odd_series(const BIGF& x, bool alternate) {
    BIGF square = x * x, power = x, sum = x;
    if (alternate) square.neg = 1;
    for (uint64_t n = 3;; n += 2) {
        power = power * square;
        if (power.is_zero() || power.exp < sum.exp + negligible) return sum;
        sum = sum + big_div_small(power, n);
    }
}

// For |x| below 2^16.
static BIGF big_exp(const BIGF& x) {
    if (x.is_zero()) return big_one;
    int64_t k = big_nearest(x / big_ln2);
    BIGF r = big_scale(x - big_from_int(k) * big_ln2, -8);
    BIGF term = r, sum = big_one + r;
    for (uint64_t n = 2; !term.is_zero() && term.exp > negligible; ++n) {
        term = big_div_small(term * r, n);
        sum = sum + term;
    }
    for (int i = 0; i < 8; ++i) sum = sum * sum;
    return big_scale(sum, k);
}

// For x above 0.
static BIGF big_log(const BIGF& x) {
    BIGF m = x;
    int64_t k = x.exp;
    m.exp = 0;
    if (m.m[3] < 0xB504F333F9DE6484u) { // below the root of one half
        m.exp = 1;
        --k;
    }
    BIGF log_m = big_scale(odd_series((m - big_one) / (m + big_one), false), 1);
    return k ? log_m + big_from_int(k) * big_ln2 : log_m;
}

static BIGF big_atan(const BIGF& x) {
    if (x.is_zero()) return x;
    BIGF magnitude = x;
    magnitude.neg = 0;
    bool inverted = big_compare(magnitude, big_one) > 0;
    BIGF r = inverted ? big_one / magnitude : magnitude;
    int halvings = 0;
    for (; r.exp > -3; ++halvings) r = r / (big_one + big_sqrt(big_one + r * r));
    r = big_scale(odd_series(r, true), halvings);
    if (inverted) r = big_half_pi - r;
    r.neg = x.neg;
    return r;
}

// ---- Exponential and logarithm

int f_exp(const simul_fval* x, simul_fval* r) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (f_is_inf(x)) return x->sign ? set_zero(r, 0) : set_inf(r, 0);
    if (f_is_zero(x)) return f_cvf(&one, r);
    if (x->exp > 16) {
        // |x| is 2^16 or more: beyond the range of the simulator.
        if (x->sign)
            set_zero(r, 0);
        else
            set_inf(r, 0);
        return fp_mark(r->exp == exp_special ? FPE_OVER : FPE_UNDER);
    }
    return big_to_simul(big_exp(big_from_simul(x)), r);
}

static int log_of(const simul_fval* x, simul_fval* r, bool decimal) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (f_is_zero(x)) {
        set_inf(r, 1);
        return fp_mark(FPE_DIVIDE);
    }
    if (x->sign) return set_invalid(r);
    if (f_is_inf(x)) return set_inf(r, 0);
    BIGF log = big_log(big_from_simul(x));
    return big_to_simul(decimal ? log / big_ln10 : log, r);
}

int f_log(const simul_fval* x, simul_fval* r) { return log_of(x, r, false); }
int f_log10(const simul_fval* x, simul_fval* r) { return log_of(x, r, true); }

// ---- Power

enum PARITY { NO_INTEGER, EVEN, ODD };

static PARITY parity_of(const simul_fval* y) {
    if (is_special(y) || f_is_zero(y)) return EVEN;
    UWIDE m = digits_of(y);
    int fraction_bits = 96 - y->exp;
    if (fraction_bits > 96) return NO_INTEGER;
    if (fraction_bits < 0) return EVEN;
    if (m & ((UWIDE{1} << fraction_bits) - 1)) return NO_INTEGER;
    return m >> fraction_bits & 1 ? ODD : EVEN;
}

// One of the operands is zero or infinite, neither is a NaN.
static int pow_of_special(const simul_fval* x, const simul_fval* y, simul_fval* r) {
    int sign = x->sign && parity_of(y) == ODD;
    if (f_is_inf(y)) {
        int magnitude = is_special(x) ? 1 : compare_magnitudes(x, &one);
        if (magnitude == 0) return f_cvf(&one, r); // -1
        return (magnitude > 0) == !y->sign ? set_inf(r, 0) : set_zero(r, 0);
    }
    if (is_special(x)) return y->sign ? set_zero(r, sign) : set_inf(r, sign);
    if (!y->sign) return set_zero(r, sign);
    set_inf(r, sign);
    return fp_mark(FPE_DIVIDE);
}

int f_pow(const simul_fval* x, const simul_fval* y, simul_fval* r) {
    if (f_is_zero(y) || f_bit_eq(x, &one)) return f_cvf(&one, r);
    if (f_is_nan(x)) return take_nan(x, r);
    if (f_is_nan(y)) return take_nan(y, r);
    if (f_is_zero(x) || is_special(x) || is_special(y)) return pow_of_special(x, y, r);
    PARITY parity = parity_of(y);
    if (x->sign && parity == NO_INTEGER) return set_invalid(r);
    int sign = x->sign && parity == ODD;
    BIGF base = big_from_simul(x);
    base.neg = 0;
    BIGF t = big_from_simul(y) * big_log(base);
    if (!t.is_zero() && t.exp > 16) {
        if (t.neg)
            set_zero(r, sign);
        else
            set_inf(r, sign);
        return fp_mark(t.neg ? FPE_UNDER : FPE_OVER);
    }
    BIGF power = big_exp(t);
    power.neg = sign;
    return big_to_simul(power, r);
}

// ---- Trigonometric functions

// |x| = quadrant * pi/2 + r with |r| <= pi/4, the quadrant modulo 4. The product with 2/pi is taken from the bit of
// 2/pi on that first matters modulo 4, as far as 350 bits behind the point, so that r has its 256 bits even next to a
// multiple of pi/2. False beyond the range.
static bool reduce_angle(const simul_fval* x, int* quadrant, BIGF* r) {
    *quadrant = 0;
    if (x->exp < 0) { // below 2^-16
        *r = big_from_simul(x);
        r->neg = 0;
        return true;
    }
    const int window_words = 7, window_bits = 64 * window_words,
              words = static_cast<int>(sizeof two_over_pi / sizeof two_over_pi[0]);
    int e = x->exp - 96; // |x| = digits * 2^e
    int offset = e > 3 ? e - 3 : 0;
    int first = offset / 64, part = offset % 64;
    if (first + window_words >= words) return false;
    UWIDE m = digits_of(x);
    uint64_t d[2] = {static_cast<uint64_t>(m), static_cast<uint64_t>(m >> 64)};
    uint64_t product[window_words + 2] = {0, 0, 0, 0, 0, 0, 0, 0, 0};
    for (int i = 0; i < window_words; ++i) {
        const uint64_t* p = &two_over_pi[first + window_words - 1 - i];
        uint64_t w = part ? p[0] << part | p[1] >> (64 - part) : p[0];
        uint64_t carry = 0;
        for (int k = 0; k < 2; ++k) {
            UWIDE t = static_cast<UWIDE>(w) * d[k] + product[i + k] + carry;
            product[i + k] = static_cast<uint64_t>(t);
            carry = static_cast<uint64_t>(t >> 64);
        }
        product[i + 2] = carry;
    }
    int point = window_bits + offset - e;
    auto bit = [&](int i) {
        return i < 64 * (window_words + 2) ? static_cast<int>(product[i / 64] >> (i % 64) & 1) : 0;
    };
    *quadrant = bit(point) + 2 * bit(point + 1);
    bool round_up = bit(point - 1);
    for (int i = point; i < 64 * (window_words + 2); ++i) product[i / 64] &= ~(uint64_t{1} << (i % 64));
    BIGF fraction = big_from_words(product, window_words + 2, -point);
    if (round_up) {
        *quadrant = (*quadrant + 1) & 3;
        // The complement first, so that a fraction next to 1 keeps its bits.
        uint64_t carry = 1;
        for (int i = 0; i < window_words + 2; ++i) {
            product[i] = ~product[i] + carry;
            carry = carry && product[i] == 0;
        }
        for (int i = point; i < 64 * (window_words + 2); ++i) product[i / 64] &= ~(uint64_t{1} << (i % 64));
        fraction = big_from_words(product, window_words + 2, -point);
        fraction.neg = 1;
    }
    *r = fraction * big_half_pi;
    return true;
}

// The sine or cosine of an angle `turn` quadrants on.
static bool big_sine(const simul_fval* x, int turn, BIGF* result) {
    int quadrant;
    BIGF r;
    if (!reduce_angle(x, &quadrant, &r)) return false;
    // Odd in x: for a negative x the reduced angle is that of |x|, and the caller's sign comes last.
    int q = (quadrant + turn) & 3;
    *result = factorial_series(r, q & 1 ? 0 : 1, true);
    if (q & 2) result->neg = !result->neg;
    return true;
}

static int trigonometric(const simul_fval* x, simul_fval* r, int turn) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (is_special(x)) return set_invalid(r);
    if (f_is_zero(x)) return f_cvf(turn ? &one : x, r);
    BIGF v;
    if (!big_sine(x, turn, &v)) return set_invalid(r);
    if (!turn && x->sign) v.neg = !v.neg;
    return big_to_simul(v, r);
}

int f_sin(const simul_fval* x, simul_fval* r) { return trigonometric(x, r, 0); }
int f_cos(const simul_fval* x, simul_fval* r) { return trigonometric(x, r, 1); }

int f_tan(const simul_fval* x, simul_fval* r) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (is_special(x)) return set_invalid(r);
    if (f_is_zero(x)) return f_cvf(x, r);
    BIGF sine, cosine;
    if (!big_sine(x, 0, &sine) || !big_sine(x, 1, &cosine)) return set_invalid(r);
    BIGF v = sine / cosine;
    if (x->sign) v.neg = !v.neg;
    return big_to_simul(v, r);
}

// ---- Inverse trigonometric functions

int f_asin(const simul_fval* x, simul_fval* r) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (f_is_zero(x)) return f_cvf(x, r);
    int magnitude = compare_magnitudes(x, &one);
    if (magnitude > 0) return set_invalid(r);
    BIGF v = big_from_simul(x);
    BIGF result = big_half_pi;
    if (magnitude < 0) result = big_atan(v / big_sqrt((big_one - v) * (big_one + v)));
    result.neg = x->sign;
    return big_to_simul(result, r);
}

// Twice the angle of the half angle's tangent, which keeps its bits next to 1.
int f_acos(const simul_fval* x, simul_fval* r) {
    if (f_is_nan(x)) return take_nan(x, r);
    int magnitude = f_is_zero(x) ? -1 : compare_magnitudes(x, &one);
    if (magnitude > 0) return set_invalid(r);
    if (magnitude == 0) return x->sign ? big_to_simul(big_pi, r) : set_zero(r, 0);
    BIGF v = f_is_zero(x) ? BIGF() : big_from_simul(x);
    return big_to_simul(big_scale(big_atan(big_sqrt((big_one - v) / (big_one + v))), 1), r);
}

int f_atan(const simul_fval* x, simul_fval* r) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (f_is_zero(x)) return f_cvf(x, r);
    BIGF v = big_half_pi;
    if (!is_special(x)) v = big_atan(big_from_simul(x));
    v.neg = x->sign;
    return big_to_simul(v, r);
}

// The angle of a point on an axis or at infinity.
static int atan2_of_special(const simul_fval* y, const simul_fval* x, simul_fval* r) {
    BIGF v;
    if (is_special(y) && is_special(x)) {
        v = big_scale(big_half_pi, -1);
        if (x->sign) v = big_pi - v;
    } else if (is_special(y) || f_is_zero(x)) {
        v = big_half_pi;
        if (f_is_zero(y)) v = x->sign ? big_pi : BIGF();
    } else if (x->sign) {
        v = big_pi;
    }
    v.neg = y->sign;
    return big_to_simul(v, r);
}

int f_atan2(const simul_fval* y, const simul_fval* x, simul_fval* r) {
    if (f_is_nan(y)) return take_nan(y, r);
    if (f_is_nan(x)) return take_nan(x, r);
    if (is_special(y) || is_special(x) || f_is_zero(y) || f_is_zero(x)) return atan2_of_special(y, x, r);
    BIGF ratio = big_from_simul(y) / big_from_simul(x);
    ratio.neg = 0;
    BIGF v = big_atan(ratio);
    if (x->sign) v = big_pi - v;
    v.neg = y->sign;
    return big_to_simul(v, r);
}

// ---- Hyperbolic functions

// Below 1 the series, which keeps its bits where exponentials would cancel.
static BIGF big_sinh(const BIGF& x) {
    if (x.exp <= 0) return factorial_series(x, 1, false);
    BIGF e = big_exp(x);
    return big_scale(e - big_one / e, -1);
}

static BIGF big_cosh(const BIGF& x) {
    BIGF e = big_exp(x);
    return big_scale(e + big_one / e, -1);
}

int f_sinh(const simul_fval* x, simul_fval* r) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (f_is_zero(x) || is_special(x)) return f_cvf(x, r);
    if (x->exp > 16) {
        set_inf(r, x->sign);
        return fp_mark(FPE_OVER);
    }
    return big_to_simul(big_sinh(big_from_simul(x)), r);
}

int f_cosh(const simul_fval* x, simul_fval* r) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (f_is_zero(x)) return f_cvf(&one, r);
    if (is_special(x)) return set_inf(r, 0);
    if (x->exp > 16) {
        set_inf(r, 0);
        return fp_mark(FPE_OVER);
    }
    return big_to_simul(big_cosh(big_from_simul(x)), r);
}

int f_tanh(const simul_fval* x, simul_fval* r) {
    if (f_is_nan(x)) return take_nan(x, r);
    if (f_is_zero(x)) return f_cvf(x, r);
    // From 2^16 on it is 1 to more digits than there are.
    if (x->exp > 16) return f_cvf(x->sign ? &neg_one : &one, r);
    BIGF v = big_from_simul(x);
    return big_to_simul(big_sinh(v) / big_cosh(v), r);
}
