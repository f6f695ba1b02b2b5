"""The Debian package, installed in an empty root: its tools find each other there. BUILD names the build folder."""
import os
import subprocess
import tempfile
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[3]
BUILD = Path(os.environ.get("BUILD", ROOT / "build"))


def run(*words, **more):
    return subprocess.run([str(word) for word in words], stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, **more)


class Package(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        folder = tempfile.TemporaryDirectory()
        cls.addClassCleanup(folder.cleanup)
        cls.folder = Path(folder.name)
        cls.made = run("cpack", "-G", "DEB", "-B", cls.folder / "package", cwd=BUILD)
        cls.root = cls.folder / "root"
        (cls.root / "var/lib/dpkg").mkdir(parents=True)
        cls.told = run("dpkg", f"--root={cls.root}", "--force-not-root", "--force-depends", "--force-script-chrootless",
                       "-i", *(cls.folder / "package").glob("*.deb"))
        cls.bin = cls.root / "usr/bin"

    def test_a_program_runs_through_the_installed_tools(self):
        self.assertEqual((self.made.returncode, self.told.returncode), (0, 0), self.made.stdout + self.told.stdout)
        environment = {name: text for name, text in os.environ.items() if name not in ("ZOPT", "ICRUN", "ICDUMP", "ICPARSE")}
        sample = self.root / "usr/share/zopt/samples/fir16.c"
        page = self.folder / "page.html"
        for words in (("zrun", sample, "-o2", "--remarks"), ("zview", sample, "-o", page), ("zbisect", sample, "-o2")):
            done = run(self.bin / words[0], *words[1:], env=environment)
            self.assertEqual(done.returncode, words[0] == "zbisect", done.stdout)
        self.assertTrue(page.exists())

    def test_manual_pages_and_completion(self):
        pages = {path.name for path in (self.root / "usr/share/man/man1").iterdir()}
        self.assertEqual({path.name + ".1" for path in self.bin.iterdir()}, {name.removesuffix(".gz") for name in pages})
        completion = self.root / "usr/share/bash-completion/completions/zopt"
        for line, wanted in (("--opt_le", "--opt_level="), ("--abi=e", "eabi"), ("--opt_level=", "off 0 1 2 3 4")):
            script = (f"source {completion}; COMP_WORDS=({self.bin}/zopt '{line}'); COMP_CWORD=1; COMP_LINE='zopt {line}'; "
                      'COMP_POINT=${#COMP_LINE}; _zopt 2>/dev/null; echo ${COMPREPLY[@]}')
            self.assertEqual(run("bash", "-c", script).stdout.strip(), wanted)


if __name__ == "__main__":
    unittest.main()
