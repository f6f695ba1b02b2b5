/* Loops that become one instruction of the multiply-accumulate hardware under the repeat instruction: see
   docs/multiply_accumulate.md. With --unified_memory the first and the last become the dual form. */
#include <zrun.h>
#define N 32
#pragma DATA_ALIGN(x, 2)
static int x[N];
#pragma DATA_ALIGN(h, 2)
static int h[N];
static long fine[N], gain[N];

/* A dot product: 16 by 16 bits, 32 added. */
static long dot(void) {
    long acc = 0;
    int i;
    for (i = 0; i < N; i++) acc += (long)x[i] * h[i];
    return acc;
}
/* A convolution: one operand walks down; each product is shifted before it is added. */
static long convolve(const int *p, const int *q, int n) {
    long acc = 0;
    const int *last = q + n;
    while (n-- > 0) acc += (long)*p++ * *--last >> 4;
    return acc;
}
/* Fractions of 32 bits: the high half of each product. */
static long scaled(const long *p, const long *q, int n) {
    long acc = 0;
    int i;
    for (i = 0; i < n; i++) acc += (long)((long long)p[i] * q[i] >> 33);
    return acc;
}
/* Energy: a square needs one operand. */
static long energy(const int *p, int n) {
    long acc = 0;
    int i;
    for (i = 0; i < n; i++) acc += (long)p[i] * p[i];
    return acc;
}
/* Two sums over the even and the odd elements. */
static long both(long *odd) {
    long a = 0, b = 0;
    int i;
    for (i = 0; i < N / 2; i++) {
        a += (long)x[2 * i] * h[2 * i];
        b += (long)x[2 * i + 1] * h[2 * i + 1];
    }
    *odd = b;
    return a;
}

int main(void) {
    int i;
    long odd;
    for (i = 0; i < N; i++) {
        x[i] = i * 37 % 101 - 50, h[i] = i * 53 % 97 - 48;
        fine[i] = (i - 15) * 99999989L, gain[i] = 1000000007L - i * 50000017L;
    }
    put_i32(dot()), put_i32(convolve(x, h, N - 3)), put_i32(scaled(fine, gain, N)), put_i32(energy(h, N));
    put_i32(both(&odd)), put_i32(odd);
    return 0;
}
