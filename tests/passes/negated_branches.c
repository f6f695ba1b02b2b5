// A condition that only jumps over a jump is negated, and the jump is gone; unordered floats keep their sense.
// RUN: --opt_level=0
#include <zrun.h>

int g;

// FUNCTION: leave
// HAS: /if \(!\(.*>= 5\)\) goto L\d+/
// NOT: /^goto/
// HAS: _g = 2
// NOT: < 5
void leave(int x) {
    if (x < 5) goto out;
    g = 2;
out:
    g++;
}

// FUNCTION: floats
// NOT: >=
// HAS: end function
int floats(float a, float b) {
    if (a < b) goto less;
    return 1;
less:
    return 2;
}

int main(void) {
    float nan = 0.0F;
    nan = nan / nan;
    leave(3);
    put_i16(g);
    leave(9);
    put_i16(g);
    put_i16(floats(1.0F, 2.0F));
    put_i16(floats(2.0F, 1.0F));
    put_i16(floats(nan, 1.0F));
    return 0;
}
