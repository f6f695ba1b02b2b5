// Addresses that move with a loop's counter become pointers; a counter that nothing else needs goes.
// RUN: --opt_level=2 --debug:skip=cd-unroll-completely-for-speed+cd-unroll-for-speed
#include <zrun.h>

int a[300], b[300];
long m[8][8], w[64];

// The test is on the pointer: it meets its end exactly, also where the loop does not run.
// FUNCTION: dot
// HAS: s += *$O$P0++ * *$O$P1++
// NOT: i
// HAS: if (!($O$P0 == $O$P2)) goto L2
// COUNT 0: n > 0 ? x + n : x
int dot(const int *x, const int *y, int n) {
    int s = 0;
    for (int i = 0; i < n; i++) s += x[i] * y[i];
    return s;
}

// Rows become pointers of the outer loop.
// FUNCTION: total
// COUNT 1: s += *$O$P0
// COUNT 0: i +=
// COUNT 0: j +=
long total(void) {
    long s = 0;
    for (int i = 0; i < 8; i++)
        for (int j = 0; j < 8; j++) s += m[i][j];
    return s;
}

// Down, by twos, with the limit met and passed.
// FUNCTION: strides
// COUNT 0: i -=
// COUNT 0: i +=
long strides(void) {
    long s = 0;
    for (int i = 63; i > 0; i -= 2) s = s * 3 + w[i];
    for (int i = 1; i < 63; i += 4) s = s * 5 + w[i] * w[i + 1];
    return s;
}

// The pointer steps where the counter does.
// FUNCTION: chosen
// HAS: /if .*goto/
// HAS: $O$P0 += 2
// HAS: k += 1
int chosen(int n) {
    int k = 0;
    for (int i = 0; i < n; i++) {
        w[k] = w[k] + i;
        if (a[i] & 1) k++;
    }
    return k;
}

// Offsets from one pointer, up from the lowest.
// FUNCTION: smooth
// COUNT 1: *($O$P0 + 2)
// COUNT 1: *($O$P0 + 4)
void smooth(int n) {
    for (int i = 1; i < n; i++) w[i] = w[i - 1] + w[i + 1];
}

// By an amount that stays, and through a variable that each round sets anew; not by the value of the round before.
// FUNCTION: butterfly
// COUNT 4: /P[0-9] \+= \$O\$/
// COUNT 0: k =
void butterfly(int half) {
    for (int i = 0; i < 32; i += half * 2) {
        int k = i + half;
        w[i] = w[i] + w[k];
        a[i] = a[k] ^ a[i];
        w[k] ^= a[k];
    }
}

// FUNCTION: late
// COUNT 1: k = m + 1
void late(int n) {
    int k = 3, m = 0;
    for (int i = 0; i < n; i++) {
        k = m + 1;
        m = i;
        w[k] = w[k] + b[m];
    }
}

// It is read behind the loop.
// FUNCTION: found
// COUNT 1: i += 1
int found(int key) {
    int i;
    for (i = 0; i < 64; i++)
        if (w[i] == key) break;
    return i;
}

// An unsigned counter wraps, and so does the address.
// FUNCTION: wraps
// COUNT 0: $O$P
long wraps(unsigned u, const long *p, int n) {
    long s = 0;
    do {
        s += p[u];
        u += 0x8000u;
    } while (--n > 0);
    return s;
}

// Bounded by its test it does not.
// FUNCTION: bounded
// COUNT 0: u +=
long bounded(unsigned n) {
    long s = 0;
    for (unsigned u = 0; u < n; u++) s += w[u];
    return s;
}

// From the greatest value on it meets the limit later, though the first test leaves for others above the limit.
// FUNCTION: tested_late
// COUNT 1: u += 1
long tested_late(unsigned long u, unsigned long n) {
    long s = 0;
    do s = s * 3 + a[u + 1];
    while (++u < n);
    return s;
}

// A signed one does not wrap: the first test may leave, or the last value is met.
// FUNCTION: tested_late_signed
// COUNT 0: i += 1
long tested_late_signed(int i, int n) {
    long s = 0;
    do s = s * 3 + a[i + 1];
    while (++i < n);
    return s;
}

// FUNCTION: kept_volatile
// COUNT 0: $O$P0 +=
long kept_volatile(int n) {
    long s = 0;
    for (volatile int i = 0; i < n; i++) s += w[i];
    return s;
}

