// Bit-fields: signed and unsigned, crossing and filling words, compound assignment, packing, arrays of them.
#include <zrun.h>

struct flags {
    unsigned a : 1, b : 2, c : 3, d : 4;
    unsigned e : 6;
};
struct signs {
    int s1 : 2;
    int s2 : 5;
    int s3 : 9;
    int whole : 16;
};
struct gaps {
    unsigned x : 7;
    unsigned : 0;
    unsigned y : 9;
    unsigned : 3;
    unsigned z : 4;
};
struct wide {
    unsigned long lo : 20;
    unsigned long hi : 12;
    long sg : 24;
};
struct record {
    unsigned kind : 3;
    int value : 10;
    unsigned last : 1;
};

static struct flags shared;

static void fill(struct flags* f, unsigned v) {
    f->a = v & 1u;
    f->b = (v >> 1) & 3u;
    f->c = (v >> 3) & 7u;
    f->d = (v >> 6) & 15u;
    f->e = (v >> 10) & 63u;
}

static unsigned gather(const struct flags* f) {
    return f->a | f->b << 1 | f->c << 3 | f->d << 6 | (unsigned)f->e << 10;
}

static void count(struct flags* f, int n) {
    while (n-- > 0) {
        f->c++;
        f->d += 3u;
        f->a ^= 1u;
        --f->e;
        f->b = f->b * 2u + 1u;
    }
}

static int sum(const struct record* r) {
    int s = 0;
    do {
        s += r->kind == 5u ? r->value : -r->value;
    } while (!r++->last);
    return s;
}

static long sign_range(struct signs* s, int v) {
    s->s1 = v & 1;
    s->s2 = v % 16;
    s->s3 = v % 256;
    s->whole = v;
    return s->s1 + 10L * s->s2 + 1000L * s->s3 + s->whole;
}

int main(void) {
    struct flags f = {1, 2, 3, 4, 5}, g;
    struct signs s = {0, 0, 0, 0};
    struct gaps h = {100, 300, 9};
    struct wide w = {0xABCDEUL, 0x123UL, -5};
    struct record list[4] = {{5, 100, 0}, {1, -30, 0}, {5, -512, 0}, {7, 511, 1}};
    unsigned i;
    put_u32(gather(&f));
    for (i = 0; i < 60000u; i += 9999u) {
        fill(&shared, i);
        put_u32(gather(&shared));
    }
    g = f;
    count(&g, 3);
    put_u32(gather(&g));
    put_u32(gather(&f));
    count(&shared, 20);
    put_u32(gather(&shared));
    for (i = 0; i < 5; i++) put_i32(sign_range(&s, (int)i * 731 - 1500));
    put_i16(s.s2 < 0);
    put_u32(h.x + h.y + h.z);
    h.y = h.x;
    h.x = h.z << 2;
    put_u32(h.x * 1000UL + h.y);
    put_u32(w.lo);
    put_u32(w.hi);
    put_i32(w.sg);
    w.lo += 0x60000UL;
    w.hi = w.lo >> 8;
    w.sg = w.sg * 1000L;
    put_u32(w.lo);
    put_u32(w.hi);
    put_i32(w.sg);
    put_i16(sum(list));
    list[2].last = 1;
    put_i16(sum(list));
    put_i16(f.b > f.a ? f.b - f.a : -1);
    put_i16((f.d == 4) + (f.e != 5) * 2);
    put_i16((f.c = 7) + (f.b = 1));
    return 0;
}
