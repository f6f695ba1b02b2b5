// A pointer's step becomes part of the reference beside it.
// RUN: --opt_level=2 --disable_inlining --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
// LEVELS: 0 1 3 4
#include <zrun.h>

int a[40], b[40], seen;
long w[20];
struct pair { int x, y; } ps[12];
struct wide { int x, y, z; } ws[6];

int twice(int x) {
    seen = seen * 3 + x;
    return x * 2;
}

// FUNCTION: copy
// HAS: *p++{2} = *q++{2}
// NOT: p +=
void copy(long* p, long* q, int n) {
    for (; n > 0; n--) *p++ = *q++;
}

// The step in front of a reference: of the next element, or of the one that was passed.
// FUNCTION: before
// HAS: s = s * 3 + *(p -= 1)
int before(int* p, int n) {
    int s = 0;
    do s = s * 3 + *--p;
    while (--n > 0);
    return s;
}

// Around the back edge: the pointer is a step ahead when the loop begins.
// FUNCTION: backwards
// HAS: /\*\(.*-= 1\)/
int backwards(int n) {
    int k, s = 0;
    for (k = 0; k < n; k++) s += a[k] * b[20 - k];
    return s;
}

// Steps of another size, of a pointer that is read twice or as a value, and behind a test stay.
// FUNCTION: stay
// NOT: ++
int stay(int* p, long* q, int c, int** out) {
    int s = 0, n = 5;
    do {
        s += *q > 3;
        q += 2;
        s += p[0] * p[1];
        p += 2;
        if (c && *p) s++;
        p += 1;
    } while (--n);
    *out = p;
    return s;
}

// FUNCTION: over_branch
// HAS: /= \*p\+\+/
int over_branch(int* p, int n) {
    int s = 0, t;
    while (n-- > 0) {
        t = *p;
        if (t & 1) s += twice(t);
        p++;
    }
    return s;
}

// A branch that reads the pointer has the step ahead of it.
int on_one_arm(int* p, int n) {
    int s = 0;
    while (n-- > 0) {
        p++;
        if (n & 1) s += p[-1];
        s += *p * 3;
        p++;
        if (n & 2) s += p[-1] * 5;
    }
    return s;
}

// FUNCTION: split
// HAS: /^\*p\+\+ = \$O\$A\d+$/
void split(int* p, int n) {
    do {
        *p = twice(p[1]);
        p++;
    } while (--n);
}

// FUNCTION: members
// HAS: /\(\*p\+\+\{2\}\)\.y/
int members(struct pair* p, struct wide* v, int n) {
    int s = 0;
    do {
        s = s * 3 + p->y;
        p++;
        s += v->z;
        v++;
    } while (--n);
    return s;
}

// Two references take a step each.
// FUNCTION: pairs
// COUNT 2: x++
// COUNT 2: y++
// NOT: +=2
long pairs(int* x, int* y, int n) {
    long s = 0;
    do {
        int re = x[0], im = x[1];
        y[0] = im;
        y[1] = (int)s;
        s = s * 3 + re - im;
        x += 2, y += 2;
    } while (--n);
    return s;
}

// References in an order that takes no step, or half of one.
// FUNCTION: out_of_order
// HAS: x += 2
long out_of_order(int* x, int n) {
    long s = 0;
    do {
        s = s * 3 + x[1];
        s ^= x[0];
        s += (x[0] & 1) && x[1];
        x += 2;
    } while (--n);
    return s;
}

// A limit moves as far as the pointer lags behind; one that is read behind the loop does not.
// FUNCTION: down_to
// HAS: /= \*\(\S+ -= 1\)$/
long down_to(int n, int k) {
    int *p = a + n, *end = a + k;
    long s = 0;
    do s = s * 3 + (p[0] ^ p[0] >> 1);
    while (--p != end);
    return s;
}

// FUNCTION: down_to_read
long down_to_read(int n, int k) {
    int *p = a + n, *end = a + k;
    long s = 0;
    do s = s * 3 + (p[0] ^ p[0] >> 1);
    while (--p != end);
    return s + *p + *end;
}

// Whatever lies between the one reference and the step of each iteration.
// FUNCTION: only_use
// HAS: /= \*\S+\+\+/
int only_use(int* p, int n) {
    int peaks = 0, up = 0, high = 0, i;
    for (i = 0; i < n; i++, p++) {
        int v = *p;
        if (up) {
            if (v > high) high = v;
            else if (v < high - 3) peaks++, up = 0;
        } else if (v < 5) {
            if (peaks > 7) break;
            up = 1, high = v;
        }
    }
    return peaks * 100 + high;
}

// The pointer is read behind the loop, and where the loop is left early.
int* read_behind(int* p, int n) {
    do {
        if (*p == 9) return p;
        p--;
    } while (--n);
    return p;
}

int given_address(int* p, int n) {
    int s = 0, **pp = &p;
    do {
        s += *p;
        p++;
        if (s > 50) *pp = a;
    } while (--n);
    return s;
}

int main(void) {
    int i, *out;
    for (i = 0; i < 40; i++) a[i] = i * 7 % 23, b[i] = i * 5 % 17;
    for (i = 0; i < 12; i++) ps[i].x = i, ps[i].y = i * i;
    for (i = 0; i < 6; i++) ws[i].x = ws[i].y = 0, ws[i].z = i * 11;
    copy(w, (long*)a, 9), copy(w + 12, w, 3);
    put_i32(w[8] + w[13]);
    put_i16(before(a + 20, 11)), put_i16(before(b + 1, 1));
    for (i = 0; i < 4; i++) put_i16(backwards(i * 5));
    put_i16(stay(a, w, 1, &out)), put_i16((int)(out - a));
    put_i16(over_branch(a, 13)), put_i16(over_branch(a, 0)), put_i16(seen);
    put_i16(on_one_arm(b, 9)), put_i16(on_one_arm(b, 8));
    split(b, 7);
    for (i = 0; i < 9; i++) put_i16(b[i]);
    put_i16(members(ps, ws, 6));
    put_i16((int)(read_behind(a + 30, 5) - a)), put_i16((int)(read_behind(a + 39, 30) - a));
    put_i16(given_address(b, 20));
    put_i32(pairs(a, b, 9)), put_i16(b[17] + b[18]);
    put_i32(out_of_order(a, 9)), put_i32(out_of_order(b, 1));
    put_i32(down_to(30, 3)), put_i32(down_to(4, 3)), put_i32(down_to_read(30, 3));
    put_i16(only_use(a, 40)), put_i16(only_use(b, 17)), put_i16(only_use(b, 0));
    return 0;
}
