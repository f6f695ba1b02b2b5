// Without optimization the statements stay as they were written.
// RUN: --opt_level=off
#include <zrun.h>

int g;

// FUNCTION: plain
// HAS: /_g = 1/
// HAS: /_g = 2/
// HAS: return y
int plain(int x) {
    int y = x + 1;
    g = 1;
    g = 2;
    return y;
}

int main(void) {
    put_i16(plain(4));
    put_i16(g);
    return 0;
}
