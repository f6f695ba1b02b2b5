"""Random nests of loops with affine references, all within their objects: programs for the check of dependences."""
import random

OBJECTS = {"a": "int", "b": "long", "e": "long long"}
LENGTH = 4000
LOOPS = "ijl"


class Nest:
    """One function: parameters n (a bound), w (a factor), k (an offset), pointers p and q into one object."""

    def __init__(self, seed):
        r = self.random = random.Random(seed)
        self.values = {"n": r.randint(1, 9), "w": r.randint(1, 12), "k": r.randint(-3, 20)}
        self.object = r.choice("abe")
        self.start = {"p": r.randint(0, 60), "q": r.randint(0, 60)}
        self.depth = r.choice((1, 1, 2, 2, 3))
        self.loops = [self.loop(level) for level in range(self.depth)]
        self.walkers = {}
        self.references = [self.reference() for _ in range(r.randint(2, 4))]
        self.least = [None] * len(self.references)
        self.run(0, {})

    def loop(self, level):
        """(first value, condition, step): texts for C and Python alike."""
        r = self.random
        most = 40 if self.depth == 1 else 9
        step, low = r.choice((1, 1, 1, 2, 3)), r.randint(0, 4)
        high = str(low + step * r.randint(0, most))
        if r.random() < 0.4:
            high = r.choice(("n", "n + 2", "2 * n"))
        if level and r.random() < 0.4:
            high = LOOPS[level - 1] + r.choice((" + 1", "", " + 3"))
        start = LOOPS[level - 1] if level and r.random() < 0.2 else str(low)
        if r.random() < 0.3:
            return f"{high}", f">= {start}", -step
        return start, f"< {high}", step

    def reference(self):
        """(object, 16-bit parts?, subscript): `^` in it is the number that keeps the access within the object."""
        r = self.random
        name = r.choice((self.object, self.object, self.object, "p", "q", r.choice("abe")))
        if r.random() < 0.25:
            walker = f"t{len(self.walkers)}"
            self.walkers[walker] = (name, r.randrange(self.depth), r.choice((1, 1, 2, 3, -1, -2)))
            return walker, False, str(r.randint(0, 3))
        terms = [f"{r.randint(-2, 4)} * {i}" for i in LOOPS[:self.depth]]
        if r.random() < 0.3:
            terms[0] = r.choice(("w * i", "w * (i + 1)"))
        if r.random() < 0.3:
            terms.append(r.choice(("k", "n", "w")))
        text = " + ".join(terms + [str(r.randint(0, 6))])
        return name, r.random() < 0.2, text

    def run(self, level, at):
        """Finds the least and the greatest subscripts."""
        for walker, (_, ahead_of, _) in self.walkers.items():
            if ahead_of == level:
                at[walker] = 0
        if level < self.depth:
            first, condition, step = self.loops[level]
            at[LOOPS[level]] = eval(first, {}, {**self.values, **at})
            while eval(LOOPS[level] + condition, {}, {**self.values, **at}):
                self.run(level + 1, at)
                at[LOOPS[level]] += step
            return
        for n, (name, _, text) in enumerate(self.references):
            v = eval(text, {}, {**self.values, **at}) + at.get(name, 0)
            low, high = self.least[n] or (v, v)
            self.least[n] = min(low, v), max(high, v)
        for walker, (_, _, by) in self.walkers.items():
            at[walker] += by

    def access(self, n):
        name, is_narrow, text = self.references[n]
        low = 0 if name in self.walkers else (self.least[n] or (0, 0))[0]
        text += f" + {max(0, -low) + self.random.randint(0, 3)}"
        if is_narrow and name in OBJECTS:
            return f"((unsigned char *){name})[{text}]"
        return f"{name}[{text}]"

    def text(self, number):
        r = self.random
        type_ = OBJECTS[self.object]
        lines = [f"void f{number}(int n, int w, int k, {type_} *p, {type_} *q) {{", "    int i = 0, j = 0, l = 0;"]
        for walker, (name, _, _) in self.walkers.items():
            lines.append(f"    {OBJECTS.get(name, type_)} *{walker};")
        distance = self.start["q"] - self.start["p"]
        guards = ["w > 0", "n > 0", f"k >= {self.values['k'] - 2}"]
        if distance:
            far = abs(distance)
            guards += [f"(p - q >= {far}) | (q - p >= {far})", f"{'q - p' if distance > 0 else 'p - q'} >= {far}"]
        for guard in r.sample(guards, r.randint(0, 2)):
            lines.append(f"    if ({guard})")
        lines.append("    {")
        for level in range(self.depth):
            self.set_walkers(level, lines)
            first, condition, step = self.loops[level]
            i = LOOPS[level]
            lines.append(f"    for ({i} = {first}; {i} {condition}; {i} += {step}) {{")
        accesses = [self.access(n) for n in range(len(self.references))]
        half = max(1, len(accesses) // 2)
        lines.append(f"        {accesses[0]} {r.choice(('=', '=', '+='))} {' + '.join(accesses[1:half + 1])} + 1;")
        if accesses[half + 1:]:
            lines.append(f"        {accesses[-1]} = {accesses[half]} ^ i;")
        lines += [f"        {walker} += {by};" for walker, (_, _, by) in self.walkers.items()]
        return "\n".join(lines + ["    }"] * self.depth + ["    }", "}"])

    def set_walkers(self, level, lines):
        for walker, (name, ahead_of, _) in self.walkers.items():
            if ahead_of == level:
                low = min((self.least[n] or (0, 0))[0] for n, ref in enumerate(self.references) if ref[0] == walker)
                lines.append(f"    {walker} = {name} + {max(0, -low)};")

    def call(self, number):
        values = ", ".join(str(self.values[v]) for v in "nwk")
        pointers = ", ".join(f"{self.object} + {self.start[p]}" for p in "pq")
        return f"    f{number}({values}, {pointers});"


def program(seed, nests):
    """Text of a program of so many nests."""
    all_nests = [Nest(f"{seed}.{n}") for n in range(nests)]
    lines = ["#include <zrun.h>"] + [f"static {t} {o}[{LENGTH}];" for o, t in OBJECTS.items()]
    lines += [nest.text(n) for n, nest in enumerate(all_nests)]
    lines += ["int main(void) {", "    unsigned long sum = 0;", f"    for (int i = 0; i < {LENGTH}; i++)",
              "        a[i] = i * 7 % 101, b[i] = i * 5L % 211, e[i] = i;"]
    for n, nest in enumerate(all_nests):
        lines += [nest.call(n)]
    lines += [f"    for (int i = 0; i < {LENGTH}; i++) sum = sum * 31 + a[i] + b[i] * 3 + (unsigned long)e[i];",
              "    put_u32(sum);", "    return 0;", "}"]
    return "\n".join(lines) + "\n"
