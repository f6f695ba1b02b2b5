"""Programs of loops that count: all comparisons, steps of either sign, counters of three types, 0 to 9 iterations.

What a loop is compared with is a constant or follows from a parameter, so that the generator knows how often it iterates
for each call: the pragmas in front of some loops tell the truth. Others are left early, by what is in an array.
"""
import random
from dataclasses import dataclass
from math import gcd

from .writer import HEAD

MOST = 9
BITS = {"int": 16, "unsigned int": 16, "long": 32}
COMPARE = {"<": lambda a, b: a < b, "<=": lambda a, b: a <= b, ">": lambda a, b: a > b, ">=": lambda a, b: a >= b,
           "!=": lambda a, b: a != b}
# What a limit is made of `{v}`, a parameter or the counter of the loop around.
FORMS = [("{v}", lambda v: v), ("{v} + 3", lambda v: v + 3), ("{v} - 2", lambda v: v - 2), ("2 * {v}", lambda v: 2 * v),
         ("({v} & 7)", lambda v: v & 7), ("4 * ({v} & 3)", lambda v: 4 * (v & 3)), ("({v} & 1) * 6 + 1", lambda v: (v & 1) * 6 + 1)]


def wraps(value, type_):
    """The value as the type holds it; None where a signed sum overflows."""
    low = 0 if type_.startswith("unsigned") else -(1 << (BITS[type_] - 1))
    if low == 0:
        return value % (1 << BITS[type_])
    return value if low <= value < -low else None


@dataclass(frozen=True)
class Head:
    """A counter from `start`, compared with `form` of a variable, or with a constant where that is None."""
    name: str
    type: str
    start: int
    compare: str
    step: int
    form: object
    limit: int
    tested_last: bool

    def values(self, variable):
        """What the counter is in each iteration; None for too many, or where something overflows."""
        limit = self.limit if self.form is None else wraps(self.form[1](variable), self.type)
        at, seen = self.start, []
        if limit is None:
            return None
        while (self.tested_last and not seen) or COMPARE[self.compare](at, limit):
            seen.append(at)
            at = wraps(at + self.step, self.type)
            if at is None or len(seen) > MOST:
                return None
        return seen

    def suffix(self):
        return {"int": "", "unsigned int": "u", "long": "L"}[self.type]

    def test(self, variable):
        limit = f"{self.limit}{self.suffix()}" if self.form is None else f"({self.type})({self.form[0].format(v=variable)})"
        return f"{self.name} {self.compare} {limit}"

    def advance(self, rng):
        size, sign = abs(self.step), "+" if self.step > 0 else "-"
        words = [f"{self.name} {sign}= {size}", f"{self.name} = {self.name} {sign} {size}"]
        return rng.choice(words + [f"{self.name}{sign}{sign}"] * 3 if size == 1 else words)


