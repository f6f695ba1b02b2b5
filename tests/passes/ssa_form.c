// What is seen through definitions: constants and copies, dead assignments, and what loops need not compute again.
// RUN: --opt_level=2 --disable_inlining
// LEVELS: 1 3 4
#include <zrun.h>

struct node { struct node* next; int a, b; int c[3]; } here, there;
struct box { int limit, scale; } box = {10, 3};
int g, seen, many[8];
volatile int port;

int told(int x) {
    seen = seen * 3 + x;
    return x & 7;
}
void turn(void) { g = g * 2 + 1; }

// FUNCTION: chain
// HAS: return c != 0
int chain(int c) {
    int x = 3, y, z;
    if (c) y = x + 1;
    else { y = 8; y -= x + 1; }
    z = y;
    return (c && z == 4) + (!c && 4 != z);
}

// What an update reads is known, and what it is joined with.
int updates(int y, int c) {
    int x = 3, z, w = 5;
    x += y;
    z = x;
    if (c) w++;
    x = w;
    w += 2;
    return z * 100 + x * 10 + w;
}

int overlapping(int y) {
    struct node v;
    v = there;
    v.c[1] = 7;
    v.c[1] /= 5;
    there = v;
    return there.c[1] * y;
}

// A copy holds until what was copied changes.
int changed_behind(int a, int n) {
    int x = a, y, z, w;
    a = 7;
    y = x;
    do {
        z = a;
        a++;
    } while (a < n);
    w = z;
    if (n > 20) { x = w; if (n & 1) w = 5; y += x; }
    return y + z * w + a;
}

int swapped(int n) {
    int a = 1, b = 2, t;
    while (n--) { t = a; a = b; b = t; }
    return a * 10 + b;
}

// When control comes back to where the environment was saved, `a` need not hold what it held there.
long environment[8];
int setjmp(long*);
// FUNCTION: comes_back
// HAS: x = a
// COUNT 1: /[+^] x/
int comes_back(int n) {
    int a = n * 3, x = a, s = 0;
    if (setjmp(environment)) {
        do s = told(s) ^ x;
        while (--n);
        return s;
    }
    while (n--) a = a * 2 + told(a);
    return a;
}

// The effects of a dead assignment stay, and what they read.
// FUNCTION: effects
// COUNT 1: _told(
int effects(int a) {
    int y, x;
    y = a * 2;
    x = told(y);
    x = a;
    return x;
}

// FUNCTION: reached_by_a_call
// HAS: _g = 4
int reached_by_a_call(void) {
    g = 4;
    turn();
    return g;
}

int written_or_not(int c) {
    if (c) g = 5;
    return g;
}

// FUNCTION: moved_load
// HAS: $O$H0 = (*p).limit
// COUNT 1: limit
int moved_load(struct box* p, int n) {
    int i, s = 0;
    for (i = 0; i < n; i++) s = s * 3 + (p->limit ^ i);
    return s;
}

// FUNCTION: changed_in_loop
// NOT: $H
int changed_in_loop(struct box* p, int* q, int n) {
    int i, s = 0;
    for (i = 0; i < n; i++) { s = s * 3 + (p->limit ^ i); *q += i; }
    return s;
}

// A division, or a load, is done where it was, or where it is certain to be done.
int guarded(int n, int d, struct box* p, struct box* q) {
    int i, s = 0;
    for (i = 0; i < n; i++) {
        if (d) s += n / d;
        if (p) s += p->limit;
        if (i == 5) break;
        if (q->scale > 3) s += 100 / (q->scale - 3);
    }
    return s;
}

int stopped(int n, struct box* p) {
    int i = 0, s = 0;
    do {
        if (told(i + 2) == 2) return s;
        s += p->limit * p->scale;
    } while (++i < n);
    return s;
}

// FUNCTION: outer_and_inner
// HAS: /U\d+ = \(\*p\)\.limit/
int outer_and_inner(struct box* p, int d) {
    int i, k, s = 0;
    for (i = 0; i < 5; i++)
        for (k = 0; k < 6; k++) s += (p->limit / d) ^ (i * k);
    return s;
}

// A value of few numbers has a name, and what is known of it is known in every block.
// FUNCTION: bounded
// NOT: > 9
int bounded(int a, int n) {
    int s = 0, k, i;
    for (i = 0; i < n; i++) {
        k = many[i] & 7;
        if (a > i) s += k;
        else s -= 2 * k;
        if (seen == i && k > 9) return s;
        s ^= i;
    }
    return s;
}

int main(void) {
    struct box small = {2, 3};
    put_i16(chain(1) * 10 + chain(0));
    put_i16(updates(4, 0)), put_i16(updates(1, 1));
    put_i16(overlapping(9));
    put_i16(changed_behind(3, 10)), put_i16(changed_behind(3, 2)), put_i16(changed_behind(4, 21));
    put_i16(swapped(5)), put_i16(swapped(4));
    put_i16(effects(5)), put_i16(seen);
    put_i16(reached_by_a_call()), put_i16(written_or_not(0)), put_i16(written_or_not(1));
    put_i16(moved_load(&box, 4)), put_i16(moved_load(0, 0));
    put_i16(changed_in_loop(&small, &small.limit, 5));
    seen = 0;
    put_i16(guarded(3, 0, 0, &box)), put_i16(guarded(9, 2, &box, &box));
    put_i16(bounded(3, 8)), put_i16(stopped(9, 0) + 1), put_i16(outer_and_inner(&box, 3)), put_i16(seen);
    return 0;
}
