// A parameter that has one value at all calls goes from the function and from the calls.
// RUN: --opt_level=3
// LEVELS: 0 2 4
#include <zrun.h>

static int g[8] = {1, 2, 3, 4, 5, 6, 7, 8}, hits;
int counter, cell;

// The local copy still changes; constants of every kind. An address stays where it would be made in each iteration.
// FUNCTION: loop
// HAS: 0 p: int *, class 17, qualifiers 0000, 32 bits aligned to 32, level 1
// HAS: 1 k: int, class 17, qualifiers 0000, 16 bits aligned to 16, level 1
// HAS: end of arguments
// NOT: class 17
// HAS: pragma 39 MUST_ITERATE("8", "8", "8")
#pragma FUNC_CANNOT_INLINE(loop)
static int loop(int n, int *p, int k, long w, float x) {
    int s = 0;
    while (n--) s += p[n] * k;
    return s + n + (int)w + (int)x;
}

// Passed on in a cycle of calls, and counted down.
// FUNCTION: even
// HAS: /^function _even/
// HAS: 0 n: int, class 17, qualifiers 0000, 16 bits aligned to 16, level 1
// HAS: end of arguments
// FUNCTION: odd
// HAS: /^function _odd/
// HAS: 0 n: int, class 17, qualifiers 0000, 16 bits aligned to 16, level 1
// HAS: end of arguments
static int odd(int step, int n, int m);
#pragma FUNC_CANNOT_INLINE(even)
#pragma FUNC_CANNOT_INLINE(odd)
static int even(int step, int n, int m) { return n <= 0 ? m : odd(step, n - 1, m) + step; }
static int odd(int step, int n, int m) { return n <= 0 ? -m : even(step, n - 1, m * 2 / 2); }

// What an argument does stays; a value of what was written is none.
// FUNCTION: effects
// HAS: 0 b: int, class 17, qualifiers 0000, 16 bits aligned to 16, level 1
// HAS: end of arguments
#pragma FUNC_CANNOT_INLINE(effects)
static int effects(int a, int b) { return a * 3 + b; }
#pragma FUNC_CANNOT_INLINE(next)
static int next(void) { return ++counter; }

// The address of an object that is read once, and of a function.
// FUNCTION: once
// HAS: /^function _once/
// HAS: end of arguments
// HAS: _cell = _twice(_cell)
#pragma FUNC_CANNOT_INLINE(once)
#pragma FUNC_CANNOT_INLINE(twice)
static int twice(int n) { return n * 2 + 1; }
static void once(int *to, int (*f)(int)) { cell = f(*to); }

// Few values: what is known of them settles tests, remainders and trip counts.
// FUNCTION: ranged
// HAS: pragma 39 MUST_ITERATE("1", "15", "1")
// NOT: 99
// NOT: %
#pragma FUNC_CANNOT_INLINE(ranged)
static int ranged(int n, int k) {
    int s = 0, i;
    for (i = 0; i < n; i++) s += g[i & 7] * (k % 4);
    if (n > 20) s = 99;
    return s;
}
// FUNCTION: upward
// NOT: -5
#pragma FUNC_CANNOT_INLINE(upward)
static int upward(int d, int m) { return d > m ? d : d < 0 ? -5 : upward(d + 3, m) + 1; }
// FUNCTION: downward
// COUNT 1: -5
#pragma FUNC_CANNOT_INLINE(downward)
static int downward(int d, int m) { return d < m ? d : d < 0 ? -5 : downward(d - 3, m) + 1; }

// What locals of the callers may be at the calls; one value of them.
// FUNCTION: of_counter
// NOT: 99
// NOT: 98
#pragma FUNC_CANNOT_INLINE(of_counter)
static int of_counter(int n) {
    if (n > 20) hits += 99;
    return n & 1 ? 98 : n;
}
// FUNCTION: of_local
// HAS: 0 k: int, class 17, qualifiers 0000, 16 bits aligned to 16, level 1
// HAS: end of arguments
#pragma FUNC_CANNOT_INLINE(of_local)
static int of_local(int n, int k) { return n * k; }

// No argument is left.
// FUNCTION: alone
// HAS: /^function _alone/
// HAS: end of arguments
#pragma FUNC_CANNOT_INLINE(alone)
static int alone(int n) { hits += n; return hits; }

// Entered through a pointer; written, or its address taken; with another number of arguments; changed ahead of being
// passed on; exported.
// FUNCTION: by_pointer
// COUNT 1: class 17
#pragma FUNC_CANNOT_INLINE(by_pointer)
static int by_pointer(int n) { return n * 5; }
// FUNCTION: changes
// COUNT 1: n: int, class 17
#pragma FUNC_CANNOT_INLINE(changes)
static int changes(int n, int k) { if (k) n++; return k ? changes(n, k - 1) * 2 : n; }
// FUNCTION: takes_address
// COUNT 1: class 22
#pragma FUNC_CANNOT_INLINE(takes_address)
static int takes_address(int n) { int *p = counter ? &n : &counter; *p += 2; return n; }
// FUNCTION: exported
// COUNT 1: class 17
#pragma FUNC_CANNOT_INLINE(exported)
int exported(int n) { return n * n; }

int main(void) {
    int (*fp)(int) = by_pointer;
    volatile int one = 1;
    int i, r = 0, v = 5;
    if (one) v = counter + 5 - counter;
    for (i = 0; i < 20; i += 2) r += of_counter(i);
    if (one) v = 5;
    put_i16(r + of_local(v, one) + of_local(5, one));
    r = 0;
    for (i = 0; i < 3; i++) r += loop(8, g, i, -1, 2.5f);
    put_i16(r); put_i16(loop(8, g, one + 6, -1L, 2.5f));
    put_i16(even(3, one + 4, 9)); put_i16(odd(3, one + 7, 9));
    put_i16(effects(8 + 0 * next(), one)); put_i16(effects((put_i16(1), 8), one)); put_i16(effects(8, counter));
    once(&cell, twice); once(&cell, twice); put_i16(cell); put_i16(ranged(one & 15, 9)); put_i16(ranged(one & 3, one & 15));
    put_i16(upward(0, one + 30)); put_i16(upward(4, one)); put_i16(downward(7, one - 30));
    put_i16(alone(4)); if (one && alone(4) > 3) put_i16(alone(4));
    put_i16(by_pointer(3)); put_i16(fp(one));
    put_i16(changes(2, one)); put_i16(takes_address(6)); put_i16(exported(7));
    return 0;
}
