// Two-band filter banks: lifting wavelets over several levels with perfect reconstruction, and a polyphase bank.
#include <zrun.h>

#define N 32

static int signal[N], work[N], copy[N];

static int mirror(int i, int n) { return i < 0 ? -i : i >= n ? 2 * n - 2 - i : i; }

static void split(int* x, int n) {
    int i;
    for (i = 1; i < n; i += 2) x[i] -= (x[i - 1] + x[mirror(i + 1, n)]) >> 1;
    for (i = 0; i < n; i += 2) x[i] += (x[mirror(i - 1, n)] + x[mirror(i + 1, n)] + 2) >> 2;
    for (i = 0; i < n / 2; i++) {
        work[i] = x[2 * i];
        work[i + n / 2] = x[2 * i + 1];
    }
    for (i = 0; i < n; i++) x[i] = work[i];
}

static void join(int* x, int n) {
    int i;
    for (i = 0; i < n / 2; i++) {
        work[2 * i] = x[i];
        work[2 * i + 1] = x[i + n / 2];
    }
    for (i = 0; i < n; i++) x[i] = work[i];
    for (i = 0; i < n; i += 2) x[i] -= (x[mirror(i - 1, n)] + x[mirror(i + 1, n)] + 2) >> 2;
    for (i = 1; i < n; i += 2) x[i] += (x[i - 1] + x[mirror(i + 1, n)]) >> 1;
}

static int threshold(int* x, int from, int to, int limit) {
    int zeroed = 0;
    while (from < to) {
        if (x[from] > -limit && x[from] < limit && x[from] != 0) {
            x[from] = 0;
            zeroed++;
        }
        from++;
    }
    return zeroed;
}

static long band_energy(const int* x, int from, int to) {
    long e = 0;
    do e += (long)x[from] * x[from];
    while (++from < to);
    return e;
}

static void polyphase(long out[4]) {
    static const int prototype[16] = {1, 3, 7, 12, 18, 24, 29, 32, 32, 29, 24, 18, 12, 7, 3, 1};
    static const int phase[4][4] = {{1, 1, 1, 1}, {1, 1, -1, -1}, {1, -1, -1, 1}, {1, -1, 1, -1}};
    int start, band, p, k;
    for (band = 0; band < 4; band++) out[band] = 0;
    for (start = 0; start + 16 <= N; start += 4) {
        long branch[4];
        for (p = 0; p < 4; p++) {
            branch[p] = 0;
            for (k = 0; k < 16; k += 4) branch[p] += (long)prototype[k + p] * copy[start + k + p];
        }
        for (band = 0; band < 4; band++) {
            long v = 0;
            for (p = 0; p < 4; p++) v += phase[band][p] > 0 ? branch[p] : -branch[p];
            out[band] += v < 0 ? -v : v;
        }
    }
}

int main(void) {
    int i, n, errors = 0;
    long bands[4];
    for (i = 0; i < N; i++) copy[i] = signal[i] = (i * i * 13) % 211 - 100 + (i > 20 ? 300 : 0);
    for (n = N; n >= 4; n /= 2) split(signal, n);
    for (n = N; n >= 4; n /= 2) put_i32(band_energy(signal, n / 2, n));
    for (n = 4; n <= N; n *= 2) join(signal, n);
    for (i = 0; i < N; i++) errors += signal[i] != copy[i];
    put_i16(errors);
    split(signal, N);
    put_i16(threshold(signal, N / 2, N, 40));
    put_i16(threshold(signal, N / 2, N, 40));
    join(signal, N);
    for (i = 0; i < N; i += 4) put_i16(signal[i]);
    polyphase(bands);
    for (i = 0; i < 4; i++) put_i32(bands[i]);
    return 0;
}
