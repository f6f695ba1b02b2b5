// Negations fold into comparisons of integers, pairs of them vanish; of floats only equality may be turned round.
// RUN: --opt_level=1
#include <zrun.h>

// FUNCTION: ordered
// HAS: /return \w+ >= 3/
// NOT: !
int ordered(int x) { return !(x < 3); }

// FUNCTION: twice
// HAS: /return \w+ != 0/
int twice(int x) { return !!x; }

int g;

// FUNCTION: branch
// COUNT 0: /!!|! !/
// COUNT 1: if (
int branch(int x) {
    if (!!(x == 4)) return 1;
    g = x;
    return 2;
}

// FUNCTION: unordered
// COUNT 0: >=
int unordered(float x) { return !(x < 3.0F); }

// FUNCTION: equal
// COUNT 1: !=
int equal(float x) { return !(x == 3.0F); }

int main(void) {
    volatile float zero = 0.0F;
    put_i16(ordered(3));
    put_i16(twice(8));
    put_i16(branch(4) * 10 + branch(5));
    put_i16(unordered(2.0F) * 100 + unordered(3.0F) * 10 + unordered(zero / zero));
    put_i16(equal(3.0F) * 10 + equal(zero / zero));
    return 0;
}
