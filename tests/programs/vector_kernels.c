// Simple loops over arrays of every element type: sums, scaling, copies, extremes, with promised and unknown trips.
#include <zrun.h>

#define N 40

static int x16[N], y16[N], z16[N];
static long x32[N], y32[N];
static float xf[N], yf[N];
static long long xw[N];
static unsigned char bytes[N];

static void add16(int* restrict z, const int* restrict x, const int* restrict y, int n) {
    int i;
    for (i = 0; i < n; i++) z[i] = x[i] + y[i];
}

static long dot16(const int* x, const int* y, int n) {
    long s = 0;
    int i;
    for (i = 0; i < n; i++) s += (long)x[i] * y[i];
    return s;
}

static long dot_by_four(const int* x, const int* y) {
    long s = 0;
    int i;
    for (i = 0; i < N; i += 4) {
        s += (long)x[i] * y[i];
        s += (long)x[i + 1] * y[i + 1];
        s += (long)x[i + 2] * y[i + 2];
        s += (long)x[i + 3] * y[i + 3];
    }
    return s;
}

static void scale(float* y, const float* x, float k, int n) {
    int i;
    for (i = 0; i < n; i++) y[i] = k * x[i] + y[i];
}

static void extremes(const long* x, int n, long* low, long* high) {
    int i;
    *low = *high = x[0];
    for (i = 1; i < n; i++) {
        if (x[i] < *low) *low = x[i];
        if (x[i] > *high) *high = x[i];
    }
}

static int count_if(const int* x, int n, int limit) {
    int i, c = 0;
    for (i = 0; i < n; i++) c += x[i] > limit;
    return c;
}

static void reverse_copy(long* to, const long* from, int n) {
    int i;
    for (i = 0; i < n; i++) to[n - 1 - i] = from[i];
}

static void smooth(int* x, int n) {
    int i;
    for (i = 1; i < n; i++) x[i] = (x[i] + x[i - 1]) / 2;
}

static void shift_down(int* x, int n, int by) {
    int i;
    for (i = 0; i + by < n; i++) x[i] = x[i + by];
}

static void select(int* z, const int* x, const int* y, const unsigned char* mask, int n) {
    int i;
    for (i = 0; i < n; i++) z[i] = mask[i] ? x[i] : y[i];
}

static void gather(int* z, const int* x, const unsigned char* where, int n) {
    int i;
    for (i = 0; i < n; i++) z[i] = x[where[i]];
}

static long long prefix(long long* x, int n) {
    int i;
    for (i = 1; i < n; i++) x[i] += x[i - 1];
    return x[n - 1];
}

static long digest(const int* x) {
    long d = 0;
    int i;
    for (i = 0; i < N; i++) d = (d * 3 + x[i]) % 1000003L;
    return d;
}

int main(void) {
    int i, n;
    long low, high;
    for (i = 0; i < N; i++) {
        x16[i] = i * 37 % 101 - 50;
        y16[i] = i * i % 67;
        x32[i] = (long)x16[i] * y16[i] * 1000L;
        xf[i] = (float)x16[i] / 4.0F;
        yf[i] = (float)i;
        xw[i] = x32[i] * 4096LL;
        bytes[i] = (unsigned char)(i * 7 % N);
    }
    for (n = 0; n <= N; n += 13) {
        add16(z16, x16, y16, n);
        put_i32(digest(z16));
        put_i32(dot16(x16, y16, n));
        put_i16(count_if(x16, n, 10));
    }
    put_i16(dot16(x16, y16, N) == dot_by_four(x16, y16));
    scale(yf, xf, 0.5F, N);
    scale(yf + 1, yf, 2.0F, 5);
    for (i = 0; i < N; i += 5) put_f32(yf[i]);
    extremes(x32, N, &low, &high);
    put_i32(low);
    put_i32(high);
    reverse_copy(y32, x32, N);
    put_i32(y32[0] - y32[N - 1]);
    reverse_copy(y32, y32, N);
    put_i32(y32[3] + y32[N - 2]);
    smooth(x16, N);
    put_i32(digest(x16));
    shift_down(x16, N, 3);
    shift_down(y16, N, 0);
    put_i32(digest(x16));
    select(z16, x16, y16, bytes, N);
    put_i32(digest(z16));
    gather(z16, z16, bytes, N);
    put_i32(digest(z16));
    put_i64(prefix(xw, N));
    put_i64(prefix(xw, 1));
    return 0;
}
