"""On no path is an expression evaluated more often than without the optimizer.

Random graphs of blocks, also with loops that are entered in two places; each function runs along one path, which its seed
decides. The expressions are calls of functions that only compute, each of one caller alone, so that the executor counts
them; operators are counted over each program. Moves that rest on how often blocks run are left out.
"""
import random
import re
import tempfile
import unittest
from pathlib import Path

from run import Tools, difference

PROGRAMS, GRAPHS, PATHS = 5, 12, 5
CALLEES, OPERATORS = ("p", "q"), ("|", "^")


class Graph:
    """The text of one function; @ stands for the number of the path."""

    def __init__(self, rng, name):
        self.rng, self.name, self.blocks = rng, name, rng.randint(4, 9)
        self.lines = [f"unsigned {name}_@_{k}(unsigned a, unsigned b) {{ return a * {i + 3} - b * 5 - (a - b) * a; }}"
                      for i, k in enumerate(CALLEES)]
        self.lines += [f"unsigned {name}_@(unsigned s, unsigned a, unsigned b) {{", "unsigned c = 1, d = 2; int fuel = 40;"]
        for block in range(self.blocks):
            self.lines.append(f"l{block}: if (--fuel < 0) goto out;")
            self.lines += [self.statement() for _ in range(rng.randint(0, 3))]
            if rng.random() < 0.75:
                self.lines.append(f"s = s * 75u + 74u; if (s & 256u) goto l{rng.randrange(self.blocks)};")
        self.lines.append("out: return c + d + a + b; }")

    def expression(self):
        if self.rng.random() < 0.6:
            return f"{self.name}_@_{self.rng.choice(CALLEES)}(a, b)"
        if self.rng.random() < 0.6:
            return f"(a {self.rng.choice(OPERATORS)} b)"
        return self.rng.choice(("(a * 3 + b)", "((b << 2) - a)", "((long)(int)a * 3 + (int)b)"))  # steps with its variables

    def statement(self):
        e, x = self.expression, self.expression()
        return self.rng.choice((
            lambda: f"c += {e()};", lambda: f"d = {e()} - c;", lambda: f"a += {self.rng.choice(('1', '1', 'c & 3'))};",
            lambda: "b -= 3;",
            lambda: "b = d & 15;", lambda: f"g = {e()};", lambda: f"hit({e()});",
            # Effects among the reads.
            lambda: f"c = hit(d) + {e()};", lambda: f"d = (g = {e()}) - {e()};", lambda: f"c += (d++ & 1) + {e()};",
            lambda: f"*r++ = {e()}; r = &t[1];", lambda: f"c = ({e()} > 3 && {e()} < 9) + hit({e()});",
            lambda: f"hit(d = {e()} + c);", lambda: f"d = {x}; d += {x} > 3 && (a += 1) && (c += {x});",
            lambda: f"c = (s & 64u && {x} < 9) + (d = c); if (s & 32u) g = {x};"))()

    def of_path(self, path):
        return [line.replace("@", str(path)) for line in self.lines]


def program(seed):
    rng, lines, main = random.Random(seed), ["#include <zrun.h>", "unsigned g, t[4], *r = &t[1];"], []
    lines.append("unsigned hit(unsigned x) { g += x; return g - x; }")
    for i in range(GRAPHS):
        graph = Graph(rng, f"f{i}")
        for path in range(PATHS):
            lines += graph.of_path(path)
            arguments = f"{rng.randrange(65536)}u, {rng.randrange(9)}, {rng.randrange(9)}"
            main.append(f"put_i16(f{i}_{path}({arguments})); put_i16(g);")
    return "\n".join([*lines, "int main(void) {", *main, "return 0; }"])


class PathCounts(unittest.TestCase):
    def counts(self, tools, unit):
        """Calls by callee, and executed operators of the program."""
        done = tools.execute(unit, ["--profile", "--stats"])
        calls = {name: int(n) for name, n in re.findall(r"^(\w+): (\d+) calls", done.errors, re.M)}
        operators = {op: int(n) for n, op in re.findall(r"^ *(\d+) (ORB|XORB)$", done.errors, re.M)}
        return done, calls, operators

    def test_no_path_evaluates_more(self):
        tools, before, after = Tools(), 0, 0
        with tempfile.TemporaryDirectory() as folder:
            source, unit, out = (Path(folder) / name for name in ("p.c", "p.if", "p.opt.if"))
            for seed in range(PROGRAMS):
                source.write_text(program(seed))
                tools.parse(source, unit)
                tools.optimize(unit, out, ["--opt_level=2", "--disable_inlining", "--debug:skip=ssa-hoist+merge-symbols"])
                want, calls, operators = self.counts(tools, unit)
                got, new_calls, new_operators = self.counts(tools, out)
                self.assertIsNone(difference(want, got), f"program {seed}")
                more = {name: (calls.get(name, 0), n) for name, n in new_calls.items() if n > calls.get(name, 0)}
                self.assertEqual(more, {}, f"program {seed}")
                for op, n in new_operators.items():
                    self.assertLessEqual(n, operators[op], f"program {seed}: {op}")
                is_expression = lambda name: name.count("_") == 2
                before += sum(n for name, n in calls.items() if is_expression(name))
                after += sum(n for name, n in new_calls.items() if is_expression(name))
        self.assertLess(after * 10, before * 9)  # something is found


if __name__ == "__main__":
    unittest.main()
