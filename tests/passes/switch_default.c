// A switch names where it goes without a match: a default of its own, or the statement behind it.
// RUN: --opt_level=2
#include <zrun.h>

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

// FUNCTION: own
// HAS: /switch .*default: L\d+;/
int own(int x) {
    int r = 0;
    switch (x) {
    case 3: r = 1; break;
    case 30: r = 2; break;
    case -300: r = 3; break;
    default: r = 4;
    }
    return r;
}

int main(void) {
    int i;
    for (i = 0; i < 4; i++) put_i16(without(i));
    put_i16(own(3) + 10 * own(30) + 100 * own(-300) + 1000 * own(0));
    return 0;
}
