"""Edges between the two accesses of a loop, as the whole optimizer tells them to the code generator."""
import os
import re
import sys
import tempfile
import unittest
from pathlib import Path

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent.parent / "tools"))
import affine_nests  # noqa: E402
from icparse_lib import cli  # noqa: E402
from zbench import INCLUDE, LOOPS_STAY, Tools, difference  # noqa: E402

DECLARATIONS = """
int a[1000], d[1000]; long b[1000]; long long e[500]; int c[100][20]; long m[40][30];
struct S { int x; long y; int z[4]; } st[100];
int *g; struct S *sp;
"""
PARAMETERS = "int n, int k, int h, unsigned w, int *p, long *q, int *restrict r, int *restrict s"
LOCALS = "int i, j, t; unsigned v; long l; int *o = p;"

UP, FIFTY = "for (i = 0; i < n; i++)", "for (i = 0; i < 50; i++)"
NEST = "for (i = 0; i < 50; i++) for (j = 0; j < 20; j++)"
# Two accesses that never meet: loop, then pairs of a store and a load.
INDEPENDENT = {
    UP: """a[2*i]=a[2*i+1]; a[2*i+1]=a[2*i]; a[4*i+1]=a[4*i+3]; a[2*i]=a[4*i+1]; a[3*i]=a[3*i+1]; a[6*i]=a[9*i+2];
        a[5*i]=a[10*i+3]; b[2*i]=b[2*i+1]; b[4*i]=b[2*i+3]; e[3*i]=e[3*i+2]; a[i]=d[i]; a[i+1]=b[i]; p[2*i]=p[2*i+1];
        p[4*i+k]=p[4*i+k+2]; a[2*i+k]=a[2*i+k+1]; a[4*k+2*i]=a[2*i+1]; g[2*i]=g[2*i+1]; g[3*i+h]=g[3*i+h+1]; r[i]=s[i];
        r[i]=s[i+1]; r[i]=a[i]; st[i].y=d[i]; q[2*i]=q[2*i+1]; st[i].x=st[i].y; st[i].x=st[i+1].y; st[i].z[0]=st[i].z[1];
        st[i].z[1]=st[i+5].z[2]; st[i].y=st[2*i].x; sp[i].x=sp[i+1].y; sp[i].z[3]=sp[i+2].z[1]; c[i][1]=c[i][2];
        c[2*i][k]=c[2*i+1][k]; m[i][0]=m[i+1][3]; a[8*i]=a[8*i+7]; a[-2*i+500]=a[-2*i+501]""",
    FIFTY: """a[i]=a[i+50]; a[i]=a[100]; a[99-i]=a[i]; a[i]=a[50]; b[i]=b[60+i]; a[i]=a[120-i]; a[2*i]=a[2*i+99]; a[i+100]=a[i];
        a[i]=a[2*i+50]; e[i]=e[i+70]; p[i]=p[i+50]; g[i]=g[i+64]; st[i].x=st[i+50].x; a[i+k]=a[i+k+50];
        c[i][3]=c[i+50][3]; st[i].z[1]=st[60].z[1]""",
    "for (i = 10; i < 20; i++)": "a[i]=a[9]; a[i]=a[i-10]; a[i]=a[5]; a[i]=a[20]; a[2*i]=a[i-1]; b[i]=b[3]; p[i]=p[9]",
    "for (i = 49; i >= 0; i--)": "a[i]=a[i+50]; a[i]=a[99-i]; b[2*i]=b[2*i+1]; p[i]=p[50]; a[3*i]=a[3*i+2]",
    "for (i = 0; i < 20; i += 2)": "a[i]=a[i+1]; a[i]=a[3]; a[i]=a[21+i]; b[i]=b[i+7]",
    "for (v = 0; v < 100u; v++)": "a[2*v]=a[2*v+1]; a[v]=a[v+100]; b[v+200]=b[v]; a[300-v]=a[v]; p[3*v]=p[3*v+1]",
    "for (v = 1; v < w; v++)": "a[v]=a[0]; b[v]=b[0]",
    "for (l = 0; l < 100; l++)": "a[2*l]=a[2*l+1]; b[l]=b[l+100]; p[l]=p[l+200]",
    NEST: """c[2*i][j]=c[2*i+1][j]; c[i][j]=c[i+50][j]; a[40*(i&7)+j]=a[j+400]; p[40*i+j]=p[40*i+j+20]; m[3][j]=m[5][j];
        c[i][j]=c[i+60][5]; p[20*i+j]=p[1000+j]; m[j][i&7]=m[j+20][i&7]; a[10*j]=a[10*j+5]""",
    "for (i = 0; i < 20; i++) for (j = 0; j < i; j++)": "c[i][j]=c[i][i]; c[i][j]=c[i+20][j]; a[20*i+j]=a[600+j]",
    "for (i = 0; i < n; i++, p += 2)": "p[0]=p[1]; p[3]=p[0]; p[2]=p[5]",
    "for (i = 0; i < n; i++, q -= 3)": "q[0]=q[1]; q[2]=q[0]",
    "for (i = 0; i < n; i++, o += 4)": "o[1]=o[2]; *(long *)o=*(long *)(o+2)",
    "for (i = 0; i < 64; i++) ": "a[i/4]=a[i/8+16]; a[i&7]=a[i+8]; b[i*i]=b[4000+i]; a[i%5]=a[i+5]",
    "t = 2*k + 1; for (i = 0; i < n; i++)": "a[2*i+t]=a[2*i]; p[2*i]=p[2*i+t]",
    "for (i = 0; i < 30; i++) for (j = 0; j < 10; j++) for (l = 0; l < 2; l++)": "p[20*i+2*j+l]=p[600+l]; p[4*i+2]=p[8*j+4*l]",
}
# The edges by the numbers of the accesses, the load is 1: the distance where it is one, or the directions.
EXACT = {
    UP: {"a[i+1]=a[i]": "2-1 <1", "a[i]=a[i+1]": "1-2 <1", "a[i]=a[i]+1": "1-2 =0", "a[i+3]=a[i]": "2-1 <3", "a[2*i+4]=a[2*i]": "2-1 <2",
         "p[i+2]=p[i]": "2-1 <2", "p[i]=p[i+k]": "1-2 =< 2-1 <1", "st[i+2].y=st[i].y": "2-1 <2", "b[i]=b[i+33]": "1-2 <33", "a[i+32]=a[i]": "2-1 <32"},
    "for (i = 0; i < 4; i++)": {"p[i]=p[i+k]": "1-2 =< 2-1 <1", "p[i]=p[i+3]": "1-2 <3"},
    "for (i = 49; i >= 0; i--)": {"a[i+1]=a[i]": "1-2 <1", "a[i]=a[i+2]": "2-1 <2"},
    "for (i = 0; i < n; i++, p++, o++)": {"p[1]=o[0]": "2-1 <1", "o[0]=p[2]": "1-2 <2"},
    "t = n; if (h) t = k; for (i = 0; i < n; i++)": {"a[i+t]=a[i+n]": "1-2 =< 2-1 <1"},
    "for (i = 0; i < n; i++, p = p + h)": {"p[1]=p[0]": "1-2 <1 2-1 <1"},
    "for (i = 0; i < n; i++, p++)": {"p[1]=p[0]": "2-1 <1", "p[0]=p[4]": "1-2 <4"},
    "for (i = 0; i < 40; i++) for (j = 0; j < 20; j++)": {"m[i+1][j]=m[i][j]": "2-1 <1 =0", "m[i][j+1]=m[i][j]": "2-1 =0 <1"},
}


