// Where size counts, an operand that the 16-bit multiply reads from memory gets no temporary; other operands do.
// RUN: --opt_level=1 --size_speed_goal=3 --disable_inlining
// LEVELS: 2 4
#include <zrun.h>

int x[8], y[8];
unsigned char small[8];
long wide[8];

// FUNCTION: products
// NOT: $O$N
// HAS: /^return .*\*.* \* 3.*\* 5/
int products(int *p) { return p[1] * 3 ^ p[1] * 5; }

// FUNCTION: of_two
// NOT: $O$N
// HAS: /^return/
int of_two(int *p, int *q, int k) { return (p[1] * q[2] - k) ^ (p[1] * q[3] + k) ^ k * q[3]; }

// What a variable has is taken from there.
// FUNCTION: held
// COUNT 1: _x
int held(int k) {
    int v = x[1];
    return v * k ^ x[1] * (k + 1);
}

// A sum of them is no multiplication.
// FUNCTION: sums
// COUNT 1: _x
int sums(int k) { return (x[1] + k) ^ (x[1] - k * 3) ^ (x[1] & k); }

// Neither are 32-bit products those of the 16-bit multiply.
// FUNCTION: of_32_bits
// COUNT 1: &_wide
long of_32_bits(long k) { return wide[2] * k ^ wide[2] * (k + 1); }

int main(void) {
    int i;
    for (i = 0; i < 8; i++) x[i] = i * 7 - 9, y[i] = 5 - i, wide[i] = i * 70000L;
    for (i = 0; i < 6; i++) {
        put_i16(products(x + i)); put_i16(of_two(x + i, y, i)); put_i16(held(i)); put_i16(sums(i));
        put_i32(of_32_bits(i));
    }
    return 0;
}
