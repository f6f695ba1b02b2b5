"""scripts/fuzz tells each kind of fault of an optimizer; tools/genc keeps its promises; the bench counts right."""
import importlib.machinery
import importlib.util
import os
import re
import shutil
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent.parent
sys.path.insert(0, str(ROOT / "tools"))
from genc_lib import values  # noqa: E402
from genc_lib.changing_loops import ChangingLoops  # noqa: E402
from genc_lib.pointers import Pointers  # noqa: E402
from genc_lib.program import Program  # noqa: E402
from genc_lib.types import INT, LONG, UINT  # noqa: E402
from zbench import Tools  # noqa: E402

PROGRAM = "#include <zrun.h>\nint main(void) {{ int i; for (i = 0; i < 3; i++) put_i16(i * {0}); return 0; }}\n"
ENDLESS = "int main(void) { for (;;) {} return 0; }\n"

# What stands in for the optimizer: it copies, but at level 3 does what FAULT says.
OPTIMIZER = """#!/bin/sh
level= in= out=
for word in "$@"; do
    case $word in --opt_level=*) level=${word#*=} ;; --*) ;; *) in=$out out=$word ;; esac
done
[ "$level" = 3 ] || exec cp "$in" "$out"
"""
FAULTS = {  # what the optimizer does, what the report must say
    "exit 3": "optimizer status 3",
    "kill -SEGV $$": "optimizer status -11",
    "exit 0": "left no output",
    "cp wrong.if $out": "line 2: '8' instead of '7'",
    "cp endless.if $out": "",
    "echo none >$out": "",
}


def load(name):
    """A script of scripts/ as a module."""
    path = str(ROOT / "scripts" / name)
    loader = importlib.machinery.SourceFileLoader(name, path)
    module = importlib.util.module_from_spec(importlib.util.spec_from_loader(name, loader))
    sys.modules[name] = module
    loader.exec_module(module)
    return module


