"""SSA form: into it and out of it leaves every program as it was, and its cycles are the sequences that they are."""
import re
import tempfile
import unittest
from pathlib import Path
import sys

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent.parent / "tools"))
from zbench import ROOT, Tools, difference  # noqa: E402

# What is assigned in the loop `for (i = 0; i < n; i++)`, and the class of the variable's phi at its head.
SEQUENCES = [("k += 2;", "k", "AFFINE LINEAR"), ("if (p[i]) k += n; else k += 3;", "k", "NONE"),
             ("k = k - n;", "k", "AFFINE LINEAR"), ("if (p[i]) k += 2; else k += 3;", "k", "PSEUDO LINEAR"),
             ("if (p[i]) k += 2; else k -= 3;", "k", "NONE"), ("t = k; k = m; m = t;", "k", "FLIP-FLOP"),
             ("k = k * 3;", "k", "SIMPLE GEOMETRIC"), ("u >>= 1;", "u", "SHIFT RIGHT"), ("k += i;", "k", "POLYNOMIAL"),
             ("p[i] = k; k = i;", "k", "WRAPAROUND"), ("l = l->next;", "l", "SIMPLE LIST"),
             ("if (p[i]) l = l->next;", "l", "SIMPLE LIST"), ("t = k; k = t;", "k", "REGION CONSTANT"),
             ("k += p[i];", "k", "NONE"), ("k = f(0, k, 0, 0);", "k", "NONE"), ("k = 2 * k + 1;", "k", "NONE"),
             ("t = k; k = m; m = t; if (p[i]) k = 3;", "k", "NONE")]


class SSA(unittest.TestCase):
    def setUp(self):
        self.tools = Tools()
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.source, self.unit, self.out = (Path(folder.name) / name for name in ("p.c", "p.if", "p.opt.if"))

    def test_sequences(self):
        for body, variable, wanted in SEQUENCES:
            with self.subTest(body):
                self.source.write_text("struct L { int v; struct L *next; };\n"
                                       "int f(int *p, int n, struct L *l, unsigned u) {\n"
                                       f"  int i, t = 0, k = 1, m = 2;\n  for (i = 0; i < n; i++) {{ {body} }}\n"
                                       "  return k + m + t + u + l->v;\n}\nint main(void) { return 0; }\n")
                self.tools.parse(self.source, self.unit)
                self.tools.optimize(self.unit, self.out, ["--opt_level=2", "--print_debug=1", "--aux_cmd_flag=3",
                                                          "--debug:only=forward-substitution", "--debug:validate"])
                text = self.unit.with_suffix(".odb").read_text()
                head = re.search(r"^i\.\d+ in (BB\d+): AFFINE LINEAR$", text, re.M)[1]
                found = re.search(rf"^{variable}\.\d+ in {head}: (.*)$", text, re.M)
                self.assertEqual(found[1], wanted)

    def test_gives_up_whole(self):
        many = 700
        names = ", ".join(f"g{i}" for i in range(many))
        steps = "".join(f"if (g{i} > k) f(k - {i});\n g{i} += g{(i * 7 + 1) % many};\n" for i in range(many))
        self.source.write_text(f"#include <zrun.h>\nint {names};\nvoid f(int k) {{ int i; if (k < 1) return;\n"
                               f"for (i = 0; i < 2; i++) {{\n{steps}}}\n}}\n"
                               "int main(void) { g1 = 1; f(2); put_i16(g0 + g3 + g699); return 0; }\n")
        self.tools.parse(self.source, self.unit)
        self.tools.optimize(self.unit, self.out, ["--opt_level=2", "--debug:validate"])
        self.assertEqual(difference(self.tools.execute(self.unit), self.tools.execute(self.out)), None)

    def test_leaves_no_trace(self):
        for program in sorted(ROOT.glob("bench/kernels/*.c")):
            with self.subTest(program.name):
                self.tools.parse(program, self.unit)
                for words in (["--opt_level=2", "--debug:bare_SSA"], ["--opt_level=2", "--print_debug=1", "--aux_cmd_flag=3"]):
                    self.tools.optimize(self.unit, self.out, words + ["--debug:validate"])
                    self.assertEqual(difference(self.tools.execute(self.unit), self.tools.execute(self.out)), None)

    def test_without_the_normal_form_and_with_it(self):
        self.source.write_text("#include <zrun.h>\nlong double g[24];\nint main(void) {\n  long i;\n"
                               "  for (i = 0; i < 20; i++) g[i] = g[i + 4] - g[15] + 2.0L;\n"
                               "  put_f64(g[7]);\n  return 0;\n}\n")
        self.tools.parse(self.source, self.unit)
        for order in ("22,32,34", "21,31,34", "31,22,34"):
            self.tools.optimize(self.unit, self.out, ["--opt_level=2", f"--opt_passes={order}", "--debug:validate"])
            self.assertEqual(difference(self.tools.execute(self.unit), self.tools.execute(self.out)), None)


if __name__ == "__main__":
    unittest.main()
