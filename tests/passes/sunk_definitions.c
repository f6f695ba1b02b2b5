// What each iteration of a loop assigns and the loop does not read is assigned behind it.
// RUN: --opt_level=2 --disable_inlining --debug:hierarchy --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
#include <zrun.h>

int a[8], b[8];
volatile int port;

// FUNCTION: behind_the_loop
// HAS: /goto L2/
// HAS: last = *(&_b + (n & 7)) * 3
// COUNT 2: last =
int behind_the_loop(int n) {
    int i, last = 7;
    for (i = 0; i < n; i++) {
        a[i] = i;
        last = b[n & 7] * 3;
    }
    return last;
}

// Where no iteration runs, or one leaves ahead of the assignment, it keeps its value.
int left_early(int n) {
    int i, x = 5;
    for (i = 0; i < 8; i++) {
        if (b[i] == n) break;
        x = n * 3 + b[7];
        a[i] = x & 0;
    }
    return x;
}

int by_condition(int n) {
    int i = 0, x = 1;
    do {
        if (b[i] & 1) x = n + 4;
        a[i] = n;
    } while (++i < 4);
    return x;
}

// What it is computed from changes ahead of the exit: through a pointer, or in the step of the counter.
int changes_behind(int *p, int *q) {
    int i = 0, x, y;
    do {
        x = *p;
        *q = i;
        y = i;
    } while (++i < 5);
    return x * 10 + y;
}

// FUNCTION: keeps_its_reads
// HAS: /x = _port/
// HAS: /goto L1/
int keeps_its_reads(void) {
    int i = 0, x;
    do {
        x = port;
        a[i] = i;
    } while (++i < 3);
    return x;
}

int nested(int n) {
    int i, j, x = 0;
    for (i = 0; i < 3; i++) {
        j = 0;
        do {
            x = n * 5 + 1;
            a[j] += i;
        } while (++j < 2);
        b[i] += 1;
    }
    return x;
}

int main(void) {
    int i, k = 9;
    for (i = 0; i < 8; i++) b[i] = i;
    put_i16(behind_the_loop(3));
    put_i16(behind_the_loop(0));
    put_i16(left_early(0) * 100 + left_early(4));
    put_i16(by_condition(2));
    put_i16(changes_behind(&k, &k) * 10 + changes_behind(a, b));
    port = 6;
    put_i16(keeps_its_reads());
    put_i16(nested(4) + b[1]);
    return 0;
}
