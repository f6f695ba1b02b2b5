// Effects that only follow one another become statements of their own, in their order.
// RUN: --opt_level=1
#include <zrun.h>

int g, h;

// FUNCTION: commas
// HAS: _g = 3
// HAS: _h = 4
// COUNT 0: /, _/
void commas(void) { g = 3, h = 4; }

// FUNCTION: header
// HAS: _h = 1
// HAS: /^L\d+:/
int header(int n) {
    int s = 0;
    for (g = 0, h = 1; g < n; g++, h *= 2) s += h;
    return s;
}

// FUNCTION: discarded
// COUNT 0: /_g [+*]/
// COUNT 1: _h
int discarded(int x) {
    g + 1;
    g* x;
    return h;
}

// No effect moves ahead of what reads its place or writes what it reads.
static int of_g(void) { return g * 10; }
// FUNCTION: behind_its_reader
// COUNT 1: of_g() + (_g = 3, _h)
int behind_its_reader(void) { return of_g() + (g = 3, h); }

// FUNCTION: behind_a_condition
// HAS: /^return .*&& .*_g = .*_h = _g/
int behind_a_condition(int x) { return (x > 5 && (g = x)) + (h = g, 3); }

// ---- What a statement does under a condition stays under it, also where the condition is all that is left of the statement.

static long long seen = 15;
static int a[4] = {1, 2, 3, 4};

// FUNCTION: arm_of_a_dead_value
// HAS: /\? .*_seen = /
int arm_of_a_dead_value(const int *p, int x, int n) {
    int y = 7;
    y = x < p[2] ? (seen = p[1], seen) : p[0] << 1;
    return ~n;
}

// FUNCTION: right_of_a_dead_and
// HAS: /&& .*_seen = /
int right_of_a_dead_and(int x, int n) {
    int y = 7;
    y = x > 5 && (seen = n) > 2;
    return n + 1;
}

// ---- Negations fold into comparisons of integers, pairs of them vanish; of floats only equality may be turned round.

// FUNCTION: ordered
// HAS: /return \w+ >= 3/
// NOT: !
int ordered(int x) { return !(x < 3); }

// FUNCTION: twice
// HAS: /return \w+ != 0/
int twice(int x) { return !!x; }

// FUNCTION: branch
// COUNT 0: /!!|! !/
// COUNT 1: if (
int branch(int x) {
    if (!!(x == 4)) return 1;
    g = x;
    return 2;
}

// FUNCTION: unordered
// COUNT 0: >=
int unordered(float x) { return !(x < 3.0F); }

// FUNCTION: equal
// COUNT 1: !=
int equal(float x) { return !(x == 3.0F); }

// A test of the value before a step asks the one behind it; where the moved limit would wrap, and of what wraps itself,
// it cannot.
// FUNCTION: counted_down
// HAS: n -= 1
// HAS: /n < 0/
// HAS: m += 1
// HAS: /m >= 13/
// HAS: k += 1
// HAS: /k - 1 /
// HAS: u -= 1
// HAS: /u \+ 1 /
int counted_down(int n, int m, int k, unsigned u) {
    int s = 0;
    while (n-- > 0) s += g;
    while (m++ < 12) s -= h;
    if (k++ < 32767) s += k;
    if (u-- > 5) s += 3;
    return s + k;
}

int main(void) {
    commas();
    put_i16(g + h);
    put_i16(header(5));
    put_i16(discarded(1));
    put_i16(behind_its_reader());
    put_i16(behind_a_condition(9) * 10 + h);
    put_i16(arm_of_a_dead_value(a, 9, 5));
    put_i64(seen);
    put_i16(right_of_a_dead_and(1, 30));
    put_i64(seen);
    put_i16(right_of_a_dead_and(6, 31));
    put_i64(seen);
    put_i16(arm_of_a_dead_value(a, 1, 5));
    put_i64(seen);
    volatile float zero = 0.0F;
    put_i16(ordered(3));
    put_i16(twice(8));
    put_i16(branch(4) * 10 + branch(5));
    put_i16(unordered(2.0F) * 100 + unordered(3.0F) * 10 + unordered(zero / zero));
    put_i16(equal(3.0F) * 10 + equal(zero / zero));
    for (int i = -1; i < 2; i++) put_i16(counted_down(i, i + 11, 32767 - 2 * (i & 1), i + 5));
    return 0;
}
