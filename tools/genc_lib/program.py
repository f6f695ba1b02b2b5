"""A whole program: tables, helpers, kernels, and a main that feeds and calls them and prints sums of what they left."""
import random
from dataclasses import dataclass

from .expressions import Expressions
from .loops import INDEX_NAMES
from .scope import FLOATS, INTEGERS, KINDS, SAMPLE, Array, Count, Kind, Records, Scope, Var, literal
from .statements import Body
from .types import DOUBLE, INT, LDOUBLE, LLONG, LONG, UINT, ULLONG, ULONG
from .values import coerced, integer, real

HEAD = """#include <zrun.h>

static unsigned long seed = {seed}UL, sum;

static unsigned int draw(void)
{{
    seed = seed * 1664525UL + 1013904223UL;
    return (unsigned int)(seed >> 16);
}}

static void mix(unsigned long word)
{{
    sum = (((sum << 5) | (sum >> 27)) * 33UL) ^ word;
}}
"""

HELPERS = (  # text, name, result, parameters
    ("static int clip16(long v) { return v > 32767L ? 32767 : v < -32767L ? -32767 : (int)v; }",
     "clip16", Kind(INT, -32767, 32767), (Kind(LONG, LONG.lo, LONG.hi),)),
    ("static unsigned int turn(unsigned int x, unsigned int k)\n{\n    k &= 15u;\n"
     "    return k ? (x << k) | (x >> (16u - k)) : x;\n}",
     "turn", Kind(UINT, 0, UINT.hi), (Kind(UINT, 0, UINT.hi), Kind(UINT, 0, 99))),
    ("static long mul16(int a, int b) { return (long)a * b; }",
     "mul16", Kind(LONG, -2**30, 2**30), (Kind(INT, INT.lo, INT.hi),) * 2),
    ("static int sign(long long v) { return (v > 0) - (v < 0); }",
     "sign", Kind(INT, -1, 1), (Kind(LLONG, LLONG.lo, LLONG.hi),)),
    ("static int ones(unsigned long v)\n{\n    int n = 0;\n    while (v) {\n        v &= v - 1;\n        n++;\n    }\n"
     "    return n;\n}", "ones", Kind(INT, 0, 32), (Kind(ULONG, 0, ULONG.hi),)),
)

FIELDS = (("x", SAMPLE, 0), ("y", Kind(INT, INT.lo, INT.hi), 0), ("w", Kind(LONG, -100000, 100000), 0),
          ("u", Kind(UINT, 0, UINT.hi), 0), ("g", Kind(ULLONG, 0, ULLONG.hi), 0), ("b", Kind(INT, -16, 15), 5),
          ("c", Kind(UINT, 0, 7), 3), ("d", Kind(UINT, 0, 511), 9), ("e", Kind(INT, -64, 63), 7))


@dataclass(frozen=True)
class Helper:
    name: str
    kind: Kind
    parameters: tuple


