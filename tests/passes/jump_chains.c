// Jumps to jumps go to the end of the chain, a jump to the next statement goes, and labels that nothing names go too.
// RUN: --opt_level=1
#include <zrun.h>

int g;

// FUNCTION: chain
// COUNT 1: goto
// COUNT 1: /^L\d+:/
// HAS: return 0
int chain(int x) {
    if (x > 3) goto first;
    g = x;
    return 0;
first:
    goto second;
second:
    goto third;
third:
    return 1;
}

// FUNCTION: next_statement
// COUNT 0: goto
// COUNT 0: /^L\d+:/
int next_statement(int x) {
    goto a;
a:
    x = x + 1;
    goto b;
b:
    return x;
}

int main(void) {
    put_i16(chain(3));
    put_i16(chain(4));
    put_i16(next_statement(5));
    return 0;
}
