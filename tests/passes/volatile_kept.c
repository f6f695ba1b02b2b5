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

int main(void) {
    pulse();
    put_i16(twice());
    unused();
    return 0;
}
