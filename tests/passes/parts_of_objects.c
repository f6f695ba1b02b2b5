// Stores to a part that a later store covers go; loads of a part that is known to hold a variable's value take that.
// RUN: --opt_level=2 --disable_inlining
#include <zrun.h>

struct pair {
    int a, b;
};
union word {
    int i;
    unsigned u;
};
static volatile struct pair port;

// FUNCTION: overwritten
// NOT: * 17
// HAS: /\* 18/
void overwritten(struct pair* p, int x) {
    p->a = x * 17;
    p->b = x;
    p->a = x * 18;
}

// FUNCTION: read_between
// HAS: /\* 17/
// HAS: /\* 18/
int read_between(struct pair* p, int x) {
    p->a = x * 17;
    int y = p->a + p->b;
    p->a = x * 18;
    return y;
}

// FUNCTION: read_by_the_store
// HAS: /\* 17/
void read_by_the_store(struct pair* p, int x) {
    p->a = x * 17;
    p->a = p->a ^ p->a >> 3;
}

// FUNCTION: read_by_alias
// HAS: /\* 17/
// HAS: /\* 18/
int read_by_alias(struct pair* p, int* q, int x) {
    p->a = x * 17;
    int y = *q;
    p->a = x * 18;
    return y;
}

// FUNCTION: pointer_moves
// HAS: /\* 17/
// HAS: /\* 18/
void pointer_moves(struct pair* p, int x) {
    p->a = x * 17;
    ++p;
    p->a = x * 18;
}

// FUNCTION: read_as_other_member
// HAS: /\* 17/
unsigned read_as_other_member(union word* w, int x) {
    w->i = x * 17;
    unsigned y = w->u;
    w->i = x * 18;
    return y;
}

// FUNCTION: volatile_part
// HAS: /\* 17/
// HAS: /\* 18/
void volatile_part(int x) {
    port.a = x * 17;
    port.a = x * 18;
}

static struct pair shared;
static int look(void) { return shared.a; }

// FUNCTION: read_by_callee
// HAS: /\* 17/
// HAS: /\* 18/
int read_by_callee(int x) {
    shared.a = x * 17;
    int y = look();
    shared.a = x * 18;
    return y;
}

// FUNCTION: stored_value
// COUNT 1: .a
int stored_value(struct pair* p, int x) {
    p->a = x;
    p->b = p->a * 3;
    return 0;
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
    struct pair p[2] = {{1, 2}, {3, 4}};
    union word w;
    overwritten(p, 3);
    put_i32(p[0].a);
    put_i32(read_between(p, 4));
    put_i32(read_by_alias(p, &p[0].a, 5));
    pointer_moves(p, 6);
    put_i32(p[0].a + p[1].a);
    put_i32((int)read_as_other_member(&w, 7));
    read_by_the_store(p, 12);
    put_i32(p[0].a);
    volatile_part(8);
    put_i32(port.a);
    put_i32(read_by_callee(9));
    stored_value(p, 10);
    put_i32(p[0].b);
    changed_between(p, &p[0].a, 11);
    put_i32(p[0].b);
    return 0;
}
