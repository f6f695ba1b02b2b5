"""Loops whose trip count can be proved: the promise in the output names it, and the loop runs so often.

A row is a loop without its body, the count, and what is declared in front of it. All are one program: each loop is a
function that returns how often its body ran.
"""
import re
import sys
import tempfile
import unittest
from pathlib import Path

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent.parent / "tools"))
from zbench import LOOPS_STAY, Tools  # noqa: E402

I, U, L, K, Q, P = "int i;", "unsigned u;", "long l;", "unsigned long k;", "long long q;", "int *p;"

# Declarations, loop, count. `x` is an unknown int (8), `y` an unknown unsigned (5), `w` an array of 1000 int.
COUNTED = [
    (I, "for (i = 0; i < 10; i++)", 10),
    (I, "for (i = 0; i <= 10; i++)", 11),
    (I, "for (i = 10; i > 0; i--)", 10),
    (I, "for (i = 10; i >= 0; i--)", 11),
    (I, "for (i = 0; i != 12; i += 3)", 4),
    (I, "for (i = 12; i != 0; i -= 4)", 3),
    (I, "for (i = 0; i < 10; i += 3)", 4),
    (I, "for (i = 1; i < 10; i += 3)", 3),
    (I, "for (i = 0; i <= 9; i += 3)", 4),
    (I, "for (i = -7; i < 8; i += 5)", 3),
    (I, "for (i = 20; i > 3; i -= 7)", 3),
    (I, "for (i = 20; i >= 6; i -= 7)", 3),
    (I, "for (i = -30000; i < 30000; i += 7)", 8572),
    (I, "for (i = 30000; i >= -30000; i -= 1000)", 61),
    (I, "for (i = 32760; i < 32767; i++)", 7),
    (I, "for (i = -32768; i < -32760; i++)", 8),
    (I, "for (i = 3; 30 > i; i += 2)", 14),
    (I + " i = 5;", "while (i < 25) { i += 5;", 4),
    (I + " i = 0;", "while (i != 6) { i++;", 6),
    (I, "for (i = 4; i; i >>= 1)", 3),
    (I, "for (i = -7; i * 3 < 90; i = i * 2 + 40)", 2),
    (U, "for (u = 1; u < 1000; u *= 3)", 7),
    (U, "for (u = 0; u < 10; u++)", 10),
    (U, "for (u = 0; u <= 10; u++)", 11),
    (U, "for (u = 7; u != 0; u--)", 7),
    (U, "for (u = 9; u > 2; u -= 3)", 3),
    (U, "for (u = 0; u != 10; u += 3)", 43694),
    (U, "for (u = 65530u; u < 65535u; u++)", 5),
    (U, "for (u = 65530u; u != 4; u++)", 10),
    (U, "for (u = 40000u; u < 60000u; u += 100)", 200),
    (U, "for (u = 6; u != 2; u += 4)", 16383),
    (L, "for (l = 0; l < 1000; l += 2)", 500),
    (L, "for (l = 0; l < 32767; l += 2)", 16384),
    (L, "for (l = -5; l <= 5; l++)", 11),
    (L, "for (l = 2000000000; l < 2000000010; l += 3)", 4),
    (L, "for (l = 100000; l > 99990; l--)", 10),
    (L, "for (l = 0; l != 70000; l += 7000)", 10),
    (K, "for (k = 0; k < 10; k++)", 10),
    (K, "for (k = 4000000000u; k < 4000000008u; k += 2)", 4),
    (K, "for (k = 10; k != 0; k -= 2)", 5),
    (Q, "for (q = 0; q < 5; q++)", 5),
    (Q, "for (q = 5000000000; q < 5000000006; q += 2)", 3),
    (I, "for (i = x; i < x + 10; i++)", 10),
    (I, "for (i = x + 3; i < x + 10; i += 2)", 4),
    (I, "for (i = x; i != x + 8; i += 2)", 4),
    (I, "for (i = x; i > x - 9; i -= 3)", 3),
    (I, "for (i = x * 4 + 1; i <= x * 4 + 7; i++)", 7),
    (U, "for (u = y; u != y + 5; u++)", 5),
    (P, "for (p = w; p < w + 20; p++)", 20),
    (P, "for (p = w; p != w + 20; p += 4)", 5),
    (P, "for (p = w + 30; p > w + 10; p -= 5)", 4),
    (P, "for (p = &w[x & 3]; p != &w[(x & 3) + 12]; p += 3)", 4),
    (I + " int n = 12;", "for (i = 0; i < n; i++)", 12),
    (I + " int n = 12, from = 4;", "for (i = from; i < n; i += from)", 2),
    (I + " const int n = x & 0;", "for (i = n; i < n + 6; i++)", 6),
    (I + " int j = 3;", "for (i = 0; i < 4; i++) { j += 2;", 4),
    (I + " if (x > 8 || x < 8) return 8;", "for (i = 2; i < x; i++)", 6),
    (I + " int n = x; if (n % 8 || n < 3 || n > 14) return 8;", "for (i = 0; i < n; i++)", 8),
    (I + " if (x != 8) return 8;", "for (i = 0; i < x; i++)", 8),
    (I + " if (x > 9 || x < 7 || x == 7 || x == 9) return 8;", "for (i = 0; i < x; i++)", 8),
    (I + "\n#pragma MUST_ITERATE(8, 8)\n", "for (i = 0; i < x; i++)", 8),
    (I + "\n#pragma MUST_ITERATE(8, 15, 8)\n", "for (i = 0; i < x; i++)", 8),
    (I + " i = 0;", "do { i += 4; BODY } while (i < 17);", 5),
]
MOST_MISSED = 3

