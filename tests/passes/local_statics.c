// A function-local static that every call writes before it reads it moves into the frame; one with a memory stays.
// RUN: --opt_level=2
#include <zrun.h>

static int other(int x) { return x + 1; }

// FUNCTION: scratch
// HAS: /\d+ _s\$\d: .*level 2/
int scratch(int x) {
    static int s;
    s = x * x;
    if (x > 4) s += 3;
    return s - x;
}

// The call's own argument is read before anything can happen.
// FUNCTION: as_argument
// HAS: /\d+ _a\$\d: .*level 2/
int as_argument(int x) {
    static int a;
    a = x * 3;
    return other(a);
}

// FUNCTION: one_path
// COUNT 0: /\d+ _o\$\d: /
// HAS: /_o\$\d/
int one_path(int x) {
    static int o = 5;
    if (x) o = x;
    return o;
}

// An inner call writes what the outer one reads.
// FUNCTION: entered_again
// COUNT 0: /\d+ _r\$\d: /
// HAS: /_r\$\d/
int entered_again(int n) {
    static int r;
    r = n;
    if (n > 0) other(entered_again(n - 1));
    return r;
}

// FUNCTION: has_pointer
// COUNT 0: /\d+ _p\$\d: /
// HAS: /_p\$\d/
int has_pointer(int x) {
    static int p;
    static int *const q = &p;
    p = x;
    *q += 2;
    return p;
}

// FUNCTION: watched
// COUNT 0: /\d+ _v\$\d: /
// HAS: /_v\$\d/
int watched(int x) {
    static volatile int v;
    v = x;
    return v;
}

// FUNCTION: loop_first
// COUNT 0: /\d+ _l\$\d: /
// HAS: /_l\$\d/
int loop_first(int n) {
    static int l = 2;
    int sum = 0;
    while (n-- > 0) {
        sum += l;
        l = n;
    }
    return sum;
}

int main(void) {
    put_i16(scratch(3) + scratch(7));
    put_i16(as_argument(4));
    put_i16(one_path(0));
    put_i16(one_path(8));
    put_i16(one_path(0));
    put_i16(entered_again(3));
    put_i16(has_pointer(4));
    put_i16(watched(4));
    put_i16(loop_first(3));
    put_i16(loop_first(2));
    return 0;
}
