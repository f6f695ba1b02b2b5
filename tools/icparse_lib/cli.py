"""The command line."""
import argparse
import gc
import os
import platform
import shutil
import sys

import pycparser

from . import preprocess, types as T
from .errors import CompileError, all_errors
from .model import Unit
from .translator import Translator, finish
from .writer import Writer

LARGE_INPUT = 100_000  # bytes of source


def parse_arguments(arguments):
    parser = argparse.ArgumentParser(prog="icparse", description="C99 to I-file for the Zelkova controllers. Several "
                                     "files make one unit.")
    parser.add_argument("files", nargs="+", metavar="FILE.c")
    parser.add_argument("-o", dest="output", required=True, metavar="FILE.if")
    parser.add_argument("-I", dest="include", action="append", default=[], metavar="DIR")
    parser.add_argument("-D", dest="define", action="append", default=[], metavar="NAME[=V]")
    parser.add_argument("--abi", choices=("legacy", "eabi"), default="legacy")
    parser.add_argument("--opt", metavar="WORD", help="a word of option set 0; may be repeated, and may begin with '-'")
    parser.add_argument("--set", nargs=2, metavar=("N", "WORD"), help="a word of option set N")
    parser.add_argument("-w", dest="quiet", action="store_true", help="no warnings")
    rest, sets = take_option_words(arguments, parser)
    options = parser.parse_intermixed_args(rest)
    options.sets = sets
    return options


def take_option_words(arguments, parser):
    """Takes `--opt WORD` and `--set N WORD` out of the arguments, since WORD may look like an option itself."""
    rest, sets, words = [], {}, iter(arguments)
    for word in words:
        try:
            if word == "--opt":
                sets.setdefault(0, []).append(next(words))
            elif word == "--set":
                number = int(next(words))
                sets.setdefault(number, []).append(next(words))
            else:
                rest.append(word)
        except (StopIteration, ValueError):
            parser.error(f"{word} needs {'a word' if word == '--opt' else 'a number and a word'}")
    return rest, sets


def translate(options, rewrite=None):
    """The bytes of the I-file, once `rewrite` has had the unit."""
    T.set_abi(options.abi == "eabi")
    unit, linked = Unit(os.path.basename(options.files[0])), {}
    unit.option_sets = options.sets
    if options.abi == "eabi":
        unit.name_prefix = ""
        unit.option_sets.setdefault(0, []).insert(0, "--abi=eabi")
    for path in options.files:
        translator = Translator(unit, linked, None if options.quiet else sys.stderr)
        translator.file(preprocess.parse(path, options.include, options.define, options.abi == "eabi", translator.warn))
    finish(unit)
    if rewrite:
        rewrite(unit)
    return Writer(unit).bytes()


def show_source(where):
    """The line of an error, and a mark under its column."""
    if not where or not where.column or not os.path.isfile(where.file):
        return
    with open(where.file, encoding="utf-8", errors="replace") as source:
        lines = source.read().splitlines()
    if 0 < where.line <= len(lines):
        line = lines[where.line - 1]
        indent = "".join("\t" if c == "\t" else " " for c in line[:where.column - 1])
        print(f"    {line}\n    {indent}^", file=sys.stderr)


def take_compiling_python(arguments):
    """Continues in a Python that compiles itself, where one is installed and the input is worth its slower start."""
    sizes = sum(os.path.getsize(word) for word in arguments if word.endswith(".c") and os.path.isfile(word))
    faster = shutil.which("pypy3")
    if sizes > LARGE_INPUT and faster and platform.python_implementation() == "CPython":
        library = os.path.dirname(os.path.dirname(pycparser.__file__))
        os.execve(faster, [faster, *sys.argv], dict(os.environ, PYTHONPATH=library))


def main(arguments, rewrite=None):
    options = parse_arguments(arguments)
    sys.setrecursionlimit(20000)
    gc.disable()  # a run allocates what it needs until its end; collections would look at all of it again and again
    try:
        data = translate(options, rewrite)
    except CompileError as error:
        if os.path.isfile(options.output):
            os.remove(options.output)
        for one in all_errors(error):
            print(one, file=sys.stderr)
            show_source(one.where)
        return 1
    with open(options.output, "wb") as out:
        out.write(data)
    return 0
