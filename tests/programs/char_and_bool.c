// Small types: characters of 16 bits, truth values, enumerations, promotions, and narrow stores in loops.
#include <zrun.h>

enum day { MON = 1, TUE, WED, SUN = 7 };
typedef _Bool truth;

static truth flags[10];
static signed char small[4] = {-1, 0, 127, -128};
static unsigned char bytes[4] = {255, 0, 1, 128};

static truth is_set(int v, int bit) { return v & (1 << bit); }
static truth both(truth a, truth b) { return a && b; }
static int as_number(truth t) { return t + t; }

static enum day next(enum day d) { return d == WED ? SUN : d == SUN ? MON : (enum day)(d + 1); }

static int sieve(int limit) {
    int i, j, n = 0;
    for (i = 0; i < 10; i++) flags[i] = 1;
    for (i = 2; i < limit; i++) {
        if (!flags[i]) continue;
        n++;
        for (j = 2 * i; j < limit; j += i) flags[j] = 0;
    }
    return n;
}

static unsigned checksum(const unsigned char* p, int n) {
    unsigned char sum = 0;
    while (n-- > 0) sum = (unsigned char)((sum + *p++) & 0xFF);
    return sum;
}

static int letters(const char* s, int* vowels) {
    int n = 0;
    *vowels = 0;
    for (; *s; s++) {
        char c = *s >= 'A' && *s <= 'Z' ? (char)(*s + 32) : *s;
        truth vowel = c == 'a' || c == 'e' || c == 'i' || c == 'o' || c == 'u';
        n += c >= 'a' && c <= 'z';
        *vowels += vowel;
    }
    return n;
}

static int clamp(int v) { return v < 0 ? 0 : v > 255 ? 255 : v; }

static void brighten(unsigned char* p, int n, int by) {
    int i;
    for (i = 0; i < n; i++) p[i] = (unsigned char)clamp(p[i] + by);
}

int main(void) {
    truth t = 5, f = 0;
    float half = 0.5F;
    int i, vowels;
    enum day d = MON;
    put_i16(t);
    put_i16(as_number(is_set(12, 2)));
    put_i16(is_set(12, 0));
    put_i16(both(2, t) + both(t, f));
    t = half;
    put_i16(t);
    t = half - 0.5F;
    put_i16(t);
    t = &half != 0;
    put_i16(!t + t * 10);
    f |= 4;
    put_i16(f);
    t = 256L * 256L;
    put_i16(t);
    for (i = 0; i < 5; i++) {
        put_i16(d);
        d = next(d);
    }
    put_i16(sieve(10));
    put_i16(flags[7] + flags[9] * 10);
    for (i = 0; i < 4; i++) put_i16(small[i] + bytes[i]);
    put_i16(small[3] / 2 - small[0]);
    put_u32(checksum(bytes, 4));
    brighten(bytes, 4, 100);
    put_u32(checksum(bytes, 4));
    brighten(bytes, 4, -150);
    for (i = 0; i < 4; i++) put_i16(bytes[i]);
    put_i16(letters("The Quick Brown Fox", &vowels));
    put_i16(vowels);
    put_i16('a' + '\n' + '\x41');
    return 0;
}
