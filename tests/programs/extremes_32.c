// 32-bit arithmetic at its extremes, both signs, and mixed with 16 bits.
#include <zrun.h>

static const long values[] = {
    0L,     1L,      -1L,    10L,    -10L,        32767L,      -32768L,      65535L,
    65536L, -65537L, 46340L, 46341L, 1073741824L, 2147483647L, -2147483647L, -2147483647L - 1};
#define COUNT (sizeof values / sizeof values[0])

static int fits(long long v) { return v >= -2147483647LL - 1 && v <= 2147483647LL; }

static unsigned long step(unsigned long d, unsigned long v) { return (d << 5 | d >> 27) ^ v; }

static unsigned long pair(long a, long b, unsigned long d) {
    unsigned long ua = (unsigned long)a, ub = (unsigned long)b;
    if (fits((long long)a + b)) d = step(d, (unsigned long)(a + b));
    if (fits((long long)a - b)) d = step(d, (unsigned long)(a - b));
    if (fits((long long)a * b)) d = step(d, (unsigned long)(a * b));
    if (b != 0 && !(a == -2147483647L - 1 && b == -1)) {
        d = step(d, (unsigned long)(a / b));
        d = step(d, (unsigned long)(a % b));
        if ((a / b) * b + a % b != a) put_str("division law");
    }
    d = step(d, ua + ub);
    d = step(d, ua - ub);
    d = step(d, ua * ub);
    if (ub) d = step(d, ua / ub ^ ua % ub);
    d = step(d, (unsigned long)((a < b) + 2 * (a <= b) + 4 * (a == b) + 8 * (ua < ub) + 16 * (ua >= ub)));
    return d;
}

static void narrow(long v) {
    put_i16((int)(unsigned)v);
    put_u32((unsigned)v);
    put_u32((unsigned long)(v >> 16));
    put_u32((unsigned long)v >> 16);
}

int main(void) {
    volatile long low = -2147483647L - 1, high = 2147483647L;
    volatile int small = -3;
    volatile unsigned big = 65533u;
    unsigned long d = 1;
    unsigned i, j;
    int s;
    for (i = 0; i < COUNT; i++) {
        for (j = 0; j < COUNT; j++) d = pair(values[i], values[j], d);
        put_u32(d);
        for (s = 0; s < 32; s += 3) {
            d = step(d, (unsigned long)values[i] << s);
            d = step(d, (unsigned long)values[i] >> s);
            d = step(d, (unsigned long)(values[i] >> s));
        }
        put_u32(d);
        narrow(values[i]);
    }
    put_i32(low / 10);
    put_i32(low % 10);
    put_i32(high / -7);
    put_i32(high % small);
    put_i32(low / small);
    put_i32(high / (long)big);
    put_u32((unsigned long)high * big);
    put_i32(small + (long)big);
    put_i16(small < (long)big);
    put_i16((unsigned)small == big);
    put_i16((long)small == (long)big);
    put_i16((unsigned long)small > (unsigned long)big);
    put_i32(low + high);
    put_i64((long long)low - high);
    put_u32((unsigned long)low + (unsigned long)low);
    return 0;
}
