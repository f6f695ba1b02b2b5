"""What loops are told of the alignment of the pointers that they keep."""
import re
import tempfile
import unittest
from pathlib import Path

from run import Tools

# What a pointer is set to ahead of a loop, its step there, and the number of units that its address is a multiple of.
POINTERS = [("(int *)&w[k]", "", 2), ("k ? (int *)&w[k] : (int *)w + 6", "", 2), ("(int *)&w[k]", "k", 0),
            ("(int *)w + k", "", 0), ("(int *)&w[k] + 1", "", 0), ("k ? (int *)&w[k] : x + k", "", 0),
            ("k ? (int *)&w[k] : r", "", 0), ("*(int **)r", "", 0), ("x", "", 0)]


class PointerAlignments(unittest.TestCase):
    def test_assertions(self):
        tools = Tools()
        with tempfile.TemporaryDirectory() as folder:
            source, unit, out = (Path(folder) / name for name in ("p.c", "p.if", "p.opt.if"))
            source.write_text("long w[64];\nint x[64];\n" + "".join(
                f"void f{n}(int k, int n, int *r) {{\n  for (int j = 0; j < n; j++, k += 3) {{\n    int *p{n} = {value};\n"
                f"    for (int i = 0; i < n; i++) {{ p{n}[i] += r[i] + j; p{n} += {step or 0}; }}\n  }}\n}}\n"
                for n, (value, step, _) in enumerate(POINTERS)))
            tools.parse(source, unit)
            tools.optimize(unit, out, ["--opt_level=3", "--print_debug=1"])
            text = unit.with_suffix(".odb").read_text()
        found = set(re.findall(r"^--> Attempting to assert \(long\)p(\d+) % (\d+)L == 0L$", text, re.M))
        self.assertEqual(found, {(str(n), str(units)) for n, (_, _, units) in enumerate(POINTERS) if units})
