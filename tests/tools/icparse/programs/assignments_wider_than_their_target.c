// Assignments wider than their target.
// Prints: 4464 10 65535 1.5 1 0 1 17 8 4472 2 0 7 1 121
#include <zrun.h>
int main(void) {
    int i = 30000;
    unsigned u = 5;
    float f = 3;
    char c = 'x';
    _Bool b = 0;
    int v[2] = {7, 8}, *p = v;
    struct {
        unsigned n : 3;
        int s : 4;
    } z = {7, -8};
    i += 40000L;
    put_i16(i);
    i = 7;
    i *= 1.5;
    put_i16(i);
    u -= 6;
    put_u32(u);
    f /= 2;
    put_f32(f);
    b++;
    b++;
    put_i16(b--);
    put_i16(b);
    b |= 4;
    put_i16(b);
    *p++ *= 2.5;
    put_i16(v[0]);
    put_i16(*p);
    *p++ += 70000L;
    put_i16(v[1]);
    put_i16(p - v);
    z.n++;
    put_i16(z.n);
    z.s--;
    put_i16(z.s);
    put_i16(z.n += 9);
    c += 1;
    put_i16(c);
    return 0;
}
