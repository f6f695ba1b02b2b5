// Quotients and remainders of counters by what the loop leaves alone are counted; others are divided for.
// RUN: --opt_level=2 --disable_inlining --debug:skip=cd-unroll-for-speed
// LEVELS: 1 3 4
#include <zrun.h>

int seen;
int take(int x) { return seen = seen * 3 + x; }

// FUNCTION: every
// NOT: %
// COUNT 1: ? 0 :
void every(int n, int d) {
    int i;
    for (i = 0; i < n; i++) {
        take(i);
        if (i % d == d - 1) take(-1);
        take(i % d);
    }
}

// FUNCTION: every_unsigned
// NOT: %
long every_unsigned(unsigned n, unsigned d) {
    unsigned i;
    long sum = 0;
    for (i = 0; i < n; i++) sum = sum * 5 + take((int)(i % d));
    return sum;
}

// The divisor is positive and the counter not negative: so says the loop around.
// FUNCTION: phases
// COUNT 1: / phases
int phases(const int* x, int n, int phases) {
    int p, k, sum = 0;
    for (p = 0; p < phases; p++)
        for (k = p; k < n; k += phases) sum = sum * 3 + x[k / phases] + take(k / phases);
    return sum;
}

// Where a pointer takes the place of the quotient, that does not step.
// FUNCTION: strided
// HAS: $O$q0 = i / d
// COUNT 0: q0 +=
int strided(const int* x, int n, int d) {
    int i, k, all = 0;
    for (i = 0; i < d; i++)
        for (k = i; k < n; k += d) all ^= x[40 - k / d];
    return all;
}

// ---- These divide: the divisor may be negative, or the counter; it steps by another number, or twice, or changes; or what
// is asked for is asked for seldom.

// FUNCTION: unknown_sign
// COUNT 1: / d
int unknown_sign(int from, int n, int d) {
    int k, sum = 0;
    if (d == 0) return 0;
    for (k = from; k < n && sum < 99; k += d) sum += k / d + 7;
    return sum;
}

// FUNCTION: by_two
// COUNT 3: %
int by_two(int n, int d) {
    int i, j, sum = 0;
    for (i = 0; i < n; i += 2) sum = sum * 3 + i % d;
    for (i = 0; i < n; i++) {
        sum = sum * 3 + i % d;
        if (sum & 1) i++;
    }
    for (j = 0; j < n; j++) {
        sum = sum * 3 + j % d;
        if (j == 6) d++;
    }
    return sum;
}

// FUNCTION: seldom
// COUNT 2: %
int seldom(int n, int d) {
    int i, sum = 0;
    for (i = 0; i < n; i++) {
        sum += take(1) == 5 && i % d;
        if (sum > 100) sum -= i % d;
    }
    return sum;
}

// A step that an inner loop takes, and a remainder that it asks for.
int nested(int n, int d) {
    int i, j, sum = 0;
    for (i = 0; i < n; i++) {
        sum = sum * 3 + i % d;
        for (j = 0; j < 3; j++) {
            sum += i % d + j % d;
            if (j == 2 && (sum & 3) == 0) i++;
        }
    }
    return sum;
}

int x[41];

int main(void) {
    int n, d;
    for (n = 0; n < 40; n++) x[n] = n * n;
    for (n = 0; n < 20; n += 3)
        for (d = -4; d <= 5; d++) {
            if (d == 0) continue;
            every(n, d);
            put_i16(by_two(n, d < 0 ? -d : d) + seldom(n, d) + nested(n, d));
            put_i16(phases(x, n, d) + strided(x, n, d) + (d > 0 ? unknown_sign(-9, n, d) : unknown_sign(n, 0, d)));
            put_i32(every_unsigned((unsigned)n, (unsigned)d));
        }
    every(2, -32767 - 1);
    put_i16(seen);
    return 0;
}
