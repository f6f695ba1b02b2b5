// A local with one assignment to a value that never changes is that value everywhere; the assignment goes.
// RUN: --opt_level=2
#include <zrun.h>

static int set(int* p) { return *p = 4; }
int g, h[4];
struct pair {
    int a, b;
} s;

// FUNCTION: chain
// NOT: /\d+ [xy]\b/
// HAS: return n + 3
int chain(int n) {
    int x = 1, y = x + 1;
    return n + x + y;
}

// FUNCTION: chosen
// NOT: /switch \(/
// HAS: _put_i16(n + 7)
void chosen(int n) {
    int mode = 3;
    switch (mode) {
    case 1: put_i16(n); break;
    case 3: put_i16(n + 7); break;
    default: put_i16(0);
    }
}

// FUNCTION: addresses
// HAS: _g = 5
// HAS: _s.b = 6
// HAS: *(&_h + i) = 7
// NOT: /\b[pqr]\b/
void addresses(int i) {
    int *p = &g, *q = &s.b, *r = h;
    *p = 5;
    *q = 6;
    r[i] = 7;
}

// FUNCTION: once
// HAS: first = _set(&_g)
// HAS: return first * first
int once(void) {
    int first = set(&g), second = first;
    return second * first;
}

// The variable of an outer block keeps the value of an earlier turn.
// FUNCTION: kept_over_turns
// HAS: /last = /
int kept_over_turns(int n) {
    int i, last, sum = 0;
    for (i = 0; i < n; i++) {
        const int now = h[i & 3] + i;
        if (i & 1) last = now;
        if (i) sum += last * now;
        if (!i) last = 100;
    }
    return sum;
}

// FUNCTION: one_assignment_over_turns
// HAS: last = now
int one_assignment_over_turns(int n) {
    int i, last, sum = 0;
    for (i = 1; i <= n; i++) {
        const int now = h[i & 3] + i * 5;
        if (i % 3 == 1) last = now;
        sum += last * 2 + now;
    }
    return sum;
}

// FUNCTION: reached_by_pointer
// HAS: x = 1
// HAS: /return .*x/
int reached_by_pointer(void) {
    int x = 1;
    set(&x);
    return x;
}

// FUNCTION: watched
// HAS: x = 1
// HAS: return x + x
int watched(void) {
    volatile int x = 1;
    return x + x;
}

// FUNCTION: stepped
// HAS: x = 1
int stepped(int n) {
    int x = 1;
    while (n--) x += x;
    return x;
}

// A string is one object: the pointer to it is not copied.
// FUNCTION: one_string
// COUNT 1: "abc
int one_string(void) {
    const char *start = "abc", *end = start;
    while (*end) end++;
    return end - start;
}

// FUNCTION: embedded
// HAS: return n + 12
int embedded(int n) {
    int x;
    return n + (x = 4) + x + x;
}

int main(void) {
    h[1] = 3;
    put_i16(chain(5));
    chosen(8);
    addresses(2);
    put_i16(g + s.b + h[2]);
    put_i16(once());
    put_i16(kept_over_turns(9));
    put_i16(one_assignment_over_turns(10));
    put_i16(reached_by_pointer());
    put_i16(watched());
    put_i16(stepped(5));
    put_i16(one_string());
    put_i16(embedded(3));
    return 0;
}
