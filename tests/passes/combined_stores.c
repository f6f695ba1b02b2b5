// Two assignments in a row to one object in memory become one, unless something could see the first.
// RUN: --opt_level=1
#include <zrun.h>

int g, h, *gp = &g;
unsigned u;
long wide;
float real;
struct pair {
    int a, b;
    int field : 5;
} s;

// FUNCTION: read_between
// HAS: _g = n * 2 + 1
void read_between(int n) {
    g = n;
    g = g * 2 + 1;
}

// FUNCTION: steps
// HAS: _g += 7
// HAS: _u += (unsigned int)n + 5
// HAS: _wide = (_wide + (long)n) * 3
void steps(int n) {
    g += 3;
    g += 4;
    u += (unsigned)n;
    u += 5;
    wide += n;
    wide *= 3;
}

// FUNCTION: temporary
// COUNT 1: _g =
// HAS: /^\$O\$T\d+ = n \* 5/
void temporary(int n) {
    g = n * 5;
    g = g * g;
}

// What is added may overflow, or round, where no step of the sum does.
// FUNCTION: sums_that_overflow_alone
// HAS: _g = _g + n + m
// HAS: _wide = _wide + (long)n + (long)m
// HAS: /^_real = _real \+ \S+ \+ \S+$/
void sums_that_overflow_alone(int n, int m) {
    g += n;
    g += m;
    wide += n;
    wide += m;
    real += 0.1f;
    real += 0.2f;
}

// FUNCTION: seen_by_pointer
// HAS: _g = 1
// HAS: _g = *_gp + 1
void seen_by_pointer(void) {
    g = 1;
    g = *gp + 1;
}

// Of a double that is no wider than a float the one access tells the declared type, the other does not.
// FUNCTION: seen_as_double
// HAS: *($O$N0 + 14) = x
// HAS: *($O$N0 + 14) = *(a + PMCONV((long)(i * 3), 32) + 2) * 0.5
static double reals[16];
void seen_as_double(const double* a, int i, long l, float x) {
    reals[l + 7] = x;
    reals[l + 7] = a[i * 3 + 1] * 0.5;
}

// FUNCTION: through_a_pointer
// COUNT 1: *_gp =
// HAS: *_gp = 4
void through_a_pointer(void) {
    *gp = 3;
    *gp = 4;
}

// The first store may change where the second goes.
struct node {
    struct node* next;
    int value;
} n1, n2, *head = &n1;

// FUNCTION: moved_target
// COUNT 2: next =
void moved_target(void) {
    head->next->next = &n2;
    head->next->next = &n1;
}

// FUNCTION: fields
// HAS: *((unsigned int *)&_s + 2) = *((unsigned int *)&_s + 2) & 65504 | 2
// NOT: _s
void fields(void) {
    s.field = 1;
    s.field = 2;
}

static int change(void) { return g++; }
// FUNCTION: calls_stay
// HAS: _g = 1
// HAS: _g = _change()
void calls_stay(void) {
    g = 1;
    g = change();
}

// The copies of parameters stay, on whatever paths they hold.
// FUNCTION: one_parameter
// HAS: a = a
int one_parameter(int a) {
    if (g > 3) g = g * a, h = 1;
    else h = 2;
    return a + 1;
}

int main(void) {
    read_between(4);
    put_i16(g);
    steps(9);
    put_i16(g);
    put_i32(wide);
    put_i16(u);
    temporary(6);
    put_i16(g);
    sums_that_overflow_alone(-20000, 30000);
    put_i16(g);
    put_i32(wide);
    put_i16(real * 10);
    seen_by_pointer();
    put_i16(g);
    seen_as_double(reals, 2, 0, 40);
    put_i16(reals[7]);
    through_a_pointer();
    put_i16(g);
    n1.next = &n1;
    n2.next = &n2;
    moved_target();
    put_i16(n1.next == &n2);
    put_i16(n2.next == &n1);
    fields();
    put_i16(s.field);
    calls_stay();
    put_i16(g);
    return 0;
}
