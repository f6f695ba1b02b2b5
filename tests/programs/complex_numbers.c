// Complex numbers: arithmetic, conversions, as members, arguments, results and in arrays.
// no crosscheck
#include <complex.h>
#include <zrun.h>

struct pole {
    int order;
    float complex at;
};

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

int main(void) {
    float complex a = 1.5f + 2.0f * I, b = -1.0f + I, c;
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
    put_i16(calls);
    put_i16(sizeof(float complex));
    return 0;
}
