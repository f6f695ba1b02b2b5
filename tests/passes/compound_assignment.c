// An assignment to one of its operands becomes compound where the operator allows it; volatile accesses stay counted.
// RUN: --opt_level=0
#include <zrun.h>

int g, a[4];
volatile int v;

// FUNCTION: change
// HAS: _g += 3
// HAS: _g <<= 2
// HAS: _g &= 15
// NOT: /_g = /
void change(void) {
    g = g + 3;
    g = g << 2;
    g = 15 & g;
}

// FUNCTION: watched
// HAS: _v = _v + 1
void watched(void) { v = v + 1; }

// FUNCTION: reversed
// HAS: _g = 9 - _g
// NOT: -=
void reversed(void) { g = 9 - g; }

int main(void) {
    change();
    put_i16(g);
    watched();
    put_i16(v);
    reversed();
    put_i16(g);
    return 0;
}
