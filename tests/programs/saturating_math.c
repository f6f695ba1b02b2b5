// Saturating and rounding arithmetic on fractions of 16 and 32 bits, normalization, block scaling.
#include <zrun.h>

typedef int q15;
typedef long q31;

static q31 add_sat(q31 a, q31 b) {
    unsigned long s = (unsigned long)a + (unsigned long)b;
    if (((a ^ b) & 0x80000000UL) == 0 && ((s ^ (unsigned long)a) & 0x80000000UL))
        return a < 0 ? -2147483647L - 1 : 2147483647L;
    return (q31)s;
}

static q31 sub_sat(q31 a, q31 b) {
    long long d = (long long)a - b;
    if (d > 2147483647LL) return 2147483647L;
    if (d < -2147483647LL - 1) return -2147483647L - 1;
    return (q31)d;
}

static q31 multiply(q15 a, q15 b) {
    if (a == -32767 - 1 && b == -32767 - 1) return 2147483647L;
    return (q31)a * b * 2;
}

static q15 round_q15(q31 v) { return (q15)(add_sat(v, 0x8000L) >> 16); }

static q15 negate(q15 a) { return a == -32767 - 1 ? 32767 : -a; }
static q15 magnitude(q15 a) { return a < 0 ? negate(a) : a; }

static q15 shift_left(q15 a, int n) {
    while (n-- > 0) {
        if (a > 16383) return 32767;
        if (a < -16384) return -32767 - 1;
        a *= 2;
    }
    return a;
}

static q15 divide(q15 n, q15 d) { /* 0 <= n <= d, d > 0 */
    q15 q = 0;
    long r = n;
    int i;
    if (n == d) return 32767;
    for (i = 0; i < 15; i++) {
        r <<= 1;
        q *= 2;
        if (r >= d) {
            r -= d;
            q++;
        }
    }
    return q;
}

static int headroom(const q15* v, int n) {
    unsigned all = 0;
    int bits = 0;
    while (n-- > 0) all |= (unsigned)(*v < 0 ? ~*v : *v), v++;
    while (bits < 15 && !(all & 0x4000u)) {
        all <<= 1;
        bits++;
    }
    return bits;
}

static q31 energy(const q15* v, int n) {
    q31 acc = 0;
    for (; n; n--, v++) acc = add_sat(acc, multiply(*v, *v));
    return acc;
}

int main(void) {
    static const q31 longs[] = {0L, 1L, -1L, 0x40000000L, -0x40000000L, 2147483647L, -2147483647L - 1};
    static const q15 shorts[] = {0, 1, -1, 16384, -16384, 12345, 32767, -32767, -32767 - 1};
    static const q15 quiet[] = {3, -9, 14, -2}, loud[] = {32767, -32767 - 1, 30000, 1};
    int i, j;
    for (i = 0; i < 7; i++)
        for (j = i; j < 7; j++) {
            put_i32(add_sat(longs[i], longs[j]));
            put_i32(sub_sat(longs[i], longs[j]));
        }
    for (i = 0; i < 9; i++) {
        put_i16(negate(shorts[i]));
        put_i16(magnitude(shorts[i]));
        put_i16(shift_left(shorts[i], i));
        for (j = i; j < 9; j += 2) put_i16(round_q15(multiply(shorts[i], shorts[j])));
    }
    put_i16(divide(1, 2));
    put_i16(divide(12345, 32767));
    put_i16(divide(5, 5));
    put_i16(headroom(quiet, 4));
    put_i16(headroom(loud, 4));
    put_i16(headroom(quiet, 0));
    put_i32(energy(quiet, 4));
    put_i32(energy(loud, 4));
    return 0;
}