# Promises must be true of these too: what is known is less, or the count is no formula.
UNCOUNTED = [
    (U, "for (u = 0; u <= y; u++) { if (u == 20) break;"),
    (I, "for (i = 0; i < 100; i++) { if (i == x) break;"),
    (I + " int n = x; if (n > 10) i = 1;", "for (i = 0; i < n; i++)"),
    (I + " int n = x; if (n % 4) return 0; if (y > 3) n++;", "for (i = 0; i < n; i++)"),
    (I + "\n#pragma MUST_ITERATE(4, 100, 4)\n", "for (i = 0; i < x + 2; i++) { if (i == 7) break;"),
    (I + "\n#pragma MUST_ITERATE(0, 100, 2)\n", "for (i = 0; i < x - 8; i++)"),
    (I, "for (i = 0; i < x - 9; i += 2)"),
    (U, "for (u = y; u < 5; u--)"),
    (I + " i = x;", "do { i++; BODY } while (i < 0);"),
    (U + " u = 65535u;", "do { u++; BODY } while (u < y);"),
    (I, "for (i = 0; i < 20; i++) { if (i == 10) { last(); } w[i & 15 | (i > 10) * 512]++;"),
    (I + " i = 0;", "while (i < 10) { i++; if (w[i] == 0) continue;"),
    (U + " int *p = w + 600;", "for (u = x & 127; u > 6u; u -= 2) { *p = x; p = w + 601;"),
]

PRELUDE = """#include <zrun.h>
int w[1000], calls;
volatile int eight = 8;
volatile unsigned five = 5;
void last(void) { calls++; }
"""


def function(number, declarations, loop):
    body = f"w[50 + (int)(runs & 7)] += {number}; runs++;"
    loop = loop.replace("BODY", body) if "BODY" in loop else loop + (" " if "{" in loop else " { ") + body + " }"
    return f"long f{number}(int x, unsigned y) {{ long runs = 0; {declarations} {loop}\n return runs; }}\n"


def program(rows):
    calls = "".join(f"    put_i32(f{n}(eight, five));\n" for n in range(len(rows)))
    return PRELUDE + "".join(function(n, *row[:2]) for n, row in enumerate(rows)) + f"int main(void) {{\n{calls}    return 0;\n}}\n"


class LoopCounts(unittest.TestCase):
    def outputs(self, rows, words):
        tools = Tools()
        with tempfile.TemporaryDirectory() as folder:
            source, unit, out = (Path(folder) / name for name in ("p.c", "p.if", "p.opt"))
            source.write_text(program(rows))
            tools.parse(source, unit)
            tools.optimize(unit, out, [*words, "--debug:validate", "--disable_inlining"])
            return tools.execute(unit), tools.execute(out, ["--check"]), tools.dump(out)

    def test_counts_are_proved(self):
        _, checked, dump = self.outputs(COUNTED, ["--opt_level=2", LOOPS_STAY])
        self.assertEqual([int(n) for n in checked.output.split()], [row[2] for row in COUNTED], checked.errors)
        missed = []
        for n, row in enumerate(COUNTED):
            part = dump[dump.index(f"function _f{n}:"):]
            part = part[:part.index("end function")]
            # A loop of one iteration, or one that is computed, is no loop any more.
            if not re.search(rf'MUST_ITERATE\("{row[2]}", "{row[2]}", "{row[2]}"\)', part):
                missed.append(row)
        self.assertLessEqual(len(missed), MOST_MISSED, missed)

    def test_promises_are_true(self):
        for words in (["--opt_level=2"], ["--opt_level=3"], ["--opt_level=2", "--float_support=fpu32"]):
            plain, checked, _ = self.outputs(UNCOUNTED, words)
            self.assertEqual((checked.status, checked.output), (plain.status, plain.output), checked.errors)


if __name__ == "__main__":
    unittest.main()
