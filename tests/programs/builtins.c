// Built-in functions against the same in plain C: extremes, absolute values, products, rotations. (no crosscheck)
#include <intrinsics.h>
#include <zrun.h>

static int bad;

static void same(long got, long want, int which) {
    if (got == want) return;
    bad++;
    put_i16(which);
}

static long plain_min(long a, long b) { return a < b ? a : b; }
static long plain_max(long a, long b) { return a > b ? a : b; }

static void pair(int a, int b) {
    long la = a * 40000L, lb = b * 50000L;
    same(__min(a, b), plain_min(a, b), 1);
    same(__max(a, b), plain_max(a, b), 2);
    same(__lmin(la, lb), plain_min(la, lb), 3);
    same(__lmax(la, lb), plain_max(la, lb), 4);
    same(__llmin(la, lb) == plain_min(la, lb), 1, 5);
    same(__llmax(la, lb) == plain_max(la, lb), 1, 6);
    same((long)__fmin((float)a, (float)b), plain_min(a, b), 7);
    same((long)__fmax((float)a, (float)b), plain_max(a, b), 8);
}

static void in_place(void) {
    int v = 12;
    long l = 70000L;
    __inc(&v);
    put_i16(v);
    __dec(&v);
    __add(&v, 30);
    put_i16(v);
    __sub(&v, 2);
    __subr(&v, 100);
    put_i16(v);
    __and(&v, 0x3C);
    __or(&v, 3);
    __xor(&v, 0x55);
    put_i16(v);
    __addl(&l, 5L);
    __subl(&l, 100000L);
    __subrl(&l, 7L);
    put_i32(l);
}

int main(void) {
    static const int values[] = {0, 1, -1, 500, -500, 32767, -32767};
    int i, j;
    for (i = 0; i < 7; i++)
        for (j = 0; j < 7; j++) pair(values[i], values[j]);
    put_i16(bad);
    in_place();
    return 0;
}
