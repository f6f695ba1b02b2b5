// Conditions with effects: short circuits, conditional and comma operators, increments of every form and width.
#include <zrun.h>

static int log_at;
static char log_text[40];

static int note(int what, int value) {
    if (log_at < 39) log_text[log_at++] = (char)('a' + what);
    return value;
}

static void show(int result) {
    log_text[log_at] = 0;
    log_at = 0;
    put_str(log_text);
    put_i16(result);
}

static int deep(int a, int b, int c) {
    return (note(0, a) && (note(1, b) || note(2, c))) || (!note(3, a) && note(4, c));
}

static long widths(void) {
    signed char c = 5;
    unsigned u = 65535u;
    long l = -1;
    unsigned long ul = 0;
    long long w = 1LL << 33;
    float f = 1.5F;
    long r = c++;
    r += 10L * --c;
    r += u++ == 65535u;
    r += 2 * (long)u--;
    r += l++ * 3;
    r += ++l * 7;
    r += ul-- == 0;
    r += (ul == 0xFFFFFFFFUL) * 2;
    w--;
    r += (long)(w >> 30);
    r += (long)(f++ * 2.0F);
    r += (long)(--f * 4.0F);
    r += (long)f--;
    return r * 100 + u % 10u + c;
}

static int pointers(void) {
    static int data[6] = {1, 2, 3, 4, 5, 6};
    int *p = data, s;
    s = *p++;
    s = s * 10 + *++p;
    s = s * 10 + ++*p;
    s = s * 10 + (*p)++;
    s = s * 10 + *p--;
    return s + *p;
}

static int compound(void) {
    int x = 100, i = 0, a[3] = {1, 2, 3};
    x += i;
    a[i++] += 10;
    a[i++] <<= 3;
    a[i] %= 2;
    x = (a[0] -= 5, a[1] ^= 1, a[0] * 100 + a[1] * 10 + a[2]) + x;
    x /= 3;
    x |= 1;
    x &= ~2;
    return x + i;
}

int main(void) {
    int i, a[3] = {9, 9, 9};
    for (i = 0; i < 8; i++) show(deep(i & 4, i & 2, i & 1));
    put_i32(widths());
    put_i16(pointers());
    put_i16(compound());
    i = (a[0] = a[1] = 4) + a[2];
    put_i16(i);
    i = note(0, 3) * 0;
    show(i);
    i = (note(2, 5), note(3, 6));
    show(i);
    if (note(4, 0) && note(5, 1)) i = 99;
    show(i);
    return 0;
}
