"""Pragmas of loops, all kinds in a random order: each comes out of the whole optimizer once, in its place, as it was."""
import random
import re
import sys
import tempfile
import unittest
from pathlib import Path
from unittest import mock

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent.parent / "tools"))
from icparse_lib import cli, pragmas  # noqa: E402
from zbench import INCLUDE, LOOPS_STAY, Tools  # noqa: E402

ORDER = [125, 124, 123, 112, 66, 67, 65, 64, 63, 56, 68, 41, 38, 37, 39, 40, 121, 80, 60, 42, 43, 44]
LISTS = [60, 42, 43, 44]
ARGUMENTS = {66: "1, 2, 3, 4", 67: "5, 6, 7, 8", 65: "1, 2, 3, 4, 5, 6", 64: "7, 8, 9, 1, 2, 3", 63: "9", 38: "2", 37: "4",
             39: "2, 100, 1", 40: "3, 50"}
# The pragmas stand at each @.
LOOPS = ["int i; @ for (i = 0; i < n; i++) g[i & 7] += i;",
         "int i = 0; @ while (g[1]++, g[2] += i, i < n) { g[i & 7] += i; i++; }",
         "int i = 0; @ do { g[i & 7] += i; i++; } while (i < n);",
         "int i; @ for (i = 0; i < n; i++) { g[i & 7] += i; if (g[i & 7] > 999) break; }",
         "int *p = g; int i; if (n > 0) { @ for (i = 0; i < n; i++) *p++ = i; }",
         "int i, j; @ for (i = 0; i < n; i++) { g[0] += i; @ for (j = 0; j < n; j++) g[j & 7] += j; g[1] += i; }"]


def stated(loop, choice):
    names = {kind: name for name, kind in pragmas.KINDS.items()}
    kinds = [kind for kind in ORDER if kind != 41] + LISTS  # the parser makes those of places

    def shuffled(_):
        choice.shuffle(kinds)
        return "".join(f"\n#pragma {names[k]}({ARGUMENTS.get(k, choice.randrange(9999))})" for k in kinds) + "\n"

    return f"int g[8];\nvoid f(int n) {{ {re.sub('@', shuffled, loop)} }}\n"


def groups(dump):
    """Lists of (kind, arguments) of pragmas that follow each other; flags are the optimizer's own, and so may the name of
    a loop's variable be."""
    found = [[]]
    for line in dump[dump.index("function _f:"):].splitlines():
        pragma = re.match(r" +pragma (\d+) \w+(.*)", line)
        if not pragma:
            found.append([])
        elif pragma[1] != "57":
            words = re.sub(r'^\(("[^"]*"), "\w*"', r'(\1, ""', pragma[2]) if pragma[1] == "41" else pragma[2]
            found[-1].append((int(pragma[1]), words))
    return [group for group in found if group]


class LoopPragmas(unittest.TestCase):
    def test_each_comes_out_once_in_its_place(self):
        tools = Tools()
        names = {name: 99 for name, kind in pragmas.KINDS.items() if kind in ORDER}
        taken = mock.patch.multiple(pragmas, LOOP=names, loop_pragma=lambda name, words, _: (pragmas.KINDS[name], words))
        for seed, loop in enumerate(LOOPS):
            with tempfile.TemporaryDirectory() as folder, taken:
                source, unit, out = (Path(folder) / name for name in ("p.c", "p.if", "p.opt"))
                source.write_text(stated(loop, random.Random(seed)))
                self.assertEqual(cli.main(["-w", "-I", str(INCLUDE), str(source), "-o", str(unit)]), 0)
                # A stable sort: those of a list stay as they were.
                want = [sorted(g, key=lambda p: ORDER.index(p[0])) for g in groups(tools.dump(unit))]
                for words in (["--opt_level=2"], ["--opt_level=3", "--float_support=fpu32"], ["--opt_level=2", "--debug:idle_frames"]):
                    words.append(LOOPS_STAY)
                    tools.optimize(unit, out, [*words, "--debug:validate"])
                    self.assertEqual(groups(tools.dump(out)), want, (loop, words))


if __name__ == "__main__":
    unittest.main()
