// At level 2 what the source asks for is inlined, and nothing else.
// Definitions with a call or another use that is left are written, others are not.
// RUN: --opt_level=2 --inline_recursion_limit=4
// LEVELS: off 0 1 2 3 4
// COUNT 0: function _of_inline
// COUNT 1: function _by_word
// COUNT 1: function _deep
// COUNT 1: function _in_table
// COUNT 1: function _ping
#include <stdarg.h>
#include <stdlib.h>
#include <zrun.h>

int g, h;
static inline int by_word(int a) { return a * 3 + g; }
#pragma FUNC_ALWAYS_INLINE(by_name)
static int by_name(int a) { int i, s = 0; for (i = 0; i < a; i++) s += i * g; return s; }
#pragma FUNC_ALWAYS_INLINE(barred)
#pragma FUNC_CANNOT_INLINE(barred)
static int barred(int a) { return a + 9; }
static int plain(int a) { return a * 7; }
static int deep(int n) { return n ? n + deep(n - 1) : 0; }
static int sum(int n, ...) {
    va_list list;
    int s = 0;
    va_start(list, n);
    while (n--) s += va_arg(list, int);
    va_end(list);
    return s;
}
static int two(int a) { return sum(2, a, a + 1) + plain(a); }
static int ping(int n);
static int pong(int n) { return n > 0 ? ping(n - 1) + 1 : 0; }
static int ping(int n) { return n > 0 ? pong(n - 1) + 2 : 0; }
static inline int in_table(int a) { return a - 1; }
int (*const table[])(int) = {in_table};
static inline int of_inline(int a) { return by_word(a) + plain(a); }
static int old(a, b) int a; int b; { return a - b; }
int setjmp(long *);
void *alloca(unsigned long);
static int returns_again(int a) { static long place[8]; return setjmp(place) + a; }
static int takes(int a) { int *p = alloca(a); return p[a - 1] = a; }

// FUNCTION: asked
// COUNT 0: by_word(
// COUNT 0: by_name(
// COUNT 1: _barred(
// COUNT 1: _plain(
int asked(int x) { return by_word(x) + by_name(x) + barred(x) + plain(x); }

// FUNCTION: not_asked
// COUNT 1: _by_word(
// COUNT 1: _by_name(
int not_asked(int x) {
#pragma NOINLINE
    h = by_word(x) + by_name(x);
    return h;
}

// The next statement is meant, with the calls in its arguments, and no other.
// FUNCTION: forced
// COUNT 1: _plain(
int forced(int x) {
#pragma FORCEINLINE
    h = plain(plain(x) + 1);
    h += plain(h);
    return h;
}

// The names of types say nothing, and a statement that is taken apart is still one.
typedef float real;
typedef struct { int a; long b; } couple;
typedef int (*function)(int);
static int of_names(real f, couple p, function g) { return (int)f + p.a + g(2); }
static couple couple_of(int a) { couple p; p.a = a; p.b = a; return p; }
// FUNCTION: in_parts
// COUNT 0: _of_names(
// COUNT 0: _couple_of(
int in_parts(int n, float f) {
    int s = 0, i;
    for (i = 0; i < n; i++) {
#pragma FORCEINLINE
        s += of_names(f, couple_of(i), table[0]);
    }
    return s;
}

// Too many arguments, and a callee that counts its own.
// FUNCTION: misfits
// COUNT 1: _old(
// COUNT 1: _sum(
int misfits(int x) {
#pragma FORCEINLINE
    h = old(x, 2, 3) + sum(1, x);
    return h;
}

// A recursive function is taken in once; with the calls below it, to the limit, where the call stays.
// FUNCTION: once
// COUNT 1: _deep(
int once(int x) {
#pragma FORCEINLINE
    h = deep(x);
    return h;
}
// FUNCTION: all_below
// COUNT 1: _deep(
// COUNT 4: - 1
int all_below(int x) {
#pragma FORCEINLINE_RECURSIVE
    h = deep(x);
    return h;
}
// FUNCTION: both
// COUNT 1: /_p[io]ng\(/
int both(int x) {
#pragma FORCEINLINE_RECURSIVE
    h = ping(x);
    return h;
}

// FUNCTION: below
// COUNT 1: _sum(
// COUNT 0: _plain(
int below(int x) {
#pragma FORCEINLINE_RECURSIVE
    h = two(x);
    return h;
}
// What a function has in its frame by a call stays there.
// FUNCTION: frames
// COUNT 1: _returns_again(
// COUNT 1: _takes(
int frames(int x) {
    if (x < 100) return x;
#pragma FORCEINLINE
    h = returns_again(x) + takes(x);
    return h;
}
// FUNCTION: main
// A quotient stays behind a test that came in with a callee, also where that stands in a callee of its own.
static inline void leave_unless(int b) { if (!b) exit(0); }
static int checked(int b) { leave_unless(b); return b; }
int quotients(int n, int a, int b) {
    int i, s = 0;
    for (i = 0; i < n; i++) {
        if (i & 1) leave_unless(b);
        else s += checked(b);
        s += a / b;
    }
    return s;
}

int main(void) {
    int i;
    for (i = 0; i < 4; i++) {
        g = i * 5 + 1;
        put_i32(asked(i));
        put_i32(not_asked(i));
        put_i32(forced(i));
        put_i32(misfits(i));
        put_i32(once(i * 3));
        put_i32(all_below(i * 4));
        put_i32(both(i * 4));
        put_i32(below(i));
        put_i32(frames(i));
        put_i32(in_parts(i, i + 2.5f));
        put_i32(table[0](i) + in_table(i) + of_inline(i));
    }
    put_i32(quotients(3, 9, 2));
    put_i32(quotients(2, 9, i - 4)); // ends here
    return 0;
}
