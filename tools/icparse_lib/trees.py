"""Making trees: constants, conversions, addresses, pointer steps. Knows types, but no names."""
from fractions import Fraction
import math
import struct

from . import types as T
from .errors import CompileError
from .model import Node, Op

LITERAL, TEMPORARY = "literal", "temporary"  # marks of a COMMAOP whose right operand is an object

COMPARISONS = {Op.EQ, Op.NEQ, Op.LE, Op.LT, Op.GE, Op.GT, Op.ULE, Op.ULT, Op.UGE, Op.UGT}
TRUTHS = COMPARISONS | {Op.ANDAND, Op.OROR, Op.EXCLAIM}


# ---- Constants
def integer(type_, value):
    """A constant of an integer type. What does not fit the ICON record travels as decimal text."""
    kind = T.as_integer(type_)
    value = kind.wrap(value)
    # A signed number of more than four groups is read without its sign, so 64-bit ICONs stay within four.
    fits = kind.size <= 32 or (-(1 << 27) <= value < 1 << 27 if kind.signed else value < 1 << 32)
    return Node(Op.ICON if fits else Op.LCON, kind, value=value)


def round_to(type_, value):
    """A real number (Fraction or float) as the floating type holds it."""
    size = T.strip(type_).size
    if isinstance(value, Fraction):
        return _nearest(value, 24, -149) if size == 32 else float(value) if abs(value) < 2**1024 else math.inf
    if size == 32 and math.isfinite(value):
        return struct.unpack("f", struct.pack("f", value))[0] if abs(value) < 3.4028235677973366e38 else (
            math.copysign(math.inf, value))
    return value


def _nearest(value, bits, lowest):
    """The binary number of `bits` bits nearest to a fraction, ties to even."""
    if value == 0:
        return 0.0
    magnitude = abs(value)
    exponent = magnitude.numerator.bit_length() - magnitude.denominator.bit_length() - bits
    while magnitude / Fraction(2) ** exponent >= 1 << bits:
        exponent += 1
    exponent = max(exponent, lowest)
    whole = round(magnitude / Fraction(2) ** exponent)
    result = math.ldexp(whole, exponent)
    if result > 3.4028234663852886e38:
        result = math.inf
    return -result if value < 0 else result


def floating(type_, value):
    value = round_to(type_, value)
    return Node(Op.FCON, T.strip(type_), value=value.hex() if math.isfinite(value) else repr(value))


def is_integer_constant(node):
    return node.op in (Op.ICON, Op.LCON)


def zero(type_):
    """The zero of a scalar type."""
    if T.is_floating(type_):
        return floating(type_, 0.0)
    if T.is_complex(type_):
        part = zero(T.strip(type_).part)
        return Node(Op.COMPLEX, T.strip(type_), part, part)
    if T.is_pointer(type_):
        return Node(Op.PCONV, T.unqualified(type_), integer(T.INT, 0))
    return integer(type_, 0)


def is_null_constant(node):
    """An integer constant 0, or one cast to `void *`."""
    if node.op == Op.PCONV and T.is_void(T.pointed_to(node.type)):
        node = node.left
    return is_integer_constant(node) and node.value == 0 and T.is_integer(node.type)


# ---- Objects
def field_of(node):
    """The member that a tree names, or None."""
    return node.right.value[1] if node.op == Op.STDOT else None


def bit_width(node):
    member = field_of(node)
    return member.width if member else None


def is_object(node):
    """Whether the tree designates an object: what C calls an lvalue, and temporaries."""
    if node.op in (Op.NAME, Op.STDOT):
        return not T.is_function(node.type)
    return node.op in (Op.UMULT, Op.SCON) or (node.op == Op.COMMAOP and node.value is not None)


def is_temporary(node):
    while node.op == Op.STDOT:
        node = node.left
    return node.op == Op.COMMAOP and node.value == TEMPORARY


def comma(first, second, mark=None):
    return Node(Op.COMMAOP, second.type, first, second, mark)


def name(symbol):
    (symbol.link or symbol).used = True
    return Node(Op.NAME, symbol.type, value=symbol)


def dot(base, path):
    """Member access along the members of `path`. The record's qualifiers are the member's too."""
    if base.op == Op.COMMAOP:
        return comma(base.left, dot(base.right, path), base.value)
    for member in path:
        record = T.strip(base.type)
        type_ = T.qualify(member.type, T.qualifiers(base.type))
        base = Node(Op.STDOT, type_, base, Node(Op.FIELD, member.type, value=(record, member)))
    return base


def indirect(pointer):
    """The object behind a pointer; the address of an object gives the object back."""
    target = T.pointed_to(pointer.type)
    if pointer.op == Op.UAND and pointer.left.type.key == target.key:
        return pointer.left
    return Node(Op.UMULT, target, pointer)


def address(node, type_=None):
    """The address of an object or function."""
    type_ = type_ or T.Pointer(node.type)
    if node.op == Op.COMMAOP:
        return comma(node.left, address(node.right, type_))
    if node.op == Op.SCON:
        return retype(Node(Op.SCON, T.Pointer(T.strip(node.type).element), value=node.value), type_)
    if node.op == Op.UMULT:
        return retype(node.left, type_)
    return Node(Op.UAND, type_, node)


def retype(pointer, type_):
    """A pointer value under another pointer type."""
    return pointer if pointer.type.key == type_.key else Node(Op.PCONV, type_, pointer)


