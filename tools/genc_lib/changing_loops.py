"""Programs of loops whose steps, bounds and bases change while they run.

Each loop ends: a step is between 1 and 8 whatever it is made of, a bound is at most LIMIT, and what a body adds to a
counter goes the counter's way. So a counter stays within -24 and LIMIT + 40, a pointer is moved by one at most in an
iteration, and arrays are long enough for all of it. Elements keep to kinds so narrow that signed sums never overflow;
what is summed up is unsigned.
"""
import random

from .scope import Kind, Var
from .types import INT, LONG, UINT
from .writer import HEAD, Writer

DATA = Kind(INT, 0, 63)
STEP = Kind(INT, 1, 8)
SHORT = Kind(INT, 0, 12)  # bounds of inner loops
LIMIT = 126               # of what is compared with: two elements at most
ROOM = 512
OFFSET = 64               # of the subscripts of counters that may be negative

GLOBALS = """static int a[512], b[512], next[512];
{static}long w[512];
{static}int kg = 3, gn = 40, gs = 9, asked;
volatile int vk = 2;
static int m[16][16];
struct P {{ int x, y; }};
static struct P ps[512];
static int *tab[4] = {{a, b, a + 9, b + 64}}, *gp = a;

static int ask(int i) {{ asked = (asked + 1) & 1023; return (i & 3) + 1; }}
static int slow(int i) {{ kg = ((kg + i) & 7) + 1; gn = (gn + 7) & 63; return kg; }}
static void turn(int *k) {{ *k = (*k & 7) + 1; }}

static void start(void)
{{
    int i;
    for (i = 0; i < 512; i++) {{
        a[i] = i * 5 & 63, b[i] = (i * 3 + 7) & 63, next[i] = i % 3 + 1, w[i] = i * 11L;
        ps[i].x = (i & 7) + 1, ps[i].y = i & 63;
    }}
    for (i = 0; i < 256; i++) m[i >> 4][i & 15] = i & 63;
    kg = 3, gn = 40, gs = 9, vk = 2, gp = a;
}}

static void show(void)
{{
    int i;
    for (i = 0; i < 512; i++) mix(a[i]), mix(b[i]), mix(next[i]), mix(w[i]), mix(ps[i].x), mix(ps[i].y);
    for (i = 0; i < 256; i++) mix(m[i >> 4][i & 15]);
    mix(kg), mix(gn), mix(gs), mix(vk), mix(asked), mix(*gp);
    put_u32(sum);
}}
"""


class Counter:
    """A loop's variable: `at` is a subscript that lies in the arrays, wherever the body stands."""

    def __init__(self, name, type_, up, at):
        self.name, self.type, self.up, self.at = name, type_, up, at


