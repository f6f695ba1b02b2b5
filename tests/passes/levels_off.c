// Without optimization the statements stay as they were written, and the objects where they were.
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

// FUNCTION: scopes
// COUNT 2: /\d+ cells: int\[20\], class 1/
int scopes(int x) {
    if (x > 3) {
        int cells[20];
        cells[x] = x;
        return cells[x];
    } else {
        int cells[20];
        cells[x] = 2 * x;
        return cells[x];
    }
}

int main(void) {
    put_i16(plain(4));
    put_i16(scopes(3) + scopes(4));
    put_i16(g);
    return 0;
}
