"""Loops that multiply and accumulate: which call of the hardware each becomes, and that it computes the same."""
import re
import sys
import tempfile
import unittest
from pathlib import Path

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent.parent / "tools"))
from icparse_lib import cli  # noqa: E402
from zbench import INCLUDE, Tools, difference  # noqa: E402

COUNTS = (0, 1, 2, 3, 4, 5, 16, 17, 64)
DECLARATIONS = f"""
#include <zrun.h>
#pragma DATA_ALIGN(h, 2)
int h[160];
#pragma DATA_ALIGN(k, 2)
int k[160];
long w[80], v[80], z[80]; float f[80], g[80]; long double d[80], e[80]; unsigned u[80]; volatile int port;
int n, counts[] = {{{", ".join(map(str, COUNTS))}}};
void keep(long* p) {{ *p += 1; }}
void fill(void) {{
    int i;
    for (i = 0; i < 160; i++) h[i] = (i * 731 & 4095) - 2048, k[i] = 2047 - (i * 397 & 4095);
    for (i = 0; i < 80; i++) {{
        u[i] = i * 111;
        w[i] = (i * 977L & 32767) - 16384, v[i] = (i * 37 & 255) - 128, z[i] = (i + 5) * 26843545L * (i & 1 ? -1 : 1);
        f[i] = (i - 31) * .5f, g[i] = i & 3 ? i * .25f : -0.f, d[i] = f[i], e[i] = g[i];
    }}
    h[0] = -32768, k[0] = 16383;
}}
"""
WALKS = {  # the loop, and how it names its factors
    "indexed": ("for (i = 0; i < n; i++)", "p[i]", "q[i]"),
    "pointers": ("for (i = n; i > 0; i--)", "*p++", "*q++"),
    "reversed": ("for (i = 0; i < n; i++)", "p[i]", "q[64 - i]"),
    "counted": ("while (i++ < n)", "*p++", "q[i]"),
}


FLOATS = {"float": "f32", "long double": "f64"}


def forms():
    """Type of the factors, their arrays, what is added, and the call and shift that it becomes."""
    for op, verb in (("+=", "add"), ("-=", "sub")):
        for shift in range(-1, 7):
            mode = " * 2" if shift < 0 else f" >> {shift}" if shift else ""
            yield "int", "h", "k", f"{op} ((long)X * Y){mode}", f"mpy_{verb}", shift
            yield "long", "w", "v", f"{op} (X * Y){mode}", f"mpy_{verb}_s32_lo", shift
            if shift >= 0:
                yield "long", "z", "w", f"{op} (long)((long long)X * Y >> {32 + shift})", f"mpy_{verb}_s32_hi", shift
                yield "int", "h", "h", f"{op} ((long)X * X){mode}", f"sqr_{verb}", shift
    yield "float", "f", "g", "+= X * Y", "mpy_add_f32", None
    yield "long double", "d", "e", "+= X * Y", "mpy_add_f64", None


