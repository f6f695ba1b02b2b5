// Operations on constants are done at their width, and neighbours that are constants come together.
// RUN: --opt_level=1
#include <zrun.h>

// FUNCTION: product
// HAS: return 42
int product(void) { return 2 * 3 * 7; }

// FUNCTION: wraps
// HAS: return 1
// NOT: 65536
unsigned wraps(void) { return 65535u + 2u; }

// FUNCTION: truncates
// HAS: return -2
int truncates(void) { return -7 / 3; }

// FUNCTION: quotient
// HAS: return 100000
long quotient(void) { return 1000000L / 10L; }

// FUNCTION: single
// HAS: return 0x1.8p+1
float single(void) { return 1.0F + 2.0F; }

// FUNCTION: truth
// HAS: return 1
int truth(void) { return (3 > 2) + (4u < 1u); }

// FUNCTION: narrowed
// HAS: return 4464
unsigned narrowed(void) { return (unsigned)70000L; }

int main(void) {
    put_i16(product());
    put_u32(wraps());
    put_i16(truncates());
    put_i32(quotient());
    put_f32(single());
    put_i16(truth());
    put_u32(narrowed());
    return 0;
}
