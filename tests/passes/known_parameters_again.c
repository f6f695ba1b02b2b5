// Parameters are known once for the file, however often an order of steps asks for it.
// RUN: --opt_level=3 --disable_inlining --opt_passes=5,5,11
#include <zrun.h>

int g[4];

// FUNCTION: scaled
// HAS: by = 3
static long scaled(int n, int by) { return (long)g[n & 3] * by + n; }

int main(void) {
    g[1] = 5;
    put_i32(scaled(1, 3) + scaled(g[1], 3));
    return 0;
}
