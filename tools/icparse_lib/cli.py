"""The command line."""
import argparse
import os
import sys

from . import preprocess, types as T
from .errors import CompileError
from .model import Unit
from .translator import Translator, finish
from .writer import Writer


def parse_arguments(arguments):
    parser = argparse.ArgumentParser(prog="icparse", description="C99 to I-file for the Zelkova controllers. Several "
                                     "files make one unit.")
    parser.add_argument("files", nargs="+", metavar="FILE.c")
    parser.add_argument("-o", dest="output", required=True, metavar="FILE.if")
    parser.add_argument("-I", dest="include", action="append", default=[], metavar="DIR")
    parser.add_argument("-D", dest="define", action="append", default=[], metavar="NAME[=V]")
    parser.add_argument("--abi", choices=("legacy", "eabi"), default="legacy")
    parser.add_argument("--opt", action="append", default=[], metavar="WORD", help="a word of option set 0")
    parser.add_argument("--set", action="append", nargs=2, default=[], metavar=("N", "WORD"), dest="sets",
                        help="a word of option set N")
    parser.add_argument("-w", dest="quiet", action="store_true", help="no warnings")
    options, rest = parser.parse_known_args(join_option_words(arguments))
    if rest:
        parser.error(f"unknown option {rest[0]}")
    return options


def join_option_words(arguments):
    """`--opt WORD` where the word itself begins with '-'."""
    out = list(arguments)
    for index, argument in enumerate(out):
        if argument == "--opt" and index + 1 < len(out):
            out[index:index + 2] = [f"--opt={out[index + 1]}"]
    return out


def translate(options):
    """The bytes of the I-file."""
    T.set_abi(options.abi == "eabi")
    unit, linked = Unit(os.path.basename(options.files[0])), {}
    if options.opt:
        unit.option_sets[0] = list(options.opt)
    for number, word in options.sets:
        unit.option_sets.setdefault(int(number), []).append(word)
    for path in options.files:
        tree = preprocess.parse(path, options.include, options.define, options.abi == "eabi")
        Translator(unit, linked, None if options.quiet else sys.stderr).file(tree)
    finish(unit)
    return Writer(unit).bytes()


def main(arguments):
    options = parse_arguments(arguments)
    sys.setrecursionlimit(20000)
    try:
        data = translate(options)
    except CompileError as error:
        if os.path.isfile(options.output):
            os.remove(options.output)
        print(error, file=sys.stderr)
        return 1
    with open(options.output, "wb") as out:
        out.write(data)
    return 0
