"""The bench itself: an optimizer that miscompiles is caught. Its outputs are broken here by hand, a record at a time.

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

NODE, SYMBOL, BEGIN_FUNCTION, END_MARKER = 101, 35, 1, 255
NAME, ICON, ASG, COMMAOP = 2, 4, 58, 59
OPPOSITE = {80: 81, 81: 80, 82: 85, 85: 82, 83: 84, 84: 83}  # comparisons by their negations


def records(data):
    """(kind, where the content starts, where it ends) of each record."""
    at = 0
    while at < len(data):
        kind, size, shift = data[at], 0, 0
        at += 1
        if kind != END_MARKER:
            while True:
                byte = data[at]
                at += 1
                size |= (byte & 127) << shift
                shift += 7
                if byte < 128:
                    break
        yield kind, at, at + size
        at += size


def nodes(data, operator=None):
    """Where the contents of the nodes with this operator start and end, in the order of the file."""
    return [(start, end) for kind, start, end in records(data)
            if kind == NODE and operator in (None, data[start])]


def signed(value):
    """A small constant as the format writes it."""
    out = bytearray()
    while True:
        byte, value = value & 127, value >> 7
        if (value, byte & 64) in ((0, 0), (-1, 64)):
            return bytes(out + bytes([byte]))
        out.append(byte | 128)


def constant(data, value):
    """The only node of this constant."""
    found = [(start, end) for start, end in nodes(data, ICON) if data[start:end].endswith(signed(value))]
    assert len(found) == 1, f"{len(found)} nodes hold {value}"
    return found[0]


def wrong_constant(data):
    start, end = constant(data, 4321)
    data[end - len(signed(4321)):end] = signed(4320)


def dropped_store(data):
    """The assignment of 1234 becomes a comma: its operands are evaluated, nothing is stored."""
    value, _ = constant(data, 1234)
    start = max(start for start, _ in nodes(data, ASG) if start < value)
    data[start] = COMMAOP


def swapped_branch(data):
    """The comparison with 77 turns round, its branch does not."""
    value, _ = constant(data, 77)
    start = max(start for start, _ in nodes(data) if data[start] in OPPOSITE and start < value)
    data[start] = OPPOSITE[data[start]]


def stale_alias(data):
    """The last load of `seen` takes the value from before the store through the pointer, kept in `old`."""
    functions = []  # where each begins, and the names of its locals in the order of their numbers
    for kind, start, _ in records(data):
        if kind == BEGIN_FUNCTION:
            functions.append((start, []))
        elif kind == SYMBOL and functions and data[start] != ord("_"):
            functions[-1][1].append(bytes(data[start:data.index(0, start)]).decode())
    (first, locals_), = ((start, names) for start, names in functions if "seen" in names)
    last = min((start for start, _ in functions if start > first), default=len(data))
    loads = [end for start, end in nodes(data, NAME)
             if first < start < last and data[end - 2:end] == bytes([2, locals_.index("seen")])]
    data[loads[-1] - 1] = locals_.index("old")


def cut_short(data):
    del data[len(data) // 2:]


class Miscompiler(Tools):
    """The optimizer, whose outputs `fault` then breaks."""

    def __init__(self, fault):
        super().__init__()
        self.fault = fault

    def optimize(self, unit, out, words=()):
        super().optimize(unit, out, words)
        data = bytearray(Path(out).read_bytes())
        self.fault(data)
        Path(out).write_bytes(data)


class Bench(unittest.TestCase):
    def failures(self, tools, expected=EXPECTED):
        with tempfile.TemporaryDirectory() as folder:
            source = Path(folder) / "victim.c"
            source.write_text(PROGRAM)
            return judge_program(tools, source, sums(expected), ["off"], folder)

    def test_sound_optimizer_passes(self):
        self.assertEqual(self.failures(Tools()), [])

    def test_miscompilations_are_reported(self):
        for fault, report in ((wrong_constant, "line 2: '4320' instead of '4321'"),
                              (dropped_store, "line 1: '0' instead of '1234'"),
                              (swapped_branch, "line 3: '1' instead of '2'"),
                              (stale_alias, "line 6: '5' instead of '9'")):
            with self.subTest(fault.__name__):
                self.assertEqual(self.failures(Miscompiler(fault)), [f"level off: {report}"])

    def test_damaged_output_is_reported(self):
        self.assertIn("level off", self.failures(Miscompiler(cut_short))[0])

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
