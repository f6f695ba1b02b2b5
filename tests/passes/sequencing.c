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

// No effect moves ahead of what reads its place or writes what it reads.
static int of_g(void) { return g * 10; }
// FUNCTION: behind_its_reader
// COUNT 1: of_g() + (_g = 3, _h)
int behind_its_reader(void) { return of_g() + (g = 3, h); }

// FUNCTION: behind_a_condition
// HAS: /^return .*&& .*_g = .*_h = _g/
int behind_a_condition(int x) { return (x > 5 && (g = x)) + (h = g, 3); }

int main(void) {
    commas();
    put_i16(g + h);
    put_i16(header(5));
    put_i16(discarded(1));
    put_i16(behind_its_reader());
    put_i16(behind_a_condition(9) * 10 + h);
    return 0;
}
