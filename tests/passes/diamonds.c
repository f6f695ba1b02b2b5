// Two cheap arms without side effects become one statement; an arm that needs its condition as a guard keeps it.
// RUN: --opt_level=1 --float_support=fpu32
#include <stdint.h>
#include <zrun.h>

int g, table[4] = {5, 6, 7, 8};
volatile int v;

// FUNCTION: selected
// HAS: /x > 3 \? y \+ 1 : 7/
// COUNT 0: goto
int selected(int x, int y) {
    int r;
    if (x > 3) r = y + 1;
    else r = 7;
    return r;
}

// FUNCTION: largest
// COUNT 1: /__lmax\(/
int32_t largest(const int32_t *p, int n) {
    int32_t m = p[0];
    for (int i = 1; i < n; i++) {
        int32_t e = p[i];
        if (e > m) m = e;
    }
    return m;
}

// What the condition reads may be chosen from; what only the arm reads needs its guard.
// FUNCTION: peaks
// COUNT 1: /= __max\(m, \*/
// COUNT 1: /< 0.*goto/
// COUNT 1: = ABS(e)
int peaks(const int *p, int n) {
    int m = -9, e, sum = 0;
    while (n-- > 1) {
        if (*p > m) m = *p;
        e = *p++ - 6;
        if (e < 0) e = -e;
        sum += e;
    }
    if (n < 0) m = table[sum & 3];
    return m + sum;
}

// FUNCTION: bounded
// COUNT 0: if (
// HAS: /__min\(.*7/
// HAS: /__max\(.*-1/
int bounded(int x, int y) {
    if (x >= 8) x = 7;
    if (y < 0) y = -1;
    return x + y;
}

// FUNCTION: not_the_bound
// COUNT 0: __min
int not_the_bound(int x) {
    if (x >= 8) x = 6;
    return x;
}

// FUNCTION: clipped
// COUNT 0: if (
// HAS: /__fmax\(/
float clipped(float x) {
    if (x < 0.0F) x = 0.0F;
    return x;
}

// FUNCTION: mixed
// COUNT 0: __min
int mixed(int x, unsigned y) { return (unsigned)x < y ? x : (int)y; }

// FUNCTION: guarded_load
// COUNT 1: if (
int guarded_load(const int *p) {
    if (p) return *p;
    return 0;
}

// FUNCTION: guarded_division
// COUNT 1: if (
int guarded_division(int x, int y) {
    if (y) return x / y;
    return 0;
}

static int step(int by) { return g += by; }

// FUNCTION: effects
// COUNT 1: if (
int effects(int x) {
    if (x) return step(1);
    return step(2);
}

// FUNCTION: volatile_target
// COUNT 1: if (
void volatile_target(int x) {
    if (x) v = 1;
    else v = 2;
}

int main(void) {
    put_i16(peaks(table, 4));
    volatile float zero = 0.0F;
    static const int32_t list[5] = {-70000, 5, 90000, -3, 89999};
    put_i16(selected(4, 10) + selected(3, 10));
    put_i32(largest(list, 5));
    for (int i = 6; i < 10; i++) put_i16(bounded(i, i - 8) * 100 + not_the_bound(i));
    put_f32(clipped(-2.0F) + clipped(3.0F));
    put_f32(clipped(zero / zero));
    put_f32(1.0F / clipped(-zero));
    put_i16(mixed(-1, 4));
    put_i16(guarded_load(table) + guarded_load(0));
    put_i16(guarded_division(9, 2) + guarded_division(9, 0));
    put_i16(effects(0) * 10 + effects(1));
    volatile_target(0);
    put_i16(v);
    return 0;
}
