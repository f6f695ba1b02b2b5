// Computations that are redundant on some path go, and nothing is computed that was not.
// RUN: --opt_level=2 --disable_inlining --debug:validate
#include <stdlib.h>
#include <string.h>
#include <zrun.h>

void use(int x);
int check(int b);
int hits, cell, *volatile pc = &cell;
void use(int x) { hits += x; }
int check(int b) { if (b == 0) { put_i16(-1); exit(0); } return b; }

#define E(a, b) (((a) ^ (b) * 3) * ((a) + (b) * 5))

// In both arms and behind them: no third time.
// FUNCTION: both_arms
// COUNT 2: b * 5 + a
int both_arms(int a, int b, int c) {
    int x;
    if (c > 0) x = E(a, b); else { use(E(a, b) + 1); x = 1; }
    use(c);
    return x + E(a, b);
}

// In one arm and behind it: the other arm computes it, too.
// FUNCTION: one_arm
// COUNT 2: b * 5 + a
int one_arm(int a, int b, int c) {
    if (c > 0) use(E(a, b)); else use(c);
    return E(a, b);
}

// Not where one path does not need it.
int not_on_the_other_path(int a, int b, int c, int d) {
    if (c > 0) use(E(a, b)); else use(c);
    if (d > 0) return c;
    return E(a, b);
}

// An operand changes in between, also within one statement.
int changed(int a, int b, int c) {
    int x = (a + b) * c, y, z;
    if (c > 3) use(x);
    a++;
    y = (a + b) * c;
    if (c > 4) use(y);
    z = (a + b) * c + a++;
    if (c > 5) use(a);
    return x ^ y ^ z ^ (a + b) * c;
}

// Effects among the reads that leave the operands alone: the value is there ahead of them.
// FUNCTION: beside_effects
// COUNT 1: b * 5 + a
int beside_effects(int a, int b, int n, int *p) {
    int i, k, s = 0;
    for (i = 0; i < n; i++) {
        *p++ = E(a, b) + i;
        s += check(i + 1) ^ E(a, b);
        cell = (k = check(n)) + E(a, b) + k;
    }
    return s;
}

// Those that change them, those that are not evaluated, and, beside a call that may not return, what may trap.
// FUNCTION: beside_other_effects
// HAS: /\(a \+= 1\) && \(_cell \+= .* a\)\) && _check\(b\) \+ a . b$/
// HAS: return _check(b) + a / b
int beside_other_effects(int a, int b, int c) {
    if (c & 1) use(E(a, b)); else cell = E(a, b) + 1;
    c += (E(a, b) & 4) && (a += 1) && (cell += E(a, b)) && check(b) + a / b;
    if (c & 2) return check(b) + a / b;
    return E(a, b);
}

// The temporary goes along with a variable that is stepped; behind the last use it may leave the type.
// FUNCTION: goes_along
// COUNT 1: * 5
// HAS: /^\$O\$U\d \+= 5$/
int goes_along(int i, int n, int a) {
    for (; i < n; i++) {
        use(a + 5 * i);
        if (i & 1) use((a + 5 * i) ^ 3);
    }
    return i;
}

// FUNCTION: goes_along_in_one_arm
// COUNT 1: * 38
// HAS: /^\$O\$U\d -= 74$/
long goes_along_in_one_arm(int n, int k) {
    int i = k, j;
    long s = 0;
    for (j = 0; j < n; j++) {
        if (j % 3 == 1) i -= 2;
        use(j);
        s += ((long)i * 37 + k) ^ j;
    }
    return s;
}

// Below a complement the product would not wrap: it is made where the program makes it.
// FUNCTION: complement
// COUNT 2: * 5
void complement(int i, int n) {
    if (n == 3) use(~(i * 5));
    for (int j = 0; j < n; j++) {
        i -= 6000;
        use(~(i * 5));
    }
}

// A displacement that no access has room for is added once; one that it has belongs to it.
int far[40000];
// FUNCTION: out_of_reach
// COUNT 1: + 35000
// COUNT 3: + 300)
int out_of_reach(int k) {
    far[35000] ^= k; far[300] += k; use(k);
    far[35000] += 2; far[300] ^= k; use(k + 1);
    far[35000] -= k;
    return far[300];
}

