// Structures by value: arguments, results, nested assignment, arrays inside, copies before changes, comparison.
#include <zrun.h>

struct point {
    int x, y;
};
struct box {
    struct point low, high;
    long weight;
};
struct mixed {
    char tag;
    float f;
    long long wide;
    int tail;
};

static struct point make(int x, int y) {
    struct point p;
    p.x = x;
    p.y = y;
    return p;
}

static struct point add(struct point a, struct point b) {
    a.x += b.x;
    a.y += b.y;
    return a;
}

static struct box around(struct point a, struct point b) {
    struct box r = {{0, 0}, {0, 0}, 0};
    r.low = make(a.x < b.x ? a.x : b.x, a.y < b.y ? a.y : b.y);
    r.high = make(a.x > b.x ? a.x : b.x, a.y > b.y ? a.y : b.y);
    r.weight = (long)(r.high.x - r.low.x) * (r.high.y - r.low.y);
    return r;
}

static int inside(struct box b, struct point p) {
    return p.x >= b.low.x && p.x <= b.high.x && p.y >= b.low.y && p.y <= b.high.y;
}

static struct mixed change(struct mixed m, int how) {
    if (how & 1) m.tag = (char)(m.tag + 1);
    if (how & 2) m.f *= 2.0F;
    if (how & 4) m.wide = -m.wide;
    if (how & 8) return (how & 1) ? m : change(m, 1);
    return m;
}

static struct point table[4];

static struct point* next(void) {
    static int i;
    return &table[i++ % 4];
}

int main(void) {
    struct point p = make(3, -4), q = p, r;
    struct box b;
    struct mixed m = {'a', 1.5F, 1LL << 40, 9}, n;
    int i;
    q.x = 100;
    put_i16(p.x);
    p = add(p, add(q, make(1, 1)));
    put_i16(p.x);
    put_i16(p.y);
    b = around(p, make(-5, 20));
    put_i32(b.weight);
    put_i16(inside(b, make(0, 0)));
    put_i16(inside(b, make(0, 21)));
    b.low = b.high;
    put_i16(inside(b, b.high));
    for (i = 0; i < 16; i += 3) {
        n = change(m, i);
        put_i16(n.tag);
        put_f32(n.f);
        put_i64(n.wide);
    }
    put_i16(m.tag);
    for (i = 0; i < 6; i++) *next() = make(i, i * i);
    r = table[1];
    table[1] = table[0];
    table[0] = r;
    for (i = 0; i < 4; i++) put_i16(table[i].x * 100 + table[i].y);
    r = i ? p : q;
    put_i16(r.x);
    r = (p = q, q.x = 1, p);
    put_i16(r.x);
    put_i16(make(7, 8).y);
    put_i16(around(p, q).low.x);
    return 0;
}
