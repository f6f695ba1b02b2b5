// Arithmetic of 16, 32 and 64 bits at its extremes, both signs: in loops, by constants, through hidden operands, mixed.
// Steps that ask for what bodies do, behind the expansion of a function that goes with its last call:
// optimize: --call_assumptions=2 --opt_passes=6,10,5
#include <zrun.h>

typedef long long i64;
typedef unsigned long long u64;

static const int ints[] = {0, 1, -1, 2, -2, 7, -7, 255, 256, 16383, 16384, 32766, 32767, -32766, -32767, -32767 - 1};
static const long longs[] = {0L,     1L,      -1L,    10L,    -10L,        32767L,      -32768L,      65535L,
                             65536L, -65537L, 46340L, 46341L, 1073741824L, 2147483647L, -2147483647L, -2147483647L - 1};
static const i64 wides[] = {0LL,
                            1LL,
                            -1LL,
                            100LL,
                            -100LL,
                            65536LL,
                            4294967295LL,
                            4294967296LL,
                            -4294967297LL,
                            1000000007LL,
                            9223372036854775807LL,
                            -9223372036854775807LL,
                            -9223372036854775807LL - 1};
#define COUNT(values) (int)(sizeof values / sizeof values[0])

static u64 mix(u64 d, u64 v) { return (d ^ v) * 1099511628211ULL; }

static int sum_fits(i64 a, i64 b, i64 min, i64 max) { return b > 0 ? a <= max - b : a >= min - b; }

/* product(a, b) is what may be multiplied with a sign. */
#define WIDTH(name, S, U, bits, min, max, product)                                                                     \
    static u64 pair_##name(S a, S b, u64 d) {                                                                          \
        U ua = (U)a, ub = (U)b;                                                                                        \
        if (sum_fits(a, b, min, max)) d = mix(d, (u64)(a + b));                                                        \
        if (b > min && sum_fits(a, -b, min, max)) d = mix(d, (u64)(a - b));                                            \
        if (product(a, b)) d = mix(d, (u64)(a * b));                                                                   \
        if (b != 0 && !(a == min && b == -1)) {                                                                        \
            d = mix(mix(d, (u64)(a / b)), (u64)(a % b));                                                               \
            if ((a / b) * b + a % b != a) put_str("division law");                                                     \
        }                                                                                                              \
        if (ub != 0) d = mix(mix(d, ua / ub), ua % ub);                                                                \
        d = mix(mix(mix(d, (U)(ua + ub)), (U)(ua - ub)), (U)(ua * ub));                                                \
        d = mix(mix(mix(d, ua & ub), ua | ub), (U)(ua ^ ~ub));                                                         \
        d = mix(d, (u64)((a < b) | (a <= b) << 1 | (a > b) << 2 | (a >= b) << 3 | (a == b) << 4 | (a != b) << 5));     \
        return mix(d, (u64)((ua < ub) | (ua <= ub) << 1 | (ua > ub) << 2 | (ua >= ub) << 3));                          \
    }                                                                                                                  \
    static void all_##name(const S* values, int count) {                                                               \
        u64 d = 14695981039346656037ULL;                                                                               \
        int i, j;                                                                                                      \
        for (i = 0; i < count; i++) {                                                                                  \
            S a = values[i];                                                                                           \
            for (j = 0; j < count; j++) d = pair_##name(a, values[j], d);                                              \
            put_i64((i64)d);                                                                                           \
            for (j = 0; j < bits; j += bits / 16) d = mix(mix(mix(d, (U)((U)a << j)), (U)a >> j), (u64)(a >> j));      \
            d = mix(mix(mix(mix(d, (unsigned)a), (unsigned long)a), (u64)(int)(a & 0x7FFF)), (u64)(U)a);               \
            put_i64((i64)d);                                                                                           \
        }                                                                                                              \
    }

#define SMALL_PRODUCT(a, b) ((i64)(a) * (b) >= -32768LL && (i64)(a) * (b) <= 32767LL)
#define LONG_PRODUCT(a, b) ((i64)(a) * (b) >= -2147483648LL && (i64)(a) * (b) <= 2147483647LL)
#define NO_PRODUCT(a, b) 0
WIDTH(int, int, unsigned, 16, -32767 - 1, 32767, SMALL_PRODUCT)
WIDTH(long, long, unsigned long, 32, -2147483647L - 1, 2147483647L, LONG_PRODUCT)
WIDTH(wide, i64, u64, 64, -9223372036854775807LL - 1, 9223372036854775807LL, NO_PRODUCT)

/* Operands that only the run knows, by constants. */
#define HIDDEN(low, high, U)                                                                                           \
    (put_i64(low / 10), put_i64(low % 10), put_i64(low / 2), put_i64(low / -2), put_i64(high / -7),                    \
     put_i64(high % -10), put_i64(low >> 15), put_i64(high >> 14), put_i64(low < high), put_i64((U)low > (U)high),     \
     put_i64(low + high), put_i64(low + 1 == -high), put_i64(-(low + 1)), put_i64(~low == high),                       \
     put_i64((i64)((U)low * 2u)), put_i64((i64)(U)((U)high + (U)high)), put_i64((i64)(U)low))

static void high_product(u64 a, u64 b) {
    u64 a0 = a & 0xFFFFFFFFULL, a1 = a >> 32, b0 = b & 0xFFFFFFFFULL, b1 = b >> 32;
    u64 mid = a1 * b0 + (a0 * b0 >> 32), mid2 = a0 * b1 + (mid & 0xFFFFFFFFULL);
    put_i64((i64)(a1 * b1 + (mid >> 32) + (mid2 >> 32)));
}

int main(void) {
    volatile int low = -32767 - 1, high = 32767, small = -3;
    volatile long low_long = -2147483647L - 1, high_long = 2147483647L;
    volatile i64 low_wide = -9223372036854775807LL - 1, high_wide = 9223372036854775807LL;
    volatile unsigned big = 65533u;
    all_int(ints, COUNT(ints));
    all_long(longs, COUNT(longs));
    all_wide(wides, COUNT(wides));
    HIDDEN(low, high, unsigned);
    HIDDEN(low_long, high_long, unsigned long);
    HIDDEN(low_wide, high_wide, u64);
    put_i32((long)low * low);
    put_i32((long)low - high);
    put_u32((unsigned long)low);
    put_i32(high_long % small);
    put_i32(low_long / small);
    put_i32(high_long / (long)big);
    put_u32((unsigned long)high_long * big);
    put_i32(small + (long)big);
    put_i16(small < (long)big);
    put_i16((unsigned)small == big);
    put_i16((long)small == (long)big);
    put_i16((unsigned long)small > (unsigned long)big);
    put_i64((i64)low_long - high_long);
    high_product(0xFFFFFFFFFFFFFFFFULL, 0xFFFFFFFFFFFFFFFFULL);
    high_product(0x123456789ABCDEFULL, 0xFEDCBA987654321ULL);
    return 0;
}
