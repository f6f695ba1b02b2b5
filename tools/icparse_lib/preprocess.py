"""From a source file to a syntax tree: the C preprocessor, a few rewrites that the parser library needs, the parser."""
import os
import re
import subprocess

from pycparser import c_parser

from . import pragma_places
from .errors import CompileError, Position
from .pragma_places import LINE_MARKER

HEADERS = os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "include")

ASM = re.compile(r"\b(?:asm|__asm__|__asm)(?:\s+(?:volatile|__volatile__))?\s*(?=\()")
TOKEN = re.compile(r'"(?:\\.|[^"\\\n])*"|\'(?:\\.|[^\'\\\n])*\'|^\#[^\n]*|[{}\n]|\b(?:__asm__|__asm|asm)\b', re.M)
FILE_SCOPE_ASM = re.compile(r'\w+\s*(?:volatile\s*)?\(((?:\s*"(?:\\.|[^"\\])*")+)\s*\)\s*;')
PARSE_ERROR = re.compile(r"(.*?):(\d+):(?:(\d+):)?\s*(.*)", re.S)
CPP_ERROR = re.compile(r"^(.*?):(\d+):(\d+): (?:fatal )?error: (.*)$", re.M)

# Names that must be types to the parser library; the declarations themselves mean nothing.
BUILT_IN_NAMES = {"__wchar_t"}
BUILT_IN_TYPES = "".join(f"typedef int {name};\n" for name in sorted(BUILT_IN_NAMES))

# Attributes are read and mean nothing; pragmas say what they would.
PREDEFINED = ("__attribute__(words)=", "__attribute(words)=",
              "__ZELKOVA__=1", "__signed__=signed", "__inline=inline", "__inline__=inline", "__restrict=restrict",
              "__restrict__=restrict", "__const=const", "__volatile=volatile", "__extension__=",
              '__interrupt=_Pragma("INTERRUPT_NEXT")', 'interrupt=_Pragma("INTERRUPT_NEXT")',
              "cregister=", "__cregister=")  # control registers are reached as memory is


def preprocess(path, include_dirs, defines, eabi):
    """The preprocessed text; `defines` are NAME or NAME=VALUE."""
    command = ["cpp", "-std=c99", "-undef", "-nostdinc", "-pipe"]
    command += [f"-D{d}" for d in (*PREDEFINED, f"__ZELKOVA_EABI__={int(eabi)}", *defines)]
    command += [f"-I{d}" for d in include_dirs] + ["-isystem", HEADERS, path]
    try:
        result = subprocess.run(command, capture_output=True, check=False, encoding="utf-8", errors="surrogateescape")
    except FileNotFoundError as missing:
        raise CompileError(None, "the C preprocessor `cpp` is not installed") from missing
    if result.returncode:
        found = CPP_ERROR.search(result.stderr)
        if found:
            raise CompileError(Position(found[1], int(found[2]), int(found[3])), found[4])
        raise CompileError(None, result.stderr.strip() or "the preprocessor failed")
    return result.stdout


def lift_file_scope_asm(text):
    """`asm("...");` outside functions becomes a pragma line, which the parser library takes there."""
    out, last, depth, line, file = [], 0, 0, 1, ""
    for token in TOKEN.finditer(text):
        word = token[0]
        if word == "\n":
            line += 1
        elif word[0] == "#":
            marker = LINE_MARKER.match(word)
            if marker:
                line, file = int(marker[1]) - 1, marker[2]
        elif word in "{}":
            depth += 1 if word == "{" else -1
        elif depth == 0 and word.strip("_") == "asm" and token.start() >= last:
            found = FILE_SCOPE_ASM.match(text, token.start())
            if found:
                after = line + found[0].count("\n")
                strings = " ".join(found[1].split("\n"))
                out.append(text[last:token.start()] + f'\n#pragma ASM_TEXT {strings}\n# {after} "{file}"\n')
                last = found.end()
    return "".join(out) + text[last:]


class Parser(c_parser.CParser):
    """The library's parser; its longest lists grow in place here, where it copies them for each element."""

    def p_block_item_list(self, p):
        """ block_item_list : block_item
                            | block_item_list block_item
        """
        p[0] = p[1]
        if len(p) > 2 and p[2] != [None]:
            p[0] += p[2]

    def p_struct_declaration_list(self, p):
        """ struct_declaration_list     : struct_declaration
                                        | struct_declaration_list struct_declaration
        """
        p[0] = p[1] or []
        if len(p) > 2:
            p[0] += p[2] or []


def parse(path, include_dirs, defines, eabi, warn=lambda where, text: None):
    """The syntax tree of a source file; `warn` takes a position and a text."""
    if not os.path.isfile(path):
        raise CompileError(None, f"cannot read {path}")
    text = preprocess(path, include_dirs, defines, eabi)
    if "asm" in text:
        text = ASM.sub(lambda m: "asm" + " " * (len(m[0]) - 3), lift_file_scope_asm(text))
    if "#pragma" in text:
        text = pragma_places.settle(text, warn)
    parser = Parser()
    try:
        return parser.parse(BUILT_IN_TYPES + text, path)
    except AssertionError as error:  # some malformed declarations reach the parser library's own checks
        raise CompileError(Position(parser.clex.filename, parser.clex.lexer.lineno, 0), "syntax error") from error
    except c_parser.ParseError as error:
        found = PARSE_ERROR.match(str(error))
        if not found:
            raise CompileError(None, str(error)) from error
        what = found[4].replace("before:", "syntax error before")
        raise CompileError(Position(found[1], int(found[2]), int(found[3] or 0)), what) from error
