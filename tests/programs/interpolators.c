// Resampling and interpolation of signals: linear, cubic, polyphase by table, and sigma-delta noise shaping.
#include <zrun.h>

#define N 20

static int in[N];

static int linear(long position) { /* 8 bits of fraction */
    int i = (int)(position >> 8), f = (int)(position & 255L);
    if (i >= N - 1) return in[N - 1];
    return in[i] + (int)(((long)in[i + 1] - in[i]) * f >> 8);
}

static int cubic(long position) {
    int i = (int)(position >> 8);
    long f = position & 255L, a, b, c, r;
    if (i < 1 || i > N - 3) return linear(position);
    a = 3L * (in[i] - in[i + 1]) - in[i - 1] + in[i + 2];
    b = 2L * in[i - 1] - 5L * in[i] + 4L * in[i + 1] - in[i + 2];
    c = (long)in[i + 1] - in[i - 1];
    r = (a * f >> 8) + b;
    r = (r * f >> 8) + c;
    r = r * f >> 9;
    return (int)(r + in[i]);
}

static int resample(long step, int (*at)(long), int* out, int room) {
    long position;
    int n = 0;
    for (position = 0; position < (long)(N - 1) << 8 && n < room; position += step) out[n++] = at(position);
    return n;
}

static int shape(const int* x, int n, int bits) {
    long error = 0, before = 0;
    int i, ones = 0;
    long quantum = 1L << (16 - bits);
    for (i = 0; i < n; i++) {
        long want = x[i] + 2 * error - before;
        long q = (want + (quantum >> 1)) / quantum * quantum;
        before = error;
        error = want - q;
        ones += (int)(q / quantum);
    }
    return ones;
}

static long cic(const int* x, int n, int r) { /* three stages, by r */
    unsigned long i1 = 0, i2 = 0, i3 = 0, c1 = 0, c2 = 0, c3 = 0, check = 0;
    int k;
    for (k = 0; k < n; k++) {
        i1 += (unsigned long)(long)x[k];
        i2 += i1;
        i3 += i2;
        if (k % r == r - 1) {
            unsigned long a = i3 - c1, b = a - c2, c = b - c3;
            c1 = i3;
            c2 = a;
            c3 = b;
            check = check * 5UL + c;
        }
    }
    return (long)(check & 0x7FFFFFFFUL);
}

int main(void) {
    int out[64], i, n;
    for (i = 0; i < N; i++) in[i] = (i % 7 - 3) * 900 + i * 11;
    n = resample(100L, linear, out, 64);
    put_i16(n);
    for (i = 0; i < n; i += 6) put_i16(out[i]);
    n = resample(100L, cubic, out, 64);
    put_i16(n);
    for (i = 0; i < n; i += 6) put_i16(out[i]);
    n = resample(256L, cubic, out, 64);
    for (i = 0; i < n; i++)
        if (out[i] != in[i]) put_i16(i);
    put_i16(resample(7L, linear, out, 64));
    put_i16(resample(20000L, linear, out, 64));
    for (i = 4; i <= 12; i += 4) put_i16(shape(in, N, i));
    put_i32(cic(in, N, 4));
    put_i32(cic(in, N, 1));
    put_i32(cic(in, 3, 4));
    return 0;
}
