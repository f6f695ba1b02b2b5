"""Whole programs: what they print, where an executor is given, and that their units read well."""
import unittest

from support import run

PROGRAMS = {
    "assignments wider than their target": ("""
        int main(void) {
            int i = 30000; unsigned u = 5; float f = 3; char c = 'x'; _Bool b = 0; int v[2] = { 7, 8 }, *p = v;
            struct { unsigned n : 3; int s : 4; } z = { 7, -8 };
            i += 40000L; put_i16(i); i = 7; i *= 1.5; put_i16(i); u -= 6; put_u32(u); f /= 2; put_f32(f);
            b++; b++; put_i16(b--); put_i16(b); b |= 4; put_i16(b);
            *p++ *= 2.5; put_i16(v[0]); put_i16(*p); *p++ += 70000L; put_i16(v[1]); put_i16(p - v);
            z.n++; put_i16(z.n); z.s--; put_i16(z.s); put_i16(z.n += 9); c += 1; put_i16(c); return 0;
        }""", "4464 10 65535 1.5 1 0 1 17 8 4472 2 0 7 1 121"),
    "records by value": ("""
        struct S { int a; long b; }; struct P { struct S s[2]; char t; };
        struct S mk(int a, long b) { return (struct S){ .b = b, .a = a }; }
        struct P twice(struct S s) { struct P p = { { s, s }, 't' }; p.s[1].a++; return p; }
        int main(void) {
            struct S a = mk(1, 100000L), b, c, *q = &a; struct P p = twice(a); int i = 1;
            c = b = a; put_i32(c.b); put_i16(mk(5, 6).a); put_i16(twice(mk(8, 9)).s[1].a); put_i16(p.t);
            put_i32((i ? a : p.s[1]).b); put_i16((i++, p.s[1]).a); *q = twice(mk(3, 4)).s[0]; put_i16(a.a); put_i16(i);
            put_i16((b = mk(20, 1)).a); put_i16(b.a); return 0;
        }""", "100000 5 9 116 100000 2 3 2 20 20"),
    "scopes and control": ("""
        static int count(void) { static int n = 3; return n++; }
        int x = 100;
        int main(void) {
            int x = 1, i, n = 0; { int x = 2; { extern int x; put_i16(x); } put_i16(x); } put_i16(x);
            for (int x = 5, j = 8; x < j; x++, j--) { int y = x * j; if (y == 42) continue; put_i16(y); }
            for (i = 0; ; i++) { if (i == 3) break; switch (i) { case 0: n += 1; case 1: n += 10; break; default: n += 100; } }
            put_i16(n); do n--; while (n > 110); put_i16(n); while (1) { if (n-- < 100) goto out; }
        out: put_i16(n); count(); put_i16(count()); switch (7L) { default: put_i16(1); }
            switch (n) { int dead; case 98: dead = 4; put_i16(dead); } i = n > 3 && (put_i16(55), 0) || n == 98; put_i16(i);
            n > 0 ? put_i16(8) : put_i16(9); return 0;
        }""", "100 2 1 40 121 110 98 4 1 4 55 1 8"),
    "initializers": ("""
        struct P { int a[3]; struct { int q, r; }; unsigned b : 3, : 0, c : 5; } p = { .a = { [1] = 5, 6 }, .q = 3, 4, .c = 7 };
        union { long l; int i[2]; } u = { .i = { 1, 2 } }; struct { union { float f; long l; } w; int t; } m = { { .l = 0x3F800000 }, 2 };
        int *at = &p.a[2], grid[][3] = { 1, 2, 3, { 4 }, [3] = { [1] = 9 } }; const char *s[] = { "ab", [2] = "c" "d" };
        char text[4] = "abcd"; long *lp = (long[]){ 10, 20, 30 }; int (*op)(int); static int big[100] = { [50] = 6 };
        int twice(int x) { return 2 * x; } int (*ops[3])(int) = { [1] = twice }; struct L { struct L *next; int v; } l = { &l, 5 };
        int main(void) {
            int v[60] = { 1, [40] = 2, 3 }, i, n = 0; struct P z = { .c = 9, .a = { 1 } }; char t[] = "xyz";
            for (i = 0; i < 60; i++) n += v[i] * i; put_i16(n); put_i16(p.a[2]); put_i16(p.r); put_i16(p.c); put_i32(u.l);
            put_f32(m.w.f); put_i16(m.t); put_i16(*at); put_i16(sizeof grid); put_i16(grid[3][1] + grid[1][0]); put_str(s[2]);
            put_i16(text[3]); put_i32(lp[2]); put_i16(ops[1](21)); put_i16(big[50] + big[99]); put_i16(l.next->next->v);
            put_i16(z.c + z.a[0] + z.r); put_i16(sizeof t + t[2]); put_i16(((int[]){ 4, 5, 6 })[2]); return 0;
        }""", "203 6 4 7 131073 1 2 6 12 13 cd 100 30 42 6 5 10 126 6"),
    "old definitions": ("""
        int old(a, f, c) int a; float f; char c; { return a + (int)f + c; }
        int main(void) { put_i16(old(1, 2.5f, 3)); return 0; }""", "6"),
    "unsigned characters and 64 bits": ("""
        int main(void) {
            unsigned char c = 65535; long long a = -1; unsigned long long m = 0xFFFFFFFFFFFFFFFFULL; c++; put_i16(c);
            put_i64(a << 40); put_i64(m >> 60); put_i64(-9223372036854775807LL - 1); put_i16(m == a); put_i64(3000000000LL);
            put_i64(-134217729LL); put_i16((long long)1 << 33 > 0); return 0;
        }""", "0 -1099511627776 15 -9223372036854775808 1 3000000000 -134217729 1"),
    "functions and their pointers": ("""
        typedef int (*op)(int); enum color { RED, GREEN = 5, BLUE };
        static int sq(int x) { return x * x; } static int neg(int x) { return -x; }
        int apply(int (*g)(int), int v) { return g(v) + (*g)(v) + (**g)(v); } op pick(int k) { return k ? sq : neg; }
        int (*choose(int k))(int) { return k > 1 ? pick(1) : k ? neg : 0; }
        enum color next(enum color c) { switch (c) { case RED: return GREEN; case GREEN: return BLUE; default: return RED; } }
        int fib(int n) { return n < 2 ? n : fib(n - 1) + fib(n - 2); }
        void each(int *v, int n, void (*f)(int *)) { while (n--) f(v++); } void bump(int *p) { ++*p; }
        static const struct { char c; op f; } table[] = { { 's', sq }, { 'n', neg } };
        int main(void) {
            int v[3] = { 1, 2, 3 }, i; put_i16(apply(sq, 3)); put_i16(pick(0)(7)); put_i16(choose(2)(5)); put_i16(choose(0) == 0);
            put_i16(next(next(RED))); put_i16(next(BLUE)); put_i16(fib(12)); each(v, 3, bump); put_i16(v[0] * 100 + v[1] * 10 + v[2]);
            for (i = 0; i < 2; i++) put_i16(table[i].f(4) + (table[i].c == 'n')); put_i16((i ? sq : neg)(6)); return 0;
        }""", "27 -7 25 1 6 0 144 234 16 -3 36"),
    "pointers and arrays": ("""
        int m[2][3][4]; char *copy(char *d, const char *s) { char *r = d; while ((*d++ = *s++)) ; return r; }
        int sum(int a[][4], int n) { int i, j, s = 0; for (i = 0; i < n; i++) for (j = 0; j < 4; j++) s += a[i][j]; return s; }
        long long wide[3] = { 1, 2, 3 }; struct T { struct T *l, *r; int k; };
        int depth(const struct T *t) { int l, r; if (!t) return 0; l = depth(t->l); r = depth(t->r); return 1 + (l > r ? l : r); }
        int main(void) {
            int (*p)[3][4] = m, (*row)[4] = m[1], *e = &m[1][2][3]; unsigned u = 2; char buf[8], *c; void *v = wide;
            struct T a = { 0, 0, 1 }, b = { &a, 0, 2 }, t = { 0, &b, 3 };
            m[1][2][3] = 5; row[0][1] = 6; put_i16(p[1][2][3]); put_i16(*(*(*(m + 1) + 2) + 3)); put_i16(e[-(int)u + 2]);
            e -= u; e += 2; put_i16(*e); put_i16(sum(m[1], 3)); put_i32((char *)&m[1] - (char *)m); put_i32(&m[1] - m);
            put_str(copy(buf, "hello")); c = buf; put_i16(*++c); put_i16(*c++ + (*c)++); put_i16(c[0]); put_i16(2[buf]);
            put_i64(((long long *)v)[2]); put_i64(*((long long *)v + 1)); put_i16((long *)&wide[2] - (long *)wide); put_i16(depth(&t));
            put_i16("xyz"[1]); put_i16(&wide[1] > wide && &wide[0] <= (long long *)v && e); return 0;
        }""", "5 5 5 5 11 12 1 hello 101 209 109 109 3 2 4 3 121 1"),
    "bit-fields and volatile objects": ("""
        struct R { volatile unsigned ctl; union { unsigned all; struct { unsigned en : 1, mode : 3, : 4, irq : 8; } bit; } st; } regs;
        #define R ((struct R *)&regs)
        struct { int s : 3; unsigned u : 16; long w : 20; _Bool b : 1; } f; volatile int ticks; static int reads(void) { return ticks++; }
        int main(void) {
            R->st.bit.irq = 0x1A5; R->st.bit.mode = 5; R->st.bit.en = 1; put_u32(R->st.all); R->ctl |= 4; R->ctl <<= 2; put_i16(R->ctl);
            f.s = 5; put_i16(f.s); f.u = -1; put_i16(f.u > 0); put_i16(f.s - 4 < f.u); f.w = 600000; put_i32(f.w); f.b = 6; put_i16(f.b);
            put_i16(f.s++); put_i16(f.s); put_i16((f.s = 12) + 1); put_i16(-R->st.bit.mode < 0); reads(); ticks; put_i16(reads() * 10);
            return 0;
        }""", "42251 16 -3 1 1 -448576 1 -3 -2 -3 1 10"),
    "integers of every width": ("""
        unsigned ua = 50000; int ia = -1; long la = -70000; unsigned long ul = 4000000000; long long ll = 1; unsigned long long um = 7;
        int main(void) {
            put_i16(ia < ua); put_i16(la < ua); put_i16(la < ul); put_i32(ua + ia); put_u32(ua * 2); put_i32((long)ua * 2);
            put_i32(-7 / 2); put_i16(-7 % 3); put_u32(ul / 3); put_u32(ul >> 4); put_i32(la >> 4); put_i16(ia >> 1); put_u32(ua >> 1);
            put_i64(ll << 40); put_i64((ll << 40) / -3); put_i64(um - 8 > 0); put_i64((int)ul); put_i64((unsigned)la); put_i16('\\xFFFE');
            put_i16(sizeof(char) + sizeof(long) + sizeof 1LL + sizeof 'a'); put_i64(0xFFFF + 1); put_i64(65535 + 1); put_i16(1 ? -1 : 0u);
            put_f32(ul); put_f32((float)la / 16); put_i32(-2.9f); put_u32((unsigned)3.99); put_i64(1e15L); put_i16(!0.5f + !0); return 0;
        }""", "0 1 0 49999 34464 100000 -3 -1 1333333333 250000000 -4375 -1 25000 1099511627776 -366503875925 1 10240 61072 -2 "
              "8 0 65536 -1 4e+09 -4375 -2 3 1000000000000000 1"),
    "built-ins": ("""
        #include <intrinsics.h>
        int main(void) { put_i32(__mpy(-3, 4)); put_i16(__max(3, 9)); put_i16(__abs16_sat(-32767 - 1)); return 0; }""",
                  "-12 9 32767"),
}


