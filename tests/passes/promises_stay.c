// A loop's pragma is followed by that loop's own label, however the blocks are laid out.
// RUN: --opt_level=2 --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
#include <zrun.h>

int g[8];

// FUNCTION: two_loops
// HAS: /MUST_ITERATE\("2", "2"/
// NOT: /m \+= 1/
// HAS: /k \+= 1/
long two_loops(int n) {
    long sum = 0;
    int k, w, m;
#pragma MUST_ITERATE(2, 2)
    for (k = 3; k < 5; k++) {
        for (w = 0; w < n; w++) sum += g[w];
        g[0] = w;
    }
    for (m = 3; m != 11; m++) sum = sum * 3 + g[m - 3];
    return sum;
}

// FUNCTION: nested
// HAS: /MUST_ITERATE\("2", "2", "2"/
// NOT: /j \+= 1/
// HAS: /k \+= 1/
// HAS: /n > 0.* goto/
// HAS: /MUST_ITERATE\("1", "4", "1"/
// NOT: /k \+= 1/
// HAS: /j \+= 1/
long nested(int n) {
    long sum = 0;
    int u, k, j;
    for (u = 0; u <= n; u++) {
#pragma MUST_ITERATE(, 2)
        for (k = 1; k < 3; k++) sum += g[n] * k;
        g[1] = u;
#pragma MUST_ITERATE(, 4)
        for (j = 0; j < n; j++) {
            if (g[j] > n) sum -= j;
            else g[2] = (int)sum;
            sum = sum * 7 + g[j];
        }
    }
    return sum;
}

// What is promised of the iterations of a loop is not promised of its tests, of which there is one more.
// FUNCTION: only_a_test
// COUNT 1: MUST_ITERATE
// HAS: pragma 39 MUST_ITERATE("3", "3", "3")
void only_a_test(void) {
    unsigned w;
#pragma MUST_ITERATE(, 2, 2)
    for (w = 2; w-- > 0;) {
    }
    g[3] = (int)w;
}

// What was promised of a loop that is no more is not promised of the next one, nor of what leads there.
// FUNCTION: left_at_once
// COUNT 0: MUST_ITERATE("1", "1"
// COUNT 1: if (!(c))
long left_at_once(int n, int c) {
    long s = 0;
#pragma MUST_ITERATE(1, 1)
    for (;;) {
        s += g[n & 7];
        break;
    }
    if (c) {
        do s += g[n & 3] * 3;
        while (--n > 0);
    }
    return s;
}

// FUNCTION: never_run
// COUNT 0: /MUST_ITERATE\("[^"]*", "1"/
long never_run(int n) {
    long s = 0;
    int i = 7;
#pragma MUST_ITERATE(, 1)
    for (; i < 3; i++) s += g[i];
    do s += g[n & 3] * 3;
    while (--n > 0);
    return s;
}

// What the next iteration alone reads is computed ahead of the test all the same: the test stays the end of an iteration.
// FUNCTION: read_by_the_next
// HAS: /MUST_ITERATE\("5", "5"/
// COUNT 1: goto
int read_by_the_next(int n) {
    int *p = g, s = 0, y = n + 1;
    do {
        s += y;
        p++;
        y = g[n & 7] + s;
    } while (p < g + 5);
    return s;
}

// Left from within its sixth iteration, which is the last one of the loop that remains.
// FUNCTION: left_within
// HAS: /MUST_ITERATE\("0", "6", "1"\)/
// COUNT 1: goto
long left_within(const long *p) {
    long acc = 1;
    int i = 0;
    do {
        acc -= *++p * 3;
        if (i == 5) break;
    } while (++i < 15);
    return acc;
}

// The iteration that is known to be the last one leaves the loop, which was counted by the values of its variable.
// FUNCTION: last_one_leaves
// COUNT 0: MUST_ITERATE
int last_one_leaves(void) {
    int v = 64, t = 1;
#pragma MUST_ITERATE(3, 4)
    for (;;) {
        if (v & 1) {
            t += 5;
            v >>= 2;
            if (v == 0) break;
        } else {
            g[v & 7] ^= 7;
            v >>= 2;
            if (v == 0) break;
        }
    }
    return t;
}

int main(void) {
    for (int i = 0; i < 8; i++) g[i] = i * i;
    put_i32(two_loops(8));
    put_i32(two_loops(0));
    put_i32(nested(4));
    put_i32(nested(0));
    only_a_test();
    put_i16(g[3]);
    put_i16(last_one_leaves());
    put_i32(left_at_once(5, 0) + left_at_once(4, 1) + never_run(3));
    put_i16(read_by_the_next(3));
    static const long many[16] = {0, 1, 2, 3, 4, 5, 6, 7};
    put_i32(left_within(many));
    return 0;
}
