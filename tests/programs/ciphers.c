// Block ciphers and hashes: rounds over 32-bit words with rotations, a 16-bit cipher, and their inverses.
#include <zrun.h>

typedef unsigned long u32;

static u32 left(u32 v, int n) { return v << n | v >> (32 - n); }

static void encipher(u32 v[2], const u32 k[4]) {
    u32 a = v[0], b = v[1], sum = 0;
    int i;
    for (i = 0; i < 32; i++) {
        sum += 0x9E3779B9UL;
        a += ((b << 4) + k[0]) ^ (b + sum) ^ ((b >> 5) + k[1]);
        b += ((a << 4) + k[2]) ^ (a + sum) ^ ((a >> 5) + k[3]);
    }
    v[0] = a;
    v[1] = b;
}

static void decipher(u32 v[2], const u32 k[4]) {
    u32 a = v[0], b = v[1], sum = 0x9E3779B9UL * 32UL;
    int i;
    for (i = 32; i > 0; --i) {
        b -= ((a << 4) + k[2]) ^ (a + sum) ^ ((a >> 5) + k[3]);
        a -= ((b << 4) + k[0]) ^ (b + sum) ^ ((b >> 5) + k[1]);
        sum -= 0x9E3779B9UL;
    }
    v[0] = a;
    v[1] = b;
}

static void speck(unsigned* x, unsigned* y, const unsigned key[4]) {
    unsigned k = key[0], l[3], a = *x, b = *y;
    int i;
    for (i = 0; i < 3; i++) l[i] = key[i + 1];
    for (i = 0; i < 22; i++) {
        unsigned n;
        a = ((a >> 7 | a << 9) + b) ^ k;
        b = (b << 2 | b >> 14) ^ a;
        n = (k + (l[i % 3] >> 7 | l[i % 3] << 9)) ^ (unsigned)i;
        l[i % 3] = n;
        k = (k << 2 | k >> 14) ^ n;
    }
    *x = a;
    *y = b;
}

static void quarter(u32* a, u32* b, u32* c, u32* d) {
    *a += *b;
    *d = left(*d ^ *a, 16);
    *c += *d;
    *b = left(*b ^ *c, 12);
    *a += *b;
    *d = left(*d ^ *a, 8);
    *c += *d;
    *b = left(*b ^ *c, 7);
}

static void compress(u32 h[5], const u32 block[16]) {
    u32 w[80], a = h[0], b = h[1], c = h[2], d = h[3], e = h[4];
    int i;
    for (i = 0; i < 80; i++) w[i] = i < 16 ? block[i] : left(w[i - 3] ^ w[i - 8] ^ w[i - 14] ^ w[i - 16], 1);
    for (i = 0; i < 80; i++) {
        u32 f, k, t;
        if (i < 20)
            f = (b & c) | (~b & d), k = 0x5A827999UL;
        else if (i < 40)
            f = b ^ c ^ d, k = 0x6ED9EBA1UL;
        else if (i < 60)
            f = (b & c) | (b & d) | (c & d), k = 0x8F1BBCDCUL;
        else
            f = b ^ c ^ d, k = 0xCA62C1D6UL;
        t = left(a, 5) + f + e + k + w[i];
        e = d;
        d = c;
        c = left(b, 30);
        b = a;
        a = t;
    }
    h[0] += a;
    h[1] += b;
    h[2] += c;
    h[3] += d;
    h[4] += e;
}

int main(void) {
    static const u32 key[4] = {0x01234567UL, 0x89ABCDEFUL, 0xFEDCBA98UL, 0x76543210UL};
    static const unsigned small[4] = {0x0100u, 0x0908u, 0x1110u, 0x1918u};
    u32 v[2] = {1, 2}, q[4] = {0x11111111UL, 0x01020304UL, 0x9B8D6F43UL, 0x01234567UL};
    u32 h[5] = {0x67452301UL, 0xEFCDAB89UL, 0x98BADCFEUL, 0x10325476UL, 0xC3D2E1F0UL}, block[16] = {0x61626380UL};
    unsigned x = 0x6574u, y = 0x694Cu;
    int i;
    encipher(v, key);
    put_u32(v[0]);
    put_u32(v[1]);
    decipher(v, key);
    put_u32(v[0]);
    put_u32(v[1]);
    speck(&x, &y, small);
    put_u32(x);
    put_u32(y);
    quarter(&q[0], &q[1], &q[2], &q[3]);
    for (i = 0; i < 4; i++) put_u32(q[i]);
    block[15] = 24;
    compress(h, block);
    for (i = 0; i < 5; i++) put_u32(h[i]);
    return 0;
}
