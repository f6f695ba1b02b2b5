// What all calls pass in a pointer parameter is known where nothing but these calls enters the function.
// RUN: --opt_level=3 --debug:skip=ssa-rp-with-benign-loads+ssa-reg-promote+ssa-reg-promote-with-simpcfg+superblocks
// LEVELS: 0 2
#include <zrun.h>

int x[20], y[20], z[20], a, b;
static int *kept;

// Two places to read, two others to write.
// FUNCTION: scaled
// COUNT 1: *(from + k)
#pragma FUNC_CANNOT_INLINE(scaled)
static int scaled(int *to, int *from, int k, int n) {
    int s = from[k] * 3;
    *to = n;
    return s + from[k] * 5;
}

// Passed on, and stepped.
// FUNCTION: passed_on
// COUNT 1: *(from + k)
#pragma FUNC_CANNOT_INLINE(passed_on)
static int passed_on(int *from, int k, int n) {
    int s = from[k] * 3;
    y[n & 7] = n;
    s = s * 2 + from[k] * 5;
    return s + (n > 0 ? passed_on(from + 2, k, n - 1) : scaled(y + n + 2, from, k, n));
}

// One call passes what is written.
// FUNCTION: meets_once
// COUNT 2: *(from + k)
#pragma FUNC_CANNOT_INLINE(meets_once)
static int meets_once(int *to, int *from, int k, int n) {
    int s = from[k] * 3;
    *to = n;
    return s + from[k] * 5;
}

// Entered through a pointer, too.
// FUNCTION: by_address
// COUNT 2: *(from + k)
#pragma FUNC_CANNOT_INLINE(by_address)
static int by_address(int *to, int *from, int k, int n) {
    int s = from[k] * 3;
    *to = n;
    return s + from[k] * 5;
}
int (*volatile entry)(int *, int *, int, int) = by_address;

// An object of each activation is none of the one that runs.
#pragma FUNC_CANNOT_INLINE(nested)
static int nested(int *outer, int n) {
    int own = n, *p = n & 1 ? &own : outer;
    *p += 3;
    if (n > 0) own += nested(&own, n - 1);
    *outer += n;
    return own * 2 + *p;
}

#pragma FUNC_CANNOT_INLINE(keeping)
static int keeping(int *p, int *q) {
    static int last;
    int s = last;
    *p += 4;
    *q += last++;
    kept = &last;
    return s + last + *p;
}

int main(void) {
    int i;
    for (i = 0; i < 20; i++) x[i] = i, y[i] = 100 - i, z[i] = i * i;
    put_i16(scaled(y, x + 3, 2, 4)); put_i16(scaled(y + 5, z, 0, 9)); put_i16(passed_on(x + 1, 0, 5)); put_i16(passed_on(x, 1, 4));
    put_i16(meets_once(y, x, 3, 1)); put_i16(meets_once(z + 1, z + 1, 0, 2));
    put_i16(by_address(y, x, 2, 1)); put_i16(entry(x, x, 0, 7));
    put_i16(nested(&a, 5)); put_i16(keeping(&a, &b)); put_i16(keeping(kept, &b)); put_i16(keeping(&b, kept));
    return 0;
}
