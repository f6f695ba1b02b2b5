// Blocks that end the function alike are written once.
// RUN: --opt_level=2 --debug:skip=ssa-rp-with-benign-loads+ssa-reg-promote+ssa-reg-promote-with-simpcfg
#include <zrun.h>

int g, h;

// FUNCTION: tails
// COUNT 1: _h = 
// COUNT 1: /return .*\* 3/
int tails(int x, int y) {
    switch (x) {
    case 1: h = y + 1; return g * 3;
    case 9: h = y + 1; return g * 3;
    case 70: g = 7; break;
    default: g = 8;
    }
    h = y + 1;
    return g * 3;
}

// FUNCTION: unlike
// COUNT 2: _h = 
int unlike(int x) {
    if (x) { g = 5; h = x + 1; return g * 3; }
    g = 5;
    h = x + 2;
    return g * 3;
}

int main(void) {
    put_i16(tails(1, 1) + h);
    put_i16(tails(9, 9) + h);
    put_i16(tails(70, 70) + h);
    put_i16(tails(2, 2) + h);
    put_i16(unlike(1) + h);
    put_i16(unlike(0) + h);
    return 0;
}
