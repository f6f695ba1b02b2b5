"""What documents list is what the code has: the tables of docs/ifile.md, and the steps of docs/passes.md."""
import re
import subprocess
import sys
import unittest
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]


def text(path):
    return (ROOT / path).read_text()


def rows(document, head):
    """The cells of a table that follows the head line, without the last."""
    body = text(document).split(f"\n{head}\n")[1].split("\n\n")[0]
    return [tuple(cell.strip() for cell in line.split("|")[1:-1])[:-1] for line in body.replace("\\|", "or").splitlines()[1:]]


def enumerators(path, prefix):
    return set(re.findall(rf"^    ({prefix}\w+) = (0x[0-9A-Fa-f]+|\d+),", text(path), re.M))


class Tables(unittest.TestCase):
    def test_operators_and_pragmas(self):
        nodes = re.findall(r"^IF_NODE\((\d+), (\w+), (\d)\)", text("IFILE/if_nodes.def"), re.M)
        self.assertEqual(rows("docs/ifile.md", "| Opcode | Name | Operands | What it is |"), nodes)
        pragmas = re.findall(r'^PRAGMA_NAME\((\d+), "(.*)"\)', text("IFILE/pragma_names.def"), re.M)
        self.assertEqual(rows("docs/ifile.md", "| Kind | Name | Texts and meaning |"), pragmas)

    def test_records_classes_and_qualifiers(self):
        kinds = dict(enumerators("IFILE/ifile.h", "IFR_"))
        names = re.findall(r'case (IFR_\w+): return "(.*)";', text("IFILE/if_read_basic.cpp"))
        self.assertEqual(set(rows("docs/ifile.md", "| Kind | Record | Payload |")), {(kinds[kind], name) for kind, name in names})
        self.assertEqual(len(kinds), len(names))
        for head, prefix in ("| Class | Name | What it is |", "SC_"), ("| Qualifier | Name | What it says |", "CQ_"):
            wanted = {(number, name) for name, number in enumerators("OPT5/ir/symtab.h", prefix)}
            self.assertEqual(set(rows("docs/ifile.md", head)), wanted)


class Pages(unittest.TestCase):
    def test_each_step_has_its_paragraph_and_example(self):
        page = text("docs/passes.md")
        missing = {int(n) for first, last in re.findall(r"(\d+)(?:-(\d+))?", page.split("as they are: ")[1].split(".\n")[0])
                   for n in range(int(first), int(last or first) + 1)}
        for number, kind, name in re.findall(r'/\*\s*(\d+) \*/ \{(\w), "([^"]*)"', text("OPT5/driver/steps.cpp")):
            self.assertEqual(kind == "L", int(number) in missing, name)
            if kind != "L":
                self.assertTrue(re.search(rf"(?m)^### .*\b{number} {re.escape(name)}", page), name)
        done = subprocess.run([sys.executable, ROOT / "scripts" / "docs", "--check"], stderr=subprocess.PIPE, text=True)
        self.assertEqual(done.returncode, 0, done.stderr)

    def test_files_that_are_named_exist(self):
        for page in [*(ROOT / "docs").glob("*.md"), ROOT / "README.md", ROOT / "CONTRIBUTING.md"]:
            for name in re.findall(r"`((?:\w+/)+[\w-]+(?:\.\w+)?)`", page.read_text()):
                if name.split("/")[0] != "build":
                    self.assertTrue((ROOT / name).exists() or (ROOT / "OPT5" / name).exists(), f"{page.name}: {name}")


if __name__ == "__main__":
    unittest.main()