REFUSED = {  # what a loop does beside, or in place of, what the hardware does
    "long acc = 0; for (i = 0; i < n; i++) acc += ((long)h[i] * k[i]) >> 7;": "a shift too far",
    "long acc = 0; for (i = 0; i < n; i++) acc += (long)((long long)z[i] * w[i] >> 39);": "a shift too far",
    "unsigned long acc = 0; for (i = 0; i < n; i++) acc += (unsigned long)u[i] * u[i + 1];": "unsigned",
    "long acc = 0; for (i = 0; i < n && acc < 100000; i++) acc += (long)h[i] * k[i];": "tested",
    "long acc = 0; int* p = h; for (i = 0; i < n; i++) { acc += (long)p[i] * k[i]; p[i + 1] = (int)acc; }": "changes a factor",
    "long acc = 0; i = 0; do acc += (long)h[i] * k[i]; while (++i < 9 && acc < 9999);": "tested in a loop of two blocks",
    "long acc = 0; i = 0; do acc += (long)h[i] * k[i]; while (++i < acc >> 16);": "the test needs the sum",
    "long acc = 0; i = 0; do { acc += (long)h[i] * k[i]; w[i] = acc; } while (h[i++] < 0 && 1);": "the test reads memory",
    "long acc = 0; for (i = 0; i < n; i++) { acc += (long)h[i] * k[i]; w[i] = acc; keep(w); }": "a call",
    "long acc = 0; for (i = 0; i < n; i++) acc += (long)h[i] * k[i] + (long)h[i + 1] * k[i + 2];": "two products",
    "long acc = 0; for (i = 0; i < n; i++) { acc += (long)h[i] * k[i]; keep(&acc); }": "its address is known",
    "long acc = 0; for (i = 0; i < n; i++) acc += (long)h[i] * (int)acc;": "a factor",
    "long acc = 0; for (i = 0; i < n; i++) acc += h[i] * k[i];": "a product of 16 bits",
    "long long acc = 0; for (i = 0; i < n; i++) acc += (long long)w[i] * v[i];": "64 bits",
}
ADD = "mpy_add"
TAKEN = {  # what programmers write: the loop, and its calls
    # The sum is used where it is made.
    "long acc = 5; for (i = 0; i < n; i++) { acc += (long)h[i] * k[i]; w[i] = acc; }": [ADD],
    "long acc = 5; for (i = 0; i < 17; i++) { acc -= acc >> 4; acc += (long)h[i] * k[i]; }": [ADD],
    "long acc = 5; int *p = h, *e = h + n; while (p < e) { acc += (long)*p++ * 3 >> 2; w[7] = acc; }": [ADD],
    "long acc = 5, b = 0; for (i = n; i != 0; i--) { acc += (long)h[i] * k[64 - i]; b += acc; } acc ^= b;": [ADD],
    "long acc = 5; i = 2; do { acc -= z[i] * v[i]; w[0] ^= acc; i += 3; } while (i < n);": ["mpy_sub_s32_lo"],
    "long acc = 5; unsigned j; for (j = 0; j < n; j++) { acc += (long)h[j] * k[j]; w[j] += acc; }": [ADD],
    "long acc = 5; long j; for (j = n - 1; j >= 0; j--) { acc += (long)((long long)z[j] * w[j] >> 35); v[j] = acc; }": ["mpy_add_s32_hi"],
    # Limits, and indexes that wrap.
    "long acc = 5; for (i = 0; i < n; i++) { acc += (long)h[i] * k[i]; if (acc > 99999) acc = 99999; }": [ADD],
    "long acc = 0; for (i = 0; i < n; i++) { int a = h[i]; if (a > 100) a = 100; if (a < -100) a = -100; acc += (long)a * k[i]; }": [ADD],
    "long acc = 0; int j = 27; for (i = 0; i < n; i++) { acc += (long)h[i] * k[j]; if (++j == 32) j = 0; }": [ADD],
    "long acc = 0; int j = 3; for (i = 0; i < n; i++) { acc += (long)h[i] * k[j--]; if (j < 0) j = 31; }": [ADD],
    "long acc = 0; int j = 3; for (i = 0; i < n; i++) { acc += (long)h[i] * k[j]; j = (j + 1) & 31; }": [ADD],
    "long acc = 0; for (i = 0; i < n; i++) acc += (long)(k[i] > 0 ? k[i] : -k[i]) * h[i];": [ADD],
    # Factors.
    "long acc = 0; int* p = h; for (i = 0; i < n; i++) { long a = *p++; acc += a * a; }": ["sqr_add"],
    "long acc = 0; int s = counts[2]; for (i = 0; i < n; i++) acc += (long)h[i * s] * k[i];": [ADD],
    "long acc = 0; for (i = 0; i < n; i++) acc += (long)h[i] * -7;": ["mpy_sub"],
    "long acc = 0; for (i = 0; i < n; i++) acc += (long)k[i] * (h[i] + h[2 * n - 1 - i]);": [ADD],
    "long acc = 0; for (i = 0; i < n; i++) acc += (long)h[i] * i;": [ADD],
    "long acc = 0, b = 0; for (i = 0; i < n; i++) b += h[i], acc += (long)h[i] * h[i]; acc ^= b;": ["sqr_add"],
    "long acc = 0; for (i = n - 1; i > 0; i--) { acc += (long)h[i] * k[i]; h[i] = h[i - 1]; }": [ADD],
    # The sum is in memory.
    "long acc; for (i = 0; i < n; i++) w[3] += (long)h[i] * k[i]; acc = w[3];": [ADD],
    "static long s; long acc; for (i = 0; i < n; i++) s += (long)h[i] * k[i]; acc = s;": [ADD],
    "static struct { int n; long s; } s; long acc; for (i = 0; i < n; i++) s.s += (long)h[i] * k[i]; acc = s.s;": [ADD],
    "long acc = 0; int j; for (j = 0; j < 8; j++) { w[j] = 0; for (i = 0; i < n; i++) w[j] += (long)h[i] * k[i + j]; acc ^= w[j]; }": [ADD],
}
# In a unified memory: the loop, and the call.
DUAL = {
    "long acc = 5; int j; for (j = 0; j < 8; j++) { for (i = 0; i < 16; i++) acc += (long)h[j * 16 + i] * k[i]; acc ^= j; }": "dmac",
    "long acc = 5; int c = 64; i = 0; while (c-- > 0) { acc += (long)h[i] * h[i]; i++; }": "dmac",
    "long acc = 5; for (i = 0; i < n; i += 2) { acc += (long)h[i] * k[i] >> 1; acc += (long)h[i + 1] * k[i + 1] >> 1; }": "dmac",
    "long acc = 5; for (i = 0; i < n; i += 2) { acc += (long)h[i] * k[i]; acc += (long)h[i + 1] * k[i + 1]; w[i] = acc; }": None,
    "long acc = 5; for (i = 1; i < n; i += 2) { acc += (long)h[i] * k[i]; acc += (long)h[i + 1] * k[i + 1]; }": None,
    "long acc = 5; for (i = 0; i < n; i += 4) acc += (long)h[i] * k[i] + (long)h[i+1] * k[i+1] + (long)h[i+2] * k[i+2] + (long)h[i+3] * k[i+3];": "dmac dmac",
    "long acc = 5; for (i = 0; i < 64; i++) acc += (long)h[i] * k[i];": "dmac",
    "long acc = 5; for (i = 63; i >= 0; i--) acc += (long)h[i] * k[i];": "mpy_add",  # the words' halves are exchanged
    "long acc = 5; for (i = 1; i < 65; i++) acc += (long)h[i] * k[i];": "mpy_add",
    "long acc = 5; for (i = 0; i < 63; i++) acc += (long)h[i] * k[i];": "mpy_add",
    "long acc = 5; for (i = 0; i < n; i++) acc += (long)h[i] * k[i];": "mpy_add",
    "long acc = 5; for (i = 0; i < 62; i++) acc += (long)h[i] * k[i + 2] >> 3;": "dmac",
    "long acc = 5; int *p = (int*)w, *q = h; for (i = 0; i < 50; i++) acc += (long)*p++ * *q++;": "dmac",
    "long acc = 0, b = 0; for (i = 0; i < n; i++) { acc += (long)h[2*i] * k[2*i] >> 2; b += (long)h[2*i+1] * k[2*i+1] >> 2; } acc ^= b;": "dmac",
    "long acc = 0, b = 0; for (i = 0; i < n; i++) { acc += (long)h[2*i] * k[2*i]; b += (long)h[2*i+2] * k[2*i+2]; } acc ^= b;": None,
}


