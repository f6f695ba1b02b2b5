// Adaptive filters: LMS on 16-bit fractions and normalized LMS in floats, both identify an unknown system.
#include <zrun.h>

#define TAPS 6

static const int unknown[TAPS] = {8000, -4000, 2000, 1000, -500, 250};
static unsigned long seed = 99UL;

static int noise(void) {
    seed = seed * 69069UL + 1UL;
    return (int)((seed >> 20) & 4095UL) - 2048;
}

static int output_of(const int* w, const int* x) {
    long sum = 0;
    int k;
    for (k = 0; k < TAPS; k++) sum += (long)w[k] * x[k];
    return (int)(sum >> 14);
}

static void shift_in(int* x, int v) {
    int k;
    for (k = TAPS - 1; k > 0; k--) x[k] = x[k - 1];
    x[0] = v;
}

static int lms(int rounds) {
    int w[TAPS] = {0}, x[TAPS] = {0}, i, k, e = 0;
    for (i = 0; i < rounds; i++) {
        shift_in(x, noise());
        e = output_of(unknown, x) - output_of(w, x);
        for (k = 0; k < TAPS; k++) w[k] += (int)(((long)e * x[k]) >> 9);
    }
    for (k = 0; k < TAPS; k++) put_i16(w[k]);
    return e;
}

static void nlms(int rounds, float mu) {
    float w[TAPS] = {0.0F}, x[TAPS] = {0.0F};
    int xi[TAPS] = {0}, i, k;
    float worst = 0.0F;
    for (i = 0; i < rounds; i++) {
        float y = 0.0F, power = 1.0F, e;
        shift_in(xi, noise());
        for (k = 0; k < TAPS; k++) {
            x[k] = (float)xi[k];
            y += w[k] * x[k];
            power += x[k] * x[k];
        }
        e = (float)output_of(unknown, xi) - y;
        for (k = 0; k < TAPS; k++) w[k] += mu * e * x[k] / power;
    }
    for (k = 0; k < TAPS; k++) {
        float d = w[k] * 16384.0F - (float)unknown[k];
        if (d < 0) d = -d;
        if (d > worst) worst = d;
    }
    put_i16(worst < 50.0F);
    put_i32((long)(w[0] * 1000.0F));
    put_i32((long)(w[1] * 1000.0F));
}

int main(void) {
    int e = lms(150);
    put_i16(e);
    e = lms(0);
    put_i16(e);
    nlms(300, 0.5F);
    nlms(0, 0.5F);
    put_u32(seed);
    return 0;
}
