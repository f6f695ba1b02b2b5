// Accesses that loop work brings into base and subscript and back: the same accesses, each as volatile as it was.
// RUN: --opt_level=2 --disable_inlining --debug:idle_frames,validate
#include <zrun.h>

unsigned near_start[] = {5, 6, 7, 8};
int big[9], *q, g;
long wide[6];
volatile int port;
struct S { int a[4]; volatile int flag; long last; } gs, *sp = &gs;
static struct S sa[3];

void look(int *p) { *p += 1; }

// A widened unsigned sum wraps ahead of its widening: this is the element before.
// FUNCTION: one_before
// COUNT 1: (long)(i - 1)
void one_before(unsigned i) { wide[(unsigned)(i + 65535u)] = wide[i] + 1; }

// The terms that are taken away, a first term below zero, and a difference of pointers.
int backwards(int *p, int i, int j, int *end) {
    return *(p - (i - j)) + *(p - i - 1) * 10 + p[-j] * 100 + *(end - (end - p)) * 1000;
}

// FUNCTION: reads_twice
// COUNT 2: _port
// COUNT 2: *v
// COUNT 2: .flag
int reads_twice(volatile int *v) {
    int x;
    x = *v; x = *v;
    x += port; x += port;
    x += sp->flag; x += sp->flag;
    return x;
}

// A qualified parameter: the variable itself is written, and read again.
// FUNCTION: qualified
// HAS: n = n, m = m
// HAS: n = n
int qualified(volatile int n, const int m) { n += m; return n + n; }

// Members, elements and what an automatic address is taken of may be written through pointers.
int through_pointers(int k) {
    static int held = 3, *holder = &held;
    struct S s;
    int a[4] = {1, 2, 3, 4}, *r = &s.a[1], *t = &a[k], sum;
    s.a[1] = 1;
    *r = 2;
    s.a[1] += *r;
    *t = 9;
    look(&a[k]);
    *holder = 5;
    held += *holder;
    sum = s.a[1] * 1000 + a[k] * 10 + held;
    return sum;
}

int address_of_element(int k) {
    int *p = &sa[1].a[2], n, r = 0;
    for (n = 0; n < 3; n++) {
        *p = n + k;
        sa[n].a[2] = 5;
        r = r * 10 + *p;
    }
    return r;
}

unsigned near_limit(unsigned *p, int i, unsigned u, long l) { return *(p + i + 32767 - 32767) * 10u + *(p + l - u + i); }

int main(void) {
    int i;
    for (i = 0; i < 9; i++) big[i] = i;
    for (i = 0; i < 6; i++) wide[i] = i * 100L;
    one_before(3);
    put_i32(wide[2]);
    put_i32(backwards(big + 5, 3, 1, big + 8));
    port = 4, gs.flag = 6;
    put_i16(reads_twice(&port));
    put_i16(qualified(3, 4));
    put_i16(through_pointers(2));
    put_i16(address_of_element(1));
    put_u32(near_limit(near_start + 1, 1, 2u, 1L));
    return 0;
}
