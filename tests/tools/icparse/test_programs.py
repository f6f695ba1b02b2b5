"""Whole programs: what they print, where an executor is given, and that their units read well."""
import os
import re
import unittest

from support import run

PROGRAMS = os.path.join(os.path.dirname(os.path.abspath(__file__)), "programs")


class Programs(unittest.TestCase):
    def test_output(self):
        for name in sorted(os.listdir(PROGRAMS)):
            with self.subTest(name), open(os.path.join(PROGRAMS, name)) as text:
                source = text.read()
                expected = " ".join(re.findall("^// Prints: (.*)", source, re.M)).split(" ")
                printed = run(source)
                if printed is not None:
                    self.assertEqual(printed, expected)

    def test_several_files(self):
        first = """#include <zrun.h>
            struct N { int v; struct N *next; }; extern struct N *head; static int hidden = 1; int late, both;
            void push(struct N *n); int count(void);
            int main(void) { struct N a = { 3, 0 }, b = { 4, 0 }; push(&a); push(&b); put_i16(count());
                put_i16(head->v * 10 + head->next->v); put_i16(hidden + late + both); return 0; }"""
        second = """struct N { int v; struct N *next; }; static int hidden = 7; struct N *head; int both, late = 5;
            void push(struct N *n) { n->next = head; head = n; }
            int count(void) { int c = 0; struct N *p; for (p = head; p; p = p->next) c++; return c * hidden; }"""
        printed = run([first, second])
        if printed is not None:
            self.assertEqual(printed, ["14", "43", "6"])

    def test_a_double_is_what_the_abi_says(self):
        source = "#include <zrun.h>\nint main(void) { double d = 0.1; put_f64(d); return 0; }"
        for abi, expected in (("legacy", "0.10000000149011612"), ("eabi", "0.10000000000000001")):
            printed = run(source, "--abi=" + abi)
            if printed is not None:
                self.assertEqual(printed, [expected])


if __name__ == "__main__":
    unittest.main()
