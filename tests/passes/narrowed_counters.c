// A long counter that becomes an int: loops in it are bounded by the int from then on. The assertions of values keep the
// long one in the loop.
// RUN: --opt_level=2 --debug:vp_asserts
// LEVELS: 3
#include <zrun.h>

int g[8];
// FUNCTION: nest
// NOT: pragma 39 MUST_ITERATE("0", "2", "1")
void nest(void) {
    long l = 0;
    int i;
    unsigned w;
    do {
        for (i = 0; i <= l; i++)
            for (w = 0; w <= i; w++) g[w]++;
        l += 1;
    } while (l <= 2);
}

int main(void) {
    int i;
    nest();
    for (i = 0; i < 8; i++) put_i16(g[i]);
    return 0;
}
