// Calls of the library that are an operator, a number or two assignments; not what the unit defines itself, or what is
// larger.
// RUN: --opt_level=2
#include <stdlib.h>
#include <string.h>
#include <zrun.h>

int pair[2], triple[3] = {7, 8, 9}, twins[2];
long wide, wides[2] = {3, 4};
volatile int port;

// FUNCTION: absolute
// HAS: return (long)ABS(x) + ABS(y)
long absolute(int x, long y) { return abs(x) + labs(y); }

// FUNCTION: lengths
// HAS: /strlen\(.*\+ i\)\) \+ 6/
// COUNT 1: strlen
unsigned long lengths(int i) { return strlen("hello") + strlen("a\0b") + strlen("hello" + i) + strlen("x" + 1); }

// A character that is read is a number; one whose address is taken, or that is picked at run time, is in memory.
// FUNCTION: characters
// COUNT 0: 'e'
// HAS: return *("hello\000" + i) + 101
int characters(int i) { return "hello"[1] + "hello"[i]; }

// FUNCTION: address
// HAS: return (const int *)("hello\000" + 1)
const char *address(void) { return &"hello"[1]; }

// FUNCTION: filled
// NOT: memset
void filled(void) {
    memset(pair, 5, 2);
    memset(&wide, 0, sizeof wide);
    memset(wides, 0, 2);
}

// FUNCTION: not_filled
// COUNT 4: memset
void not_filled(int n) {
    memset(triple, 0, 3);
    memset(&wide, 1, sizeof wide);
    memset((void *)&port, 0, 1);
    memset(pair, n, 2);
}

// FUNCTION: copied
// NOT: memcpy
int copied(void) {
    int a[2];
    memcpy(a, triple, sizeof a);
    return *(int *)memcpy(twins, a, 1) + a[1];
}

// FUNCTION: not_copied
// COUNT 2: mem
void not_copied(int *p) {
    memcpy(p, triple, 2);
    memmove(triple + 1, triple, 2);
}


long long llabs(long long x) { return x + 1; }

// FUNCTION: of_the_unit
// COUNT 0: ABS
long long of_the_unit(long long x) { return llabs(x); }

int main(void) {
    put_i64(of_the_unit(-7));
    put_i32(absolute(-5, -70000L));
    put_i32((long)lengths(2));
    put_i16(characters(4) + *address());
    filled();
    put_i32(pair[0] * 10 + pair[1] + wide + wides[0] * 3 + wides[1]);
    put_i16(copied() + twins[0]);
    not_copied(pair);
    put_i16(pair[1] + triple[2]);
    not_filled(3);
    put_i32(pair[0] + triple[2] + wide);
    return 0;
}
