// A loop's pragma is followed by that loop, however the blocks are laid out.
// RUN: --opt_level=2
#include <zrun.h>

int g[8];

// FUNCTION: two_loops
// HAS: /MUST_ITERATE\("2", "2"/
// NOT: /m \+= 1/
// HAS: /k \+= 1/
long two_loops(int n) {
    long sum = 0;
    int k, w, m;
#pragma MUST_ITERATE(2, 2)
    for (k = 3; k < 5; k++) {
        for (w = 0; w < n; w++) sum += g[w];
        g[0] = w;
    }
    for (m = 3; m != 11; m++) sum = sum * 3 + g[m - 3];
    return sum;
}

int main(void) {
    for (int i = 0; i < 8; i++) g[i] = i * i;
    put_i32(two_loops(8));
    put_i32(two_loops(0));
    return 0;
}
