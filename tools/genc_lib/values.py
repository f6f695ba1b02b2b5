"""Expressions that carry the interval of their values, so that what is built is defined whatever the data.

An operation whose exact result leaves the range of its signed type is never built as it stands: it is done in a wider
type or in the unsigned one. Conversions to a narrower signed type wrap on the target and are allowed.
"""
from dataclasses import dataclass

from .types import INT, LDOUBLE, LLONG, LONG, SIGNED, UINT, UNSIGNED, Type, common, promoted

# Floating values stay far from overflow, so that neither an infinity nor a NaN ever comes up.
FLOAT_LIMIT = 1e15
FLOAT_SLACK = 1.0001


@dataclass(frozen=True)
class Value:
    text: str
    type: Type
    lo: float
    hi: float

    @property
    def is_float(self):
        return self.type.is_float

    @property
    def constant(self):
        return self.lo == self.hi


def integer(number, type_=INT):
    """A literal of `type_`; the least value of a type has no literal of its own."""
    type_ = promoted(type_)
    if number >= 0:
        text = f"{number}{type_.suffix}"
    elif number == type_.lo:
        text = f"(-{-number - 1}{type_.suffix} - 1)"
    else:
        text = f"(-{-number}{type_.suffix})"
    return Value(text, type_, number, number)


def fitting(number):
    """A literal of the narrowest type that holds it."""
    return integer(number, next(t for t in (INT, LONG, LLONG) if t.holds(number, number)))


def real(number, type_):
    """A literal whose digits say exactly what it is: multiples of a small power of two."""
    text = f"{abs(number)!r}{type_.suffix}"
    return Value(f"(-{text})" if number < 0 else text, type_, number, number)


def converted(value, type_):
    """Interval of `value` after conversion to `type_`."""
    if type_.is_float:
        return float(value.lo), float(value.hi)
    return (value.lo, value.hi) if type_.holds(value.lo, value.hi) else (type_.lo, type_.hi)


def cast(value, type_):
    """A written conversion. From a floating type it must fit, since C says nothing of the rest."""
    if value.is_float and not type_.is_float:
        lo, hi = int(value.lo * FLOAT_SLACK) - 1, int(value.hi * FLOAT_SLACK) + 1
        assert type_.holds(lo, hi), value
        return Value(f"({type_.name}){value.text}", type_, lo, hi)
    return Value(f"({type_.name}){value.text}", type_, *converted(value, type_))


def _truncated(a, b):
    q = abs(a) // abs(b)
    return q if (a < 0) == (b < 0) else -q


def _covering(x, y):
    """Bounds of what bitwise operators make of two intervals."""
    bits = max(v.bit_length() if v >= 0 else (~v).bit_length() for v in (*x, *y))
    return (-(1 << bits) if min(x[0], y[0]) < 0 else 0), (1 << bits) - 1


def _quotient(x, y):
    corners = [_truncated(a, b) for a in (*x, 0) if x[0] <= a <= x[1] for b in y]
    return min(corners), max(corners)


def _remainder(x, y):
    most = max(abs(y[0]), abs(y[1])) - 1
    return -min(most, max(0, -x[0])), min(most, max(0, x[1]))


def _and(x, y):
    if x[0] >= 0 and y[0] >= 0:
        return 0, min(x[1], y[1])
    if x[0] >= 0 or y[0] >= 0:
        return 0, x[1] if x[0] >= 0 else y[1]
    return _covering(x, y)


def _or(x, y):
    lo, hi = _covering(x, y)
    return (max(x[0], y[0]) if lo == 0 else lo), hi


def _product(x, y):
    corners = [a * b for a in x for b in y]
    return min(corners), max(corners)


EXACT = {
    "+": lambda x, y: (x[0] + y[0], x[1] + y[1]),
    "-": lambda x, y: (x[0] - y[1], x[1] - y[0]),
    "*": _product,
    "/": _quotient,
    "%": _remainder,
    "&": _and,
    "|": _or,
    "^": _covering,
}
COMPARISONS = ("<", "<=", ">", ">=", "==", "!=")


def result(op, left, right):
    """(type, lo, hi) of `left op right` as C does it, or None where that may be undefined. No shifts."""
    type_ = common(left.type, right.type)
    x, y = converted(left, type_), converted(right, type_)
    if op in COMPARISONS:
        return INT, 0, 1
    if type_.is_float:
        if op == "/":
            return None
        lo, hi = EXACT[op](x, y)
        return (type_, lo, hi) if max(-lo, hi) < FLOAT_LIMIT else None
    if op in "/%":
        if y[0] <= 0 <= y[1] or type_.signed and x[0] == type_.lo and y[0] <= -1 <= y[1]:
            return None
    lo, hi = EXACT[op](x, y)
    if type_.holds(lo, hi):
        return type_, lo, hi
    return None if type_.signed else (type_, 0, type_.hi)