@unittest.skipUnless("ICRUN" in os.environ, "needs the executor")
class Faults(unittest.TestCase):
    def setUp(self):
        held = tempfile.TemporaryDirectory()
        self.addCleanup(held.cleanup)
        self.folder = Path(held.name)
        self.source = self.folder / "right.c"
        self.source.write_text(PROGRAM.format(7))
        for name, text in (("wrong", PROGRAM.format(8)), ("endless", ENDLESS)):
            (self.folder / f"{name}.c").write_text(text)
            Tools().parse(self.folder / f"{name}.c", self.folder / f"{name}.if")

    def fuzz(self, fault, *words, source=None):
        optimizer = self.folder / "zopt"
        optimizer.write_text(OPTIMIZER + fault + "\n")
        optimizer.chmod(0o755)
        return subprocess.run([sys.executable, ROOT / "scripts" / "fuzz", source or self.source, "--zopt", optimizer,
                               "--no-reduce", "--findings", self.folder / "found", *words], cwd=self.folder,
                              capture_output=True, text=True)

    def test_each_fault_is_told_and_kept(self):
        for fault, said in FAULTS.items():
            with self.subTest(fault):
                done = self.fuzz(fault, "--levels", "0 3")
                self.assertEqual(done.returncode, 1, done.stdout + done.stderr)
                self.assertIn("FAIL right --opt_level=3", done.stdout)
                self.assertIn(said, done.stdout)
                self.assertRegex(done.stdout, r"1 programs, 8 runs, 1 differences, 0 skipped\n$")
                kept = self.folder / "found" / "right"
                self.assertEqual((kept / "right.c").read_text(), PROGRAM.format(7))
                self.assertIn("--opt_level=3", (kept / "show.sh").read_text())

    def test_the_reducer_is_told_which_cuts_still_show_the_fault(self):
        cut, sound = PROGRAM.format(7).replace("return 0;", ""), "int main(void) { return 0; }\n"
        uninitialized = PROGRAM.format(7).replace("i = 0;", ";")
        for fault, texts in (("exit 3", {cut: 0, sound: 0, uninitialized: 1, "int": 1}),
                             ("cp wrong.if $out", {cut: 0, ENDLESS: 1})):
            self.fuzz(fault.replace("wrong.if", str(self.folder / "wrong.if")), "--levels", "3")
            for text, status in texts.items():
                (self.folder / "reduced.c").write_text(text)
                done = subprocess.run([self.folder / "found" / "right" / "interesting.sh"], cwd=self.folder)
                self.assertEqual(done.returncode, status, f"{fault}: {text}")

    def test_a_sound_optimizer_has_no_differences(self):
        done = self.fuzz("cp $in $out")
        self.assertEqual((done.returncode, done.stdout), (0, "1 programs, 12 runs, 0 differences, 0 skipped\n"))
        self.assertFalse((self.folder / "found").exists())

    def test_an_endless_program_is_skipped(self):
        done = self.fuzz("exit 3", source=self.folder / "endless.c")
        self.assertEqual(done.returncode, 0)
        self.assertRegex(done.stdout, r"skip endless: .*\n1 programs, 0 runs, 0 differences, 1 skipped\n$")

    @unittest.skipUnless(shutil.which("clang") and shutil.which("llc"), "needs clang and llc")
    def test_the_other_compiler_finds_a_wrong_executor(self):
        liar = self.folder / "icrun"
        liar.write_text(f"#!/bin/sh\n{os.environ['ICRUN']} \"$@\" | sed s/14/15/\n")
        liar.chmod(0o755)
        done = self.fuzz("cp $in $out", "--levels", "0", "--crosscheck", "--icrun", liar)
        self.assertIn("FAIL right crosscheck: crosscheck: line 3: '15' instead of '14'\n", done.stdout)
        self.assertIn("1 differences, 0 skipped, 1 judged by the other compiler", done.stdout)
        self.assertNotIn("opt_level", (self.folder / "found" / "right" / "show.sh").read_text())
        done = self.fuzz("cp $in $out", "--levels", "0", "--crosscheck")
        self.assertEqual(done.returncode, 0, done.stdout)

    @unittest.skipUnless(shutil.which("clang") and shutil.which("llc"), "needs clang and llc")
    def test_what_the_other_compiler_cannot_judge_is_no_difference(self):
        self.source.write_text("#include <zrun.h>\nint main(void) { int i = 0x7FFF; i++; put_i16(i); return 0; }\n")
        done = self.fuzz("cp $in $out", "--levels", "0", "--crosscheck")
        self.assertEqual(done.returncode, 0, done.stdout)
        self.assertIn("no crosscheck of right: it does what the language leaves open", done.stdout)


