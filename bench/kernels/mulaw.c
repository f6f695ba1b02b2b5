// Companding of telephone lines, both laws: every code decodes and encodes to itself.
#include <zrun.h>

static unsigned mu_encode(int linear) {
    int sign = linear < 0, exponent = 7, mask;
    if (sign) linear = linear == -32767 - 1 ? 32767 : -linear;
    linear >>= 2;
    linear = (linear > 8158 ? 8158 : linear) + 33;
    for (mask = 0x1000; exponent > 0 && !(linear & mask); mask >>= 1) exponent--;
    return ~(unsigned)((sign ? 0x80 : 0) | exponent << 4 | ((linear >> (exponent + 1)) & 15)) & 0xFFu;
}

static int mu_decode(unsigned code) {
    int v;
    code = ~code & 0xFFu;
    v = (int)((((code & 15u) << 1) + 33u) << (code >> 4 & 7u)) - 33;
    v = (int)((unsigned)v << 2);
    return code & 0x80u ? -v : v;
}

static unsigned a_encode(int linear) {
    unsigned sign = 0x80, exponent = 0, v;
    if (linear < 0) {
        sign = 0;
        linear = ~linear;
    }
    v = (unsigned)linear >> 4;
    if (v > 31) {
        unsigned t = v >> 5;
        do exponent++;
        while (t >>= 1);
        v >>= exponent - 1;
        v &= 15u;
    } else if (v > 15) {
        exponent = 1;
        v &= 15u;
    }
    return (sign | exponent << 4 | v) ^ 0x55u;
}

static int a_decode(unsigned code) {
    unsigned seg;
    int v;
    code ^= 0x55u;
    v = (int)((code & 15u) << 4) + 8;
    seg = code >> 4 & 7u;
    switch (seg) {
    case 0: break;
    case 1: v += 0x100; break;
    default: v = (v + 0x100) << (seg - 1u); break;
    }
    return code & 0x80u ? v : -v;
}

int main(void) {
    static const int probes[] = {0, 1, -1, 7, 8, 100, -100, 1000, 5000, -5000, 20000, 32767, -32767 - 1};
    unsigned code;
    unsigned i;
    int bad = 0;
    long sum = 0;
    for (code = 0; code < 256; code++) {
        if (mu_encode(mu_decode(code)) != code && code != 0x7Fu) bad++;
        sum += (long)mu_decode(code) * (long)(code & 7u);
    }
    put_i16(bad);
    put_i32(sum);
    bad = 0;
    for (sum = code = 0; code < 256; code++) {
        if (a_encode(a_decode(code)) != code) bad++;
        sum += (long)a_decode(code) * (code % 5u);
    }
    put_i16(bad);
    put_i32(sum);
    for (i = 0; i < sizeof probes / sizeof *probes; i++) {
        put_i16((int)mu_encode(probes[i]));
        put_i16(mu_decode(mu_encode(probes[i])));
        put_i16((int)a_encode(probes[i]));
        put_i16(a_decode(a_encode(probes[i])));
    }
    return 0;
}
