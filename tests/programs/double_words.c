// Double precision: polynomial sine, exponential and roots by iteration, bits of results to the last place.
#include <zrun.h>

typedef long double real;

union image {
    real value;
    unsigned long long bits;
};

static unsigned long long image(real v) {
    union image u;
    u.value = v;
    return u.bits;
}

static real sine(real x) {
    real term = x, sum = x;
    int n;
    for (n = 2; n < 24; n += 2) {
        term = -term * x * x / (real)(n * (n + 1));
        sum += term;
    }
    return sum;
}

static real exponential(real x) {
    real r = 1.0L, base = 2.71828182845904509L, term = 1.0L, sum = 1.0L;
    int whole = (int)x, n;
    x -= whole;
    for (n = 1; n < 20; n++) {
        term *= x / n;
        sum += term;
    }
    if (whole < 0) {
        base = 1.0L / base;
        whole = -whole;
    }
    for (; whole; whole >>= 1, base *= base)
        if (whole & 1) r *= base;
    return r * sum;
}

static real root(real v) {
    real x = v, last;
    int i;
    for (i = 0; i < 60; i++) {
        last = x;
        x = (x + v / x) / 2.0L;
        if (x == last) break;
    }
    return x;
}

static real integrate(real (*f)(real), real from, real to, int steps) {
    real h = (to - from) / steps, sum = f(from) + f(to);
    int i;
    for (i = 1; i < steps; i++) sum += f(from + h * i) * (i & 1 ? 4.0L : 2.0L);
    return sum * h / 3.0L;
}

int main(void) {
    real x;
    int i;
    for (i = -4; i <= 4; i++) put_i64((long long)image(sine(i * 0.5L)));
    for (x = -3.5L; x < 4.0L; x += 1.75L) put_f64(exponential(x));
    for (i = 2; i < 100; i *= 3) put_f64(root((real)i));
    put_f64(integrate(sine, 0.0L, 1.0L, 10));
    put_f64(integrate(exponential, -1.0L, 1.0L, 8));
    put_f64(0.1L + 0.2L);
    put_f64(1.0L / 3.0L);
    put_f64((real)(1.0F / 3.0F));
    put_f64(9007199254740992.0L + 1.0L);
    put_f64(9007199254740992.0L + 3.0L);
    put_i64((long long)(9007199254740991.0L * 2.0L));
    put_f64(-0.0L);
    put_f64(1.0e300L * 1.0e10L);
    return 0;
}
