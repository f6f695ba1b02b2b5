// A test that an earlier one decides goes; one whose operands may have changed in between stays.
// RUN: --opt_level=2 --disable_inlining
#include <zrun.h>

int g, h;
volatile int v;
static void touch(void) { g++; }

// FUNCTION: implied
// COUNT 1: if (
void implied(int x) {
    if (x > 3) {
        h = 1;
        if (x != 0) h += 2;
        g = h;
    }
}

// FUNCTION: called
// COUNT 2: if (
void called(void) {
    if (g > 3) {
        touch();
        if (g > 3) h += 2;
        h++;
    }
}

// FUNCTION: through_pointer
// COUNT 2: if (
void through_pointer(int *p) {
    if (g > 3) {
        *p = 2;
        if (g > 3) h += 2;
        h++;
    }
}

// FUNCTION: twice_volatile
// COUNT 2: if (
void twice_volatile(void) {
    if (v) {
        h = 1;
        if (v) h += 2;
        g = h;
    }
}

// Of the flag, each way knows what it is.
// FUNCTION: joined
// COUNT 2: if (
void joined(int x, int y) {
    if (x && y > 2) h = 1;
    else h = 2;
    g += h;
}

int amount = 5;

// Iterations that stand one behind the other, of a loop of which something is promised: their blocks become one.
// FUNCTION: by_trial
// NOT: goto
// HAS: /return t \+ 128/
unsigned by_trial(void) {
    unsigned t = 1, i;
    for (i = 8; i <= 100; i = i * 2) {
        if (i & 4)
            t += 3;
        else
            t -= i;
        t += amount;
    }
    return t + i;
}

int main(void) {
    for (int i = -1; i < 9; i++) {
        g = h = 0;
        implied(i);
        put_i16(g * 10 + h);
        g = i;
        called();
        put_i16(g * 10 + h);
        g = i;
        through_pointer(&g);
        put_i16(g * 10 + h);
        joined(i, i);
        put_i16(g);
    }
    v = 1;
    twice_volatile();
    put_i16(h);
    put_i16(by_trial());
    return 0;
}
