"""Which calls are inlined: a second statement of the rules predicts every decision on random call graphs.

A function of a graph stores to a volatile variable and calls others, a call a line, so that its size and its calls are
known here without the optimizer. Predicted are the accepted calls, the sizes, the definitions of the output and the
functions that each of them still calls.
"""
import itertools
import os
import random
import re
import tempfile
import unittest
from dataclasses import dataclass, field
from pathlib import Path

import read_functions as reader
from run import HERE, Tools, difference

DEPTH_LIMIT, MOST_NESTED, MOST_FORCED_DEEP = 10, 4000, 100000
FORCED, DEEP, NEVER = "FORCEINLINE", "FORCEINLINE_RECURSIVE", "NOINLINE"
INCLUDE = HERE.parent.parent / "tools" / "include"
PROGRAMS = [HERE / "inlining.c", HERE / "inlining_forced.c"] + [
    HERE.parent / "programs" / f"{name}.c" for name in ("function_pointers", "recursion", "side_effects", "struct_values")]
DECISION = "--opt_passes=6,10,11"  # the steps that decide and expand, for speed
CONSTANT_POINTERS = {"inlining": {"f": "pointed_to"}, "inlining_forced": {"table": "in_table"}}
WISHES = ("",) * 12 + (FORCED, DEEP, NEVER)
SIZES = (5, 6, 9, 10, 11, 19, 20, 20, 21, 21, 60, 98, 99, 100, 101)  # about the limits of the rules


@dataclass
class Call:
    callee: int
    pragma: str = ""
    line: int = 0
    fits: bool = True  # the arguments the parameters


@dataclass
class Function:
    name: str
    stores: int
    parameters: int = 1
    odd: bool = False
    old_style: bool = False
    calls: list = field(default_factory=list)
    inline: bool = False
    external: bool = False
    always: bool = False
    cannot: bool = False
    taken: bool = False  # its address is
    variadic: bool = False
    through_pointer: bool = False  # it calls

    @property
    def size(self):
        """The first parameter to its variable: 2; a store: 2, of a constant: 3; a call with it: 1; the end: 1."""
        return 2 + 2 * self.stores + 3 * self.odd + len(self.calls) + 1

    def fill(self, size):
        self.stores, self.odd = 0, False
        rest = max(size - self.size, 2)
        self.odd = rest % 2 == 1 and rest > 3
        self.stores = (rest - 3 * self.odd) // 2


@dataclass
class ReadFunction(Function):
    """One of a C program; how large it is was read elsewhere."""
    size: int = 0


def read_program(source, sizes):
    """The functions of a C program, those whose address is taken in this order, and how many have the size that a count
    of the parser's trees gives. The others are read into other trees."""
    unit = reader.unit_of([source], INCLUDE)
    bodies = [item for item in unit.items if isinstance(item, reader.FunctionBody)]
    constant = {pointer: next(s for s in unit.symbols if s.name == f"_{name}")
                for pointer, name in CONSTANT_POINTERS.get(source.stem, {}).items()}
    scans, index = [reader.Scan(body, constant) for body in bodies], {id(body.symbol): i for i, body in enumerate(bodies)}
    named = [id(s) for s in reader.initializer_names(unit)] + \
        [id(s) for scan in scans for s in scan.named if s not in constant.values()]
    anonymous = list(dict.fromkeys(index[s] for s in named if s in index))
    graph = []
    for i, (body, scan) in enumerate(zip(bodies, scans)):
        symbol = body.symbol
        type_, has = reader.T.strip(symbol.type), lambda name: reader.has_pragma(symbol, name)
        f = ReadFunction(symbol.name[1:], 0, len(body.parameters), old_style=not type_.prototype, taken=i in anonymous,
                         inline=bool(symbol.qualifier_bits & symbol.INLINE_BIT), always=has("FUNC_ALWAYS_INLINE"),
                         external=symbol.klass != symbol.STATIC, variadic=type_.variadic,
                         through_pointer=scan.through_pointer, size=sizes.get(symbol.name[1:], scan.size))
        own, wide = reader.has_its_own_frame(body, scan)
        f.cannot = has("FUNC_CANNOT_INLINE") or own or (wide and not (f.inline or f.always)) or \
            scan.never_returns or (scan.ends and not f.inline)
        f.calls = [Call(index[id(callee)], pragma, line, reader.arguments_fit(call, bodies[index[id(callee)]]))
                   for callee, pragma, line, call in scan.calls if id(callee) in index]
        graph.append(f)
    return graph, anonymous, sum(sizes.get(f.name) == scan.size for f, scan in zip(graph, scans))


