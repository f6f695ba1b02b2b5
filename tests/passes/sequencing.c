// Effects that only follow one another become statements of their own, in their order.
// RUN: --opt_level=1
#include <zrun.h>

int g, h;

// FUNCTION: commas
// HAS: _g = 3
// HAS: _h = 4
// COUNT 0: /, _/
void commas(void) { g = 3, h = 4; }

// FUNCTION: header
// HAS: _h = 1
// HAS: /^L\d+:/
int header(int n) {
    int s = 0;
    for (g = 0, h = 1; g < n; g++, h *= 2) s += h;
    return s;
}

// FUNCTION: discarded
// COUNT 0: /_g [+*]/
// COUNT 1: _h
int discarded(int x) {
    g + 1;
    g* x;
    return h;
}

int main(void) {
    commas();
    put_i16(g + h);
    put_i16(header(5));
    put_i16(discarded(1));
    return 0;
}
