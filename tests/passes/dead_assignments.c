// Assignments that no path reads go, what they compute stays for its effects; assignments in expressions stand alone.
// RUN: --opt_level=1 --disable_inlining
#include <zrun.h>

int g;
volatile int v;
static int step(int by) { return g += by; }

// FUNCTION: effects
// COUNT 1: _step(
// COUNT 1: /_v/
// COUNT 0: unused
void effects(void) {
    int unused = step(3);
    unused = v;
    unused += 4;
}

// Counters that feed themselves, and a ring; one that a call and one that the result needs stay.
// FUNCTION: counters
// NOT: own
// NOT: ring
// COUNT 1: _step(called
// COUNT 1: kept += 1
int counters(int* p, int n) {
    int own = 0, ring1 = 1, ring2 = n, called = 2, kept = 3;
    for (int i = 0; i < n; ++i) {
        own += p[i];
        ring1 = ring1 * 3 + ring2;
        ring2 = ring1 ^ 5;
        called = step(called);
        kept++;
    }
    return kept;
}

// Calls of functions that compute and return for certain go, with calls that are their arguments; what acts in an argument
// and what may stay away does not.
static int square(int x) { return x * x; }
static int sum(const int* p, int n) {
    int s = 0;
    for (int i = 0; i < n; ++i) s += p[i];
    return s;
}
static int may_stay(int x) {
    while (x & 1) x = x * 3 ^ 2;
    return x;
}

// FUNCTION: idle
// NOT: _square(
// NOT: _sum(
// COUNT 2: _step(
// COUNT 1: _may_stay(
int idle(const int* p, int a) {
    int unused = square(square(a));
    unused = sum(p, step(1) & 1);
    square(step(2)) + (a > 3 && sum(p, a));
    unused = may_stay(a);
    return a;
}

// FUNCTION: conditional
// HAS: x = 5
int conditional(int y) {
    int x = 5;
    y > 3 && (x = y);
    g = y;
    return x;
}

// FUNCTION: under_a_condition
// HAS: x = 5
int under_a_condition(int y) {
    int x = 5, seen = y > 3 && (x = y) > 7;
    return x * 10 + seen;
}

static void look(const int *p) { g += *p; }

// FUNCTION: address_taken
// HAS: x = 7
// HAS: x = y
int address_taken(int y) {
    int x;
    x = 7;
    look(&x);
    x = y;
    look(&x);
    return y;
}

// FUNCTION: volatile_local
// COUNT 2: x = 
void volatile_local(void) {
    volatile int x;
    x = 1;
    x = 2;
}

// FUNCTION: embedded
// COUNT 0: /\(.*= 3\)/
int embedded(int y) {
    int x;
    y = (x = 3) + g;
    g = x;
    return y * x;
}

// FUNCTION: old_value
// COUNT 0: /\+\+/
int old_value(int y) {
    g = y;
    return y++ * 2 + g + step(y);
}

// FUNCTION: not_past_a_read
// HAS: /\(g|_g.*_step\(1\)/
int not_past_a_read(void) { return g + step(1); }

int main(void) {
    effects();
    put_i16(g);
    put_i16(conditional(4) * 10 + conditional(3));
    put_i16(under_a_condition(2) * 100 + under_a_condition(8));
    put_i16(address_taken(9));
    volatile_local();
    put_i16(embedded(8));
    put_i16(old_value(6));
    put_i16(not_past_a_read());
    put_i16(counters((int[]){4, 5, 6}, 3));
    put_i16(idle((int[]){4, 5, 6}, 2));
    put_i16(g);
    return 0;
}
