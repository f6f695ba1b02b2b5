// What is known of loop variables and counts shows in the promises; a counter is no wider than its values.
// RUN: --opt_level=2 --disable_inlining --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
#include <stdlib.h>
#include <zrun.h>

long w[2000];
int g[20], m[10][10];

// The value behind the loop fits too.
// FUNCTION: narrowed
// COUNT 1: int, class 22
// HAS: /MUST_ITERATE\("500", "500", "500"\)/
long narrowed(void) {
    long k;
    for (k = 0; k < 1000; k += 2) w[k] = k;
    return k;
}

// FUNCTION: too_far
// COUNT 0: int, class 22
// HAS: /MUST_ITERATE\("16384", "16384", "16384"\)/
long too_far(void) {
    long k;
    for (k = 0; k < 32767; k += 2) w[k & 15] += k;
    return k;
}

// FUNCTION: unknown_end
// COUNT 0: int, class 22
long unknown_end(long n) {
    long k;
    for (k = 0; k < n; k++) w[k & 15] += k;
    return k;
}

// Four divides n, and so two the count.
// FUNCTION: by_twos
// HAS: /MUST_ITERATE\("2", "\d+", "2"\)/
int by_twos(int n) {
    int i, s = 0;
    if (n % 4) return -1;
    for (i = 0; i < n; i += 2) s = s * 3 + g[i];
    return s;
}

// n changes on a path between the test and the loop.
// FUNCTION: changed_between
// NOT: /MUST_ITERATE\("\d+", "\d+", "[24]"\)/
int changed_between(int n, int c) {
    int i, s = 0;
    if (n % 4) return -1;
    if (c) n++;
    for (i = 0; i < n; i += 2) s = s * 3 + g[i];
    return s;
}

// The test leads to both values of n.
// FUNCTION: joined
// NOT: /MUST_ITERATE\("1\d"/
int joined(int n) {
    int i, s = 0;
    if (n > 10) g[0] = 1;
    for (i = 0; i < n; i++) s = s * 3 + g[i];
    return s;
}

// A subscript bounds the count, if it is reached in every iteration.
// FUNCTION: within
// HAS: /MUST_ITERATE\("1", "20", "1"\)/
void within(int n) {
    int i;
    for (i = 0; i < n; i++) g[i] = i;
}

// FUNCTION: rows
// HAS: /MUST_ITERATE\("1", "100", "1"\)/
void rows(int n) {
    int i;
    for (i = 0; i < n; i++) m[0][i] = i;
}

// FUNCTION: sometimes
// NOT: /MUST_ITERATE\("1", "20"/
int sometimes(int n) {
    int i, s = 0;
    for (i = 0; i < n; i++)
        if (i < 20) s += g[i];
    return s;
}

void done(void) {
    put_i16(77);
    exit(0);
}

// The call comes back from none of the iterations that would leave the array.
// FUNCTION: stopped
// NOT: MUST_ITERATE("1", "20"
void stopped(int n) {
    int i;
    for (i = 0; i < n; i++) {
        if (i == 20) done();
        g[i] = i + 1;
    }
}

// What the next iteration alone reads is not computed on the edge back: the test stays the loop's end.
// FUNCTION: carried
// HAS: /MUST_ITERATE\("4", "4", "4"\)/
// COUNT 1: goto
long carried(int x) {
    long s = 0;
    int i;
    for (i = 0; i < 4; i++) {
        int y = g[i] + 2;
        s = s * 3 + (x + 9) / 5;
        g[i] = y;
        x = y % 50;
    }
    return s;
}

// That a counter does not wrap is said in the loop while loops are worked on, and no longer.
// FUNCTION: unsigned_counter
// COUNT 0: AFFINE
// HAS: /MUST_ITERATE\("10", "10", "10"\)/
int unsigned_counter(void) {
    int s = 0;
    for (unsigned u = 3; u < 33u; u += 3) s = s * 3 + g[u >> 1];
    return s;
}

// A copy of a parameter changes the variable wherever it is not the first thing that the function does.
unsigned bounded_anew(int n) {
    unsigned u = 0;
    int v = g[0];
    while (u < (unsigned)(v & 15)) {
        v = n;
        u++;
    }
    return u;
}

int main(void) {
    g[0] = 9;
    put_u32(bounded_anew(1)), put_u32(bounded_anew(4));
    put_i32(carried(3));
    put_i32(narrowed());
    put_i32(too_far());
    put_i32(unknown_end(5));
    for (int n = -4; n < 17; n += 4) put_i16(by_twos(n));
    put_i16(changed_between(8, 1));
    put_i16(joined(12) + joined(3));
    within(20);
    rows(100);
    put_i16(sometimes(30));
    put_i16(g[19] + m[9][9]);
    stopped(40);
    put_i16(unsigned_counter());
    return 0;
}
