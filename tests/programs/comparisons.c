// Comparisons at each width and sign, with constants at the edge of ranges, in chains, as values and in branches.
#include <zrun.h>

#define ALL(a, b)                                                                                                      \
    ((a) < (b)) | ((a) <= (b)) << 1 | ((a) > (b)) << 2 | ((a) >= (b)) << 3 | ((a) == (b)) << 4 | ((a) != (b)) << 5

static int by_int(int a, int b) { return ALL(a, b); }
static int by_unsigned(unsigned a, unsigned b) { return ALL(a, b); }
static int by_long(long a, long b) { return ALL(a, b); }
static int by_ulong(unsigned long a, unsigned long b) { return ALL(a, b); }
static int by_wide(long long a, long long b) { return ALL(a, b); }
static int by_uwide(unsigned long long a, unsigned long long b) { return ALL(a, b); }
static int mixed(int a, unsigned b) { return ALL(a, b); }
static int mixed_long(unsigned a, long b) { return ALL(a, b); }
static int mixed_ulong(int a, unsigned long b) { return ALL(a, b); }

static int edges(int x) {
    int r = 0;
    if (x <= 32767) r |= 1;
    if (x < 32767) r |= 2;
    if (x >= -32767 - 1) r |= 4;
    if (x > -32767 - 1) r |= 8;
    if (x == 32767) r |= 16;
    if (x != -32767 - 1) r |= 32;
    return r;
}

static int unsigned_edges(unsigned x) {
    int r = 0;
    if (x >= 0u) r |= 1;
    if (x > 0u) r |= 2;
    if (x < 1u) r |= 4;
    if (x <= 65535u) r |= 8;
    if (x < 65535u) r |= 16;
    if (x > 65534u) r |= 32;
    return r;
}

static int ranges(int x) {
    return (x >= 10 && x <= 20) + 2 * (x < 10 || x > 20) + 4 * ((unsigned)(x - 10) <= 10u) + 8 * (x > 5 && x < 6) +
           16 * (x > 5 || x < 6);
}

static int three_way(long a, long b) { return a < b ? -1 : a > b; }

static int sign(int x) { return (x > 0) - (x < 0); }

static int chain(int a, int b, int c) {
    if (a == b && b == c) return 0;
    if (a == b || b == c || a == c) return 1;
    if (a < b) {
        if (b < c) return 2;
        return a < c ? 3 : 4;
    }
    return a < c ? 5 : b < c ? 6 : 7;
}

static int offsets(int x) {
    return (x + 5 > 10) + 2 * (x - 3 == 4) + 4 * (10 - x < 3) + 8 * (2 * x == 14) + 16 * (-x > 0) +
           32 * ((x & 7) == 7) + 64 * (x % 2 != 0);
}

int main(void) {
    static const int values[] = {0, 1, -1, 100, 32767, -32767 - 1};
    int i, j, k;
    for (i = 0; i < 6; i++) {
        for (j = 0; j < 6; j++) {
            int a = values[i], b = values[j];
            unsigned long sum = by_int(a, b);
            sum = sum * 64 + by_unsigned((unsigned)a, (unsigned)b);
            sum = sum * 64 + by_long(a, b * 65536L);
            sum = sum * 64 + by_ulong((unsigned long)a, (unsigned long)b);
            sum = sum * 64 + by_wide(a * 4294967296LL, b);
            put_u32(sum);
            sum = by_uwide((unsigned long long)a, (unsigned long long)b);
            sum = sum * 64 + mixed(a, (unsigned)b);
            sum = sum * 64 + mixed_long((unsigned)a, b);
            sum = sum * 64 + mixed_ulong(a, (unsigned long)b);
            put_u32(sum * 64 + three_way(a, b));
        }
        put_u32((edges(values[i]) * 64 + unsigned_edges((unsigned)values[i])) * 64L + sign(values[i]));
    }
    for (i = 5; i < 25; i += 5) put_i16(ranges(i));
    put_i16(ranges(-5));
    for (i = 0; i < 3; i++)
        for (j = 0; j < 3; j++)
            for (k = 0; k < 3; k++) put_i16(chain(i, j, k));
    for (i = -1; i < 9; i++) put_i16(offsets(i));
    return 0;
}
