// 64-bit arithmetic: carries across words, division, shifts by variables, comparisons, narrowing.
#include <zrun.h>

typedef long long i64;
typedef unsigned long long u64;

static const i64 values[] = {0,
                             1,
                             -1,
                             100,
                             -100,
                             65536LL,
                             4294967295LL,
                             4294967296LL,
                             -4294967297LL,
                             1000000007LL,
                             9223372036854775807LL,
                             -9223372036854775807LL,
                             -9223372036854775807LL - 1};
#define COUNT 13

static u64 mix(u64 d, u64 v) { return (d ^ v) * 1099511628211ULL; }

static int add_fits(i64 a, i64 b) {
    if (b > 0) return a <= 9223372036854775807LL - b;
    return a >= -9223372036854775807LL - 1 - b;
}

static void high_product(u64 a, u64 b) {
    u64 a0 = a & 0xFFFFFFFFULL, a1 = a >> 32, b0 = b & 0xFFFFFFFFULL, b1 = b >> 32;
    u64 mid = a1 * b0 + (a0 * b0 >> 32), mid2 = a0 * b1 + (mid & 0xFFFFFFFFULL);
    put_i64((i64)(a1 * b1 + (mid >> 32) + (mid2 >> 32)));
}

static int bits(u64 v) {
    int n = 0;
    for (; v; v &= v - 1) n++;
    return n;
}

static u64 gcd(u64 a, u64 b) {
    while (b) {
        u64 t = a % b;
        a = b;
        b = t;
    }
    return a;
}

int main(void) {
    u64 d = 14695981039346656037ULL;
    int i, j;
    for (i = 0; i < COUNT; i++) {
        i64 a = values[i];
        for (j = 0; j < COUNT; j++) {
            i64 b = values[j];
            if (add_fits(a, b)) d = mix(d, (u64)(a + b));
            d = mix(d, (u64)a - (u64)b);
            d = mix(d, (u64)a * (u64)b);
            if (b != 0 && !(b == -1 && a < -9223372036854775807LL)) d = mix(mix(d, (u64)(a / b)), (u64)(a % b));
            if (b != 0) d = mix(mix(d, (u64)a / (u64)b), (u64)a % (u64)b);
            d = mix(d, (u64)((a < b) + 2 * (a >= b) + 4 * ((u64)a < (u64)b) + 8 * (a == b)));
        }
        put_i64((i64)d);
        for (j = 0; j < 64; j += 7) d = mix(d, ((u64)a << j) ^ ((u64)a >> j) ^ (u64)(a >> j));
        put_i64((i64)d);
        put_i32((long)(u64)(a & 0x7FFFFFFFLL));
        put_i16((int)(a & 0x7FFF));
        put_i16(bits((u64)a));
    }
    high_product(0xFFFFFFFFFFFFFFFFULL, 0xFFFFFFFFFFFFFFFFULL);
    high_product(0x123456789ABCDEFULL, 0xFEDCBA987654321ULL);
    put_i64((i64)gcd(1000000016000000063ULL, 1000000007ULL * 6ULL));
    put_i64((i64)gcd(600851475143ULL, 8462696833ULL));
    put_i64(-9223372036854775807LL / 10);
    put_i64(-9223372036854775807LL % 10);
    return 0;
}
