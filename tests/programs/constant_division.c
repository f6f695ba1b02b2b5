// Division and remainder by constants, each against the same by a variable, at 16 and 32 bits, both signs.
#include <zrun.h>

static int bad;

static void same(long got, long want) { bad += got != want; }
static void same_u(unsigned long got, unsigned long want) { bad += got != want; }

#define S16(D)                                                                                                         \
    {                                                                                                                  \
        int d = divisor(D);                                                                                            \
        same(x / (D), x / d);                                                                                          \
        same(x % (D), x % d);                                                                                          \
        sum += x / (D) + x % (D);                                                                                      \
    }
#define U16(D)                                                                                                         \
    {                                                                                                                  \
        unsigned d = (unsigned)divisor((int)(D));                                                                      \
        same_u(u / (D), u / d);                                                                                        \
        same_u(u % (D), u % d);                                                                                        \
        usum += u / (D) ^ u % (D);                                                                                     \
    }
#define S32(D)                                                                                                         \
    {                                                                                                                  \
        long d = divisor_l(D);                                                                                         \
        same(y / (D), y / d);                                                                                          \
        same(y % (D), y % d);                                                                                          \
        sum ^= y / (D)-y % (D);                                                                                        \
    }
#define U32(D)                                                                                                         \
    {                                                                                                                  \
        unsigned long d = (unsigned long)divisor_l((long)(D));                                                         \
        same_u(v / (D), v / d);                                                                                        \
        same_u(v % (D), v % d);                                                                                        \
        usum ^= v / (D) + v % (D);                                                                                     \
    }

static volatile int hidden;
static int divisor(int d) { return d + hidden; }
static long divisor_l(long d) { return d + hidden; }

static long signed_16(int x) {
    long sum = 0;
    S16(1)
    S16(2) S16(3) S16(4) S16(5) S16(7) S16(8) S16(10) S16(100) S16(1000) S16(16384) S16(32767) S16(-2) S16(-3) S16(-7)
        S16(-16) S16(-10000) S16(-32767) return sum;
}

static unsigned long unsigned_16(unsigned u) {
    unsigned long usum = 0;
    U16(1u) U16(2u) U16(3u) U16(6u) U16(7u) U16(10u) U16(64u) U16(641u) U16(32768u) U16(65535u) return usum;
}

static long signed_32(long y) {
    long sum = 0;
    S32(1L)
    S32(2L) S32(3L) S32(5L) S32(7L) S32(9L) S32(10L) S32(4096L) S32(86400L) S32(1000000007L) S32(2147483647L) S32(-2L)
        S32(-3L) S32(-10L) S32(-65536L) S32(-2147483647L) return sum;
}

static unsigned long unsigned_32(unsigned long v) {
    unsigned long usum = 0;
    U32(1UL) U32(3UL) U32(7UL) U32(10UL) U32(127UL) U32(1000UL) U32(65536UL) U32(2147483647UL) return usum;
}

static int power_of_two_tests(int x) {
    return (x % 2 == 1) + 2 * (x % 2 == -1) + 4 * (x % 4 == 0) + 8 * (x / 8 == 0) + 16 * (x % 16 > 0) +
           32 * ((x & 15) == x % 16);
}

int main(void) {
    static const int small[] = {0, 1, -1, 6, -6, 9, -9, 10, 99, 1000, -1001, 32766, 32767, -32767, -32767 - 1};
    static const long large[] = {0L,     1L,          -1L,         9L,          -10L,         65535L,          -65536L,
                                 86399L, 1000000006L, 2147483646L, 2147483647L, -2147483647L, -2147483647L - 1};
    unsigned i;
    for (i = 0; i < sizeof small / sizeof small[0]; i++) {
        put_i32(signed_16(small[i]));
        put_u32(unsigned_16((unsigned)small[i]));
        put_i16(power_of_two_tests(small[i]));
    }
    for (i = 0; i < sizeof large / sizeof large[0]; i++) {
        put_i32(signed_32(large[i]));
        put_u32(unsigned_32((unsigned long)large[i]));
    }
    put_i16(bad);
    return 0;
}
