// Bit-fields are read and written by operations on the container that holds them.
// RUN: --opt_level=2
// COUNT 0: /[.][a-hxy] [-+^]?= /
#include <zrun.h>

struct flags {
    unsigned a : 1, b : 2, c : 13;
    int d : 9, e : 7;
};
struct wide {
    unsigned long x : 20, y : 12;
    long g : 24;
    int plain;
};
struct mixed {
    int plain;
    long x : 16; // its container as declared would hold `plain`
    unsigned long long y : 40;
};
union view {
    unsigned x : 4;
    int y : 9;
};

struct flags s = {1, 2, 3, -4, 5};
struct wide w = {1, 2, -3, 4};
struct mixed m = {1, -2, 3};
volatile struct flags port;
int calls;
int next(void) { return calls++ & 1; }

// FUNCTION: reads
// HAS: /^\S+ = \*\(\(unsigned int \*\)p \+ 1\)$/
// HAS: /^return \(\(int\)\(\S+ << 7\) >> 7\) \+ \(int\)\(\*\(unsigned int \*\)p >> 1 & 3\) \+ \(\(int\)\S+ >> 9\)$/
int reads(struct flags *p) { return p->d + p->b + p->e; }

// Neighbouring stores to one container are one.
// FUNCTION: writes
// HAS: *(unsigned int *)p = (unsigned int)(v << 3 | 5)
// HAS: *((unsigned int *)p + 1) = *((unsigned int *)p + 1) & 511 | 1024
// NOT: p
void writes(struct flags *p, int v) {
    p->a = 1;
    p->b = 2;
    p->c = v;
    p->e = 2;
}

// The value of an assignment is what the field holds; the address and the right side are computed once.
// FUNCTION: values
// COUNT 2: _next()
int values(struct flags *p, int v) {
    int r = p->d = v;
    r = r * 10 + p[next()].e--;
    r = r * 10 + (p->b += next());
    if ((p->c <<= 3) > 99) r += p->c++;
    return r;
}

// A read is one read, a write one read and one write.
// FUNCTION: watched
// COUNT 7: _port
int watched(int v) {
    port.b = v;
    int r = port.c;
    port.e += r;
    return port.d++;
}

// FUNCTION: across_units
// HAS: /= [*][(]unsigned long [*][)]&_w & 4293918720 [|] 70000$/
// HAS: /_m \+ 1\) = \(unsigned int\)v$/
long across_units(int v) {
    w.x = 70000;
    w.g -= v;
    m.x = v;
    m.y += 1;
    return w.x + w.y + w.g + (long)m.y + m.plain + m.x;
}

// FUNCTION: local
// COUNT 0: struct
// HAS: return (int)$O$B0 + (int)$O$B2 + 3
int local(int n) {
    struct flags l;
    l.a = (unsigned)n;
    l.c = (unsigned)(n + 1);
    l.d = 3;
    return l.a + l.c + l.d;
}

// FUNCTION: overlaid
// COUNT 0: union
int overlaid(int n) {
    union view u;
    u.y = n;
    u.x++;
    return u.y;
}

// FUNCTION: copied
// COUNT 0: struct half
int copied(struct wide *p, int n) {
    struct half {
        unsigned x : 4, y : 12;
    } h, *q = (struct half *)&s;
    h = *q;
    h.x += n;
    *q = h;
    return h.y + (int)p->y;
}

// A loop's work on the members is worth taking two copies apart; a single access is not.
struct mode {
    unsigned a : 3;
    int b : 5;
    long sum;
    unsigned long c : 20;
} modes[2];

// FUNCTION: worked
// COUNT 0: class 1,
// COUNT 0: /\*[^=]*[-+|&]= /
// HAS: $O$B0 = (unsigned int)((int)$O$B0 + 3 & 7)
long worked(struct mode *p, int n) {
    struct mode m = *p;
    for (int i = 0; i < n; i++) {
        m.a += 3;
        m.b -= m.a;
        m.sum += m.b;
        m.c = m.c * 5 + m.a;
    }
    *p = m;
    return m.sum + m.c;
}

// FUNCTION: looked_at
// COUNT 2: =struct
int looked_at(struct mode *p, struct mode *q) {
    struct mode m = *p;
    m.a++;
    *q = m;
    return m.b;
}

// A mask is removed that clears no bit of what any assignment gives the variables.
// FUNCTION: masked
// COUNT 1: & 7
// COUNT 1: & 31
// COUNT 0: & 63
unsigned masked(const unsigned *p, int n) {
    unsigned at = 2, flags = *p & 31, sum = 0;
    for (int i = 0; i < n; i++) {
        sum = sum * 3 + p[at & 15] + (flags * 2 & 63);
        at = at + 1 & 7;
        flags = (flags ^ at) & 31;
    }
    return sum;
}

// Not where one of them sets such a bit, what they are given is not known, or the sum carries into it.
// FUNCTION: needed
// COUNT 1: & 15
// COUNT 1: & 7
// COUNT 1: & 3
unsigned needed(const unsigned *p, int n, unsigned given) {
    unsigned at = 2, low = 1, sum = 0;
    for (int i = 0; i < n; i++) {
        sum = sum * 3 + p[at & 15] + (given & 7);
        at = sum & 1 ? at << 1 : 3;
        low = low + 1 & 3;
        given += low;
    }
    return sum;
}

int main(void) {
    static const unsigned table[16] = {5, 99, 3, 7000, 65535, 17, 4, 8, 21};
    struct flags t[2] = {{0, 1, 2, 3, 4}, {1, 3, 8191, -256, -64}};
    for (int i = -3; i < 12; i += 2) {
        put_u32(masked(table + 3, i) ^ needed(table, i, 1000u * i));
        writes(t, i);
        put_i16(values(t, i * 77));
        put_i16(reads(t) + reads(t + 1) * 3);
        put_i16(watched(i * 300));
        put_i32(across_units(i * 1000));
        put_i16(local(i));
        put_i16(overlaid(i * 50));
        put_i16(copied(&w, i));
        put_i16(reads(&s));
        put_i32(worked(modes, i) + looked_at(modes, modes + 1));
        put_i32(modes[1].a + modes[1].b + (long)modes[1].c * 3 - modes[0].a);
    }
    return 0;
}
