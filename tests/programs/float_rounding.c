// Sums and products whose result depends on the order and on the rounding of each step: nothing may be reassociated.
#include <zrun.h>

#define N 50

static float terms[N];

static float forward(void) {
    float s = 0.0F;
    int i;
    for (i = 0; i < N; i++) s += terms[i];
    return s;
}

static float backward(void) {
    float s = 0.0F;
    int i;
    for (i = N; i-- > 0;) s += terms[i];
    return s;
}

static float compensated(void) {
    float s = 0.0F, c = 0.0F;
    int i;
    for (i = 0; i < N; i++) {
        float y = terms[i] - c, t = s + y;
        c = (t - s) - y;
        s = t;
    }
    return s;
}

static float horner(const float* c, int n, float x) {
    float r = c[n];
    while (n-- > 0) r = r * x + c[n];
    return r;
}

static float powers(const float* c, int n, float x) {
    float r = 0.0F, p = 1.0F;
    int i;
    for (i = 0; i <= n; i++, p *= x) r += c[i] * p;
    return r;
}

static void two_sum(float a, float b) {
    float s = a + b, bb = s - a, e = (a - (s - bb)) + (b - bb);
    put_f32(s);
    put_f32(e);
}

static long double precise(void) {
    long double s = 0.0L;
    int i;
    for (i = 0; i < N; i++) s += terms[i];
    return s;
}

int main(void) {
    static const float series[] = {1.0F, 1.0F, 0.5F, 0.16666667F, 0.041666668F, 0.0083333338F};
    float x, third = 1.0F / 3.0F;
    int i;
    terms[0] = 1.0e7F;
    for (i = 1; i < N; i++) terms[i] = 1.0F / (float)i + (i % 5 == 0 ? 1000.0F : 0.0F) * (i % 2 ? 1.0F : -1.0F);
    put_f32(forward());
    put_f32(backward());
    put_f32(compensated());
    put_i32((long)(precise() * 100.0L));
    for (x = -1.0F; x <= 1.0F; x += 0.375F) {
        put_f32(horner(series, 5, x));
        put_f32(powers(series, 5, x));
    }
    two_sum(1.0e8F, 1.2345678F);
    two_sum(0.1F, 0.2F);
    put_f32(third * 3.0F);
    put_f32(third + third + third - 1.0F);
    put_f32(0.1F + 0.2F + 0.3F);
    put_f32(0.1F + (0.2F + 0.3F));
    put_i16(0.1F + 0.2F == 0.3F);
    put_i16(0.1L + 0.2L == 0.3L);
    put_f32((16777216.0F + 1.0F) - 16777216.0F);
    put_f32((x + 1.0e9F) - 1.0e9F);
    put_f32(x / 10.0F - x * 0.1F);
    put_f32((x * third) / third - x);
    return 0;
}
