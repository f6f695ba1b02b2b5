// Differential coding of 4 bits a sample: encoder and decoder keep in step, packed four codes a word.
#include <zrun.h>

#define N 64

static const int index_step[8] = {-1, -1, -1, -1, 2, 4, 6, 8};
static const int steps[49] = {16,  17,  19,  21,  23,  25,  28,  31,  34,  37,  41,   45,   50,   55,   60,  66,  73,
                              80,  88,  97,  107, 118, 130, 143, 157, 173, 190, 209,  230,  253,  279,  307, 337, 371,
                              408, 449, 494, 544, 598, 658, 724, 796, 876, 963, 1060, 1166, 1282, 1411, 1552};

struct state {
    int value;
    int index;
};

static int bounded(long v) { return v > 2047 ? 2047 : v < -2048 ? -2048 : (int)v; }

static void update(struct state* s, unsigned code) {
    int step = steps[s->index], delta = step >> 3;
    if (code & 4u) delta += step;
    if (code & 2u) delta += step >> 1;
    if (code & 1u) delta += step >> 2;
    s->value = bounded(code & 8u ? (long)s->value - delta : (long)s->value + delta);
    s->index += index_step[code & 7u];
    if (s->index < 0)
        s->index = 0;
    else if (s->index > 48)
        s->index = 48;
}

static unsigned encode(struct state* s, int sample) {
    int diff = sample - s->value, step = steps[s->index];
    unsigned code = 0, mask;
    if (diff < 0) {
        code = 8;
        diff = -diff;
    }
    for (mask = 4; mask; mask >>= 1) {
        if (diff >= step) {
            code |= mask;
            diff -= step;
        }
        step >>= 1;
    }
    update(s, code);
    return code;
}

static int source(int i) {
    int t = i % 20;
    return (t < 10 ? t : 20 - t) * 150 - 750 + (i & 3) * 11;
}

int main(void) {
    struct state encoder = {0, 0}, decoder = {0, 0};
    unsigned packed[N / 4], check = 0;
    long noise = 0;
    int i;
    for (i = 0; i < N; i++) {
        unsigned code = encode(&encoder, source(i));
        if ((i & 3) == 0) packed[i >> 2] = 0;
        packed[i >> 2] |= code << (4 * (i & 3));
    }
    for (i = 0; i < N / 4; i++) check = (check >> 3 | check << 13) + packed[i];
    put_u32(check);
    for (i = 0; i < N; i++) {
        long e;
        update(&decoder, packed[i / 4] >> (i % 4 * 4) & 15u);
        e = decoder.value - source(i);
        noise += e * e;
        if (i % 8 == 7) put_i16(decoder.value);
    }
    put_i32(noise / N);
    put_i16(decoder.value == encoder.value);
    put_i16(decoder.index == encoder.index);
    put_i16(bounded(100000L));
    put_i16(bounded(-100000L));
    return 0;
}
