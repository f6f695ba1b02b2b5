"""The C types of the target.

A type is an immutable object with `size` and `align` in bits; the addressable unit is 16 bits, and char, short and int
are one unit each. Typedefs and qualifiers are kept as layers, since the I-file names types as the source does; `strip`
looks behind them. Two types are the same I-file type exactly if their `key`s are equal; records and enumerations are
equal only to themselves.
"""

import itertools

UNIT = 16

CONST, VOLATILE, RESTRICT = 1, 2, 64
QUALIFIER_BITS = {"const": CONST, "volatile": VOLATILE, "restrict": RESTRICT}


class Type:
    size = 0
    align = UNIT
    complete = True
    key = None

    def __eq__(self, other):
        return isinstance(other, Type) and self.key == other.key

    def __hash__(self):
        return hash(self.key)

    def __repr__(self):
        return str(self)


class Void(Type):
    key = ("void",)
    complete = False

    def __str__(self):
        return "void"


class Integer(Type):
    """An integer kind: bool, signed char, unsigned char, wchar_t, short, ... in the order of the I-file's numbers."""
    NAMES = ("_Bool", "char", "unsigned char", "wchar_t", "short", "unsigned short", "int", "unsigned int", "long",
             "unsigned long", "long long", "unsigned long long")
    SIZES = (16, 16, 16, 16, 16, 16, 16, 16, 32, 32, 64, 64)
    RANKS = (0, 1, 1, 1, 2, 2, 3, 3, 4, 4, 5, 5)

    def __init__(self, kind, explicit_sign=False):
        self.kind, self.explicit_sign = kind, explicit_sign
        self.size = self.SIZES[kind]
        self.align = min(self.size, 32)
        self.signed = kind in (1, 4, 6, 8, 10)
        self.rank = self.RANKS[kind]
        self.key = ("int", kind, explicit_sign)

    @property
    def minimum(self):
        return -(1 << (self.size - 1)) if self.signed else 0

    @property
    def maximum(self):
        return 1 if self.kind == 0 else (1 << (self.size - self.signed)) - 1

    def wrap(self, value):
        """`value` as an object of this type holds it."""
        if self.kind == 0:
            return int(value != 0)
        value &= (1 << self.size) - 1
        return value - (1 << self.size) if self.signed and value >> (self.size - 1) else value

    def __str__(self):
        return "signed char" if self.kind == 1 and self.explicit_sign else self.NAMES[self.kind]


class Floating(Type):
    """float, double, long double by the I-file's number; the ABI gives double its size."""
    NAMES = ("float", "double", "long double")
    align = 32

    def __init__(self, kind, size):
        self.kind, self.size = kind, size
        self.key = ("float", kind)

    def __str__(self):
        return self.NAMES[self.kind]


class Complex(Type):
    """A complex number of float or double: the real part, then the imaginary part."""
    signed = True

    def __init__(self, part):
        self.part = part
        self.key = ("complex", part.key)

    size = property(lambda self: 2 * self.part.size)
    align = property(lambda self: self.part.align)

    def __str__(self):
        return f"{self.part} _Complex"


class Pointer(Type):
    size = align = 32

    def __init__(self, target):
        self.target = target
        self.key = ("pointer", target.key)

    def __str__(self):
        return f"{self.target} *"


class Array(Type):
    """`count` is None while the size is unknown."""

    def __init__(self, element, count):
        self.element, self.count = element, count
        self.complete = count is not None
        self.align = element.align
        self.key = ("array", element.key, count)

    @property
    def size(self):
        return self.element.size * (self.count or 0)

    def __str__(self):
        return f"{self.element}[{'' if self.count is None else self.count}]"


class Function(Type):
    """`parameters` are types after decay. Without `prototype` the arguments are not checked."""
    size = align = 32

    def __init__(self, result, parameters, variadic=False, prototype=True):
        self.result, self.parameters, self.variadic, self.prototype = result, tuple(parameters), variadic, prototype
        self.key = ("function", result.key, tuple(p.key for p in self.parameters), variadic, prototype)

    def __str__(self):
        inside = ", ".join([str(p) for p in self.parameters] + ["..."] * self.variadic)
        return f"{self.result} ({inside})"


class Member:
    """A member with its place: `offset` in bits from the start of the record, `width` of a bit-field or None."""
    __slots__ = ("name", "type", "offset", "width", "number", "position")

    def __init__(self, name, type_, width, position):
        self.name, self.type, self.width, self.position = name, type_, width, position
        self.offset = self.number = 0


