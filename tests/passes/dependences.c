// What the code generator is told of accesses: by `<` they keep the iterations of a loop apart.
// RUN: --opt_level=2 --float_support=fpu32 --disable_inlining --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
#include <zrun.h>

int a[128], b[128];

// FUNCTION: exact
// HAS: /^dependence vector 0, flags 08: =0 <1$/
// HAS: /^dependence vector 2, flags 08: =0 <33\(overflows\)$/
// COUNT 2: /dependence vector .* </
void exact(void) {
    for (int i = 0; i < 60; i++) a[i] = a[i + 1] + 1;
    for (int i = 0; i < 60; i++) a[i + 33] = a[i] + 1;
}

// The odd ones and the even ones; a string and what is written; two arrays.
// FUNCTION: apart
// COUNT 0: /dependence vector .* </
void apart(const char* t, int n) {
    for (int i = 0; i < 60; i++) a[2 * i] = a[2 * i + 1] + 1;
    for (int i = 0; i < n; i++) b[i] = "0123456789"[i];
    for (int i = 0; i < 60; i++) a[i] = b[i];
}

// By its type a load does not see the store; what is stored later may have any.
// FUNCTION: typed
// HAS: /^dependence vector 0, flags 00: =0 =<\S*$/
// HAS: dependence 1 -> 2 by vector 0
// NOT: dependence
void typed(long* p, const float* q, int n) {
    for (int i = 0; i < n; i++) p[i] = (long)q[i];
}

// In an iteration of its own a place is loaded and stored once; in the iterations of a loop around, again.
// FUNCTION: once
// NOT: dependence
void once(void) {
    for (int i = 0; i < 60; i++) a[i] += 1;
}

// FUNCTION: again
// HAS: /^dependence vector 0, flags 08: =0 =<\S* =0$/
// HAS: dependence 2 -> 2 by vector 0
void again(int n) {
    for (int i = 0; i < n; i++)
        for (int j = 0; j < 60; j++) a[j] += b[i];
}

// Bases are told apart by what is asked ahead of the loop, so far as that reaches: by their distance, and modulo 4.
// FUNCTION: disjoint
// HAS: /^dependence vector 0, flags 08: =0 <33/
// NOT: vector 1
void disjoint(int* p, int* q, int n) {
    if ((p - q >= 100) | (q - p >= 100))
        for (int i = 0; i < n; i++) p[i] = q[i];
}
// FUNCTION: near
// NOT: dependence
void near(int* p, int* q) {
    if ((p - q >= 50) | (q - p >= 50))
        for (int i = 0; i < 50; i++) p[i] = q[i];
}
// FUNCTION: aligned
// NOT: dependence
void aligned(int* p, int* q, int n) {
    if ((long)p % 4 == 0)
        if (((long)q & 3) == 2)
            for (int i = 0; i < n; i++) p[4 * i] = q[4 * i + 1];
}

// Rows of a length that is not known; a triangle; what lies behind all that the loop stores.
// FUNCTION: rows
// HAS: /^dependence vector \d, flags 08: =0 <1 =0$/
// NOT: / 2 -> 1 /
void rows(int* p, int n, int m) {
    for (int i = 0; i < m; i++)
        for (int j = 0; j < n; j++) p[n * i + j] = p[n * i + j + n] + 1;
}
// FUNCTION: triangle
// NOT: dependence
void triangle(int m[][20]) {
    for (int i = 0; i < 20; i++)
        for (int j = 0; j < i; j++) m[i][j] = m[j][i] + 1;
}
// FUNCTION: behind
// NOT: dependence
void behind(int* p, int n) {
    for (int i = 0; i < n; i++) p[i] = p[i + n] + 1;
}

// A loop that was said to be one of two clones, and stands alone.
// FUNCTION: single
// HAS: /^loop 1 in 0: .* flags 0000$/
// NOT: LOOP_FLAGS
void single(int n) {
#pragma LOOP_FLAGS(192)
    for (int i = 0; i < n; i++) a[i] += 1;
}

// A nest has the vectors of two levels, and those that hold if the outer loop is taken to carry nothing.
// FUNCTION: nest
// HAS: /^dependence vector 0, flags 08: =0 <1\S* =/
// HAS: /^dependence vector 1, flags 05:$/
void nest(int m[][8], int n) {
    for (int i = 0; i < n; i++)
        for (int j = 0; j < 8; j++) m[i + 1][j] = m[i][j] + b[j];
}

int main(void) {
    static int m[9][8];
    static long wide[9];
    static float real[9] = {1, 2, 3};
    static int square[20][20];
    once(), single(9);
    again(9);
    disjoint(a, b, 20), disjoint(a, a + 101, 20);
    near(a, a + 60);
    aligned(a, a + 2, 7), aligned(b, a, 20);
    rows(a, 5, 8);
    triangle(square);
    behind(b, 60);
    exact();
    apart("x", 10);
    typed(wide, real, 9);
    nest(m, 8);
    for (int i = 0; i < 128; i++) put_i16(a[i]), put_i16(b[i]);
    put_i16(m[8][3] + (int)wide[2]);
    return 0;
}
