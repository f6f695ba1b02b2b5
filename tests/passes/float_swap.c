// Three assignments that exchange two variables become the target's exchange; a value that is still needed keeps them.
// RUN: --opt_level=1 --float_support=fpu32 --disable_inlining
#include <zrun.h>

static void show(float a, float b) {
    put_f32(a);
    put_f32(b);
}

// FUNCTION: exchanged
// COUNT 1: __swapf(
// COUNT 0: t = 
void exchanged(float a, float b, int n) {
    while (n-- > 0) {
        float t = a;
        a = b;
        b = t;
    }
    show(a, b);
}

// FUNCTION: kept
// COUNT 0: __swapf(
float kept(float a, float b) {
    float t = a;
    a = b;
    b = t;
    show(a, b);
    a = b + t;
    return a * t;
}

// What stood between them is removed first.
// FUNCTION: no_exchange
// COUNT 0: __swapf(
// COUNT 0: unused = 
float no_exchange(float a, float b, float c, int n) {
    float t = 0, unused = a;
    while (n-- > 0) {
        show(t, b);
        t = a;
        unused = b;
        b = t;
        a = c;
    }
    return b;
}

int main(void) {
    for (int n = 0; n < 3; n++) exchanged(1.5F, -2.0F, n);
    put_f32(kept(3.0F, 4.0F));
    put_f32(no_exchange(1.0F, 2.0F, 3.0F, 3));
    return 0;
}
