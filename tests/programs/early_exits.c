// Loops left early: break, continue, return from nests, sentinel search, flags, and conditions with effects.
#include <zrun.h>

static int calls;
static int touch(int v) {
    calls++;
    return v;
}

static int search(const int* a, int n, int key) {
    int i;
    for (i = 0; i < n; i++)
        if (a[i] == key) break;
    return i == n ? -1 : i;
}

static int sentinel(int* a, int n, int key) {
    int i = 0, kept = a[n];
    a[n] = key;
    while (a[i] != key) i++;
    a[n] = kept;
    return i < n ? i : -1;
}

static int first_repeat(const int* a, int n) {
    int i, j;
    for (i = 1; i < n; i++)
        for (j = 0; j < i; j++)
            if (a[i] == a[j]) return i * 10 + j;
    return -1;
}

static int skip_some(const int* a, int n) {
    int i, s = 0;
    for (i = 0; i < n; i++) {
        if (a[i] & 1) continue;
        if (a[i] > 12) {
            s += 100;
            continue;
        }
        if (a[i] == 0) break;
        s += a[i];
    }
    return s * 10 + i % 10;
}

static int flag_loop(const int* a, int n) {
    int going = 1, i = 0, s = 0;
    while (going && i < n) {
        s += a[i];
        if (s > 30) going = 0;
        i++;
    }
    return s * 10 + i;
}

static int effects(int n) {
    int i = 0, s = 0;
    calls = 0;
    while (touch(i) < n && touch(s) < 20) s += ++i;
    return s * 100 + calls;
}

static int inner_break(int n) {
    int i, j, c = 0;
    for (i = 0; i < n; i++) {
        for (j = 0;; j++) {
            if (j == i) break;
            if ((i + j) % 5 == 4) goto next_outer;
            c += j;
        }
        c += 100;
    next_outer:;
    }
    return c;
}

static int collatz(unsigned long v, int limit) {
    int n = 0;
    for (;;) {
        if (v == 1UL) return n;
        if (n++ >= limit) return -1;
        v = v & 1UL ? 3UL * v + 1UL : v / 2UL;
    }
}

static int last_before(const int* a, int n, int bound) {
    int last = -1;
    while (n-- > 0) {
        if (a[n] >= bound) continue;
        last = a[n];
        if (last == 0) return -2;
        break;
    }
    return last;
}

static int primes(int limit) {
    int n, d, count = 0;
    for (n = 2; n < limit; n++) {
        int prime = 1;
        for (d = 2; d * d <= n; d++)
            if (n % d == 0) {
                prime = 0;
                break;
            }
        count += prime;
    }
    return count;
}

int main(void) {
    int a[11] = {4, 7, 2, 9, 14, 6, 4, 0, 3, 8, 55}, i;
    for (i = -1; i < 10; i++) {
        put_i16(search(a, 10, i));
        put_i16(sentinel(a, 10, i));
    }
    put_i16(a[10]);
    for (i = 0; i <= 10; i += 5) {
        put_i16(first_repeat(a, i));
        put_i16(skip_some(a, i));
        put_i16(flag_loop(a, i));
        put_i16(effects(i));
        put_i16(inner_break(i));
        put_i16(last_before(a, i, 8));
    }
    put_i16(collatz(27UL, 200));
    put_i16(collatz(27UL, 50));
    put_i16(collatz(1UL, 0));
    put_i16(primes(200));
    return 0;
}
