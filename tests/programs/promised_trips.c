// Loops whose trips are promised by pragmas, at the least, the most, and between; requests for unrolling.
#include <loops.h>
#include <zrun.h>

#define N 48

static int x[N], y[N];
static long sums[N];

static long at_least_one(const int* p, int n) {
    long s = 0;
    int i;
#pragma MUST_ITERATE(1)
    for (i = 0; i < n; i++) s += p[i];
    return s;
}

static long multiple_of_four(const int* p, const int* q, int n) {
    long s = 0;
    int i;
#pragma MUST_ITERATE(4, 48, 4)
    for (i = 0; i < n; i++) s += (long)p[i] * q[i];
    return s;
}

static long multiple_only(const int* p, int n) {
    long s = 0;
    int i;
#pragma MUST_ITERATE(, , 8)
    for (i = 0; i < n; i++) s = s * 2 % 10007L + p[i];
    return s;
}

// A minimum of 0 that is written down: the loop may not iterate at all.
static long none_or_multiple(const int* p, int n) {
    long s = 1;
    int i;
    MUST_ITERATE(0, , 4)
    for (i = 0; i < n; i++) s = s * 3 % 10007L + p[i];
    return s;
}

static void unrolled(int* to, const int* from, int n) {
    int i;
#pragma UNROLL(4)
    for (i = 0; i < n; i++) to[i] = from[i] * 3 - 1;
}

static void not_unrolled(int* to, int n) {
    int i;
#pragma UNROLL(1)
    for (i = 0; i < n; i++) to[i] += i;
}

static int likely(const int* p, int n) {
    int i = 0;
#pragma PROB_ITERATE(0, 3)
    while (i < n && p[i] != 5) i++;
    return i;
}

static void nested(int rows, int columns) {
    int i, j;
#pragma MUST_ITERATE(2, 6, 2)
    for (i = 0; i < rows; i++) {
        sums[i] = 0;
#pragma MUST_ITERATE(8, 8)
        for (j = 0; j < columns; j++) sums[i] += (long)x[i * columns + j] * (j + 1);
    }
}

static int bottom(int n) {
    int c = 0;
#pragma MUST_ITERATE(3, 30, 3)
    do {
        c += n & 3;
    } while (--n > 0);
    return c;
}

static long exact(void) {
    long s = 1;
    int i;
#pragma MUST_ITERATE(16, 16, 16)
#pragma UNROLL(2)
    for (i = 0; i < 32; i += 2) s = (s * 3 + x[i]) % 100003L;
    return s;
}

int main(void) {
    int i;
    for (i = 0; i < N; i++) {
        x[i] = i * 7 % 19;
        y[i] = 20 - i;
    }
    for (i = 1; i < N; i += 23) put_i32(at_least_one(x, i));
    for (i = 4; i <= N; i += 20) put_i32(multiple_of_four(x, y, i));
    for (i = 16; i <= N; i += 16) put_i32(multiple_only(x, i));
    for (i = 0; i <= N; i += 12) put_i32(none_or_multiple(x, i));
    for (i = 0; i < 10; i += 3) {
        unrolled(y, x, i);
        not_unrolled(y + 20, i);
        put_i32(at_least_one(y, N));
        put_i16(likely(x + i, N - i));
    }
    nested(2, 8);
    put_i32(sums[0] + sums[1] * 3);
    nested(6, 8);
    put_i32(sums[2] + sums[5] * 3);
    put_i16(bottom(3));
    put_i16(bottom(30));
    put_i32(exact());
    return 0;
}
