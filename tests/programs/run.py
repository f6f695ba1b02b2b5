#!/usr/bin/env python3
"""Whole programs: each must print the same before and after optimization.

Every tests/programs/NAME.c is parsed and executed, and must print what the sums in expected.txt are of. It is then
optimized at every level and at both ends of the size goal, with the checker between steps, executed, and compared line
by line with the run before; what it says of loops is held against the run. What was optimized is optimized once more: an
output is a valid input, and must still print the same.

A line of expected.txt is a program, how many lines it prints, and a sum of each SECTION of these. --accept writes the
sums of what the chosen programs print unoptimized; crosscheck.py asks another compiler whether they are right.

A program may begin with comments that say how it is built:
  // parse: WORD...      words for the parser; a file name with .c is a further file of the unit, in this folder
  // optimize: WORD...   every level is taken with these words too; such a line may be repeated

With --forms SEED each program is judged once a level as another parser might have written it (forms.py), with the trees
brought into the form of loop work and back at each step that will have work there, and in two other orders of the steps.
"""
import argparse
import random
import sys
import tempfile
import zlib
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent.parent / "tools"))
from zbench import Outcome, Tools, Trouble, difference  # noqa: E402

LEVELS = ("off", "0", "1", "2", "3", "4")
SIZE_GOALS = ("0", "5")
CHECK, FRAMES = "--debug:validate", "--debug:idle_frames"
TOLD_OF_LOOPS = "--float_support=fpu32"  # where records of loops are written
EXPECTED = HERE / "expected.txt"
SECTION = 16


def sums(output):
    """The words that stand for an output: the count of its lines, then the sum of each section of them."""
    lines = output.splitlines(keepends=True)
    return [str(len(lines))] + [f"{zlib.crc32(''.join(lines[at:at + SECTION]).encode()):08x}"
                                for at in range(0, len(lines), SECTION)]


def expectations():
    """The sums by the names of programs."""
    return {name: words for name, *words in (line.split() for line in EXPECTED.read_text().splitlines())}


def unexpected(words, output):
    """None when `output` has these sums, or one line that tells where it parts from them."""
    got = sums(output)
    for at, (left, right) in enumerate(zip(words[1:], got[1:])):
        if left != right:
            return f"lines {at * SECTION + 1} to {(at + 1) * SECTION}: sum {right} instead of {left}"
    return None if got == words else f"{got[0]} lines instead of {words[0]}"


def directives(source, key):
    """The words of each `// key:` line at the head of a program."""
    for line in source.read_text().splitlines():
        if not line.startswith("//"):
            return
        if line.startswith(f"// {key}:"):
            yield line.split(":", 1)[1].split()


def parser_words(source):
    return [source.parent / word if word.endswith(".c") else word
            for words in directives(source, "parse") for word in words]


def variants(levels, more=()):
    """(name, option words) of each way a program is optimized; `more` are its own sets of words."""
    for level in levels:
        yield f"level {level}", [f"--opt_level={level}", CHECK]
    if "2" in levels:
        for goal in SIZE_GOALS:
            yield f"level 2 goal {goal}", ["--opt_level=2", f"--size_speed_goal={goal}", CHECK]
        yield "level 2 loops", ["--opt_level=2", TOLD_OF_LOOPS, CHECK]
    for words in more:
        for level in levels:
            yield f"level {level} {' '.join(words)}", [f"--opt_level={level}", *words, CHECK]


def judge_variant(tools, unit, want, name, words, rounds=("", " again")):
    """Failures of one program optimized by `words`, twice in a row. `unit` stays as it is."""
    source = unit
    for round_ in rounds:
        out = unit.with_name(f"{unit.stem}-{name.replace(' ', '-')}{round_.replace(' ', '-')}.if")
        try:
            tools.optimize(source, out, words)
            found = difference(want, tools.execute(out, ["--check"]))
        except Trouble as trouble:
            found = str(trouble)
        if found:
            return [f"{name}{round_}: {found}"]
        source = out
    return []


