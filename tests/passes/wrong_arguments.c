// Calls that do not fit their functions, and functions that are entered otherwise than by name: all parameters stay, and
// nothing ends the optimizer. What is wrong is never executed.
// RUN: --opt_level=3
// LEVELS: 1 2 4
#include <zrun.h>

static volatile int never, one = 1;
static int hits;

// FUNCTION: two
// COUNT 2: class 17
#pragma FUNC_CANNOT_INLINE(two)
static int two();
static int calls_two(int n) { return never ? two(n) + two() + two(n, 1, 2) : two(7, 3); }
static int two(int a, int b) { return a * 10 + b; }

// FUNCTION: down
// COUNT 2: class 17
#pragma FUNC_CANNOT_INLINE(down)
static int down();
static int down(n, m) int n; int m; { return n <= 0 ? m : never ? down(n) : down(n - 1, m); }

// FUNCTION: ping
// COUNT 2: class 17
// FUNCTION: pong
// COUNT 2: class 17
#pragma FUNC_CANNOT_INLINE(ping)
#pragma FUNC_CANNOT_INLINE(pong)
static int pong();
static int ping(n, k) int n, k; { return n <= 0 ? k : never ? pong(n, k, 9) : pong(n - 1, k); }
static int pong(n, k) int n, k; { return n <= 0 ? -k : never ? ping(1, 2) : ping(n - 1, k); }

// Another size.
// FUNCTION: wide
// COUNT 1: class 17
#pragma FUNC_CANNOT_INLINE(wide)
static long wide();
static long calls_wide(void) { return never ? wide(1) : wide(70000L); }
static long wide(long n) { return n + 1; }

// Through a pointer to another type of function.
// FUNCTION: cast
// COUNT 1: class 17
#pragma FUNC_CANNOT_INLINE(cast)
static int cast(int n) { return n * 3; }
static int calls_cast(void) {
    int (*f)(int, int) = (int (*)(int, int))cast;
    return never ? f(1, 2) : cast(5) + cast(5);
}

// Entered from a table, by who is given its address, by an interrupt; another definition may take its place.
// FUNCTION: from_table
// COUNT 1: class 17
static int from_table(int n) { return n + 4; }
static int (*const table[])(int) = {from_table};
// FUNCTION: by_callback
// COUNT 1: class 17
static int by_callback(int n) { return n * n; }
#pragma FUNC_CANNOT_INLINE(apply)
static int apply(int (*f)(int), int n) { return f(n) + (f == by_callback); }
// FUNCTION: may_be_replaced
// COUNT 1: class 17
#pragma WEAK(may_be_replaced)
#pragma FUNC_CANNOT_INLINE(may_be_replaced)
int may_be_replaced(int n) { return n - 1; }

// One value as a long: of -1 and 65535u there are two; of -1 and -1L one.
// FUNCTION: converted
// COUNT 1: class 17
#pragma FUNC_CANNOT_INLINE(converted)
static long converted(long n) { return n / 2; }
// FUNCTION: same
// COUNT 0: class 17
#pragma FUNC_CANNOT_INLINE(same)
static long same(long n) { return n * 3 + hits; }

int main(void) {
    put_i16(calls_two(4)); put_i16(down(4, 3)); put_i16(ping(5, 3)); put_i32(calls_wide()); put_i16(calls_cast());
    put_i16(from_table(2) + table[0](one)); put_i16(by_callback(3) + apply(by_callback, one + 8));
    put_i16(may_be_replaced(4));
    put_i32(converted(-1) + converted(65535u)); put_i32(same(-1) + same(-1L));
    return 0;
}
