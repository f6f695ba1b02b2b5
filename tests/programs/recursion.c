// Recursion: tail, mutual, nested, through pointers, with address-taken locals, and by structures.
#include <zrun.h>

static int tail_sum(int n, int sum) {
    if (n <= 0) return sum;
    return tail_sum(n - 1, sum + n % 10);
}

static int is_even(unsigned n);
static int is_odd(unsigned n) { return n == 0 ? 0 : is_even(n - 1u); }
static int is_even(unsigned n) { return n == 0 ? 1 : is_odd(n - 1u); }

static int rotating(int a, int b, int c, int n) {
    if (!n) return a * 100 + b * 10 + c;
    return rotating(b, c, a, n - 1);
}

static int nested(int n) { return n > 100 ? n - 10 : nested(nested(n + 11)); }

static int female(int n);
static int male(int n) { return n == 0 ? 0 : n - female(male(n - 1)); }
static int female(int n) { return n == 0 ? 1 : n - male(female(n - 1)); }

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

static int permutations(int* a, int k, int n, long* d) {
    int i, count = 0;
    if (k == n) {
        *d = (*d * 5 + a[0] * 2 + a[n - 1]) % 30011L;
        return 1;
    }
    for (i = k; i < n; i++) {
        int t = a[k];
        a[k] = a[i];
        a[i] = t;
        count += permutations(a, k + 1, n, d);
        a[i] = a[k];
        a[k] = t;
    }
    return count;
}

static int queens(int row, unsigned columns, unsigned left, unsigned right) {
    unsigned free_places = ~(columns | left | right) & 0x3Fu;
    int n = 0;
    if (row == 6) return 1;
    while (free_places) {
        unsigned bit = free_places & (0u - free_places);
        free_places ^= bit;
        n += queens(row + 1, columns | bit, (left | bit) << 1, (right | bit) >> 1);
    }
    return n;
}

static long fibonacci(int n) { return n < 2 ? n : fibonacci(n - 1) + fibonacci(n - 2); }

static int (*step)(int, int);
static int up(int n, int d) { return n >= 50 ? n : step(n + d, d + 1); }

int main(void) {
    int a[5] = {1, 2, 3, 4, 5}, start = 1;
    long d = 0;
    put_i16(tail_sum(300, 0));
    put_i16(tail_sum(-1, 9));
    put_i16(is_even(77u) * 10 + is_odd(77u));
    put_i16(rotating(1, 2, 3, 0));
    put_i16(rotating(1, 2, 3, 4));
    put_i16(nested(30));
    put_i16(male(12) * 100 + female(12));
    hanoi(7, 0, 2, 1);
    put_u32(moves);
    put_i16(chain(6, &start));
    put_i16(permutations(a, 0, 5, &d));
    put_i32(d);
    put_i16(a[0] * 10 + a[4]);
    put_i16(queens(0, 0, 0, 0));
    put_i32(fibonacci(17));
    step = up;
    put_i16(up(0, 1));
    return 0;
}
