"""The step that changes an outcome is found."""
import os
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent.parent.parent
SOURCE = """#include <zrun.h>
int a[8] = {1, 2, 3}, b[8] = {4, 5, 6};
long first(int x) { return x * 3L + a[x & 1]; }
int two(int x) { int s = 3, t = 4; return x * s + (x ^ t); }
long dot(int n) { long s = 0; int i; for (i = 0; i < n; i++) s += (long)a[i] * b[i]; return s; }
int main(void) { put_i32(dot(3) + first(2)); return 0; }
"""


def bisect(*words):
    with tempfile.TemporaryDirectory() as folder:
        (Path(folder) / "p.c").write_text(SOURCE)
        return subprocess.run([sys.executable, ROOT / "tools" / "zbisect", Path(folder) / "p.c", *words], capture_output=True,
                              text=True, check=False)


class Zbisect(unittest.TestCase):
    def test_the_row_and_the_function_are_named(self):
        dump = os.environ.get("ICDUMP", ROOT / "build" / "icdump")
        for test in (f"{dump} {{}} | grep -q __parallel", f"! {dump} $0 | grep -q __parallel"):
            done = bisect("--opt_level=2", "--", "sh", "-c", test)
            self.assertEqual(done.returncode, 0, done.stderr)
            self.assertRegex(done.stdout, r"^run \d+: 'Zelkova rotate loops' of _dot changes the outcome")
            self.assertRegex(done.stdout, r"(?m)^rewrite 1 of 1 in it: .*a.* \* .*b")

    def test_the_rewrite_is_named(self):
        dump = os.environ.get("ICDUMP", ROOT / "build" / "icdump")
        done = bisect("-o1", "--", "sh", "-c", f"! {dump} $0 | grep -q 'x ^ 4'")
        self.assertRegex(done.stdout, r"(?m)^run \d+: .* of _two changes the outcome\n(.*\n)?rewrite \d of [2-9] in it: t = 4;")

    def test_nothing_changes_what_is_printed(self):
        done = bisect("--opt_level=3")
        self.assertEqual((done.returncode, done.stdout), (1, "no step changes the outcome\n"), done.stderr)


if __name__ == "__main__":
    unittest.main()
