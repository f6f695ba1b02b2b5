// 128-bit integers in big-endian bytes.
#include "XINT/xint.h"

#include <cstring>
#include <endian.h>

using WIDE = __int128;
using UWIDE = unsigned __int128;

#define ZERO8 0, 0, 0, 0, 0, 0, 0, 0
#define ONES8 255, 255, 255, 255, 255, 255, 255, 255
#define SMALL(n)                                                                                                       \
    { ZERO8, 0, 0, 0, 0, 0, 0, 0, n }

const XINT xi_zero = SMALL(0), xi_one = SMALL(1), xi_ten = SMALL(10);
const XINT xi_negone = {ONES8, ONES8};
const XINT xi_not1f = {ONES8, 255, 255, 255, 255, 255, 255, 255, 0xE0};
const XINT xi_minint = {0x80, 0, 0, 0, 0, 0, 0, 0, ZERO8};
const XINT xi_maxint = {0x7F, 255, 255, 255, 255, 255, 255, 255, ONES8};
const XINT xi_32bitmask = {ZERO8, 0, 0, 0, 0, 255, 255, 255, 255};
const XINT xi_dig[10] = {SMALL(0), SMALL(1), SMALL(2), SMALL(3), SMALL(4),
                         SMALL(5), SMALL(6), SMALL(7), SMALL(8), SMALL(9)};
int xi_error;

static const WIDE wide_min = static_cast<WIDE>(UWIDE{1} << 127);

static UWIDE get(const uint8_t* a) {
    uint64_t w[2];
    memcpy(w, a, 16);
    return static_cast<UWIDE>(be64toh(w[0])) << 64 | be64toh(w[1]);
}

static WIDE sget(const uint8_t* a) { return static_cast<WIDE>(get(a)); }

static void put(UWIDE v, uint8_t* r) {
    uint64_t w[2] = {htobe64(static_cast<uint64_t>(v >> 64)), htobe64(static_cast<uint64_t>(v))};
    memcpy(r, w, 16);
}

// ---- Arithmetic

int XI_add(const uint8_t* a, const uint8_t* b, uint8_t* r) {
    UWIDE sum;
    int carry = __builtin_add_overflow(get(a), get(b), &sum);
    put(sum, r);
    return carry;
}

int XI_sub(const uint8_t* a, const uint8_t* b, uint8_t* r) {
    UWIDE difference;
    int borrow = __builtin_sub_overflow(get(a), get(b), &difference);
    put(difference, r);
    return borrow;
}

int XI_neg(const uint8_t* a, uint8_t* r) {
    UWIDE v = get(a);
    put(-v, r);
    return v == static_cast<UWIDE>(wide_min);
}

int XI_and(const uint8_t* a, const uint8_t* b, uint8_t* r) {
    put(get(a) & get(b), r);
    return 0;
}

int XI_or(const uint8_t* a, const uint8_t* b, uint8_t* r) {
    put(get(a) | get(b), r);
    return 0;
}

int XI_xor(const uint8_t* a, const uint8_t* b, uint8_t* r) {
    put(get(a) ^ get(b), r);
    return 0;
}

int XI_notb(const uint8_t* a, uint8_t* r) {
    put(~get(a), r);
    return 0;
}

static int saturate(bool negative, uint8_t* r) {
    XI_asg(negative ? xi_minint : xi_maxint, r);
    return 1;
}

int XI_mpy(const uint8_t* a, const uint8_t* b, uint8_t* r) {
    WIDE x = sget(a), y = sget(b), product;
    if (__builtin_mul_overflow(x, y, &product)) return saturate((x < 0) != (y < 0), r);
    put(product, r);
    return 0;
}

int XI_div(const uint8_t* a, const uint8_t* b, uint8_t* r) {
    WIDE x = sget(a), y = sget(b);
    if (y == 0) return saturate(x < 0, r);
    if (x == wide_min && y == -1) return saturate(false, r);
    put(x / y, r);
    return 0;
}

int XI_mod(const uint8_t* a, const uint8_t* b, uint8_t* r) {
    WIDE x = sget(a), y = sget(b);
    if (y == 0) return saturate(x < 0, r);
    put(y == -1 ? 0 : x % y, r);
    return 0;
}

// ---- Shifts

static int size_of(WIDE v) {
    UWIDE bits = v < 0 ? ~static_cast<UWIDE>(v) : v;
    uint64_t high = static_cast<uint64_t>(bits >> 64), low = static_cast<uint64_t>(bits);
    if (high) return 129 - __builtin_clzll(high);
    return low ? 65 - __builtin_clzll(low) : 1;
}

static int shift(WIDE v, int64_t left, uint8_t* r) {
    if (left <= 0) {
        put(v >> (left < -127 ? 127 : -left), r);
        return 0;
    }
    if (v == 0) {
        put(0, r);
        return 0;
    }
    if (size_of(v) + left > 128) {
        put(0, r);
        xi_error = 1;
        return 1;
    }
    put(static_cast<UWIDE>(v) << left, r);
    return 0;
}

int XI_shl(const uint8_t* a, int n, uint8_t* r) { return shift(sget(a), n, r); }
int XI_shr(const uint8_t* a, int n, uint8_t* r) { return shift(sget(a), -static_cast<int64_t>(n), r); }
int XI_size(const uint8_t* a) { return size_of(sget(a)); }

// ---- Compare and copy

int XI_cmp(const uint8_t* a, const uint8_t* b) {
    WIDE x = sget(a), y = sget(b);
    return x < y ? -1 : x > y;
}

int XI_eq(const uint8_t* a, const uint8_t* b) { return XI_cmp(a, b) == 0; }
int XI_ne(const uint8_t* a, const uint8_t* b) { return XI_cmp(a, b) != 0; }
int XI_lt(const uint8_t* a, const uint8_t* b) { return XI_cmp(a, b) < 0; }
int XI_le(const uint8_t* a, const uint8_t* b) { return XI_cmp(a, b) <= 0; }
int XI_gt(const uint8_t* a, const uint8_t* b) { return XI_cmp(a, b) > 0; }
int XI_ge(const uint8_t* a, const uint8_t* b) { return XI_cmp(a, b) >= 0; }
void XI_asg(const uint8_t* a, uint8_t* r) { memmove(r, a, 16); }

// ---- Conversion

void XI_itox(int32_t v, uint8_t* r) { put(static_cast<WIDE>(v), r); }
void XI_llitox(int64_t v, uint8_t* r) { put(static_cast<WIDE>(v), r); }
void XI_utox(uint32_t v, uint8_t* r) { put(v, r); }
void XI_llutox(uint64_t v, uint8_t* r) { put(v, r); }
int32_t XI_xtoi(const uint8_t* a) { return static_cast<int32_t>(get(a)); }
int64_t XI_xtolli(const uint8_t* a) { return static_cast<int64_t>(get(a)); }
uint32_t XI_xtou(const uint8_t* a) { return static_cast<uint32_t>(get(a)); }
uint64_t XI_xtollu(const uint8_t* a) { return static_cast<uint64_t>(get(a)); }

void XI_dump(const uint8_t* a) {
    for (int i = 0; i < 16; ++i) printf("%02x%s", a[i], i == 15 ? "\n" : i % 4 == 3 ? " " : "");
}
