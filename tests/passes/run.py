#!/usr/bin/env python3
"""Pass tests: small programs whose optimized form must, and must not, show what their comments say.

  // RUN: --opt_level=2 --disable:cps     option words of the optimizer
  // FUNCTION: f                          what follows looks at this function's part of the dump
  // HAS: x = y + 3                       a line of the dump; these lines stand in this order
  // NOT: goto                            appears in no line between the lines of HAS around it
  // COUNT 2: _f(                         appears so often in the whole part
  // LEVELS: 0 3                          the program is optimized and executed at these levels, too

HAS compares a whole line without its indentation, NOT and COUNT look inside of lines; a text between slashes is a
regular expression, searched in the line by all three. Before the first FUNCTION the whole dump is looked at. Each
program is executed before and after, too, and must print the same.
"""
import argparse
import re
import sys
import tempfile
from concurrent.futures import ThreadPoolExecutor
from dataclasses import dataclass, field
from pathlib import Path

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent.parent / "tools"))
from zbench import Tools, Trouble, difference  # noqa: E402

DIRECTIVE = re.compile(r"^\s*//\s*(RUN|LEVELS|FUNCTION|HAS|NOT|COUNT\s+\d+):\s*(.*?)\s*$")

# A misspelt directive, or one that a formatter moved behind other words, must not pass for a comment.
MISPLACED = re.compile(r"//\s*[A-Z]{3,}( \d+)?:|//.*\b(RUN|LEVELS|FUNCTION|HAS|NOT|COUNT \d+):")


@dataclass(frozen=True)
class Expectation:
    kind: str  # HAS, NOT or COUNT
    text: str
    count: int
    line: int  # where it stands in the program

    def __str__(self):
        return f"line {self.line}: {self.kind}{f' {self.count}' if self.kind == 'COUNT' else ''}: {self.text}"

    @property
    def pattern(self):
        if len(self.text) > 2 and self.text[0] == self.text[-1] == "/":
            return re.compile(self.text[1:-1])
        whole = re.escape(self.text)
        return re.compile(rf"^{whole}$" if self.kind == "HAS" else whole)


@dataclass
class Section:
    """The expectations on one function, or on the whole dump when the name is empty."""
    function: str = ""
    expectations: list = field(default_factory=list)


@dataclass
class Case:
    words: list
    sections: list
    levels: list


def read_case(text):
    """The directives of a program's text; Trouble for what is no sound test."""
    words, sections, levels = None, [Section()], []
    for number, line in enumerate(text.splitlines(), 1):
        found = DIRECTIVE.match(line)
        if not found:
            if MISPLACED.search(line):
                raise Trouble(f"line {number}: no directive that is known: {line.strip()}")
            continue
        kind, argument = found.groups()
        if not argument:
            raise Trouble(f"line {number}: {kind} of nothing")
        if kind == "RUN":
            if words is not None:
                raise Trouble(f"line {number}: a second RUN")
            words = argument.split()
        elif kind == "LEVELS":
            levels += argument.split()
        elif kind == "FUNCTION":
            sections.append(Section(argument))
        else:
            count = int(kind.split()[1]) if kind.startswith("COUNT") else 0
            sections[-1].expectations.append(Expectation(kind.split()[0], argument, count, number))
    if words is None:
        raise Trouble("no RUN")
    if not any(section.expectations for section in sections):
        raise Trouble("nothing is expected")
    return Case(words, sections, levels)


def part_of(dump, function):
    """The lines of `function` in a dump, without indentation; Trouble when the dump has no such function."""
    lines = [line.strip() for line in dump.splitlines()]
    if not function:
        return lines
    start = next((i for i, line in enumerate(lines) if line.startswith(f"function _{function}:")), None)
    if start is None:
        raise Trouble(f"the output has no function {function}")
    return lines[start:lines.index("end function", start) + 1]


def check_section(lines, expectations):
    """Failures of the expectations on these lines."""
    failures = []
    position = 0  # first line behind the last HAS
    barred = []  # NOTs since then

    def check_barred(end):
        for bar in barred:
            for line in lines[position:end]:
                if bar.pattern.search(line):
                    failures.append(f"{bar}: but there is: {line}")
        barred.clear()

    for expectation in expectations:
        pattern = expectation.pattern
        if expectation.kind == "NOT":
            barred.append(expectation)
        elif expectation.kind == "COUNT":
            count = sum(len(pattern.findall(line)) for line in lines)
            if count != expectation.count:
                failures.append(f"{expectation}: found {count} times")
        else:
            found = next((i for i in range(position, len(lines)) if pattern.search(lines[i])), None)
            if found is None:
                earlier = any(pattern.search(line) for line in lines[:position])
                failures.append(f"{expectation}: {'stands too early' if earlier else 'not found'}")
                continue
            check_barred(found)
            position = found + 1
    check_barred(len(lines))
    return failures


def check_dump(dump, case):
    """Failures of a case on the dump of its output, each with the part of the dump that was searched."""
    failures = []
    for section in case.sections:
        if not section.expectations:
            continue
        try:
            lines = part_of(dump, section.function)
        except Trouble as trouble:
            failures.append(str(trouble))
            continue
        found = check_section(lines, section.expectations)
        if found:
            shown = lines if section.function else lines[:60]
            failures.append("\n".join(found + ["  where it was searched:"] + [f"    | {line}" for line in shown]))
    return failures


def judge(tools, source, folder):
    """All failures of one pass test."""
    unit, out = Path(folder) / f"{source.stem}.if", Path(folder) / f"{source.stem}.out.if"
    try:
        case = read_case(source.read_text())
        tools.parse(source, unit)
        tools.optimize(unit, out, [*case.words, "--debug:validate"])
        checks = [] if "asm" in source.read_text() else ["--check"]  # which inline assembly would end
        before, after = tools.execute(unit), tools.execute(out, checks)
        failures = check_dump(tools.dump(out), case)
        if before.status != 0:
            failures.append(f"unoptimized: status {before.status}: {before.errors.strip()}")
        for level in ["", *case.levels]:
            if level:
                tools.optimize(unit, out, [*case.words, f"--opt_level={level}", "--debug:validate"])
                after = tools.execute(out)
            found = difference(before, after)
            failures += [f"execution {level and f'at level {level}'}: {found}"] if found else []
        return failures
    except Trouble as trouble:
        return [str(trouble)]


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    Tools.add_options(parser)
    parser.add_argument("--jobs", type=int, default=2, help="tests at the same time (2)")
    parser.add_argument("--only", action="append", metavar="NAME", help="tests whose name contains NAME; repeatable")
    options = parser.parse_args()
    tools = Tools.of(options)
    sources = [path for path in sorted(HERE.glob("*.c")) if not options.only or any(w in path.stem for w in options.only)]
    if not sources:
        sys.exit("no test is chosen")
    failed = 0
    with tempfile.TemporaryDirectory() as folder, ThreadPoolExecutor(options.jobs) as pool:
        for source, failures in zip(sources, pool.map(lambda source: judge(tools, source, folder), sources)):
            failed += bool(failures)
            for failure in failures:
                print(f"FAIL {source.name}: {failure}", flush=True)
    print(f"{len(sources) - failed} passed, {failed} failed")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
