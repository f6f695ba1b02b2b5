// In-place radix-2 transform of 32 complex 16-bit points with scaling, and back.
#include <zrun.h>

#define N 32
#define LOG 5

static const int sine[N / 4 + 1] = {0, 6393, 12539, 18204, 23170, 27245, 30273, 32137, 32767};
static int re[N], im[N];

static int sin_of(int k) {
    k &= N - 1;
    if (k >= N / 2) return -sin_of(k - N / 2);
    return k <= N / 4 ? sine[k] : sine[N / 2 - k];
}

static int cos_of(int k) { return sin_of(k + N / 4); }

static unsigned reverse(unsigned v) {
    unsigned r = 0;
    int i;
    for (i = 0; i < LOG; i++) {
        r = (r << 1) | (v & 1u);
        v >>= 1;
    }
    return r;
}

static void permute(void) {
    unsigned i;
    for (i = 0; i < N; i++) {
        unsigned j = reverse(i);
        if (j > i) {
            int t = re[i];
            re[i] = re[j];
            re[j] = t;
            t = im[i];
            im[i] = im[j];
            im[j] = t;
        }
    }
}

static int mulq(int a, int b) { return (int)(((long)a * b + 16384L) >> 15); }

static void transform(int inverse, int shift) {
    int half, i, j;
    permute();
    for (half = 1; half < N; half <<= 1) {
        int stride = N / (2 * half);
        for (j = 0; j < half; j++) {
            int wr = cos_of(j * stride);
            int wi = inverse ? sin_of(j * stride) : -sin_of(j * stride);
            for (i = j; i < N; i += 2 * half) {
                int k = i + half;
                int tr = mulq(wr, re[k]) - mulq(wi, im[k]);
                int ti = mulq(wr, im[k]) + mulq(wi, re[k]);
                re[k] = (re[i] - tr) >> shift;
                im[k] = (im[i] - ti) >> shift;
                re[i] = (re[i] + tr) >> shift;
                im[i] = (im[i] + ti) >> shift;
            }
        }
    }
}

int main(void) {
    int i, worst = 0;
    for (i = 0; i < N; i++) {
        re[i] = (cos_of(3 * i) >> 2) + (sin_of(5 * i) >> 3);
        im[i] = 0;
    }
    transform(0, 1);
    for (i = 0; i < N; i++)
        if (re[i] > 40 || re[i] < -40 || im[i] > 40 || im[i] < -40) {
            put_i16(i);
            put_i16(re[i]);
            put_i16(im[i]);
        }
    transform(1, 0);
    for (i = 0; i < N; i++) {
        int e = re[i] - ((cos_of(3 * i) >> 2) + (sin_of(5 * i) >> 3));
        if (e < 0) e = -e;
        if (e > worst) worst = e;
    }
    put_i16(worst < 128);
    put_i16(worst);
    for (i = 0; i < 8; i++) put_i16((int)reverse((unsigned)(i * 5)));
    return 0;
}
