"""The bench itself: an optimizer that miscompiles is caught.

ZOPT, ICRUN and ICPARSE name the programs.
"""
import tempfile
import unittest
from pathlib import Path

from run import Tools, judge_program, sums

PROGRAM = """#include <zrun.h>
static int cells[4];
static int choose(int v) { if (v > 77) return 1; return 2; }
static void fill(int *p) { p[1] = 1234; p[2] = 4321; }
int main(void) {
    int seen = 5, old = 0, *p = &seen;
    fill(cells);
    put_i16(cells[1]);
    put_i16(cells[2]);
    put_i16(choose(50));
    put_i16(choose(100));
    old = seen;
    *p = 9;
    put_i16(old);
    put_i16(seen);
    return 0;
}
"""
EXPECTED = "1234\n4321\n2\n1\n5\n9\n"

# What a wrong optimizer makes of the program, as a change of its text, and what is reported then.
MISCOMPILATIONS = (
    ("4321", "4320", "line 2: '4320' instead of '4321'"),
    ("p[1] = 1234;", "", "line 1: '0' instead of '1234'"),
    ("v > 77", "v <= 77", "line 3: '1' instead of '2'"),
    ("put_i16(seen);", "put_i16(old);", "line 6: '5' instead of '9'"),
)


class Miscompiler(Tools):
    """An optimizer whose output is another program."""

    def __init__(self, program):
        super().__init__()
        self.program = program

    def optimize(self, unit, out, words=()):
        source = Path(out).with_suffix(".c")
        source.write_text(self.program)
        self.parse(source, out)


class Cutter(Tools):
    """An optimizer that loses half of its output."""

    def optimize(self, unit, out, words=()):
        data = Path(unit).read_bytes()
        Path(out).write_bytes(data[:len(data) // 2])


class Bench(unittest.TestCase):
    def failures(self, tools, expected=EXPECTED):
        with tempfile.TemporaryDirectory() as folder:
            source = Path(folder) / "victim.c"
            source.write_text(PROGRAM)
            return judge_program(tools, source, sums(expected), ["off"], folder)

    def test_sound_optimizer_passes(self):
        self.assertEqual(self.failures(Tools()), [])

    def test_miscompilations_are_reported(self):
        for right, wrong, report in MISCOMPILATIONS:
            with self.subTest(wrong):
                self.assertEqual(self.failures(Miscompiler(PROGRAM.replace(right, wrong))), [f"level off: {report}"])

    def test_damaged_output_is_reported(self):
        self.assertIn("level off", self.failures(Cutter())[0])

    def test_wrong_expectation_is_reported(self):
        self.assertIn("unoptimized: lines 1 to 16: sum", self.failures(Tools(), EXPECTED.replace("9", "8"))[0])
        self.assertIn("unoptimized: lines 1 to 16: sum", self.failures(Tools(), EXPECTED + "10\n")[0])

    def test_failing_optimizer_is_reported(self):
        tools = Tools(zopt="/bin/false")
        self.assertIn("optimizer status 1", self.failures(tools)[0])
        tools = Tools(zopt="/bin/true")
        self.assertIn("no output", self.failures(tools)[0])


if __name__ == "__main__":
    unittest.main()
