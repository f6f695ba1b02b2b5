"""Exceptions: random programs with handlers and clean-ups do the same at every level, whatever is inlined.

A function calls those ahead of it, in regions that catch, clean up or pass on, and may throw; handlers print what they see
of the locals and the global variable, and may throw again.
"""
import os
import random
import tempfile
import unittest
from pathlib import Path

from run import Tools, difference

PRAGMAS = ("",) * 4 + ("#pragma FORCEINLINE", "#pragma FORCEINLINE_RECURSIVE", "#pragma FORCEINLINE_RECURSIVE", "#pragma NOINLINE")


class Program:
    def __init__(self, seed):
        self.rng, self.labels, self.lines = random.Random(seed), 0, []
        self.lines += ["#include <zrun.h>", "int g;", "static int twice(int a) { return a * 2; }",
                       "static void undo(int *p) { put_i32(*p + 1000); *p += 3; }",
                       "static int check(int a) { if ((a & 7) == 3) zthrow(a & 15); return a - 1; }"]
        self.count = self.rng.randint(2, 5)
        for i in range(self.count):
            self.function(i)
        self.lines += ["int main(void) {", "    int i;", "    for (i = 0; i < 12; i++) {", '        __eh_catch("...", out);']
        self.lines += [f"        put_i32(f{i}(i * {self.rng.choice((1, 3))}));" for i in reversed(range(self.count))]
        self.lines += ["        __eh_end();", "        continue;", "    out:", "        put_i32(zcaught() + g);", "    }",
                       "    return 0;", "}"]

    def value(self, also=("g", "v + g")):
        return self.rng.choice(("a", "v", "w", "v + 1", "a + w", "v ^ a", str(self.rng.randint(0, 9))) + also)

    def call(self, i):
        names = [f"f{j}" for j in range(i)] + ["check", "check"]
        return f"{self.rng.choice(names)}({self.value()})" + self.rng.choice(("", "", f" + twice({self.value(())})"))

    def statements(self, i, depth, count):
        for _ in range(count):
            self.statement(i, depth)

    def statement(self, i, depth):
        rng, out = self.rng, self.lines.append
        kind = rng.choice(("set", "call", "call", "call", "if", "return", "throw", "loop", "region", "region"))
        if kind in ("if", "loop", "region") and depth > 2:
            kind = "call"
        if kind in ("call", "if", "return"):
            out(rng.choice(PRAGMAS))
        target = rng.choice(("v", "w", "g"))
        if kind == "set":
            out(f"    {target} = {self.value()} * {rng.randint(1, 5)};")
        elif kind == "call":
            out(f"    {target} {'+=' if target != 'g' and rng.random() < 0.3 else '='} {self.call(i)};")
        elif kind == "if":
            out(f"    if ({self.call(i)} {rng.choice(('> 4', '& 1', '== a'))}) {{")
            self.statements(i, depth + 1, rng.randint(1, 2))
            out("    }")
        elif kind == "return":
            out(f"    if (v > {rng.randint(3, 60)}) return {self.call(i)};")
        elif kind == "throw":
            out(f"    if (({self.value()}) % 5 == {rng.randint(0, 4)}) zthrow({self.value()});")
        elif kind == "loop":
            self.labels += 1
            out(f"    {{ int n{self.labels}; for (n{self.labels} = 0; n{self.labels} < 3; n{self.labels}++) {{")
            self.statements(i, depth + 1, rng.randint(1, 2))
            out("    } }")
        else:
            self.region(i, depth)

    def region(self, i, depth):
        rng, out = self.rng, self.lines.append
        kind = rng.choice(("catch",) * 4 + ("cleanup(undo(&u))",) * 2 + ("pass()",) * 2 + ("terminate()",))
        if kind != "catch":
            out(f"    __eh_{kind};")
            self.statements(i, depth + 1, 1 if kind == "terminate()" else rng.randint(1, 3))
            out("    __eh_end();")
            return
        self.labels += 1
        n, what = self.labels, rng.choice(('"..."', '"..."', str(rng.randint(0, 12))))
        out(f"    __eh_catch({what}, h{n});")
        self.statements(i, depth + 1, rng.randint(1, 3))
        out("    __eh_end();")
        out(f"    goto e{n};\nh{n}:")
        out("    put_i32(zcaught()); put_i32(v + w * 3 + g * 7 + u);")
        if rng.random() < 0.3:
            out(f"    zthrow({rng.choice(('zcaught()', 'v', '3'))});")
        self.statements(i, depth + 1, rng.randint(0, 1))
        out(f"e{n}:;")

    def function(self, i):
        head = self.rng.choice(("static ", "static inline ", "")) + f"int f{i}(int a) {{"
        self.lines += [head, f"    int v = a + {i}, w = 1, u = {i};"]
        self.statements(i, 0, self.rng.randint(2, 5))
        self.lines += ["    return v + w;", "}"]


class Exceptions(unittest.TestCase):
    def test_random_programs(self):
        tools = Tools(**{name: os.environ.get(name.upper()) for name in ("zopt", "icrun", "icdump", "icparse")})
        integrated = 0
        first, count = (int(os.environ.get(name, default)) for name, default in (("FIRST_SEED", 0), ("SEEDS", 25)))
        with tempfile.TemporaryDirectory() as folder:
            source, unit, out, info = (Path(folder) / name for name in ("p.c", "p.if", "out.if", "p.nfo"))
            for seed in range(first, first + count):
                source.write_text("\n".join(Program(seed).lines) + "\n")
                tools.parse(source, unit)
                before = tools.execute(unit)
                for level in range(5):
                    with self.subTest(seed=seed, level=level):
                        tools.optimize(unit, out, [f"--opt_level={level}", "--debug:validate,inline_commentary",
                                                   "--gen_opt_info=2", f"--opt_info_filename={info}"])
                        self.assertIsNone(difference(before, tools.execute(out)))
                        if level < 2:  # the table names nothing that is gone
                            tools.optimize(out, unit.with_suffix(".2.if"), ["--opt_level=off"])
                        integrated += info.read_text().count("[accepted:") if level == 3 else 0
        self.assertGreater(integrated, 3 * count)


if __name__ == "__main__":
    unittest.main()
