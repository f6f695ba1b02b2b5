// FIR filters on 16-bit fractions: direct, circular history, symmetric, decimating, interpolating.
#include <zrun.h>

#define TAPS 16
#define N 48

static const int taps[TAPS] = {-120, 210,  480,  -655,  -1311, 2200, 5243, 9830,
                               9830, 5243, 2200, -1311, -655,  480,  210,  -120};
static int input[N], output[N];

static int saturate(long v) {
    if (v > 32767L) return 32767;
    if (v < -32768L) return -32767 - 1;
    return (int)v;
}

static void make_input(void) {
    unsigned long seed = 12345UL;
    int i;
    for (i = 0; i < N; i++) {
        seed = seed * 1664525UL + 1013904223UL;
        input[i] = (int)(seed >> 18) - 8192;
    }
}

static void fir_direct(const int* x, int* y, int n) {
    int i, k;
    for (i = TAPS - 1; i < n; i++) {
        long sum = 1L << 14;
        for (k = 0; k < TAPS; k++) sum += (long)taps[k] * x[i - k];
        y[i] = saturate(sum >> 15);
    }
}

static void fir_circular(const int* x, int* y, int n) {
    int history[TAPS], at = 0, i, k;
    for (k = 0; k < TAPS; k++) history[k] = 0;
    for (i = 0; i < n; i++) {
        long sum = 1L << 14;
        int p;
        history[at] = x[i];
        p = at;
        for (k = 0; k < TAPS; k++) {
            sum += (long)taps[k] * history[p];
            p = p == 0 ? TAPS - 1 : p - 1;
        }
        at = (at + 1) % TAPS;
        y[i] = saturate(sum >> 15);
    }
}

static int fir_symmetric(const int* newest) {
    long sum = 1L << 14;
    const int *lo = newest, *hi = newest - (TAPS - 1);
    const int* h = taps;
    while (lo > hi) sum += *h++ * ((long)*lo-- + *hi++);
    return saturate(sum >> 15);
}

static int decimate(const int* x, int* y, int n, int m) {
    int made = 0, i, k;
    for (i = TAPS - 1; i < n; i += m) {
        long sum = 0;
        for (k = 0; k < TAPS; k++) sum += (long)x[i - k] * taps[k];
        y[made++] = (int)(sum >> 16);
    }
    return made;
}

static long interpolate(const int* x, int n, int phases) {
    long total = 0;
    int i, p, k;
    for (i = TAPS / phases; i < n; i++)
        for (p = 0; p < phases; p++) {
            long sum = 0;
            for (k = p; k < TAPS; k += phases) sum += (long)taps[k] * x[i - k / phases];
            total ^= sum + p;
        }
    return total;
}

int main(void) {
    int i, made;
    make_input();
    fir_direct(input, output, N);
    for (i = TAPS - 1; i < N; i += 5) put_i16(output[i]);
    for (i = TAPS - 1; i < N; i++)
        if (fir_symmetric(&input[i]) != output[i]) put_str("symmetric form differs");
    fir_circular(input, output, N);
    for (i = 0; i < N; i += 6) put_i16(output[i]);
    for (i = 2; i <= 5; i++) {
        made = decimate(input, output, N, i);
        put_i16(made);
        put_i16(output[made - 1]);
    }
    put_i32(interpolate(input, N, 2));
    put_i32(interpolate(input, N, 4));
    put_i16(saturate(40000L));
    put_i16(saturate(-40000L));
    return 0;
}
