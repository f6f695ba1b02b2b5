// Complex numbers: arithmetic, conversions, as members, arguments, results and in arrays; a transform of them.
// no crosscheck
#include <complex.h>
#include <zrun.h>

#define N 8

struct pole {
    int order;
    float complex at;
};

static float complex roots[N], spectrum[N];
static const float complex table[3] = {1.0f, 2.0f * I, -0.5f + 0.25f * I};
static double complex other = 3.0 - 4.0 * I;
static struct pole poles[2] = {{1, 0.5f}, {2, -1.0f + 1.0f * I}};
static int calls;

static void put(float complex z) {
    put_f32(crealf(z));
    put_f32(cimagf(z));
}

static float complex rotated(float complex z, int quarters) {
    calls++;
    while (quarters-- > 0) z *= I;
    return z;
}

static struct pole moved(struct pole p, float complex by) {
    p.at += by;
    p.order++;
    return p;
}

static float complex horner(const float complex* c, int n, float complex z) {
    float complex r = 0;
    while (n-- > 0) r = r * z + c[n];
    return r;
}

// The transform by its definition; the roots of unity of order 8 come from products of one.
static void transform(float complex* out, const float complex* in) {
    int i, k;
    roots[0] = 1;
    for (i = 1; i < N; i++) roots[i] = roots[i - 1] * (0.70710678f - 0.70710678f * I);
    for (k = 0; k < N; k++) {
        float complex sum = 0;
        for (i = 0; i < N; i++) sum += in[i] * roots[i * k % N];
        out[k] = sum;
    }
}

int main(void) {
    float complex a = 1.5f + 2.0f * I, b = -1.0f + I, c, samples[N];
    double complex d = a;
    double complex l;
    struct pole p;
    int i;
    put(a + b);
    put(a - b);
    put(a * b);
    put(a / b);
    put(-a);
    put(conjf(a) * a);
    put(a + 1);
    put(2 * a - 3.5f);
    put_f32(cabsf(3.0f + 4.0f * I));
    put_i16(a == b);
    put_i16(a != 1.5f + 2.0f * I);
    put_i16(!b);
    put_i16((_Bool)(0.0f + 1.0f * I));
    put_i16((int)a);
    c = a;
    c *= c;
    c -= 0.5f;
    put(c);
    c = calls ? a : rotated(a, 1);
    put(c);
    put(rotated(rotated(b, 2), 3));
    l = other * a;
    put_f32(creal(l));
    put_f32(cimag(l));
    d /= 2;
    put_f32(creal(d));
    put((float complex)(other / l));
    for (i = 0; i < 2; i++) {
        p = moved(poles[i], table[i + 1]);
        put_i16(p.order);
        put(p.at);
    }
    put(horner(table, 3, b));
    for (i = 0; i < N; i++) samples[i] = (float)(i * i % 5) - (i & 1) * I;
    transform(spectrum, samples);
    for (i = 0; i < N; i++) {
        put_i16((int)(crealf(spectrum[i]) * 100));
        put_i16((int)(cimagf(spectrum[i]) * 100));
    }
    put_i16(calls);
    put_i16(sizeof(float complex));
    return 0;
}
