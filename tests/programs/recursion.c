// Recursion: mutual, nested, twice in a body, with address-taken locals.
#include <zrun.h>

static int is_even(unsigned n);
static int is_odd(unsigned n) { return n == 0 ? 0 : is_even(n - 1u); }
static int is_even(unsigned n) { return n == 0 ? 1 : is_odd(n - 1u); }

static int nested(int n) { return n > 100 ? n - 10 : nested(nested(n + 11)); }

static unsigned long moves;
static void hanoi(int n, int from, int to, int via) {
    if (n == 0) return;
    hanoi(n - 1, from, via, to);
    moves = (moves * 3UL + (unsigned long)(from * 3 + to)) & 0xFFFFFFUL;
    hanoi(n - 1, via, to, from);
}

static int chain(int n, int* upper) {
    int mine = n * n;
    if (n == 0) return *upper;
    *upper += mine & 7;
    return chain(n - 1, &mine) + *upper;
}

int main(void) {
    int start = 1;
    put_i16(is_even(77u) * 10 + is_odd(77u));
    put_i16(nested(30));
    hanoi(7, 0, 2, 1);
    put_u32(moves);
    put_i16(chain(6, &start));
    return 0;
}