class Function:
    """One function with a loop, and perhaps one in that; it is called with each of `calls`."""

    def __init__(self, rng, name):
        self.rng, self.lines = rng, []
        self.calls = sorted(rng.sample(range(-12, 40), rng.randint(1, 4)))
        outer = self.head("i", "n", self.calls)
        self.put(1, "int n2 = n, c = 0;", "long s = 0;", *(f"{t} {v};" for v, t in (("i", outer.type), ("j", "int"))), "(void)n2, (void)j;")
        self.loop(outer, "n", self.calls, 1)
        self.put(1, "mix(c), mix((long)i);", "return s;")
        self.text = "\n".join([f"static long {name}(int n)", "{", *self.lines, "}"])
        self.name = name

    def put(self, depth, *lines):
        self.lines += ["    " * depth + line for line in lines]

    def head(self, name, variable, entries, types=tuple(BITS)):
        """A head that iterates 0 to 9 times for each value of the variable at its entries."""
        rng = self.rng
        for _ in range(4000):
            type_ = rng.choice(types)
            step = rng.choice((1, 1, 1, -1, -1, 2, 3, 4, 5, 6, 7, -2, -3, -5, -7))
            start = rng.choice((0, 0, 0, 1, 5, rng.randint(-30, 40), rng.randint(-60, 120)))
            if rng.random() < 0.1:
                start = {"int": rng.randint(32700, 32767), "unsigned int": rng.randint(65500, 65535), "long": rng.randint(99990, 100030)}[type_]
            start = wraps(start, type_)
            form = rng.choice(FORMS) if rng.random() < 0.65 else None
            limit = wraps(start + step * rng.randint(0, MOST) + rng.choice((0, 0, 0, 1, -1)), type_)
            compare = rng.choice(list(COMPARE) if step > 0 else [">", ">=", "!=", ">", ">=", "<"])
            if limit is None:
                continue
            head = Head(name, type_, start, compare, step, form, limit, rng.random() < 0.3)
            runs = [head.values(v) for v in entries]
            # Heads that never iterate are rare enough.
            if None not in runs and (any(runs) or rng.random() < 0.02):
                return head
        return Head(name, "int", 0, "<", 1, None, 4, False)

    def pragma(self, counts):
        """What is true of these counts, and not always all of it."""
        rng, least, most, multiple = self.rng, min(counts), max(counts), gcd(*counts)
        words = [rng.choice((least, least, max(least - 2, 0))), rng.choice((most, most, most + 3, "")), rng.choice((multiple, multiple, ""))]
        if words[2] in (0, 1):
            words[2] = ""
        if words[2] and words[0] % words[2]:
            words[0] = least
        return f"#pragma MUST_ITERATE({', '.join(map(str, words))})".replace(", , )", ")").replace(", )", ")")

    def loop(self, head, variable, entries, depth):
        rng = self.rng
        runs = [head.values(v) for v in entries]
        leaves_early = rng.random() < 0.25
        test, advance = head.test(variable), head.advance(rng)
        shape = "do" if head.tested_last else rng.choice(("for", "for", "for", "while", "endless"))
        promise = [self.pragma([len(run) for run in runs])] if not leaves_early and shape != "endless" and rng.random() < 0.5 else []
        if shape == "for":
            self.put(depth, *promise, f"for ({head.name} = {head.start}{head.suffix()}; {test}; {advance}) {{")
        else:
            opening = {"do": "do {", "while": f"while ({test}) {{", "endless": "for (;;) {"}[shape]
            self.put(depth, f"{head.name} = {head.start}{head.suffix()};", *promise, opening)
        if shape == "endless":
            self.put(depth + 1, f"if (!({test})) break;")
        self.body(head, sorted({v for run in runs for v in run}), depth + 1, leaves_early, shape == "for")
        if shape != "for":
            self.put(depth + 1, f"{advance};")
        self.put(depth, f"}} while ({test});" if shape == "do" else "}")

    def body(self, head, values, depth, leaves_early, may_continue):
        rng, at = self.rng, f"{head.name} & 15"
        plain = (f"s += a[{at}];", "c++;", f"a[({at}) ^ 3] += c & 3;", f"s ^= (long){head.name};", f"if (a[{at}] & 2) s -= c;",
                 f"b[c & 15] = a[{at}];")
        self.put(depth, *rng.sample(plain, rng.randint(1, 3)))
        if may_continue and rng.random() < 0.15:
            self.put(depth, f"if (a[{at}] & 4) continue;")
        if leaves_early:
            # A return from an inner loop would leave the outer one, whose count may be told.
            leaves = rng.choice(("break;", "break;", "return s + c;") if depth == 2 else ("break;",))
            self.put(depth, f"if (a[c & 15] {rng.choice(('== 5', '> 40', '== c'))}) {leaves}")
        if depth == 2 and rng.random() < 0.45:
            variable, entries = ("n2", self.calls) if rng.random() < 0.4 or head.type != "int" or not values else (head.name, values)
            self.loop(self.head("j", variable, entries, ("int",)), variable, entries, depth)
            self.put(depth, "s += j;")
        if rng.random() < 0.5:
            self.put(depth, "c += 2;")


class CountedLoops:
    def __init__(self, seed, size):
        self.rng, self.seed, self.size = random.Random(seed), seed, size

    def text(self):
        functions = [Function(self.rng, f"count{n}") for n in range(2 * self.size)]
        main = ["int main(void)", "{", "    int k;", "    for (k = 0; k < 16; k++) a[k] = k * 7 & 15;"]
        main += [f"    put_i32({f.name}({call}));" for f in functions for call in f.calls]
        main += ["    for (k = 0; k < 16; k++) mix(a[k]), mix(b[k]);", "    put_u32(sum);", "    return 0;", "}"]
        return "\n\n".join([f"/* genc --kind counts --seed {self.seed} --size {self.size} */\n" + HEAD, "static int a[16], b[16];",
                            *(f.text for f in functions), "\n".join(main)]) + "\n"
