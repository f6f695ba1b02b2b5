// Locals that only their names reach may live in registers, structures too; those reached by pointers, and arrays, may
// not.
// RUN: --opt_level=2
#include <zrun.h>

static void set(int* p) { *p += 4; }

// FUNCTION: plain
// HAS: /\d+ total: .*class 22,.*level 2/
int plain(int n) {
    int total = 0;
    while (n > 0) total += n--;
    return total;
}

// FUNCTION: reached
// HAS: /\d+ reached: .*class 1,.*level 2/
int reached(int n) {
    int reached = n;
    set(&reached);
    return reached;
}

// FUNCTION: aggregate
// HAS: /\d+ cells: .*class 1,.*level 2/
int aggregate(int n) {
    int cells[3] = {1, 2, 3};
    set(cells + n);
    return cells[0] + cells[n];
}

struct record {
    int v[4];
    long l;
    volatile int* port;
};

// FUNCTION: structures
// HAS: /\d+ own: .*class 22,.*level 2/
// HAS: /\d+ shown: .*class 1,.*level 2/
int structures(struct record* from, int n) {
    struct record own = *from, shown = *from;
    set(&shown.v[1]);
    own.l += n;
    *from = own;
    return (int)own.l + shown.v[1];
}

int main(void) {
    static struct record first = {{1, 2, 3, 4}, 5};
    put_i16(structures(&first, 2) + first.v[2]);
    put_i16(plain(4));
    put_i16(reached(5));
    put_i16(aggregate(2));
    return 0;
}
