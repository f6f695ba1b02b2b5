// Where size counts more than speed nothing takes a register of its own for a whole loop.
// RUN: --opt_level=2 --size_speed_goal=3
#include <zrun.h>

struct box { int limit; } box = {10};

// NOT: $O$H
int kept_load(struct box* p, int n) {
    int i, s = 0;
    for (i = 0; i < n; i++) s = s * 3 + (p->limit ^ i);
    return s;
}

int main(void) {
    put_i16(kept_load(&box, 4));
    return 0;
}
