// Shifts: constants and variables of every width, rotations, field extraction, sign extension, scaling identities.
#include <zrun.h>

static unsigned rotate16(unsigned v, int n) {
    n &= 15;
    return n ? v << n | v >> (16 - n) : v;
}

static unsigned long rotate32(unsigned long v, unsigned n) { return (v << (n & 31u)) | (v >> ((32u - n) & 31u)); }

static int extend(unsigned v, int width) {
    unsigned sign = 1u << (width - 1);
    v &= sign | (sign - 1u);
    return (int)((v ^ sign) - sign);
}

static unsigned long swap_bytes(unsigned long v) {
    return v >> 24 | (v >> 8 & 0xFF00UL) | (v & 0xFF00UL) << 8 | v << 24;
}

static unsigned field(unsigned long v, int at, int width) { return (unsigned)(v >> at & ((1UL << width) - 1UL)); }

static unsigned long deposit(unsigned long v, int at, int width, unsigned long bits) {
    unsigned long mask = ((1UL << width) - 1UL) << at;
    return (v & ~mask) | (bits << at & mask);
}

static unsigned spread(unsigned v) { /* bits of a byte to even places */
    v &= 0xFFu;
    v = (v | v << 4) & 0x0F0Fu;
    v = (v | v << 2) & 0x3333u;
    return (v | v << 1) & 0x5555u;
}

static int leading(unsigned long v) {
    int n = 0;
    if (!v) return 32;
    if (!(v & 0xFFFF0000UL)) n += 16, v <<= 16;
    if (!(v >> 24)) n += 8, v <<= 8;
    if (!(v >> 28)) n += 4, v <<= 4;
    if (!(v >> 30)) n += 2, v <<= 2;
    return n + !(v >> 31);
}

int main(void) {
    volatile unsigned long hidden = 0x89ABCDEFUL;
    volatile int minus = -1000;
    unsigned long v = hidden;
    int i;
    for (i = 0; i < 17; i += 4) put_u32(rotate16(0x8421u, i));
    for (i = 0; i <= 32; i += 8) put_u32(rotate32(v, (unsigned)i));
    for (i = 1; i <= 16; i += 3) put_i16(extend(0xA5A5u, i));
    put_u32(swap_bytes(v));
    put_u32(swap_bytes(swap_bytes(v)) ^ v);
    for (i = 0; i < 28; i += 9) put_u32(field(v, i, 4));
    for (i = 0; i < 28; i += 9) put_u32(deposit(v, i, 5, 0x15UL));
    put_u32(spread(0xF5u) | spread(0xFFu) << 1);
    for (v = 1; v; v = v << 5) put_i16(leading(v));
    put_i16(leading(0));
    put_i16(minus >> 3);
    put_i16((minus >> 3) * 8);
    put_i16(minus / 8);
    put_i16(-(-minus >> 3));
    put_i16((minus >> 2) >> 3);
    put_u32((unsigned)minus >> 2 >> 3);
    put_u32(hidden << 3 >> 3);
    put_u32(hidden >> 3 << 3);
    put_u32(hidden >> 31);
    put_i32((long)hidden >> 31);
    put_i32((long)hidden >> 16);
    put_u32((hidden >> 16) << 16 | (hidden & 0xFFFFUL));
    put_u32(~0UL >> 7 << 7);
    put_i16((int)((hidden & 0x8000UL) != 0));
    return 0;
}
