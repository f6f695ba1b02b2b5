// Huffman codes: tree from frequencies, canonical codes, packing and unpacking of a bit stream.
#include <zrun.h>

#define SYMBOLS 8

static unsigned weights[2 * SYMBOLS];
static int parent[2 * SYMBOLS], lengths[SYMBOLS];
static unsigned codes[SYMBOLS];
static unsigned stream[32];
static int position;

static int take_least(int n, int except) {
    int i, best = -1;
    for (i = 0; i < n; i++) {
        if (parent[i] >= 0 || weights[i] == 0 || i == except) continue;
        if (best < 0 || weights[i] < weights[best]) best = i;
    }
    return best;
}

static void build(void) {
    int n, i;
    for (i = 0; i < 2 * SYMBOLS; i++) parent[i] = -1;
    for (n = SYMBOLS;; n++) {
        int a = take_least(n, -1), b = take_least(n, a);
        if (b < 0) break;
        weights[n] = weights[a] + weights[b];
        parent[a] = parent[b] = n;
    }
    for (i = 0; i < SYMBOLS; i++) {
        int p = i;
        lengths[i] = 0;
        while (weights[i] && parent[p] >= 0) {
            lengths[i]++;
            p = parent[p];
        }
    }
}

static void assign(void) {
    unsigned code = 0;
    int l, i;
    for (l = 1; l < 16; l++) {
        for (i = 0; i < SYMBOLS; i++)
            if (lengths[i] == l) codes[i] = code++;
        code <<= 1;
    }
}

static void put_bits(unsigned v, int n) {
    while (n-- > 0) {
        if (v >> n & 1u) stream[position >> 4] |= 0x8000u >> (position & 15);
        position++;
    }
}

static int get_symbol(void) {
    unsigned code = 0;
    int l, i;
    for (l = 1; l < 16; l++) {
        code = code << 1 | (stream[position >> 4] >> (15 - (position & 15)) & 1u);
        position++;
        for (i = 0; i < SYMBOLS; i++)
            if (lengths[i] == l && codes[i] == code) return i;
    }
    return -1;
}

static int symbol_at(int i) { return (i * i + i / 3) % 11 % SYMBOLS; }

int main(void) {
    int i, wrong = 0, end;
    for (i = 0; i < 100; i++) weights[symbol_at(i)]++;
    build();
    assign();
    for (i = 0; i < SYMBOLS; i++) {
        put_u32(weights[i]);
        put_i16(lengths[i]);
        put_u32(codes[i]);
    }
    for (i = 0; i < 100; i++) put_bits(codes[symbol_at(i)], lengths[symbol_at(i)]);
    end = position;
    put_i16(end);
    for (i = 0; i < 4; i++) put_u32(stream[i]);
    position = 0;
    for (i = 0; i < 100; i++) wrong += get_symbol() != symbol_at(i);
    put_i16(wrong);
    put_i16(position - end);
    return 0;
}
