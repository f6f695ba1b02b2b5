"""What a translation produces: trees, symbols, functions and the unit that holds them.

The unit is the I-file in memory; `writer` gives it its bytes. Trees carry C types; numbers of types, symbols and files
come into being when the unit is written.
"""
import os
import re

ROOT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "..")


def read_rows(path, macro):
    """The argument texts of each `macro(...)` row of one of the project's table files."""
    with open(os.path.join(ROOT, path)) as table:
        return re.findall(rf"^{macro}\((.*)\)", table.read(), re.M)


class Op:
    """Opcode numbers by name, as the I-file has them."""
    LABELREF, NAME, SCON, ICON, FCON, PLUS, PLUSASG, MINUS, MINUSASG, UMINUS = range(1, 11)
    MULT, MULTASG, UMULT, ANDB, ANDBASG, UAND, ORB, ORBASG, XORB, XORBASG = range(11, 21)
    QUEST, COLON, ANDAND, OROR, LCON, FIELD = range(21, 27)
    RETURN, SWITCH, DEFAULT, CASE, COMMA, PCOMMA, ASG, COMMAOP = 36, 40, 46, 47, 56, 57, 58, 59
    DIV, DIVASG, MOD, MODASG, SLL, SLLASG, SRL, SRLASG, STDOT = range(60, 69)
    CALL, UCALL, EXCLAIM, NOTB, PLUSPLUS, MINMIN = 70, 72, 76, 77, 78, 79
    EQ, NEQ, LE, LT, GE, GT, ULE, ULT, UGE, UGT = range(80, 90)
    ARGREF, STASG, STARG, SCONV, PCONV, PMCONV, CBRANCH = 97, 98, 99, 104, 105, 106, 109
    ENDINIT, BRANCH, SKIP, URETURN, ICALL, UICALL, MCALL, UMCALL = 112, 114, 115, 118, 129, 130, 132, 133
    COMPLEX, REAL, IMAG = 140, 141, 142


class Node:
    """A tree. `value` is the payload: a number, text, `Symbol`, label number or member path element, by opcode."""
    __slots__ = ("op", "type", "left", "right", "value", "exception_entry")

    def __init__(self, op, type_, left=None, right=None, value=None):
        self.op, self.type, self.left, self.right, self.value = op, type_, left, right, value
        self.exception_entry = 0  # of a call


class Symbol:
    """An object or function. `level` 0 is file scope; `klass` is the I-file's storage class."""
    AUTO, DEFINED, STATIC, REGISTER, EXTERNAL, PARAMETER = 1, 2, 3, 4, 5, 17
    INLINE_BIT, INTERRUPT_BIT = 0x4, 0x20

    def __init__(self, name, type_, klass, level, position):
        self.name, self.type, self.klass, self.level, self.position = name, type_, klass, level, position
        self.qualifier_bits = self.location = self.align = 0
        self.pragmas = []       # (kind, [text...])
        self.initializer = None  # list of trees for a file-scope object
        self.index = None
        self.used = False
        self.local = None          # of a parameter: the local that the body uses
        self.function_type = None  # of a parameter: its type in the body, where it is passed as another
        self.link = None           # another file's symbol that this one stands for
        self.body = None           # of a function: its FunctionBody


class Block:
    """A scope with symbols of its own: `items` are statements, labels, nested blocks, in order."""

    def __init__(self, position):
        self.position, self.end = position, position
        self.symbols, self.items = [], []


class Statement:
    __slots__ = ("tree", "position")

    def __init__(self, tree, position):
        self.tree, self.position = tree, position


class Label:
    __slots__ = ("number",)

    def __init__(self, number):
        self.number = number


class Text:
    """Inline assembly."""
    __slots__ = ("text", "position")

    def __init__(self, text, position):
        self.text, self.position = text, position


class Pragma:
    """A pragma that stands between statements."""
    __slots__ = ("kind", "arguments")

    def __init__(self, kind, arguments):
        self.kind, self.arguments = kind, arguments


class ExceptionEntry:
    """What an exception does that leaves a call: `what` is the tree of a clean-up, or text and label of a handler."""
    PASS, CLEANUP, CATCH, TERMINATE = 0, 1, 2, 5

    def __init__(self, kind, next_, what=None):
        self.kind, self.next, self.what = kind, next_, what


class FunctionBody:
    def __init__(self, symbol, position):
        self.symbol, self.position, self.end = symbol, position, position
        self.parameters = []
        self.exceptions = []  # from entry 1, which passes on
        self.block = Block(position)


class Unit:
    def __init__(self, source_name):
        self.source_name = source_name
        self.symbols = []    # of file scope, in order
        self.items = []      # FunctionBody and Text of file scope, in order
        self.tentative = []    # symbols that get zeros if no file initializes them
        self.option_sets = {}  # number: [word...]
        self.name_prefix = "_"  # of the linker's names; the new ABI has none
        self.serial = 0

    def new_symbol(self, name, type_, klass, position):
        symbol = Symbol(name, type_, klass, 0, position)
        self.symbols.append(symbol)
        return symbol

    def next_serial(self):
        self.serial += 1
        return self.serial