def function(number, loop, statement):
    return f"void f{number}({PARAMETERS}) {{ {LOCALS} {loop} {statement}; }}\n"


def edges(text):
    """The vectors of a function's edges by (from, to), without those of speculation and those of an access and itself."""
    vectors = {}
    for number, flags, elements in re.findall(r"dependence vector (\d+), flags (\w+):(.*)", text):
        if not int(flags, 16) & 7:
            vectors[number] = elements.replace("(overflows)", "").split()[1:]
    found = {}
    for source, to, vector in re.findall(r"dependence (\d+) -> (\d+) by vector (\d+)", text):
        if source != to and vectors.get(vector): # within a loop
            found[source, to] = vectors[vector]
    return found


class Dependence(unittest.TestCase):
    def optimized(self, statements):
        """The parts of the dump, in the order of (loop, statement)."""
        source = DECLARATIONS + "".join(function(i, *s) for i, s in enumerate(statements))
        tools = Tools()
        with tempfile.TemporaryDirectory() as folder:
            path, unit, out = (Path(folder) / name for name in ("p.c", "p.if", "p.opt"))
            path.write_text(source)
            self.assertEqual(cli.main(["-w", "-I", str(INCLUDE), str(path), "-o", str(unit)]), 0)
            tools.optimize(unit, out, ["--opt_level=2", "--float_support=fpu32", "--disable_inlining", LOOPS_STAY])
            dump = tools.dump(out)
        parts = {int(p[1]): p[2] for p in re.finditer(r"function _f(\d+):(.*?)end function", dump, re.S)}
        return [parts[i] for i in range(len(statements))]

    def test_what_never_meets_has_no_edge(self):
        statements = [(loop, s.strip()) for loop, all in INDEPENDENT.items() for s in all.split(";")]
        self.assertGreaterEqual(len(statements), 100)
        told = [s for s, part in zip(statements, self.optimized(statements)) if edges(part)]
        for loop, statement in told:
            print("edge:", loop, statement)
        self.assertLessEqual(len(told) * 10, len(statements))

    def test_distances_are_exact(self):
        rows = [(loop, s, want) for loop, all in EXACT.items() for s, want in all.items()]
        for (loop, s, want), part in zip(rows, self.optimized([row[:2] for row in rows])):
            told = " ".join(f"{x}-{y} {' '.join(v)}" for (x, y), v in sorted(edges(part).items()))
            with self.subTest(loop=loop, statement=s):
                self.assertEqual(told, want)


