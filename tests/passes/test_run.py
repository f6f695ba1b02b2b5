"""The runner of the pass tests itself: wrong expectations are caught, sound ones are not."""
import os
import tempfile
import unittest
from pathlib import Path

from run import Tools, Trouble, check_dump, judge, read_case

DUMP = """globals:
   0 _g: int

function _f: int(int)
    end of locals
    x = y + 3
  L1:
    _g = x
    if (!(x > 3)) goto L1
    _f(x + _f(1))
    return x
    end function

function _g2: int()
    x = y + 30
    end function
"""

# directives on _f, and whether they hold
CASES = [
    ("HAS: x = y + 3", True),
    ("HAS: x = y", False),
    ("HAS: x = y + 30", False),
    ("HAS: /= y/", True),
    ("HAS: /= y$/", False),
    ("HAS: _g = x|HAS: return x", True),
    ("HAS: return x|HAS: _g = x", False),
    ("HAS: _g = x|HAS: _g = x", False),
    ("NOT: goto", False),
    ("NOT: switch", True),
    ("NOT: /L\\d/", False),
    ("NOT: goto|HAS: _g = x", True),
    ("NOT: goto|HAS: return x", False),
    ("HAS: /^_f/|NOT: goto", True),
    ("HAS: _g = x|NOT: goto|HAS: return x", False),
    ("HAS: x = y + 3|NOT: switch|NOT: L1|HAS: return x", False),
    ("COUNT 2: _f(", True),
    ("COUNT 1: _f(", False),
    ("COUNT 0: L1", False),
    ("COUNT 0: y + 30", True),
]

UNSOUND = ["// HAS: x", "// RUN: -o1", "// RUN: -o1\n// RUN: -o2\n// HAS: x", "// RUN: -o1\n// HASNT: x\n// HAS: y",
           "// RUN: -o1\n// COUNT: x\n// HAS: y", "// RUN: -o1\n// HAS:",
           "// RUN: -o1\n// NOT: x\n// so that it stays. HAS: y"]

PROGRAM = """#include <zrun.h>
// RUN: --opt_level=1
// FUNCTION: {function}
// {directive}
int f(int x) {{ return x; g: goto g; }}
int main(void) {{ put_i16(f(3)); return {status}; }}
"""


class Matching(unittest.TestCase):
    def test_directives(self):
        for text, holds in CASES:
            lines = ["// RUN: -o1", "// FUNCTION: f"] + [f"// {line}" for line in text.split("|")]
            with self.subTest(text):
                self.assertEqual(not check_dump(DUMP, read_case("\n".join(lines))), holds)

    def test_whole_dump_is_searched_without_function(self):
        case = read_case("// RUN: -o1\n// COUNT 2: /^function/\n// HAS: globals:\n// HAS: x = y + 30")
        self.assertEqual(check_dump(DUMP, case), [])

    def test_missing_function(self):
        case = read_case("// RUN: -o1\n// FUNCTION: h\n// NOT: x")
        self.assertIn("no function h", check_dump(DUMP, case)[0])

    def test_failure_tells_what_and_where(self):
        case = read_case("// RUN: -o1\n// FUNCTION: f\n// HAS: x = 1")
        failure = check_dump(DUMP, case)[0]
        self.assertIn("line 3: HAS: x = 1: not found", failure)
        self.assertIn("_g = x", failure)
        self.assertNotIn("y + 30", failure)

    def test_unsound_tests(self):
        for text in UNSOUND:
            with self.subTest(text), self.assertRaises(Trouble):
                read_case(text)


@unittest.skipUnless(os.environ.get("ICRUN"), "no executor is given")
class Whole(unittest.TestCase):
    def failures(self, directive, function="f", status=0):
        with tempfile.TemporaryDirectory() as folder:
            source = Path(folder) / "probe.c"
            source.write_text(PROGRAM.format(directive=directive, function=function, status=status))
            return judge(Tools(), source, folder)

    def test_programs(self):
        self.assertEqual(self.failures("HAS: /return x/"), [])
        self.assertTrue(self.failures("HAS: return 7"))
        self.assertTrue(self.failures("NOT: return"))
        self.assertTrue(self.failures("NOT: return", function="absent"))
        self.assertTrue(self.failures("HAS: /return x/", status=4))


if __name__ == "__main__":
    unittest.main()
