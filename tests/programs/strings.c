// Work on strings without a library: copy, compare, search, reverse, convert, split, match patterns.
#include <zrun.h>

static char buffer[64];

static int length(const char* s) {
    const char* p = s;
    while (*p) p++;
    return (int)(p - s);
}

static char* copy(char* to, const char* from) {
    char* r = to;
    while ((*to++ = *from++)) {
    }
    return r;
}

static char* append(char* to, const char* from) {
    copy(to + length(to), from);
    return to;
}

static int compare(const char* a, const char* b) {
    while (*a && *a == *b) a++, b++;
    return *a - *b;
}

static const char* find(const char* text, const char* key) {
    for (;; text++) {
        int i = 0;
        while (key[i] && text[i] == key[i]) i++;
        if (!key[i]) return text;
        if (!*text) return 0;
    }
}

static void reverse(char* s) {
    char* e = s + length(s);
    while (s < --e) {
        char t = *s;
        *s++ = *e;
        *e = t;
    }
}

static char* from_number(long v, unsigned base, char* to) {
    char* p = to;
    unsigned long u = v < 0 && base == 10 ? 0UL - (unsigned long)v : (unsigned long)v;
    do *p++ = "0123456789abcdef"[u % base];
    while (u /= base);
    if (v < 0 && base == 10) *p++ = '-';
    *p = 0;
    reverse(to);
    return to;
}

static long to_number(const char* s, int* used) {
    const char* start = s;
    unsigned long v = 0;
    int minus = 0;
    while (*s == ' ') s++;
    if (*s == '-' || *s == '+') minus = *s++ == '-';
    while (*s >= '0' && *s <= '9') v = v * 10UL + (unsigned long)(*s++ - '0');
    *used = (int)(s - start);
    return minus ? (long)(0UL - v) : (long)v;
}

static int matches(const char* p, const char* s) {
    if (!*p) return !*s;
    if (*p == '*') return matches(p + 1, s) || (*s && matches(p, s + 1));
    return *s && (*p == '?' || *p == *s) && matches(p + 1, s + 1);
}

static int upper_words(char* s) {
    int words = 0, inside = 0;
    for (; *s; s++) {
        int letter = *s >= 'a' && *s <= 'z';
        if (letter && !inside) {
            *s = (char)(*s - 'a' + 'A');
            words++;
        }
        inside = letter;
    }
    return words;
}

static int split(const char* s, char separator, int* lengths) {
    int n = 0, l = 0;
    do {
        if (*s == separator || !*s) {
            lengths[n++] = l;
            l = 0;
        } else
            l++;
    } while (*s++);
    return n;
}

int main(void) {
    static const long numbers[] = {0L, 7L, -1L, 123456789L, 2147483647L, -2147483647L - 1};
    static const char* const patterns[] = {"*", "a*c", "a?c", "", "*b*b*", "abc?", "a**c"};
    int i, used, lengths[8];
    put_str(append(append(copy(buffer, "one"), ", "), "two"));
    put_i16(length(buffer));
    put_i16(compare("abc", "abd"));
    put_i16(compare("abc", "abc"));
    put_i16(compare("ab", "a"));
    put_i16(find("needle in hay", "hat") == 0);
    put_str(find("needle in hay", "le "));
    put_i16(find("abc", "abcd") == 0);
    reverse(buffer);
    put_str(buffer);
    for (i = 0; i < 6; i++) {
        put_str(from_number(numbers[i], 10u, buffer));
        put_i32(to_number(buffer, &used));
        put_str(from_number(numbers[i], 16u, buffer));
        put_str(from_number(numbers[i], 2u, buffer));
    }
    put_i32(to_number("  -42x", &used));
    put_i16(used);
    for (i = 0; i < 7; i++) put_i16(matches(patterns[i], "abc") * 10 + matches(patterns[i], "abbc"));
    put_i16(upper_words(copy(buffer, "the quick 2nd-hand fox")));
    put_str(buffer);
    put_i16(split("a,bb,,dddd,", ',', lengths));
    for (i = 0; i < 5; i++) put_i16(lengths[i]);
    return 0;
}
