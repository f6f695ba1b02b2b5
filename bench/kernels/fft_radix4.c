// Radix-4 transform of 64 float points with computed twiddles, checked against energy and the plain sum.
#include <zrun.h>

#define N 64

struct complex {
    float re, im;
};

static struct complex data[N], twiddle[N];

static void make_twiddles(void) {
    /* exp(-2 pi i / 64) by repeated multiplication, renewed at each quarter */
    const float c = 0.99518472667219693F, s = -0.098017140329560604F;
    int i;
    twiddle[0].re = 1.0F;
    twiddle[0].im = 0.0F;
    for (i = 1; i < N; i++)
        if (i % 16 == 0) {
            twiddle[i].re = twiddle[i - 16].im;
            twiddle[i].im = -twiddle[i - 16].re;
        } else {
            twiddle[i].re = twiddle[i - 1].re * c - twiddle[i - 1].im * s;
            twiddle[i].im = twiddle[i - 1].re * s + twiddle[i - 1].im * c;
        }
}

static struct complex mul(struct complex a, struct complex b) {
    struct complex r;
    r.re = a.re * b.re - a.im * b.im;
    r.im = a.re * b.im + a.im * b.re;
    return r;
}

static void butterfly(struct complex* p, int step) {
    struct complex a = p[0], b = p[step], c = p[2 * step], d = p[3 * step];
    struct complex s0, s1, d0, d1;
    s0.re = a.re + c.re;
    s0.im = a.im + c.im;
    d0.re = a.re - c.re;
    d0.im = a.im - c.im;
    s1.re = b.re + d.re;
    s1.im = b.im + d.im;
    d1.re = b.im - d.im;
    d1.im = d.re - b.re;
    p[0].re = s0.re + s1.re;
    p[0].im = s0.im + s1.im;
    p[2 * step].re = s0.re - s1.re;
    p[2 * step].im = s0.im - s1.im;
    p[step].re = d0.re + d1.re;
    p[step].im = d0.im + d1.im;
    p[3 * step].re = d0.re - d1.re;
    p[3 * step].im = d0.im - d1.im;
}

static void transform(void) {
    int step, group, k;
    for (step = N / 4; step >= 1; step /= 4) {
        int turn = N / (4 * step);
        for (group = 0; group < N; group += 4 * step)
            for (k = 0; k < step; k++) {
                struct complex* p = data + group + k;
                butterfly(p, step);
                p[step] = mul(p[step], twiddle[k * turn % N]);
                p[2 * step] = mul(p[2 * step], twiddle[2 * k * turn % N]);
                p[3 * step] = mul(p[3 * step], twiddle[3 * k * turn % N]);
            }
    }
}

static int digit_reverse(int i) { return ((i & 3) << 4) | (i & 12) | ((i >> 4) & 3); }

int main(void) {
    float before = 0.0F, after = 0.0F;
    int i;
    make_twiddles();
    for (i = 0; i < N; i++) {
        data[i].re = (float)((i * 7) % 16 - 8);
        data[i].im = i & 1 ? 0.5F : -0.25F;
        before += data[i].re * data[i].re + data[i].im * data[i].im;
    }
    transform();
    for (i = 0; i < N; i++) after += data[i].re * data[i].re + data[i].im * data[i].im;
    put_f32(before);
    put_i16((after / (float)N - before) < 0.01F && (before - after / (float)N) < 0.01F);
    put_f32(data[0].re);
    put_f32(data[0].im);
    for (i = 0; i < N; i++) {
        struct complex x = data[digit_reverse(i)];
        if (x.re * x.re + x.im * x.im > 100.0F) {
            put_i16(i);
            put_i32((long)(x.re * 64.0F));
            put_i32((long)(x.im * 64.0F));
        }
    }
    return 0;
}
