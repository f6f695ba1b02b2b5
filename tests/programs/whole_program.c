// Two files as one unit, whose functions and objects nothing outside uses: called across the files, by pointer alone,
// by the library, by an interrupt, or never.
// parse: parts/whole_program_2.c
// optimize: --call_assumptions=0
// optimize: --call_assumptions=1
// optimize: --call_assumptions=2
// optimize: --call_assumptions=3
// no crosscheck
#include "parts/whole_program.h"
#include <stdlib.h>

int never_written = 11;
int written_there;
const int table[4] = {3, 1, 4, 1};
static int hidden = 100; // another of this name is in the other file

int never_called(int v) { return v * table[1]; }
int same_argument(int v, int scale) { return v * scale + hidden; }

#pragma INTERRUPT(tick)
void tick(void) { written_there += 1000; }

static int by_size(const void* a, const void* b) {
    const int x = *(const int*)a, y = *(const int*)b;
    return x < y ? -1 : x > y;
}

static long twice(long v) { return 2 * v; }
static long thrice(long v) { return 3 * v; }
static long (*const steps[])(long) = {twice, thrice, negated};

int main(void) {
    int values[] = {5, -3, 9, 0, never_written}, i;
    qsort(values, 5, sizeof values[0], by_size);
    for (i = 0; i < 5; i++) put_i16(values[i]);
    for (i = 0; i < 3; i++) put_i32(steps[i](70000L + i));
    put_i16(written_there);
    write_there(7);
    put_i16(written_there);
    hidden += 5;
    put_i16(same_argument(written_there, 4));
    put_i16(call_back(same_argument));
    put_i16(other_hidden());
    set_handler(&i);
    write_there(1);
    put_i16(i);
    put_i16(deep(30));
    put_i16(sum_table());
    put_i16(never_written);
    return 0;
}
