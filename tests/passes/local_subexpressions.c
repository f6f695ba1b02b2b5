// What a block has computed, loaded or stored is not computed or loaded again there.
// RUN: --opt_level=2 --disable_inlining --debug:validate
// LEVELS: 1 3
#include <zrun.h>
void exit(int);

struct S { float re, im; int tag; };
int g, h;
int stop(int x) { put_i16(x); return x & 3; }
int half(int x) { return x / 2 + (x & 1); } // writes nothing
int bump(int x) { g += x; return g; }

// A stored value that only a load would repeat is kept: no load behind the stores.
// FUNCTION: stored
// COUNT 2: (*p)
void stored(struct S *p, int a, float *sum) {
    p->re = (float)(a * 3);
    p->im = a & 1 ? 0.5f : -0.25f;
    *sum = p->re * p->re + p->im;
}

// FUNCTION: stored_result
// COUNT 0: + *p
int stored_result(int *p, int a) {
    *p = stop(a);
    return a + *p;
}

// Another place of the type, of another width, the address itself, a volatile one: loaded again.
int stored_and_changed(int *p, int *q, long *l, int a) {
    int x, y, z;
    *p = half(a) * 3; *q = 2; x = *p;
    *l = (long)a * 70000; *p = 5; y = (int)(*l >> 3);
    *l = (long)a * 3; z = *(int *)l;
    return x ^ y * 3 ^ z * 5;
}
int *here;
int self(int **pp, int **qq) { *pp = here + half(3); *qq = &g; return **pp; }
volatile int port;
int twice_read(int a) { port = half(a); return port + port; }
struct B { unsigned a : 3, b : 5; } bits;
int part(int a) { bits.a = half(a) + a; bits.b = 9; return bits.a + bits.b; }
unsigned narrow(unsigned *p, int a) { *(unsigned char *)p = a + 300; return *(unsigned char *)p; }

// Loads on both sides of calls that write nothing, and of one that does.
// FUNCTION: around_calls
// COUNT 1: *p
int around_calls(const int *p, int a) { return half(*p) * 3 - half(a + *p) + half(*p + 1); }
int around_writer(const int *p, int a) { int x = half(*p) + a; x += bump(a) * *p; return x - half(*p); }

int operands_change(int a, int b) {
    int x = a + b, y;
    stop(x);
    a = 1; x = a + b; stop(x);
    x = x * 3 + b; y = x * 3 + b; x = x * 3 + b;
    return x - y + a++ + (a + b);
}

// Calls that only compute are made once; not what reads memory that changes, or a volatile object.
int cube(int x) { return x * x * x + x / 3; }
float scaled(float x) { return x * 1.5f + 2.0f; }
int reads_g(int x) { return x + g; }
int counts(int x) { static int n; return n++ + x; }
int samples(void) { return port; }
// FUNCTION: pure_calls
// COUNT 1: _cube(
// COUNT 1: _scaled(
int pure_calls(int a, int *p) {
    int s = cube(a);
    *p = s;
    g += s;
    if (scaled(2.0f) > 4.0f && scaled(2.0f) < 6.0f) s += cube(a) * 3;
    return s;
}
// FUNCTION: other_calls
// COUNT 2: _samples(
// COUNT 3: _reads_g(
// COUNT 2: _counts(
int other_calls(int a) {
    int s = samples() + 3, t = reads_g(a) * 5;
    t += reads_g(a);
    s -= counts(a);
    g += 1;
    s += samples();
    s ^= reads_g(a) + t;
    s -= counts(a);
    *here = 3;
    return s + reads_g(a);
}

// Effects among the operands: what they cannot change is shared, the rest is evaluated where it stands.
// FUNCTION: steps_and_sums
// COUNT 1: a * b + 3
int steps_and_sums(const int *p, int a, int b) { int s = *p++ * 5 + (a * b + 3); return s * (a * b + 3) + *p++ - *p; }
// FUNCTION: calls_and_sums
// COUNT 1: a * b + 3
// COUNT 2: *p
int calls_and_sums(int *p, int a, int b) { return *p * 7 + bump(a * b + 3) + (a * b + 3) * *p; }
int assigned_between(int *p, int *q, int a, int b) {
    int s = *p * 3 + b, t = (a * b + 3) * 3 + s;
    t -= bump(t) * 3 + (*q++ = b - 6, *p * 3 + b) + (a = b - 1, a * b + 3) * 5;
    if (bump(a * b + 3) < 99 && bump(b) + (*q += 4, *p * 3 + b) > 6) return t + (a * b + 3) * *q;
    return t * 3 + a;
}
void need_divisor(int b) { if (!b) exit(0); }
int divided_behind_call(int a, int b) { return bump(a) + (need_divisor(b), a / b + 1) + (b + 3) * (a / b + 1); }

