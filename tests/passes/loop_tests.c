// A loop is closed by one conditional branch, and is one piece of text: its test moves to its end, or stands there a
// second time, and what it is left to stands behind it.
// RUN: --opt_level=2 --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
#include <zrun.h>

int g[8];

// FUNCTION: nested
// COUNT 0: ?
// COUNT 1: if (!(i > 0)) goto L5
// HAS: /^if .* goto L6/
// HAS: L2:
// HAS: /^if .* goto L5/
// HAS: L4:
// HAS: /^if .* goto L4/
// HAS: /^if .* goto L2/
// COUNT 0: /^goto/
int nested(int n) {
    int sum = 0, i, j;
    for (i = 0; i < n; i++)
        for (j = 0; j < i; j++) sum += g[j];
    return sum;
}

// A first test that is known to stay is not made.
// FUNCTION: in_turn
// COUNT 0: /^goto/
// COUNT 3: /^if .* goto/
int in_turn(int n) {
    int sum = 0;
    for (int i = 0; i < n; i++) sum += sum ^ i;
    for (int i = 0; i < 9; i++) sum += sum ^ n;
    return sum;
}

// What follows both arms of a test is copied to the end of the one that would jump there, if it is small.
// FUNCTION: arms
// COUNT 2: n -= 1
// COUNT 2: goto L1
int arms(const int *p, int n) {
    int a = 0, b = 0;
    do {
        if (*p > n) {
            a += *p;
            g[0] ^= a;
        } else {
            b -= *p;
            g[1] += b;
        }
        p++;
        n--;
    } while (n > 0);
    return a * 3 + b;
}

// FUNCTION: long_tail
// COUNT 1: n -= 1
int long_tail(const int *p, int n) {
    int a = 0, b = 0;
    do {
        if (*p > n) {
            a += *p;
            g[0] ^= a;
        } else {
            b -= *p;
            g[1] += b;
        }
        g[2] += p[n & 3] * a + b * 3 - g[0] * g[1];
        g[3] ^= p[n & 1] * b + a * 5 - g[0] * g[2];
        p++;
        n--;
    } while (n > 0);
    return a * 3 + b;
}

// A loop of one iteration is none, and one that computes nothing that is read goes.
// FUNCTION: nothing_left
// COUNT 0: goto
int nothing_left(int n, const int *p) {
    int i, j, s = 0;
    for (j = 0; j < 10; j++) s += j;
    for (i = 3; i < 4; i++) g[i] += p[i] * n;
    for (i = 10, j = 3; i > 0; i -= 2) j ^= i * n;
    return n;
}

// Not where what it has counted, or found, is read, and where it may wait for good.
volatile int ticks;
int waits(int n, const int *p) {
    int i, k = 0, s = 0, last = 0;
    for (i = 0; i < n; i++) {}
    for (k = 0; k < 7; k++) last = k ^ n;
    for (k = 0; k < 5; k++) s += ticks;
    while (p != &g[n]) p++;
    for (k = 0; k < 1; k++) { if (n > 3) break; s += 5; }
    return i * 100 + last + s + (p == &g[n]);
}

int main(void) {
    put_i16(in_turn(4) + in_turn(0));
    for (int i = 0; i < 8; i++) g[i] = i * i;
    for (int n = -1; n < 7; n += 2) put_i16(nested(n));
    static const int x[8] = {3, 9, -4, 2, 7, 7, -1, 5};
    for (int n = 0; n < 7; n += 2) put_i16(nothing_left(n, x) + waits(n, g) + g[3]);
    put_i16(arms(x, 5) + long_tail(x, 4));
    return 0;
}
