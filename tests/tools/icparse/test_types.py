"""Types, layouts and conversions."""
import unittest

from support import error_of, expression, initializer, symbol_of, translate, T


class Layout(unittest.TestCase):
    def members(self, text):
        record = T.strip(symbol_of(translate(text + " x;"), "_x").type)
        return record.size, record.align, [(m.name, m.offset, m.width) for m in record.members]

    def test_records(self):
        cases = [
            ("struct { char c; long l; }", (64, 32, [("c", 0, None), ("l", 32, None)])),
            ("struct { long long a; char b; }", (96, 32, [("a", 0, None), ("b", 64, None)])),
            ("struct { int a[3]; int *p; }", (96, 32, [("a", 0, None), ("p", 64, None)])),
            ("union { char c; long l[2]; }", (64, 32, [("c", 0, None), ("l", 0, None)])),
            ("struct { unsigned a : 3, b : 5, c : 9; }", (32, 16, [("a", 0, 3), ("b", 3, 5), ("c", 16, 9)])),
            ("struct { unsigned a : 3; unsigned : 0; unsigned b : 2; }", (32, 16, [("a", 0, 3), ("b", 16, 2)])),
            ("struct { unsigned a : 3; int : 6; int b : 7; }", (16, 16, [("a", 0, 3), ("b", 9, 7)])),
            ("struct { int a : 9; long b : 20; }", (32, 32, [("a", 0, 9), ("b", 9, 20)])),
            ("struct { int a : 9; long b : 24; }", (64, 32, [("a", 0, 9), ("b", 32, 24)])),
            ("struct { int a; struct { int b; long c; }; }", (96, 32, [("a", 0, None), (None, 32, None)])),
            ("struct { int n; long tail[]; }", (32, 32, [("n", 0, None), ("tail", 32, None)])),
        ]
        for text, expected in cases:
            with self.subTest(text):
                self.assertEqual(self.members(text), expected)

    def test_abi_decides_double_and_wide_characters(self):
        for abi, size in (("legacy", "2:unsigned long"), ("eabi", "4:unsigned long")):
            unit = translate("unsigned long n = sizeof(double); double d;", abi)
            self.assertEqual(symbol_of(unit, "_n").initializer[0].value, int(size[0]))
            self.assertEqual(symbol_of(unit, "_d").type.size, 16 * int(size[0]))

    def test_declarators(self):
        cases = [("int (*x)(char, long);", "int (char, long) *"), ("const char *const x[3];", "const char * const[3]"),
                 ("unsigned long long int x;", "unsigned long long"), ("short unsigned x;", "unsigned short"),
                 ("signed char x;", "signed char"), ("long signed int x;", "long"),
                 ("struct S { int a; } y, *x;", "struct S *"), ("enum E { A } y, x = A;", "enum E"),
        ("int (*x[2])(int (*)[3], ...);", "int (int[3] *, ...) *[2]"), ("int x[][2] = {{1},{2},{3}};", "int[2][3]"),
                 ("enum { big = 40000 } x;", "enum <nameless>")]
        for text, expected in cases:
            with self.subTest(text):
                self.assertEqual(str(symbol_of(translate(text), "_x").type), expected)

    def test_an_enumeration_is_as_wide_as_its_values(self):
        for values, size in (("A = -1, B = 32767", 16), ("A = 65535", 16), ("A = -1, B = 40000", 32), ("A = 1LL << 40", 64)):
            with self.subTest(values):
                self.assertEqual(symbol_of(translate(f"enum {{ {values} }} x;"), "_x").type.size, size)


