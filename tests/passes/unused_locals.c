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

// ---- Without optimization of expressions the value that is tested is not read again; nothing else moves into a test.

int g;
volatile int v;

// FUNCTION: counted
// HAS: /if .*n -= 1/
int counted(int n) {
    int sum = 0;
    do {
        sum += n;
        n -= 1;
    } while (n > 0);
    return sum;
}

// FUNCTION: of_another
// COUNT 0: /if .*x = /
int of_another(int x, int y) {
    g = y;
    x = y + 1;
    if (y > 2) g = 4;
    return x;
}

// FUNCTION: of_memory
// COUNT 0: /if .*_g = /
int of_memory(int y) {
    g = y + 1;
    if (g > 2) return 4;
    return y;
}

int main(void) {
    put_i16(several(4));
    put_i16(kept());
    put_i16(counted(5));
    put_i16(of_another(1, 3) + g);
    put_i16(of_memory(2) + of_memory(1));
    return 0;
}
