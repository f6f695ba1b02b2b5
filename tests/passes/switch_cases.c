// Of a switch on a value in a small known range the cases that cannot occur go, and the default where it cannot be taken.
// RUN: --opt_level=2
#include <zrun.h>

int g;

// FUNCTION: full
// HAS: /switch .* case 3: L\d+; default: L\d+; }/
// COUNT 1: _never_executed
// COUNT 0: = 99
int full(unsigned x) {
    switch (x & 3) {
    case 0: g = 10; break;
    case 1: g = 20; break;
    case 2: g = 31; break;
    case 3: g = 42; break;
    default: g = 99;
    }
    return g;
}

// FUNCTION: impossible
// COUNT 0: case 9
// COUNT 0: case -1
// COUNT 0: = 77
int impossible(unsigned x) {
    switch ((int)(x & 7)) {
    case 1: g = 10; break;
    case 9: g = 77; break;
    case -1: g = 77; break;
    default: g = 5;
    }
    return g;
}

// FUNCTION: stride
// COUNT 0: case 5
// HAS: /switch .*case 1: .*case 2: /
// COUNT 0: = 77
int stride(unsigned x) {
    switch ((x & 3) * 4 + 8) {
    case 8: g = 10; break;
    case 12: g = 20; break;
    case 13: g = 77; break;
    case 16: g = 30; break;
    }
    return g;
}

// FUNCTION: open
// COUNT 0: _never_executed
// HAS: /default/
int open(int x) {
    switch (x) {
    case 0: g = 1; break;
    case 1: g = 2; break;
    case 2: g = 4; break;
    default: g = 99;
    }
    return g;
}

// FUNCTION: sparse
// COUNT 0: _never_executed
int sparse(unsigned x) {
    switch (x & 63) {
    case 0: g = 1; break;
    case 31: g = 2; break;
    case 60: g = 4; break;
    default: g = 99;
    }
    return g;
}

// ---- A switch names where it goes without a match: a default of its own, or the statement behind it.

// FUNCTION: without
// HAS: /switch \(\w+\) \{ case 1: L\d+; case 2: L\d+; default: L\d+; \}/
// COUNT 0: goto
int without(int x) {
    switch (x) {
    case 1: return 5;
    case 2: return 6;
    }
    return 7;
}

int main(void) {
    for (int i = -2; i < 9; i++) {
        put_i16(full((unsigned)i));
        put_i16(impossible((unsigned)i));
        put_i16(stride((unsigned)i));
        put_i16(open(i));
        put_i16(sparse((unsigned)i));
    }
    put_i16(sparse(31) + sparse(60));
    int i;
    for (i = 0; i < 4; i++) put_i16(without(i));
    return 0;
}