class Conversions(unittest.TestCase):
    VARIABLES = """char c; unsigned char uc; int i; unsigned u; long l; unsigned long ul; long long ll; float f;
        long double ld; _Bool b; int *p; long *lp; struct { unsigned n : 4; int s : 7; } bits; enum { E } e; int a[4][5];"""

    def test_arithmetic(self):
        cases = [
            ("c + i", "PLUS(SCONV.int(_c), _i)"),
            ("uc + i", "PLUS(SCONV.unsigned int(_uc), SCONV.unsigned int(_i))"),
            ("i + l", "PLUS(SCONV.long(_i), _l)"),
            ("u + l", "PLUS(SCONV.long(_u), _l)"),
            ("ul + ll", "PLUS(SCONV.long long(_ul), _ll)"),
            ("i < u", "ULT(SCONV.unsigned int(_i), _u)"),
            ("i < l", "LT(SCONV.long(_i), _l)"),
            ("f * ld", "MULT(SCONV.long double(_f), _ld)"),
            ("i + 2.5L", "PLUS(SCONV.long double(_i), 2.5:long double)"),
            ("l << ll", "SLL(_l, SCONV.int(_ll))"),
            ("bits.n + 1", "PLUS(SCONV.int(STDOT(_bits, .n)), 1:int)"),
            ("bits.n < -1", "LT(SCONV.int(STDOT(_bits, .n)), -1:int)"),
            ("-32768", "-32768:long"), ("~0u", "65535:unsigned int"), ("40000", "40000:long"), ("0xFFFF", "65535:unsigned int"),
            ("'\\xFFFF'", "-1:int"), ("1 ? i : l", "QUEST(NEQ(1:int, 0:int), COLON(SCONV.long(_i), _l))"),
            ("!f", "EQ(_f, 0.0:float)"), ("!(i < 3)", "EXCLAIM(LT(_i, 3:int))"),
            ("i && p", "ANDAND(NEQ(_i, 0:int), NEQ(_p, PCONV.int *(0:int)))"),
        ]
        for text, expected in cases:
            with self.subTest(text):
                self.assertEqual(expression(self.VARIABLES, text), expected)

    def test_casts(self):
        cases = [("(long)i", "SCONV.long(_i)"), ("(int)70000L", "4464:int"), ("(_Bool)l", "SCONV.int(SCONV._Bool(NEQ(_l, 0:long)))"),
                 ("(unsigned)p", "SCONV.unsigned int(SCONV.unsigned long(_p))"),
                 ("(int *)i", "PCONV.int *(SCONV.long(_i))"), ("(int *)u", "PCONV.int *(SCONV.unsigned long(_u))"),
                 ("(char *)p", "PCONV.char *(_p)"), ("(int)2.9f", "2:int")]
        for text, expected in cases:
            with self.subTest(text):
                self.assertEqual(expression(self.VARIABLES, text), expected)

    def test_pointer_arithmetic_is_exact_in_32_bits(self):
        cases = [("p + i", "PLUS(_p, _i)"), ("p + u", "PLUS(_p, SCONV.long(_u))"), ("p - ll", "MINUS(_p, SCONV.long(_ll))"),
                 ("lp + i", "PLUS(_lp, PMCONV.long(SCONV.long(_i), 32:long))"), ("lp + 3", "PLUS(_lp, 6:int)"),
                 ("lp + 20000", "PLUS(_lp, 40000:long)"), ("&lp[ul]", "PLUS(_lp, PMCONV.unsigned long(_ul, 32:unsigned long))"),
                 ("a[1][i]", "UMULT(PLUS(PCONV.int *(PLUS(UAND(_a), 5:int)), _i))"),
                 ("lp - &l", "DIV(MINUS(_lp, UAND(_l)), 2:long)"), ("p - &i", "MINUS(_p, UAND(_i))"), ("*a[0]", "UMULT(PCONV.int *(UAND(_a)))")]
        for text, expected in cases:
            with self.subTest(text):
                self.assertEqual(expression(self.VARIABLES, text), expected)

    def test_floating_constants_are_rounded_once(self):
        # Halfway between two singles but for a digit that a double does not hold.
        self.assertEqual(initializer("float x = 1.00000005960464477539062500000000001f;", "_x"), [f"{1 + 2**-23}:float"])
        self.assertEqual(initializer("float x = 1.000000059604644775390625f;", "_x"), ["1.0:float"])
        self.assertEqual(initializer("long double x = 0x1.8p3L;", "_x"), ["12.0:long double"])
        self.assertEqual(initializer("float x = 1e-45f;", "_x"), [f"{2**-149}:float"])


    def test_complex_numbers_are_two_parts(self):
        self.assertEqual(initializer("float _Complex z = 1.5f;", "_z"), ["1.5:float", "0.0:float"])
        self.assertEqual(initializer("float _Complex z = -__builtin_complex(1.0f, 2.0f) * 2;", "_z"),
                         ["-2.0:float", "-4.0:float"])

    def test_attributes_mean_nothing(self):
        source = "{} unsigned long n {} = 4;"
        self.assertEqual(initializer(source.format("__attribute__((used))", "__attribute__((aligned(8), section(\"s\")))"),
                                     "_n"), initializer(source.format("", ""), "_n"))


class WrongTypes(unittest.TestCase):
    def test_positions(self):
        cases = [
            ("struct S { int a; int a; };", "t.c:1:23: error: duplicate member 'a'"),
            ("struct S { int b : 17; };", "t.c:1:16: error: bad bit-field width 17: a bit-field has at most the bits "
             "of its type, and 'int' has 16; 'long' has 32"),
            ("int a[-1];", "t.c:1:5: error: negative array size"),
            ("struct S; struct S s;", "t.c:1:20: error: 's' has incomplete type 'struct S'"),
            ("int f(void)[3];", "t.c:1:5: error: a function cannot return 'int[3]'"),
            ("\n  void x;", "t.c:2:8: error: 'x' has type void"),
            ("int x; long x;", "t.c:1:13: error: conflicting declarations of 'x'"),
            ("enum { A, A };", "t.c:1:11: error: redefinition of 'A'"),
            ("long long unsigned float x;", "t.c:1:1: error: 'long long unsigned float' is not a type"),
            ("int g(void); void f(void) { int v[g()]; }",
             "t.c:1:33: error: the array size is no constant; arrays of variable length are not supported"),
            ("long double _Complex z;", "t.c:1:1: error: 'long double _Complex' is not supported"),
            ("float _Complex z; int f(void) { return z < z; }",
             "t.c:1:40: error: operator < cannot take 'float _Complex' and 'float _Complex'"),
            ("float _Complex z; void f(void) { z++; }", "t.c:1:34: error: operator ++ cannot take 'float _Complex'"),
        ]
        for text, expected in cases:
            with self.subTest(text):
                self.assertEqual(error_of(text), expected)


if __name__ == "__main__":
    unittest.main()