class Generator(unittest.TestCase):
    def test_one_seed_one_text(self):
        for seed in (1, 2):
            for kind in ("kernels", "pointers", "loops"):
                texts = {subprocess.run([sys.executable, ROOT / "tools" / "genc", "--kind", kind, "--seed", str(seed)],
                                        check=True, env={**os.environ, "PYTHONHASHSEED": str(salt)},
                                        capture_output=True).stdout for salt in (1, 2)}
                self.assertEqual(len(texts), 1)
        self.assertNotEqual(Program(1, 4).text(), Program(2, 4).text())

    def test_a_few_programs_hold_every_kind_of_statement(self):
        text = "\n".join(Program(seed, 4).text() for seed in range(40))
        for kind in (r"#pragma MUST_ITERATE\(\d", r"#pragma UNROLL", r"\bdo \{", r"\bswitch \(", r"\bbreak;",
                     r"continue;", r"\*p\d+\+\+", r"\*--p\d+", r"q\d+->", r"volatile", r" restrict ", r"long double",
                     r"goto out\d", r"\) return [^;]*;\n +\}", r"long long", r" : 5;", r" [-+*/%&|^]= ", r" && ", r" \|\| ",
                     r"\? \(\w[^?:]* = ",
                     r"-= \d\) \{", r" % \d", r" / \d", r"<< ", r">> ", r"static const ", r"kernel\d\(g\d+", r"\]\[",
                     r"\*q\d+ = rs"):
            self.assertTrue(re.search(kind, text), kind)

    def test_programs_of_pointers_and_of_changing_loops_hold_what_they_are_for(self):
        for program, kinds in (
                (Pointers, (r"\*\*gpp = ", r"restrict a\d", r"\(char \*\)", r"u\d\.l\[", r"s\d = \*?s", r"\*pp = ", r"same\(",
                            r"static int kept", r"aim\(&", r"\(\*action\)", r"g[xy] = \w+ = ", r"w\d+ != e\d+")),
                (ChangingLoops, (r"\+= k\) \{", r"\+= next\[\w+\]", r"slow\(k\)", r"= ask\(", r"\bkg = ", r"\*np = ", r"p\+\+;",
                                 r"p = q;", r"-- > 0\) \{", r"do \{", r" != \du; u\+\+", r"327\d\d;", r"\(k = \(k & 7\) \+ 1\)",
                                 r"\bvk = ", r"turn\(kp\)", r"\(i - 32700\)"))):
            text = "\n".join(program(seed, 4).text() for seed in range(40))
            for kind in kinds:
                self.assertTrue(re.search(kind, text), kind)

    def test_intervals_hold_what_the_operators_give(self):
        spans = ((-5, 7), (-3, -1), (2, 9), (0, 0), (-1, 1))
        for op, exact in values.EXACT.items():
            for x in spans:
                for y in spans:
                    if op in "/%" and y[0] <= 0 <= y[1]:
                        continue
                    lo, hi = exact(x, y)
                    for a in range(x[0], x[1] + 1):
                        for b in range(y[0], y[1] + 1):
                            q = abs(a) // abs(b) * (1 if (a < 0) == (b < 0) else -1) if op in "/%" else 0
                            got = {"/": q, "%": a - q * b}[op] if op in "/%" else eval(f"{a} {op} {b}")
                            self.assertTrue(lo <= got <= hi, f"{a} {op} {b} = {got} outside {lo}..{hi}")

    def test_what_may_be_undefined_is_not_built(self):
        full, wide = (values.Value("x", t, t.lo, t.hi) for t in (INT, LONG))
        for op, left, right in (("+", full, full), ("*", wide, full), ("-", full, values.integer(1)), ("/", full, full),
                                ("/", full, values.integer(-1)), ("%", wide, values.integer(0))):
            self.assertIsNone(values.result(op, left, right), f"{left} {op} {right}")
        self.assertIsNotNone(values.result("*", values.Value("u", UINT, 0, UINT.hi), full))
        self.assertIn("unsigned", values.shift("<<", full, values.integer(3)).text)


class Bench(unittest.TestCase):
    def test_the_mean_is_geometric_and_leaves_out_what_never_happens(self):
        bench = load("bench")
        counts = lambda **given: {name: given.get(name, 0) for name in bench.COUNTS}
        results = {"a": {"before": counts(nodes=100, loads=10), "levels": {"2": counts(nodes=50, loads=10)}},
                   "b": {"before": counts(nodes=100), "levels": {"2": counts(nodes=200)}}}
        mean = bench.means(results, ["2"])["2"]
        self.assertAlmostEqual(mean["nodes"], 1.0)
        self.assertAlmostEqual(mean["loads"], 1.0)
        results["a"]["levels"]["2"]["loads"] = 5
        self.assertAlmostEqual(bench.means(results, ["2"])["2"]["loads"], 0.5)

    def test_tables_line_up(self):
        text = load("bench").table(["", "level 0"], [["nodes", 5], ["multiplies", 12345]])
        self.assertEqual(len({len(line) for line in text.splitlines()}), 1)
        self.assertTrue(re.search(r"\| nodes      \|       5 \|", text))


if __name__ == "__main__":
    unittest.main()