def product_of(form, walk):
    kind, x, y, added, _, _ = form
    loop, left, right = WALKS[walk]
    if x == y and "++" in left:
        loop, left = "for (i = n; i > 0; i--, p++)", "*p"
    added = added.replace("X", left).replace("Y", right)
    result = kind if kind in FLOATS else "long"
    start = "0" if kind in FLOATS else "5"
    return f"{result} %s({kind}* p, {kind}* q) {{ {result} acc = {start}; int i = 0; {loop} acc {added}; return acc; }}\n"


class Program:
    def __init__(self, functions, calls):
        self.source = DECLARATIONS + "".join(functions)
        loop = "for (j = 0; j < %d; j++) { n = counts[j] >> halved;" % len(COUNTS)
        self.source += "int main(void) { int j, halved; for (halved = 0; halved < 2; halved++) { fill(); " + loop
        self.source += " ".join(calls) + " } } return 0; }\n"

    def optimized(self, case, options):
        """Executes before and after; the dumps of the functions f0, f1..."""
        tools = Tools()
        with tempfile.TemporaryDirectory() as folder:
            path, unit, out = (Path(folder) / name for name in ("p.c", "p.if", "p.opt"))
            path.write_text(self.source)
            case.assertEqual(cli.main(["-w", "-I", str(INCLUDE), str(path), "-o", str(unit)]), 0)
            tools.optimize(unit, out, ["--debug:validate", "--disable_inlining", *options])
            case.assertIsNone(difference(tools.execute(unit), tools.execute(out, ["--check"])))
            again = Path(folder) / "again"
            tools.optimize(out, again, ["--debug:validate", "--disable_inlining", *options])
            case.assertIsNone(difference(tools.execute(unit), tools.execute(again, ["--check"])))
            dump = tools.dump(out)
        parts = {int(p[1]): p[2] for p in re.finditer(r"function _f(\d+):(.*?)end function", dump, re.S)}
        return [parts[i] for i in range(len(parts))]


