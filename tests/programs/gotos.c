// Control flow by goto: loops of two entries, jumps into loops and blocks.
#include <zrun.h>

static int irreducible(int n, int enter) {
    int steps = 0;
    if (enter) goto middle;
top:
    steps += 1;
    n -= 2;
middle:
    steps += 10;
    n -= 1;
    if (n > 0) goto top;
    return steps;
}

static int into_loop(int n, int skip) {
    int i = 0, s = 0;
    if (skip) goto inside;
    for (i = 0; i < n; i++) {
        s += 100;
    inside:
        s += i;
    }
    return s;
}

static int into_block(int n) {
    int r = 1;
    switch (n & 3) {
    case 0:
        r += 1;
        if (n > 8) goto two;
        break;
    case 1: do { r *= 2;
        case 3: r += 3;
        } while (r < 40);
        break;
    case 2:
    two:
        r -= 5;
    }
    return r;
}

int main(void) {
    int i;
    for (i = -1; i < 10; i += 3) {
        put_i16(irreducible(i, 0));
        put_i16(irreducible(i, 1));
        put_i16(into_loop(i, 0));
        put_i16(into_loop(i, 1));
    }
    for (i = 0; i < 16; i += 3) put_i16(into_block(i));
    return 0;
}
