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
