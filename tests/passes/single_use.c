// A variable that is set once and read once in a block goes, and its value is computed where it is read.
// RUN: --opt_level=2 --debug:skip=ssa-rp-with-benign-loads+ssa-reg-promote+ssa-reg-promote-with-simpcfg
#include <zrun.h>

int g[16], total;
volatile int port;
int bump(void) { return ++total; }

// FUNCTION: histogram
// COUNT 0: b =
void histogram(const int *x, int n) {
    for (int i = 0; i < n; i++) {
        int b = x[i] + 8 >> 2;
        g[b & 15]++;
    }
}

// Loads and volatile reads do not move past a store or a call, nor does what reads a variable past its assignment.
// FUNCTION: ordered
// COUNT 1: /^c = /
// COUNT 1: /^d = /
int ordered(int *p, int n) {
    int b = *p, c, d;
    p[1] = n;
    if (n & 1) total ^= b;
    c = total;
    n += bump() + c;
    d = n * 3;
    n += bump();
    return n + d;
}

int main(void) {
    for (int i = 0; i < 5; i++) {
        int v[3] = {i * 3, i, 5};
        histogram(v, 3);
        put_i16(ordered(v, i));
        put_i16(ordered(v + 1, -i));
    }
    for (int i = 0; i < 16; i++) put_i16(g[i]);
    return 0;
}
