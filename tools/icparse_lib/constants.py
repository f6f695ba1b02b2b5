"""Values of constant expressions, computed from their trees."""
from fractions import Fraction

from . import trees, types as T
from .errors import CompileError
from .model import Node, Op


def integer_value(node):
    """The value of an integer constant expression, or None."""
    value = _number(node)
    return value if isinstance(value, int) else None


def require_integer(node, where, what):
    value = integer_value(node) if T.is_integer(node.type) else None
    if value is None:
        raise CompileError(where, f"{what} is not an integer constant")
    return value


def complex_items(node, type_, where):
    """The constants of both parts of a static complex number; `node` is null for zero."""
    value = 0j if node is None else _complex_number(node)
    if value is None:
        raise CompileError(where, "the initializer is not constant")
    return [trees.floating(type_.part, part) for part in (value.real, value.imag)]


def _complex_number(node):
    """The value of a constant expression of complex type as the target holds it, or None."""
    if node.op == Op.COMPLEX:
        parts = _number(node.left), _number(node.right)
        return None if None in parts else complex(*parts)
    if node.op in (Op.SCONV, Op.UMINUS):
        value = _complex_number(node.left) if T.is_complex(node.left.type) else None
        if value is None:
            return None
        value = -value if node.op == Op.UMINUS else value
    elif node.op in (Op.PLUS, Op.MINUS, Op.MULT):
        a, b = _complex_number(node.left), _complex_number(node.right)
        if a is None or b is None:
            return None
        part = T.strip(node.type).part
        fit = lambda number: trees.round_to(part, number)
        if node.op == Op.MULT:
            value = complex(fit(a.real * b.real) - fit(a.imag * b.imag), fit(a.real * b.imag) + fit(a.imag * b.real))
        else:
            value = a + b if node.op == Op.PLUS else a - b
    else:
        return None
    return complex(*(trees.round_to(T.strip(node.type).part, part) for part in (value.real, value.imag)))


def _number(node):
    """int or float of an arithmetic constant expression, else None."""
    op = node.op
    if op in (Op.ICON, Op.LCON):
        return node.value
    if op == Op.FCON:
        return float.fromhex(node.value)
    if op == Op.SCONV and T.is_pointer(node.left.type):
        place = _pointer(node.left)
        return None if place is None or place.base is not None else _fit(node.type, place.offset)
    if op in (Op.SCONV, Op.UMINUS, Op.NOTB, Op.EXCLAIM):
        value = _number(node.left)
        return None if value is None else _unary(node, value)
    if op == Op.QUEST:
        chosen = _number(node.left)
        return None if chosen is None else _number(node.right.left if chosen else node.right.right)
    if op in (Op.ANDAND, Op.OROR):
        left = _number(node.left)
        if left is None or bool(left) == (op == Op.OROR):
            return None if left is None else int(bool(left))
        right = _number(node.right)
        return None if right is None else int(bool(right))
    if op in _BINARY or op in _COMPARE:
        left, right = _number(node.left), _number(node.right)
        return None if left is None or right is None else _binary(node, left, right)
    return None


def _fit(type_, value):
    if T.is_floating(type_):
        return trees.round_to(type_, Fraction(value) if isinstance(value, int) else value)
    return T.as_integer(type_).wrap(int(value))


def _unary(node, value):
    if node.op == Op.EXCLAIM:
        return int(not value)
    if node.op == Op.NOTB:
        value = ~value
    elif node.op == Op.UMINUS:
        value = -value
    elif value != value or value in (float("inf"), float("-inf")):
        return value if T.is_floating(node.type) else None
    return _fit(node.type, value)


def _divide(a, b):
    if isinstance(a, float) or isinstance(b, float):
        return a / b if b else None
    return None if b == 0 else abs(a) // abs(b) * (1 if (a < 0) == (b < 0) else -1)


def _shift(left):
    def compute(a, b):
        if not 0 <= b < 64:
            return None
        return a << b if left else a >> b
    return compute


_BINARY = {Op.PLUS: lambda a, b: a + b, Op.MINUS: lambda a, b: a - b, Op.MULT: lambda a, b: a * b, Op.DIV: _divide,
           Op.MOD: lambda a, b: None if b == 0 else a - b * _divide(a, b), Op.ANDB: lambda a, b: a & b,
           Op.ORB: lambda a, b: a | b, Op.XORB: lambda a, b: a ^ b, Op.SLL: _shift(True), Op.SRL: _shift(False)}
