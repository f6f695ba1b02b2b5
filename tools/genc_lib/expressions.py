"""Random expressions over a scope. None has a side effect, so the order of evaluation never shows."""
from .scope import INTEGERS, SAMPLE, Var, affine, affine_of_two, constant, field_of, literal, wrapped
from .types import FLOAT, INT, LDOUBLE, LLONG, LONG, UINT, ULONG
from .values import (COMPARISONS, Value, binary, cast, chosen, coerced, complemented, counted, fitting, integer,
                     negated, real, result, shift)

OPERATORS = "+-*" * 3 + "&|^" * 2 + "/%"
DIVISORS = (2, 3, 5, 7, 8, 10, 16, 25, 60, 100, 255, 1000, -3, -7, -8)
CASTS = (INT, UINT, LONG, ULONG, LLONG)


class Expressions:
    def __init__(self, rng, scope):
        self.rng, self.scope = rng, scope

    # Subscripts and objects.

    def subscript(self, size):
        """Text of a subscript below `size`: affine in the loops' variables where one fits."""
        rng, indices = self.rng, self.scope.indices
        if indices and rng.random() < 0.8:
            text = None
            if len(indices) > 1 and rng.random() < 0.35:
                text = affine_of_two(rng, *rng.sample(indices, 2), size)
            text = text or affine(rng, rng.choice(indices[-2:]), size)
            if text:
                return text
        scalars = [v for v in self.scope.scalars if not v.kind.type.is_float]
        if scalars and rng.random() < 0.5:
            return wrapped(rng.choice(scalars).value, size)
        return str(rng.randrange(size))

    def element(self, array):
        text = array.name + "".join(f"[{self.subscript(size)}]" for size in array.dims)
        return Var(text, array.kind, array.writable)

    def record_field(self, records):
        return field_of(records, self.subscript(records.size), self.rng.choice(records.fields))

    def objects(self, is_float, written=False):
        """A random object of integer or floating kind, or None."""
        rng, scope = self.rng, self.scope
        fits = lambda kind: kind.type.is_float == is_float
        scalars = [v for v in scope.scalars if fits(v.kind) and (v.writable or not written)]
        arrays = [a for a in scope.arrays if fits(a.kind) and (a.writable or not written)]
        makers = [lambda: rng.choice(scalars)] * (2 if scalars else 0)
        makers += [lambda: self.element(rng.choice(arrays))] * (4 if arrays else 0)
        if scope.records and not is_float:
            makers.append(lambda: self.record_field(rng.choice(scope.records)))
        return rng.choice(makers)() if makers else None

    # Integers.

    def leaf(self):
        rng = self.rng
        roll = rng.random()
        if roll < 0.15 and self.scope.indices:
            return rng.choice(self.scope.indices).value
        if roll < 0.2 and self.scope.counts:
            return rng.choice(self.scope.counts).value
        if roll < 0.38:
            return constant(rng, rng.choice(INTEGERS)) if rng.random() < 0.3 else integer(literal(rng, SAMPLE, True))
        found = self.objects(False)
        return found.value if found else integer(literal(rng, SAMPLE))

    def expression(self, depth):
        """An integer expression of at most `depth` levels."""
        rng = self.rng
        if depth <= 0 or rng.random() < 0.12:
            return self.leaf()
        roll = rng.random()
        if roll < 0.5:
            return binary(rng, rng.choice(OPERATORS), self.expression(depth - 1), self.expression(depth - 1))
        if roll < 0.6:
            return binary(rng, rng.choice("/%"), self.expression(depth - 1), fitting(rng.choice(DIVISORS)))
        if roll < 0.72:
            return self.shifted(depth)
        if roll < 0.77:
            return rng.choice((negated, complemented))(self.expression(depth - 1))
        if roll < 0.84:
            return chosen(self.condition(depth - 1), self.expression(depth - 1), self.expression(depth - 1))
        if roll < 0.88:
            return Value(f"({self.comparison(depth)})", INT, 0, 1)
        if roll < 0.94 and self.scope.helpers:
            return self.helper_call(depth)
        return cast(self.expression(depth - 1), rng.choice(CASTS))

    def shifted(self, depth):
        rng = self.rng
        value, op = self.expression(depth - 1), rng.choice(("<<", ">>"))
        bits = value.type.bits
        count = integer(rng.randrange(bits)) if rng.random() < 0.7 else counted(rng, self.leaf(), bits)
        if count.is_float:
            count = integer(1)
        return shift(op, value, count)

    def helper_call(self, depth):
        helper = self.rng.choice(self.scope.helpers)
        arguments = [coerced(self.rng, self.expression(depth - 2), k.type, k.lo, k.hi).text for k in helper.parameters]
        return Value(f"{helper.name}({', '.join(arguments)})", helper.kind.type, helper.kind.lo, helper.kind.hi)

    # Conditions.

    def comparison(self, depth):
        rng = self.rng
        if rng.random() < 0.15:
            left, right = self.floating(depth - 1), self.floating(0)
            return f"{left.text} {rng.choice(('<', '<=', '>', '>='))} {right.text}"
        left = self.expression(depth - 1)
        right = self.expression(depth - 1) if rng.random() < 0.4 else integer(literal(rng, SAMPLE, True))
        op = rng.choice(COMPARISONS)
        assert result(op, left, right)
        return f"{left.text} {op} {right.text}"

    def condition(self, depth):
        rng = self.rng
        roll = rng.random()
        if depth > 0 and roll < 0.25:
            joint = rng.choice((" && ", " || "))
            return joint.join(f"({self.condition(depth - 1)})" for _ in range(2))
        if depth > 0 and roll < 0.32:
            return f"!({self.condition(depth - 1)})"
        if roll < 0.4:
            return self.expression(max(depth - 1, 0)).text
        return self.comparison(max(depth, 1))

    # Floating point.

    def floating(self, depth):
        rng = self.rng
        if depth <= 0 or rng.random() < 0.15:
            found = self.objects(True) if rng.random() < 0.75 else None
            if found:
                return found.value
            return real(rng.randint(-64, 64) / 8.0, rng.choice((FLOAT, FLOAT, LDOUBLE)))
        roll = rng.random()
        if roll < 0.75:
            return binary(rng, rng.choice("++--***"), self.floating(depth - 1), self.floating(depth - 1))
        if roll < 0.8:
            return binary(rng, "/", self.floating(depth - 1), self.floating(depth - 1))
        if roll < 0.88:
            return negated(self.floating(depth - 1))
        if roll < 0.94:
            return chosen(self.condition(0), self.floating(depth - 1), self.floating(depth - 1))
        return cast(self.expression(depth - 2), rng.choice((FLOAT, LDOUBLE)))

    def of_kind(self, kind, depth):
        """An expression that may be stored into an object of `kind`."""
        rng = self.rng
        from_float = kind.type.is_float != (rng.random() < 0.08)
        value = self.floating(depth) if from_float else self.expression(depth)
        return coerced(rng, value, kind.type, kind.lo, kind.hi)
