"""icrun's command line and its statuses. ICRUN and ICPARSE name the programs."""
import os
import subprocess
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[3]
ICRUN = os.environ["ICRUN"]
ICPARSE = os.environ.get("ICPARSE", ROOT / "tools" / "icparse")

PROGRAM = """#include <zrun.h>
int shared = 5;
static long sum(int n) { long s = 0; for (int i = 0; i < n; i++) s += i; return s; }
int main(void) { put_i32(sum(100)); return -1; }
"""


def icrun(*words):
    return subprocess.run([ICRUN, *words], stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)


class CommandLine(unittest.TestCase):
    def test_what_is_refused(self):
        rows = [
            ([], "no file"),
            (["--fast", "a.if"], "what is --fast?"),
            (["a.if", "b.if"], "what is b.if?"),
            (["--max-steps"], "--max-steps needs a number"),
            (["--max-steps", "many", "a.if"], "--max-steps needs a number"),
            (["--max-steps", "10k", "a.if"], "--max-steps needs a number"),
            (["--max-memory", "100", "a.if"], "--max-memory is from 4096"),
            (["--max-memory", "0x80000000", "a.if"], "--max-memory is from 4096"),
        ]
        for words, text in rows:
            with self.subTest(words=words):
                done = icrun(*words)
                self.assertEqual(done.returncode, 64)
                self.assertIn("icrun: " + text, done.stderr)
                self.assertEqual(done.stdout, "")

    def test_help_names_every_status(self):
        done = icrun("--help")
        self.assertEqual(done.returncode, 0)
        for status in range(64, 77):
            self.assertRegex(done.stdout, rf"\b{status} ")


class Files(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = Path(folder.name)

    def compiled(self, source=PROGRAM):
        (self.folder / "p.c").write_text(source)
        subprocess.run([ICPARSE, self.folder / "p.c", "-o", self.folder / "p.if"], check=True)
        return self.folder / "p.if"

    def test_no_i_file(self):
        program = self.compiled().read_bytes()
        rows = {"absent": None, "empty": b"", "text": b"int main;\n", "cut": program[: len(program) // 2]}
        for name, data in rows.items():
            with self.subTest(name=name):
                path = self.folder / name
                if data is not None:
                    path.write_bytes(data)
                done = icrun(path)
                self.assertEqual(done.returncode, 65, done.stderr)
                self.assertIn(f"icrun: {path}: ", done.stderr)
                self.assertEqual(done.stdout, "")

    def test_status_is_mains(self):
        done = icrun(self.compiled())
        self.assertEqual((done.returncode, done.stdout, done.stderr), (255, "4950\n", ""))

    def test_errors_name_function_and_line(self):
        rows = [
            (71, "while (1) shared++;", ["--max-steps", "0x1000"]),
            (70, "return 1 / (shared - 5);", []),
            (68, "return *(int *)0;", []),
            (73, "abort();", []),
        ]
        for status, body, words in rows:
            with self.subTest(status=status):
                source = f"#include <stdlib.h>\nint shared = 5;\nint f(void) {{\n{body}\nreturn 0; }}\nint main(void) {{ return f(); }}\n"
                done = icrun(*words, self.compiled(source))
                self.assertEqual(done.returncode, status, done.stderr)
                self.assertRegex(done.stderr, r"\bin f, line 4\b")

    def test_what_was_printed_before_an_error_stands(self):
        done = icrun(self.compiled('#include <zrun.h>\nint main(void) { put_i16(7); return *(int *)0; }\n'))
        self.assertEqual((done.returncode, done.stdout), (68, "7\n"))

    def test_reports(self):
        program = self.compiled()
        plain = icrun(program).stdout
        for word, text in [("--stats", r"multiplies"), ("--profile", r"sum"), ("--globals", r"shared")]:
            with self.subTest(word=word):
                done = icrun(word, program)
                self.assertEqual(done.returncode, 255)
                self.assertTrue(done.stdout.startswith(plain))
                self.assertRegex(done.stdout + done.stderr, text)

    def test_innermost_loops_are_counted(self):
        """A test and a jump in each iteration; a jump alone; a test of its own."""
        source = """#include <stdlib.h>
            int calls;
            void leave(void) { if (++calls == 5) exit(0); }
            int main(void) {
            int i = 0, j, s = 0;
            do { j = i; while (j < 7) j++; s += j; } while (++i < 3);
            for (j = 0; j < 9; j++) if (j == s) return 1;
            for (;;) leave(); }"""
        done = icrun("--stats", self.compiled(source))
        self.assertRegex(done.stderr, r"(?m)^loops 2 loops_closed 1 iterations 22 iterations_closed 4 loop_branches 43 "
                                      r"tested_loops 1 tested_iterations 9 ")

    def test_promise_in_a_handler(self):
        """No edge of the code leads to the handler: what stands ahead of its loop is no part of that."""
        source = """#include <zrun.h>
            int main(void) { int i, s = 0;
            __eh_catch("...", h); zthrow(2); __eh_end(); return 1;
            h: _Pragma("MUST_ITERATE(3, 3)") for (i = 0; i < N; i++) s += i;
            return s; }"""
        self.assertEqual(icrun("--check", self.compiled(source.replace("N", "3"))).returncode, 3)
        self.assertEqual(icrun("--check", self.compiled(source.replace("N", "4"))).returncode, 76)


if __name__ == "__main__":
    unittest.main()