TOLD = ["--float_support=fpu32", "--disable_inlining"]
# Loops whose vectors are exact, for what becomes of a file in which one distance is forgotten.
TELLING = """#include <zrun.h>
int a[200]; long b[200]; int m[20][20];
void f(int n, int *p) {
    for (int i = 0; i < 60; i++) a[i + 2] = a[i] + 1;
    for (int i = 59; i >= 0; i--) b[2 * i] = b[2 * i + 6] + 1;
    for (int i = 0; i < 9; i++) for (int j = 0; j < 9; j++) m[i + 1][j] = m[i][j + 1] + 1;
    for (int i = 0; i < n; i++, p += 2) p[6] = p[0];
}
int main(void) { f(9, a); put_i16(a[61]); put_i32(b[4]); put_i16(m[4][4]); return 0; }
"""


class TraceCheck(unittest.TestCase):
    """A run is held against the edges: whatever two accesses meet, an edge must tell so (icrun --check)."""

    def run_in_folder(self, source, work):
        with tempfile.TemporaryDirectory() as folder:
            path, unit, out = (Path(folder) / name for name in ("p.c", "p.if", "p.opt"))
            path.write_text(source)
            self.assertEqual(cli.main(["-w", "-I", str(INCLUDE), str(path), "-o", str(unit)]), 0)
            return work(Tools(), unit, out)

    def test_no_meeting_is_missing(self):
        def work(tools, unit, out):
            want = tools.execute(unit)
            self.assertEqual(want.status, 0, want.errors)
            for words, check in ((["--opt_level=2", *TOLD], []), (["--opt_level=3", *TOLD], []),
                                 (["--opt_level=2", *TOLD, "--use_g2"], ["--innermost"])):
                tools.optimize(unit, out, words)
                wrong = difference(want, tools.execute(out, ["--check", *check]))
                self.assertIsNone(wrong, f"{words}: {wrong}")

        first, count = int(os.environ.get("NESTS_FROM", "0")), int(os.environ.get("NESTS_COUNT", "10"))
        for seed in range(first, first + count): # of 30 nests each
            with self.subTest(seed=seed):
                self.run_in_folder(affine_nests.program(seed, 30), work)

    def test_a_forgotten_distance_is_caught(self):
        def work(tools, unit, out):
            tools.optimize(unit, out, ["--opt_level=2", *TOLD])
            self.assertEqual(tools.execute(out, ["--check"]).status, 0)
            whole = out.read_bytes()
            records = re.findall(r"0x(\w+) +59 +(\d+) ", tools.dump(out, ["--raw"]))
            forgotten = 0
            for at, size in records:
                start = int(at, 16) + 2
                last = start + int(size) - 2 # the direction of the innermost loop, behind it the distance
                changed = bytearray(whole)
                if changed[start + 1] & 7 or changed[start + 2] < 2: # of speculation; of accesses in different loops
                    continue
                changed[last + 1] = (changed[last + 1] + 1) % 256
                forgotten += 1
                out.write_bytes(changed)
                self.assertEqual(tools.execute(out, ["--check"]).status, 75, f"vector at {at}")
            self.assertEqual(forgotten, 3)

        self.run_in_folder(TELLING, work)


if __name__ == "__main__":
    unittest.main()
