// Records by value.
// Prints: 100000 5 9 116 100000 2 3 2 20 20
#include <zrun.h>
struct S {
    int a;
    long b;
};
struct P {
    struct S s[2];
    char t;
};
struct S mk(int a, long b) {
    return (struct S){.b = b, .a = a};
}
struct P twice(struct S s) {
    struct P p = {{s, s}, 't'};
    p.s[1].a++;
    return p;
}
int main(void) {
    struct S a = mk(1, 100000L), b, c, *q = &a;
    struct P p = twice(a);
    int i = 1;
    c = b = a;
    put_i32(c.b);
    put_i16(mk(5, 6).a);
    put_i16(twice(mk(8, 9)).s[1].a);
    put_i16(p.t);
    put_i32((i ? a : p.s[1]).b);
    put_i16((i++, p.s[1]).a);
    *q = twice(mk(3, 4)).s[0];
    put_i16(a.a);
    put_i16(i);
    put_i16((b = mk(20, 1)).a);
    put_i16(b.a);
    return 0;
}
