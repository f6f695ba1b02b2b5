// Control flow by goto: loops of two entries, jumps out of and into nests, backward and over initializations.
#include <zrun.h>

static int irreducible(int n, int enter) {
    int steps = 0;
    if (enter) goto middle;
top:
    steps += 1;
    n -= 2;
middle:
    steps += 10;
    n -= 1;
    if (n > 0) goto top;
    return steps;
}

static int find_pair(const int m[4][4], int key, int* r, int* c) {
    int i, j;
    for (i = 0; i < 4; i++)
        for (j = 0; j < 4; j++)
            if (m[i][j] == key) goto found;
    return 0;
found:
    *r = i;
    *c = j;
    return 1;
}

static int into_loop(int n, int skip) {
    int i = 0, s = 0;
    if (skip) goto inside;
    for (i = 0; i < n; i++) {
        s += 100;
    inside:
        s += i;
    }
    return s;
}

static int into_block(int n) {
    int r = 1;
    switch (n & 3) {
    case 0:
        r += 1;
        if (n > 8) goto two;
        break;
    case 1: do { r *= 2;
        case 3: r += 3;
        } while (r < 40);
        break;
    case 2:
    two:
        r -= 5;
    }
    return r;
}

static int retry(int fail_at) {
    int attempt = 0, work, total = 0;
again:
    attempt++;
    work = 0;
    for (;;) {
        if (++work == fail_at && attempt < 3) {
            total += work;
            goto again;
        }
        if (work >= 5) goto done;
    }
done:
    return total * 10 + attempt;
}

static int cleanup(int stage) {
    int held = 0;
    if (stage < 1) goto none;
    held |= 1;
    if (stage < 2) goto one;
    held |= 2;
    if (stage < 3) goto two;
    held |= 4;
    return held;
two:
    held &= ~2;
one:
    held &= ~1;
none:
    return held - 1;
}

static int automaton(const char* s) {
    int n = 0;
a:
    if (!*s) return n;
    if (*s++ == 'x') goto b;
    goto a;
b:
    if (!*s) return -n;
    n++;
    if (*s == 'y') {
        s++;
        goto c;
    }
    s++;
    goto a;
c:
    n += 10;
    if (*s == 'z') goto b;
    goto a;
}

int main(void) {
    static const int m[4][4] = {{1, 2, 3, 4}, {5, 6, 7, 8}, {9, 10, 11, 12}, {13, 14, 15, 16}};
    int i, r = -1, c = -1;
    for (i = -1; i < 10; i += 3) {
        put_i16(irreducible(i, 0));
        put_i16(irreducible(i, 1));
        put_i16(into_loop(i, 0));
        put_i16(into_loop(i, 1));
        put_i16(retry(i));
    }
    put_i16(find_pair(m, 11, &r, &c) * 100 + r * 10 + c);
    put_i16(find_pair(m, 17, &r, &c) * 100 + r * 10 + c);
    for (i = 0; i < 16; i += 3) put_i16(into_block(i));
    for (i = 0; i < 4; i++) put_i16(cleanup(i));
    put_i16(automaton("xyzxy"));
    put_i16(automaton("axxbx"));
    put_i16(automaton(""));
    return 0;
}
