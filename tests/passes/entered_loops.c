// A loop whose counter starts from a constant is entered behind its first test.
// RUN: --opt_level=2 --debug:skip=ssa-rp-with-benign-loads+ssa-reg-promote+ssa-reg-promote-with-simpcfg+cd-unroll-completely-for-speed+cd-unroll-for-speed
// LEVELS: 3
#include <zrun.h>

int g[40], n = 3;
int *at = &n;

// FUNCTION: counted
// HAS: i = 0
// NOT: goto
// HAS: /^L\d+:/
// HAS: /^if \(!\(i >= 24\)\) goto L\d+$/
// COUNT 1: goto
void counted(void) {
    for (int i = 0; i < 24; i++) g[i & 7] += i * i;
}

// A start that is computed of the same variable decides the test as well.
// FUNCTION: between
// NOT: goto
// HAS: /^L\d+:/
// COUNT 1: goto
int between(const int *from) {
    const int *p = from, *end = from + 8;
    int s = 0;
    while (p != end) s = s * 3 + *p++;
    return s;
}

// Places of one object are in order; of a pointer that is not known it is not known either.
// FUNCTION: in_object
// COUNT 0: /^(if .*goto L[^1]|goto)/
// COUNT 1: goto L1
int in_object(void) {
    int s = 0;
    for (const int *p = g + 3; p < g + 20; p++) s = s * 3 + *p;
    return s;
}

// FUNCTION: not_in_object
// HAS: /^if \(!\(p <u/
int not_in_object(const int *from) {
    int s = 0;
    for (const int *p = from + 3; p < from + 8; p++) s = s * 3 + *p;
    return s;
}

// The condition that chooses the limit is the first test, and then the limit needs no choice; unless it is read behind
// the loop, or its other value does not end the loop.
// FUNCTION: chosen
// HAS: end = p + n
// HAS: /^if \(!\(n > 2\)\)/
// NOT: ?
int chosen(const int *p, int n) {
    const int *end = n > 2 ? p + n : p;
    int s = 0;
    while (p != end) s = s * 3 + *p++;
    return s;
}

// FUNCTION: read_behind
// COUNT 1: n > 2 ? p + n : p
int read_behind(const int *p, int n) {
    const int *end = n > 2 ? p + n : p;
    int s = 0;
    while (p != end) s = s * 3 + *p++;
    return s + (end == g);
}

// FUNCTION: other_limit
// COUNT 1: n > 2 ? p + n : p + 1
int other_limit(const int *p, int n) {
    const int *end = n > 2 ? p + n : p + 1;
    int s = 0;
    while (p != end) s = s * 3 + *p++;
    return s;
}

// FUNCTION: changed_condition
// COUNT 1: n > 2 ? p + n : p
int changed_condition(const int *p, int n) {
    int s = 0;
    for (int k = 0; k < 3; k++) {
        const int *at = p, *end = n > 2 ? p + n : p;
        n = g[k];
        while (at != end) s = s * n + *at++;
    }
    return s;
}

// An earlier test decides the first one of an inner loop, as long as nothing changes what it asks.
// FUNCTION: triangle
// COUNT 0: j < n
// COUNT 1: n > 0
int triangle(int n) {
    int s = 0;
    for (int i = 0; i < n; i++)
        for (int j = i; j < n; j++) s = s * 3 + j;
    return s;
}

// FUNCTION: moved
// COUNT 2: i < n
int moved(int n) {
    int s = 0;
    for (int i = 0; i < n; i++) {
        n -= g[i];
        for (int j = i; j < n; j++) s = s * 3 + j;
    }
    return s;
}

// What the loop starts from is not known here: a call, an assembly text or a pointer may have changed it.
// FUNCTION: unknown
// COUNT 1: if (!(_n < 5)
// COUNT 1: if (!(_n >= 5)
void unknown(void) {
    n = 0;
    *at += 5;
    for (; n < 5; n++) g[n]++;
}

// FUNCTION: stepped
// COUNT 0: goto
int stepped(int s) {
    s = 4;
    g[s++]++;
    while (s < 4) g[s++]++;
    return s;
}

// The label behind a promise is of its own loop, wherever other loops lie.
// FUNCTION: promised
// HAS: /MUST_ITERATE/
// HAS: /^L\d+:/
// HAS: /w == 4/
// COUNT 2: MUST_ITERATE
long promised(int k, int *p) {
    int w, j;
    long s = 0;
    _Pragma("MUST_ITERATE(2, 2)")
    for (w = 2; w != 4; w++) {
        p[w & 7] = g[w];
        n += p[k & 7];
    }
    ++g[1];
    if (n != k) {
        for (j = -6; j >= -7; j -= 1) s -= (long)g[j + 7] * g[j + 37];
        n = (int)s;
    }
    return s;
}

// What a test ahead of a loop says may be that not both of two things hold; that has no simpler form.
// FUNCTION: not_both
// HAS: /goto/
static int bits(unsigned long v) {
    int count = 0;
    while (v) {
        v &= v - 1;
        count++;
    }
    return count;
}

unsigned not_both(int to) {
    unsigned y = 3;
    for (long l = 0; l < to; l++) y = y && l ? (n = (int)l * 3, n % 100) : bits(l);
    return y;
}

int main(void) {
    int p[8] = {0};
    counted();
    unknown();
    put_i16(between(g) + in_object() + not_in_object(g));
    put_i16(stepped(1));
    put_i32(promised(4, p));
    put_u32(not_both(12));
    for (int i = 0; i < 5; i++) {
        g[i] = i * 7 - 5;
        put_i16(chosen(g, i) + read_behind(g, i));
        put_i16(other_limit(g, i) + changed_condition(g, i));
        put_i16(triangle(i) + moved(i));
    }
    put_i16(g[3] + g[4] + n);
    return 0;
}