// A division stays behind a call that may not return; 1: it is not computed ahead of the loop.
// FUNCTION: divides
// COUNT 1: n / b
int divides(int n, int b) {
    int i, s = 0;
    for (i = 0; i < n; i++) { check(b); s += n / b; }
    return s;
}

// The same of a call that only computes.
int quotient(int n, int b) { return n / b + n; }
// FUNCTION: divides_by_call
// HAS: _check(b)
// HAS: /_quotient\(/
int divides_by_call(int n, int b) {
    int i, s = 0;
    for (i = 0; i < n; i++) { check(b); s += quotient(n, b) ^ i; }
    return s;
}

// FUNCTION: calls_on_both_arms
// COUNT 2: _quotient(
int calls_on_both_arms(int a, int b, int c) {
    int x;
    if (c > 0) x = quotient(a, b); else { use(quotient(a, b) + 1); x = 1; }
    use(c);
    return x + quotient(a, b);
}

// Bit-fields of one container, and a variable that a pointer reaches.
struct BITS { unsigned a : 4, b : 5; } bits;
unsigned parts(struct BITS *p, struct BITS *q, int c) {
    unsigned x = p->a * 3u;
    if (c) use(x);
    q->b = c; q->a += 1;
    if (c > 1) use(p->a * 3u);
    return x + p->a * 3u + p->b;
}
int reached(int a, int b, int c) {
    int v = a, *q = c > 1 ? &v : &cell, x = v * b * 3;
    if (c) use(x);
    *q = c;
    return x ^ v * b * 3;
}

// A shift or a compare of another sign is another computation.
int signs(int a, unsigned u, int c) {
    int x = a >> 1, y;
    if (c) use((unsigned)a >> 1 > 9u);
    y = (unsigned)a >> 1 > 100u;
    if (c > 2) use(a < 7);
    return x + y + ((unsigned)a < 7u) + (int)(u >> 1) + (a >> 1);
}

struct S { int a, b[3]; } gs;
// Stores of structures, copies of memory, calls and unknown pointers change what is read.
int changes_of_memory(struct S *s, struct S *t, int *p, int c) {
    int x = s->b[1] * 3, y, z, w;
    if (c) use(x);
    *s = *t;
    y = s->b[1] * 3;
    if (c) use(y);
    memcpy(s, &gs, sizeof gs);
    z = s->b[1] * 3;
    *p = 4;
    w = s->b[1] * 3;
    if (c > 1) use(w);
    *pc = 77;
    return x + y * 2 + z * 4 + w * 8 + s->b[1] * 3 + cell;
}

// FUNCTION: around_a_loop
// COUNT 1: a * b * 5
int around_a_loop(int a, int b, int n) {
    int i = 0, s = 0;
    do { s ^= a * b * 5 + i; use(s); i++; } while (i < n);
    return s;
}

// Edges of a switch that lead to one place.
int critical_edges(int a, int b, int c) {
    int x = 0;
    switch (c) {
    case 1: x = a * b * 7; break;
    case 2: use(a * b * 7);
    case 3:
    case 4: x += a * b * 7; break;
    case 5: break;
    default: use(3);
    }
    return c > 2 ? x + a * b * 7 : x;
}


// The best so far is not asked again, unless what the answer comes from has changed.
int weight(int x) { return x * x % 11 + cell * x; }
// FUNCTION: heaviest
// COUNT 2: _weight(
// HAS: /K\d+ = \$O\$N\d+$/
int heaviest(int n) {
    int i, best = 0;
    for (i = 1; i < n; i++)
        if (weight(i) > weight(best)) best = i;
    return best;
}
int heaviest_of_changing(int n, int *p) {
    int i, best = 0, first = 0, jump = 0;
    for (i = 1; i < n; i++) {
        if (weight(i) > weight(best)) { *p = i - 3; best = i; }
        if (weight(i) > weight(first)) { first = i; *p ^= n; }
        if (weight(i) > weight(jump)) { i++; jump = i; }
    }
    return best + first * 16 + jump * 256;
}

