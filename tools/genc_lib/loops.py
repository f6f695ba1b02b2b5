"""Loop heads whose trip counts are known to the generator, and pragmas that tell the truth about them."""
from dataclasses import dataclass

from .scope import Index
from .types import INT, LONG, UINT


@dataclass(frozen=True)
class Loop:
    index: Index
    opening: tuple  # lines before the body; the last one opens its brace
    closing: str
    least: int
    most: int
    multiple: int
    countable: bool = True  # a pragma about its trips may stand before it


def constant_loop(rng, name, type_, most):
    """A loop of fixed bounds in one of C's many spellings."""
    trips, step = rng.randint(1, most), rng.choice((1, 1, 1, 1, 2, 3))
    start = rng.choice((0, 0, 0, 1, 2, 5) if type_ is UINT else (0, 0, 0, 1, 3, -2, -7))
    last = start + (trips - 1) * step
    index = Index(name, type_, start, last)
    up = [f"for ({name} = {start}; {name} < {last + rng.randint(1, step)}; {name} += {step}) {{",
          f"for ({name} = {start}; {name} <= {last}; {name} += {step}) {{",
          f"for ({name} = {start}; {name} != {last + step}; {name} += {step}) {{"]
    down = [f"for ({name} = {last}; {name} >= {start}; {name} -= {step}) {{",
            f"for ({name} = {last}; {name} > {start - 1}; {name} -= {step}) {{",
            f"for ({name} = {last}; {name} != {start - step}; {name} -= {step}) {{"]
    if step == 1:
        up.append(f"for ({name} = {start}; {name} < {last + 1}; {name}++) {{")
        down.append(f"for ({name} = {last}; {name} >= {start}; --{name}) {{")
    signed = type_.signed
    heads = up + down if signed else up
    choice = rng.random()
    if choice < 0.1 and step == 1 and not signed:
        head = f"for ({name} = {trips}; {name}-- > 0;) {{"
        return Loop(Index(name, type_, 0, trips - 1), (head,), "}", trips, trips, trips)
    if choice < 0.25:
        # Counted at the end of the body: the body sees the values from `start` on.
        return Loop(index, (f"{name} = {start};", "do {"), f"    {name} += {step};\n}} while ({name} <= {last});",
                    trips, trips, trips, False)
    return Loop(index, (rng.choice(heads),), "}", trips, trips, trips)


def counted_loop(rng, name, type_, count, most):
    """A loop to a bound that is a parameter: up to it, or down from it. None where it may run too long."""
    if count.hi > most:
        return None
    bound = count.name if type_ is INT else f"({type_.name}){count.name}"
    index = Index(name, type_, 0, count.hi - 1)
    heads = [f"for ({name} = 0; {name} < {bound}; {name}++) {{", f"for ({name} = 0; {name} != {bound}; ++{name}) {{"]
    if type_.signed:
        heads += [f"for ({name} = {bound} - 1; {name} >= 0; {name}--) {{"]
    else:
        heads += [f"for ({name} = {bound}; {name}-- != 0;) {{"]
    if count.step > 1 and rng.random() < 0.4:
        heads = [f"for ({name} = 0; {name} < {bound}; {name} += {count.step}) {{"]
        index = Index(name, type_, 0, count.hi - count.step)
        return Loop(index, tuple(heads), "}", count.lo // count.step, count.hi // count.step, 1)
    return Loop(index, (rng.choice(heads),), "}", count.lo, count.hi, count.step)


def triangular_loop(rng, name, type_, outer):
    """An inner loop whose bound is the outer variable."""
    index = Index(name, type_, 0, outer.hi)
    if rng.random() < 0.5 or not type_.signed:
        return Loop(index, (f"for ({name} = 0; {name} <= {outer.name}; {name}++) {{",), "}", 1, outer.hi + 1, 1)
    return Loop(index, (f"for ({name} = {outer.name}; {name} >= 0; {name}--) {{",), "}", 1, outer.hi + 1, 1)


def pragmas(rng, loop):
    """Lines before the loop; what they promise holds in each run."""
    lines = []
    if loop.countable and rng.random() < 0.4:
        least = rng.choice((loop.least, loop.least, rng.randint(0, loop.least), ""))
        most = rng.choice((loop.most, loop.most, loop.most + rng.randint(0, 20), ""))
        divisors = [d for d in (1, 2, 3, 4, 8, loop.multiple) if loop.multiple % d == 0]
        multiple = rng.choice((loop.multiple, rng.choice(divisors), ""))
        if least == "" and multiple not in ("", 1) and loop.least == 0:
            least = 0  # a multiple alone would promise an iteration
        # A least count that the multiple contradicts would be no lie, but nobody writes it.
        if least == "" or multiple == "" or least % multiple == 0:
            lines.append(f"#pragma MUST_ITERATE({least}, {most}, {multiple})".replace(", , )", ")").replace(", )", ")"))
    if rng.random() < 0.12:
        lines.append(f"#pragma UNROLL({rng.choice((1, 2, 3, 4))})")
    return [line for line in lines if "()" not in line]


INDEX_NAMES = (("i", INT), ("j", INT), ("k", INT), ("m", INT), ("u", UINT), ("w", UINT), ("l", LONG))
