"""What the statements of a function may name, each with the range that every store keeps."""
from dataclasses import dataclass, field, replace

from .types import DOUBLE, FLOAT, INT, LDOUBLE, LLONG, LONG, SHORT, UINT, ULLONG, ULONG, USHORT, Type
from .values import Value, integer


@dataclass(frozen=True)
class Kind:
    """A type with the range that objects of this kind keep to."""
    type: Type
    lo: float
    hi: float


def _full(type_):
    return Kind(type_, type_.lo, type_.hi)


SAMPLE = Kind(INT, -256, 255)
INTEGERS = (SAMPLE, _full(INT), _full(UINT), Kind(UINT, 0, 99), Kind(SHORT, -1000, 1000), _full(USHORT),
            Kind(LONG, -100000, 100000), _full(LONG), _full(ULONG), Kind(LLONG, -10**9, 10**9), _full(ULLONG))
FLOATS = (Kind(FLOAT, -1000.0, 1000.0), Kind(DOUBLE, -64.0, 64.0), Kind(LDOUBLE, -1000.0, 1000.0))
KINDS = INTEGERS + FLOATS


@dataclass(frozen=True)
class Var:
    """A scalar, or anything else that a text names: an element, a field, what a pointer points to."""
    text: str
    kind: Kind
    writable: bool = True
    read_as: Type = None  # of a bit-field: the type that it is promoted to
    bit_field: bool = False

    @property
    def value(self):
        return Value(self.text, self.read_as or self.kind.type, self.kind.lo, self.kind.hi)


@dataclass(frozen=True)
class Array:
    name: str
    kind: Kind
    dims: tuple
    writable: bool = True
    volatile: bool = False


@dataclass(frozen=True)
class Records:
    """An array of structures; the fields are Vars whose text is the field's name."""
    name: str
    tag: str
    fields: tuple
    size: int


@dataclass(frozen=True)
class Index:
    """A loop's variable inside the loop: never stored to by the body, each value between lo and hi."""
    name: str
    type: Type
    lo: int
    hi: int

    @property
    def value(self):
        return Value(self.name, self.type, self.lo, self.hi)


@dataclass(frozen=True)
class Count:
    """A parameter that says how many elements to work on: a multiple of `step`."""
    name: str
    lo: int
    hi: int
    step: int

    @property
    def value(self):
        return Value(self.name, INT, self.lo, self.hi)


@dataclass
class Scope:
    scalars: list = field(default_factory=list)
    arrays: list = field(default_factory=list)
    records: list = field(default_factory=list)
    counts: list = field(default_factory=list)
    helpers: list = field(default_factory=list)
    indices: list = field(default_factory=list)


def affine(rng, index, size):
    """`c * index + k` that lies in [0, size), or None."""
    factors = [c for c in (1, 1, 1, -1, 2, 3, -2) if (index.hi - index.lo) * abs(c) < size]
    if not factors:
        return None
    factor = rng.choice(factors)
    ends = sorted((factor * index.lo, factor * index.hi))
    offset = rng.choice((-ends[0], size - 1 - ends[1], rng.randint(-ends[0], size - 1 - ends[1])))
    if not index.type.signed and (factor < 0 or offset < 0):
        return None
    text = index.name if factor == 1 else f"{factor} * {index.name}" if factor > 0 else f"-{index.name}"
    if factor < -1:
        text = f"{factor} * {index.name}"
    if offset > 0 and factor < 0 and rng.random() < 0.7:
        return f"{offset} - {index.name if factor == -1 else f'{-factor} * {index.name}'}"
    return text if offset == 0 else f"{text} {'+' if offset > 0 else '-'} {abs(offset)}"


def affine_of_two(rng, first, second, size):
    """`i * c + j + k` within [0, size), as in a row of a table kept in one dimension, or None."""
    width = second.hi - second.lo + 1
    factor = rng.choice((1, 1, width))
    lo, hi = factor * first.lo + second.lo, factor * first.hi + second.hi
    if not first.type.signed or not second.type.signed or hi - lo >= size:
        return None
    offset = rng.randint(-lo, size - 1 - hi)
    text = f"{first.name} + {second.name}" if factor == 1 else f"{first.name} * {factor} + {second.name}"
    return text if offset == 0 else f"{text} {'+' if offset > 0 else '-'} {abs(offset)}"


def wrapped(value, size):
    """Any integer as a subscript below `size`."""
    unsigned = f"(unsigned int){value.text}"
    return f"({unsigned} & {size - 1}u)" if size & (size - 1) == 0 else f"({unsigned} % {size}u)"


def field_of(records, at, member, arrow=False):
    text = f"{at}->{member.text}" if arrow else f"{records.name}[{at}].{member.text}"
    return replace(member, text=text)


def literal(rng, kind, small=False):
    """A value of `kind`, often one at an end of its range or near zero."""
    if kind.type.is_float:
        return rng.randint(-255, 255) / 8.0 * (1 if kind.hi < 100 else 2)
    if small:
        return rng.randint(max(kind.lo, -9), min(kind.hi, 20))
    return rng.choice((kind.lo, kind.hi, rng.randint(max(kind.lo, -4), min(kind.hi, 16)), rng.randint(kind.lo, kind.hi),
                       rng.randint(kind.lo, kind.hi)))


def constant(rng, kind):
    return integer(literal(rng, kind), kind.type)
