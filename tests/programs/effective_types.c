// What C lets one object be accessed as: characters, the other sign, members and wholes, members of one union, memory
// that takes a new type, pointers that are derived from a restricted one. Every store here may be seen by the load
// behind it.
#include <stdlib.h>
#include <zrun.h>

struct point {
    int x, y;
};
struct line {
    struct point from, to;
    long length;
};
union word {
    long whole;
    unsigned half[2];
    struct point parts;
};

static long wide = 0x00010002L;
static int plain = 3;
static struct line lines[2];
static union word words[2];
static long pool[8];

static long as_characters(long* p, unsigned char* c) {
    long before = *p;
    *c = 9;
    return *p - before;
}

static int other_sign(int* p, unsigned* q) {
    *p = -1;
    *q = 7;
    return *p;
}

static int member_and_whole(struct line* l, struct point* p, int* i) {
    struct point saved;
    l->to.x = 1;
    p->x = 2;
    *i += 10;
    saved = *p;
    p->y = l->to.x + 1;
    *p = saved;
    return l->to.x * 100 + l->to.y;
}

static int copied_structure(struct line* a, struct line* b) {
    int first = a->from.y;
    *b = lines[1];
    return first * 10 + a->from.y;
}

static long through_union(union word* u, unsigned* half) {
    u->whole = 0x00050004L;
    *half += 3;
    return u->whole;
}

static long members_of_union(union word* u, union word* v) {
    u->parts.x = 1;
    u->parts.y = 2;
    v->half[1] = 6;
    return u->whole + v->parts.y;
}

static long reused_memory(void* memory) {
    long* as_long = memory;
    float* as_float = memory;
    long result;
    *as_long = 77;
    result = *as_long;
    *as_float = 2.5f;
    result += (long)(*as_float * 2);
    *as_long = 5;
    return result + *as_long;
}

static int derived(int* restrict p, int* q, int n) {
    int* end = p + n;
    int* cursor = p;
    int sum = 0;
    while (cursor != end) {
        *cursor = n;
        sum += p[0] + p[n - 1];
        cursor++;
    }
    *q = 1;
    return sum + end[-1];
}

static int restricted_inside(int* a, int n) {
    int sum = 0, i;
    for (i = 0; i < n; i++) {
        int* restrict p = a + i;
        int* same = p;
        *p = i;
        *same += 5;
        sum += *p;
    }
    return sum + a[0];
}

static int same_array(int* a, int i, int j) {
    a[i] = 1;
    a[j] = 2;
    a[i + 1] = 3;
    return a[i] * 100 + a[j] * 10 + a[j + 1];
}

static int* remembered;
static void remember(int* p) { remembered = p; }
static void change_remembered(void) { *remembered += 11; }

static int reached_later(void) {
    int x = 2, y;
    remember(&x);
    y = x;
    change_remembered();
    return x * 10 + y;
}

// The last store of each iteration says what the memory holds behind the loop.
static void stored_in_turn(int* p, float* q, int n) {
    int i = 0;
    do {
        *p = i;
        *q = 1.5f;
        i++;
    } while (i < n);
}

int main(void) {
    void* memory = malloc(8);
    int a[4] = {1, 2, 3, 4}, spare = 0;
    put_i32(as_characters(&wide, (unsigned char*)&wide));
    put_i16(other_sign(&plain, (unsigned*)&plain));
    put_i16(member_and_whole(&lines[0], &lines[0].to, &lines[0].to.x));
    lines[1].from.y = 4;
    put_i16(copied_structure(&lines[0], &lines[0]));
    put_i16(copied_structure(&lines[1], &lines[0]));
    put_i32(through_union(&words[0], &words[0].half[0]));
    put_i32(members_of_union(&words[0], &words[0]));
    put_i32(members_of_union(&words[0], &words[1]));
    put_i32(reused_memory(pool));
    put_i16(derived(a, &spare, 4));
    put_i16(restricted_inside(a, 4));
    put_i16(same_array(a, 0, 0));
    put_i16(same_array(a, 1, 2));
    put_i16(same_array(a, 2, 1));
    put_i16(reached_later());
    stored_in_turn(memory, memory, plain + 9);
    put_f32(*(float*)memory);
    return 0;
}
