// Convolutional code of rate 1/2, constraint length 3: encode, disturb, decode by the Viterbi algorithm.
#include <zrun.h>

#define STATES 4
#define LENGTH 24

static unsigned char path[LENGTH][STATES];
static int received[LENGTH];

static int parity(int v) {
    v ^= v >> 2;
    v ^= v >> 1;
    return v & 1;
}

/* state holds the two latest bits; the word is the pair of output bits */
static int word_of(int state, int bit) {
    int reg = bit << 2 | state;
    return parity(reg & 7) << 1 | parity(reg & 5);
}

static int distance(int a, int b) {
    int d = a ^ b;
    return (d >> 1) + (d & 1);
}

static void encode(unsigned long bits) {
    int state = 0, i;
    for (i = 0; i < LENGTH; i++) {
        int bit = (int)(bits >> i) & 1;
        received[i] = word_of(state, bit);
        state = bit << 1 | state >> 1;
    }
}

static int decode(unsigned long* bits) {
    int metric[STATES] = {0, 100, 100, 100}, next[STATES];
    int i, s, best = 0, cost;
    for (i = 0; i < LENGTH; i++) {
        for (s = 0; s < STATES; s++) {
            int bit = s >> 1, from0 = (s & 1) << 1, from1 = from0 | 1;
            int m0 = metric[from0] + distance(word_of(from0, bit), received[i]);
            int m1 = metric[from1] + distance(word_of(from1, bit), received[i]);
            next[s] = m0 <= m1 ? m0 : m1;
            path[i][s] = (unsigned char)(m0 <= m1 ? from0 : from1);
        }
        for (s = 0; s < STATES; s++) metric[s] = next[s];
    }
    for (s = 1; s < STATES; s++)
        if (metric[s] < metric[best]) best = s;
    cost = metric[best];
    *bits = 0;
    for (i = LENGTH - 1; i >= 0; i--) {
        if (best & 2) *bits |= 1UL << i;
        best = path[i][best];
    }
    return cost;
}

int main(void) {
    static const unsigned long words[] = {0UL, 0x2AC31FUL, 0xFFFFFFUL, 0x123456UL};
    unsigned w;
    int flips;
    for (w = 0; w < 4; w++)
        for (flips = 0; flips < 4; flips++) {
            unsigned long bits;
            int i, cost;
            encode(words[w]);
            for (i = 0; i < flips; i++) received[3 + 7 * i] ^= i == 1 ? 2 : 1;
            cost = decode(&bits);
            put_i16(cost);
            put_u32(bits ^ words[w]);
        }
    return 0;
}
