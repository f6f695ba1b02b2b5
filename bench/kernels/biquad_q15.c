// Cascades of second-order sections in 16-bit fractions, both direct forms, with limit cycles and overflow.
#include <zrun.h>

struct section {
    int b0, b1, b2, a1, a2;
    int x1, x2, y1, y2;
};

static struct section cascade[3] = {
    {1024, 2048, 1024, -14000, 6200, 0, 0, 0, 0},
    {4096, -8192, 4096, -12000, 5000, 0, 0, 0, 0},
    {16384, 0, -16384, 3000, 9000, 0, 0, 0, 0},
};

static int clip(long v) { return v > 32767L ? 32767 : v < -32768L ? -32767 - 1 : (int)v; }

static int run_section(struct section* s, int x) {
    long sum = (long)s->b0 * x;
    int y;
    sum += (long)s->b1 * s->x1;
    sum += (long)s->b2 * s->x2;
    sum -= (long)s->a1 * s->y1;
    sum -= (long)s->a2 * s->y2;
    y = clip((sum + 8192L) >> 14);
    s->x2 = s->x1;
    s->x1 = x;
    s->y2 = s->y1;
    s->y1 = y;
    return y;
}

static int run_cascade(int x) {
    unsigned i;
    for (i = 0; i < sizeof cascade / sizeof cascade[0]; i++) x = run_section(cascade + i, x);
    return x;
}

static void reset(void) {
    struct section* s;
    for (s = cascade; s != cascade + 3; s++) s->x1 = s->x2 = s->y1 = s->y2 = 0;
}

/* Direct form two keeps two states of 32 bits. */
static long form_two(const int* x, int n) {
    long w1 = 0, w2 = 0, check = 0;
    int i;
    for (i = 0; i < n; i++) {
        long w0 = (long)x[i] * 64L + ((1300L * (w1 >> 6)) >> 5) - ((560L * (w2 >> 6)) >> 5);
        long y = ((1024L * (w0 >> 8)) >> 6) + ((2048L * (w1 >> 8)) >> 6) + ((1024L * (w2 >> 8)) >> 6);
        w2 = w1;
        w1 = w0;
        check = (long)((unsigned long)check * 31UL) ^ y;
    }
    return check;
}

int main(void) {
    static int step[64];
    int i, y, peak = 0, at = -1;
    for (i = 0; i < 40; i++) {
        y = run_cascade(i == 0 ? 30000 : 0);
        if (i < 8 || i == 39) put_i16(y);
    }
    reset();
    for (i = 0; i < 100; i++) {
        y = run_cascade(i & 16 ? 32767 : -32767 - 1);
        if (y > peak) {
            peak = y;
            at = i;
        }
    }
    put_i16(peak);
    put_i16(at);
    put_i16(cascade[0].y1);
    put_i16(cascade[1].y2);
    put_i16(cascade[2].x1);
    for (i = 0; i < 64; i++) step[i] = (i % 16 - 8) * 1000;
    put_i32(form_two(step, 64));
    put_i32(form_two(step, 1));
    put_i32(form_two(step, 0));
    return 0;
}