class Body(Writer):
    def __init__(self, rng):
        super().__init__(rng, [Var(t, DATA) for t in ("gn", "a[3]", "b[7]", "*gp", "ps[2].y", "n", "*np", "m[3][4]")])
        self.scope.scalars += [Var(t, STEP) for t in ("k", "kg", "*kp", "next[5]")]
        self.scope.scalars += [Var(t, SHORT) for t in ("gs", "n2")]
        self.counters, self.moves_pointer, self.depth = [], False, 0

    def step(self, counter=None):
        """What is between 1 and 8, and may be another value each time it is asked for."""
        rng = self.rng
        words = ["k", "k", "kg", "*kp", "vk", "next[3]", "(k = (k & 7) + 1)", "slow(k)", "ps[k].x", "(x & 7) + 1",
                 f"({self.value(DATA, 1)} & 7) + 1", "1", "2", "3"]
        if counter:
            words += [f"next[{counter.at}]", f"ps[{counter.at}].x", f"ask((int){counter.name} & 63)"] * 2
        return rng.choice(words)

    def bound(self):
        if self.depth:
            return self.rng.choice(("n2", "n2", "gs", "7", "12", "n2 + 1", "gs - 1"))
        return self.rng.choice(("n", "n", "gn", "*np", "a[3]", "ps[2].y", "n - 1", "n + gs", "40", "63", "*gp", "n * 2"))

    # ---- Changes

    def change_step(self, counter):
        rng = self.rng
        self.put(rng.choice((f"k = {self.value(STEP, 2)};", "k++; if (k > 8) k = 1;", "kg = (kg * 2 & 7) + 1;", "turn(kp);",
                             "turn(&k);" , "vk = (vk & 7) + 1;", f"*kp = {self.value(STEP, 1)};",
                             f"next[{counter.at}] = {self.value(STEP, 1)};", f"kp = {rng.choice(('&kg', '&next[4]', 'next + 9'))};",
                             f"ps[{counter.at}].x = {self.value(STEP, 1)};")))

    def change_bound(self, _counter):
        rng = self.rng
        self.put(rng.choice((f"n = {self.value(DATA, 2)};", "if (n > 0) n--;", "if (n < 60) n += 2;", f"*np = {self.value(DATA, 1)};",
                             f"gn = {self.value(DATA, 1)};", "n2 = (n2 + 5) % 12;", "gs = n2;", "slow(n);",
                             f"np = {rng.choice(('&gn', '&a[3]', '&b[7]', '&ps[2].y', 'gp'))};")))

    def change_base(self, counter):
        rng = self.rng
        words = [f"p = tab[{counter.at} & 3];", "p = q; q = gp;", "{ int *t = tab[0]; tab[0] = tab[1]; tab[1] = t; }",
                 "gp = p == a ? b : a;", "q = tab[k & 3];", "s = &ps[k];"]
        if not self.moves_pointer and len(self.counters) == 1:
            words += ["p++;"] * 3
        word = rng.choice(words)
        self.moves_pointer |= word == "p++;"
        self.put(word)

    def change_counter(self, counter):
        if counter.at.startswith("(") or counter.type is UINT and not counter.up:
            return self.sum_up(counter)
        sign = "+" if counter.up else "-"
        return self.put(f"if ({self.test()}) {counter.name} {sign}= {self.rng.choice(('1', 'k', '2', 'next[3]'))};")

    # ---- Uses

    def elements(self, counter):
        at = counter.at
        names = [f"a[{at}]", f"b[{at}]", f"a[{at} + 1]", f"p[{at}]", f"q[{at}]", f"p[{at} + 2]", f"ps[{at}].y", f"s[{at}].y",
                 f"m[{at} & 15][k]"]
        if len(self.counters) > 1:
            outer = self.counters[0].at
            names += [f"m[{outer} & 15][{at} & 15]", f"a[{outer} + {at}]", f"p[{at}]"]
        return [Var(n, DATA) for n in names]

    def sum_up(self, counter):
        element = self.rng.choice(self.elements(counter) + [Var(f"w[{counter.at}]", None), Var(counter.name, None)])
        self.put(self.rng.choice((f"r = r * 5 + {element.text};", f"r += {element.text};", f"r ^= (unsigned long){element.text} << 3;")))

    def store_element(self, counter):
        elements = self.elements(counter)
        self.scope.scalars += elements
        if self.rng.random() < 0.2:
            self.put(f"w[{counter.at}] = w[{counter.at} + 1] / 2 + {self.rng.choice(elements).text};")
        else:
            self.put(self.store(self.rng.choice(elements), 2))
        for _ in elements:
            self.scope.scalars.pop()

    def iterate(self, counter, may_continue):
        rng = self.rng
        self.counters.append(counter)
        moved, self.moves_pointer = self.moves_pointer, self.moves_pointer or self.depth > 0
        self.indent += 1
        self.depth += 1
        plain = (self.sum_up, self.sum_up, self.store_element, self.store_element, self.change_step, self.change_bound,
                 self.change_base, self.change_counter)
        for _ in range(rng.randint(2, 5)):
            roll = rng.random()
            if roll < 0.15:
                self.braces(f"if ({self.test()}) {{", lambda: rng.choice(plain[:-1])(counter))
            elif roll < 0.2:
                self.put(f"if ({self.test()}) {rng.choice(('break', 'continue' if may_continue else 'break'))};")
            elif roll < 0.32 and self.depth < 2:
                self.loop()
            else:
                rng.choice(plain)(counter)
        self.depth -= 1
        self.indent -= 1
        self.moves_pointer = moved
        self.counters.pop()

    # ---- Loops

    def advance(self, counter):
        name, step, sign = counter.name, self.step(counter), "+" if counter.up else "-"
        words = [f"{name} {sign}= {step}"] * 3 + [f"{name} = {name} {sign} ({step})"]
        if counter.up:
            words += [f"{name} = ({step}) + {name}"]
            words += [f"{name} += {step}, k = (k & 7) + 1"]
        return self.rng.choice(words)

    def write(self, head, counter, tail="}", may_continue=True):
        self.put(head)
        self.iterate(counter, may_continue)
        self.put(tail)

    def upward(self, name, type_):
        rng, counter = self.rng, Counter(name, type_, True, name)
        start, test = rng.choice(("0", "0", "1", "3", "(k & 1)")), f"{name} {rng.choice(('<', '<', '<='))} {self.compared(type_)}"
        shape = rng.random()
        if shape < 0.5:
            self.write(f"for ({name} = {start}; {test}; {self.advance(counter)}) {{", counter)
        elif shape < 0.75:
            self.put(f"{name} = {start};")
            self.write(f"while ({test}) {{", counter, f"    {self.advance(counter)};\n{'    ' * self.indent}}}", False)
        else:
            self.put(f"{name} = {start};")
            self.write("do {", counter, f"    {self.advance(counter)};\n{'    ' * self.indent}}} while ({test});", False)

    def compared(self, type_):
        bound = self.bound()
        return bound if type_.signed else f"(unsigned int)({bound} & 127)"

    def downward(self, name, type_):
        rng = self.rng
        if not type_.signed:
            counter = Counter(name, type_, False, name)
            self.write(f"for ({name} = (unsigned int)({self.bound()} & 127); {name} > 8u; {name} -= {self.step(counter)}) {{", counter)
            return
        counter = Counter(name, type_, False, f"{name} + {OFFSET}")
        if rng.random() < 0.25:
            self.put(f"{name} = {self.bound()};")
            self.write(f"while ({name}-- > 0) {{", counter)
            return
        self.write(f"for ({name} = {self.bound()}; {name} {rng.choice(('> 0', '>= 0', '>= k'))}; {self.advance(counter)}) {{", counter)

    def far(self, name, type_):
        """Counters that wrap, that begin below zero, and that come near the end of their type."""
        rng = self.rng
        if not type_.signed:
            counter = Counter(name, type_, True, f"({name} + {rng.choice((16, 20))}u)")
            self.write(f"for ({name} = 65{rng.randint(525, 535)}u; {name} != {rng.randint(0, 9)}u; {name}++) {{", counter)
        elif type_ is INT and rng.random() < 0.5:
            counter = Counter(name, type_, True, f"({name} - 32700)")
            self.write(f"for ({name} = 327{rng.randint(10, 40)}; {name} < 327{rng.randint(45, 58)}; {name} += {self.step()}) {{", counter)
        else:
            counter = Counter(name, type_, True, f"{name} + {OFFSET}")
            self.write(f"for ({name} = -{rng.randint(3, 20)}; {name} < {self.bound()}; {self.advance(counter)}) {{", counter)

    def by_pointer(self):
        """Up to an end that comes nearer, in the array that is walked."""
        rng, name = self.rng, self.name("e")
        self.put("{", f"    int *{name}, *{name}s = {rng.choice('ab')} + 5;", f"    {name} = {name}s + ({self.bound()} + 1);")
        self.indent += 1
        kept = self.scope.scalars[:]
        self.scope.scalars.append(Var(f"*{name}s", DATA))
        self.put(f"for (; {name}s < {name}; {name}s += {self.step()}) {{")
        self.indent += 1
        for _ in range(rng.randint(1, 3)):
            self.put(rng.choice((lambda: self.store(Var(f"*{name}s", DATA)), lambda: f"r = r * 3 + *{name}s;",
                                 lambda: f"if ({name} > {name}s) {name}--;", lambda: f"r += {name}s[k];",
                                 lambda: "k = (k & 7) + 1;"))())
        self.indent -= 1
        self.scope.scalars = kept
        self.put("}")
        self.indent -= 1
        self.put("}")

    def two_counters(self):
        rng = self.rng
        self.put(f"for (i = 0, j = {rng.randint(20, 60)}; i < j; i += {self.step()}, j {rng.choice(('--', '-= k'))}) {{")
        counter = Counter("i", INT, True, "i")
        self.counters.append(Counter("j", INT, False, f"j + {OFFSET}"))
        self.scope.scalars.append(Var(f"a[j + {OFFSET}]", DATA))
        self.indent += 1
        for _ in range(rng.randint(2, 3)):
            rng.choice((self.sum_up, self.store_element, self.change_step, self.change_bound))(counter)
        self.put(f"r = r * 3 + b[j + {OFFSET}];")
        self.indent -= 1
        self.scope.scalars.pop()
        self.counters.pop()
        self.put("}")

    def loop(self):
        rng = self.rng
        if self.depth == 0:
            self.put(f"p = {rng.choice(('a', 'b', 'tab[k & 3]', 'gp'))};")
            if rng.random() < 0.25:
                return rng.choice((self.by_pointer, self.two_counters))()
        free = [n for n in ((("i", INT), ("j", INT), ("u", UINT), ("l", LONG))) if n[0] not in {c.name for c in self.counters}]
        name, type_ = rng.choice(free)
        rng.choice((self.upward, self.upward, self.upward, self.downward, self.far))(name, type_)
        return self.put(f"r = r * 3 + (unsigned long){name};")