_serial = itertools.count(1)


def _identity(tag):
    """(key, name) of a new record or enumeration, which is the same type as no other. Without a tag it gets a name."""
    number = next(_serial)
    return ("tagged", number), tag or f"$$fake{number}"


class Record(Type):
    """A structure or union. It is incomplete until `lay_out` gives it its members."""

    def __init__(self, is_union, tag, position):
        self.is_union, self.tag, self.position = is_union, tag, position
        self.members, self.complete = [], False
        self.key, self.name = _identity(tag)

    def lay_out(self, members):
        """Places the members. A bit-field never crosses a boundary of its declared type; width 0 goes to the next."""
        end = size = 0
        for member in members:
            start = 0 if self.is_union else end
            if member.width is None:
                member.offset = round_up(start, member.type.align)
                end = member.offset + member.type.size
            elif member.width == 0:
                end = round_up(start, member.type.size)
                continue
            else:
                container = member.type.size
                if start // container != (start + member.width - 1) // container:
                    start = round_up(start, container)
                member.offset = start
                end = start + member.width
                if not member.name:
                    size = max(size, end)
                    continue
            self.align = max(self.align, member.type.align)
            size = max(size, end)
            self.members.append(member)
            member.number = len(self.members)
        self.size = round_up(max(size, UNIT), self.align)
        self.complete = True

    def find(self, name):
        """The members on the way to `name`, through nameless records; None if there is none of that name."""
        for member in self.members:
            if member.name == name:
                return [member]
            inner = strip(member.type)
            if not member.name and isinstance(inner, Record):
                rest = inner.find(name)
                if rest:
                    return [member] + rest
        return None

    def __str__(self):
        return f"{'union' if self.is_union else 'struct'} {self.tag or '<nameless>'}"


class Enum(Type):
    def __init__(self, tag, position):
        self.tag, self.position = tag, position
        self.enumerators, self.underlying, self.complete = [], None, False
        self.key, self.name = _identity(tag)

    size = property(lambda self: self.underlying.size if self.underlying else UNIT)
    align = property(lambda self: self.underlying.align if self.underlying else UNIT)

    def __str__(self):
        return f"enum {self.tag or '<nameless>'}"


class Qualified(Type):
    def __init__(self, base, bits):
        self.base, self.bits = base, bits
        self.key = ("qualified", base.key, bits)

    size = property(lambda self: self.base.size)
    align = property(lambda self: self.base.align)
    complete = property(lambda self: self.base.complete)

    def __str__(self):
        words = [word for word, bit in QUALIFIER_BITS.items() if self.bits & bit]
        return f"{self.base} {' '.join(words)}" if isinstance(self.base, Pointer) else f"{' '.join(words)} {self.base}"


class Typedef(Type):
    def __init__(self, name, base, position):
        self.name, self.base, self.position = name, base, position
        self.key = ("typedef", name, base.key)

    size = property(lambda self: self.base.size)
    align = property(lambda self: self.base.align)
    complete = property(lambda self: self.base.complete)

    def __str__(self):
        return self.name


