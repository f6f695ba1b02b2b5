// What values a variable may have decides tests, remainders and choices; what it may not have does not.
// RUN: --opt_level=2 --disable_inlining --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
// LEVELS: 1 3
#include <intrinsics.h>
#include <zrun.h>

int x[100], h;

// A sum of at most 100 amounts of 1 or 2 is 300 at no time; before that it is 50 once.
// FUNCTION: accumulated
// COUNT 1: _h += 1
// COUNT 0: _h += 100
int accumulated(void) {
    int i, s = 0;
    for (i = 0; i < 100; i++) {
        s += 1 + (x[i] & 1);
        if (s == 50) h++;
        if (s > 200) h += 100;
    }
    return s;
}

// The block that repeats is part of a cycle with two entries, through which another value comes to it.
int cycle_with_two_entries(unsigned s, int a) {
    int d = 2, fuel = 20;
    if (a) goto repeats;
other:
    if (--fuel < 0) return a;
    h += s & 7;
    d = a + 7;
    s = s * 75u + 74u; if (s & 256u) goto behind;
repeats:
    if (--fuel < 0) return a;
    put_i16(d);
    s = s * 75u + 74u; if (s & 256u) goto repeats;
behind:
    if (--fuel < 0) return a;
    s = s * 75u + 74u; if (s & 256u) goto other;
    return d;
}

// FUNCTION: doubled
// HAS: /if .*s > 1000/
int doubled(int n) {
    int k, s = 1;
    for (k = 0; k < (n & 15); k++) s += s;
    if (s > 1000) h += 3;
    return s;
}

// Past the end of its type an unsigned counter goes on from 0.
// FUNCTION: wrapped
// COUNT 1: u += 1
int wrapped(unsigned u) {
    int steps = 0;
    if (u < 65530u) return -1;
    while (u >= 10) u++, steps++;
    return steps;
}

// FUNCTION: ranges
// HAS: return (unsigned int)v <u 10 ? 3 : 4
int ranges(int v) {
    if ((unsigned)v < 10u) {
        if (v < 0) return 1;
        if (v > 9) return 2;
        return 3;
    }
    return 4;
}

// FUNCTION: remainders
// HAS: return ((n > 12 ? -13 : 7) + n) * 100 + n
int remainders(int n) {
    if (n >= 0 && n < 20) return n % 20 + (n + 7) % 20 * 100;
    return 0;
}

// FUNCTION: of_either_sign
// COUNT 1: >> 15
int of_either_sign(int n) {
    if (n < -8 || n > 8) return 0;
    return n % 4;
}

// FUNCTION: other
// HAS: return 12 - v
int other(int n) {
    int v = n & 1 ? 5 : 7;
    x[3] = v;
    return v == 5 ? 7 : 5;
}

// The cases leave 1 and 3; the default leaves anything else.
// FUNCTION: cases
// COUNT 0: _h = 77
// COUNT 1: _h = 78
int cases(int n) {
    switch (n) {
    case 1:
    case 3:
        if (n == 2) h = 77;
        return n + h;
    default:
        if (n > 4) h = 78;
        return h;
    }
}

// A loop that only passes a variable on does not make it larger; one that steps down to 0 leaves it there.
// FUNCTION: nested
// COUNT 0: _h = 79
int nested(void) {
    int i, j, k = 3, n = 0;
    for (i = 0; i < 9; i++)
        for (j = 20; j > 0; j -= 5) {
            if (j > 20 || k > 3 || i > 8) h = 79;
            n += x[i + j];
        }
    return n + j;
}

// What a call throws out of is not assigned.
static int thrown(int n) {
    if (n & 1) zthrow(n);
    return n;
}
// FUNCTION: handled
// HAS: /v (==|!=) 50/
int handled(int n) {
    int v = 50;
    __eh_catch("...", caught);
    v = thrown(n) & 7;
    __eh_end();
    return v;
caught:
    return v == 50 ? 1000 + zcaught() : v;
}

// FUNCTION: shapes
// NOT: %
int shapes(int n) {
    int v = n & 31, w = n >> 11, r = 0;
    if (v >= 3 && v != 17) r += (v + 30) % 33 + v / 5 * 7;
    if (w > -9 && w < 4) r += w % 8 * 3 + w / 4;
    if (w > 2) r += (w + 5) % 13;
    if (v > 16) r ^= v % (1 << (n & 7)) + (w < 0 ? -w : w);
    return r + (v == 31 ? 9 : v > 30);
}

// What is tested is a sum of the counter around the loop: the innermost loop runs at least once.
// FUNCTION: eliminated
// NOT: ?
long a[4][4];
void eliminated(void) {
    int col, row, k;
    for (col = 0; col < 4; col++)
        for (row = col + 1; row < 4; row++) {
            long f = a[row][col];
            for (k = col; k < 4; k++) a[row][k] -= f * a[col][k];
        }
}
// FUNCTION: told_by_sums
// COUNT 0: = 81
// COUNT 1: = 80
int told_by_sums(int n, int m) {
    int v = n + 1, w = m + 1;
    if (v > 5 && n <= 4) h = 81;
    m += 2;
    if (w < 3 && m < -9) h = 80;
    return h;
}