// An operator that gets the address of a variable, and assembly, change it.
const int taps[8] = {3, 1, 4, 1, 5, 9, 2, 6};
long accumulated(const int *x, int k, int c) {
    long sum = k, before = sum * 7, now, after;
    int i;
    if (c) use((int)before);
    for (i = 0; i < 8; i++) sum += (long)taps[i] * x[i];
    now = sum * 7;
    if (c > 1) use((int)now);
    for (i = 0; i < 8; i++) sum += (long)taps[i] * x[7 - i];
    after = sum * 7;
    return before ^ now ^ after;
}
// FUNCTION: assembled
// COUNT 2: * 21
int assembled(int c) {
    int x = cell * 21;
    if (c) use(x);
    if (c > 1000) asm("    INC @_cell");
    return x + cell * 21;
}

// A loop stays closed by its test: nothing is computed on the edge back.
// FUNCTION: closed_by_its_test
// COUNT 1: goto
int *tab[2];
int closed_by_its_test(int k) {
    int i, *p = tab[1];
    for (i = 0; i < 4; i++) {
        hits = *tab[1];
        *tab[1] %= k;
        *tab[1] = k - *p;
    }
    return hits + *p;
}

// Of an output that is optimized once more: the pointer's name tells that nobody declared what it points to.
short shorts[16];
unsigned stepped_once_more(short *first) {
    int *$O$P3 = (int *)(first + 1), *$O$P4 = (int *)(first + 11);
    do {
        unsigned read = (unsigned)first[3] << 2;
        *$O$P3 = (int)(read + $O$P3[1]);
        $O$P3 += 1;
    } while ($O$P3 != $O$P4);
    return (unsigned)first[8];
}

int main(void) {
    static int buffer[4];
    struct S s = {1, {2, 3, 4}}, t = {5, {6, 7, 8}};
    int c;
    gs.b[1] = 11;
    for (c = -1; c < 7; c++) {
        put_i16(both_arms(c, 7, c - 2)); put_i16(one_arm(c, 3, c - 1)); put_i16(not_on_the_other_path(c, 9, c - 2, c & 1));
        put_i16(changed(c, 8, c)); put_i16(signs(c - 3, 7u + c, c)); put_i16(around_a_loop(c, 3, 4));
        put_i16(critical_edges(c, 6, c));
        put_i16(changes_of_memory(&s, &t, &s.b[1], c));
        s.b[1] = c;
        put_i16(calls_on_both_arms(c, 7, c)); put_i16(parts(&bits, &bits, c)); put_i16(reached(c, 5, c));
    }
    for (c = -3; c < 4; c++) {
        static const int in[8] = {7, -2, 5, 3, -9, 4, 1, 8};
        cell = c;
        put_i16(heaviest(9)); put_i16(heaviest_of_changing(9, &cell)); put_i16(cell);
        put_i32(accumulated(in, c, c)); put_i16(assembled(c));
    }
    for (c = 0; c < 16; c++) shorts[c] = (short)(c * 3 + 1);
    put_u32(stepped_once_more(shorts));
    cell = 77;
    tab[1] = &cell;
    put_i16(closed_by_its_test(30)); put_i16(cell);
    put_i16(divides_by_call(5, 2)); put_i16(divides_by_call(0, 0));
    for (c = 1; c < 7; c++) { put_i16(beside_effects(c, 3, c & 3, buffer)); put_i16(cell + buffer[0]); }
    for (c = 1; c < 7; c++) { put_i16(beside_other_effects(c, 3, c)); put_i16(beside_other_effects(9 * c, 3, 4)); }
    complement(7000, 2);
    put_i16(goes_along(1, 6, 32740)); put_i16(goes_along(-3, 4, -7)); put_i16(hits);
    put_i32(goes_along_in_one_arm(8, 900)); put_i32(goes_along_in_one_arm(0, 900));
    put_i16(out_of_reach(9)); put_i16(far[35000]);
    put_i16(divides(5, 2)); put_i16(divides(0, 0)); put_i16(hits);
    put_i16(divides(4, 0));
    return 0;
}