// A call may change it.
// FUNCTION: kept_aliased
// COUNT 0: $O$P0 +=
static void twice(int *i) { ++*i; }
long kept_aliased(int n) {
    long s = 0;
    for (int i = 0; i < n; i++) {
        s += w[i];
        twice(&i);
    }
    return s;
}

// What is promised of a loop stands right ahead of it, and of an iteration that is promised no test asks.
// FUNCTION: promised
// HAS: $O$P0 = &_w
// HAS: /^pragma 39 MUST_ITERATE/
// NOT: goto
// HAS: L1:
long promised(int n) {
    long s = 0;
#pragma MUST_ITERATE(2)
    for (int i = 0; i < n; i++) s += w[i];
    return s;
}

// No induction steps by what the loop changes, and nothing is evaluated for a step but where it stands.
long next[300], growing = 1;
volatile int one_of_three = 3;
int asked;
int ask(int i) {
    asked++;
    return (i & 3) + 1;
}
// FUNCTION: changing_steps
// COUNT 1: _ask(
long changing_steps(int n) {
    long r = 1;
    int k = 1, j = 0;
    for (int i = 0; i < n; i += k) w[i] = i, k++;
    for (int i = 0; i < n; i += next[i]) r = r * 5 + w[i];
    for (int i = 0; i < n; i += ask(i)) r = r * 5 + w[i];
    for (int i = 0; i < n; i += growing) r = r * 5 + w[i], growing = growing * 2;
    for (int i = 0; i < n; i += one_of_three) r = r * 5 + w[i];
    for (int i = 0; i < n; i += (j++, 1)) r = r * 5 + w[i] + w[j];
    for (int i = 0; i < n; i += (k = k & 3) + 1) r = r * 5 + w[i] + w[k], k += i;
    return r + asked;
}

// FUNCTION: kept_apart
// COUNT 0: x + i
// COUNT 0: y + i
void kept_apart(const int *restrict x, int *restrict y, int n) {
    for (int i = 0; i < n; i++) y[i] = x[i] * x[i + 1];
}

// A pointer of an inner loop with a known trip count continues from where that loop left it; not where it may be left early,
// where the outer counter steps ahead of it, or where the count is not known.
// FUNCTION: nests
// COUNT 4: /[$]O[$]P[0-9]+ = [$]O[$]P[0-9]+$/
long nests(int n, int k) {
    long s = 0;
    for (int i = 0; i < 8; i++)
        for (int j = 1; j < 6; j++) s = s * 3 + m[i][j];
    for (int i = 0; i < 8; i++)
        for (int j = 7; j >= 2; j -= 2) s = s * 5 + m[i][j] + m[j][i];
    for (int i = 0; i < 8; i++)
        for (int j = 0; j < 8 && s != 77; j++) s = s * 3 + m[i][j];
    for (int i = -1; i++ < 7;)
        for (int j = 0; j < 4; j++) s = s * 7 + m[i][j];
    for (int i = 0; i < n; i += k)
        for (int j = 0; j < n; j++) s = s * 3 + m[i][j];
    for (int h = 0; h < 3; h++)
        for (int i = h; i < 8; i++) {
            if (m[i][0] == s) continue;
            for (int j = 0; j < 3; j++) s = s * 3 + m[i][j];
        }
    return s;
}

// An address that stays is computed ahead of the loop; the load is not, for the loop stores to what it reads.
// FUNCTION: settled
// COUNT 1: PMCONV((long)k
// HAS: /^s \+= \*\(\$O\$U0 \+ 6\) \* \*\$O\$P\d$/
void settled(int k, int n, long s) {
    for (int i = 0; i < n; i++) {
        s += m[k][3] * w[i];
        w[i] = s;
        m[i & 7][3]++;
    }
}

// Two counters of one value are one, which may be read behind the loop; a use between their steps sees them differ.
// FUNCTION: together
// COUNT 0: p +=
// COUNT 1: i += 1
int together(const int *x, int n) {
    int i = 0, p = 0, s = 0;
    while (i < n) s = s * 3 + x[i] + (p & 3), i++, p++;
    return s + i;
}

// FUNCTION: apart
// COUNT 1: k += 1
// COUNT 1: p += 1
int apart(const int *x, int n) {
    int k = n, p = n, s = 0;
    do {
        k++;
        s = s * 3 + x[p & 7] * k;
        p++;
    } while (s < 999 && k < 99);
    return s;
}

