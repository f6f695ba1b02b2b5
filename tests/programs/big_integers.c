// Arithmetic of many words: sums with carries, products, division by a word, factorials and powers, in decimal.
#include <zrun.h>

#define WORDS 16

struct big {
    unsigned w[WORDS];
    int n;
};

static void set(struct big* b, unsigned v) {
    int i;
    for (i = 0; i < WORDS; i++) b->w[i] = 0;
    b->w[0] = v;
    b->n = v != 0;
}

static void times(struct big* b, unsigned k) {
    unsigned long carry = 0;
    int i;
    for (i = 0; i < b->n; i++) {
        carry += (unsigned long)b->w[i] * k;
        b->w[i] = (unsigned)carry;
        carry >>= 16;
    }
    if (carry) b->w[b->n++] = (unsigned)carry;
}

static unsigned over(struct big* b, unsigned k) {
    unsigned long rest = 0;
    int i;
    for (i = b->n - 1; i >= 0; i--) {
        rest = rest << 16 | b->w[i];
        b->w[i] = (unsigned)(rest / k);
        rest %= k;
    }
    while (b->n > 0 && b->w[b->n - 1] == 0) b->n--;
    return (unsigned)rest;
}

static void add(struct big* a, const struct big* b) {
    unsigned carry = 0;
    int i, n = a->n > b->n ? a->n : b->n;
    for (i = 0; i < n; i++) {
        unsigned s = a->w[i] + b->w[i], t = s + carry;
        carry = (s < a->w[i]) | (t < s);
        a->w[i] = t;
    }
    if (carry && n < WORDS) a->w[n++] = 1;
    a->n = n;
}

static int subtract(struct big* a, const struct big* b) {
    unsigned borrow = 0;
    int i;
    for (i = 0; i < WORDS; i++) {
        unsigned d = a->w[i] - b->w[i], t = d - borrow;
        borrow = (d > a->w[i]) | (t > d);
        a->w[i] = t;
    }
    for (a->n = WORDS; a->n > 0 && !a->w[a->n - 1];) a->n--;
    return (int)borrow;
}

static void multiply(struct big* r, const struct big* a, const struct big* b) {
    int i, j;
    set(r, 0);
    for (i = 0; i < a->n; i++) {
        unsigned long carry = 0;
        for (j = 0; i + j < WORDS; j++) {
            carry += (unsigned long)a->w[i] * (j < b->n ? b->w[j] : 0u) + r->w[i + j];
            r->w[i + j] = (unsigned)carry;
            carry >>= 16;
        }
    }
    for (r->n = WORDS; r->n > 0 && !r->w[r->n - 1];) r->n--;
}

static void print(struct big b) {
    char text[80], *p = text + 79;
    *p = 0;
    do *--p = (char)('0' + over(&b, 10u));
    while (b.n);
    put_str(p);
}

int main(void) {
    struct big f, a, b, t;
    int i;
    set(&f, 1);
    for (i = 2; i <= 30; i++) {
        times(&f, (unsigned)i);
        if (i % 10 == 0) print(f);
    }
    put_i16(f.n);
    put_u32(over(&f, 9973u));
    set(&a, 0);
    set(&b, 1);
    for (i = 0; i < 150; i++) {
        t = b;
        add(&b, &a);
        a = t;
    }
    print(a);
    multiply(&t, &a, &b);
    print(t);
    put_i16(subtract(&b, &a));
    print(b);
    set(&t, 0);
    put_i16(subtract(&t, &b));
    put_i16(t.n);
    add(&t, &b);
    put_u32(t.w[0]);
    set(&t, 0);
    print(t);
    return 0;
}