def round_up(value, step):
    return -(-value // step) * step


VOID = Void()
BOOL, CHAR, UCHAR, WCHAR = Integer(0), Integer(1), Integer(2, True), Integer(3)
SCHAR = Integer(1, True)
SHORT, USHORT, INT, UINT, LONG, ULONG, LLONG, ULLONG = (Integer(kind) for kind in range(4, 12))
FLOAT, DOUBLE, LDOUBLE = Floating(0, 32), Floating(1, 32), Floating(2, 64)
SIZE_T, PTRDIFF_T = ULONG, LONG


def set_abi(eabi):
    """The new ABI has a 64-bit double and a 32-bit wchar_t."""
    DOUBLE.size = 64 if eabi else 32
    WCHAR.size = WCHAR.align = 32 if eabi else 16


def strip(type_):
    """The type behind typedefs and qualifiers."""
    while isinstance(type_, (Qualified, Typedef)):
        type_ = type_.base
    return type_


def unqualified(type_):
    """The type without its outer qualifiers; a typedef's name stays where nothing is lost by it."""
    if qualifiers(type_) == 0:
        return type_
    while isinstance(type_, Qualified) or (isinstance(type_, Typedef) and qualifiers(type_)):
        type_ = type_.base
    return type_


def qualifiers(type_):
    """The outer qualifier bits."""
    bits = 0
    while isinstance(type_, (Qualified, Typedef)):
        bits |= type_.bits if isinstance(type_, Qualified) else 0
        type_ = type_.base
    return bits


def qualify(type_, bits):
    """`type_` with more qualifiers; those of an array belong to its elements."""
    if not bits:
        return type_
    bare = strip(type_)
    if isinstance(bare, Array):
        return Array(qualify(bare.element, bits | qualifiers(type_)), bare.count)
    if isinstance(type_, Qualified):
        return Qualified(type_.base, type_.bits | bits)
    return Qualified(type_, bits)


def is_integer(type_):
    return isinstance(strip(type_), (Integer, Enum))


def is_floating(type_):
    return isinstance(strip(type_), Floating)


def is_complex(type_):
    return isinstance(strip(type_), Complex)


def is_arithmetic(type_):
    return isinstance(strip(type_), (Integer, Enum, Floating, Complex))


def is_pointer(type_):
    return isinstance(strip(type_), Pointer)


def is_scalar(type_):
    return isinstance(strip(type_), (Integer, Enum, Floating, Complex, Pointer))


def is_void(type_):
    return isinstance(strip(type_), Void)


def is_record(type_):
    return isinstance(strip(type_), Record)


def is_array(type_):
    return isinstance(strip(type_), Array)


def is_function(type_):
    return isinstance(strip(type_), Function)


def as_integer(type_):
    """The integer type that holds the values of an integer or enumeration type."""
    bare = strip(type_)
    return bare.underlying or INT if isinstance(bare, Enum) else bare


def pointed_to(type_):
    return strip(type_).target


def promote(type_, width=None):
    """Integer promotion; `width` is that of a bit-field. A narrow unsigned type, as wide as int, goes to unsigned."""
    if not is_integer(type_):
        return strip(type_)
    kind = as_integer(type_)
    if kind.rank > INT.rank:
        return kind
    if kind.kind == 0 or (width is not None and width < INT.size):
        return INT
    return INT if kind.minimum < 0 or kind.maximum <= INT.maximum else UINT if kind.size <= UINT.size else ULONG


def usual(left, right):
    """The common type of two promoted arithmetic types."""
    left, right = (as_integer(t) if is_integer(t) else strip(t) for t in (left, right))
    if is_complex(left) or is_complex(right):
        return Complex(usual(*(t.part if is_complex(t) else t for t in (left, right))))
    if is_floating(left) or is_floating(right):
        return max((t for t in (left, right) if is_floating(t)), key=lambda t: t.kind)
    if left.kind == right.kind:
        return left
    if left.signed == right.signed:
        return max((left, right), key=lambda t: t.rank)
    unsigned, signed = (right, left) if left.signed else (left, right)
    if unsigned.rank >= signed.rank:
        return unsigned
    return signed if signed.size > unsigned.size else Integer(signed.kind + 1)


def compatible(a, b):
    """Whether two types are compatible in the sense of C, qualifiers included."""
    if a.key == b.key:
        return True
    if qualifiers(a) != qualifiers(b):
        return False
    a, b = strip(a), strip(b)
    if isinstance(a, Enum) or isinstance(b, Enum):
        return isinstance(a, (Enum, Integer)) and isinstance(b, (Enum, Integer)) and (
            a.key == b.key if isinstance(a, Enum) and isinstance(b, Enum) else as_integer(a).key == as_integer(b).key)
    if type(a) is not type(b):
        return False
    if isinstance(a, Pointer):
        return compatible(a.target, b.target)
    if isinstance(a, Array):
        return compatible(a.element, b.element) and (a.count == b.count or a.count is None or b.count is None)
    if isinstance(a, Function):
        if not compatible(a.result, b.result):
            return False
        if not (a.prototype and b.prototype):
            return True
        return a.variadic == b.variadic and len(a.parameters) == len(b.parameters) and all(
            compatible(unqualified(p), unqualified(q)) for p, q in zip(a.parameters, b.parameters))
    return a.key == b.key


def composite(old, new):
    """Of two compatible declarations' types the one that knows more."""
    a, b = strip(old), strip(new)
    if isinstance(a, Array) and isinstance(b, Array) and b.count is None:
        return old
    if isinstance(a, Function) and isinstance(b, Function) and a.prototype and not b.prototype:
        return old
    return new
