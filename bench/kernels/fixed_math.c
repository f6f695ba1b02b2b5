// Fixed-point square roots, reciprocals, division, logarithms, and exponent by tables and shifts.
#include <zrun.h>

static unsigned isqrt32(unsigned long v) {
    unsigned long bit = 1UL << 30, r = 0;
    while (bit > v) bit >>= 2;
    while (bit) {
        if (v >= r + bit) {
            v -= r + bit;
            r = (r >> 1) + bit;
        } else
            r >>= 1;
        bit >>= 2;
    }
    return (unsigned)r;
}

static unsigned newton_sqrt(unsigned v) {
    unsigned x, y;
    if (v < 2) return v;
    for (x = v, y = (v >> 1) + 1u; y < x; y = (x + v / x) >> 1) x = y;
    return x;
}

static unsigned long divide(unsigned long n, unsigned d, unsigned* rest) {
    unsigned long q = 0, r = 0;
    int i;
    for (i = 31; i >= 0; i--) {
        r = r << 1 | (n >> i & 1UL);
        q <<= 1;
        if (r >= d) {
            r -= d;
            q |= 1UL;
        }
    }
    *rest = (unsigned)r;
    return q;
}

static int log2_fraction(unsigned v) { /* 8 bits of fraction */
    int whole = 0, i;
    unsigned long m;
    if (v == 0) return -1;
    while (whole < 15 && v >> (whole + 1) != 0) whole++;
    m = (unsigned long)v << (15 - whole);
    for (i = 0; i < 8; i++) {
        m = m * m >> 15;
        whole <<= 1;
        if (m >= 65536UL) {
            m >>= 1;
            whole |= 1;
        }
    }
    return whole;
}

static int norm(long v) {
    int n = 0;
    if (v == 0) return 31;
    if (v < 0) v = ~v;
    while (n < 31 && !(v & 0x40000000L)) {
        v = (v << 1) & 0x7FFFFFFFL;
        n++;
    }
    return n;
}

int main(void) {
    static const unsigned long values[] = {0UL,     1UL,     2UL,       3UL,          4UL,          99UL,        100UL,
                                           65535UL, 65536UL, 1000000UL, 2147483648UL, 4294836225UL, 4294967295UL};
    unsigned i, rest, bad = 0;
    for (i = 0; i < sizeof values / sizeof values[0]; i++) {
        unsigned long q;
        put_u32(isqrt32(values[i]));
        q = divide(values[i], 10u, &rest);
        put_u32(q);
        put_u32(rest);
        if (q != values[i] / 10UL || rest != values[i] % 10UL) put_str("division differs");
    }
    for (i = 0; i < 2000; i += 7)
        if (newton_sqrt(i * 32u) != isqrt32(i * 32u)) bad++;
    put_i16((int)bad);
    put_u32(newton_sqrt(65535u));
    for (i = 1; i; i *= 3u) {
        put_i16(log2_fraction(i));
        if (i > 20000u) break;
    }
    put_i16(log2_fraction(0));
    put_i16(log2_fraction(65535u));
    put_i16(norm(0L));
    put_i16(norm(1L));
    put_i16(norm(-1L));
    put_i16(norm(0x3FFFFFFFL));
    put_i16(norm(0x40000000L));
    put_i16(norm(-2147483647L - 1));
    return 0;
}
