// Functions and their pointers.
// Prints: 27 -7 25 1 6 0 144 234 16 -3 36
#include <zrun.h>
typedef int (*op)(int);
enum color { RED, GREEN = 5, BLUE };
static int sq(int x) { return x * x; }
static int neg(int x) { return -x; }
int apply(int (*g)(int), int v) { return g(v) + (*g)(v) + (**g)(v); }
op pick(int k) { return k ? sq : neg; }
int (*choose(int k))(int) { return k > 1 ? pick(1) : k ? neg : 0; }
enum color next(enum color c) {
    switch (c) {
    case RED: return GREEN;
    case GREEN: return BLUE;
    default: return RED;
    }
}
int fib(int n) { return n < 2 ? n : fib(n - 1) + fib(n - 2); }
void each(int* v, int n, void (*f)(int*)) {
    while (n--) f(v++);
}
void bump(int* p) { ++*p; }
static const struct {
    char c;
    op f;
} table[] = {{'s', sq}, {'n', neg}};
int main(void) {
    int v[3] = {1, 2, 3}, i;
    put_i16(apply(sq, 3));
    put_i16(pick(0)(7));
    put_i16(choose(2)(5));
    put_i16(choose(0) == 0);
    put_i16(next(next(RED)));
    put_i16(next(BLUE));
    put_i16(fib(12));
    each(v, 3, bump);
    put_i16(v[0] * 100 + v[1] * 10 + v[2]);
    for (i = 0; i < 2; i++) put_i16(table[i].f(4) + (table[i].c == 'n'));
    put_i16((i ? sq : neg)(6));
    return 0;
}
