// Window functions built by recurrences, applied in place; peak, mean and effective value of the result.
#include <zrun.h>

#define N 32

enum shape { RECTANGLE, TRIANGLE, PARABOLA, HANN, SHAPES };

static float window[N];
static int data[N];

static float cos_step(int restart) {
    static float c0, c1; /* cos(2 pi i / 32) by c[i+1] = 2 cos(w) c[i] - c[i-1] */
    float next;
    if (restart) {
        c0 = 0.98078528F;
        c1 = 1.0F;
        return c1;
    }
    next = 2.0F * 0.98078528F * c1 - c0;
    c0 = c1;
    c1 = next;
    return c1;
}

static void make(enum shape s) {
    int i;
    for (i = 0; i < N; i++) switch (s) {
        case RECTANGLE: window[i] = 1.0F; break;
        case TRIANGLE: window[i] = i < N / 2 ? (float)i / 16.0F : (float)(N - i) / 16.0F; break;
        case PARABOLA: {
            float t = (float)(i - N / 2) / (float)(N / 2);
            window[i] = 1.0F - t * t;
            break;
        }
        case HANN: window[i] = 0.5F - 0.5F * cos_step(i == 0); break;
        default: window[i] = 0.0F;
        }
}

static float root(float v) {
    float r = v > 1.0F ? v : 1.0F;
    int i;
    if (v <= 0.0F) return 0.0F;
    for (i = 0; i < 20; i++) r = 0.5F * (r + v / r);
    return r;
}

static void measure(void) {
    float sum = 0.0F, squares = 0.0F, peak = -1.0e30F;
    int i, at = 0;
    for (i = 0; i < N; i++) {
        float v = (float)data[i] * window[i];
        sum += v;
        squares += v * v;
        if (v > peak) {
            peak = v;
            at = i;
        }
    }
    put_i16(at);
    put_i32((long)(peak * 16.0F));
    put_i32((long)(sum * 4.0F));
    put_i32((long)(root(squares / (float)N) * 4.0F));
}

int main(void) {
    int i;
    enum shape s;
    for (i = 0; i < N; i++) data[i] = ((i * 29) & 63) - 20;
    for (s = RECTANGLE; s <= SHAPES; s = (enum shape)(s + 1)) {
        make(s);
        measure();
    }
    put_f32(root(2.0F) > 1.41421F && root(2.0F) < 1.41422F ? 1.0F : 0.0F);
    put_f32(root(-1.0F));
    return 0;
}
