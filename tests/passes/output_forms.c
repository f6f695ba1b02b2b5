// The output scales subscripts by the operator that the code generator addresses by, and subtracts small constants.
// RUN: --opt_level=2
#include <zrun.h>

long row[4][7];
struct triple { int a, b, c; } list[5];

// FUNCTION: element
// HAS: /_row \+ PMCONV\(\(long\)i, 224\)\)? \+ PMCONV\(j, 32\)\)?.*PMCONV\(\(long\)i, 48\) - 3.*PMCONV\(k, 48\) - 3/
long element(int i, long j, long k, const struct triple* p) { return row[i][j] + p[i - 1].c + p[k - 1].c; }

// An unsigned step of a pointer is widened with zeros, so it stays; a product that is no offset stays one.
// FUNCTION: steps
// HAS: *sums = (long)(i - 3) + (long)i * 3
// HAS: *(sums + 2) = (long)(u - 2)
// HAS: *(sums + 4) = (long)(u + 32768)
// HAS: return p + 65535
int* steps(int* p, int i, unsigned u, long* sums) {
    sums[0] = i - 3 + i * 3L;
    sums[1] = u + 65534u;
    sums[2] = u + 32768u;
    return p + 65535u;
}

int main(void) {
    static int far[2];
    long sums[3];
    int i;
    for (i = 0; i < 28; i++) row[i / 7][i % 7] = i * 1000L;
    for (i = 0; i < 5; i++) list[i].c = i * 11;
    put_i32(element(3, 5, 4, list));
    put_i16(steps(far, 7, 40000u, sums) - far == 65535L);
    for (i = 0; i < 3; i++) put_i32(sums[i]);
    return 0;
}
