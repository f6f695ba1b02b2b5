"""What the rules of inlining ask of a C program, read from the trees of the parser."""
import sys
from pathlib import Path

sys.path.insert(0, str(Path(__file__).resolve().parent.parent.parent / "tools"))
from icparse_lib import preprocess, types as T  # noqa: E402
from icparse_lib.model import Block, FunctionBody, Op, Pragma, Statement, Symbol, Unit  # noqa: E402
from icparse_lib.pragmas import KINDS  # noqa: E402
from icparse_lib.translator import Translator, finish  # noqa: E402

WRITES = {Op.ASG, Op.PLUSASG, Op.MINUSASG, Op.MULTASG, Op.ANDBASG, Op.ORBASG, Op.XORBASG, Op.DIVASG, Op.MODASG, Op.SLLASG,
          Op.SRLASG, Op.PLUSPLUS, Op.MINMIN, Op.STASG}
FREE = {Op.SWITCH, Op.COMMA, Op.PCOMMA, Op.COMMAOP, Op.PCONV, Op.BRANCH, Op.CBRANCH}
FRAME = {"setjmp", "alloca"}



def unit_of(sources, include):
    T.set_abi(False)
    unit, linked = Unit("unit"), {}
    for path in sources:
        Translator(unit, linked, None).file(preprocess.parse(str(path), [str(include)], [], False))
    finish(unit)
    return unit


def statements(items):
    """Each statement with the pragma that speaks of its calls; labels and branches come with their marks."""
    request = None
    for item in items:
        if isinstance(item, Block):
            yield from statements(item.items)
        elif isinstance(item, Pragma):
            request = request or next((n for n in ("FORCEINLINE", "FORCEINLINE_RECURSIVE", "NOINLINE")
                                       if KINDS[n] == item.kind), None)
        elif isinstance(item, Statement):
            yield item, request or ""
            request = None


def place_object(node):
    """The NAME behind members of a place, or None."""
    while node is not None and node.op == Op.STDOT:
        node = node.left
    return node if node is not None and node.op == Op.NAME else None


class Scan:
    """Size, calls and named functions of a body; `pointers` tells whom objects of constant value point to."""

    def __init__(self, body, pointers):
        self.size, self.calls, self.named, self.through_pointer = 0, [], [], False
        self.prototype = T.strip(body.symbol.type).prototype
        self.aliased, self.pointers = set(), pointers
        straight = all(isinstance(item, (Statement, Pragma)) for item in body.block.items)
        trees = [(s, r) for s, r in statements(body.block.items)]
        for s, _ in trees:
            self.find_aliased(s.tree)
        for s, self.request in trees:
            self.line = s.position.line
            self.tree(s.tree, False)
        # The mark behind a call that never returns is an operation of the machine, which is copied on demand alone.
        self.ends = any(c[0].name == "_exit" or has_pragma(c[0], "FUNC_NEVER_RETURNS") for c in self.calls)
        self.never_returns = straight and self.ends

    def find_aliased(self, t):
        if t is None:
            return
        if t.op in (Op.UAND, Op.ARGREF) and place_object(t.left):
            self.aliased.add(id(place_object(t.left).value))
        self.find_aliased(t.left)
        self.find_aliased(t.right)

    def tree(self, t, prolog):
        if t is None:
            return
        self.size += t.op not in FREE
        if t.op == Op.NAME:
            symbol = t.value
            if T.is_function(symbol.type):
                self.named.append(symbol.link or symbol)
            elif symbol.klass == Symbol.AUTO and id(symbol) not in self.aliased:
                self.size -= 1
        elif t.op in (Op.CALL, Op.UCALL):
            self.call(t)
        elif t.op in (Op.RETURN, Op.URETURN):
            self.tree(t.right, False)
        elif t.op == Op.CBRANCH:
            self.tree(t.left, False)
        elif t.op == Op.SWITCH:
            self.tree(t.left, False)
        elif t.op == Op.BRANCH:
            pass
        elif t.op in WRITES:
            value = t.right
            while value.op in (Op.SCONV, Op.PCONV):
                value = value.left
            inner = prolog or (t.op == Op.ASG and value.op == Op.NAME and value.value.klass == Symbol.PARAMETER)
            self.tree(t.right, inner)
            target = t.left
            if t.op == Op.ASG:
                target = place_object(target) or (target.left if target.op == Op.UMULT else target)
            self.tree(target, inner)
        else:
            if (t.op == Op.PLUS and t.left.op == Op.UAND and t.right.op == Op.ICON) or \
                    (t.op == Op.STDOT and t.left.op == Op.UMULT) or \
                    (t.op == Op.SCONV and prolog and self.prototype):
                self.size -= 1
            if t.op == Op.STDOT:
                return self.tree(t.left, False)
            prolog = prolog or t.op == Op.PCOMMA
            self.tree(t.right, prolog)
            self.tree(t.left, prolog)

    def call(self, t):
        pointer = t.left
        while pointer.op in (Op.UMULT, Op.UAND, Op.PLUS, Op.SCONV, Op.PCONV):
            pointer = pointer.left
        callee = self.pointers.get(pointer.value.name.strip("_")) if pointer.op == Op.NAME else None
        if t.left.op == Op.UAND and T.is_function(t.left.left.type):
            callee = t.left.left.value
        if callee is None:
            self.through_pointer = True
            self.tree(t.left, False)
        else:
            self.calls.append((callee.link or callee, self.request, self.line, t))
        if t.op == Op.CALL:
            self.tree(t.right, False)


def initializer_names(unit):
    """The functions that objects of file scope start with."""
    found = []

    def visit(t):
        if t is not None:
            if t.op == Op.NAME and T.is_function(t.value.type):
                found.append(t.value.link or t.value)
            visit(t.right)
            visit(t.left)

    for symbol in unit.symbols:
        for tree in symbol.initializer or []:
            visit(tree)
    return found


def has_pragma(symbol, name):
    return any(kind == KINDS[name] for kind, _ in symbol.pragmas)


def pair_fits(argument, parameter):
    a, p = T.strip(argument.type), T.strip(parameter)
    if T.is_pointer(a) and T.is_pointer(p):
        return a == p or not (T.is_function(a.target) or T.is_function(p.target))
    if argument.op == Op.ARGREF:
        return T.strip(argument.left.type) == p
    null = argument.op == Op.ICON and argument.value == 0 and T.is_pointer(p)
    return a == p or null or (T.is_integer(a) and T.is_integer(p))


def arguments_fit(call, body):
    arguments, t = [], call.right
    while t is not None and t.op == Op.COMMA:
        arguments.insert(0, t.right)
        t = t.left
    arguments[:0] = [t] if t is not None else []
    parameters = [p.type for p in body.parameters]
    return len(arguments) == len(parameters) and all(map(pair_fits, arguments, parameters))


def has_its_own_frame(body, scan):
    """Locals that are volatile, or too much memory, and calls that are about the frame bar copies of a body."""
    symbols, blocks = list(body.parameters), [body.block]
    while blocks:
        block = blocks.pop()
        symbols += block.symbols
        blocks += [item for item in block.items if isinstance(item, Block)]
    wide = sum(s.type.size for s in symbols if s.klass != Symbol.STATIC and s.type.size > 16)
    return any(T.qualifiers(s.type) & T.VOLATILE for s in symbols) or \
        bool({c[0].name[1:] for c in scan.calls} & FRAME), wide > 256
