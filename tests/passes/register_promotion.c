// Scalars in memory that are read or written again and again are kept in temporaries.
// RUN: --opt_level=2 --disable_inlining
// LEVELS: 1 3 4
#include <zrun.h>
#include <stdlib.h>

struct state {
    long sum;
    int count, last;
    unsigned char small;
};
struct state st;
int g, h, a[16];
unsigned u;
float f;
const int fixed = 7;
volatile int port;
union { long l; int i[2]; } un;

int bump(void) { return ++g; }
void end_if(int x) {
    if (!x) return;
    put_i16(g);
    exit(0);
}

// ---- What moves

// FUNCTION: global_sum
// COUNT 1: = _g
// COUNT 1: _g =
int global_sum(int n) {
    int i;
    for (i = 0; i < n; i++) g += a[i];
    return 0;
}

// FUNCTION: members
// COUNT 2: .sum
// COUNT 2: .count
// COUNT 1: .last
void members(struct state *p, int n) {
    int i = 0;
    do {
        p->sum += i;
        p->count++;
        p->last = i * 5;
    } while (++i < n);
}

// FUNCTION: within_endless_loop
// COUNT 1: = _h
// COUNT 1: _h =
void within_endless_loop(void) {
    int i;
    for (;;) {
        for (i = 0; i < 16; i++) h += a[i];
        if (h > 500) end_if(h);
    }
}

// An iteration reads h once ahead of the test that may leave the loop: one load ahead of it may be one too many.
// FUNCTION: benign
// COUNT 1: _h
int benign(int n) {
    int i = 0, s = 0;
    while (a[i] != n) {
        s += h;
        if (s > 1000) break;
        i++;
    }
    return s;
}

// FUNCTION: overwritten
// COUNT 1: _g =
void overwritten(int x) {
    g = x;
    if (x & 1) h = 5;
    g = x + 1;
}

// FUNCTION: partly_known
// COUNT 2: *p
int partly_known(int *p, int x) {
    int y = 0;
    if (x) y = *p;
    return y * 2 + *p;
}

// The value is what the store left of it.
// FUNCTION: converted
// COUNT 0: = _u
// COUNT 0: = _f
int converted(struct state *p, double d, long l) {
    int x;
    f = d;
    x = f == d ? 1 : 2;
    u = l;
    x += u / 3;
    p->small = l;
    return x * 10 + p->small;
}

// ---- What stays

int stored_in_some(int *p, const int *m, int n) {
    int i;
    for (i = 0; i < n; i++)
        if (m[i]) *p = i;
    return p ? *p : -1;
}

int read_in_some(const int *p, int n) {
    int i, s = 0;
    for (i = 0; i < n; i++)
        if (p) s += *p;
    return s;
}

int read_behind_exit(const int *p, int n) {
    int i, s = 0;
    for (i = 0; i < n; i++) {
        s += i;
        if (!p) return s;
        s += *p;
    }
    return s;
}

int aliased(int *p, int *q, int n) {
    int i, r;
    g = 1;
    *p = 2;
    r = g;
    for (i = 0; i < n; i++) {
        *q += i;
        g += *p;
    }
    return r * 100 + g;
}

// FUNCTION: polled
// COUNT 2: _g
int polled(int n) {
    g = 0;
    while (port < n) g++, port = g;
    return g;
}

struct cell {
    int key;
    struct cell *next;
};
int follow(struct cell *p) {
    int s = p->key;
    while (p->next) {
        p->key += 1;
        p = p->next;
        s += p->key;
    }
    return s;
}

int parts(int x) {
    struct state copy;
    un.l = 0x10002;
    x += un.i[1] * 3 + un.i[0];
    st.last = x;
    copy = st;
    st.last = 2;
    st = copy;
    x += st.last;
    un.i[0] = 5;
    return x + (un.l == 5 || un.l == 0x50001);
}

int two_entries(int n) {
    int i = 0;
    if (n & 1) goto inside;
again:
    g += i;
inside:
    h += g;
    i++;
    if (i < n) goto again;
    return g;
}

int many_exits(int n) {
    int i;
    for (i = 0;; i++) {
        g = i;
        if (a[i & 15] == n) return 1;
        switch (n - i) {
        case 3: return g;
        case 9: continue;
        }
        g = i * 2;
        if (i > 20) break;
    }
    return g + h;
}

int constant(int n, int *p) {
    int i, s = 0;
    for (i = 0; i < n; i++) {
        s += fixed;
        if (p != &fixed) *p = i;
    }
    return s;
}

