// Stores to a part that a later store covers go, as do those to objects that no one reads any more; loads of a part that
// is known to hold a variable's value take that.
// RUN: --opt_level=2 --disable_inlining --debug:skip=lcse+ssa-rp-with-benign-loads+ssa-reg-promote+ssa-reg-promote-with-simpcfg
#include <zrun.h>

struct pair {
    int a, b;
};
struct outer {
    struct pair in;
    int rest[4];
    unsigned low : 5, high : 11;
};
union word {
    int i;
    unsigned u;
    float f;
};
static volatile struct pair port;
static struct pair shared;
static struct outer whole = {{21, 22}, {23}};
static int taken;
static int look(void) { return shared.a; }
static int count(void) { return ++taken; }

// ---- Stores that go: 17 is what the first would have multiplied with

// FUNCTION: covered
// NOT: * 17
// COUNT 5: * 18
void covered(struct outer* p, union word* w, int* q, int i, int x) {
    p->in.a = x * 17;
    p->in.b = x;
    p->in.a = x * 18;
    p->rest[i] = x * 17;
    p->rest[i] = x * 18;
    q[i + 1] = x * 17;
    q[1 + i] = x * 18;
    shared.a = x * 17;
    shared.a = x * 18;
    w->i = x * 17;
    w->i = x * 18;
    shared.b = x * 17;
    shared = whole.in;
    q[9] += x * 17;
    q[9] = x * 18;
}

// FUNCTION: effects_stay
// COUNT 1: _count(
// COUNT 1: .a
void effects_stay(struct pair* p, int x) {
    p->a += count();
    p->a = x;
}

// FUNCTION: unread
// NOT: * 17
// COUNT 1: _count(
int unread(int i, int x) {
    struct pair t;
    int local[8];
    t.a = x;
    t.b = i;
    if (x > 3) local[i] = t.a * 17;
    local[i + 1] = count();
    return t.b;
}

// FUNCTION: read_on_one_path
// COUNT 2: * 17
// COUNT 1: * 18
int read_on_one_path(int i, int x) {
    int local[8], other[8], third[8];
    local[i] = x * 17;
    if (x > 3) return local[i - 1 + 1];
    third[i] = x * 17;
    other[i + 1] = third[i];
    local[i] = x * 18;
    for (int n = 0; n < 3; ++n) x += local[i] + other[i + 1];
    local[i] = x;
    return x;
}

// FUNCTION: holds_pointer
// COUNT 1: * 17
void holds_pointer(int* q, int x) {
    struct {
        int *p, *end;
    } t[3];
    for (int i = 0; i < 3; ++i) t[i].p = t[i].end = q + i;
    *t[x & 1].p = x * 17;
}

// FUNCTION: restricted
// HAS: *q ^= k
// NOT: * 17
int restricted(int* restrict p, int* restrict q, int x) {
    int k = x * 19, y;
    *p = k;
    *q = x * 18;
    y = *p;
    p[1] = x * 17;
    *q ^= y;
    p[1] = x * 18;
    return y - k;
}

// ---- Stores that stay

// FUNCTION: read_between
// COUNT 6: * 17
// COUNT 6: * 18
int read_between(struct outer* p, union word* w, int* q, int x) {
    p->in.a = x * 17;
    int y = p->in.a + p->in.b;
    p->in.a = x * 18;
    p->rest[1] = x * 17;
    y += *q;
    p->rest[1] = x * 18;
    w->i = x * 17;
    y += (int)w->u;
    w->i = x * 18;
    shared.a = x * 17;
    y += look();
    shared.a = x * 18;
    q[x] = x * 17;
    y += q[q[3] & 1];
    q[x] = x * 18;
    port.a = x * 17;
    port.a = x * 18;
    return y;
}

// FUNCTION: read_by_the_store
// COUNT 3: * 17
void read_by_the_store(struct pair* p, int* q, int i, int x) {
    p->a = x * 17;
    p->a = look() ^ p->a;
    q[i] = x * 17;
    q[i] = q[q[i] & 1] + count();
    shared.a = x * 17;
    shared.a ^= x;
}

// FUNCTION: covered_in_part
// COUNT 3: * 17
// COUNT 1: * 544
void covered_in_part(struct outer* p, struct outer* o, int* q, int i, int x) {
    q[2 * i] = x * 17;
    q[i] = x;
    p->rest[i] = x * 17;
    p->rest[i + 1] = x;
    p->in = o->in;
    p->in.a = x * 17;
    p->high = (unsigned)(x * 17);
    p->low = 3;
}

// FUNCTION: place_moves
// COUNT 2: * 17
// COUNT 2: * 18
// COUNT 1: /^\*r =/
// HAS: _shared.a = x
void place_moves(struct pair* p, int** q, int** r, int x) {
    p->a = x * 17;
    ++p;
    p->a = x * 18;
    **q = x * 17;
    *q = &taken;
    **q = x * 18;
    *r = &shared.a;
    **r = x;
    *r = &shared.b;
}

// ---- Loads

// FUNCTION: stored_value
// COUNT 1: .a
int stored_value(struct pair* p, int x) {
    p->a = x;
    p->b = p->a * 3;
    if (x > 9) p->b = p->a * 5;
    return 1;
}

// FUNCTION: changed_between
// COUNT 2: .a
int changed_between(struct pair* p, int* q, int x) {
    p->a = x;
    *q = 5;
    p->b = p->a * 3;
    return 0;
}

int main(void) {
    struct outer p = {{1, 2}, {3, 4, 5, 6}, 7, 8}, o = {{11, 12}, {13, 14, 15, 16}, 17, 18};
    union word w;
    int q[12] = {1, 0, 1, 1}, *at = q, *r = q;
    covered(&p, &w, q, 2, 5);
    put_i32(p.in.a + p.in.b + p.rest[2] + q[3] + shared.a + w.i + q[9]);
    effects_stay(&p.in, 6);
    put_i32(p.in.a);
    put_i32(unread(3, 4) + unread(2, 1) + taken);
    put_i32(read_on_one_path(3, 4) + read_on_one_path(2, 1));
    holds_pointer(q, 5);
    put_i32(q[0]);
    q[3] = 1;
    put_i32(read_between(&p, &w, &p.rest[1], 1));
    put_i32(p.in.a + p.rest[1] + w.i + shared.a + port.a);
    read_by_the_store(&p.in, q, 2, 12);
    put_i32(p.in.a + q[2] + shared.a);
    covered_in_part(&p, &o, q, 1, 6);
    put_i32(q[2] + p.in.a + p.in.b + p.rest[1] + p.rest[2] + p.high + p.low);
    struct pair two[2] = {{1, 2}, {3, 4}};
    place_moves(two, &at, &r, 6);
    put_i32(two[0].a + two[1].a + q[0] + taken + shared.a);
    put_i32(stored_value(two, 10) + stored_value(two + 1, 1));
    changed_between(two, &two[0].a, 11);
    put_i32(two[0].b);
    put_i32(restricted(&two[0].a, &two[1].a, 7));
    return 0;
}
