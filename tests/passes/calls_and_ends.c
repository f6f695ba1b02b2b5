// A function without calls says that it is a leaf; one with calls, direct or by pointer, does not.
// RUN: --opt_level=2 --disable_inlining
#include <stdlib.h>
#include <zrun.h>

int g;

// FUNCTION: leaf
// COUNT 1: /function info.*leaf/
int leaf(int x) { return x + g; }

// FUNCTION: caller
// COUNT 0: leaf)
// COUNT 1: _leaf(
int caller(int x) {
    g = x;
    return leaf(x) + g;
}

// FUNCTION: indirect
// COUNT 0: leaf)
int indirect(int (*f)(int), int x) { return f(x); }

// ---- Behind a call that never returns stands the mark that says so, and nothing of what followed.

// FUNCTION: stop
// HAS: _exit(7)
// HAS: // ***	; the preceding call never returns
// HAS: _never_executed()
// NOT: 55
// COUNT 0: 55
void stop(int x) {
    if (x > 1000) {
        exit(7);
        g = 55;
    }
    g = x;
}

int main(void) {
    put_i16(caller(3));
    put_i16(indirect(caller, 4));
    stop(4);
    put_i16(g);
    return 0;
}
