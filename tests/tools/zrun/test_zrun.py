"""tools/zrun: its statuses, what it shows and what it keeps. ZOPT, ICRUN, ICDUMP and ICPARSE name the programs."""
import os
import subprocess
import tempfile
import unittest
from pathlib import Path

ZRUN = Path(__file__).resolve().parents[3] / "tools" / "zrun"

PROGRAM = """#include <zrun.h>
static int f(int x) { goto next; next: return x + 1; }
int main(void) { put_i16(f(41)); return 3; }
"""

# An optimizer whose output is another program's.
LIAR = """#!/bin/sh
for last; do :; done
cp {other} $last
"""

NEST = """#include <zrun.h>
int f(int n, int m) { int i, j, s = 0;
    for (i = 0; i < n; i++) {
#pragma MUST_ITERATE(1, 9)
        for (j = 0; j < m; j++) { put_i16(s); s += i * j; } }
    return s; }
int main(void) { put_i16(f(4, 3)); return 0; }
"""


class Zrun(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = Path(folder.name)

    def zrun(self, *words, source=PROGRAM):
        path = self.folder / "p.c"
        path.write_text(source)
        return subprocess.run([ZRUN, path, *words], stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)

    def test_equal(self):
        done = self.zrun("--opt_level=2", "--show", "--keep", self.folder / "kept")
        self.assertEqual(done.returncode, 0, done.stderr)
        self.assertIn("equal: 1 lines, status 3", done.stdout)
        self.assertRegex(done.stdout, r"nodes +\d+ +\d+")
        self.assertRegex(done.stdout, r"function _f: int\(int\) +\| function _f: int\(int\)")
        kept = sorted(path.name for path in (self.folder / "kept").iterdir())
        self.assertEqual(kept, ["p.if", "p.opt.if", "p.opt.out", "p.out"])
        again = subprocess.run([ZRUN, self.folder / "kept" / "p.opt.if", "-o1"], stdout=subprocess.PIPE)
        self.assertEqual(again.returncode, 0)

    def test_loops(self):
        done = self.zrun("--opt_level=2", "--disable_inlining", "--float_support=fpu32", "--show", "--keep", self.folder, source=NEST)
        self.assertEqual(done.returncode, 0, done.stderr)
        told = [line for line in done.stdout.splitlines() if line.startswith("loop of ")]
        self.assertEqual(len(told), 2, told)
        self.assertRegex(told[0], r"^loop of _f: line 3 for, loop 1, \d.* iterations")
        self.assertRegex(told[1], r"^loop of _f: line 5 for, loop 2 in 1, \d.* iterations.*, MUST_ITERATE\(1, 9")
        self.assertRegex(done.stdout, r"\nloop 1 of line 3: .*\n(    .*\n)*loop 2 of line 5: ")
        dot = subprocess.run([os.environ["ICDUMP"], "--dot", self.folder / "p.opt.if"], stdout=subprocess.PIPE, text=True).stdout
        self.assertRegex(dot, r"(?s)cluster_\d_1 \{\s*label=\"loop 1: [^}]*cluster_\d_2 \{\s*label=\"loop 2: [^}]*\}[^}]*\}")

    def test_different(self):
        self.assertEqual(self.zrun("--keep", self.folder, source=PROGRAM.replace("41", "42")).returncode, 0)
        other = self.folder / "other.if"
        (self.folder / "p.opt.if").rename(other)
        liar = self.folder / "liar"
        liar.write_text(LIAR.format(other=other))
        os.chmod(liar, 0o755)
        done = self.zrun("--zopt", liar)
        self.assertEqual(done.returncode, 1, done.stderr)
        self.assertIn("different: line 1: '43' instead of '42'", done.stdout)

    def test_trouble(self):
        self.assertEqual(self.zrun(source="int main(void) { return x; }").returncode, 2)
        self.assertEqual(self.zrun("--opt_level=99").returncode, 2)
        self.assertEqual(self.zrun("--zopt", "/nowhere/zopt").returncode, 2)
        self.assertEqual(subprocess.run([ZRUN, "absent.c"], stderr=subprocess.PIPE).returncode, 2)


if __name__ == "__main__":
    unittest.main()
