// Tone detection: Goertzel's recurrence in fixed and floating point over the eight tones of a keypad.
#include <zrun.h>

#define N 105

/* 2 cos(2 pi f / 8000), 14 bits of fraction */
static const int coefficient[8] = {27980, 26956, 25701, 24219, 19073, 16325, 13085, 9315};
static const float float_coefficient[8] = {1.70773781F, 1.64528104F, 1.56868698F, 1.4782046F,
                                           1.16410402F, 0.99637021F, 0.79861839F, 0.56853271F};
static const char keys[4][4] = {{'1', '2', '3', 'A'}, {'4', '5', '6', 'B'}, {'7', '8', '9', 'C'}, {'*', '0', '#', 'D'}};

static int samples[N];

/* Two oscillators by the same recurrence; amplitudes stay within 16 bits. */
static void make_tones(int low, int high) {
    float a1 = 0.0F, a0 = 300.0F, b1 = 0.0F, b0 = 300.0F;
    int i;
    for (i = 0; i < N; i++) {
        float a = float_coefficient[low] * a0 - a1, b = float_coefficient[high] * b0 - b1;
        samples[i] = (int)a0 + (int)b0;
        a1 = a0;
        a0 = a;
        b1 = b0;
        b0 = b;
    }
}

static long fixed_power(int tone) {
    long s1 = 0, s2 = 0, c = coefficient[tone];
    int i;
    for (i = 0; i < N; i++) {
        long s0 = (samples[i] >> 4) + ((c * (s1 >> 2)) >> 12) - s2;
        s2 = s1;
        s1 = s0;
    }
    s1 >>= 4;
    s2 >>= 4;
    return s1 * s1 + s2 * s2 - ((c * s1) >> 14) * s2;
}

static float float_power(int tone) {
    float s1 = 0.0F, s2 = 0.0F, c = float_coefficient[tone];
    const int *p = samples, *end = samples + N;
    while (p < end) {
        float s0 = (float)*p++ + c * s1 - s2;
        s2 = s1;
        s1 = s0;
    }
    return s1 * s1 + s2 * s2 - c * s1 * s2;
}

static int strongest(int from, int to) {
    int i, best = from;
    for (i = from + 1; i < to; i++)
        if (fixed_power(i) > fixed_power(best)) best = i;
    return best;
}

int main(void) {
    int low, high;
    for (low = 0; low < 4; low++)
        for (high = 4; high < 8; high++) {
            int l, h;
            make_tones(low, high);
            l = strongest(0, 4);
            h = strongest(4, 8);
            put_i16(keys[l][h - 4]);
            put_i16(l == low && h == high);
        }
    put_i32(fixed_power(0));
    put_i32(fixed_power(7));
    put_i16(float_power(3) > 20.0F * float_power(0));
    put_i16(float_power(7) > 20.0F * float_power(5));
    put_i32((long)(float_power(1) / 1000.0F));
    return 0;
}