def calls_in(part):
    return re.findall(r"(?:__parallel_|__)((?:mpy|sqr)_\w+|dmac)\(.*?(?:, (-?\d+))?\)$", part, re.M)


class Mac(unittest.TestCase):
    def program_of(self, bodies):
        functions = [f"long f{i}(void) {{ int i; {body} return (long)acc; }}\n" for i, body in enumerate(bodies)]
        return Program(functions, [f"put_i32(f{i}());" for i in range(len(bodies))])

    def test_each_form_becomes_its_call(self):
        cases = [(form, walk) for form in forms() for walk in WALKS]
        functions = [product_of(form, walk) % f"f{i}" for i, (form, walk) in enumerate(cases)]
        calls = [f"put_{FLOATS.get(c[0][0], 'i32')}(f{i}({c[0][1]}, {c[0][2]}));" for i, c in enumerate(cases)]
        for options in (["--opt_level=2", "--float_support=fpu64", "--unified_memory"], ["--opt_level=4"],
                        ["--opt_level=2", "--opt_passes=77,28,78,67"],  # steps within references come first
                        ["--opt_level=3", "--float_support=fpu32", "--size_speed_goal=5"]):
            parts = Program(functions, calls).optimized(self, options)
            if "--unified_memory" not in options:
                continue
            for (form, walk), part in zip(cases, parts):
                with self.subTest(form=form, walk=walk):
                    shift = "" if form[5] is None else str(form[5])
                    self.assertEqual(calls_in(part), [(form[4], shift)])

    def test_others_stay_as_they_are(self):
        parts = self.program_of(REFUSED).optimized(self, ["--opt_level=2"])
        for (body, reason), part in zip(REFUSED.items(), parts):
            with self.subTest(reason=reason, body=body):
                self.assertEqual(calls_in(part), [])

    def test_a_loop_that_stays_keeps_its_edges(self):
        body = "int i; long s = 0; for (i = 0; i < m; i++) s += 3L * i, p[j] += (long)t * q[i]; return s;"
        Program([f"long f0(int m, int* q, long* p, int j, int t) {{ {body} }}\n"],
                ["put_i32(f0(n, h, w, 2, 3));"]).optimized(self, ["--opt_level=2"])

    def test_forms_of_programs(self):
        program = self.program_of(TAKEN)
        for (body, calls), part in zip(TAKEN.items(), program.optimized(self, ["--opt_level=2"])):
            with self.subTest(body=body):
                self.assertEqual([call[0] for call in calls_in(part)], calls)
        for options in (["--opt_level=3", "--debug:disable:simple_rotation"], ["--opt_level=4", "--size_speed_goal=2"]):
            program.optimized(self, options)

    def test_words_of_two_elements(self):
        program = self.program_of(DUAL)
        parts = program.optimized(self, ["--opt_level=2", "--float_support=fpu32", "--unified_memory"])
        for (body, name), part in zip(DUAL.items(), parts):
            with self.subTest(body=body):
                self.assertEqual([call[0] for call in calls_in(part)], (name or "").split())
                if name == "dmac" and "i < 64" in body:
                    self.assertIn('MUST_ITERATE("32", "32", "32")', part)
        for options in (["--opt_level=2"], ["--opt_level=2", "--unified_memory", "--big_endian"]):
            self.assertFalse(any("dmac" in part for part in program.optimized(self, options)))


if __name__ == "__main__":
    unittest.main()
