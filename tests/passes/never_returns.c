// Behind a call that never returns stands the mark that says so, and nothing of what followed.
// RUN: --opt_level=2
#include <stdlib.h>
#include <zrun.h>

int g;

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
    stop(4);
    put_i16(g);
    return 0;
}
