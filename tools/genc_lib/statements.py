"""Random statements. `Body` writes one function's; `factor` is how often the statement at hand may run, at most."""
from . import idioms, loops
from .expressions import Expressions
from .scope import Index, literal
from .values import EXACT, Value, coerced, integer, result

# A statement inside loops runs at most so often in one call of its function.
MOST_RUNS = 600


class Body(Expressions):
    def __init__(self, rng, scope, returns, kernels=(), restricted=False):
        super().__init__(rng, scope)
        self.returns, self.kernels, self.restricted = returns, kernels, restricted
        self.lines, self.indent, self.factor, self.cost = [], 1, 1, 0
        # Whether `break` and `continue` would mean the loop around, and may stand there.
        self.in_loop = self.in_do = self.in_switch = False
        # Behind the outermost loop, while no loop around promises a count: where `goto` may lead, and `return` stand.
        self.out, self.labels, self.used_labels = None, 0, []
        self.declarations = []

    # Writing.

    def put(self, *lines):
        for line in lines:
            self.lines.append("" if line.startswith("#") else "    " * self.indent)
            self.lines[-1] += line.replace("\n", "\n" + "    " * self.indent)
        self.cost += 12 * self.factor

    def local(self, prefix, type_name, first=None):
        """A new variable at the head of the function."""
        name = f"{prefix}{len(self.declarations)}"
        gap, start = "" if type_name.endswith("*") else " ", "" if first is None else f" = {first}"
        self.declarations.append(f"{type_name}{gap}{name}{start};")
        return name

    def new_label(self):
        self.labels += 1
        return f"out{self.labels}"

    def block(self, depth, count):
        self.indent += 1
        for _ in range(count):
            self.statement(depth)
        self.indent -= 1

    # Choice.

    def statement(self, depth):
        rng = self.rng
        simple = (self.assignment,) * 6 + (self.compound, self.compound, self.increment, self.conditional_effect)
        nested = (self.loop,) * 4 + (idioms.sum_of_products,) * 3 + (idioms.pointer_walk, idioms.two_pointers) * 2 + (
            idioms.search, idioms.swap_loop, idioms.halving, idioms.record_pointer, idioms.recurrence, self.branch,
            self.branch, self.switch, self.call, self.volatile, idioms.fill)
        if self.in_loop and rng.random() < 0.06:
            return self.leave()
        if depth <= 0 or rng.random() < 0.45:
            return rng.choice(simple)()
        make = rng.choice(nested)
        if make.__module__.endswith("idioms"):
            return make(self, depth)
        return make(depth)

    # Simple statements.

    def target(self):
        return self.objects(self.rng.random() < 0.2, written=True) or self.objects(False, written=True)

    def assignment(self):
        place = self.target()
        self.put(f"{place.text} = {self.of_kind(place.kind, self.rng.randint(1, 3)).text};")

    def compound(self):
        """`x op= e` where that keeps x in its range."""
        rng, place = self.rng, self.target()
        if place.kind.type.is_float:
            return self.assignment()
        for _ in range(4):
            op, value = rng.choice(list(EXACT)), self.expression(2)
            found = result(op, place.value, value)
            if found and (place.kind.lo <= found[1] and found[2] <= place.kind.hi or self.wraps(place)):
                return self.put(f"{place.text} {op}= {value.text};")
        self.put(f"{place.text} = {self.of_kind(place.kind, 2).text};")

    @staticmethod
    def wraps(place):
        """Whether every value of its type is one of its range."""
        kind = place.kind
        return (kind.lo, kind.hi) == (kind.type.lo, kind.type.hi) and not place.bit_field

    def increment(self):
        place = self.target()
        if not place.kind.type.is_float and self.wraps(place) and not place.kind.type.signed:
            return self.put(self.rng.choice(("{0}++;", "++{0};", "{0}--;", "--{0};")).format(place.text))
        if not place.kind.type.is_float:
            lo, hi = place.kind.lo, place.kind.hi
            return self.put(f"if ({place.text} < {integer(hi, place.kind.type).text}) {place.text}++;") \
                if self.rng.random() < 0.5 else \
                self.put(f"if ({place.text} > {integer(lo, place.kind.type).text}) --{place.text};")
        self.assignment()

    def scalars(self):
        return [v for v in self.scope.scalars if v.writable and not v.kind.type.is_float]

    def without(self, *hidden):
        """Leaves these variables out of expressions; gives what to put back."""
        kept = self.scope.scalars
        self.scope.scalars = [v for v in kept if v not in hidden]
        return kept

    def conditional_effect(self):
        """Assignments in the arms of ?:, behind && and ||, and before a comma: sequence points keep them in order."""
        rng, own = self.rng, self.scalars()
        if len(own) < 2:
            return self.assignment()
        first, second = rng.sample(own, 2)
        store = f"{second.text} = {self.of_kind(second.kind, 2).text}"
        kept = self.without(second)
        condition = self.condition(1)
        value = coerced(rng, second.value, first.kind.type, first.kind.lo, first.kind.hi).text
        other = self.of_kind(first.kind, 1).text
        self.scope.scalars = kept
        shape = rng.randrange(4)
        if shape == 0:
            self.put(f"{first.text} = ({condition}) ? ({store}, {value}) : {other};")
        elif shape == 1:
            joint = rng.choice(("&&", "||"))
            limit = literal(rng, second.kind, True)
            self.put(f"if (({condition}) {joint} ({store}) {rng.choice(('>', '!=', '<='))} {limit}) "
                     f"{first.text} = {other};")
        elif shape == 2:
            self.put(f"{first.text} = ({store}, {value});")
        else:
            self.put(f"({condition}) ? ({store}) : ({second.text} = {self.of_kind(second.kind, 1).text});")

    def volatile(self, _depth):
        volatiles = [v for v in self.scope.arrays if v.volatile]
        if not volatiles:
            return self.assignment()
        array = self.rng.choice(volatiles)
        at = self.element(array)
        name = self.local("v", array.kind.type.name, 0)
        self.put(f"{at.text} = {self.of_kind(array.kind, 2).text};", f"{name} = {at.text};")
        target = self.target()
        value = coerced(self.rng, Value(name, array.kind.type, array.kind.lo, array.kind.hi), target.kind.type,
                        target.kind.lo, target.kind.hi)
        self.put(f"{target.text} = {value.text};")

    def leave(self):
        """An early way out of the loop around, of all of them, or of the function."""
        word = "continue" if self.rng.random() < 0.4 and not self.in_do else "break"
        if self.out and len(self.scope.indices) > 1 and self.rng.random() < 0.6:
            word = f"goto {self.out}"
            self.used_labels.append(self.out)
        elif self.out and self.rng.random() < 0.25:
            word = f"return {self.of_kind(self.returns, 1).text}"
        elif self.in_switch:
            return self.assignment()
        self.put(f"if ({self.condition(1)}) {word};")

    # Compound statements.

    def branch(self, depth):
        rng = self.rng
        self.put(f"if ({self.condition(2)}) {{")
        self.block(depth - 1, rng.randint(1, 2))
        if rng.random() < 0.5:
            self.put("} else {")
            self.block(depth - 1, rng.randint(1, 2))
        self.put("}")

    def switch(self, depth):
        rng = self.rng
        kept, self.in_switch = self.in_switch, True
        subject = self.expression(1)
        if subject.is_float or rng.random() < 0.5:
            cases = rng.sample(range(8), rng.randint(2, 6))
            self.put(f"switch ((unsigned int){subject.text} & 7u) {{")
        else:
            cases = rng.sample((-300, -5, -1, 0, 1, 2, 3, 10, 100, 255), rng.randint(2, 6))
            self.put(f"switch ((int){subject.text}) {{")
        for case in cases:
            self.put(f"case {case}:")
            self.block(min(depth - 1, 1), 1)
            if rng.random() < 0.75:
                self.put("    break;")
        if rng.random() < 0.7:
            self.put("default:")
            self.block(0, 1)
            self.put("    break;")
        self.put("}")
        self.in_switch = kept

    def free_index(self):
        busy = {index.name for index in self.scope.indices}
        return self.rng.choice([pair for pair in loops.INDEX_NAMES if pair[0] not in busy])

    def new_loop(self, most=40):
        """A loop that the budget has room for, or None."""
        rng = self.rng
        most = min(most, MOST_RUNS // self.factor)
        if most < 2 or len(self.scope.indices) >= 4:
            return None
        name, type_ = self.free_index()
        outer = [i for i in self.scope.indices if i.lo >= 0 and i.hi < most]
        if outer and rng.random() < 0.15:
            return loops.triangular_loop(rng, name, type_, rng.choice(outer))
        counts = [c for c in self.scope.counts if c.hi <= most]
        if counts and rng.random() < 0.5:
            return loops.counted_loop(rng, name, type_, rng.choice(counts), most)
        return loops.constant_loop(rng, name, type_, min(most, rng.choice((4, 8, 12, 20, 40))))

    def inside(self, loop, write, early=False):
        """Writes the loop around what `write` writes."""
        if not early:
            self.put(*loops.pragmas(self.rng, loop))
        self.put(*loop.opening)
        kept = self.factor, self.in_loop, self.in_do, self.in_switch, self.out
        outermost = early and not self.scope.indices
        if outermost:
            self.out = self.new_label()
        elif not early:
            self.out = None
        self.factor *= max(1, loop.most)
        # Where the count is at the end of the body, a `continue` would pass it by.
        self.in_loop, self.in_do, self.in_switch = early, "do {" in loop.opening, False
        self.scope.indices.append(loop.index)
        write()
        self.scope.indices.pop()
        left = outermost and self.out in self.used_labels
        label = self.out
        self.factor, self.in_loop, self.in_do, self.in_switch, self.out = kept
        self.put(loop.closing)
        if left:
            self.put(f"{label}:;")

    def loop(self, depth):
        """A loop, or a nest of two or three, each body a few statements."""
        rng, loop = self.rng, self.new_loop()
        if loop is None:
            return self.assignment()
        early = rng.random() < (0.6 if self.out else 0.2)
        nest = rng.random() < 0.5

        def write():
            if nest:
                self.indent += 1
                self.loop(depth - 1)
                self.indent -= 1
            if not nest or rng.random() < 0.4:
                self.block(depth - 1, rng.randint(1, 3))
            if early and rng.random() < 0.7:
                self.indent += 1
                self.leave()
                self.indent -= 1

        self.inside(loop, write, early)
        if rng.random() < 0.15 and not early:
            self.after(loop.index)

    def after(self, index: Index):
        """The variable's value after the loop: it is set, since each loop's head sets it."""
        target = self.target()
        bounds = Value(index.name, index.type, max(index.type.lo, index.lo - 8), index.hi + 8)
        if not index.type.signed:
            bounds = Value(index.name, index.type, 0, index.type.hi)
        value = coerced(self.rng, bounds, target.kind.type, target.kind.lo, target.kind.hi)
        self.put(f"{target.text} = {value.text};")

    def call(self, _depth):
        """Calls another kernel; what it returns goes into a variable of its own first."""
        affordable = [k for k in self.kernels if k.cost * self.factor < 20000]
        if not affordable or self.restricted:
            return self.assignment()
        kernel = self.rng.choice(affordable)
        words = kernel.arguments(self.rng)
        if words is None:
            return self.assignment()
        name = self.local("r", kernel.kind.type.name, 0)
        self.put(f"{name} = {kernel.name}({', '.join(words)});")
        self.cost += kernel.cost * self.factor
        target = self.target()
        value = Value(name, kernel.kind.type, kernel.kind.lo, kernel.kind.hi)
        self.put(f"{target.text} = {coerced(self.rng, value, target.kind.type, target.kind.lo, target.kind.hi).text};")
