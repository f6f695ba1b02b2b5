// Generators: shift registers, congruential with 16, 32 and 64 bits, xorshift, lagged Fibonacci; simple tests of them.
#include <zrun.h>

static unsigned lfsr16(unsigned s) { return s >> 1 ^ (0u - (s & 1u) & 0xB400u); }

static unsigned long galois(unsigned long s) { return s & 1UL ? s >> 1 ^ 0xA3000000UL : s >> 1; }

static unsigned long xorshift(unsigned long* s) {
    unsigned long x = *s;
    x ^= x << 13;
    x ^= x >> 17;
    x ^= x << 5;
    return *s = x;
}

static unsigned long long wide_state = 42ULL;
static unsigned long permuted(void) {
    unsigned long long old = wide_state;
    unsigned long x, turn;
    wide_state = old * 6364136223846793005ULL + 1442695040888963407ULL;
    x = (unsigned long)((old >> 18 ^ old) >> 27);
    turn = (unsigned long)(old >> 59);
    return x >> turn | x << (32UL - turn & 31UL);
}

static unsigned lag[17];
static int at;
static unsigned lagged(void) {
    unsigned v = lag[at] += lag[(at + 12) % 17];
    if (++at == 17) at = 0;
    return v;
}

static long park(long s) { /* 16807 s mod 2^31 - 1 without overflow */
    long high = s / 127773L, low = s % 127773L;
    s = 16807L * low - 2836L * high;
    return s > 0 ? s : s + 2147483647L;
}

static int period(unsigned start) {
    unsigned s = start;
    int n = 0;
    do {
        s = lfsr16(s);
        n++;
    } while (s != start && n < 30000);
    return n;
}

static void shuffle(int* a, int n, unsigned long* s) {
    while (n > 1) {
        int k = (int)(xorshift(s) % (unsigned long)n--), t = a[n];
        a[n] = a[k];
        a[k] = t;
    }
}

int main(void) {
    unsigned long g = 1, x = 2463534242UL, ones = 0;
    unsigned s = 0xACE1u;
    long p = 1;
    int deck[20], bins[8] = {0}, i;
    for (i = 0; i < 1000; i++) {
        s = lfsr16(s);
        g = galois(g);
        p = park(p);
    }
    put_u32(s);
    put_u32(g);
    put_i32(p);
    put_i16(period(0xACE1u));
    put_i16(period(0u));
    for (i = 0; i < 5; i++) put_u32(xorshift(&x));
    for (i = 0; i < 5; i++) put_u32(permuted());
    for (i = 0; i < 17; i++) lag[i] = (unsigned)i * 2654u + 7u;
    for (i = 0; i < 500; i++) ones += lagged() & 1u;
    put_u32(ones);
    put_u32(lagged());
    for (i = 0; i < 20; i++) deck[i] = i;
    shuffle(deck, 20, &x);
    for (i = 0; i < 20; i += 4) put_i16(deck[i]);
    for (i = 0; i < 800; i++) bins[permuted() >> 29]++;
    for (i = 0; i < 8; i++) put_i16(bins[i]);
    return 0;
}
