// Accesses of volatile objects are neither dropped, merged, nor reordered at any strength of optimization.
// RUN: --opt_level=4 --opt_for_speed=5
#include <zrun.h>

volatile int port, other;

// FUNCTION: pulse
// HAS: _port = 0
// HAS: _port = 1
// HAS: _port = 0
void pulse(void) {
    port = 0;
    port = 1;
    port = 0;
}

// FUNCTION: twice
// COUNT 2: _port
int twice(void) { return port + port; }

// FUNCTION: unused
// COUNT 1: _port
// COUNT 1: _other
// HAS: /_port/
// HAS: /_other/
void unused(void) {
    port;
    (void)other;
}

// What is no volatile object may be written as one.
// FUNCTION: written_as_volatile
// NOT: return 11
int written_as_volatile(int x) {
    int plain = 10, *p = &plain;
    put_i16(*p);
    plain = 10;
    *(volatile int*)(x ? p : 0) = 20;
    return plain + 1;
}

int main(void) {
    put_i16(written_as_volatile(1));
    pulse();
    put_i16(twice());
    unused();
    return 0;
}