def parsed(tools, source, folder, words=()):
    """The unit of a program, and what it does unoptimized."""
    unit = Path(folder) / f"{source.stem}.if"
    tools.parse(source, unit, [*parser_words(source), *words])
    return unit, tools.execute(unit)


def orders(name):
    """Orders of the steps: loop work ahead of inlining; the table up to some step; loop work, or all steps, in any order."""
    rng, steps, loop_work = random.Random(name), list(range(81)), range(28, 61)
    chosen = rng.choice((steps[:rng.choice(loop_work)], steps[:28] + rng.sample(loop_work, 33) + steps[61:], rng.sample(steps, 81)))
    return [",".join(map(str, order)) for order in ([41, 13, 6, 11], chosen)]


def judge_program(tools, source, expected, levels, folder, forms=None):
    """All failures of one program, each a line of text; none when it passes."""
    try:
        unit, want = parsed(tools, source, folder, [] if forms is None else ["--seed", f"{forms} {source.stem}"])
        found = difference(Outcome(0, want.output), want) or unexpected(expected, want.output)
    except Trouble as trouble:
        found = str(trouble)
    if found:
        return [f"unoptimized: {found}"]
    failures = []
    if forms is not None:
        for level in levels:
            failures += judge_variant(tools, unit, want, f"level {level}", [f"--opt_level={level}", CHECK, FRAMES], [""])
        if "3" in levels:
            for number, order in enumerate(orders(f"{forms} {source.stem}")):
                words = ["--opt_level=3", f"--opt_passes={order}", CHECK, FRAMES]
                failures += judge_variant(tools, unit, want, f"order {number}", words, [""])
        return failures
    for name, words in variants(levels, directives(source, "optimize")):
        failures += judge_variant(tools, unit, want, name, words)
    return failures


def chosen(only, shard):
    """The programs to run: those whose name contains `only`, of these each COUNT-th from INDEX on."""
    programs = [source for source in sorted(HERE.glob("*.c")) if not only or any(word in source.stem for word in only)]
    index, count = (int(part) for part in shard.split("/"))
    return programs[index::count]


def accept(tools, programs):
    """Writes what these programs print now as what they have to."""
    known = {name: words for name, words in expectations().items() if (HERE / f"{name}.c").exists()}
    with tempfile.TemporaryDirectory() as folder:
        for source in programs:
            known[source.stem] = sums(parsed(tools, source, folder)[1].output)
    EXPECTED.write_text("".join(f"{' '.join([name, *words])}\n" for name, words in sorted(known.items())))


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    Tools.add_options(parser)
    parser.add_argument("--jobs", type=int, default=2, help="programs at the same time (2)")
    parser.add_argument("--only", action="append", metavar="NAME", help="programs whose name contains NAME; repeatable")
    parser.add_argument("--levels", default=" ".join(LEVELS), help="levels to optimize at (all)")
    parser.add_argument("--shard", default="0/1", metavar="INDEX/COUNT", help="a part of the programs, from 0/COUNT on")
    parser.add_argument("--forms", metavar="SEED", help="programs in other forms, at each level")
    parser.add_argument("--accept", action="store_true", help="write expected.txt by the programs unoptimized")
    options = parser.parse_args()
    if options.forms is not None:
        options.icparse = HERE / "forms.py"
    tools, levels = Tools.of(options), options.levels.replace(",", " ").split()
    programs = chosen(options.only, options.shard)
    if not programs:
        sys.exit("no program is chosen")
    if options.accept:
        return accept(tools, programs)
    expected = expectations()
    failed = 0
    with tempfile.TemporaryDirectory() as folder, ThreadPoolExecutor(options.jobs) as pool:
        results = pool.map(lambda source: judge_program(tools, source, expected.get(source.stem, ["0"]), levels, folder,
                                                        options.forms), programs)
        for source, failures in zip(programs, results):
            failed += bool(failures)
            for failure in failures:
                print(f"FAIL {source.stem}: {failure}", flush=True)
    print(f"{len(programs) - failed} passed, {failed} failed")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
