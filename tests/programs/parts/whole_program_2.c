#include "whole_program.h"

static int hidden = -1;
static int *handler, calls;

long negated(long v) { return -v; }

void write_there(int v) {
    written_there = v;
    calls++;
    if (handler) *handler = v + calls; // the caller's own variable
}

int call_back(int (*f)(int, int)) { return f(never_written, 4); }

int other_hidden(void) { return hidden--; }

void set_handler(int* where) { handler = where; }

static int odd(int n);
static int even(int n) { return n == 0 ? 1 : odd(n - 1); }
static int odd(int n) { return n == 0 ? 0 : even(n - 1); }
int deep(int n) { return even(n) * 10 + odd(n); }

int sum_table(void) {
    int i, s = 0;
    for (i = 0; i < 4; i++) s += table[i] * never_written;
    return s;
}
