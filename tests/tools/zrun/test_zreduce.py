"""An I-file becomes small while a command keeps its status."""
import os
import subprocess
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent.parent.parent
DUMP = Path(os.environ.get("ICDUMP", ROOT / "build" / "icdump")).resolve()
REDUCE = DUMP.parent / "zreduce"


def reduce(out, *command, unit=ROOT / "samples" / "fft16.if"):
    return subprocess.run([REDUCE, unit, out, "--", *command], capture_output=True, text=True, check=False)


class Zreduce(unittest.TestCase):
    def test_what_the_command_asks_for_stays_alone(self):
        with tempfile.TemporaryDirectory() as folder:
            out = Path(folder) / "small.if"
            done = reduce(out, "sh", "-c", f"{DUMP} {{}} | grep -q '++'")
            self.assertEqual(done.returncode, 0, done.stderr)
            dump = subprocess.run([DUMP, out], capture_output=True, text=True, check=True).stdout
            self.assertIn("++", dump)
            self.assertEqual(dump.count("end function"), 1)
            self.assertLess(out.stat().st_size, 400)
            self.assertEqual(list(Path(folder).iterdir()), [out])

    def test_a_command_or_file_that_there_is_not_is_told(self):
        with tempfile.TemporaryDirectory() as folder:
            self.assertEqual(reduce(Path(folder) / "x", "/no/such/command").returncode, 2)
            self.assertEqual(reduce(Path(folder) / "x", "true", unit="/no/such/file").returncode, 2)


if __name__ == "__main__":
    unittest.main()
