#include "FPSIM/bigfloat.h"

#include <algorithm>
#include <cstring>

// ---- Words, least significant first

static int top_bit(const uint64_t* w, int n) { // 1 + the number of the highest set bit, 0 if there is none
    while (n > 0 && w[n - 1] == 0) --n;
    return n ? 64 * n - __builtin_clzll(w[n - 1]) : 0;
}

// r[0..3] = the four words of w from bit `low`, which may be negative.
static void extract(const uint64_t* w, int n, int low, uint64_t* r) {
    for (int i = 0; i < 4; ++i) {
        int bit = low + 64 * i;
        int word = bit >> 6, part = bit & 63;
        auto at = [&](int k) { return k >= 0 && k < n ? w[k] : 0; };
        r[i] = part ? at(word) >> part | at(word + 1) << (64 - part) : at(word);
    }
}

BIGF big_from_words(const uint64_t* w, int n, int64_t scale) {
    BIGF r;
    int top = top_bit(w, n);
    if (!top) return r;
    extract(w, n, top - 256, r.m);
    r.exp = top + scale;
    return r;
}

static int compare_words(const uint64_t* a, const uint64_t* b) {
    for (int i = 3; i >= 0; --i)
        if (a[i] != b[i]) return a[i] < b[i] ? -1 : 1;
    return 0;
}

// ---- Conversion

BIGF big_from_int(int64_t v) {
    uint64_t w = v < 0 ? -static_cast<uint64_t>(v) : static_cast<uint64_t>(v);
    BIGF r = big_from_words(&w, 1, 0);
    r.neg = v < 0;
    return r;
}

BIGF big_from_simul(const simul_fval* x) {
    UWIDE d = digits_of(x);
    uint64_t w[2] = {static_cast<uint64_t>(d), static_cast<uint64_t>(d >> 64)};
    BIGF r = big_from_words(w, 2, int64_t{x->exp} - 96);
    r.neg = x->sign;
    return r;
}

int big_to_simul(const BIGF& a, simul_fval* x) {
    if (a.is_zero()) return set_zero(x, a.neg);
    // Bits that the aligned digits hold.
    int keep = 96 - static_cast<int>(((a.exp + 15) & ~int64_t{15}) - a.exp);
    UWIDE top = static_cast<UWIDE>(a.m[3]) << 64 | a.m[2];
    UWIDE kept = top >> (128 - keep);
    uint64_t tail[4];
    extract(a.m, 4, 256 - keep - 100, tail);
    tail[1] &= (uint64_t{1} << 36) - 1;
    if (tail[0] == 0 && tail[1] == 0) return pack(x, a.neg, kept, a.exp - keep, false);
    if (tail[0] == ~uint64_t{0} && tail[1] == (uint64_t{1} << 36) - 1)
        return pack(x, a.neg, kept + 1, a.exp - keep, false);
    return pack(x, a.neg, kept << 32 | 1, a.exp - keep - 32, false);
}

int64_t big_nearest(const BIGF& a) {
    if (a.is_zero() || a.exp < 0) return 0;
    // One bit behind the point rounds.
    uint64_t twice = a.m[3] >> (63 - a.exp);
    int64_t v = static_cast<int64_t>((twice + 1) >> 1);
    return a.neg ? -v : v;
}

// ---- Arithmetic

int big_compare(const BIGF& a, const BIGF& b) {
    if (a.is_zero() || b.is_zero()) return static_cast<int>(b.is_zero()) - static_cast<int>(a.is_zero());
    if (a.exp != b.exp) return a.exp < b.exp ? -1 : 1;
    return compare_words(a.m, b.m);
}

BIGF operator-(const BIGF& a) {
    BIGF r = a;
    r.neg = !a.neg;
    return r;
}

BIGF operator+(const BIGF& a, const BIGF& b) {
    if (b.is_zero()) return a;
    if (a.is_zero()) return b;
    bool swap = big_compare(a, b) < 0;
    const BIGF &large = swap ? b : a, &small = swap ? a : b;
    int64_t distance = large.exp - small.exp;
    if (distance > 256) return large;
    // The larger above a guard word, the smaller shifted down below it.
    uint64_t w[6] = {0, large.m[0], large.m[1], large.m[2], large.m[3], 0}, s[6] = {0, 0, 0, 0, 0, 0};
    uint64_t source[5] = {0, small.m[0], small.m[1], small.m[2], small.m[3]};
    extract(source, 5, static_cast<int>(distance), s);
    uint64_t above[4];
    extract(source, 5, static_cast<int>(distance) + 256, above);
    s[4] = above[0];
    unsigned __int128 carry = 0;
    bool subtract = a.neg != b.neg;
    for (int i = 0; i < 6; ++i) {
        carry = subtract ? static_cast<unsigned __int128>(w[i]) - s[i] - static_cast<uint64_t>(carry)
                         : static_cast<unsigned __int128>(w[i]) + s[i] + static_cast<uint64_t>(carry);
        w[i] = static_cast<uint64_t>(carry);
        carry = static_cast<uint64_t>(carry >> 64) & 1;
    }
    BIGF r = big_from_words(w, 6, large.exp - 320);
    r.neg = r.is_zero() ? 0 : large.neg;
    return r;
}