class Programs(unittest.TestCase):
    def test_output(self):
        for name, (source, expected) in PROGRAMS.items():
            with self.subTest(name):
                printed = run("#include <zrun.h>\n" + source)
                if printed is not None:
                    self.assertEqual(printed, expected.split(" "))

    def test_several_files(self):
        first = """#include <zrun.h>
            struct N { int v; struct N *next; }; extern struct N *head; static int hidden = 1;
            void push(struct N *n); int count(void);
            int main(void) { struct N a = { 3, 0 }, b = { 4, 0 }; push(&a); push(&b); put_i16(count());
                put_i16(head->v * 10 + head->next->v); put_i16(hidden); return 0; }"""
        second = """struct N { int v; struct N *next; }; static int hidden = 7; struct N *head;
            void push(struct N *n) { n->next = head; head = n; }
            int count(void) { int c = 0; struct N *p; for (p = head; p; p = p->next) c++; return c * hidden; }"""
        printed = run([first, second])
        if printed is not None:
            self.assertEqual(printed, ["14", "43", "1"])

    def test_a_double_is_what_the_abi_says(self):
        source = "#include <zrun.h>\nint main(void) { double d = 0.1; put_f64(d); return 0; }"
        for abi, expected in (("legacy", "0.10000000149011612"), ("eabi", "0.10000000000000001")):
            printed = run(source, "--abi=" + abi)
            if printed is not None:
                self.assertEqual(printed, [expected])


if __name__ == "__main__":
    unittest.main()
