// Peak search with hysteresis, running extremes, histogram, percentiles and entropy-like sums.
#include <zrun.h>

#define N 120
#define BINS 16

static int wave[N];
static unsigned bins[BINS];

static int find_peaks(const int* x, int n, int rise, int* where, int room) {
    int found = 0, low = x[0], high = x[0], at = 0, up = 1, i;
    for (i = 1; i < n; i++) {
        if (up) {
            if (x[i] > high) {
                high = x[i];
                at = i;
            } else if (x[i] < high - rise) {
                if (found < room) where[found] = at;
                found++;
                up = 0;
                low = x[i];
            }
        } else if (x[i] < low) {
            low = x[i];
        } else if (x[i] > low + rise) {
            up = 1;
            high = x[i];
            at = i;
        }
    }
    return found;
}

static long running_max(const int* x, int n, int width) {
    int queue[16], head = 0, count = 0, i;
    long sum = 0;
    for (i = 0; i < n; i++) {
        while (count > 0 && x[queue[(head + count - 1) % 16]] <= x[i]) count--;
        queue[(head + count++) % 16] = i;
        if (queue[head] <= i - width) {
            head = (head + 1) % 16;
            count--;
        }
        if (i >= width - 1) sum += x[queue[head]];
    }
    return sum;
}

static void fill_bins(void) {
    int i;
    for (i = 0; i < BINS; i++) bins[i] = 0;
    for (i = 0; i < N; i++) {
        int b = (wave[i] + 256) >> 5;
        bins[b < 0 ? 0 : b >= BINS ? BINS - 1 : b]++;
    }
}

static int percentile(int percent) {
    long need = (long)percent * N / 100, have = 0;
    int i = 0;
    for (;;) {
        have += (long)bins[i];
        if (have >= need) break;
        if (++i == BINS) return -1;
    }
    return i;
}

int main(void) {
    int where[6], i, n;
    for (i = 0; i < N; i++) {
        int t = i % 24;
        wave[i] = (t < 12 ? t * 40 : (24 - t) * 40) - 240 + (i * 7) % 13 - (i / 24) * 9;
    }
    for (n = 10; n <= 640; n *= 4) put_i16(find_peaks(wave, N, n, where, 6));
    n = find_peaks(wave, N, 60, where, 6);
    for (i = 0; i < n && i < 6; i++) {
        put_i16(where[i]);
        put_i16(wave[where[i]]);
    }
    put_i32(running_max(wave, N, 1));
    put_i32(running_max(wave, N, 5));
    put_i32(running_max(wave, N, 15));
    fill_bins();
    for (i = 0; i < BINS; i++) put_i16((int)bins[i]);
    put_i16(percentile(0));
    put_i16(percentile(50));
    put_i16(percentile(95));
    put_i16(percentile(101));
    return 0;
}
