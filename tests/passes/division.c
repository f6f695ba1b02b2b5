// A division or modulo by a constant becomes a product with a scaled reciprocal, or a shift; nothing is evaluated twice.
// RUN: --opt_level=2 --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
#include <zrun.h>

int a[4] = {100, -100, 32767, -7};
volatile int v = -25;
unsigned g = 65535u;

// FUNCTION: by_a_negative
// HAS: return (x >> 31) - (long)((long long)x * 274877907 >> 38)
long by_a_negative(long x) { return x / -1000L; }

// A counter that starts from 0 and only grows needs no correction, nor does what is computed of it.
// FUNCTION: counters
// HAS: /i >> 3/
// HAS: /head \+ i & 15|i \+ head & 15/
// COUNT 0: >> 15
int counters(int n) {
    int i, head = 0, s = 0;
    for (i = 0; i < n; i++) {
        s ^= i / 8;
        head = (head + i) % 16;
    }
    return s + head;
}

// Each may become negative: by a wider or an unsigned number, by the caller, through a pointer; what steps down is -10.
// FUNCTION: signs_unknown
// COUNT 3: >> 15 & 3
// COUNT 1: * 100 - 2
int signs_unknown(int n, unsigned u, int *p) {
    int down = 2, wide = 0, wrapped = 0, pointed = 0, *q = &pointed;
    while (down > -9) {
        down -= 3;
        wide += 65000L;
        wrapped = (int)(u * 3u);
        *(p ? p : q) -= 5;
    }
    return down / 4 + wide / 4 * 100 + wrapped / 4 * 1000 + n / 4 + pointed / 8;
}

// FUNCTION: widest
// HAS: return (x >> 63 & 7) + x >> 3
long long widest(long long x) { return x / 8; }

// Four products of halves.
// FUNCTION: widest_by_seven
// COUNT 0: / 7
long long widest_by_seven(long long x) { return x / 7; }

// FUNCTION: digits
// The remainder takes the quotient that the division by the same constant finds.
// COUNT 1: x >> 32) * 3435973836
// NOT: / 10
// NOT: % 10
// COUNT 0: /^(sum|x)$/
int digits(unsigned long long x) {
    int sum = 0;
    for (; x; x /= 10) sum += (int)(x % 10);
    return sum;
}

// FUNCTION: from_memory
// HAS: $O$N0 = *(&_a + i)
// HAS: return (int)((long)$O$N0 * 43691 >> 17) - ($O$N0 >> 15)
int from_memory(int i) { return a[i] / 3; }

// FUNCTION: guarded
// COUNT 1: *(&_a + i)
// COUNT 0: / 3
int guarded(int i, int j) { return i >= 0 && a[i] / 3 > j; }

// FUNCTION: read_once
// COUNT 1: _v
// COUNT 0: %
int read_once(void) { return v % 10; }

// FUNCTION: in_place
// COUNT 0: /=
// COUNT 0: %=
void in_place(int i) {
    a[i] /= 5;
    g %= 10;
}

// The place is found with an effect and is read and written by one operator.
// FUNCTION: volatile_in_place
// COUNT 1: /=
void volatile_in_place(void) { v /= 5; }

int main(void) {
    put_i16(counters(100));
    put_i16(signs_unknown(-7, 15000u, 0));
    static const long values[] = {0, 1, 6, 7, -1, -7, -8, 999, 1000, -1000, 32767, -32767, -32767 - 1};
    for (unsigned i = 0; i < sizeof values / sizeof *values; i++) {
        int x = (int)values[i];
        put_i32(by_a_negative(values[i] * 65535L));
        put_i64(widest(values[i]));
        put_i64(widest_by_seven(values[i]));
        put_i16(guarded((int)(i & 3), x));
    }
    for (int i = 0; i < 4; i++) {
        put_i16(from_memory(i));
        in_place(i);
        put_i16(a[i]);
    }
    put_i16(read_once());
    volatile_in_place();
    put_i16(digits(18446744073709551615ULL));
    put_i16(digits(12345678901234567890ULL));
    put_i16(v);
    put_u32(g);
    return 0;
}