// A pointer that steps beside a counter takes its test: up, down and over a limit, with the pointer's step on either side of
// the test and the loop perhaps not entered.
// FUNCTION: beside
// COUNT 1: n -=
// COUNT 0: i +=
// COUNT 1: m -=
// COUNT 0: k -=
long beside(const int *p, const long *q, int n, unsigned u) {
    long s = u, i;
    int m = n, k = 5, last = n;
    while (n-- > 0) s = s * 3 + *p++;
    while (m--) s = s * 3 + *q++;
    while (u--) s ^= *--p;
    for (i = 2; i <= last; i++) s += *++p;
    do s = s * 5 + *q--;
    while (--k);
    return s;
}

// Not where the counter is needed, may wrap, or passes its limit by more than one; nor where a step is left out.
// FUNCTION: not_beside
// COUNT 2: /^n -= 1/
// COUNT 2: /^u [-+]= [13]/
// COUNT 1: /^k [+]= 1/
long not_beside(const int *p, int n, unsigned u, int k) {
    long s = 0;
    while (n-- > 0) s = s * n + *p++;
    do s = s * 3 + *p++;
    while (--u > 60);
    for (; u < 70; u += 3) s = s * 3 + *p--;
    for (; k < 9; k++)
        if (s & 1 << k) s ^= *p++;
    return s;
}

// What no iteration changes is computed ahead of the loop, from the outermost one on; the address of an array only where
// something varies is added to it. It may overflow where it was not computed before: then in the unsigned type.
// FUNCTION: invariant
// HAS: /^[$]O[$]P\d+ = &_b$/
// HAS: $O$N1 = (int)((unsigned int)k * 3) ^ n
// HAS: $O$N2 = (int)((unsigned int)_g + 2)
// HAS: L2:
// COUNT 1: &_b
int g = 5;
int invariant(int n, int k) {
    int s = 0;
    for (int i = 0; i < n; i++)
        for (int j = i; j < 20; j += 3)
            if (s & 8) s += b[s & 63] * (k * 3 ^ n);
            else s ^= b[s & 31] + (g + 2);
    return s;
}

// Not what it changes, by name or through a pointer, and nothing that may fail.
// FUNCTION: variant
// HAS: s = 0
// COUNT 1: k * 5
// COUNT 1: _g + 3
// COUNT 1: n / k
// COUNT 0: $O$N
int variant(int n, int k, int *p) {
    int s = 0;
    for (int i = 0; i < n; i++) {
        if (s & 1) s += n / k;
        s += (k * 5) ^ (g + 3);
        k += s & 1;
        *p = i;
    }
    return s;
}

int main(void) {
    for (int i = 0; i < 300; i++) a[i] = i ^ 5, b[i] = 300 - i;
    for (int i = 0; i < 64; i++) w[i] = i * 7L, next[i] = i % 3 + 1, m[i / 8][i % 8] = i;
    put_i16(dot(a, b, 30));
    put_i16(dot(a, b, 0));
    put_i16(dot(a, b, -3));
    put_i32(total());
    put_i32(strides());
    put_i16(chosen(20));
    smooth(30);
    butterfly(1);
    butterfly(4);
    late(20);
    put_i32(w[29] + w[7] * 3 + w[12] + a[8]);
    put_i16(found(203));
    put_i32(wraps(3, w, 1) + bounded(9) + kept_volatile(9) + kept_aliased(9) + promised(4));
    put_i32(changing_steps(60) + tested_late(-1UL, 5) * 7 + tested_late(9, 5));
    for (int i = 0; i < 4; i++) put_i32(tested_late_signed(i, 2) ^ tested_late_signed(i + 9, 13));
    kept_apart(a, b, 30);
    put_i16(b[29] + b[3]);
    put_i32(nests(8, 3));
    settled(2, 20, 5);
    put_i32(w[19] ^ m[2][3]);
    for (int n = 0; n < 4; n++) put_i32(beside(a + 9, w + 9, n, n) ^ not_beside(a + 9, n, n + 60, n * 3));
    put_i16(invariant(9, 30000) ^ invariant(0, 32767) ^ variant(7, 0, &g) ^ variant(3, 2, a));
    put_i16(together(a, 9) + together(a, 0) + apart(a, 5));
    return 0;
}
