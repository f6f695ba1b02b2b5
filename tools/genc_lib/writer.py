"""What the small generators share: lines of a function, expressions over a scope, sums of what is left in objects."""
from .expressions import Expressions
from .scope import Kind, Scope
from .types import INT, LONG
from .values import coerced

HEAD = """#include <string.h>
#include <zrun.h>

static unsigned long sum;

static void mix(long word)
{
    sum = (((sum << 5) | (sum >> 27)) * 33UL) ^ (unsigned long)word;
}
"""
SMALL = Kind(INT, -99, 99)
WIDE = Kind(LONG, -100000, 100000)
PLAIN = ("gx", "gy", "sx", "sy")  # variables of one kind


class Writer(Expressions):
    """Lines at an indentation; `scope.scalars` holds whatever may be read or stored to at the place."""

    def __init__(self, rng, scalars=(), indices=()):
        super().__init__(rng, Scope(scalars=list(scalars), indices=list(indices)))
        self.lines, self.indent, self.names = [], 1, 0

    def put(self, *lines):
        self.lines += ["    " * self.indent + line for line in lines]

    def name(self, letter):
        self.names += 1
        return f"{letter}{self.names}"

    def value(self, kind, depth=2):
        """Text of an integer expression that an object of `kind` may hold."""
        return coerced(self.rng, self.expression(depth), kind.type, kind.lo, kind.hi).text

    def test(self):
        return self.condition(1)

    def store(self, var, depth=2):
        """An assignment of some form to `var`, after which the object keeps to its kind."""
        rng, text = self.rng, var.text
        if rng.random() < 0.25 and var.kind.lo <= 0:
            return rng.choice((f"{text} /= {rng.randint(2, 5)};", f"{text} %= {rng.randint(5, 50)};", f"{text} >>= 1;",
                               f"if ({text} < {var.kind.hi}) ({text})++;", f"if ({text} > {var.kind.lo}) {text} -= 1;",
                               f"{text} &= 63;"))
        if text in PLAIN and rng.random() < 0.3:  # by a nested assignment, to another object for certain
            return f"{text} = {rng.choice([n for n in PLAIN if n != text])} = {self.value(var.kind, depth)};"
        return f"{text} = {self.value(var.kind, depth)};"

    def braces(self, head, write, tail="}"):
        self.put(head)
        self.indent += 1
        write()
        self.indent -= 1
        self.put(tail)
