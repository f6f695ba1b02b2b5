// Calls stay, each once, in their order, also where their values are not used or are equal.
// RUN: --opt_level=2 --disable_inlining
#include <zrun.h>

static int count;

static int step(int by) {
    count = count * 3 + by;
    return count;
}

// FUNCTION: ordered
// HAS: /_step\(1\)/
// HAS: /_step\(2\)/
// HAS: /_step\(3\)/
// COUNT 3: _step(
int ordered(void) {
    int a = step(1);
    step(2);
    return a + step(3);
}

// FUNCTION: equal_calls
// COUNT 2: _step(5)
int equal_calls(void) {
    int a = step(5), b = step(5);
    return a - b;
}

// FUNCTION: guarded
// HAS: /if .*goto/
// COUNT 1: _step(
int guarded(int x) {
    if (x && step(x) > 2) return 1;
    return 0;
}

int main(void) {
    put_i16(ordered());
    put_i16(equal_calls());
    put_i16(guarded(0) + guarded(2));
    put_i16(count);
    return 0;
}
