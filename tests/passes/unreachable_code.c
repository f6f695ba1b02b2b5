// What no path reaches is dropped: behind returns and jumps, and under conditions that are constants.
// RUN: --opt_level=1
#include <zrun.h>

int g;

// FUNCTION: behind_return
// NOT: _g
// HAS: /^return/
// NOT: _g
int behind_return(int x) {
    return x;
    g = 1;
}

// FUNCTION: constant_conditions
// COUNT 0: /[23]22/
// COUNT 0: if (
// COUNT 1: /_g (\+)?= 444/
int constant_conditions(int x) {
    if (0) g = 222;
    while (0) g = 322;
    if (1) g = 444;
    return x;
}

int main(void) {
    put_i16(behind_return(1) + constant_conditions(3));
    put_i16(g);
    return 0;
}
