// The other ABI: double has 64 bits, wide characters 32, names no prefix.
// parse: --abi eabi
// no crosscheck
#include <math.h>
#include <stdarg.h>
#include <stddef.h>
#include <zrun.h>

static double values[6] = {1.0, -0.1, 1e300, 4503599627370497.5, 3.0000000001, 1e-320};
static float singles[3] = {0.1f, 16777217.0f, -3.5f};

struct mixed {
    int i;
    double d;
    float f;
    wchar_t w;
};

static double mean(int n, ...) {
    va_list list;
    double s = 0;
    int i;
    va_start(list, n);
    for (i = 0; i < n; i++) s += va_arg(list, double);
    va_end(list);
    return s / n;
}

static double polynomial(const double* c, int n, double x) {
    double r = 0;
    while (n-- > 0) r = r * x + c[n];
    return r;
}

static struct mixed doubled(struct mixed m) {
    m.d *= 2;
    m.f += (float)m.d;
    m.w <<= 4;
    return m;
}

int main(void) {
    struct mixed m = {1, 0.1, 2.5f, L'a'};
    int i;
    put_i16(sizeof(double));
    put_i16(sizeof(wchar_t));
    put_i16(sizeof(struct mixed));
    put_i16(offsetof(struct mixed, f));
    put_f64(mean(3, 1.0, singles[0], values[1]));
    for (i = 0; i < 6; i++) {
        put_f64(values[i] + 1);
        put_f64(values[i] * 0.1);
        put_f32((float)values[i]);
        put_i16(values[i] > singles[i % 3]);
    }
    put_f64(polynomial(values, 2, 0.1));
    put_f64((double)singles[0] - 0.1);
    put_f64(0.1f * 0.1f);
    put_f64(0.1 * 0.1f);
    m = doubled(doubled(m));
    put_f64(m.d);
    put_f32(m.f);
    put_i32(m.w);
    put_i64((long long)values[3]);
    put_i32((long)(values[4] * 1e9 / 2));
    put_f64(sqrt(2.0));
    put_f64(9007199254740993LL);
    put_f64(18446744073709551615ULL);
    values[0] /= 3;
    values[0] = -values[0];
    put_f64(values[0]);
    put_f64(fabs(values[0]));
    return 0;
}
