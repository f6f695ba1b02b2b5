// A function without calls says that it is a leaf; one with calls, direct or by pointer, does not.
// RUN: --opt_level=2 --disable_inlining
// LEVELS: 1 3 4
#include <stdlib.h>
#include <zrun.h>

int g;

// FUNCTION: leaf
// COUNT 1: /function info.*leaf/
int leaf(int x) { return x + g; }

// FUNCTION: caller
// COUNT 0: leaf)
// COUNT 1: _leaf(
int caller(int x) {
    g = x;
    return leaf(x) + g;
}

// FUNCTION: indirect
// COUNT 0: leaf)
int indirect(int (*f)(int), int x) { return f(x); }

// ---- Behind a call that never returns stands the mark that says so, and nothing of what followed.

// FUNCTION: stop
// HAS: _exit(7)
// HAS: // ***	; the preceding call never returns
// HAS: _never_executed()
// NOT: 55
// COUNT 0: 55
void stop(int x) {
    if (x > 1000) {
        exit(7);
        g = 55;
    }
    g = x;
}

// ---- A quotient is made ahead of a call that comes back for certain, and of no other.

int a[16], zero;
volatile int port;
int (*pointer)(int);
extern double sqrt(double);

int counts(int n) {
    int i, s = 0;
    for (i = 0; i < n; i++) s += a[i & 15];
    g++;
    return s;
}
int counts_down(int k) {
    unsigned n = k & 15;
    int s = 0;
    while (n--) s += a[n];
    for (n = 9; n > 2u; --n) g += a[n];
    for (; n < (unsigned)k; ++n) g++;
    return s;
}
int walks(int k) {
    const int *p = a + (k & 7), *e = a + 16;
    while (p != e) g += *p++;
    return (int)labs(k) + counts_down(k);
}
int may_exit(int y) {
    if (y) exit(0);
    return g;
}
int calls_it(int y) { return may_exit(y) + 1; }
int never_ends_at_top(unsigned k) { // for 65535
    unsigned i;
    for (i = 0; i <= k; i++) g++;
    return g;
}
int skips_the_end(unsigned k) { // for odd ones
    unsigned i;
    for (i = 0; i != k; i += 2) g++;
    return g;
}
int skips_it_in_a_loop(unsigned k) {
    unsigned i = 0;
    int j;
    do {
        j = 0;
        do {
            a[j] ^= i++;
        } while (++j < 2);
    } while (i != k);
    return g;
}
int runs_after_its_limit(unsigned k) {
    unsigned i;
    for (i = 0; i != k; i++) k += a[i & 15];
    return g;
}
int steps_now_and_then(int k) {
    int i = 0;
    while (i < k)
        if (a[g & 15]) i++;
    return i;
}
int steps_back(int k) {
    int i;
    for (i = 0; i < k; i++)
        if (a[i]) i--;
    return i;
}
int other_variable(int k) {
    int i = 0;
    while (k != g) i++;
    return i;
}
int has_its_address_taken(int k) {
    int i, *p = k ? &i : &g;
    for (i = 0; i < k; i++) *p -= 1;
    return i;
}
int steps_in_the_inner_loop(int k) {
    int i = 0, j;
    while (i < k)
        for (j = 0; j < a[k & 15]; j++) i++;
    return i;
}
int has_two_entries(int k) {
    if (k) goto second;
first:
    if (!a[g & 15]) return g;
second:
    g++;
    if (a[k & 15]) goto first;
    return k;
}
int is_odd(int k);
int is_even(int k) { return k ? is_odd(k - 1) : 1; }
int is_odd(int k) { return k ? is_even(k - 1) + g : 0; }
int by_pointer(int k) { return pointer(k); }
int waits(int k) { return port + k; }
int prints(int k) {
    put_i16(k);
    return k;
}
int stops(int k) {
    __asm(" NOP");
    return k;
}

#define LOOP(callee)                                                                                                   \
    int in_##callee(int n, int x, int y) {                                                                             \
        int i, s = 0;                                                                                                  \
        for (i = 0; i < n; i++) {                                                                                      \
            s += callee(y ? 0 : x);                                                                                    \
            s += x / y;                                                                                                \
        }                                                                                                              \
        return s;                                                                                                      \
    }

