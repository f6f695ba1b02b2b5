// A call of the function itself that is its last act becomes a jump, if nobody can tell one frame from another.
// RUN: --opt_level=2
#include <zrun.h>

int depth;
int *seen;
static int next(void) { return ++depth; }

// FUNCTION: gcd
// COUNT 0: _gcd(
// COUNT 1: tail recursive call occurs here
int gcd(int a, int b) {
    if (b == 0) return a;
    return gcd(b, a % b);
}

// Three parameters read each other in a ring.
// FUNCTION: ring
// COUNT 0: _ring(
int ring(int a, int b, int c, int n) {
    if (n == 0) return a * 100 + b * 10 + c;
    return ring(b, c, a, n - 1);
}

// Two calls, in two branches; one parameter is cut down on the way in.
// FUNCTION: walk
// COUNT 0: _walk(
// COUNT 2: tail recursive call occurs here
int walk(int n, signed char s) {
    if (n > 40) return s;
    if (n & 1) return walk(n * 3 + 1, (signed char)(s + 1));
    return walk(n + 5, (signed char)(s * 2));
}

// The arguments have effects in their order.
// FUNCTION: with_effects
// COUNT 0: _with_effects(
int with_effects(int a, int b, int n) {
    if (n == 0) return a * 3 + b;
    return with_effects(b + next(), a - next(), n - 1);
}

// FUNCTION: chosen
// COUNT 0: _chosen(
// COUNT 2: tail recursive call occurs here
long chosen(int n, int sum) { return n > 9 ? chosen(n - 7, sum + 1) : n ? chosen(n - 1, sum + n) : (long)sum; }

struct list {
    int value;
    struct list* next;
};
// FUNCTION: is_member
// COUNT 0: _is_member(
int is_member(const struct list* l, int v) { return l && (l->value == v || is_member(l->next, v)); }

// FUNCTION: all_positive
// COUNT 1: _all_positive(
// COUNT 2: tail recursive call occurs here
int all_positive(const int* p, int n) {
    if (n == 0) return 1;
    if (n == 1) return all_positive(p, 2 * n - 2) != 0 && *p > 0;
    if (n == 2 && *p > 0) return all_positive(p + 1, n - 1) != 0;
    return *p > 0 && all_positive(p + 1, n - 1) != 0;
}

// What the calls return isn't what their truth is.
// FUNCTION: first_above
// COUNT 1: _first_above(
int first_above(int n, int limit) {
    if (n > limit) return n;
    return n != limit && first_above(n + 2, limit);
}

// FUNCTION: not_last
// COUNT 1: _not_last(
int not_last(int n) {
    if (n == 0) return 1;
    return n * not_last(n - 1);
}

// FUNCTION: converted
// COUNT 1: _converted(
long converted(int n) {
    if (n == 0) return 70000L;
    return (int)converted(n - 1);
}

// The frame of the caller is read by the callee.
// FUNCTION: by_address
// COUNT 1: _by_address(
int by_address(int n, const int *outer) {
    int mine = n + (outer ? *outer : 0);
    if (n == 0) return mine;
    return by_address(n - 1, &mine);
}

// FUNCTION: remembered
// COUNT 1: _remembered(
int remembered(int n) {
    int mine = n;
    if (!seen) seen = &mine;
    if (n == 0) return *seen;
    return remembered(n - 1);
}

// FUNCTION: constant_parameter
// COUNT 1: _constant_parameter(
int constant_parameter(const int n) {
    if (n < 3) return n;
    return constant_parameter(n - 3);
}

// FUNCTION: restricted
// COUNT 1: _restricted(
int restricted(int *restrict p, int *restrict q, int n) {
    *p = *q + n;
    if (n == 0) return *q;
    return restricted(q, p, n - 1);
}

// FUNCTION: more
// COUNT 1: _more(
int more(int n, ...) {
    if (n == 0) return 5;
    return more(n - 1, n, n);
}

int main(void) {
    int a[2] = {3, 4};
    put_i16(gcd(48, 18));
    put_i16(depth);
    put_i16(ring(1, 2, 3, 4));
    put_i16(walk(1, 100));
    put_i16(with_effects(5, 6, 3));
    put_i32(chosen(30, 2));
    struct list one = {1, 0}, two = {2, &one};
    put_i16(is_member(&two, 1) + 2 * is_member(&two, 2) + 4 * is_member(&two, 3));
    put_i16(all_positive(a, 2) + 2 * all_positive((int[]){1, 0}, 2) + 4 * all_positive((int[]){1, 1, 2}, 3));
    put_i16(first_above(1, 6) + 10 * first_above(2, 6));
    put_i16(not_last(5));
    put_i32(converted(2));
    put_i16(by_address(4, 0));
    put_i16(remembered(4));
    put_i16(constant_parameter(8));
    put_i16(restricted(&a[0], &a[1], 4));
    put_i16(more(3));
    return 0;
}
