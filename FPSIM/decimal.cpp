// Decimal conversions by big integers of 32-bit words, least significant first.
#include "FPSIM/decimal.h"

#include "FPSIM/fpsim_impl.h"

#include <algorithm>
#include <vector>

namespace {

class BIGINT {
public:
    BIGINT() = default;
    explicit BIGINT(UWIDE v) {
        for (; v; v >>= 32) words_m.push_back(static_cast<uint32_t>(v));
    }

    bool is_zero() const { return words_m.empty(); }
    int bits() const { return is_zero() ? 0 : static_cast<int>(words_m.size()) * 32 - __builtin_clz(words_m.back()); }

    void multiply_add(uint32_t factor, uint32_t addend) {
        uint64_t carry = addend;
        for (uint32_t& w : words_m) {
            carry += static_cast<uint64_t>(w) * factor;
            w = static_cast<uint32_t>(carry);
            carry >>= 32;
        }
        if (carry) words_m.push_back(static_cast<uint32_t>(carry));
    }
    void multiply_power_of_10(int n) {
        for (; n >= 9; n -= 9) multiply_add(1000000000, 0);
        for (; n > 0; --n) multiply_add(10, 0);
    }
    uint32_t divide(uint32_t divisor) { // returns the remainder
        uint64_t rest = 0;
        for (size_t i = words_m.size(); i-- > 0;) {
            rest = rest << 32 | words_m[i];
            words_m[i] = static_cast<uint32_t>(rest / divisor);
            rest %= divisor;
        }
        trim();
        return static_cast<uint32_t>(rest);
    }
    void shift_left(int n) {
        if (is_zero()) return;
        if (int part = n % 32) {
            uint32_t carry = 0;
            for (uint32_t& w : words_m) {
                uint32_t next = w >> (32 - part);
                w = w << part | carry;
                carry = next;
            }
            if (carry) words_m.push_back(carry);
        }
        words_m.insert(words_m.begin(), n / 32, 0);
    }
    // Takes out the words from `word` on, of which there is one at most.
    uint32_t take_above(size_t word) {
        uint32_t v = word < words_m.size() ? words_m[word] : 0;
        if (word < words_m.size()) words_m.resize(word);
        trim();
        return v;
    }
    // Bits from `low` on, at most 128, and whether any bit below is set.
    UWIDE top(int low, bool* sticky) const {
        UWIDE v = 0;
        for (int i = bits() - 1; i >= low; --i) v = v << 1 | (words_m[i / 32] >> (i % 32) & 1);
        for (int i = 0; i < low / 32; ++i) *sticky |= words_m[i] != 0;
        if (low % 32) *sticky |= (words_m[low / 32] & ((1u << low % 32) - 1)) != 0;
        return v;
    }
    int compare(const BIGINT& o) const {
        if (words_m.size() != o.words_m.size()) return words_m.size() < o.words_m.size() ? -1 : 1;
        for (size_t i = words_m.size(); i-- > 0;)
            if (words_m[i] != o.words_m[i]) return words_m[i] < o.words_m[i] ? -1 : 1;
        return 0;
    }
    // this -= o * factor; returns false, with the difference off by a word's carry, where that goes below zero.
    bool subtract(const BIGINT& o, uint32_t factor) {
        uint64_t borrow = 0;
        for (size_t i = 0; i < words_m.size(); ++i) {
            uint64_t product = (i < o.words_m.size() ? static_cast<uint64_t>(o.words_m[i]) * factor : 0) + borrow;
            uint32_t low = static_cast<uint32_t>(product);
            borrow = (product >> 32) + (words_m[i] < low);
            words_m[i] -= low;
        }
        trim();
        return borrow == 0;
    }
    // The bits from `low` on, a multiple of 32, as a number, which must fit.
    uint64_t leading(int low) const {
        uint64_t v = 0;
        for (size_t i = words_m.size(); i-- > static_cast<size_t>(low / 32);) v = v << 32 | words_m[i];
        return v;
    }
    size_t words() const { return words_m.size(); }

private:
    void trim() {
        while (!words_m.empty() && words_m.back() == 0) words_m.pop_back();
    }
    std::vector<uint32_t> words_m;
};

void append_nine(std::string& out, uint32_t v) {
    char group[9];
    for (int i = 8; i >= 0; --i, v /= 10) group[i] = static_cast<char>('0' + v % 10);
    out.append(group, 9);
}

// Long division of a / b: the quotient of 97 to 128 bits is put together from words, one estimate each.
UWIDE divide(BIGINT& a, const BIGINT& b, bool* sticky) {
    // With b's top word at least half full and a below b * 2^32, the estimate from the top two words of a is at most 2
    // off.
    UWIDE quotient = 0;
    size_t n = b.words();
    for (int word = 3; word >= 0; --word) {
        BIGINT step = b;
        step.shift_left(32 * word);
        uint64_t top = a.leading(static_cast<int>(32 * (n + word - 1)));
        uint64_t q = top / (b.leading(static_cast<int>(32 * (n - 1))) + 1); // never too large
        if (q) a.subtract(step, static_cast<uint32_t>(q));
        while (a.compare(step) >= 0) {
            a.subtract(step, 1);
            ++q;
        }
        quotient = quotient << 32 | q;
    }
    *sticky = !a.is_zero();
    return quotient;
}

} // namespace

