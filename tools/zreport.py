"""What the tools print of a program, read for whoever shows it: counts, functions of a dump, and their loops."""
import re
from itertools import takewhile


def counts(outcome):
    """The executor's statistics by name: a line of names and numbers in turn, then a line `number NAME` an operator."""
    found = {}
    for line in outcome.errors.splitlines():
        words = line.split()
        names, numbers = (words[::2], words[1::2]) if words and not words[0].isdigit() else (words[1::2], words[::2])
        if len(names) == len(numbers) and all(number.isdigit() for number in numbers):
            found.update(zip(names, map(int, numbers)))
    return found


def functions(dump):
    """Name and lines of each function of a dump."""
    found, name = {}, None
    for line in dump.splitlines():
        start = re.match(r"function (\S+):", line)
        if start:
            name = start.group(1)
            found[name] = []
        if name:
            found[name].append(line.rstrip())
        if line.strip() == "end function":
            name = None
    return found


class LoopList:
    """The loops of a function in its dump: where each stands in the source, its record, and what was promised of it."""

    RECORD = re.compile(r"loop (\d+) in (\d+): (\d+) to (\d+) trips, a multiple of (\d+)")
    PLACE = re.compile(r"loop (\d+) counts with (\S+),")
    PRAGMA = re.compile(r"pragma \d+ (SRC_LOOP|MUST_ITERATE)\((.*)\)")
    UNLIMITED = "4294967295"

    def __init__(self, lines):
        self.records, self.seen, self.texts, self.source, self.promise = {}, {"0"}, [], "", ""
        for line in map(str.strip, lines):
            if record := self.RECORD.match(line):
                self.records[record[1]] = record.groups()[1:]
            elif pragma := self.PRAGMA.match(line):
                self.note(pragma[1], [word.strip(' "') for word in pragma[2].split(",")])
            elif place := self.PLACE.match(line):
                self.enter(place[1], place[2])
            elif re.match(r"L\d+:", line) and not self.records:
                self.add([])

    def note(self, name, words):
        if name == "MUST_ITERATE":
            self.promise = f"MUST_ITERATE({', '.join(words)})"
        else:
            self.source = " ".join(["line", words[0], *words[3:4]])

    def enter(self, number, counter):
        if number in self.seen:
            return
        self.seen.add(number)
        outer, least, most, multiple = self.records[number]
        count = least if least == most else f"{least} or more" if most == self.UNLIMITED else f"{least} to {most}"
        parts = [f"loop {number}" + (f" in {outer}" if outer != "0" else ""), f"{count} iterations"]
        parts += [f"a multiple of {multiple}"] * (multiple != "1") + [f"counts with {counter}"] * (counter != "none")
        self.add(parts)

    def add(self, parts):
        if parts or self.source or self.promise:
            self.texts.append(", ".join(filter(None, [self.source or "no line", *parts, self.promise])))
        self.source = self.promise = ""


def apart(dump, name):
    """What the dump says behind a function of what keeps the iterations of its loops apart."""
    lines = dump.split(f"\nfunction {name}:", 1)[1].split("end function\n", 1)[-1].splitlines()
    return list(takewhile(lambda line: re.match(r"loop \d+ of line|    ", line), lines))


def loops_of(dump):
    """By function what is known of its loops, a line each."""
    return {name: [f"loop of {name}: {text}" for text in LoopList(lines).texts] + apart(dump, name)
            for name, lines in functions(dump).items()}
