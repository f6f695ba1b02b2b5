/* What a source can say about inlining. Compare the calls that are left at --opt_level=2, at 3, with --disable_inlining
 * and with --single_inline: what is forced is expanded at every level, what is barred at none. */
#include <zrun.h>

#define N 16
static int x[N], y[N];

/* Asked for: expanded at level 2, and its definition is dropped where no call is left. */
static inline int clamp(long v) { return v > 32767 ? 32767 : v < -32768 ? -32768 : (int)v; }

/* Small: expanded at level 3 for its size (--auto_inline=SIZE). */
static int scale(int a, int gain) { return clamp((long)a * gain >> 8); }

/* Of one call: expanded at level 3 although it is larger. */
static void fill(int seed) {
    int i;
    for (i = 0; i < N; i++) {
        seed = (int)((long)seed * 75 % 8191);
        x[i] = seed - 4096;
    }
}

#pragma FUNC_ALWAYS_INLINE(rounded)
static int rounded(long v) { return clamp(v + 128 >> 8); }

#pragma FUNC_CANNOT_INLINE(report)
static void report(int v) { put_i16(v); }

static int power(int base, int n) { return n == 0 ? 1 : base * power(base, n - 1); }

int main(void) {
    int i, sum = 0;
    fill(77);
    for (i = 0; i < N; i++) y[i] = scale(x[i], 300 - i);
    for (i = 0; i < N; i++) sum += rounded((long)y[i] * i);
    report(sum);
#pragma FORCEINLINE
    report(power(3, 4));
#pragma FORCEINLINE_RECURSIVE
    sum = power(2, 6);
    report(sum);
#pragma NOINLINE
    sum = clamp(100000L) - rounded(-70000L);
    report(sum);
    return 0;
}
