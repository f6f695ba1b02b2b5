// Locals that nothing mentions leave the table; those that live in memory, or are volatile, stay.
// RUN: --opt_level=0
#include <zrun.h>

static int set(int* p) { return *p = 4; }

// FUNCTION: several
// NOT: /\d+ never\b/
// NOT: /\d+ table\b/
// HAS: /\d+ used\b.*level 2/
// HAS: end of locals
int several(int x) {
    int never, used = x + 1, table[10];
    return used * 2;
}

// FUNCTION: kept
// HAS: /\d+ memory\b/
// HAS: /\d+ watched\b/
int kept(void) {
    int memory;
    volatile int watched = 3;
    return set(&memory) + memory;
}

int main(void) {
    put_i16(several(4));
    put_i16(kept());
    return 0;
}
