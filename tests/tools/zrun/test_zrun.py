"""tools/zrun and tools/zview: their statuses, what they show and what they keep. ZOPT, ICRUN, ICDUMP and ICPARSE name the programs."""
import json
import os
import re
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

ZRUN = Path(__file__).resolve().parents[3] / "tools" / "zrun"
ZVIEW = ZRUN.with_name("zview")

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


# Behind each line the remarks to be found under it.
TOLD = """#include <zrun.h>
int x[32], y[32]; long s, m[5][5];
static int pair(int *p) { return p[0] + p[1]; }
int f(int n) { int i; long a = 0, b = 0;
    for (i = 0; i < 32; i++)  // done    loops: one branch closes it: 32 iterations
        a += (long)x[i] * y[i];  // done    multiply.*__parallel_mpy_add; missed  dual.*32-bit boundary
    for (i = 0; i < n; i++)  // done    loops: one branch closes it: n iterations
        b += x[i] * y[i];  // missed  multiply-accumulate: .*write \\(long\\)x \\* y
    for (i = 0; i < n; i++)
        { if (x[i] > 3) b += (long)x[i] * y[i]; }  // missed  multiply-accumulate: .*more than one block
    for (i = 0; i < 5; i++) b += m[i][i];  // not     multiply-accumulate
    while (x[n] != 7) n -= x[n & 7];  // missed  loops: .*no variable counts
    return (int)(a + b); }
void g(int *p, int *q, int n) { int i;
    for (i = 0; i < n; i++) p[i] = q[i] + 1;  // missed  dependence: .*restrict
    for (i = 0; i < 31; i++)
        x[i + 1] = x[i] + i;  // note    dependence: .*'x\\[i \\+ 1\\]' .*'x\\[i\\]' .*1 apart
    for (i = 0; i < 32; i++) y[i] = 3; }  // done    dependence: no access
static int v(int n) { volatile int m = n; return m; }
int main(void) { x[0] = 1; g(x, y, 5); x[5] = v(7);  // missed  inline: v\\(\\) is not expanded: it has a volatile variable
    put_i16(f(5)); put_i16(pair(x)); return 0; }  // done    inline: pair\\(\\) is expanded here; missed  inline: f\\(\\)
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

    def test_several_files(self):
        other = self.folder / "q.c"
        other.write_text("int g(int x) { return x * 2; }")
        done = self.zrun("-o2", other, "--opt_level=1", source="int g(int); int main(void) { return g(4); }")
        self.assertIn("equal: 0 lines, status 8", done.stdout, done.stderr)
        self.zrun("--keep", self.folder)
        self.assertEqual(self.zrun(self.folder / "p.if").returncode, 2)

    def test_a_stopped_program(self):
        done = self.zrun("-o2", source="int absent(void);\nint main(void) {\n  return absent(); }")
        self.assertEqual(done.returncode, 67, done.stderr)
        self.assertIn("stopped, before and after: icrun: the function absent is nowhere defined (in main, line 3), status 67",
                      done.stdout)
        self.assertIn("equal: 0 lines, status 67", self.zrun(source="int main(void) { return 67; }").stdout)

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
        self.assertEqual(dot.count('[label="true"]'), dot.count('[label="false"]')) # of each test, as it is printed

    def test_remarks(self):
        done = self.zrun("--opt_level=3", "--unified_memory", "--remarks", source=TOLD)
        self.assertEqual(done.returncode, 0, done.stderr)
        told = done.stdout.split("\n\n")[0]
        for number, line in enumerate(TOLD.splitlines(), 1):
            *_, wanted = line.partition("// ")
            under = re.search(rf"^p.c:{number}: .*\n((?:    .*\n?)*)", told, re.M)
            for text in filter(None, wanted.split("; ")):
                check = self.assertNotRegex if text.startswith("not ") else self.assertRegex
                check(under[1] if under else "", f"(?m)^    {text.replace('not     ', '.*')}")
        self.assertEqual(told.count("pair() is expanded here"), 1)

    def test_remarks_change_nothing(self):
        self.zrun("--keep", self.folder, source=TOLD)
        written = set()
        for name in "remarks", "remarkz", "remarks":
            out, told = self.folder / "out.if", self.folder / "told"
            subprocess.run([os.environ["ZOPT"], "-o3", f"--debug:{name}={told}", self.folder / "p.if", out], check=True,
                           stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)  # there is no switch remarkz
            written.add(out.read_bytes().replace(b"remarkz", b"remarks"))
        self.assertEqual(len(written), 1)
        for remark in map(json.loads, told.read_text().splitlines()):
            self.assertEqual(set(remark), {"file", "line", "column", "function", "pass", "kind", "text"})
            self.assertIn(remark["kind"], {"done", "missed", "note"})
        over = subprocess.run([os.environ["ZOPT"], f"--debug:remarks={out}", self.folder / "p.if", out], stderr=subprocess.PIPE)
        self.assertEqual(over.returncode, 1, over.stderr)

    def test_steps(self):
        done = self.zrun("-o2", "--steps", "f", source=TOLD)
        self.assertEqual(done.returncode, 0, done.stderr)
        steps = re.findall(r"(?m)^(\S+): step (.*): -(\d+) \+(\d+)\n((?:    .*\n)*)", done.stdout)
        self.assertEqual({step[0] for step in steps}, {"_f"})
        for _, name, less, more, lines in steps:
            signs = [line[4] for line in lines.splitlines()]
            self.assertEqual((signs.count("-"), signs.count("+")), (int(less), int(more)), name)
            self.assertNotEqual((less, more), ("0", "0"), name)
        rotation = [step[4] for step in steps if step[1] == "67 Zelkova rotate loops"]
        self.assertRegex(rotation[0], r"(?m)^    - +6  a \+= .*\n    \+ +6  __parallel_mpy_add")
        done = self.zrun("-o2", "--step", "ROTATE LOOPS", source=TOLD)
        self.assertEqual(re.findall(r"(?m)^(\S+: step .*): -", done.stdout), ["_f: step 67 Zelkova rotate loops"])
        self.assertEqual(self.zrun("--steps=absent").returncode, 2)

    def test_page(self):
        source, page = self.folder / "p.c", self.folder / "page.html"
        source.write_text(TOLD.replace("x[n] != 7", 'x[n] != sizeof "</script>" - 3'))
        done = subprocess.run([ZVIEW, source, "-o", page, "-o2"], stderr=subprocess.PIPE, text=True)
        self.assertEqual(done.returncode, 0, done.stderr)
        text = page.read_text()
        self.assertEqual(text.count("</script>"), 1)
        self.assertNotRegex(text, r"https?://|<link|src=")
        data = json.loads(re.search(r"(?m)^const data = (.*);$", text)[1])
        f = next(f for f in data["functions"] if f["name"] == "_f")
        self.assertIn("67 Zelkova rotate loops", [step["name"] for step in f["steps"]])
        for step in f["steps"]:
            self.assertTrue(any(row[2] for row in step["rows"] if isinstance(row, list)), step["name"])
        self.assertEqual([f[side].count('class="loop"') for side in ("before", "after")], [5, 4])  # one is unrolled completely
        self.assertEqual([name for name, *_ in data["counts"]][0], "nodes")
        self.assertEqual(subprocess.run([ZVIEW, self.folder / "absent.c", "-o", page], stderr=subprocess.PIPE).returncode, 2)
        if browser := shutil.which("chromium"):
            shown = subprocess.run([browser, "--headless", "--no-sandbox", "--disable-gpu", f"--user-data-dir={self.folder}",
                                    "--dump-dom", f"file://{page}#_f"], stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True)
            self.assertIn(f"{len(f['steps'])} of the {len(f['steps'])} steps that changed _f", shown.stdout)

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
