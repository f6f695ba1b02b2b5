// A test whose outcome is known on some ways to it goes there, with a copy of the statements ahead of it.
// RUN: --opt_level=2 --disable_inlining
#include <zrun.h>

static int a, b, t;
static void step(void) { a += 3; }

// FUNCTION: repeated
// COUNT 1: if (
void repeated(int x, int* q) {
    if (x > 3) a = q[0];
    t += x;
    if (x > 3) b = q[1];
}

// FUNCTION: opposite
// COUNT 2: _t = x
void opposite(int x, int* q) {
    if (x > 3) a = q[0];
    t = x;
    if (x < 2) return;
    b = q[1];
}

// FUNCTION: flag
// NOT: found
// COUNT 3: if (
int flag(const int* q, int n) {
    int found = 0;
    for (int i = 0; i < n; ++i)
        if (q[i] == 7) {
            found = 1;
            break;
        }
    t += n;
    if (found) return a;
    return 3;
}

// FUNCTION: across_call
// COUNT 1: if (
void across_call(int x, int* q) {
    if (x) a = q[0];
    step();
    if (x) b = q[1];
}

// FUNCTION: changed_through_pointer
// COUNT 2: if (
void changed_through_pointer(int* p, int* q) {
    if (*p > 3) a = q[0];
    *q = 5;
    if (*p > 3) b = q[1];
}

// FUNCTION: long_tail
// COUNT 2: if (
void long_tail(int x, int* q) {
    if (x > 3) a = q[0];
    t += q[2] * x + q[3] * (x + 1) + q[4] * (x + 2) + q[5] * (x + 3) + q[6] * (x + 4);
    if (x > 3) b = q[1];
}

// FUNCTION: closes_loop
// COUNT 2: if (
int closes_loop(int* q) {
    int again, n = 0;
    do {
        again = 0;
        if (q[n] < 5) {
            again = 1;
            t += q[n];
        }
        ++n;
    } while (again);
    return n;
}

// FUNCTION: asm_once
// COUNT 2: if (
void asm_once(int x, int* q) {
    if (x > 3) a = q[0];
    __asm(" nop");
    if (x > 3) b = q[1];
}

// FUNCTION: selects
// COUNT 1: __min(
int selects(int x, int y) {
    int m = x;
    if (x < 0) m = 0;
    t += y;
    if (m > 99) m = 99;
    return m;
}

int main(void) {
    int q[8] = {1, 2, 3, 4, 7, 6, 5, 8};
    for (int x = 0; x < 6; ++x) {
        repeated(x, q);
        opposite(x, q);
        put_i32(flag(q, x));
        across_call(x - 3, q);
        changed_through_pointer(q + x, q + 3);
        long_tail(x, q);
        put_i32(closes_loop(q));
        asm_once(x, q);
        put_i32(selects(x * 40 - 50, x));
        put_i32(a);
        put_i32(b);
        put_i32(t);
    }
    return 0;
}
