// Calls of small functions, and of functions with one call, become the function's body; a definition without a call that
// is left is not written.
// RUN: --opt_level=3
// LEVELS: off 0 1 2 3 4
#include <stdlib.h>
#include <zrun.h>

int g = 5, h, runs;
volatile int port;
int (*through)(void), (*pick)(int, int);

// COUNT 0: function _s_
// A parameter that is written through its address is no constant.
static int s_own_address(int a) { int *p = &a; *p = 7; return a; }

// The variable is one, whoever asks.
static int counter(void) { static int n; return ++n; }

// Each argument is evaluated once, and ahead of the body.
static int s_unused_argument(int a, int b) { return b + 1; }
static int moves_on(void) { return g += 50; }
static int second(int a, int b) { return a ? b : a; }
static int effect(void) { return ++runs; }
static int s_twice(int a) { return a * a + a; }
static int s_sees_value(int a) { g = 100; return a + g; }
static int s_narrow(signed char c, unsigned u) { return c + (int)(u >> 12); }

// The result has the type of the function, then that of its use.
static int s_int(int a) { return a * 300; }
static long s_long(long a) { return a * 70000; }
static signed char s_char(int a) { return (signed char)a; }
static int s_no_value(int a) { if (a > 0) return 3; g = a; }
static void s_void(int a) { g += a; }
static void s_void_too(int a) { g += a; }

struct pair { int a; long b; };
static struct pair s_pair(int a) { struct pair p; p.a = a; p.b = a * 3L; return p; }
static int s_by_value(struct pair p) { p.a += 10; return p.a; }
static struct pair shared = {1, 2};
static int s_reads_copy(struct pair p) { shared.a = 50; return p.a; }

// In the order of &&, || and ?:.
static int s_marks(int a) { runs += a; return runs & 1; }

// Set anew in each iteration.
static int s_array(int i) { int t[3] = {0}; t[i] += i; return t[0] + t[1] + t[2]; }
static int s_const(int x) { const int k = x * 3; const int *p = &k; return *p + k; }
static int s_const_array(int x) { const int t[2] = {x, x + 1}; return t[x & 1]; }
static int s_const_pair(int x) { const struct pair p = {x, 3}; const struct pair *q = &p; return q->a; }
static int looping(int n) { int s = 0; while (n > 0) { s += n; if (s > 50) return s; n--; } return -s; }

// The body begins with its loop, in a loop whose count is known.
static int *cursor;
static void s_skip(void) { do { g += *cursor++; } while (*cursor); }
// FUNCTION: counted
// COUNT 0: _s_
static int data[] = {1, 2, 0, 3, 4, 5, 0, 6, 0, 0};
void counted(int n) {
    cursor = data;
#pragma MUST_ITERATE(3, 3)
    do { s_skip(); cursor++; } while (--n);
}
static int s_more(int n) { int left = n; while (left > 2) left -= 2; return left && g-- > 0; }
int counted_by_test(int n) {
    int k = 0;
    g = 4;
#pragma MUST_ITERATE(4, 4)
    while (s_more(n)) k += g;
    return k;
}

// A function that is no function's equal: variable arguments, its address taken, no return.
// FUNCTION: varying
static int varying(int n, ...) { return n; }
// FUNCTION: pointed_to
static int pointed_to(int a) { return a + 2; }
static int s_forever(int a) { while (a) port = a; return 3; }
static int ends(int a) { if (a) return 1; exit(0); }

static int s_recursive_leaf(int n) { return n + 1; }
// FUNCTION: even
static int odd(int n);
static int even(int n) { return n == 0 ? 1 : odd(n - 1); }
static int odd(int n) { return n == 0 ? 0 : even(s_recursive_leaf(n) - 2); }
static int old_style(c, f) signed char c; float f; { return c + (int)f; }

// FUNCTION: main
// COUNT 0: _s_
// COUNT 0: _pointed_to(
int main(void) {
    int x = 2, i;
    long l;
    int (*f)(int) = pointed_to;
    struct pair p;
    put_i32(s_own_address(3));
    through = counter;
    counter(), through();
    put_i32(counter() * 10);
    put_i32(s_unused_argument(effect(), 1));
    put_i32(runs);
    put_i32(s_twice(effect()));
    put_i32(s_sees_value(g));
    put_i32(s_narrow((signed char)(x * 150), (unsigned)(x - 4)));
    l = s_int(x * 50);
    put_i32(l);
    put_i32(s_long(x) + s_char(x + 383));
    x = s_int(x);
    put_i32(x);
    put_i32(s_no_value(1));
    s_no_value(-2);
    port = s_int(3);
    put_i32(port + g);
    s_void(s_int(s_char(3)) + s_int(s_char(4)));
    put_i32(g);
    p = s_pair(4);
    put_i32(s_by_value(p) + p.a);
    put_i32(s_pair(6).a + (int)s_pair(7).b);
    p = x > 3 ? s_pair(1) : s_pair(2);
    put_i32(s_by_value(s_pair(p.a)));
    put_i32((x < 3 ? s_pair(11) : s_pair(12)).a);
    put_i32(s_reads_copy(shared));
    runs = 0;
    put_i32(x > 9999 && s_marks(1));
    put_i32(x < 9999 || s_marks(10));
    put_i32(x < 9999 ? 5 : s_marks(100));
    put_i32((x > 9999 && s_marks(1)) + (x == 600 ? s_marks(3) : 0) + 2);
    x > 9999 ? s_void_too(1) : s_void_too(2);
    put_i32((s_void_too(7), g) + (x++, s_int(x)));
    put_i32((effect(), effect(), s_marks(0)));
    through = moves_on, pick = second;
    put_i32(pick(1, (through(), s_int(g))));
    put_i32(pick(1, (through(), x && s_int(g) > 99)));
    put_i32(runs);
    if (s_marks(2) && s_marks(4)) put_i32(1);
    switch (s_marks(2) + s_marks(8)) {
    case 0: put_i32(20); break;
    case 2: put_i32(21); break;
    default: put_i32(22);
    }
    for (i = 0; i < 3; i++) {
        put_i32(s_array(i));
        put_i32(s_const(i) + s_const_array(i) * 100 + s_const_pair(i) * 1000);
        put_i32(looping(i * 8));
    }
    while (looping(i) < 0) put_i32(i++);
    counted(3);
    put_i32(g);
    put_i32(counted_by_test(3));
    put_i32(varying(3, 4) + f(3) + pointed_to(5));
    put_i32(even(7) + even(8) * 2);
    put_i32(old_style(x, 2.5));
    put_i32(s_forever(0) + ends(1));
    ends(0);
    put_i32(99);
    return 0;
}
