// A local structure that is only used by members, or copied whole to a steady place, becomes variables; any other stays.
// RUN: --opt_level=2
#include <zrun.h>

struct point {
    int x, y;
    long z;
};
struct box {
    struct point a, b;
};
struct link {
    struct link *next;
    int value;
};
struct row {
    int n, cell[2];
};
union word {
    long whole;
    int half;
};

struct point origin = {1, 2, 3};
struct box boxes;
struct point *where = &origin;
struct point take(struct point p) { return p; }
int sum(const struct point *p) { return p->x + p->y + (int)p->z; }

int twice(int *p) { return *p *= 2; }

// FUNCTION: members
// COUNT 0: struct
// COUNT 0: /\.\w/
// HAS: /return .* \+ 4/
int members(int i) {
    struct point p;
    p.x = i;
    p.y = i + 1;
    p.z = 4;
    return p.x * p.y + (int)p.z;
}

// FUNCTION: copied
// COUNT 0: =struct
// COUNT 0: /\d+ [pr]: struct/
int copied(struct point *q) {
    struct point p = *q, r;
    p.x += 3;
    r = p;
    *q = r;
    return r.y;
}

// FUNCTION: nested
// COUNT 0: =struct
// HAS: /end of locals/
// HAS: /_boxes\.b\.y = /
int nested(int i) {
    struct {
        struct point at;
        int weight;
    } r;
    r.weight = i;
    r.at = origin;
    r.at.y += r.weight;
    boxes.b = r.at;
    return r.at.y;
}

// The pointer to what is copied is a member itself.
// FUNCTION: last_value
// COUNT 2: /here =struct/
int last_value(struct link *head) {
    struct link here = *head;
    while (here.next) here = *here.next;
    return here.value;
}

// What the pointer is read from may be what is written.
// FUNCTION: through_memory
// HAS: /p =struct|=struct p/
int through_memory(int i) {
    struct point p;
    p.x = i;
    p.y = p.x + 1;
    p.z = 2;
    *where = p;
    return p.y;
}

// FUNCTION: member_address
// HAS: /\d+ p: struct point/
int member_address(int i) {
    struct point p;
    p.x = i;
    p.y = 3;
    return twice(&p.y) + p.y + p.x;
}

// FUNCTION: passed
// HAS: /\d+ p: struct point/
int passed(int i) {
    struct point p;
    p.x = i;
    p.y = p.z = 2;
    return take(p).x + p.x;
}

// FUNCTION: returned
// HAS: return p
struct point returned(int i) {
    struct point p;
    p.x = i;
    p.y = p.z = 2;
    return p;
}

// FUNCTION: overlaid
// HAS: /\d+ w: union word/
int overlaid(long x) {
    union word w;
    w.whole = x;
    return w.half;
}

// FUNCTION: indexed
// HAS: /\d+ r: struct row/
int indexed(int i) {
    struct row r;
    r.n = 2;
    r.cell[0] = i;
    r.cell[1] = 5;
    return r.cell[i & 1] + r.n;
}

// FUNCTION: watched
// COUNT 3: p.x
int watched(int i) {
    volatile struct point p;
    p.x = i;
    return p.x + p.x;
}

// One copy in one piece is cheaper than three members through registers.
// FUNCTION: passed_through
// COUNT 2: =struct
void passed_through(const struct point *from, struct point *to) {
    struct point p = *from;
    *to = p;
}

int main(void) {
    struct link second = {0, 7}, first = {&second, 3};
    struct point p = {10, 20, 30}, q;
    put_i16(members(3));
    put_i16(copied(&p));
    put_i16(p.x);
    put_i16(nested(6));
    put_i32(boxes.b.z);
    put_i16(last_value(&first));
    put_i16(through_memory(4));
    put_i16(origin.y);
    put_i16(member_address(8));
    put_i16(passed(4));
    put_i16(returned(9).x);
    put_i16(overlaid(0x12345L));
    put_i16(indexed(3));
    put_i16(watched(2));
    passed_through(&p, &q);
    put_i16(sum(&q));
    return 0;
}
