// What is kept in a variable at unrelated times gets a variable for each; one value that paths share does not.
// RUN: --opt_level=2
#include <zrun.h>

int g[40];
void touch(int *p) { *p += 3; }

// FUNCTION: reused
// COUNT 2: / t: int, class/
// COUNT 3: / n: int, class/
int reused(int n, int c) {
    int t = n * 3, s = 0, i;
    for (i = 0; i < n; i++) g[i] = s += t ^ c;
    t = n - s;
    if (t & 1) t++;
    s ^= t;
    n = s + t;
    for (i = 0; i < 3; i++) s += n >> i;
    return s + n;
}

// FUNCTION: shared
// COUNT 1: / t: int, class/
int shared(int c, int d) {
    int t;
    if (c) t = d * 3;
    else t = d - 7;
    while (d-- > 0) {
        if (t > 50) t = d;
        t += c;
    }
    return t;
}

// A value that a condition may leave in place, and an aliased variable.
// FUNCTION: conditional
// COUNT 1: / t: int, class/
// COUNT 1: / u: int, class/
int conditional(int c) {
    int t = c * 5, u = c, r;
    (void)(c > 2 && (t = c, 1));
    touch(&u);
    r = t + u;
    u = r * 2;
    touch(&u);
    return r + u;
}

// Read ahead of any assignment on a path that is not taken.
int maybe(int n) {
    int t, s = 0;
    for (int i = 0; i < n; i++) {
        if (i) s += t;
        t = i * 2;
        s ^= t;
        t = s & 15;
    }
    t = n;
    return s + t;
}

int main(void) {
    for (int i = 0; i < 9; i++) {
        put_i16(reused(i * 3, 5));
        put_i16(shared(i & 3, i * 11));
        put_i16(conditional(i) + maybe(i));
    }
    return 0;
}
