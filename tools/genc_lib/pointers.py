"""Programs of pointers: several names for one object, and calls that change objects behind their names.

Each pointer to int has four ints to point to, so that any may stand for any other; those called `o` have one. What
`restrict` pointers reach, no other name does while they live. A union's members are reached through the union alone,
and every object may be looked at as characters. The values of objects stay within their kinds whatever name they are
stored by, so that no sum overflows; what characters are stored to takes any value.
"""
import random

from .scope import Kind, Var
from .types import INT, LONG
from .writer import HEAD, SMALL, WIDE, Writer

ANY_INT = Kind(INT, INT.lo, INT.hi)
ANY_LONG = Kind(LONG, LONG.lo, LONG.hi)

GLOBALS = """struct S { int a; long w; int c[4]; int *p; struct S *next; };
union U { int i[4]; long l[2]; struct { int x; long y; } s; };

{static}int ga[8], gb[8], gx, gy;
static int sx, sy, ra[8], rb[8];
static long gl, sl, la[4];
static long any[4]; /* read and written by its characters */
{static}struct S s0, s1, sa[3];
static union U u0, u1;
{static}int *gp = ga, *gq = gb + 2;
static int *tab[3] = {{ga, gb, ga + 4}}, **gpp = &gp, *one = &sx;
static struct S *sp = &s0;
static const int fixed[4] = {{3, -7, 11, 42}};
"""

SHOW = """static void show(void)
{
    int i, k;
    for (i = 0; i < 8; i++) mix(ga[i]), mix(gb[i]), mix(ra[i]), mix(rb[i]);
    for (i = 0; i < 3; i++) {
        mix(sa[i].a), mix(sa[i].w), mix(sa[i].p[1]), mix(tab[i][3]), mix(sa[i].next->a);
        for (k = 0; k < 4; k++) mix(sa[i].c[k]);
    }
    for (k = 0; k < 4; k++) mix(s0.c[k]), mix(s1.c[k]), mix(any[k]), mix(la[k]), mix(u0.i[k]), mix(u1.i[k]);
    mix(gx), mix(gy), mix(sx), mix(sy), mix(gl), mix(sl), mix(s0.a), mix(s0.w), mix(s1.a), mix(s1.w);
    mix(gp[0]), mix(gq[1]), mix(**gpp), mix(*one), mix(sp->a), mix(s0.p[2]), mix(s1.p[3]);
    put_u32(sum);
}

static void start(void)
{
    int i, k;
    for (i = 0; i < 8; i++) ga[i] = i * 7 - 20, gb[i] = 40 - i * 9, ra[i] = i * i, rb[i] = 50 - i;
    for (i = 0; i < 3; i++) {
        sa[i].a = i + 5, sa[i].w = i * 1000L, sa[i].p = ga + i, sa[i].next = i ? &sa[i - 1] : &s1;
        for (k = 0; k < 4; k++) sa[i].c[k] = i * 4 + k;
    }
    for (k = 0; k < 4; k++) any[k] = k * 70000L, la[k] = k * 300L, u0.i[k] = k + 1, u1.i[k] = 9 - k;
    s0 = sa[1];
    s1 = sa[2];
    s0.p = gb;
    s0.next = &s1;
    s1.next = &sa[0];
}
"""

NAMED = [Var(t, SMALL) for t in ("gx", "gy", "sx", "sy", "s0.a", "s1.a", "sa[1].a", "sp->a", "sp->next->a", "gp[1]", "*gp",
                                 "*gq", "gq[3]", "**gpp", "(*gpp)[2]", "*one", "*tab[1]", "tab[2][1]", "s0.c[2]",
                                 "sp->c[1]", "s0.p[1]", "sp->p[3]", "ga[2]", "ga[5]", "gb[3]")]
LONGS = [Var(t, WIDE) for t in ("gl", "sl", "s0.w", "s1.w", "sp->w", "la[1]", "la[2]")]
UNIONS = [Var(t, ANY_INT) for t in ("u0.i[0]", "u0.i[1]", "u1.i[2]")] + [Var("u0.l[0]", ANY_LONG), Var("u1.l[1]", ANY_LONG),
                                                                        Var("u0.s.x", ANY_INT), Var("u1.s.y", ANY_LONG)]
PLACES = ("gp", "gq", "tab[0]", "tab[1]", "tab[2]", "s0.p", "s1.p", "sa[2].p", "sp->p", "*gpp")  # pointers to four
FOURS = ("ga", "ga + 1", "ga + 4", "gb", "&gb[3]", "s0.c", "s1.c", "sa[1].c", "sp->c", "sp->next->c") + PLACES
STRUCTURES = ("s0", "s1", "sa[0]", "sa[1]", "sa[2]", "*sp", "*sp->next")
SINGLES = ("&gx", "&gy", "&sx", "&s0.a", "&sp->a", "gp + 2", "*gpp", "&sa[2].c[3]", "one", "tab[1] + 1")


