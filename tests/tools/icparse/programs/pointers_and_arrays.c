// Pointers and arrays.
// Prints: 5 5 5 5 11 12 1 hello 101 209 109 109 3 2 4 3 121 1
#include <zrun.h>
int m[2][3][4];
char* copy(char* d, const char* s) {
    char* r = d;
    while ((*d++ = *s++))
        ;
    return r;
}
int sum(int a[][4], int n) {
    int i, j, s = 0;
    for (i = 0; i < n; i++)
        for (j = 0; j < 4; j++) s += a[i][j];
    return s;
}
long long wide[3] = {1, 2, 3};
struct T {
    struct T *l, *r;
    int k;
};
int depth(const struct T* t) {
    int l, r;
    if (!t) return 0;
    l = depth(t->l);
    r = depth(t->r);
    return 1 + (l > r ? l : r);
}
int main(void) {
    int(*p)[3][4] = m, (*row)[4] = m[1], *e = &m[1][2][3];
    unsigned u = 2;
    char buf[8], *c;
    void* v = wide;
    struct T a = {0, 0, 1}, b = {&a, 0, 2}, t = {0, &b, 3};
    m[1][2][3] = 5;
    row[0][1] = 6;
    put_i16(p[1][2][3]);
    put_i16(*(*(*(m + 1) + 2) + 3));
    put_i16(e[-(int)u + 2]);
    e -= u;
    e += 2;
    put_i16(*e);
    put_i16(sum(m[1], 3));
    put_i32((char*)&m[1] - (char*)m);
    put_i32(&m[1] - m);
    put_str(copy(buf, "hello"));
    c = buf;
    put_i16(*++c);
    put_i16(*c++ + (*c)++);
    put_i16(c[0]);
    put_i16(2 [buf]);
    put_i64(((long long*)v)[2]);
    put_i64(*((long long*)v + 1));
    put_i16((long*)&wide[2] - (long*)wide);
    put_i16(depth(&t));
    put_i16("xyz"[1]);
    put_i16(&wide[1] > wide && &wide[0] <= (long long*)v && e);
    return 0;
}