// FUNCTION: in_counts
// HAS: /x . y/
// HAS: /_counts\(/
LOOP(counts)
// FUNCTION: in_walks
// HAS: /x . y/
// HAS: /_walks\(/
LOOP(walks)
// FUNCTION: in_calls_it
// HAS: /_calls_it\(/
// HAS: /x . y/
LOOP(calls_it)
// FUNCTION: in_never_ends_at_top
// HAS: /_never_ends_at_top\(/
// HAS: /x . y/
LOOP(never_ends_at_top)
// FUNCTION: in_skips_the_end
// HAS: /_skips_the_end\(/
// HAS: /x . y/
LOOP(skips_the_end)
// FUNCTION: in_skips_it_in_a_loop
// HAS: /_skips_it_in_a_loop\(/
// HAS: /x . y/
LOOP(skips_it_in_a_loop)
// FUNCTION: in_runs_after_its_limit
// HAS: /_runs_after_its_limit\(/
// HAS: /x . y/
LOOP(runs_after_its_limit)
// FUNCTION: in_steps_now_and_then
// HAS: /_steps_now_and_then\(/
// HAS: /x . y/
LOOP(steps_now_and_then)
// FUNCTION: in_steps_back
// HAS: /_steps_back\(/
// HAS: /x . y/
LOOP(steps_back)
// FUNCTION: in_other_variable
// HAS: /_other_variable\(/
// HAS: /x . y/
LOOP(other_variable)
// FUNCTION: in_has_its_address_taken
// HAS: /_has_its_address_taken\(/
// HAS: /x . y/
LOOP(has_its_address_taken)
// FUNCTION: in_steps_in_the_inner_loop
// HAS: /_steps_in_the_inner_loop\(/
// HAS: /x . y/
LOOP(steps_in_the_inner_loop)
// FUNCTION: in_has_two_entries
// HAS: /_has_two_entries\(/
// HAS: /x . y/
LOOP(has_two_entries)
// FUNCTION: in_is_even
// HAS: /_is_even\(/
// HAS: /x . y/
LOOP(is_even)
// FUNCTION: in_by_pointer
// HAS: /_by_pointer\(/
// HAS: /x . y/
LOOP(by_pointer)
// FUNCTION: in_waits
// HAS: /_waits\(/
// HAS: /x . y/
LOOP(waits)
// FUNCTION: in_prints
// HAS: /_prints\(/
// HAS: /x . y/
LOOP(prints)
// FUNCTION: in_stops
// HAS: /_stops\(/
// HAS: /x . y/
LOOP(stops)

// A signed counter reaches the limit that it is tested for, for it would overflow behind it, unless a call leaves the loop.
#define UNTIL(callee)                                                                                                  \
    int until_##callee(int i, int n) {                                                                                 \
        do {                                                                                                           \
            callee(i & 3);                                                                                             \
            i += 2;                                                                                                    \
        } while (i != n);                                                                                              \
        return i;                                                                                                      \
    }

// FUNCTION: until_counts
// COUNT 1: MUST_ITERATE("1", "32767", "1")
UNTIL(counts)
// FUNCTION: until_calls_it
// COUNT 1: MUST_ITERATE("1", "32768", "1")
UNTIL(calls_it)

// ---- A counter that is tested by != meets no limit that it has passed: the program ends in a call, and a loop in it may
// stay for ever.

// FUNCTION: passes_its_limit
// COUNT 1: a >= 4
int quits;
void quit(void) {
    if (quits++ == 3) exit(9);
}
int passes_its_limit(int a) {
    int s = 0;
    while (a != 3) {
        s += a > 3;
        if (a >= 4) put_i16(a);
        quit();
        a += 2;
    }
    return s;
}

// FUNCTION: waits_for_ever
// COUNT 1: _lamp
volatile int door, lamp;
void waits_for_ever(int a) {
    while (a != 3) {
        if (a == 100) {
            while (door) lamp = a;
        }
        a += 2;
    }
}

int main(void) {
    if (zero) waits_for_ever(passes_its_limit(10));
    put_i16(caller(3));
    put_i16(indirect(caller, 4));
    stop(4);
    put_i16(g);
    pointer = counts;
    a[3] = 5;
    put_i16(in_counts(3, 7, 2) + in_walks(3, 7, 2) + in_by_pointer(3, 7, 2) + in_is_even(3, 7, 2) + in_waits(2, 7, 2));
    put_i16(in_prints(2, 7, 3));
    put_i16(until_counts(2, 10));
    put_i16(in_calls_it(2, 7, zero)); // ends the program ahead of the quotient
    return 0;
}
