"""The target's arithmetic types as the generator sees them: rank, width, range, and the usual conversions."""
from dataclasses import dataclass


@dataclass(frozen=True)
class Type:
    name: str
    rank: int
    bits: int
    signed: bool = True
    suffix: str = ""
    is_float: bool = False

    @property
    def lo(self):
        return -(1 << (self.bits - 1)) if self.signed else 0

    @property
    def hi(self):
        return (1 << (self.bits - (1 if self.signed else 0))) - 1

    def holds(self, lo, hi):
        return self.lo <= lo and hi <= self.hi


SHORT = Type("short", 0, 16)
USHORT = Type("unsigned short", 0, 16, False)
INT = Type("int", 1, 16)
UINT = Type("unsigned int", 1, 16, False, "u")
LONG = Type("long", 2, 32, True, "L")
ULONG = Type("unsigned long", 2, 32, False, "UL")
LLONG = Type("long long", 3, 64, True, "LL")
ULLONG = Type("unsigned long long", 3, 64, False, "ULL")
FLOAT = Type("float", 10, 32, suffix="f", is_float=True)
DOUBLE = Type("double", 11, 32, is_float=True)
LDOUBLE = Type("long double", 12, 64, suffix="L", is_float=True)

SIGNED = {1: INT, 2: LONG, 3: LLONG}
UNSIGNED = {0: UINT, 1: UINT, 2: ULONG, 3: ULLONG}


def promoted(type_):
    """short and int are equally wide, so an unsigned short becomes an unsigned int."""
    return {SHORT: INT, USHORT: UINT}.get(type_, type_)


def common(left, right):
    """Every rank is wider than the one below it: the higher rank wins, and of one rank the unsigned type."""
    left, right = promoted(left), promoted(right)
    if left.rank != right.rank:
        return left if left.rank > right.rank else right
    return left if not left.signed else right
