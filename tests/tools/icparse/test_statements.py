"""Statements, declarations, pragmas, initializers' lists, and errors with their positions."""
import os
import re
import tempfile
import unittest

from support import ROOT, body_of, compile_files, error_of, initializer, intrinsics, symbol_of, translate, Warnings


class Bodies(unittest.TestCase):
    def check(self, source, *expected):
        lines = [line for line in body_of(translate(source)) if not line.startswith("pragma 41")]
        self.assertEqual(lines, list(expected))

    def test_parameters_are_copied_in_one_statement_if_used(self):
        self.check("struct S { int a; } g; void f(int a, struct S s, int unused, char *p) { g = s; g.a = a; *p = 1; }",
                   "PCOMMA(PCOMMA(ASG(a, a), STASG(s, s)), ASG(p, p))", "STASG(_g, s)", "ASG(STDOT(_g, .a), a)",
                   "ASG(UMULT(p), 1:char)", "URETURN(_f)")
        self.check("int f(x) float x; { return x; }", "ASG(x, SCONV.float(x))", "RETURN(_f, SCONV.int(x))")

    def test_loops(self):
        self.check("int g; void f(void) { while (g) g--; }", "L1:", "CBRANCH(NEQ(_g, 0:int), L3)", "MINMIN(_g, 1:int)",
                   "BRANCH(L1)", "L3:", "URETURN(_f)")
        self.check("int g; void f(void) { for (int i = 0; i < 3; ++i) if (i == g) continue; }", "{i", "ASG(i, 0:int)",
                   "L1:", "CBRANCH(LT(i, 3:int), L3)", "CBRANCH(EQ(i, _g), L4)", "BRANCH(L2)", "L4:", "L2:",
                   "PLUSASG(i, 1:int)", "BRANCH(L1)", "L3:", "}", "URETURN(_f)")
        self.check("int g; void f(void) { do g++; while (g < 3 && g != 2); }", "L1:", "PLUSPLUS(_g, 1:int)",
                   "CBRANCH(ANDAND(LT(_g, 3:int), NEQ(_g, 2:int)), L3)", "BRANCH(L1)", "L3:", "URETURN(_f)")
        self.check("void f(void) { for (;;) ; }", "L1:", "BRANCH(L1)")
        self.check("int f(int x) { if (x) return 1; else return 2; }", "ASG(x, x)", "CBRANCH(NEQ(x, 0:int), L1)",
                   "RETURN(_f, 1:int)", "L1:", "RETURN(_f, 2:int)")

    def test_switches(self):
        self.check("void f(long x) { switch (x) { case 1: case 70000: return; default: ; } }", "ASG(x, x)",
                   "SWITCH(x, COMMA(COMMA(CASE(1:long, L2), CASE(70000:long, L3)), DEFAULT(L4)))", "L2:", "L3:",
                   "URETURN(_f)", "L4:", "URETURN(_f)")
        self.check("int g(void); void f(void) { switch (g()) { default: ; } }", "UCALL(UAND(_g))", "BRANCH(L2)", "L2:",
                   "URETURN(_f)")

    def test_only_effects_of_unused_values_stay(self):
        self.check("volatile int v; int g, *p; int h(void); void f(void) { g; v; (void)(g + h()); *p++; g, g = 1; }", "_v",
                   "UCALL(UAND(_h))", "PLUSPLUS(_p, 1:int)", "ASG(_g, 1:int)", "URETURN(_f)")
        self.check("int g; int h(void); void f(void) { g && h(); }", "CBRANCH(NEQ(_g, 0:int), L1)", "UCALL(UAND(_h))",
                   "L1:", "URETURN(_f)")

    def test_an_address_with_effects_is_computed_once(self):
        self.check("int *g(void); void f(void) { *g() += 2.5f; }", "ASG(tmp$1, UCALL(UAND(_g)))",
                   "ASG(UMULT(tmp$1), SCONV.int(PLUS(SCONV.float(UMULT(tmp$1)), 2.5:float)))", "URETURN(_f)")

    def test_loop_pragmas_stand_before_the_loop(self):
        source = """int g; void f(void) {
            #pragma MUST_ITERATE(8, , 4)
            #pragma UNROLL(2)
            for (g = 0; g < 8; g++)
               ; while (g) { do g++;
               while (g < 9); } }"""
        lines = body_of(translate(source))
        self.assertEqual(lines[:5], ["ASG(_g, 0:int)", "pragma 41 ['4', 'g', '5', 'for']", "pragma 39 ['8', '', '4']",
                                     "pragma 37 ['2']", "L1:"])
        self.assertEqual([line for line in lines if line.startswith("pragma 41")][1:],
                         ["pragma 41 ['5', '', '6', 'while']", "pragma 41 ['5', '', '6', 'do']"])

    def test_assembly(self):
        unit = translate('asm(" .global x");\nint y;\nvoid f(void) { asm volatile (" nop" " ; \\n"); }')
        self.assertEqual(unit.items[0].text, " .global x")
        self.assertEqual(body_of(unit)[0], "asm  nop ; \n")
        self.assertEqual(str(symbol_of(unit, "_y").position), "t.c:2:5")

    def test_main_returns_zero(self):
        self.assertEqual(body_of(translate("int main(void) { }"), "_main"), ["RETURN(_main, 0:int)"])