def decay(node):
    """Arrays become the address of their first element, functions their address."""
    bare = T.strip(node.type)
    if isinstance(bare, T.Array):
        return address(node, T.Pointer(bare.element))
    if isinstance(bare, T.Function):
        return address(node)
    return node


# ---- Conversions
def convert(node, type_, where):
    """The value of `node` converted to a scalar type or void; the conversion is legal as a cast."""
    target, source = T.strip(type_), T.strip(node.type)
    if isinstance(target, T.Void):
        return node
    if target.key == source.key:
        return node
    if not T.is_scalar(target) or not T.is_scalar(source):
        raise CompileError(where, f"cannot convert '{node.type}' to '{type_}'")
    if isinstance(target, T.Complex) or isinstance(source, T.Complex):
        return _convert_complex(node, target, source, where)
    if isinstance(target, T.Pointer):
        return _to_pointer(node, T.unqualified(type_), where)
    if isinstance(source, T.Pointer) and isinstance(target, T.Floating):
        raise CompileError(where, f"cannot convert '{node.type}' to '{type_}'")
    if target.key == T.BOOL.key:
        return _to_bool(node)
    if is_integer_constant(node):
        if isinstance(target, T.Floating):
            return floating(target, Fraction(node.value))
        return integer(target, node.value)
    if node.op == Op.FCON:
        return _convert_floating(node, target)
    if isinstance(target, T.Enum):
        if T.as_integer(target).key == source.key:
            return node
        target = T.as_integer(target)
    if isinstance(source, T.Enum) and T.as_integer(source).key == target.key:
        return node
    if isinstance(source, T.Pointer) and target.size < source.size:
        node = Node(Op.SCONV, T.ULONG, node)
    return Node(Op.SCONV, target, node)


def _convert_complex(node, target, source, where):
    """Between complex types part by part; a real number has no imaginary part, and loses it."""
    if isinstance(target, T.Complex):
        if isinstance(source, T.Complex):
            return Node(Op.SCONV, target, node)
        return Node(Op.COMPLEX, target, convert(node, target.part, where), zero(target.part))
    if target.key == T.BOOL.key:
        return _to_bool(node)
    return convert(Node(Op.REAL, source.part, node), target, where)


def _convert_floating(node, target):
    value = float.fromhex(node.value)
    if isinstance(target, T.Floating):
        return floating(target, value)
    kind = T.as_integer(target)
    if math.isfinite(value) and kind.minimum <= int(value) <= kind.maximum:
        return integer(kind, int(value))
    return Node(Op.SCONV, kind, node)


def _to_pointer(node, type_, where):
    if T.is_pointer(node.type):
        return retype(node, type_)
    if not T.is_integer(node.type):
        raise CompileError(where, f"cannot convert '{node.type}' to '{type_}'")
    kind = T.as_integer(node.type)
    if not (is_integer_constant(node) and node.value == 0) and kind.size != 32:
        node = convert(node, T.LONG if kind.signed else T.ULONG, where)
    return Node(Op.PCONV, type_, node)


def _to_bool(node):
    if is_integer_constant(node):
        return integer(T.BOOL, node.value)
    return Node(Op.SCONV, T.BOOL, truth(node))


def truth(node):
    """An int tree that is 0 exactly if the scalar `node` is zero."""
    if node.op in TRUTHS:
        return node
    return Node(Op.NEQ, T.INT, node, zero(node.type))


def falsity(node):
    if node.op in TRUTHS:
        return Node(Op.EXCLAIM, T.INT, node)
    return Node(Op.EQ, T.INT, node, zero(node.type))


# ---- Pointers
def units_of(type_, where):
    """The size of what a pointer steps over, in addressable units."""
    if T.is_void(type_) or T.is_function(type_):
        return 1
    if not type_.complete:
        raise CompileError(where, f"'{type_}' has no known size")
    return type_.size // T.UNIT


def scaled(index, element, where):
    """An index as an offset in 16-bit units. It is scaled in 32 bits, as wide as addresses are."""
    units = units_of(element, where)
    if is_integer_constant(index):
        offset = index.value * units
        return integer(T.INT if T.INT.minimum <= offset <= T.INT.maximum else T.LONG, offset)
    kind = T.as_integer(index.type)
    if units == 1 and kind.signed and kind.size == T.INT.size:
        return convert(index, T.INT, where)
    if kind.size != 32:
        index = convert(index, T.LONG, where)
    if units == 1:
        return index
    return Node(Op.PMCONV, T.strip(index.type), index, integer(T.as_integer(index.type), units * T.UNIT))


def step(op, pointer, index, where):
    """`pointer` plus or minus an integer. Adding 0 is left out."""
    offset = scaled(index, T.pointed_to(pointer.type), where)
    if is_integer_constant(offset) and offset.value == 0:
        return pointer
    return Node(op, T.unqualified(pointer.type), pointer, offset)


def assign(target, value):
    """A plain assignment of an already converted value."""
    op = Op.STASG if T.is_record(target.type) else Op.ASG
    return Node(op, T.unqualified(target.type), target, value)


def chain(op, nodes):
    """Nodes joined by a binary operator, leaning left; None for none."""
    result = None
    for node in nodes:
        result = node if result is None else Node(op, T.VOID if op == Op.PCOMMA else node.type, result, node)
    return result
