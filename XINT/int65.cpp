// Arithmetic of INT65. The two words are the low 96 bits of a two's complement number, so that the sum or difference of
// two values in range is exact and its top word tells whether it left the range.
#include "XINT/int65.h"

#include <utility>

using WIDE = __int128;
using UWIDE = unsigned __int128;

static WIDE wide(INT65 v) { return static_cast<WIDE>(static_cast<UWIDE>(static_cast<WIDE>(v.sign)) << 64 | v.value); }
static INT65 narrow(WIDE v) { return INT65(static_cast<int32_t>(v >> 64), static_cast<uint64_t>(v)); }
static UWIDE magnitude(INT65 v) { return v.is_negative() ? -static_cast<UWIDE>(wide(v)) : static_cast<UWIDE>(wide(v)); }
static bool in_range(INT65 v) { return v.sign == 0 || v.sign == -1; }

INT65 operator+(INT65 a, INT65 b) { return narrow(wide(a) + wide(b)); }
INT65 operator-(INT65 a, INT65 b) { return narrow(wide(a) - wide(b)); }
INT65 operator-(INT65 a) { return narrow(-wide(a)); }
INT65 operator*(INT65 a, INT65 b) {
    return narrow(static_cast<WIDE>(static_cast<UWIDE>(wide(a)) * static_cast<UWIDE>(wide(b))));
}

INT65 operator/(INT65 a, INT65 b) {
    OPT_ASSERT(!b.is_zero());
    return narrow(wide(a) / wide(b));
}

INT65 operator%(INT65 a, INT65 b) {
    OPT_ASSERT(!b.is_zero());
    return narrow(wide(a) % wide(b));
}

INT65 operator&(INT65 a, INT65 b) { return INT65(a.sign & b.sign, a.value & b.value); }
INT65 operator|(INT65 a, INT65 b) { return INT65(a.sign | b.sign, a.value | b.value); }
INT65 operator^(INT65 a, INT65 b) { return INT65(a.sign ^ b.sign, a.value ^ b.value); }
INT65 operator~(INT65 a) { return INT65(~a.sign, ~a.value); }

INT65 operator<<(INT65 a, INT65 n) {
    if (n.is_negative()) return a >> -n;
    if (n > INT65(64)) return 0;
    return narrow(static_cast<WIDE>(static_cast<UWIDE>(wide(a)) << n.value));
}

INT65 operator>>(INT65 a, INT65 n) {
    if (n.is_negative()) return a << -n;
    return narrow(wide(a) >> (n > INT65(127) ? 127 : n.value));
}

int power_of_2(INT65 v) {
    if (v.sign != 0 || v.value == 0 || (v.value & (v.value - 1)) != 0) return -1;
    return __builtin_ctzll(v.value);
}

int extract_power_of_2_factor(INT65 v) {
    OPT_ASSERT(!v.is_zero());
    return v.value ? __builtin_ctzll(v.value) : 64 + __builtin_ctz(static_cast<uint32_t>(v.sign));
}

// ---- Checked arithmetic

INT65 long_add(INT65 a, INT65 b, int* overflow) {
    INT65 sum = a + b;
    if (!in_range(a) || !in_range(b) || !in_range(sum)) *overflow = 1;
    return sum;
}

INT65 long_multiply(INT65 a, INT65 b, int* overflow) {
    WIDE product;
    bool wrapped = __builtin_mul_overflow(wide(a), wide(b), &product);
    INT65 result = narrow(product);
    if (!in_range(a) || !in_range(b) || wrapped || wide(result) != product || !in_range(result)) *overflow = 1;
    return result;
}

// ---- Number theory

INT65 long_gcd(INT65 a, INT65 b) {
    UWIDE x = magnitude(a), y = magnitude(b);
    while (y) {
        x %= y;
        std::swap(x, y);
    }
    return narrow(static_cast<WIDE>(x));
}

INT65 extended_gcd(INT65 a, INT65 b, INT65* x, INT65* y) {
    // Invariant: a * x0 + b * y0 = r0 and a * x1 + b * y1 = r1; the factors stay below the operands.
    WIDE r0 = wide(a), r1 = wide(b), x0 = 1, x1 = 0, y0 = 0, y1 = 1;
    while (r1) {
        WIDE q = r0 / r1;
        r0 -= q * r1;
        std::swap(r0, r1);
        x0 -= q * x1;
        std::swap(x0, x1);
        y0 -= q * y1;
        std::swap(y0, y1);
    }
    if (r0 < 0) {
        r0 = -r0;
        x0 = -x0;
        y0 = -y0;
    }
    *x = narrow(x0);
    *y = narrow(y0);
    return narrow(r0);
}

INT65 long_lcm(INT65 a, INT65 b) {
    if (a.is_zero() || b.is_zero()) return 0;
    INT65 m = a / long_gcd(a, b) * b;
    return m.is_negative() ? -m : m;
}

INT65 long_sqrt(INT65 v) {
    OPT_ASSERT(!v.is_negative());
    // Digit by digit, exact for every value.
    UWIDE rest = static_cast<UWIDE>(wide(v)), root = 0, bit = UWIDE{1} << 94;
    while (bit > rest) bit >>= 2;
    for (; bit; bit >>= 2) {
        if (rest >= root + bit) {
            rest -= root + bit;
            root = (root >> 1) + bit;
        } else {
            root >>= 1;
        }
    }
    return narrow(static_cast<WIDE>(root));
}

INT65 ulong_expt(INT65 base, INT65 exponent) {
    INT65 result = 1;
    for (uint64_t n = exponent.is_negative() ? 0 : exponent.value; n; n >>= 1) {
        if (n & 1) result = result * base;
        base = base * base;
    }
    return result;
}
