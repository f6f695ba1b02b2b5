"""Unrolled loops: every header with every body, for counts from none to a few more than the copies, and near the ends of types.

Each loop is a function of where its counter begins and ends; it returns what its variables and the array hold behind it.
"""
import itertools
import random
import sys
import tempfile
import unittest
from pathlib import Path

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent.parent / "tools"))
from zbench import Tools  # noqa: E402

# The counter's type, the header from `a` to `b`, and the step: pairs of `a` and `b` are made from it.
HEADERS = [
    ("int", "for (v = a; v < b; v++)", 1), ("int", "for (v = a; v <= b; v += 3)", 3), ("int", "for (v = a; v != b; v += 2)", 2),
    ("int", "for (v = a; v > b; v--)", -1), ("int", "for (v = a; v >= b; v -= 7)", -7), ("int", "v = a; @ while (v-- > b)", -1),
    ("int", "for (v = 0; v < b; v++)", 1), ("unsigned", "for (v = a; v < b; v++)", 1), ("unsigned", "for (v = a; v != b; v += 1)", 1),
    ("unsigned", "for (v = a; v > b; v -= 2)", -2), ("unsigned", "v = b; @ while (v--)", 1), ("long", "for (v = a; v < b; v += 5)", 5),
    ("unsigned long", "for (v = a; v < b; v++)", 1), ("long", "for (v = a; v != b; v--)", -1),
    ("int", "for (v = 3; v < 22; v++)", 0), ("unsigned", "for (v = 0; v < 9; v += 3)", 0), ("int", "for (v = 20; v >= 0; v -= 4)", 0),
    ("int", "for (v = 1; v < 38; v += 3)", 0), ("int", "v = a; if (v < b) @ do", 1), ("unsigned", "for (v = 65531u; v != 5; v++)", 0),
    ("int", "v = a; if (flag) v += k - 9; @ for (; v < b; v++)", 1), ("long", "v = a; if (flag) v += k - 9; @ for (; v > b; v -= 3)", -3),
    ("unsigned", "v = b; if (flag) v += k - 9; @ while (v--)", 1),
    ("int", "for (v = -30000; v < 23000; v += 9000)", 0), ("int", "for (v = 64; v; v >>= 2)", 0), ("unsigned", "for (v = 1; v < 3000; v *= 3)", 0),
]
# `k` and `p` step as well; `t` is computed.
BODIES = [
    "w[v & 127] += 3;",
    "t = t * 3 + (int)v; w[(int)(v & 63) + 1] ^= t;",
    "if (v & 1) t += 5; else w[v & 63] ^= 7;",
    "if (t > 400) break; t += 17 + w[v & 7]; k++;",
    "t += w[k]; k += 2; w[k] = (int)v; w[k + 1] ^= t & 15;",
    "*p++ = t; t ^= (int)v + *p;",
    "t += flag; if (w[v & 15] & 4) continue; k++; w[v & 15]++;",
    "for (j = 0; j < 3; j++) w[j + k] += (int)v - j; k++;",
    "w[k] = w[k + 1] + w[k + 2]; k++; if (w[k] > 90) { w[k] -= 60; t++; }",
    "w[v & 31] = (int)(v >> 1) + (int)(v << 2) - (int)v; k--; w[40 + (k & 7)] = k;",
]
PRAGMAS = ["", "", "#pragma UNROLL(2)\n", "#pragma UNROLL(3)\n", "#pragma UNROLL(4)\n", "#pragma UNROLL(1)\n", "#pragma PROB_ITERATE(2, 6)\n"]
LIMITS = {"int": (-32768, 32767), "unsigned": (0, 65535), "long": (-2147483648, 2147483647), "unsigned long": (0, 4294967295)}
WORDS = [["--opt_level=2"], ["--opt_level=2", "--size_speed_goal=5"], ["--opt_level=2", "--size_speed_goal=0"],
         ["--opt_level=3", "--float_support=fpu32"], ["--opt_level=2", "--debug:only=cd-unroll-completely-for-speed+cd-unroll-for-speed"]]


def ends(kind, header, step, choice):
    """Pairs of `a` and `b`: for counts from 0 to 13, in the middle and where the last value is an end of the type."""
    if not step:
        return [(0, 0)]
    low, high = LIMITS[kind]
    pairs = []
    for count in range(14):
        distance = count * step
        if "while (v--)" in header:
            pairs.append((0, count))
            continue
        start = choice.randrange(100, 200)
        if count % 3 == 2 and "v = 0" not in header:
            start = high - 7 - distance if step > 0 else low + 7 - distance
        if "v = 0" in header:
            start = 0
        over = choice.randrange(abs(step)) if "!=" not in header else 0
        pairs.append((start, start + distance - (over if step > 0 else -over) * (count > 0)))
    return pairs


def program(seed):
    choice = random.Random(seed)
    text = ["#include <zrun.h>\nint w[200]; volatile int flag = 1;\n"
            "static void begin(void) { int i; for (i = 0; i < 200; i++) w[i] = i * 37 & 63; }\n"
            "static void show(long v, int t, int k) { int i; unsigned long h = 0;\n"
            "    for (i = 0; i < 200; i++) h = h * 31 + (unsigned)w[i];\n    put_i32(v); put_i16(t); put_i16(k); put_u32(h); }\n"]
    calls = []
    for n, ((kind, header, step), body) in enumerate(itertools.product(HEADERS, BODIES)):
        if header.endswith("do"):
            loop = f"{header} {{ {body.replace('continue', 'goto next')} next: v++; }} while (v < b);"
        else:
            loop = f"{header if '@' in header else '@ ' + header} {{ {body} }}"
        loop = loop.replace("@", "\n" + choice.choice(PRAGMAS))
        text.append(f"void f{n}({kind} a, {kind} b) {{ {kind} v = 0; int t = 1, k = 9, j; int *p = w + 50; begin(); j = 0;\n"
                    f"{loop}\n show((long)v + j, t, k + (int)(p - w)); }}\n")
        suffix = {"int": "", "unsigned": "u", "long": "L", "unsigned long": "uL"}[kind]
        for a, b in ends(kind, header, step, choice):
            calls.append(f"f{n}({a}{suffix}, {b}{suffix});")
    return "".join(text) + "int main(void) {\n" + "\n".join(calls) + "\nreturn 0; }\n"


class Unrolling(unittest.TestCase):
    def test_all_run_as_they_were(self):
        tools = Tools()
        with tempfile.TemporaryDirectory() as folder:
            source, unit, out = (Path(folder) / name for name in ("p.c", "p.if", "p.opt"))
            source.write_text(program(1))
            tools.parse(source, unit, ["-w"])
            plain = tools.execute(unit)
            self.assertEqual(plain.status, 0, plain.errors)
            unrolled = 0
            for words in WORDS:
                tools.optimize(unit, out, [*words, "--disable_inlining", "--debug:validate"])
                done = tools.execute(out, ["--check"])
                self.assertEqual((done.status, done.output), (0, plain.output), (words, done.errors))
                unrolled += tools.dump(out).count(" UNROLL_AMOUNT(")
            self.assertGreater(unrolled, 200)


if __name__ == "__main__":
    unittest.main()
