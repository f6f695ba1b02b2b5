// Run lengths and a dictionary coder with a sliding window; what is expanded must equal what was packed.
#include <zrun.h>

#define SIZE 160

static unsigned char plain[SIZE], packed[2 * SIZE], expanded[SIZE + 20];

static int pack_runs(const unsigned char* from, int n, unsigned char* to) {
    int made = 0, i = 0;
    while (i < n) {
        int run = 1;
        while (i + run < n && run < 63 && from[i + run] == from[i]) run++;
        if (run > 2 || from[i] >= 192) {
            to[made++] = (unsigned char)(192 | run);
            to[made++] = from[i];
            i += run;
        } else
            to[made++] = from[i++];
    }
    return made;
}

static int expand_runs(const unsigned char* from, int n, unsigned char* to) {
    const unsigned char* end = from + n;
    unsigned char* start = to;
    while (from != end) {
        int c = *from++;
        if (c < 192) {
            *to++ = (unsigned char)c;
            continue;
        }
        for (c &= 63; c--;) *to++ = *from;
        from++;
    }
    return (int)(to - start);
}

static int longest(const unsigned char* s, int at, int n, int* back) {
    int best = 0, d;
    for (d = 1; d <= 31 && d <= at; d++) {
        int l = 0;
        while (l < 9 && at + l < n && s[at + l] == s[at + l - d]) l++;
        if (l > best) {
            best = l;
            *back = d;
        }
    }
    return best;
}

static int pack_window(const unsigned char* s, int n, unsigned char* to) {
    int made = 0, at = 0;
    while (at < n) {
        int back = 0, l = longest(s, at, n, &back);
        if (l > 5) l = 5;
        if (l >= 2) {
            to[made++] = (unsigned char)(128 | (l - 2) << 5 | back);
            at += l;
        } else
            to[made++] = s[at++];
    }
    return made;
}

static int expand_window(const unsigned char* from, int n, unsigned char* to) {
    int made = 0;
    while (n-- > 0) {
        unsigned c = *from++;
        if (c & 128u) {
            int l = (int)(c >> 5 & 3u) + 2, back = (int)(c & 31u);
            while (l-- > 0) to[made] = to[made - back], made++;
        } else
            to[made++] = (unsigned char)c;
    }
    return made;
}

static int differ(int n) {
    int i;
    for (i = 0; i < n; i++)
        if (plain[i] != expanded[i]) return i + 1;
    return 0;
}

static unsigned digest(const unsigned char* p, int n) {
    unsigned d = 0;
    while (n-- > 0) d = (d << 5 | d >> 11) + *p++;
    return d;
}

int main(void) {
    int kind, i, n;
    for (kind = 0; kind < 4; kind++) {
        for (i = 0; i < SIZE; i++) {
            int v = kind == 0   ? i / 20
                    : kind == 1 ? i * 7 % 120
                    : kind == 2 ? i % 9 < 8 ? 97 + i % 9 % 3 : 100
                    : (i & 24)  ? 3
                                : i;
            plain[i] = (unsigned char)(v & 127);
        }
        n = pack_runs(plain, SIZE, packed);
        put_i16(n);
        put_u32(digest(packed, n));
        put_i16(expand_runs(packed, n, expanded));
        put_i16(differ(SIZE));
        for (i = 0; i < SIZE; i++) expanded[i] = 0;
        n = pack_window(plain, SIZE, packed);
        put_i16(n);
        put_u32(digest(packed, n));
        put_i16(expand_window(packed, n, expanded));
        put_i16(differ(SIZE));
    }
    return 0;
}