def binary(rng, op, left, right):
    """`left op right`, by way of another type where the operands' own does not do."""
    found = result(op, left, right)
    if found:
        return Value(f"({left.text} {op} {right.text})", *found)
    if left.is_float or right.is_float:
        if op == "/":
            return _float_quotient(left, right)
        return binary(rng, op, scaled(left), scaled(right))
    type_ = common(left.type, right.type)
    if op in "/%" and right.lo <= 0 <= right.hi:
        return binary(rng, op, left, binary(rng, "|", cast(right, UNSIGNED[type_.rank]), integer(1)))
    if rng.random() < 0.6:
        for rank in range(type_.rank + 1, LLONG.rank + 1):
            wide = cast(left, SIGNED[rank])
            if result(op, wide, right):
                return binary(rng, op, wide, right)
    return binary(rng, op, cast(left, UNSIGNED[type_.rank]), cast_unsigned_divisor(op, right, type_))


def cast_unsigned_divisor(op, right, type_):
    """A negative divisor that becomes unsigned is large: one that is known not to be zero is made so by a bit."""
    unsigned = UNSIGNED[type_.rank]
    if op in "/%" and right.lo < 0:
        return Value(f"({unsigned.name})({right.text} | 1)", unsigned, 1, unsigned.hi)
    return right


def scaled(value):
    """A floating value brought to where a product of two is no danger."""
    if not value.is_float or max(-value.lo, value.hi) < 1e6:
        return value
    factor = real(2.0 ** -24, value.type)
    return Value(f"({value.text} * {factor.text})", value.type, value.lo * factor.lo, value.hi * factor.lo)


def _float_quotient(left, right):
    """By a divisor of at least one, whatever the data."""
    type_ = common(left.type, right.type)
    right = scaled(right)
    text = f"({left.text} / ({real(1.0, type_).text} + {right.text} * {right.text}))"
    most = max(abs(left.lo), abs(left.hi)) * FLOAT_SLACK
    return Value(text, type_, -most, most)


def shift(op, value, count):
    """`value op count` where count lies within the width."""
    type_ = promoted(value.type)
    low, high = count.lo, count.hi
    assert 0 <= low and high < type_.bits
    text = f"({value.text} {op} {count.text})"
    if op == ">>":
        lo = value.lo >> (low if value.lo < 0 else high)
        hi = value.hi >> (high if value.hi < 0 else low)
        return Value(text, type_, lo, hi)
    if value.lo >= 0 and value.hi << high <= type_.hi:
        return Value(text, type_, value.lo << low, value.hi << high)
    if type_.signed:
        return shift(op, cast(value, UNSIGNED[type_.rank]), count)
    return Value(text, type_, 0, type_.hi)


def negated(value):
    type_ = promoted(value.type)
    if value.is_float or not type_.signed or value.lo > type_.lo:
        if type_.signed:
            return Value(f"(-{value.text})", type_, -value.hi, -value.lo)
        return Value(f"(-{value.text})", type_, 0, type_.hi)
    return negated(cast(value, UNSIGNED[type_.rank]))


def complemented(value):
    type_ = promoted(value.type)
    if type_.signed:
        return Value(f"(~{value.text})", type_, ~value.hi, ~value.lo)
    return Value(f"(~{value.text})", type_, type_.hi - value.hi, type_.hi - value.lo)


def chosen(condition, left, right):
    """`condition ? left : right`."""
    type_ = common(left.type, right.type)
    x, y = converted(left, type_), converted(right, type_)
    return Value(f"({condition} ? {left.text} : {right.text})", type_, min(x[0], y[0]), max(x[1], y[1]))


def _to_integer(value):
    """A floating value as a long, after bringing it into range."""
    while max(-value.lo, value.hi) > 2e9:
        value = scaled(value)
    return cast(value, LONG)


def _to_float(value, type_, lo, hi):
    if not value.is_float:
        value = cast(value, type_)
    most, room = max(abs(value.lo), abs(value.hi)) * FLOAT_SLACK, min(abs(lo), abs(hi))
    if most <= room:
        return value
    exponent = 0
    while most * 2.0 ** exponent > room:
        exponent -= 1
    factor = real(2.0 ** exponent, value.type if value.type.rank >= type_.rank else LDOUBLE)
    return Value(f"({value.text} * {factor.text})", factor.type, value.lo * factor.lo, value.hi * factor.lo)


def coerced(rng, value, type_, lo, hi):
    """An expression whose value, assigned to an object of `type_`, lies in [lo, hi]."""
    if type_.is_float:
        return _to_float(value, type_, lo, hi)
    if value.is_float:
        value = _to_integer(value)
    x = converted(value, type_)
    if lo <= x[0] and x[1] <= hi:
        return value
    unsigned = UNSIGNED[max(value.type.rank, type_.rank)]
    span = hi - lo + 1
    if rng.random() < 0.3:
        inner = binary(rng, "%", cast(value, unsigned), integer(span, unsigned))
    else:
        inner = binary(rng, "&", cast(value, unsigned), integer((1 << (span.bit_length() - 1)) - 1, unsigned))
    inner = cast(inner, promoted(type_))
    return binary(rng, "+", inner, integer(lo, promoted(type_))) if lo else inner


def counted(rng, value, bits):
    """`value` as a shift count below `bits`."""
    return binary(rng, "&", cast(value, UINT), integer(bits - 1, UINT))
