// INT65: a 65-bit integer, from -2^64 to 2^64 - 1, so that every signed and unsigned 64-bit value of the target fits.
//
// The workhorse of all integer reasoning: constants, bounds, steps, ranges. Plain arithmetic wraps in the top word
// without a word; `long_add`, `long_multiply`, `sum_may_overflow` and `prod_may_overflow` are the forms to use where it
// matters.
#pragma once

#include "UTIL/abort.h"

#include <cstdint>
#include <limits>
#include <string>
#include <type_traits>

class TYPE;

class INT65 {
public:
    int32_t sign = 0; // 0 or -1 for every value in range; its top bit decides
    uint64_t value = 0;

    constexpr INT65() = default;
    constexpr INT65(int32_t sign_word, uint64_t low) : sign(sign_word), value(low) {}
    template <class T, class = std::enable_if_t<std::is_integral_v<T>>>
    constexpr INT65(T v) : sign(std::is_signed_v<T> && v < 0 ? -1 : 0), value(static_cast<uint64_t>(v)) {}

    constexpr bool is_negative() const { return sign < 0; }
    constexpr bool is_zero() const { return sign == 0 && value == 0; }

    // Whether the value is representable in the host type T.
    template <class T>
    constexpr bool fits() const {
        if constexpr (std::is_signed_v<T>)
            return is_negative()
                       ? sign == -1 && value >> 63 && static_cast<int64_t>(value) >= std::numeric_limits<T>::min()
                       : sign == 0 && value <= static_cast<uint64_t>(std::numeric_limits<T>::max());
        else
            return sign == 0 && value <= std::numeric_limits<T>::max();
    }
    // The value as T. One that does not fit is an assertion failure: the caller asks `fits` first where that isn't
    // known.
    template <class T>
    T fits_in() const {
        if (!fits<T>()) optassert("fits_in<T>()", __FILE__, __LINE__);
        return static_cast<T>(value);
    }

    friend constexpr bool operator==(INT65 a, INT65 b) { return a.sign == b.sign && a.value == b.value; }
    friend constexpr bool operator!=(INT65 a, INT65 b) { return !(a == b); }
    friend constexpr bool operator<(INT65 a, INT65 b) { return a.sign != b.sign ? a.sign < b.sign : a.value < b.value; }
    friend constexpr bool operator>(INT65 a, INT65 b) { return b < a; }
    friend constexpr bool operator<=(INT65 a, INT65 b) { return !(b < a); }
    friend constexpr bool operator>=(INT65 a, INT65 b) { return !(a < b); }
};

INT65 operator+(INT65 a, INT65 b);
INT65 operator-(INT65 a, INT65 b);
INT65 operator*(INT65 a, INT65 b); // on magnitudes, the sign put back
INT65 operator/(INT65 a, INT65 b); // toward zero; the divisor must not be 0
INT65 operator%(INT65 a, INT65 b); // the dividend's sign
INT65 operator-(INT65 a);
INT65 operator&(INT65 a, INT65 b);
INT65 operator|(INT65 a, INT65 b);
INT65 operator^(INT65 a, INT65 b);
INT65 operator~(INT65 a);
INT65 operator<<(INT65 a, INT65 n); // n of 0 gives a, above 64 gives 0, negative n shifts right
INT65 operator>>(INT65 a, INT65 n); // arithmetic, for any n; negative n shifts left
inline INT65& operator+=(INT65& a, INT65 b) { return a = a + b; }
inline INT65& operator-=(INT65& a, INT65 b) { return a = a - b; }

// ---- Values of target types. A pointer counts as `long`; sizes in bits.
INT65 type_mask(const TYPE* type);           // (1 << size) - 1; sizes of 0, 64 and above give 64 ones
INT65 truncate_to_type(INT65 v, TYPE* type); // wrapped into an integer, enum, pointer or vector-of-integer type
INT65 sign_extend_by_type(INT65 v, TYPE* type);
INT65 sign_extend_by_type_size(INT65 v, TYPE* type);
INT65 int_type_min(TYPE* type);
INT65 int_type_max(TYPE* type);
TYPE* default_ICON_type(INT65 v, int flag); // smallest C type for a constant; `flag` non-zero: unsigned types allowed
int power_of_2(INT65 v);                    // k with v = 2^k, else -1
int extract_power_of_2_factor(INT65 v);     // trailing zero bits of a nonzero v

// Text in one of 8 static slots of 31 bytes chosen by `slot` modulo 8; valid until the slot is used again. `radix` 0
// chooses.
const char* int2text(INT65 v, const TYPE* type, int radix, int slot);

// `*overflow` is set to 1 where the result does not stand for the true value, and never cleared.
INT65 long_add(INT65 a, INT65 b, int* overflow);
INT65 long_multiply(INT65 a, INT65 b, int* overflow);
bool sum_may_overflow(INT65 a, INT65 b, TYPE* type);
bool prod_may_overflow(INT65 a, INT65 b, TYPE* type);

INT65 long_gcd(INT65 a, INT65 b);
INT65 extended_gcd(INT65 a, INT65 b, INT65* x, INT65* y); // a*x + b*y = gcd
INT65 long_lcm(INT65 a, INT65 b);
INT65 long_sqrt(INT65 v); // floor; v not negative
INT65 ulong_expt(INT65 base, INT65 exponent);
