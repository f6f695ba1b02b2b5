// What a block, or a chain of blocks, computes again is taken from a variable; nothing is computed that was not.
// RUN: --opt_level=2 --debug:skip=ssa-rp-with-benign-loads+ssa-reg-promote+ssa-reg-promote-with-simpcfg
#include <zrun.h>

int g, h, a[20];
volatile int port;
struct state { int index, step; long sum; } st;
int ask(int x) { return g += x; }

// A variable that has the value needs no temporary; a single cheap operator gains nothing from one.
// FUNCTION: held
// COUNT 1: x * 29
// COUNT 2: x - 1
// COUNT 0: $O$N
int held(int x, int *p) {
    int y = x * 29;
    p[0] = x - 1;
    p[1] = x * 29 + 3;
    p[x - 1 & 3] = y ^ x * 29;
    return y;
}

// Exchanging two elements computes each address once.
// FUNCTION: exchanged
// COUNT 2: /&_a [+] [ij]$/
void exchanged(int i, int j) {
    int t = a[i];
    a[i] = a[j];
    a[j] = t;
}

// What was stored is loaded again; a step is worth a temporary for more than one load.
// FUNCTION: stepped
// COUNT 2: (*s).index
// COUNT 1: (*s).step
int stepped(struct state *s, int d) {
    s->index += d;
    s->step = d * 7 + s->index;
    return s->index * s->step + a[s->index & 7] * s->step;
}

// A remainder comes of its quotient, where that was computed of the same values.
// FUNCTION: remainders
// COUNT 0: %
// COUNT 2: x / y
int remainders(int x, int y) {
    int r = x / y * 10 + x % y;
    x = ask(x);
    return r ^ (x / y + x % y);
}

// Only the first of them is kept from the calls and stores in between, which may change it.
// FUNCTION: changed
// COUNT 5: _g * 3
int changed(int *p, int n) {
    int x = g * 3;
    x += g * 3;
    ask(1);
    x ^= g * 3;
    *p = n;
    x += g * 3 ^ ask(g * 3);
    return x + (g++, g * 3);
}

// FUNCTION: stepped_pointer
// COUNT 2: /[*]p(\+\+)? [*] 7/
int stepped_pointer(int *p) {
    int x = *p * 7 + 1;
    p++;
    return x ^ *p * 7;
}

// FUNCTION: watched
// COUNT 2: _port * 5
int watched(void) {
    int x = port * 5;
    return x + port * 5;
}

// Under a condition alone it is not computed ahead; behind one it is found.
// FUNCTION: conditional
// COUNT 3: x * y * 3
int conditional(int x, int y, int c) {
    int r = c ? x * y * 3 : 1;
    if (c > 5) return r + x * y * 3;
    r ^= x * y * 3;
    return c & 1 ? x * y * 3 - r : r;
}

// A product of two casts is a short product.
// FUNCTION: short_products
// COUNT 2: (long)x
long short_products(int x, long y) { return (long)x * x + y; }

// FUNCTION: again
// COUNT 1: = x * y
int again(int x, int y) {
    int r = x * y;
    a[0] = r + 1;
    r = x * y;
    return r;
}

// `p + i` is not derived from r.
int *taken(int *p) { return p; }
// FUNCTION: restricted
// COUNT 2: p + i
int restricted(int *p, int i, int k) {
    int *restrict r = p + i;
    taken(p + i)[k & 1]++;
    return k + *r;
}

int main(void) {
    for (int i = -2; i < 9; i++) {
        put_i16(held(i, a + 3));
        exchanged(i + 4 & 7, i + 9);
        put_i16(stepped(&st, i));
        put_i16(remainders(i * 77 - 9, i + 3));
        put_i16(changed(&g, i * 5) + changed(&h, i));
        put_i16(stepped_pointer(a + i + 3) + watched());
        put_i16(conditional(i, i + 3, i * i) + restricted(a, i + 3, i & 1));
        put_i32(short_products(i * 99, i) + again(i, a[2]));
        for (int k = 0; k < 12; k++) put_i16(a[k]);
    }
    return 0;
}