class Symbols(unittest.TestCase):
    def test_classes(self):
        unit = translate("""int a; static int b; extern int c; extern int d; int e; int e = 4; int used(void); int unused(void);
            static int s(void) { static int n; return n; } inline int i(void) { return 1; }
            int f(void) { extern int d; return c + d + used() + s() + i(); }""")
        classes = {symbol.name: symbol.klass for symbol in unit.symbols}
        self.assertEqual(classes, {"_a": 2, "_b": 3, "_c": 5, "_d": 5, "_e": 2, "_used": 5, "_s": 3, "_n$1": 3, "_i": 3,
                                   "_f": 2})
        self.assertEqual(symbol_of(unit, "_n$1").pragmas, [(51, ["_s"])])
        self.assertEqual(symbol_of(unit, "_i").qualifier_bits, 4)

    def test_pragmas(self):
        unit = translate("""
            #pragma FUNC_CANNOT_INLINE(f)
            #pragma DATA_SECTION(d, "fast")
            #pragma DATA_ALIGN(d, 8)
            #pragma INTERRUPT(f)
            int d; void f(void) { }
            #pragma FUNC_ALWAYS_INLINE(f)
            #pragma DATA_ALIGN(nowhere, 8)
            __interrupt void timer(void); void timer(void) { } _Noreturn void stop(void) { for (;;) ; }""")
        self.assertEqual(symbol_of(unit, "_timer").qualifier_bits, 0x20)
        self.assertEqual(symbol_of(unit, "_stop").pragmas, [(3, [])])
        self.assertEqual(symbol_of(unit, "_f").pragmas, [(4, []), (88, [])])
        self.assertEqual(symbol_of(unit, "_f").qualifier_bits, 0x20)
        self.assertEqual(symbol_of(unit, "_d").pragmas, [(2, ["fast"]), (0, ["8"])])
        self.assertEqual(symbol_of(unit, "_d").align, 128)

    def test_pragmas_within_declarations_and_statements(self):
        tokens = """struct s { int a : 3 ; int b [ 2 ] ; } ; static const int t [ ] = { 1 , { 2 } , 3 } ; int f ( int n , int k ) {
            int r = n ? k : t [ n ] ; if ( n ) for ( int i = 0 ; i < k ; i ++ ) { r += 2 ; } else do r -- ; while ( r ) ;
            switch ( r ) { case 1 : r = 2 ; default : return r ; } }""".split()
        wanted = body_of(translate(" ".join(tokens)))
        for place in range(len(tokens) + 1):
            unit = translate(" ".join(tokens[:place] + ['_Pragma("NOBODYS(1)")'] + tokens[place:]))
            self.assertEqual(body_of(unit), wanted, " ".join(tokens[max(0, place - 3):place]))
        warnings = Warnings()
        translate('int x;\nint _Pragma("NOBODYS") y;', warnings=warnings)
        self.assertEqual(warnings, ["t.c:2:9: warning: the pragma 'NOBODYS' is not known here and is ignored"])
        for words in ("interrupt void f", "void interrupt f", "static void __interrupt f", 'void _Pragma("INTERRUPT(f)") f'):
            unit = translate(f"int x; {words}(void); int y[] = {{ 1 }}; {words}(void) {{ x++; }} void (*p)(void) = f;")
            self.assertEqual(symbol_of(unit, "_f").qualifier_bits, 0x20, words)


