// What a pointer may refer to depends on the place: a value in memory lives across stores that cannot reach it there,
// and across no other.
// RUN: --opt_level=2 --debug:skip=ssa-rp-with-benign-loads+ssa-reg-promote+ssa-reg-promote-with-simpcfg+superblocks
// LEVELS: off 0 1 3
#include <string.h>
#include <zrun.h>

int a, b, c, x[40], y[40];
int *any;
struct pair { int first, second; } pairs[8];

void aim_at_b(int **p) { *p = &b; }

// In each loop one array is read and the other written.
// FUNCTION: one_after_the_other
// HAS: p = &_x
// HAS: /^\$O\$U\d+ = \*\(&_y \+ 3\)$/
// HAS: p = &_y
// HAS: /^\$O\$U\d+ = \*\(&_x \+ 3\)$/
int one_after_the_other(int n) {
    int *p = x, i, s = 0;
    for (i = 0; i < n; i++) { *p++ = i; s += y[3]; }
    p = y;
    for (i = 0; i < n; i++) { *p = i; p += 2; s += x[3]; }
    return s;
}

// A pointer of a loop that stays at every fourth element; the value is loaded again only where the step allows it.
// FUNCTION: kept_apart_by_steps
// COUNT 1: *(&_x + 6)
// COUNT 2: *(&_x + 8)
int kept_apart_by_steps(int n) {
    int *p, *end = x + 20, s = x[6] * x[8];
    for (p = x; p < end; p += 4) *p = n;
    return s + x[6] * 5 + x[8];
}

// The null pointer is no object: both values are kept; with the other one it is anything.
// FUNCTION: null_or_one
// COUNT 1: *(&_y + 3)
int null_or_one(int n) {
    int *p = 0, s;
    if (n > 3) p = &a;
    s = y[3] * 5;
    if (p) *p = n;
    if (n > 30) p = &c;
    if (p) *p += n;
    return s + y[3] * 7;
}

// One path knows the target, the other nothing of it.
// FUNCTION: changed_by_call
// COUNT 1: return _b
int changed_by_call(int n) {
    int *p = &a;
    if (n) aim_at_b(&p);
    b = 1;
    *p = 2;
    return b;
}

int stepped(int *q) {
    int *p = q;
    *p = 1;
    p = p + 1;
    *p = 2;
    return q[0] + q[1] * 10;
}

int stepped_in_loop(int *q, int n) {
    int *p = q, i, s = 0;
    for (i = 0; i < n; i++) { *p = i; p = p + 1; *p = 7; s += q[i] * 3 + q[i + 1]; }
    return s;
}

// Longs at every second element meet what lies in between.
int wide_steps(int n) {
    long *p; int s = x[9];
    for (p = (long *)x; p < (long *)(x + 16); p += 2) *p = n * 65537L;
    return s + x[9] + x[8] * 3 + x[10] * 5;
}

int through_integers(int n) {
    unsigned long u = (unsigned long)(n ? &a : &b);
    int *p = (int *)u, *q;
    union { int *p; long l; } v;
    a = b = 3;
    *p = 4;
    v.l = (long)&b;
    q = v.p;
    n = a + b * 10;
    *q += 5;
    return n + a * 100 + b * 1000;
}

int copied_pointer(int n) {
    int *p = &a, *q = &b, *volatile v = &a;
    a = 1, b = 2;
    if (n) memcpy(&p, &q, sizeof p);
    *p = 10;
    n = a + b * 3;
    v = &b;
    *v = 20;
    return n + a * 5 + b * 7;
}

int through_memory(int n) {
    int *p = &a, **pp = n > 1 ? &p : &any;
    *pp = &b;
    b = 1;
    *p = n;
    *any = 9;
    return b * 10 + a;
}

// What is equal may be either: the arm that cannot be is none that knows nothing.
int compared(int *p, int *q, int n) {
    int *r = n ? &a : &b;
    a = 1, b = 2;
    if (r == &b) { *r = n + 5; return b; }
    if (p == q) { *p = 6; return *q + a; }
    *r = 8;
    return a + b;
}

// One number, two places: what is known of the first access is not known of the second.
int one_number(int n) {
    int *p, s;
    if (n) { p = &a; a = 3; s = *p; } else { p = &b; b = 4; s = *p; b = 5; s += *p; }
    return s * 10 + *p;
}

int of_members(int n) {
    int *p = &pairs[0].second, i, s = 0;
    for (i = 0; i < n; i++) { *p = i + 1; p += 2; s += pairs[i].first + pairs[i].second; }
    return s;
}

int again(int n, int *outer) { // an object of each activation
    int own = n, *p = &own;
    if (n > 0) again(n - 1, p);
    if (outer) *outer += 3;
    *p += n;
    return own * 2 + *p;
}

int *of_last_call(int *p, int n) {
    static int kept;
    kept = n;
    if (p) *p = n + 1;
    n = kept;
    return put_i16(n), &kept;
}

int main(void) {
    int i;
    any = &c;
    for (i = 0; i < 40; i++) x[i] = i, y[i] = 100 - i;
    put_i16(one_after_the_other(10)); put_i16(kept_apart_by_steps(3)); put_i16(null_or_one(2)); put_i16(null_or_one(40));
    put_i16(changed_by_call(0)); put_i16(changed_by_call(1)); put_i16(stepped(x)); put_i16(stepped_in_loop(x, 9));
    put_i16(wide_steps(5)); put_i16(through_integers(0)); put_i16(through_integers(1)); put_i16(copied_pointer(0));
    put_i16(copied_pointer(1)); put_i16(through_memory(1)); put_i16(through_memory(2)); put_i16(compared(&a, &a, 0));
    put_i16(compared(&a, &a, 1)); put_i16(compared(x, y, 1)); put_i16(one_number(0)); put_i16(one_number(1));
    put_i16(of_members(5)); put_i16(again(4, 0)); of_last_call(of_last_call(0, 4), 6);
    return 0;
}
