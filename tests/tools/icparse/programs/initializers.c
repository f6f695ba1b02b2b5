// Initializers.
// Prints: 203 6 4 7 131073 1 2 6 12 13 cd 100 30 42 6 5 10 126 6
#include <zrun.h>
struct P {
    int a[3];
    struct {
        int q, r;
    };
    unsigned b : 3, : 0, c : 5;
} p = {.a = {[1] = 5, 6}, .q = 3, 4, .c = 7};
union {
    long l;
    int i[2];
} u = {.i = {1, 2}};
struct {
    union {
        float f;
        long l;
    } w;
    int t;
} m = {{.l = 0x3F800000}, 2};
int *at = &p.a[2], grid[][3] = {1, 2, 3, {4}, [3] = {[1] = 9}};
const char* s[] = {"ab", [2] = "c"
                               "d"};
char text[4] = "abcd";
long* lp = (long[]){10, 20, 30};
int (*op)(int);
static int big[100] = {[50] = 6};
int twice(int x) { return 2 * x; }
int (*ops[3])(int) = {[1] = twice};
struct L {
    struct L* next;
    int v;
} l = {&l, 5};
int main(void) {
    int v[60] = {1, [40] = 2, 3}, i, n = 0;
    struct P z = {.c = 9, .a = {1}};
    char t[] = "xyz";
    for (i = 0; i < 60; i++) n += v[i] * i;
    put_i16(n);
    put_i16(p.a[2]);
    put_i16(p.r);
    put_i16(p.c);
    put_i32(u.l);
    put_f32(m.w.f);
    put_i16(m.t);
    put_i16(*at);
    put_i16(sizeof grid);
    put_i16(grid[3][1] + grid[1][0]);
    put_str(s[2]);
    put_i16(text[3]);
    put_i32(lp[2]);
    put_i16(ops[1](21));
    put_i16(big[50] + big[99]);
    put_i16(l.next->next->v);
    put_i16(z.c + z.a[0] + z.r);
    put_i16(sizeof t + t[2]);
    put_i16(((int[]){4, 5, 6})[2]);
    return 0;
}
