// Counted loops of every shape: up, down, by steps, to equality, unsigned wrap, zero and negative trips, last value.
#include <zrun.h>

static int data[64];

static long up(int from, int to, int step) {
    long s = 0;
    int i;
    for (i = from; i < to; i += step) s += data[i & 63] + i;
    return s * 3 + i;
}

static long down(int from, int to, int step) {
    long s = 0;
    int i;
    for (i = from; i >= to; i -= step) s = s * 2 % 10007L + data[i & 63];
    return s + i;
}

static long not_equal(int from, int to, int step) {
    long s = 0;
    int i;
    for (i = from; i != to; i += step) s += i;
    return s;
}

static int bottom_test(int n) {
    int i = 0, s = 0;
    do s += data[i];
    while (++i < n);
    return s * 10 + i;
}

static unsigned unsigned_down(unsigned n) {
    unsigned i, s = 0;
    for (i = n; i-- > 0;) s = s * 3u + i;
    return s ^ i;
}

static long pointers(const int* p, const int* end) {
    long s = 0;
    for (; p < end; p += 2) s = s * 5 % 65521L + *p;
    return s;
}

static long two_counters(int n) {
    long s = 0;
    int i, j;
    for (i = 0, j = n; i < j; i++, j -= 2) s += (long)i * j;
    return s * 100 + i * 10 + j;
}

static long growing(long limit) {
    long v = 1, s = 0;
    while (v < limit) {
        s += v;
        v = v * 3 + 1;
    }
    return s;
}

static int triangle(int n) {
    int i, j, k, c = 0;
    for (i = 0; i < n; i++)
        for (j = i; j < n; j++)
            for (k = j; k >= i; k--) c++;
    return c;
}

static int variant_bound(int n) {
    int i, s = 0;
    for (i = 0; i < n; i++) {
        s += i;
        if (s % 3 == 0) n--;
    }
    return s * 10 + n;
}

static int variant_step(int n) {
    int i, step = 1, c = 0;
    for (i = 0; i < n; i += step) {
        c++;
        if (c % 4 == 0) step++;
    }
    return c * 100 + i;
}

static float float_counter(void) {
    float x, s = 0.0F;
    for (x = 0.0F; x < 1.0F; x += 0.125F) s += x;
    return s;
}

int main(void) {
    static const int trips[] = {-5, 0, 1, 2, 3, 4, 7, 8, 15, 16, 17, 33};
    unsigned t;
    int i;
    for (i = 0; i < 64; i++) data[i] = (i * 11) % 23;
    for (t = 0; t < sizeof trips / sizeof trips[0]; t++) {
        int n = trips[t];
        put_i32(up(0, n, 1));
        put_i32(up(-3, n, 2));
        put_i32(down(n, 0, 1));
        put_i32(down(n, -7, 3));
        put_i16(bottom_test(n));
        put_i32(two_counters(n));
        put_i16(triangle(n));
        put_i16(variant_bound(n));
        put_i16(variant_step(n));
        if (n >= 0) put_u32(unsigned_down((unsigned)n));
        if (n >= 0) put_i32(pointers(data, data + n));
    }
    put_i32(not_equal(0, 30, 3));
    put_i32(not_equal(30, 0, -5));
    put_i32(not_equal(4, 4, 1));
    put_i32(growing(1L));
    put_i32(growing(100000L));
    put_f32(float_counter());
    return 0;
}