// A place whose address stays in the loop; nothing else there can be it.
long sums[4][4];
// FUNCTION: rows_of_sums
// HAS: /\$O\$v\d+ \+= \(long\)\*.*/
// HAS: /\*.* = \$O\$v\d+/
void rows_of_sums(int n) {
    int i, j, k;
    for (i = 0; i < 4; i++)
        for (j = 0; j < 4; j++)
            for (k = 0; k < n; k++) sums[i][j] += a[k ^ j];
}

// Other accesses of the loop may be the place, or make its address another one.
int met_in_the_loop(int *p, int i, int n) {
    int k, *q = a + i, s = 0;
    for (k = 0; k < n; k++) a[i + 1] += p[k], s += q[k];
    for (k = 0; k < n; k++) a[h & 7] += k, h += k & 1;
    for (k = 0; k < n; k++)
        if (p[k] > 3) a[i] = k + a[i]; // stored in some iterations
    return s;
}

// The bounds of what is counted are known, so that it has a variable of its own, which each iteration sets.
unsigned bins[16];
void counted(int n) {
    int i;
    for (i = 0; i < n; i++) {
        int b = (a[i] >> 2) + 8;
        bins[b < 0 ? 0 : b >= 16 ? 15 : b]++;
    }
}

// Members of a local structure whose array is subscripted; the second loop reaches the member by a subscript.
struct local {
    int first;
    unsigned crc;
    int data[6];
};
// FUNCTION: local_members
// HAS: /\$O\$v\d+ = \$O\$v\d+ & 1 .*/
unsigned local_members(int n, int at) {
    struct local m = {n, 3, {1, 2, 3, 4, 5, 6}};
    int k, *words = (int *)&m;
    for (k = 0; k < n; k++) m.crc = m.crc & 1 ? m.crc >> 1 ^ 0xA001u : m.crc >> 1;
    m.data[at & 3] += (int)m.crc;
    for (k = 0; k < n; k++) m.crc += (unsigned)words[at - k], words[at & 1] ^= k;
    for (k = 0; k < n; k++) m.data[k & 3] += m.first, m.first += k;
    return m.crc + (unsigned)m.data[1] + (unsigned)m.first;
}

// The address is a quotient that only some iterations may compute.
void guarded_address(int *restrict to, const int *restrict from, int n, int i, int d) {
    int k;
    for (k = 0; k < n; k++)
        if (d) to[i / d] += from[k];
}

// On both paths to the sum `copy` is what `n` is, until one is changed.
// FUNCTION: copied
// NOT: copy *
int copied(int n, int m, int *p) {
    int copy = n;
    if (m > 3) {
        p[0] = copy * 2;
        n = p[1];
        copy = n;
    }
    p[2] += copy * n;
    if (m > 5) n = p[3];
    return copy - n;
}

int main(void) {
    struct cell c[3] = {{1, c + 1}, {2, c + 2}, {3, 0}};
    int i, zeros[4] = {0};
    for (i = 0; i < 16; i++) a[i] = i * 3;
    global_sum(9), global_sum(0);
    put_i16(g);
    members(&st, 7);
    put_i32(st.sum + st.count * 1000L + st.last);
    put_i16(benign(9) + benign(0) + benign(45));
    overwritten(4);
    put_i16(g * 10 + partly_known(&g, 1) + partly_known(&g, 0));
    put_i16(converted(&st, 0.1, 70000L + 513));
    put_i16(stored_in_some(0, zeros, 4) + stored_in_some(&g, a, 4));
    put_i16(read_in_some(0, 5) + read_in_some(a + 2, 5));
    put_i16(read_behind_exit(0, 5) + read_behind_exit(a + 2, 5));
    put_i16(aliased(&g, &h, 3) + aliased(&h, &g, 3) + aliased(a, a, 2));
    put_i16(polled(5));
    put_i16(follow(c) * 10 + c[0].key + c[1].key);
    put_i16(parts(4));
    put_i16(two_entries(4) + two_entries(5) + h);
    put_i16(many_exits(6) + many_exits(2000) + many_exits(5) + g);
    put_i16(constant(3, &i) + constant(0, 0));
    rows_of_sums(5), rows_of_sums(0);
    put_i32(sums[1][2] + sums[3][0] * 7);
    put_i16(met_in_the_loop(a, 2, 6) + a[3] + a[2] + h);
    counted(16), counted(0);
    for (i = 0; i < 16; i++) put_i16((int)bins[i]);
    for (i = 0; i < 6; i++) put_u32(local_members(i, 6 - i % 2) + local_members(7 - i, 7));
    guarded_address(zeros, a, 9, 5, 0), guarded_address(zeros, a, 9, 5, 3);
    put_i16(zeros[1]);
    put_i16(copied(4, 1, a) + copied(5, 9, a) * 3 + a[2]);
    within_endless_loop();
    return 0;
}
