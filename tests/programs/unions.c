// Unions: images of floats, halves of longs, tagged variants, and structures that share their first members.
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
enum kind { INTEGER, REAL, PAIR, TEXT };

static const char* const texts[] = {"", "abc"};

struct variant {
    enum kind kind;
    union {
        long i;
        float r;
        struct {
            int a, b;
        } p;
        int t;
    } u;
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

static long value(const struct variant* v) {
    switch (v->kind) {
    case INTEGER: return v->u.i;
    case REAL: return (long)(v->u.r * 100.0F);
    case PAIR: return v->u.p.a * 1000L + v->u.p.b;
    case TEXT: {
        long n = 0;
        const char* s = texts[v->u.t];
        while (*s) n = n * 2 + *s++;
        return n;
    }
    }
    return -1;
}

static void mutate(struct variant* v) {
    long old = value(v);
    v->kind = (enum kind)((v->kind + 1) % 3);
    switch (v->kind) {
    case INTEGER: v->u.i = old + 1; break;
    case REAL: v->u.r = (float)old / 4.0F; break;
    default: v->u.p.a = (int)(old / 1000L); v->u.p.b = (int)(old % 1000L);
    }
}

int main(void) {
    static const float floats[] = {1.0F, -2.0F, 0.15625F, 1.0e10F, 3.0e-5F};
    struct variant v[4];
    union halves h, k;
    unsigned i;
    int j;
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
    v[0].kind = INTEGER;
    v[0].u.i = -123456L;
    v[1].kind = REAL;
    v[1].u.r = 2.75F;
    v[2].kind = PAIR;
    v[2].u.p.a = 12;
    v[2].u.p.b = -34;
    v[3].kind = TEXT;
    v[3].u.t = 1;
    for (i = 0; i < 4; i++) put_i32(value(&v[i]));
    for (j = 0; j < 7; j++) mutate(&v[j % 3]);
    for (i = 0; i < 3; i++) {
        put_i16(v[i].kind);
        put_i32(value(v + i));
    }
    return 0;
}