class Kernel:
    """A function with arrays, perhaps a count, and scalars as parameters."""

    def __init__(self, program, name):
        self.program, self.name, self.cost = program, name, 0
        rng = program.rng
        self.restricted = rng.random() < 0.25
        self.kind = rng.choice(INTEGERS if rng.random() < 0.8 else FLOATS)
        self.arrays = [self.array_parameter(f"a{n}") for n in range(rng.choice((1, 2, 2, 3)))]
        self.counts = []
        if rng.random() < 0.7:
            step = rng.choice((1, 1, 2, 4))
            self.counts = [Count("n", step * rng.choice((0, 1, 1, 2)), step * rng.randint(2, 16 // step), step)]
        self.scalars = [Var(f"x{n}", rng.choice(KINDS), rng.random() < 0.5) for n in range(rng.choice((0, 1, 2)))]

    def array_parameter(self, name):
        program, rng = self.program, self.program.rng
        model = rng.choice([a for a in program.scope.arrays if len(a.dims) == 1 and not a.volatile])
        least = min(a.dims[0] for a in program.candidates(model.kind))
        return Array(name, model.kind, (least,), model.writable and rng.random() < 0.6)

    def arguments(self, rng):
        """Texts of arguments that keep what the body counts on; None where there are none."""
        words, used = [], set()
        for parameter in self.arrays:
            fitting = [a for a in self.program.candidates(parameter.kind)
                       if (a.writable or not parameter.writable) and not (self.restricted and a.name in used)]
            if not fitting:
                return None
            array = rng.choice(fitting)
            used.add(array.name)
            room = array.dims[0] - parameter.dims[0]
            offset = rng.randint(0, room) if rng.random() < 0.3 else 0
            words.append(rng.choice(("{0} + {1}", "&{0}[{1}]")).format(array.name, offset) if offset else array.name)
        words += [str(rng.randrange(c.lo, c.hi + 1, c.step)) for c in self.counts]
        words += [real(literal(rng, v.kind), v.kind.type).text if v.kind.type.is_float
                  else integer(literal(rng, v.kind), v.kind.type).text for v in self.scalars]
        return words

    def parameters(self):
        qualifier = " restrict " if self.restricted else ""
        for array in self.arrays:
            yield f"{'' if array.writable else 'const '}{array.kind.type.name} *{qualifier}{array.name}"
        for count in self.counts:
            yield f"int {count.name}"
        for var in self.scalars:
            yield f"{var.kind.type.name} {var.text}"

    def text(self, size):
        rng, shared = self.program.rng, self.program.scope
        locals_ = [Var(f"y{n}", rng.choice(KINDS)) for n in range(rng.randint(2, 4))]
        scope = Scope(scalars=self.scalars + locals_ + rng.sample(shared.scalars, min(3, len(shared.scalars))),
                      arrays=self.arrays + ([] if self.restricted else rng.sample(shared.arrays, 3)),
                      records=list(shared.records) if rng.random() < 0.5 else [], counts=self.counts,
                      helpers=shared.helpers)
        body = Body(rng, scope, self.kind, self.program.kernels, self.restricted)
        for _ in range(size):
            body.statement(3)
        result = body.of_kind(self.kind, 2).text
        self.cost = body.cost + 20
        lines = [f"static {self.kind.type.name} {self.name}({', '.join(self.parameters()) or 'void'})", "{"]
        lines += [f"    {v.kind.type.name} {v.text} = {self.program.literal(v.kind)};" for v in locals_]
        lines += [f"    {type_.name} {name};" for name, type_ in INDEX_NAMES]
        lines += [f"    {line}" for line in body.declarations]
        return "\n".join(lines + body.lines + [f"    return {result};", "}"])


class Program:
    def __init__(self, seed, size):
        self.rng, self.seed, self.size = random.Random(seed), seed, size
        self.scope, self.kernels = Scope(), []

    def literal(self, kind):
        number = literal(self.rng, kind)
        return real(number, kind.type).text if kind.type.is_float else integer(number, kind.type).text

    def candidates(self, kind):
        return [a for a in self.scope.arrays if a.kind == kind and len(a.dims) == 1 and not a.volatile]

    # Globals.

    def globals(self):
        rng, lines, number = self.rng, [], 0
        kinds = [SAMPLE, INTEGERS[1], rng.choice(INTEGERS), rng.choice(INTEGERS), rng.choice(FLOATS)]
        for kind in dict.fromkeys(kinds):
            for _ in range(rng.choice((2, 2, 3))):
                lines += self.array(f"g{number}", kind, (rng.choice((12, 16, 16, 20, 24, 32, 40)),))
                number += 1
        for kind in rng.sample(KINDS, 2):
            lines += self.array(f"g{number}", kind, (rng.choice((3, 4, 8)), rng.choice((4, 5, 8))))
            number += 1
        kind = rng.choice(INTEGERS)
        self.scope.arrays.append(Array("port", kind, (4,), True, True))
        lines.append(f"static volatile {kind.type.name} port[4];")
        for n in range(rng.randint(3, 5)):
            var = Var(f"z{n}", rng.choice(KINDS))
            self.scope.scalars.append(var)
            lines.append(f"{rng.choice(('static ', ''))}{var.kind.type.name} {var.text} = {self.literal(var.kind)};")
        return lines + self.structures()

    def array(self, name, kind, dims):
        table = self.rng.random() < 0.2
        self.scope.arrays.append(Array(name, kind, dims, not table))
        shape = "".join(f"[{d}]" for d in dims)
        if not table:
            return [f"{self.rng.choice(('static ', 'static ', ''))}{kind.type.name} {name}{shape};"]
        rows = [", ".join(self.literal(kind) for _ in range(dims[-1])) for _ in range(dims[0] if len(dims) > 1 else 1)]
        inner = ", ".join(f"{{{row}}}" for row in rows) if len(dims) > 1 else rows[0]
        return [f"static const {kind.type.name} {name}{shape} = {{{inner}}};"]

    def structures(self):
        rng = self.rng
        chosen = [row for row in FIELDS if rng.random() < 0.6] or list(FIELDS[:2])
        fields = tuple(Var(name, kind, read_as=INT if width else None, bit_field=bool(width))
                       for name, kind, width in chosen)
        size = rng.choice((4, 6, 8))
        self.scope.records.append(Records("rs", "R", fields, size))
        members = [f"    {kind.type.name} {name}{f' : {width}' if width else ''};" for name, kind, width in chosen]
        return ["", "struct R {", *members, "};", f"static struct R rs[{size}];"]

    # Functions.

    def helpers(self):
        rng, texts = self.rng, []
        for text, name, kind, parameters in rng.sample(HELPERS, 3):
            if rng.random() < 0.4:
                texts.append(f"#pragma {rng.choice(('FUNC_ALWAYS_INLINE', 'FUNC_CANNOT_INLINE'))}({name})\n{text}")
            else:
                texts.append(text)
            self.scope.helpers.append(Helper(name, kind, parameters))
        for n in range(2):
            kinds = tuple(rng.choice(INTEGERS) for _ in range(rng.randint(1, 3)))
            scope = Scope([Var(f"v{k}", kind) for k, kind in enumerate(kinds)], helpers=list(self.scope.helpers))
            kind, name = rng.choice(INTEGERS), f"f{n}"
            maker, early = Expressions(rng, scope), ""
            if rng.random() < 0.5:
                early = f"    if ({maker.condition(1)}) return {maker.of_kind(kind, 1).text};\n"
            result = coerced(rng, maker.expression(4), kind.type, kind.lo, kind.hi).text
            parameters = ", ".join(f"{k.type.name} v{i}" for i, k in enumerate(kinds))
            texts.append(f"static {kind.type.name} {name}({parameters})\n{{\n{early}    return {result};\n}}")
            self.scope.helpers.append(Helper(name, kind, kinds))
        return texts

    def kernel_texts(self):
        texts = []
        for n in range(self.size):
            kernel = Kernel(self, f"kernel{n}")
            texts.append(kernel.text(self.rng.randint(3, 6)))
            self.kernels.append(kernel)
        return texts

    # main.

    def drawn(self, kind):
        """A value of `kind` from the stream of random numbers."""
        type_ = kind.type
        if type_.is_float:
            scale = 1024.0 if kind.hi < 100 else 64.0
            return f"({type_.name})(int)draw() / {real(scale, type_).text}"
        span = kind.hi - kind.lo + 1
        if (kind.lo, kind.hi) == (type_.lo, type_.hi):
            draws = {16: "draw()", 32: "(unsigned long)draw() << 16 ^ 0x5A5AUL",
                     64: "(unsigned long long)draw() << 40 ^ 0x123456789ULL"}[type_.bits]
            return f"({type_.name})({draws})"
        if span <= 65536:
            return f"({type_.name})(draw() % {span}u)" + (f" - {-kind.lo}" if kind.lo else "")
        return f"({type_.name})((unsigned long)draw() * {min(span // 65536, 65535)}UL) + {integer(kind.lo, type_).text}"

    def folded(self, text, kind):
        """A statement that brings a value into the sum."""
        if kind.type is LDOUBLE:
            return f"mix((unsigned long)(long)({text} * 4096.0));"
        if kind.type.is_float:
            return f"mix((unsigned long)(long)({text} * {'4096.0f' if kind.type is not DOUBLE else '4096.0'}));"
        if kind.type.bits == 64:
            return f"mix((unsigned long)({text} >> 32)); mix((unsigned long){text});"
        return f"mix((unsigned long){text});"

    @staticmethod
    def printed(text, kind):
        if kind.type.is_float:
            return f"put_f64({text});" if kind.type is LDOUBLE else f"put_f32({text});"
        if kind.type.bits == 64:
            return f"put_i64((long long){text});"
        return f"put_i32((long){text});" if kind.type.signed else f"put_u32((unsigned long){text});"

    @staticmethod
    def over(array, statement):
        """A statement for each element."""
        at = "".join(f"[{name}]" for name in "ij"[:len(array.dims)])
        heads = " ".join(f"for ({name} = 0; {name} < {size}; {name}++)" for name, size in zip("ij", array.dims))
        return f"    {heads} {{ {statement(f'{array.name}{at}')} }}"

    def main(self):
        rng = self.rng
        written = [a for a in self.scope.arrays if a.writable]
        lines = ["static void feed(void)", "{", "    int i, j;"]
        lines += [self.over(a, lambda at, a=a: f"{at} = {self.drawn(a.kind)};") for a in written]
        lines += [f"    for (i = 0; i < {r.size}; i++) {{ "
                  + " ".join(f"{r.name}[i].{v.text} = {self.drawn(v.kind)};" for v in r.fields) + " }"
                  for r in self.scope.records]
        lines += ["    j = 0;", "    (void)j;", "}", "", "static void show(void)", "{", "    int i, j;"]
        lines += [self.over(a, lambda at, a=a: self.folded(at, a.kind)) for a in written]
        lines += [f"    for (i = 0; i < {r.size}; i++) {{ "
                  + " ".join(self.folded(f"{r.name}[i].{v.text}", v.kind) for v in r.fields) + " }"
                  for r in self.scope.records]
        lines += [f"    {self.folded(v.text, v.kind)}" for v in self.scope.scalars]
        lines += ["    j = 0;", "    (void)j;", "    put_u32(sum);", "}", "", "int main(void)", "{", "    feed();"]
        for kernel in self.kernels:
            for _ in range(rng.choice((1, 1, 2))):
                words = kernel.arguments(rng)
                if words is not None:
                    call = f"{kernel.name}({', '.join(words)})"
                    lines += [f"    {self.printed(call, kernel.kind)}", "    show();"]
        return "\n".join(lines + ["    return 0;", "}"])

    def text(self):
        head = HEAD.format(seed=self.rng.randrange(2**32))
        parts = [f"/* genc --seed {self.seed} --size {self.size} */\n" + head, "\n".join(self.globals())]
        parts += self.helpers() + self.kernel_texts() + [self.main()]
        return "\n\n".join(parts) + "\n"
