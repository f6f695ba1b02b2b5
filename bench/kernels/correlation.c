// Auto- and cross-correlation in 32 bits, peak search, normalization by division.
#include <zrun.h>

#define N 40
#define LAGS 12

static int a[N], b[N];
static long r[LAGS];

static void autocorrelate(const int* x, int n, long* out, int lags) {
    int lag, i;
    for (lag = 0; lag < lags; lag++) {
        long sum = 0;
        for (i = lag; i < n; i++) sum += (long)x[i] * x[i - lag];
        out[lag] = sum;
    }
}

static int best_lag(const int* x, const int* y, int n, int max, long* score) {
    int lag, i, best = 0;
    *score = -2147483647L - 1;
    for (lag = -max; lag <= max; ++lag) {
        long sum = 0;
        int from = lag < 0 ? -lag : 0, to = lag > 0 ? n - lag : n;
        for (i = from; i < to; i++) sum += (long)x[i] * y[i + lag];
        if (sum > *score) {
            *score = sum;
            best = lag;
        }
    }
    return best;
}

/* Reflection coefficients of a predictor, fractions of 2 to the 12th. */
static int levinson(const long* rr, int order, int* k) {
    long coef[LAGS], next[LAGS], err = rr[0] >> 4;
    int i, j;
    if (err == 0) return 0;
    for (i = 0; i <= order; i++) coef[i] = 0;
    for (i = 1; i <= order; i++) {
        long acc = rr[i] >> 4;
        long ki;
        for (j = 1; j < i; j++) acc -= (coef[j] * (rr[i - j] >> 4)) / 4096L;
        if (err <= 0) return i - 1;
        ki = acc * 64L / err * 64L;
        k[i - 1] = (int)ki;
        for (j = 1; j < i; j++) next[j] = coef[j] - ki * coef[i - j] / 4096L;
        for (j = 1; j < i; j++) coef[j] = next[j];
        coef[i] = ki;
        err -= err / 4096L * ki / 4096L * ki;
    }
    return order;
}

int main(void) {
    int i, k[LAGS], done;
    long score;
    for (i = 0; i < N; i++) {
        a[i] = (i * 37) % 61 - 30;
        b[i] = i >= 5 ? a[i - 5] : 0;
    }
    autocorrelate(a, N, r, LAGS);
    for (i = 0; i < LAGS; i++) put_i32(r[i]);
    put_i16(best_lag(a, b, N, 8, &score));
    put_i32(score);
    put_i16(best_lag(b, a, N, 8, &score));
    put_i32(score);
    for (i = 0; i < LAGS; i++) r[i] = (r[0] >> 6) - i * 37L * (i & 1 ? 2 : 1);
    done = levinson(r, 3, k);
    put_i16(done);
    for (i = 0; i < done; i++) put_i16(k[i]);
    autocorrelate(a, 0, r, 2);
    put_i32(r[1]);
    return 0;
}