class Headers(unittest.TestCase):
    FOLDER = os.path.join(ROOT, "tools", "include")

    def test_each_stands_alone_and_may_come_twice(self):
        for header in sorted(os.listdir(self.FOLDER)):
            with self.subTest(header):
                self.assertEqual(error_of(f"#include <{header}>\n#include <{header}>\nint x;"), "no error")

    def test_the_built_ins_are_those_of_the_optimizer(self):
        with open(os.path.join(self.FOLDER, "intrinsics.h")) as text:
            declared = {name: re.sub(r"\s*\*", " *", f"{result}({parameters})").replace(" (", "(")
                        for result, name, parameters in re.findall(r"^(\w[\w *]*?)(_\w+)\((.*)\);", text.read(), re.M)}
        wanted = {name: f"{i.result}({', '.join(map(str, i.parameters)) or 'void'})"
                  for name, i in intrinsics.TABLE.items() if None not in i.parameters}
        self.assertEqual({name: text.strip() for name, text in declared.items()},
                         {name: text for name, text in wanted.items()})

    def test_variable_arguments_lie_behind_the_last_parameter(self):
        source = """#include <stdarg.h>
            long f(char *s, int n, ...) { va_list l; va_start(l, n); return va_arg(l, long); }"""
        self.assertEqual(body_of(translate(source))[0], "ASG(l, PCONV.va_list(PLUS(UAND(n), 1:int)))")
        self.assertEqual(error_of("void f(int a, int b, ...) { char *p; __builtin_va_start(p, a); }"),
                         "t.c:1:38: error: va_start needs the last parameter of the function")


class StaticInitializers(unittest.TestCase):
    def test_lists(self):
        cases = [
            ("int x[4] = { [2] = 1, 2 };", ["0:int", "0:int", "1:int", "2:int"]),
            ("int x[40] = { 1, [39] = 2 };", ["1:int", "SKIP(0:int)", "2:int"]),
            ("int x[4];", ["0:int"] * 4),
            ("struct { int a; struct { int b, c; } s[2]; } x = { 1, 2, 3, { 4 } };", [f"{n}:int" for n in (1, 2, 3, 4, 0)]),
            ("struct { int a; struct { int b, c; } s[2]; } x = { .s[1].c = 5, .a = 1 };",
             [f"{n}:int" for n in (1, 0, 0, 0, 5)]),
            ("struct { union { long l; int i[2]; }; int k; } x = { .i = { 1, 2 }, 3 };", ["131073:long", "3:int"]),
            ("union { int a; int b; } x = { 1 };", ["1:int"]),
            ("char x[] = \"a\\0b\";", ["97:char", "0:char", "98:char", "0:char"]),
            ("const char *x[] = { \"ab\" };", ["PCONV.const char *('ab\\x00')"]),
            ("int g[3][4], *x = &g[1][2];", ["PLUS(PCONV.int *(UAND(_g)), 6:int)"]),
            ("int g[3][4]; unsigned long x = (unsigned long)&g[1];", ["SCONV.unsigned long(PLUS(PCONV.void *(UAND(_g)), 4:int))"]),
            ("struct S { long a; int b; } g; int *x = &(&g + 1)->b;", ["PLUS(PCONV.int *(UAND(_g)), 6:int)"]),
            ("int x = (int)(3.9 * 2) + sizeof(long) * (1 ? 5 : 1 / 0);", ["17:int"]),
            ("long x = -7 / 2 * 100 + -7 % 2;", ["-301:long"]),
            ("int *x = (int *)0x7000;", ["PCONV.int *(28672:long)"]),
            ("int f(void); int (*x)(void) = f;", ["UAND(_f)"]),
            ("float x = 1 / 3.0f;", ["0.3333333432674408:float"]),
        ]
        for source, expected in cases:
            with self.subTest(source):
                self.assertEqual(initializer(source, "_x"), expected)