// How a counter runs, by what it indexes; a step of 2.
// FUNCTION: by_array
// NOT: /_h \+= 1?00/
int by_array(int n) {
    int i, s = 0;
    for (i = 0; i < n; i += 2) {
        s += x[i];
        if (i > 101) h += 100;
        if (i & 1) h += 1000;
    }
    return s;
}

// A remainder by a power of two, known where the variable is set alone.
// FUNCTION: by_power
// NOT: %
int by_power(int n, int k) {
    int i, s = 0, m = 1 << (k & 7);
    x[7] = m;
    for (i = 0; i < n; i++) s += (x[i] & 255) % m + (i & 31) % m;
    return s;
}
// FUNCTION: by_other
// COUNT 1: %
int by_other(int n, int k) {
    int m = 1 << (k & 7);
    x[7] = m;
    m += k & 1;
    return (n & 255) % m;
}

// FUNCTION: null
// HAS: _at = (int *)0
int *at;
int null(int *p) {
    if (p) return *p;
    at = p;
    return h;
}

// FUNCTION: intrinsics
// NOT: _h
int intrinsics(int a, int b) {
    a = (a & 15) + 3;
    b = (b & 7) + 2;
    if (__mpy(a, b) > 162 || __mpy(a, b) < 6 || __mpyu(a, -b) < 3) h += 1;
    if (__mpyxu(-a, b) > -6 || __mpyxu(-a, b) < -162 || __mpyb(a, b) > 162) h += 2;
    if (__IQmpy(a, b, 2) > 40 || __qmpy32(a, b, 1) < 3) h += 4;
    if (__satlow16(a * 32768L) > 32767 || __IQsat(a, 7, 5) < 5) h += 8;
    return a + b;
}

// What a call writes through an argument is not what was there; a remainder by nothing is not folded.
// FUNCTION: written
// HAS: /s (==|!=) 3/
int written(long n) {
    int s = 3;
    n = __norm32(n, &s);
    return s == 3 ? 5 : (int)n;
}
// FUNCTION: by_nothing
// HAS: return 7 % 0
int by_nothing(int n) {
    if (n == 0 && x[0] == 12345) return 7 % n;
    return n;
}

// Between two updates a variable is not where iterations begin: off their grid, and beyond where they begin if it goes
// back and forth, also by wrapping.
unsigned stepped_twice(void) {
    unsigned i, n = 0;
    for (i = 0; i < 10; i++) {
        n += 1;
        h++;
        n += 2;
    }
    return n;
}

unsigned back_and_forth(void) {
    int i, n = 0;
    unsigned k;
    for (i = 0; i < 10; i++) {
        i += 3;
        if (i > 11) n += 1;
        i -= 3;
    }
    for (k = 20; k > 9;) {
        k -= 12;
        if (k > 60000u) n += 100;
        k += 10;
    }
    return n + k;
}

// Over all that an int holds.
static unsigned sum_of_all(int (*f)(int)) {
    unsigned sum = 0;
    long n;
    for (n = -32768; n < 32768; n++) sum = sum * 5 + f(n);
    return sum;
}

int main(void) {
    int i;
    put_u32(sum_of_all(shapes));
    put_u32(sum_of_all(ranges));
    put_u32(sum_of_all(remainders));
    put_u32(sum_of_all(of_either_sign));
    put_u32(sum_of_all(other));
    for (i = 0; i < 100; i++) x[i] = i * 7;
    put_i16(accumulated() + h);
    put_i16(stepped_twice() + back_and_forth());
    for (i = 0; i < 14; i++) put_i16(doubled(i));
    put_i16(wrapped(65530u));
    put_i16(wrapped(12));
    put_i16(handled(3) + handled(4));
    for (i = -12; i < 24; i++) {
        put_i16(ranges(i) + remainders(i) * 3 + of_either_sign(i) * 5);
        put_i16(other(i) + cases(i));
    }
    put_i16(nested() + h);
    put_i16(cycle_with_two_entries(19584u, 4));
    for (i = 0; i < 16; i++) a[i >> 2][i & 3] = i * 3 % 7;
    put_i16(written(40L) + by_nothing(0));
    at = x;
    put_i16(null(x + 3) + (at == x) + null(0) + (at == 0));
    for (i = 0; i < 12; i++) put_i16(by_array(i) + by_power(9 * i, i) + by_other(100 * i, i) + intrinsics(i, -i));
    eliminated();
    for (i = 0; i < 16; i++) put_i32(a[i >> 2][i & 3]);
    for (i = -20; i < 20; i++) put_i16(told_by_sums(i, i - 12));
    return 0;
}