_COMPARE = {Op.EQ: lambda a, b: a == b, Op.NEQ: lambda a, b: a != b, Op.LE: lambda a, b: a <= b,
            Op.LT: lambda a, b: a < b, Op.GE: lambda a, b: a >= b, Op.GT: lambda a, b: a > b,
            Op.ULE: lambda a, b: a <= b, Op.ULT: lambda a, b: a < b, Op.UGE: lambda a, b: a >= b,
            Op.UGT: lambda a, b: a > b}


def _binary(node, left, right):
    if node.op in _COMPARE:
        return int(_COMPARE[node.op](left, right))
    value = _BINARY[node.op](left, right)
    return None if value is None else _fit(node.type, value)


def fold(node):
    """An arithmetic tree as a constant node, or None."""
    if not T.is_arithmetic(node.type):
        return None
    value = _number(node)
    if value is None:
        return None
    if T.is_floating(node.type):
        return trees.floating(node.type, float(value))
    return trees.integer(node.type, int(value))


class _Address:
    """A symbol or string (a tree without indirection) or nothing, plus an offset in 16-bit units."""

    def __init__(self, base, offset):
        self.base, self.offset = base, offset


def _object_address(node):
    """Where the object that a tree designates lies, if that is constant."""
    if node.op == Op.NAME:
        return _Address(node, 0) if node.value.level == 0 else None
    if node.op == Op.SCON:
        return _Address(node, 0)
    if node.op == Op.UMULT:
        return _pointer(node.left)
    if node.op == Op.STDOT:
        base, member = _object_address(node.left), trees.field_of(node)
        if base is None or member.width is not None:
            return None
        return _Address(base.base, base.offset + member.offset // T.UNIT)
    return None


def _pointer(node):
    op = node.op
    if op == Op.UAND:
        return _object_address(node.left)
    if op == Op.SCON:
        return _Address(node, 0)
    if op in (Op.PCONV, Op.SCONV) and node.type.size >= 32:
        return _pointer(node.left)
    if op in (Op.PLUS, Op.MINUS) and T.is_pointer(node.left.type):
        base, offset = _pointer(node.left), _offset(node.right)
        if base is None or offset is None:
            return None
        return _Address(base.base, base.offset + (offset if op == Op.PLUS else -offset))
    if op == Op.QUEST:
        chosen = _number(node.left)
        return None if chosen is None else _pointer(node.right.left if chosen else node.right.right)
    if T.is_integer(node.type):
        value = _number(node)
        return None if value is None else _Address(None, value)
    return None


def _offset(node):
    if node.op == Op.PMCONV:
        value = _number(node.left)
        return None if value is None else value * node.right.value // T.UNIT
    return _number(node)


def initializer_item(node, type_, where):
    """The tree of a static initializer for a scalar of `type_`: a constant, or an address with a constant offset."""
    folded = fold(node)
    if folded is not None:
        return folded
    address = _pointer(node) if T.is_pointer(node.type) or node.type.size >= 32 else None
    if address is None:
        raise CompileError(where, "the initializer is not constant")
    if address.base is None:
        number = trees.integer(T.ULONG if address.offset > T.INT.maximum else T.INT, address.offset)
        return trees.convert(number, type_, where)
    pointer = T.unqualified(type_) if T.is_pointer(type_) else T.Pointer(T.VOID)
    if address.base.op == Op.SCON:
        # Under a cast even to its own type: a bare string stands for the elements of an array.
        tree = Node(Op.PCONV, pointer, Node(Op.SCON, T.Pointer(T.CHAR), value=address.base.value))
    elif T.is_function(address.base.type):
        tree = trees.decay(address.base)
    else:
        tree = trees.retype(trees.decay(address.base) if T.is_array(address.base.type) else
                            trees.address(address.base), pointer)
    if address.offset:
        size = T.INT if T.INT.minimum <= address.offset <= T.INT.maximum else T.LONG
        tree = Node(Op.PLUS, pointer, tree, trees.integer(size, address.offset))
    return tree if T.is_pointer(type_) else Node(Op.SCONV, T.as_integer(type_), tree)