class Body(Writer):
    """The statements of one function."""

    def __init__(self, rng, functions, portable):
        super().__init__(rng, NAMED + LONGS + UNIONS + [Var("any[1]", ANY_LONG), Var("fixed[2]", SMALL, False)])
        self.functions, self.fours, self.ones, self.cost, self.in_loop = functions, [], [], 0, 1
        self.portable = portable  # characters may be narrower than an int
        self.locals = []  # names of ints that have their address taken: what keeps a pointer never gets theirs

    def four(self):
        rng = self.rng
        return rng.choice(self.fours) if self.fours and rng.random() < 0.4 else rng.choice(FOURS)

    def single(self):
        rng = self.rng
        if self.locals and rng.random() < 0.3:
            return f"&{rng.choice(self.locals)}"
        if self.ones and rng.random() < 0.3:
            return rng.choice(self.ones)
        return rng.choice(SINGLES)

    def target(self, kinds=(SMALL, WIDE)):
        return self.rng.choice([v for v in self.scope.scalars if v.writable and v.kind in kinds])

    def declare(self):
        """Locals: pointers, and objects that they may point to."""
        rng = self.rng
        for name in ("x", "y"):
            self.put(f"int {name} = {self.value(SMALL, 1)};")
            self.scope.scalars.append(Var(name, SMALL))
            self.locals.append(name)
        for name in ("p", "q"):
            self.put(f"int *{name} = {self.four()};")
            self.fours += [name, name]
            self.scope.scalars += [Var(f"*{name}", SMALL), Var(f"{name}[{rng.randrange(4)}]", SMALL)]
        self.put(f"int *o = {self.single()};", f"struct S *t = &{rng.choice(STRUCTURES)}, v = {rng.choice(STRUCTURES)};",
                 f"int **pp = &{rng.choice(PLACES + ('p', 'q'))};", "static int kept, *last = ga;")
        self.ones += ["o", "&v.a", "&t->a"]
        self.fours += ["*pp", "v.c", "last", "v.p"]
        self.scope.scalars += [Var(t, SMALL) for t in ("*o", "t->a", "v.a", "t->next->c[2]", "v.c[1]", "**pp", "kept", "*last")]
        self.scope.scalars += [Var("t->w", WIDE), Var("v.w", WIDE)]
        # A few names come up again and again, so that they meet.
        self.scope.scalars += 5 * rng.sample([v for v in self.scope.scalars if v.kind == SMALL and v.writable], 7)
        self.scope.scalars += 3 * [Var(t, SMALL) for t in ("*p", "*q", "*o", "x")]

    # ---- Statements

    def plain(self):
        self.put(self.store(self.target((SMALL, WIDE, ANY_INT, ANY_LONG))))

    def point(self):
        rng = self.rng
        # What outlives the function never points into it.
        outliving = rng.choice(PLACES) + " = " + rng.choice(FOURS)
        self.put(rng.choice((lambda: outliving, lambda: f"p = {self.four()}", lambda: f"q = {self.four()}",
                             lambda: f"o = {self.single()}", lambda: f"pp = &{rng.choice(PLACES + ('p', 'q'))}",
                             lambda: f"gpp = &{rng.choice(('gp', 'gq', 'tab[0]', 's0.p', 'sp->p'))}",
                             lambda: f"t = &{rng.choice(STRUCTURES)}", lambda: f"sp = &{rng.choice(STRUCTURES)}",
                             lambda: f"last = {rng.choice(FOURS)}", lambda: f"one = {rng.choice(SINGLES)}",
                             lambda: f"*pp = {rng.choice(FOURS)}", lambda: f"sp = sp->next",
                             lambda: f"p = {self.test()} ? {self.four()} : {self.four()}",
                             lambda: f"q = (int *)((unsigned long){self.four()} + x % 1)",
                             lambda: f"{rng.choice(('p', 'q', 'gp'))} = (int *)(void *)(char *){rng.choice(FOURS)}",
                             lambda: f"memcpy(&{rng.choice(('p', 'q', 's0.p'))}, &{rng.choice(PLACES[:2])}, sizeof p)"))() + ";")

    def copy(self):
        rng = self.rng
        left, right = rng.choice(STRUCTURES + ("v", "*t")), rng.choice(STRUCTURES + ("v", "*t"))
        self.put(f"{left} = {right};" if rng.random() < 0.8 else f"{left} = same({right}, {self.value(SMALL, 1)});")

    def twice(self):
        """One object by two names, perhaps: what the first is known to hold must not outlive a change by the second."""
        rng, first, second, third = self.rng, *(self.target((SMALL,)) for _ in range(3))
        known = f"{first.text} = {rng.choice((str(rng.randint(-9, 9)), 'n', 'x', self.value(SMALL, 1)))};"
        if rng.random() < 0.2:
            second = first
        by_call = f"{rng.choice(('set', 'set', '(*action)'))}(&{second.text}, {self.value(SMALL, 1)});"
        between = rng.choice((lambda: self.put(self.store(second, 1)), lambda: self.put(self.store(second, 1)), self.copy,
                              self.call, lambda: self.put(by_call), lambda: self.put(f"{third.text} = {second.text};"), self.point))
        self.put(rng.choice((known, known, f"{third.text} = {first.text};")))
        between()
        self.put(rng.choice((f"{third.text} = {first.text};", f"{third.text} = {first.text};", self.store(first, 1),
                             f"if ({first.text} {rng.choice(('>', '==', '<='))} {rng.randint(-9, 9)}) {self.store(third, 1)}")))

    def characters(self):
        rng, name = self.rng, self.name("c")
        if self.portable:
            return self.plain()
        what = rng.choice(("any", "&any[1]", "&gx", "s0.c", "p", "&x", "&u0"))
        count = rng.choice((1, 2)) if what[0] != "&" or what in ("&any[1]", "&u0") else 1
        self.put("{")
        self.indent += 1
        self.put(f"char *{name} = (char *){what};")
        text = f"(int){name}[{count - 1}]"
        if rng.random() < 0.5 and "u0" not in what:
            self.put(f"{name}[{count - 1}] = (char)({self.value(SMALL, 1)});", self.store(self.target(), 1))
        self.put(f"x = {text} % 50;")
        self.indent -= 1
        self.put("}")
        return None

    def choose(self):
        def write():
            self.statement(1)

        self.braces(f"if ({self.test() if self.rng.random() < 0.7 else self.same_place()}) {{", write,
                    "}" if self.rng.random() < 0.5 else "} else {")
        if self.lines[-1].endswith("else {"):
            self.indent += 1
            self.statement(1)
            self.indent -= 1
            self.put("}")

    def same_place(self):
        return f"{self.four()} {self.rng.choice(('==', '!='))} {self.four()}"

    def walk(self):
        """Through four ints, which may be those that the body stores to by other names."""
        rng, name, end = self.rng, self.name("w"), self.name("e")
        if self.in_loop > 1:
            return self.plain()
        self.put("{")
        self.indent += 1
        start = self.four()
        self.put(f"int *{name} = {start}, *{end} = {name} + {rng.choice((2, 3, 4))};")
        self.in_loop *= 4

        def write():
            self.scope.scalars.append(Var(f"*{name}", SMALL))
            if rng.random() < 0.3:
                self.put(f"{rng.choice(('p', 'q'))} = {self.four()};")
            for _ in range(rng.choice((1, 2, 2))):
                self.put(self.store(rng.choice((Var(f"*{name}", SMALL), self.target())), 2))
            if rng.random() < 0.4:
                self.statement(1)
            self.scope.scalars.pop()

        step = rng.choice(("++", "++", " += 2", f" = {name} + 3"))
        self.braces(f"for (; {name} {'<' if '=' in step else rng.choice(('<', '!='))} {end}; {name}{step}) {{", write)
        self.in_loop //= 4
        self.indent -= 1
        self.put("}")
        return None

    def count(self):
        rng, name = self.rng, self.name("n")
        if self.in_loop > 1:
            return self.plain()
        self.put("{", f"    int {name};")
        self.indent += 1
        self.in_loop *= 4

        def write():
            p = self.four()
            element = Var(f"({p})[{name}]", SMALL)
            self.scope.scalars.append(element)
            self.put(self.store(rng.choice((element, self.target((SMALL,)))), 2))
            self.statement(1)
            self.scope.scalars.pop()

        self.braces(f"for ({name} = 0; {name} < 4; {name}++) {{", write)
        self.in_loop //= 4
        self.indent -= 1
        self.put("}")
        return None

    def call(self):
        rng = self.rng
        affordable = [f for f in self.functions if f.cost * self.in_loop < 400]
        if not affordable or rng.random() < 0.4:
            return self.put(rng.choice((lambda: f"set({self.single()}, {self.value(SMALL, 1)});",
                                        lambda: f"swap({self.single()}, {self.single()});",
                                        lambda: f"keep({rng.choice(FOURS)});",
                                        lambda: f"x = get({self.single()});", lambda: "bump();",
                                        lambda: f"aim(&{rng.choice(('p', 'q', 'gp', 's1.p'))}, {rng.choice(FOURS)});",
                                        lambda: f"(*action)({self.single()}, {self.value(SMALL, 1)});",
                                        lambda: f"x = apart(ra, rb, {self.value(SMALL, 1)});",
                                        lambda: f"blend(ra + 1, {rng.choice(('rb', 'rb + 3', 'ra + 5'))}, {self.value(SMALL, 1)});"))())
        f = rng.choice(affordable)
        self.cost += f.cost * self.in_loop
        self.put(f"x = {f.name}({self.four()}, {self.single()}, &{rng.choice(STRUCTURES)}, {self.value(SMALL, 1)});")
        return None

    def restricted(self):
        """A block whose two pointers are the only names of what they reach."""
        rng, a, b = self.rng, self.name("a"), self.name("b")
        self.put("{", f"    int *restrict {a} = ra, *restrict {b} = rb;")
        outside = self.scope.scalars
        self.scope.scalars = [Var("x", SMALL), Var("y", SMALL)] + [Var(f"{n}[{i}]", SMALL) for n in (a, b) for i in range(4)]
        self.indent += 1
        for _ in range(rng.randint(2, 4)):
            self.put(self.store(self.target((SMALL,)), 2))
        self.indent -= 1
        self.scope.scalars = outside
        self.put("}")

    def statement(self, depth=3):
        simple = (self.plain, self.twice, self.twice, self.twice, self.point, self.copy, self.call, self.characters, self.restricted)
        compound = (self.choose, self.walk, self.count) if depth > 1 else ()
        self.rng.choice(simple + compound * 2)()
        self.cost += self.in_loop