std::string decimal_digits(const simul_fval* x, int* point) {
    UWIDE m = digits_of(x);
    int e = x->exp - 96;
    while (!(m & 1)) {
        m >>= 1;
        ++e;
    }
    std::string digits;
    BIGINT fraction;
    int fraction_words = 0;
    BIGINT whole(m);
    if (e >= 0) {
        whole.shift_left(e);
    } else {
        whole = BIGINT(-e < 128 ? m >> -e : 0);
        fraction = BIGINT(-e < 128 ? m & ((UWIDE{1} << -e) - 1) : m);
        fraction_words = (-e + 31) / 32;
        fraction.shift_left(fraction_words * 32 + e);
    }
    std::vector<uint32_t> groups;
    while (!whole.is_zero()) groups.push_back(whole.divide(1000000000));
    for (size_t i = groups.size(); i-- > 0;) append_nine(digits, groups[i]);
    *point = static_cast<int>(digits.size());
    while (!fraction.is_zero()) {
        fraction.multiply_add(1000000000, 0);
        append_nine(digits, fraction.take_above(fraction_words));
    }
    size_t first = digits.find_first_not_of('0');
    digits.erase(0, first);
    *point -= static_cast<int>(first);
    digits.erase(digits.find_last_not_of('0') + 1);
    return digits;
}

std::string round_digits(const std::string& digits, int n, int* point) {
    if (n < 0) return "";
    std::string out = digits.substr(0, n);
    if (static_cast<size_t>(n) >= digits.size()) return out + std::string(n - digits.size(), '0');
    bool up = digits[n] > '5' ||
              (digits[n] == '5' && (static_cast<size_t>(n) + 1 < digits.size() || (n > 0 && (digits[n - 1] & 1))));
    if (!up) return out;
    int i = n - 1;
    for (; i >= 0 && out[i] == '9'; --i) out[i] = '0';
    if (i >= 0) {
        ++out[i];
        return out;
    }
    ++*point;
    return "1" + out.substr(0, n > 0 ? n - 1 : 0);
}

int decimal_value(const std::string& digits, int exponent, int sign, simul_fval* x) {
    BIGINT numerator;
    size_t i = 0;
    for (; i + 9 <= digits.size(); i += 9) {
        uint32_t group = 0;
        for (size_t k = i; k < i + 9; ++k) group = group * 10 + static_cast<uint32_t>(digits[k] - '0');
        numerator.multiply_add(1000000000, group);
    }
    for (; i < digits.size(); ++i) numerator.multiply_add(10, static_cast<uint32_t>(digits[i] - '0'));
    bool sticky = false;
    if (exponent >= 0) {
        numerator.multiply_power_of_10(exponent);
        int low = std::max(0, numerator.bits() - 128);
        UWIDE m = numerator.top(low, &sticky);
        return pack(x, sign, m, low, sticky);
    }
    BIGINT denominator(1);
    denominator.multiply_power_of_10(-exponent);
    // Bring the denominator's top bit to a word's top, and the quotient to 127 or 128 bits.
    int e = (32 - denominator.bits() % 32) % 32;
    denominator.shift_left(e);
    int up = denominator.bits() + 127 - numerator.bits();
    if (up < 0) {
        int words = (-up + 31) / 32 * 32;
        denominator.shift_left(words);
        e += words;
        up += words;
    }
    numerator.shift_left(up);
    UWIDE quotient = divide(numerator, denominator, &sticky);
    return pack(x, sign, quotient, int64_t{e} - up, sticky);
}
