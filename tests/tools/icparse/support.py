"""Translating small programs in memory, showing trees as text, running units where an executor is given."""
import os
import re
import subprocess
import sys
import tempfile

ROOT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "..", "..")
sys.path.insert(0, os.path.join(ROOT, "tools"))

from icparse_lib import intrinsics, preprocess, types as T  # noqa: E402
from icparse_lib.errors import CompileError  # noqa: E402
from icparse_lib.model import Block, FunctionBody, Label, Op, Pragma, Statement, Text, Unit  # noqa: E402
from icparse_lib.translator import Translator, finish  # noqa: E402

ICPARSE = os.path.join(ROOT, "tools", "icparse")
ICRUN, ICDUMP = os.environ.get("ICRUN"), os.environ.get("ICDUMP")
OP_NAMES = {number: name for name, number in vars(Op).items() if isinstance(number, int)}


class Warnings(list):
    def write(self, text):
        if text.strip():
            self.append(text.strip())


def translate(source, abi="legacy", warnings=None):
    """The unit of a program text, whose file is called t.c."""
    T.set_abi(abi == "eabi")
    unit = Unit("t.c")
    translator = Translator(unit, {}, warnings)
    with tempfile.TemporaryDirectory() as folder:
        path = os.path.join(folder, "t.c")
        with open(path, "w") as out:
            out.write(source)
        here = os.getcwd()
        os.chdir(folder)
        try:
            tree = preprocess.parse("t.c", [], [], abi == "eabi", translator.warn)
        finally:
            os.chdir(here)
    translator.file(tree)
    finish(unit)
    return unit


def error_of(source):
    """The message of a wrong program, with its position."""
    try:
        translate(source)
    except CompileError as error:
        return str(error)
    return "no error"


def show(tree):
    """A tree as text: operators by name, constants as value:type."""
    name = OP_NAMES[tree.op]
    if tree.op == Op.NAME:
        return tree.value.name
    if tree.op in (Op.ICON, Op.LCON, Op.FCON):
        value = float.fromhex(tree.value) if tree.op == Op.FCON else tree.value
        return f"{value}:{tree.type}"
    if tree.op == Op.SCON:
        return repr(tree.value)[1:]
    if tree.op == Op.FIELD:
        return "." + (tree.value[1].name or "")
    if tree.op == Op.LABELREF:
        return f"L{tree.value}"
    inside = ", ".join(show(t) for t in (tree.left, tree.right) if t is not None)
    if tree.op in (Op.ICALL, Op.MCALL, Op.UICALL, Op.UMCALL):
        name += f"<{tree.value}>"
    typed = f".{tree.type}" if tree.op in (Op.SCONV, Op.PCONV, Op.PMCONV) else ""
    return f"{name}{typed}({inside})"


def lines(items):
    for item in items:
        if isinstance(item, Statement):
            yield show(item.tree)
        elif isinstance(item, Label):
            yield f"L{item.number}:"
        elif isinstance(item, Block):
            yield "{" + " ".join(s.name for s in item.symbols)
            yield from lines(item.items)
            yield "}"
        elif isinstance(item, Pragma):
            yield f"pragma {item.kind} {item.arguments}"
        elif isinstance(item, Text):
            yield f"asm {item.text}"


def body_of(unit, name="_f"):
    """The lines of a function's body."""
    for item in unit.items:
        if isinstance(item, FunctionBody) and item.symbol.name == name:
            return list(lines(item.block.items))
    raise KeyError(name)


def expression(declarations, text):
    """The tree of an expression, as an expression statement's would be, inside a function."""
    unit = translate(f"{declarations}\nvoid sink(); void probe(void) {{ sink({text}); }}")
    call = re.match(r"CALL\(UAND\(_sink\), (.*)\)$", body_of(unit, "_probe")[0])
    return call[1]


def symbol_of(unit, name):
    return next(s for s in unit.symbols if s.name == name)


def initializer(source, name):
    return [show(item) for item in symbol_of(translate(source), name).initializer]


def compile_files(folder, sources, *options):
    """Runs the program itself on several texts; (status, messages, path of the output)."""
    paths = []
    for index, source in enumerate(sources):
        paths.append(os.path.join(folder, f"p{index}.c"))
        with open(paths[-1], "w") as out:
            out.write(source)
    output = os.path.join(folder, "p.if")
    result = subprocess.run([sys.executable, ICPARSE, *paths, "-o", output, *options], capture_output=True, text=True,
                            check=False)
    return result.returncode, result.stderr, output


def run(sources, *options):
    """What a program prints, as a list of lines; without an executor None. The unit must read well in any case."""
    with tempfile.TemporaryDirectory() as folder:
        status, messages, output = compile_files(folder, [sources] if isinstance(sources, str) else sources, *options)
        if status:
            raise AssertionError(messages)
        if ICDUMP:
            dump = subprocess.run([ICDUMP, output], capture_output=True, text=True, check=False)
            if dump.returncode:
                raise AssertionError(dump.stdout[-500:] + dump.stderr)
        if not ICRUN:
            return None
        result = subprocess.run([ICRUN, output], capture_output=True, text=True, check=False)
        if result.returncode:
            raise AssertionError(f"status {result.returncode}: {result.stderr}")
        return result.stdout.split("\n")[:-1]