class Function:
    def __init__(self, rng, name, functions, portable):
        self.name = name
        body = Body(rng, functions, portable)
        body.put("int r = 0;")
        body.scope.scalars += [Var("n", SMALL), Var("*f", SMALL), Var("f[2]", SMALL), Var("*g", SMALL), Var("h->a", SMALL)]
        body.fours.append("f")
        body.ones.append("g")
        body.declare()
        for _ in range(rng.randint(5, 9)):
            body.statement()
        body.put("kept = x, last = gq;", "r = *p + *q + *o + x + y + v.a + t->a + **pp + kept;", "return r % 100;")
        self.cost = body.cost + 10
        self.text = "\n".join([f"static int {name}(int *f, int *g, struct S *h, int n)", "{"] + body.lines + ["}"])


def services(rng):
    """Small functions with effects that a caller must know of."""
    body = Writer(rng, [Var("k", SMALL)] + [Var(f"{n}[{i}]", SMALL) for n in "ab" for i in range(3)])

    def stores(count, names):
        targets = [Var(f"{n}[{rng.randrange(3)}]", SMALL) for n in names for _ in range(2)]
        return "\n".join("    " + body.store(rng.choice(targets), 2) for _ in range(count))

    return f"""static void set(int *o, int k) {{ *o = k; }}
static int get(const int *o) {{ return *o; }}
static void swap(int *a, int *b) {{ int k = *a; *a = *b; *b = k; }}
static void keep(int *a) {{ {rng.choice(("gp", "tab[1]", "s0.p", "*gpp"))} = a; }}
static void aim(int **a, int *b) {{ *a = b; }}
static void bump(void) {{ static int calls; calls = (calls + 1) % 50; *one = calls; gl = gl / 2 + calls; }}
static void other(int *o, int k) {{ *gp = k / 2; *o = *gq; }}
static void (*action)(int *, int) = {rng.choice(("set", "other"))};
static struct S same(struct S v, int k) {{ v.c[1] = k; v.a = v.c[2]; return v; }}
static int apart(int *restrict a, int *restrict b, int k)
{{
{stores(4, "ab")}
    return a[0] + b[0] > k ? a[1] : b[1];
}}
static void blend(int *a, int *b, int k)
{{
{stores(4, "ab")}
}}"""


class Pointers:
    def __init__(self, seed, size, portable=False):
        self.rng, self.seed, self.size, self.portable = random.Random(seed), seed, size, portable

    def text(self):
        rng, functions = self.rng, []
        for n in range(self.size):
            functions.append(Function(rng, f"work{n}", functions[:], self.portable))
        main = ["int main(void)", "{", "    int i, x = 1;", "    start();"]
        for f in functions:
            calls = [f"put_i16({f.name}({rng.choice(FOURS)}, {rng.choice(SINGLES + ('&x',))}, &{rng.choice(STRUCTURES)}, "
                     f"{rng.randint(-99, 99)}));" for _ in range(2)]
            main += [f"    {calls[0]}", "    show();", f"    for (i = 0; i < 2; i++) {calls[1]}", "    show();",
                     f"    action = {rng.choice(('set', 'other'))};", "    put_i16(x);"]
        parts = [f"/* genc --kind pointers --seed {self.seed} --size {self.size} */\n" + HEAD,
                 GLOBALS.replace("{{", "{").replace("}}", "}").replace("{static}", rng.choice(("", "static "))), SHOW,
                 services(rng), *(f.text for f in functions), "\n".join(main + ["    return 0;", "}"])]
        return "\n\n".join(parts) + "\n"