class Errors(unittest.TestCase):
    CASES = [
        ("int f(void) { return y; }", "1:22: error: 'y' is not declared"),
        ("int f(void) { x = 1; { int a; b = a; } return 0; }\nint g = 1;\nint g = 2;",
         "1:15: error: 'x' is not declared\nt.c:1:31: error: 'b' is not declared\nt.c:3:5: error: redefinition of 'g'"),
        ("int f(void) {\n int a;\n  int a; }", "3:7: error: redefinition of 'a'"),
        ("int x = 1; int x = 2;", "1:16: error: redefinition of 'x'"),
        ("struct S { int a; }; int f(struct S s) { return s.b; }", "1:51: error: 'struct S' has no member 'b'"),
        ("int f(int a) { return f(1, 2); }", "1:23: error: 2 arguments given, 1 wanted"),
        ("void f(void) { 3 = 4; }", "1:16: error: the left operand of an assignment must be an object"),
        ("void f(void) { const int a = 1; a = 2; }", "1:33: error: assignment to an object of type 'const int'"),
        ("struct S { const int a; } s, t; void f(void) { s = t; }", "1:48: error: assignment to an object of type 'struct S'"),
        ("void f(void) { break; }", "1:16: error: break outside a loop or switch"),
        ("void f(void) { case 1: ; }", "1:16: error: case outside a switch"),
        ("void f(void) { goto L; }", "1:16: error: label 'L' is not defined"),
        ("void f(int a) { switch (a) { case 1: case 65537L: ; } }", "1:38: error: duplicate case 1"),
        ("int f(void) { return; }", "1:15: error: return without a value"),
        ("int a[2] = { 1, 2, 3 };", "1:20: error: too many initializers"),
        ("int f(void); int a = f();", "1:18: error: the initializer is not constant"),
        ("void f(float g) { g % 2; }", "1:19: error: operator % cannot take 'float' and 'int'"),
        ("struct S { int b : 3; } s; int *p = &s.b;", "1:38: error: the address of a bit-field cannot be taken"),
        ("void f(void) { void *p; *p; }", "1:26: error: operator * cannot take 'void *'"),
        ("int f(int) { return 0; }", "1:5: error: a parameter has no name"),
        ("char c[2] = \"abcd\";", "1:13: error: the string is longer than the array"),
        ("int a[2] = { [2] = 1 };", "1:20: error: index 2 is outside the array"),
        ("int f(void) { return 1 +; }", "1:25: error: syntax error before ;"),
        ("#line 70 \"other.c\"\nint x = y;", "other.c:70:9: error: 'y' is not declared"),
        ("\n#include \"missing.h\"", "2:10: error: missing.h: No such file or directory"),
        ("_Static_assert(sizeof(int) == 2, \"x\");", "1:1: error: static assertion failed: \"x\""),
        ("void f(int *p, float g) { p = g; }", "1:27: error: 'float' cannot be assigned to 'int *'"),
        ("union { int *p; long l; } u = { .l = 1 }; union { int a; long l; } v = { .l = 65536 };",
         "1:68: error: the union's first member cannot hold this initializer"),
        ("#include <intrinsics.h>\nlong f(void) { return __mpy(1); }", "2:23: error: __mpy takes 2 arguments"),
    ]

    def test_positions(self):
        for source, expected in self.CASES:
            with self.subTest(source):
                self.assertEqual(error_of(source), expected if expected.startswith("other") else "t.c:" + expected)

    def test_warnings(self):
        warnings = Warnings()
        translate("int *p; long *q; const int *c; void f(void) { p = q; p = 5; p = c; p = 0; g(); }", warnings=warnings)
        self.assertEqual(warnings, [
            "t.c:1:47: warning: 'long *' assigned to 'int *' without a cast",
            "t.c:1:54: warning: 'int' assigned to 'int *' without a cast",
            "t.c:1:61: warning: 'const int *' assigned to 'int *' loses qualifiers",
            "t.c:1:75: warning: function 'g' is not declared"])

    def test_an_error_leaves_no_output(self):
        with tempfile.TemporaryDirectory() as folder:
            status, messages, output = compile_files(folder, ["int x;"])
            self.assertEqual((status, messages, os.path.exists(output)), (0, "", True))
            status, messages, output = compile_files(folder, ["int x = y;"])
            self.assertEqual((status, os.path.exists(output)), (1, False))
            self.assertRegex(messages, r"p0\.c:1:9: error: 'y' is not declared\n    int x = y;\n            \^\n$")


if __name__ == "__main__":
    unittest.main()
