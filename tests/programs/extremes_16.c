// 16-bit arithmetic at its extremes, both signs, through volatile operands and through constants.
#include <zrun.h>

static const int values[] = {0, 1, -1, 2, -2, 7, -7, 255, 256, 16383, 16384, 32766, 32767, -32766, -32767, -32767 - 1};
#define COUNT (int)(sizeof values / sizeof values[0])

static int fits(long v) { return v >= -32768L && v <= 32767L; }

static void pair(int a, int b, unsigned long* d) {
    unsigned ua = (unsigned)a, ub = (unsigned)b;
    unsigned long h = *d;
    if (fits((long)a + b)) h = h * 31UL + (unsigned long)(a + b);
    if (fits((long)a - b)) h = h * 31UL + (unsigned long)(a - b);
    if (fits((long)a * b)) h = h * 31UL + (unsigned long)(a * b);
    if (b != 0 && !(a == -32767 - 1 && b == -1)) h = h * 31UL + (unsigned long)(a / b) * 3UL + (unsigned long)(a % b);
    h = h * 31UL + (ua + ub);
    h = h * 31UL + (ua - ub);
    h = h * 31UL + (unsigned long)(ua * ub);
    if (ub != 0) h = h * 31UL + ua / ub + 5UL * (ua % ub);
    h = h * 31UL + (ua & ub) + 2UL * (ua | ub) + 4UL * (ua ^ ub) + 8UL * ~ua;
    h = h * 31UL +
        (unsigned long)((a < b) | (a <= b) << 1 | (a > b) << 2 | (a >= b) << 3 | (a == b) << 4 | (a != b) << 5);
    h = h * 31UL + (unsigned long)((ua < ub) | (ua <= ub) << 1 | (ua > ub) << 2 | (ua >= ub) << 3);
    *d = h;
}

static void shifts(int a) {
    unsigned ua = (unsigned)a;
    unsigned long d = 0;
    int s;
    for (s = 0; s < 16; s++) {
        d = d * 7UL + (ua << s);
        d = d * 7UL + (ua >> s);
        d = d * 7UL + (unsigned long)(a >> s);
    }
    put_u32(d);
}

int main(void) {
    volatile int low = -32767 - 1, high = 32767;
    unsigned long d = 0;
    int i, j;
    for (i = 0; i < COUNT; i++) {
        for (j = 0; j < COUNT; j++) pair(values[i], values[j], &d);
        put_u32(d);
        shifts(values[i]);
    }
    put_i16(low / 2);
    put_i16(low % 7);
    put_i16(low / -2);
    put_i16(high / -3);
    put_i16(high % -10);
    put_i16(low >> 15);
    put_i16(high >> 14);
    put_i16(low < high);
    put_i16((unsigned)low > (unsigned)high);
    put_i16(low + high);
    put_i16(low + 1 == -high);
    put_i16(-(low + 1));
    put_i16(~low == high);
    put_i32((long)low * low);
    put_i32((long)low - high);
    put_u32((unsigned)low * 2u);
    put_u32((unsigned)high + (unsigned)high);
    put_u32((unsigned long)(unsigned)low);
    put_u32((unsigned long)low);
    return 0;
}
