// Error-correcting codes: Hamming (7,4) and (15,11), parity rows, and Reed-Solomon syndromes over 16 elements.
#include <zrun.h>

static unsigned char power[32], logarithm[16];

static unsigned encode74(unsigned d) {
    unsigned d1 = d & 1u, d2 = d >> 1 & 1u, d3 = d >> 2 & 1u, d4 = d >> 3 & 1u;
    return (d1 ^ d2 ^ d4) | (d1 ^ d3 ^ d4) << 1 | d1 << 2 | (d2 ^ d3 ^ d4) << 3 | d2 << 4 | d3 << 5 | d4 << 6;
}

static int syndrome(unsigned word, int n) {
    int s = 0, i;
    for (i = 1; i <= n; i++)
        if (word >> (i - 1) & 1u) s ^= i;
    return s;
}

static unsigned decode74(unsigned w) {
    int s = syndrome(w, 7);
    if (s) w ^= 1u << (s - 1);
    return (w >> 2 & 1u) | (w >> 4 & 1u) << 1 | (w >> 5 & 1u) << 2 | (w >> 6 & 1u) << 3;
}

static unsigned encode15(unsigned d) {
    unsigned w = 0;
    int i, k = 0, s;
    for (i = 1; i <= 15; i++) {
        if ((i & (i - 1)) == 0) continue;
        w |= (d >> k++ & 1u) << (i - 1);
    }
    s = syndrome(w, 15);
    for (i = 0; i < 4; i++)
        if (s >> i & 1) w |= 1u << ((1 << i) - 1);
    return w;
}

static void make_field(void) {
    unsigned v = 1;
    int i;
    for (i = 0; i < 15; i++) {
        power[i] = power[i + 15] = (unsigned char)v;
        logarithm[v] = (unsigned char)i;
        v <<= 1;
        if (v & 16u) v ^= 19u;
    }
}

static unsigned multiply(unsigned a, unsigned b) { return a && b ? power[logarithm[a] + logarithm[b]] : 0u; }
static unsigned divide(unsigned a, unsigned b) { return a ? power[logarithm[a] + 15 - logarithm[b]] : 0u; }

static unsigned evaluate(const unsigned char* word, int n, unsigned x) {
    unsigned r = 0;
    while (n-- > 0) r = multiply(r, x) ^ word[n];
    return r;
}

static void encode_rs(unsigned char* word) {     /* two checks in word[0..1], eleven symbols above */
    static const unsigned generator[2] = {8, 6}; /* (x + 2)(x + 4) */
    unsigned r0 = 0, r1 = 0;
    int i;
    for (i = 12; i >= 2; i--) {
        unsigned f = word[i] ^ r1;
        r1 = r0 ^ multiply(f, generator[1]);
        r0 = multiply(f, generator[0]);
    }
    word[0] = (unsigned char)r0;
    word[1] = (unsigned char)r1;
}

static int correct_rs(unsigned char* word) {
    unsigned s1 = evaluate(word, 13, 2), s2 = evaluate(word, 13, 4), where;
    if (!s1 && !s2) return 0;
    if (!s1 || !s2) return -1;
    where = logarithm[divide(s2, s1)];
    if (where > 12) return -1;
    word[where] ^= (unsigned char)divide(s1, power[where]);
    return (int)where + 1;
}

int main(void) {
    unsigned d, wrong = 0;
    unsigned char word[13], sent[13];
    int i, e;
    for (d = 0; d < 16; d++)
        for (e = 0; e < 8; e++) wrong += decode74(encode74(d) ^ (e ? 1u << (e - 1) : 0u)) != d;
    put_u32(wrong);
    put_u32(encode74(11));
    for (d = 0; d < 2048; d += 97)
        wrong += (unsigned)(syndrome(encode15(d), 15) != 0) + 2u * (syndrome(encode15(d) ^ 64u, 15) != 7);
    put_u32(wrong);
    put_u32(encode15(1234));
    make_field();
    put_u32(multiply(7, 11));
    put_u32(divide(multiply(13, 9), 9));
    for (i = 2; i < 13; i++) word[i] = (unsigned char)(i * 5 % 16);
    encode_rs(word);
    put_u32(word[0]);
    put_u32(word[1]);
    put_i16(correct_rs(word));
    for (i = 0; i < 13; i++) sent[i] = word[i];
    for (e = 1; e < 13; e += 3) {
        word[e] ^= (unsigned char)(e + 2);
        put_i16(correct_rs(word));
        for (i = 0; i < 13; i++)
            if (word[i] != sent[i]) put_str("not corrected");
    }
    word[3] ^= 1;
    word[9] ^= 7;
    put_i16(correct_rs(word));
    return 0;
}
