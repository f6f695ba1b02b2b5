// What the code generator is told of accesses: by `<` they keep the iterations of a loop apart.
// RUN: --opt_level=2 --float_support=fpu32 --disable_inlining
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
    exact();
    apart("x", 10);
    typed(wide, real, 9);
    nest(m, 8);
    for (int i = 0; i < 128; i++) put_i16(a[i]), put_i16(b[i]);
    put_i16(m[8][3] + (int)wide[2]);
    return 0;
}