BIGF operator-(const BIGF& a, const BIGF& b) { return a + -b; }

BIGF operator*(const BIGF& a, const BIGF& b) {
    BIGF r;
    if (a.is_zero() || b.is_zero()) return r;
    uint64_t w[8] = {0, 0, 0, 0, 0, 0, 0, 0};
    for (int i = 0; i < 4; ++i) {
        uint64_t carry = 0;
        for (int k = 0; k < 4; ++k) {
            UWIDE t = static_cast<UWIDE>(a.m[i]) * b.m[k] + w[i + k] + carry;
            w[i + k] = static_cast<uint64_t>(t);
            carry = static_cast<uint64_t>(t >> 64);
        }
        w[i + 4] = carry;
    }
    r.exp = a.exp + b.exp;
    r.neg = a.neg ^ b.neg;
    if (w[7] >> 63) {
        memcpy(r.m, w + 4, sizeof r.m);
    } else {
        for (int i = 0; i < 4; ++i) r.m[i] = w[i + 4] << 1 | w[i + 3] >> 63;
        --r.exp;
    }
    return r;
}

// Long division in words (Knuth's algorithm D): the divisor has its top bit set, so that an estimate is at most 2 off.
BIGF operator/(const BIGF& a, const BIGF& b) {
    if (a.is_zero()) return a;
    uint64_t n[9] = {0, 0, 0, 0, a.m[0], a.m[1], a.m[2], a.m[3], 0}, q[5];
    for (int j = 4; j >= 0; --j) {
        UWIDE top = static_cast<UWIDE>(n[j + 4]) << 64 | n[j + 3];
        uint64_t estimate = n[j + 4] >= b.m[3] ? ~uint64_t{0} : static_cast<uint64_t>(top / b.m[3]);
        uint64_t carry = 0, borrow = 0;
        for (int i = 0; i < 4; ++i) {
            UWIDE product = static_cast<UWIDE>(estimate) * b.m[i] + carry;
            carry = static_cast<uint64_t>(product >> 64);
            UWIDE t = static_cast<UWIDE>(n[i + j]) - static_cast<uint64_t>(product) - borrow;
            n[i + j] = static_cast<uint64_t>(t);
            borrow = static_cast<uint64_t>(t >> 64) & 1;
        }
        UWIDE t = static_cast<UWIDE>(n[j + 4]) - carry - borrow;
        n[j + 4] = static_cast<uint64_t>(t);
        bool negative = (t >> 64) != 0;
        while (negative) {
            --estimate;
            UWIDE sum = 0;
            for (int i = 0; i < 4; ++i) {
                sum = (sum >> 64) + n[i + j] + b.m[i];
                n[i + j] = static_cast<uint64_t>(sum);
            }
            UWIDE last = (sum >> 64) + n[j + 4];
            n[j + 4] = static_cast<uint64_t>(last);
            negative = (last >> 64) == 0;
        }
        q[j] = estimate;
    }
    BIGF r = big_from_words(q, 5, a.exp - b.exp - 256);
    r.neg = a.neg ^ b.neg;
    return r;
}

BIGF big_div_small(const BIGF& a, uint64_t n) {
    uint64_t q[5];
    UWIDE rest = 0;
    for (int i = 4; i >= 0; --i) {
        rest = rest << 64 | (i ? a.m[i - 1] : 0);
        q[i] = static_cast<uint64_t>(rest / n);
        rest %= n;
    }
    BIGF r = big_from_words(q, 5, a.exp - 320);
    r.neg = a.neg;
    return r;
}

BIGF big_scale(const BIGF& a, int64_t n) {
    BIGF r = a;
    r.exp += n;
    return r;
}

// Newton's steps from a root that the simulator has right to 80 bits.
BIGF big_sqrt(const BIGF& a) {
    if (a.is_zero()) return a;
    BIGF near_one = a;
    int64_t half = a.exp >> 1;
    near_one.exp -= 2 * half;
    simul_fval start;
    big_to_simul(near_one, &start);
    f_sqrt(&start, &start);
    BIGF root = big_from_simul(&start);
    for (int i = 0; i < 2; ++i) root = big_scale(root + near_one / root, -1);
    return big_scale(root, half);
}