def with_wishes(text, seed):
    """The text with statements of `main` forced and forbidden."""
    rng = random.Random(seed)
    lines = text.splitlines()
    for i in range(next(i for i, line in enumerate(lines) if line.startswith("int main")) + 1, len(lines) * (seed > 0)):
        if re.match(r"    (put_\w+|\w+ = \w+)\(.*\);$", lines[i]) and rng.random() < 0.4:
            lines[i] = f"_Pragma(\"{rng.choice((FORCED, DEEP, NEVER))}\") {lines[i]}"
    return "\n".join(lines)


def below_size(graph, i):
    """What expanding everything below the function brings, without cycles."""
    size = lambda j: 0 if graph[j].cannot else graph[j].size + below_size(graph, j)
    return sum(size(call.callee) for call in graph[i].calls)


def add_limits(seed, graph):
    """Functions with one site each, or two, of sizes right at a limit."""
    pick = lambda values, n=1: values[seed // n % len(values)]

    def add(size, *callees, **marks):
        f = Function(f"f{len(graph)}", 0, **marks)
        f.calls = [Call(callee) for callee in callees]
        f.fill(size - (below_size(graph + [f], len(graph)) if f.inline else 0))
        graph.append(f)
        return len(graph) - 1

    add(pick((98, 99, 100)))
    heavy, barred = add(300), add(30, cannot=True)
    add(pick((499, 500, 501)), *pick(((), (barred,)), 3), inline=True)
    add(7 * 300 + pick((10, 60, 80)), *[heavy] * 7, inline=True)
    add(pick((1999, 2000, 2001)), pick((heavy, barred), 3), inline=True)
    small = add(pick((19, 20, 21)), *pick(((), (barred,), (barred, heavy)), 3))
    add(12, small, small)


def random_graph(seed, cyclic):
    """main is the last function; without cycles a function calls those ahead of it."""
    rng = random.Random(seed)
    count = rng.randint(6, 16)
    inlines, graph = rng.choice((0.2, 0.7)), []
    for i in range(count):
        f = Function(f"f{i}", 0, rng.choice((1, 1, 2, 3)))
        f.inline = rng.random() < inlines
        f.external = not f.inline and rng.random() < 0.15
        f.always, f.cannot, f.taken = (rng.random() < p for p in (0.08, 0.08, 0.1))
        f.parameters = 1 if f.taken else f.parameters
        f.old_style = not cyclic and not f.taken and rng.random() < 0.2
        graph.append(f)
        for _ in range(rng.choice((0, 1, 1, 1, 2, 3)) if i or cyclic else 0):
            callee = rng.randrange(count if cyclic and rng.random() < 0.25 else max(i, 1))
            times = rng.choice((1, 1, 1, 2))
            f.calls += [Call(callee, rng.choice(WISHES)) for _ in range(times)]
        f.fill(rng.choice(SIZES))
    for f in graph:
        if not f.inline and rng.random() < 0.4:
            f.fill(rng.choice((98, 99, 100)) if not cyclic else 15)
    add_limits(seed, graph)
    main, reached = Function("main", 0, external=True), set()

    def reach(i):
        if i not in reached:
            reached.add(i)
            for call in graph[i].calls:
                reach(call.callee)

    for i in reversed(range(len(graph))):
        if i not in reached or (i < count and rng.random() < 0.3):
            main.calls += [Call(i, rng.choice(WISHES)) for _ in range(rng.randint(1, 2))]
            reach(i)
    return graph + [main]


@dataclass
class Options:
    level: int
    auto: int = None
    disabled: bool = False
    single: bool = False
    goal: int = None

    @property
    def words(self):
        return [f"--opt_level={self.level}"] + [f"--auto_inline={self.auto}"] * (self.auto is not None) + \
            ["--disable_inlining"] * self.disabled + ["--single_inline"] * self.single + \
            [f"--size_speed_goal={self.goal}"] * (self.goal is not None) + \
            ["--print_debug=1"] * (self.level < 3)  # without it the info file is of levels from 3 on


def all_cases():
    """Seed, graph and options; one limit is what some function comes to with all of its calls, or one less."""
    for seed in range(30):
        rng = random.Random(-seed)
        graph = random_graph(seed, seed % 4 == 3)
        source_of(graph)  # gives the calls their lines
        i = rng.randrange(len(graph) - 1)
        sites = sum(call.callee == i for f in graph for call in f.calls)
        limit = graph[i].size * (sites + rng.choice((0, 1, 2))) - rng.choice((0, 0, 1))
        others = (Options(2, 60), Options(3, 0, single=True), Options(3, None, True), Options(3, 5, single=True),
                  Options(2))
        for options in (Options(2, goal=(1, 1, 1, 2, 0)[seed % 5]), Options(3), Options(3, limit), others[seed % len(others)]):
            yield seed, graph, options


def source_of(graph):
    lines = ["volatile int port;"]
    lines += [f"#pragma {name}({f.name})" for f in graph for name, wish in
              (("FUNC_ALWAYS_INLINE", f.always), ("FUNC_CANNOT_INLINE", f.cannot)) if wish]
    def head(f):
        names = "abc"[:f.parameters]
        types = [f"int {name}" for name in names]
        listed = f"({', '.join(names)}) {'; '.join(types)};" if f.old_style else f"({', '.join(types)})"
        return ("" if f.external else "static ") + ("inline " if f.inline else "") + f"void {f.name}{listed}"

    lines += [head(f) + ";" for f in graph[:-1] if not f.old_style]
    taken = [f.name for f in graph if f.taken]
    lines += [f"void (*const table[])(int) = {{{', '.join(taken)}}};"] if taken else []
    for f in graph:
        lines.append("int main(void) {" if f.name == "main" else head(f) + " {")
        for call in f.calls:
            lines += [f"#pragma {call.pragma}"] if call.pragma else []
            arguments = ", ".join(["7" if f.name == "main" else "a"] * graph[call.callee].parameters)
            lines.append(f"    {graph[call.callee].name}({arguments});")
            call.line = len(lines)
        lines += ["    port = a;"] * f.stores + ["    port = 1;"] * f.odd + (["    return 0;"] if f.name == "main" else []) + ["}"]
    return "\n".join(lines) + "\n"


class Prediction:
    """The rules by size, as they are meant."""

    def __init__(self, graph, options, anonymous=()):
        self.graph, self.level, self.disabled, self.single = graph, options.level, options.disabled, options.single
        level, auto, self.goal = options.level, options.auto, options.goal
        self.auto = 20 if auto is None else auto
        self.anonymous = anonymous  # what a call through a pointer may reach, in the order of the uses
        everyone = range(len(graph))
        self.root = [f.external or f.taken for f in graph]  # the rest of the program is not known
        self.below = [[c.callee for c in f.calls] + list(anonymous)[::-1] * f.through_pointer for f in graph]
        self.callers = [sum(below.count(i) for below in self.below) + self.root[i] + graph[i].taken for i in everyone]
        self.order = self.number()
        self.follows = {j for i in self.order for j in self.below[i] if self.order[i] >= self.order[j]}
        self.kept = {i for i, f in enumerate(graph) if self.root[i] or f.cannot or not (level > 2 or f.inline)}
        self.left, self.inlined, self.accepted, self.suppressed = list(self.callers), set(), {}, set()
        self.told = []  # caller, line, callee, its size and the cost of each accepted call, in this order
        self.time, self.taken_in = [f.size for f in graph], []
        self.decide()
        self.integrate()

    def number(self):
        """Reverse postorder from the roots; the callee that was met last comes first."""
        def callees(i):
            return list(dict.fromkeys(self.below[i]))[::-1]

        roots = sorted((i for i in range(len(self.graph)) if self.root[i]), key=lambda i: "_" + self.graph[i].name)
        finished, seen = [], set()

        def visit(i):
            if i not in seen:
                seen.add(i)
                for j in callees(i):
                    visit(j)
                finished.append(i)

        for i in reversed(roots):
            visit(i)
        return {i: n for n, i in enumerate(reversed(finished), 1)}

    def recursive_size(self, i, count):
        if i in self.follows or self.graph[i].cannot:
            return 0
        calls = self.below[i]
        below = sum(self.recursive_size(j, calls.count(j)) for j in sorted(set(calls)) if j != i)
        return (self.graph[i].size + below) * count

    def forced(self, call):
        return call.pragma != NEVER and (call.pragma in (FORCED, DEEP) or self.graph[call.callee].always)

    def is_candidate(self, i, call):
        j, f = call.callee, self.graph[call.callee]
        if call.pragma == NEVER or f.cannot or f.variadic or not call.fits or (j in self.follows and self.order[i] >= self.order[j]):
            return False
        if self.forced(call):
            return True
        if self.disabled or (j in self.follows and not f.inline):
            return False
        only = self.callers[j] == 1 and not self.root[j] and self.auto > 0
        return f.inline or (self.level >= 3 and (f.size < self.auto or only))

    def is_worth_it(self, j):
        f, used = self.graph[j], self.root[j] or j in self.follows
        last = self.single and self.left[j] == 1 and j not in self.kept
        if self.auto == 0:
            return last
        called = set(self.below[j])
        size = f.size + sum(self.graph[k].size for k in called if k in self.inlined)
        if f.always or (size < 21 and len(called) + f.through_pointer <= 1):
            return True
        if size <= 99 and (self.level >= 3 or f.inline) and not f.external and j not in self.kept and not used and \
                self.callers[j] == 1:
            return True
        return (self.callers[j] + used) * size <= self.auto or last

    def decide(self):
        sites = [(i, call) for i in sorted(self.order, key=self.order.get) for call in reversed(self.graph[i].calls)
                 if self.is_candidate(i, call)]
        sites.sort(key=lambda site: -self.order[site[1].callee])
        most = 500 if self.goal is not None and self.goal < 2 else 2000
        for predicate in (self.forced,
                          lambda c: self.graph[c.callee].inline and self.recursive_size(c.callee, 1) < most,
                          lambda c: self.is_worth_it(c.callee)):
            for i, call in sites:
                if id(call) not in self.accepted and predicate(call):
                    f = self.graph[call.callee]
                    self.accepted[id(call)] = call
                    self.told.append((self.graph[i].name, call.line, f.name, f.size, self.cost(call)))
                    self.inlined.add(call.callee)
                    self.left[call.callee] -= 1
                    self.grow(i, call)
                    if self.left[call.callee] == 0 and call.callee not in self.kept:
                        self.suppressed.add(call.callee)

    def cost(self, call):
        f = self.graph[call.callee]
        return max(0, self.time[call.callee] - 2 - f.parameters * (3 if f.old_style else 2))

    def grow(self, i, call):
        """The caller gets longer, and with it everything that it is part of; a callee that goes takes no time."""
        j, cost = call.callee, self.cost(call)

        def add(to):
            self.time[to] += cost
            for caller, callee in self.taken_in:
                if callee == to and self.order[caller] < self.order[to]:
                    add(caller)

        if self.time[i]:
            add(i)
        if self.left[j] == 0 and j not in self.kept:
            self.time[j] = 0
        self.taken_in.append((i, j))

    def integrate(self):
        saved, work = set(self.inlined), [c.callee for c in self.accepted.values() if self.forced(c) and c.pragma == DEEP]
        seen = set(work)
        while work:
            below = {c.callee for c in self.graph[work.pop()].calls} - seen
            seen |= below
            work += sorted(below)
            saved |= {j for j in below if not self.graph[j].cannot}
        self.calls_left = {}

        nested = 0  # units of size of what came with expansions

        def expand(i, depth, deep, left):
            nonlocal nested
            for call in self.graph[i].calls:
                chosen = id(call) in self.accepted
                fits = depth == 0 or nested < (MOST_FORCED_DEEP if deep else MOST_NESTED)
                if call.callee in saved and (chosen or deep) and depth < DEPTH_LIMIT and fits:
                    nested += self.graph[call.callee].size if depth else 0
                    expand(call.callee, depth + 1, deep or (chosen and call.pragma == DEEP), left)
                else:
                    left.add(self.graph[call.callee].name)

        waiting = [i for i in self.order if i not in self.suppressed]
        for i in waiting:  # grows
            left, nested = self.calls_left.setdefault(self.graph[i].name, set()), 0
            expand(i, 0, False, left)
            waiting += [j for j in self.order if self.graph[j].name in left and j not in waiting]


class Choice(unittest.TestCase):
    def setUp(self):
        self.tools = Tools(**{name: os.environ.get(name.upper()) for name in ("zopt", "icrun", "icdump", "icparse")})
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = Path(folder.name)

    def compare_decisions(self, text, prediction, order=list):
        site = r"call from _(\w+) \(\S+:(\d+)\) to _(\w+).* \(size (\d+) sites"
        told = re.findall(rf"candidate:  {site}.* cost (\d+) temp", text)
        self.assertEqual([row[:4] for row in told], re.findall(rf"^\[accepted:  {site}", text, re.M))
        self.assertEqual(order((caller, int(line), callee, int(size), int(cost)) for caller, line, callee, size, cost in told),
                         order(prediction.told))
        self.assertEqual(set(re.findall(r"^Inlineable function will be suppressed: _(\w+)", text, re.M)),
                         {prediction.graph[i].name for i in prediction.suppressed})

    def check(self, unit, words, prediction):
        out, info = self.folder / "out.if", self.folder / "out.nfo"
        self.tools.optimize(unit, out, [*words, DECISION, "--debug:validate,inline_commentary", "--gen_opt_info=2",
                                        f"--opt_info_filename={info}"])
        text, dump = info.read_text(), self.tools.dump(out)
        self.compare_decisions(text, prediction)
        bodies = {name: set(re.findall(r"\b_(\w+)\(", body)) for name, body in
                  re.findall(r"^function _(\w+):(.*?)^ +end function", dump, re.M | re.S)}
        self.assertEqual(bodies, prediction.calls_left)
        return out

    def test_random_call_graphs(self):
        parsed = None
        source, unit = self.folder / "graph.c", self.folder / "graph.if"
        for seed, graph, options in all_cases():
            if parsed != seed:
                source.write_text(source_of(graph))
                self.tools.parse(source, unit)
                parsed = seed
            with self.subTest(seed=seed, options=options):
                out = self.check(unit, options.words, Prediction(graph, options))
                if seed % 4 != 3 and options.level == 3:
                    self.assertEqual(self.tools.execute(out).status, 0)

    def test_programs(self):
        """Whole programs, as they are and with calls that are forced and forbidden at random."""
        counted = 0
        for path in PROGRAMS:
            sizes = None
            for seed in range(3):
                source, unit, out, info = (self.folder / f"{path.stem}.{kind}" for kind in ("c", "if", "out.if", "nfo"))
                source.write_text(with_wishes(path.read_text(), seed))
                self.tools.parse(source, unit)
                for options in (Options(2), Options(3), Options(3, 45), Options(2, None, True)):
                    self.tools.optimize(unit, out, [*options.words, "--debug:inline_commentary", "--gen_opt_info=2",
                                                    f"--opt_info_filename={info}"])
                    if not sizes:
                        sizes = {name: int(size) for name, size in re.findall(
                            r"^Function _(\w+)\(\)\nIts integrable body size is (\d+)", unit.with_suffix(".odb").read_text(), re.M)}
                    graph, anonymous, equal = read_program(source, sizes)
                    counted += equal * (options == Options(3) and not seed)
                    with self.subTest(program=path.name, seed=seed, options=options):
                        self.compare_decisions(info.read_text(), Prediction(graph, options, anonymous), sorted)
        self.assertGreaterEqual(counted, 45)

    def test_each_strategy(self):
        tight = ",inline_static_limit=101,inline_small_limit=1"
        for program in ("inlining", "inlining_forced"):
            unit, out, info = (self.folder / f"{program}.{kind}" for kind in ("if", "out.if", "nfo"))
            self.tools.parse(Path(__file__).parent / f"{program}.c", unit)
            before = self.tools.execute(unit)
            for strategy, limits in itertools.product(range(1, 6), ("", tight)):
                with self.subTest(program=program, strategy=strategy, limits=limits):
                    self.tools.optimize(unit, out, ["--opt_level=3", "--gen_opt_info=2", f"--opt_info_filename={info}",
                                                    f"--debug:validate,inline_commentary,inliner={strategy}{limits}"])
                    self.assertIsNone(difference(before, self.tools.execute(out)))
                    if limits and strategy > 2:  # what was undone is checked by the optimizer itself
                        self.assertIn("too big", info.read_text())

    def test_which_definitions_stay(self):
        """What is used otherwise than by expanded calls stays; of what went nothing is left."""
        plain = "static inline int f(int a) { return a * 3 + g; }"
        for definition, use, levels in (
                (plain, "put_i32(f(2));", ""),
                (plain, "int (*p)(int) = f; put_i32(p(2) + f(3));", ""),
                (plain, "int (*p)(int) = x ? f : f; put_i32(p(2));", ""),
                (plain + " static int (*const t[])(int) = {f};", "put_i32(t[0](2));", "23"),
                (plain + " int (*t[])(int) = {f};", "put_i32(f(2)); put_i32(t[x](2));", "23"),
                (plain, "int (*volatile p)(int) = f; put_i32(p(2) + f(3));", "23"),
                (plain, "put_i32(f(2)); put_i32(kept == f);", "23"),
                (plain, 'put_i32(f(2));\n#pragma NOINLINE\nput_i32(f(3));', "23"),
                (plain.replace("static inline ", ""), "put_i32(f(2));", "23"),
                ("#pragma RETAIN(f)\n" + plain, "put_i32(f(2));", "23"),
                ("#pragma FUNC_CANNOT_INLINE(f)\n" + plain, "put_i32(f(2));", "23"),
                ("#pragma INTERRUPT(f)\nstatic void f(void) { g++; }", "", "23"),
                (plain + '\nasm(" .word _f");', "put_i32(f(2));", "23")):
            source, unit, out = (self.folder / name for name in ("kept.c", "kept.if", "kept.out.if"))
            source.write_text(f"#include <zrun.h>\nint g = 5, x; int (*kept)(int);\n{definition}\n"
                              f"int main(void) {{\n{use}\nreturn 0; }}\n")
            self.tools.parse(source, unit)
            for level in "23":
                with self.subTest(definition=definition, use=use, level=level):
                    self.tools.optimize(unit, out, [f"--opt_level={level}", "--debug:validate"])
                    self.assertIsNone(difference(self.tools.execute(unit), self.tools.execute(out)))
                    dump = self.tools.dump(out)
                    self.assertEqual("function _f:" in dump, level in levels)
                    if level not in levels:  # what remains is the symbol's own record, without the place of a body
                        self.assertRegex(dump, r"(?s)\A(?!.*\b_f\b.*\b_f\b)(?!.*\b_f: [^\n]* at 0x)")

    def test_orders_without_the_step_that_takes_suppressed_functions_out(self):
        unit, out = self.folder / "inlining.if", self.folder / "inlining.out.if"
        self.tools.parse(Path(__file__).parent / "inlining.c", unit)
        before = self.tools.execute(unit)
        for words in (["--opt_passes=6"], ["--opt_passes=11,6"], ["--debug:only=auto-inline-call-sites"],
                      ["--debug:skip=set-call-graph-order"], ["--debug:skip=pass-2-inits"]):
            with self.subTest(words=words):
                self.tools.optimize(unit, out, ["--opt_level=3", *words])
                self.assertIsNone(difference(before, self.tools.execute(out)))

    def test_calls_that_multiply_are_expanded_within_bounds(self):
        """Each function calls the next three times: to the depth that is allowed these are 3^10 bodies."""
        source, unit, out = (self.folder / name for name in ("deep.c", "deep.if", "deep.out.if"))
        source.write_text("static inline int f40(int x) { return x + 1; }\n" + "".join(
            f"static inline int f{i}(int x) {{ return x < 0 ? x : {' + '.join(f'f{i + 1}(x - {k})' for k in (7, 8, 9))}; }}\n"
            for i in reversed(range(40))) + "int main(void) { return f0(5) & 127; }\n")
        self.tools.parse(source, unit)
        self.tools.optimize(unit, out, ["--opt_level=3"])
        self.assertLess(out.stat().st_size, 4_000_000)
        self.assertIsNone(difference(self.tools.execute(unit), self.tools.execute(out)))


if __name__ == "__main__":
    unittest.main()