// Accesses a constant apart share the sum of base and index.
struct T { int a; long b; } tab[6];
// FUNCTION: neighbours
// COUNT 1: + i
// COUNT 1: PMCONV(
long neighbours(const int *x, int i) {
    return x[i + 1] * x[i + 2] + x[i] - x[i - 1] + tab[i + 2].b * tab[i].a - tab[i + 1].b;
}
unsigned wraps(const int *x, unsigned i) { return x[(unsigned)(i + 1)] + x[(unsigned)(i + 2)] + x[(unsigned)(i + 3)]; }

// Dropped: the variable has the value already.
// FUNCTION: redundant
// COUNT 1: x = 
int redundant(int a, int b) {
    int x = a * b + 3;
    stop(x);
    x = a * b + 3;
    return stop(x) + x;
}

// What an arm assigns the other does not see; a loop's head sees both.
int arms(int c, int x) { int y = 0; if (c) x = 1; else y = x; while (c-- > 0) { y += x; x = y; stop(x); } return y * 8 + x; }
int kept(int a) { static int x; int y = x; x = 5; stop(y); return x + y + a; }
int only_on_one_path(int c, int a) { int x = 0, y; if (c) { y = a; x = y; } stop(c); if (c > 1) x += y; return x; }
int through_restrict(int *q, int *r) { int *restrict p = q; *p = 3; *r = 4; return *r; }

int old_and_new(int n, int a) {
    int last = a, now = a, s = 0;
    do { last = now; now = stop(now + 1); s = s * 2 + last - now; } while (--n > 0);
    return s + last;
}

int row[10] = {5, 9, 2, 8, 11, 1, 7, 3, 4, 6};

// What holds the sum is written within the statement that reads it again.
int holder_is_written(int a, int b, int c) {
    int h = a * b + 29, x;
    g = h;
    x = (c ? (h = 5) : 0) + (a * b + 29);
    return x * 100 + h;
}

int main(void) {
    struct S s;
    float f;
    long l = 0;
    int c, x = 0;
    int *pp;
    for (c = -2; c < 5; c++) {
        stored(&s, c, &f); put_f32(f);
        put_i16(stored_result(&x, c)); put_i16(stored_and_changed(&x, &x, &l, c)); put_i16(stored_and_changed(&x, &g, &l, c));
        put_i16(twice_read(c)); put_i16(part(c)); h = c; put_u32(narrow((unsigned *)&h, c)); put_i16(h);
        put_i16(holder_is_written(c + 6, c + 2, c & 1)); put_i16(g);
        g = c; put_i16(around_calls(&g, c)); put_i16(around_writer(&g, c));
        put_i16(operands_change(c, 7)); put_i16(redundant(c, 5)); put_i16(arms(c, 9)); put_i16(kept(c));
        put_i16(only_on_one_path(c, 6)); put_i16(through_restrict(&g, &h)); put_i16(old_and_new(c, 5));
        tab[c < 0 ? 0 : c].b = c * 70000L; tab[c & 3].a = c; put_i32(neighbours(row + 3, c < 0 ? 1 : c - (c == 4)));
        put_u32(wraps(row, c < 0 ? 65535u : c));
        put_i16(pure_calls(c, &g)); put_i16(g); here = &g; put_i16(other_calls(c));
        here = &g - 2; put_i16(self(&pp, &pp));
        put_i16(steps_and_sums(row, c, 3)); put_i16(calls_and_sums(&g, c, 3)); put_i16(calls_and_sums(&x, c, 2));
        put_i16(assigned_between(row + 3, row + 3, c, 2)); put_i16(assigned_between(row, row + 4, c, c)); put_i16(row[3]);
    }
    for (c = 3; c > -2; c--) put_i16(divided_behind_call(7, c));
    return 0;
}
