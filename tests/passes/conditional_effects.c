// What a statement does under a condition stays under it, also where the condition is all that is left of the statement.
// RUN: --opt_level=1
#include <zrun.h>

static long long seen = 15;
static int a[4] = {1, 2, 3, 4};

// FUNCTION: arm_of_a_dead_value
// HAS: /\? .*_seen = /
int arm_of_a_dead_value(const int *p, int x, int n) {
    int y = 7;
    y = x < p[2] ? (seen = p[1], seen) : p[0] << 1;
    return ~n;
}

// FUNCTION: right_of_a_dead_and
// HAS: /&& .*_seen = /
int right_of_a_dead_and(int x, int n) {
    int y = 7;
    y = x > 5 && (seen = n) > 2;
    return n + 1;
}

int main(void) {
    put_i16(arm_of_a_dead_value(a, 9, 5));
    put_i64(seen);
    put_i16(right_of_a_dead_and(1, 30));
    put_i64(seen);
    put_i16(right_of_a_dead_and(6, 31));
    put_i64(seen);
    put_i16(arm_of_a_dead_value(a, 1, 5));
    put_i64(seen);
    return 0;
}
