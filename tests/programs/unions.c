// Unions: images of floats, halves of longs.
#include <zrun.h>

union number {
    float f;
    unsigned long u;
    long l;
};
union halves {
    unsigned long whole;
    struct {
        unsigned first, second;
    } part;
    unsigned words[2];
};
static unsigned long image(float f) {
    union number n;
    n.f = f;
    return n.u;
}

static float from_image(unsigned long u) {
    union number n;
    n.u = u;
    return n.f;
}

static float magnitude(float f) { return from_image(image(f) & 0x7FFFFFFFUL); }
static int exponent(float f) { return (int)(image(f) >> 23 & 0xFFUL) - 127; }

int main(void) {
    static const float floats[] = {1.0F, -2.0F, 0.15625F, 1.0e10F, 3.0e-5F};
    union halves h, k;
    unsigned i;
    for (i = 0; i < 5; i++) {
        put_u32(image(floats[i]));
        put_f32(magnitude(floats[i]));
        put_i16(exponent(floats[i]));
    }
    put_f32(from_image(0x40490FDBUL));
    h.whole = 0x12345678UL;
    put_u32((unsigned long)h.part.first + h.part.second);
    put_i16(h.words[0] == h.part.first && h.words[1] == h.part.second);
    k.part = h.part;
    k.words[0] ^= h.words[1];
    k.words[1] ^= h.words[0];
    put_u32(k.whole);
    return 0;
}