class Function:
    def __init__(self, rng, name):
        body = Body(rng)
        body.put("int i = 0, j = 0, k = 1 + (n & 3), n2 = n & 7, x = n;", "unsigned int u = 0;", "long l = 0;",
                 "unsigned long r = 1;", "int *p = a, *q = b, *kp = &kg;", "struct P *s = ps;")
        for _ in range(rng.randint(2, 3)):
            body.loop()
        body.put("(void)i, (void)j, (void)u, (void)l, (void)p, (void)q, (void)s, (void)x;", "return r;")
        self.text = "\n".join([f"static unsigned long {name}(int n, int *np)", "{"] + body.lines + ["}"])


class ChangingLoops:
    def __init__(self, seed, size):
        self.rng, self.seed, self.size = random.Random(seed), seed, size

    def text(self):
        rng = self.rng
        functions = [Function(rng, f"loops{n}") for n in range(self.size)]
        main = ["int main(void)", "{", "    start();"]
        for n in range(self.size):
            for _ in range(2):
                main += [f"    put_u32(loops{n}({rng.choice((0, 1, 5, 20, 37, 60))}, {rng.choice(('&gn', 'a + 3', 'b', '&ps[2].y'))}));"]
            main += ["    show();", "    start();"]
        return "\n\n".join([f"/* genc --kind loops --seed {self.seed} --size {self.size} */\n" + HEAD,
                            GLOBALS.format(static=rng.choice(("", "static "))), *(f.text for f in functions),
                            "\n".join(main + ["    return 0;", "}"])]) + "\n"
