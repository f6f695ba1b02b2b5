// Arrays and structures of scopes that are never entered together lie over each other in one union.
// RUN: --opt_level=2 --optimizer_interlist
// HAS: ; The following local variables in _blocks() will be grouped together
// HAS: // ; to share stack space among distinct scoping blocks.  References
// HAS: // ; in the source interlisting will look like "$O$O1.s3_6.l3_0$a" or "&$O$O1+0".
// HAS: /;         0\t  \$O\$O1.s3_6.l3_0\$a              a  \[.*stack_sharing.c:\d+\]/
// HAS: /;        20\t  \$O\$O1.s3_6.u3_5.s4_2.l4_1\$deep deep  \[/
// HAS: /;        20\t  \$O\$O1.s3_6.u3_5.s4_4.l4_3\$other other  \[/
#include <zrun.h>

struct big {
    int v[12];
    long l;
    float f;
};
struct pair {
    int x, y;
};
struct twin {
    int v[2];
};

int sum(int *p, int n) {
    int s = 0;
    while (n-- > 0) s += *p++;
    return s;
}
void fill(int *p, int n, int by) {
    for (int i = 0; i < n; i++) p[i] = i * by;
}

int setjmp(int *environment);

// FUNCTION: blocks
// HAS: /\d \$O\$O1: union U2_11, class 1, qualifiers 0000, 832 bits aligned to 32/
// HAS: /_fill\(&outer/
// HAS: /other\.l = 77/
int blocks(int n) {
    int outer[10], r = 0, i;
    fill(outer, 10, 3);
    {
        int a[20];
        fill(a, 20, n);
        if (n > 2) {
            int deep[32];
            for (i = 0; i < 32; i++) deep[i] = a[i % 20] + i;
            r += deep[n] + deep[31];
        } else {
            struct big other;
            for (i = 0; i < 12; i++) other.v[i] = i + a[i];
            other.l = 77;
            other.f = 2.5f;
            r += other.v[n] + (int)other.l + (int)other.f;
        }
        r += sum(a, 20);
    }
    for (i = 0; i < 3; i++) {
        struct big b;
        fill(b.v, 12, i + 1);
        b.l = i;
        r += sum(b.v, 12) + (int)b.l;
    }
    {
        float *p, z[16];
        for (p = z; p < z + 16; p++) *p = (float)(p - z);
        r += (int)z[n];
    }
    return r + sum(outer, 10);
}

// What is read of an array must not move behind a store to another type in its place, through pointers either.
// FUNCTION: types
// HAS: /.*union U2_/
int types(int n) {
    int r, q;
    {
        int a[10], *p = a;
        fill(a, 10, n);
        r = p[3] + a[n];
        q = p[4];
    }
    {
        float b[10], *p = b;
        sum((int *)b, 0);
        for (int i = 0; i < 10; i++) p[i] = 1.5f;
        b[n] = 2.0f;
        r += (int)p[n];
    }
    return r * 100 + q;
}

// One scope alone, one within the other, and what is no gain or no plain storage.
// FUNCTION: nested
// COUNT 0: union
int nested(int n) {
    int r = 0;
    {
        int a[20];
        fill(a, 20, n);
        {
            int b[20];
            fill(b, 20, a[3]);
            r += sum(b, 20);
        }
        r += sum(a, 20);
    }
    return r;
}

// FUNCTION: left_out
// COUNT 0: union
int left_out(int n) {
    int r = 0;
    {
        struct pair p = {n, 2};
        struct twin t;
        t.v[n & 1] = 3;
        t.v[~n & 1] = 4;
        r += p.x + p.y + t.v[0];
    }
    {
        volatile int v[4];
        int few[4];
        v[n] = 5;
        few[0] = v[n];
        few[1] = r;
        r += few[0] + few[1];
    }
    {
        const int table[9] = {1, 2, 3, 4, 5, 6, 7, 8, 9};
        static int lasting[9];
        lasting[n] += table[n + 1];
        r += lasting[n];
    }
    {
        int a[20];
        fill(a, 20, n);
        r += sum(a, 20);
    }
    return r;
}

// Control may come back to where the first block was left.
// FUNCTION: returned_to
// COUNT 0: union
int returned_to(int n) {
    int r = 0, environment[8];
    if (n > 99) r = setjmp(environment);
    {
        int a[20];
        fill(a, 20, n);
        r += sum(a, 20);
    }
    {
        int b[20];
        fill(b, 20, n);
        r += sum(b, 20);
    }
    return r;
}

// What one scope holds is read before another scope's array takes its place, not on the way that needs it.
int late(int wanted, int v) {
    int x, y;
    {
        int first[9];
        first[v & 7] = v;
        first[wanted & 7] = v + 2;
        x = first[wanted & 7];
    }
    {
        int second[9];
        second[v & 7] = 5;
        second[wanted & 7] = 6;
        y = second[wanted & 7];
    }
    if (wanted) return x + y;
    return y;
}

int main(void) {
    put_i16(late(3, 10));
    for (int i = 0; i < 5; i++) {
        put_i16(blocks(i));
        put_i16(types(i));
        put_i16(nested(i));
        put_i16(left_out(i < 2 ? i : 2));
        put_i16(returned_to(i));
    }
    return 0;
}
