// Pointers that nothing tells apart keep the iterations of a loop apart: the programmer is told once for each pair.
// RUN: --opt_level=2 --disable_inlining
#include <zrun.h>

int a[64], b[64];

// FUNCTION: copy
// COUNT 1: pragma 42 ALIAS_ADVICE
// HAS: /ALIAS_ADVICE\(".*:\d+", "\*\(q \+ i\)", ".*:\d+", ".*:\d+", "\*\(p \+ i\)", ".*:\d+"\)/
void copy(int* p, int* q, int n) {
    for (int i = 0; i < n; i++) {
        p[i] = q[i] + 1;
        p[i] ^= q[2 * i];
    }
}

// Of an array and a pointer the pointer alone can be declared.
// FUNCTION: into
// HAS: /ALIAS_ADVICE\(".*:\d+", "\*\(p \+ \(i \+ 1\)\)", ".*:\d+", "", "\*\(&_a \+ i\)", ".*:\d+"\)/
void into(int* p, int n) {
    for (int i = 0; i < n; i++) a[i] = p[i + 1];
}

// Told apart by the program; loads alone; one of them in each iteration far from the other.
// FUNCTION: told
// NOT: ALIAS_ADVICE
int told(int* restrict p, int* restrict q, int* r, int* s, int n) {
    int sum = 0;
    for (int i = 0; i < n; i++) p[i] = q[i] + 1;
    for (int i = 0; i < n; i++) sum += r[i] * s[i];
    if ((r - s >= 8) | (s - r >= 8))
        for (int i = 0; i < 8; i++) r[i] = s[i];
    return sum;
}

int main(void) {
    copy(a, b, 20);
    into(b, 30);
    put_i16(told(a, b, a, a + 10, 9));
    for (int i = 0; i < 64; i++) put_i16(a[i] ^ b[i]);
    return 0;
}
