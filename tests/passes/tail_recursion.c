// A call of the function itself that is its last act becomes a jump, if nobody can tell one frame from another.
// RUN: --opt_level=2
#include <zrun.h>

int depth;
volatile int port;
int *seen;
static int next(void) { return ++depth; }

// FUNCTION: gcd
// COUNT 0: _gcd(
// COUNT 1: tail recursive call occurs here
int gcd(int a, int b) {
    if (b == 0) return a;
    return gcd(b, a % b);
}

// FUNCTION: sum_to
// COUNT 0: _sum_to(
long sum_to(int n, long sum) {
    if (n <= 0) return sum;
    return sum_to(n - 1, sum + n);
}

// FUNCTION: count
// COUNT 0: _count(
void count(int n) {
    depth++;
    if (n) count(n - 1);
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

// FUNCTION: no_parameters
// COUNT 0: _no_parameters(
void no_parameters(void) {
    if (port++ < 5) no_parameters();
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
    put_i32(sum_to(200, 0));
    count(20);
    put_i16(depth);
    put_i16(ring(1, 2, 3, 4));
    put_i16(walk(1, 100));
    put_i16(with_effects(5, 6, 3));
    no_parameters();
    put_i16(port);
    put_i16(not_last(5));
    put_i32(converted(2));
    put_i16(by_address(4, 0));
    put_i16(remembered(4));
    put_i16(constant_parameter(8));
    put_i16(restricted(&a[0], &a[1], 4));
    put_i16(more(3));
    return 0;
}
