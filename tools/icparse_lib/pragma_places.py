"""Pragmas that the parser library cannot take: unknown ones, and those within a declaration or an expression.

The operator `_Pragma` may stand between any two tokens; the library takes pragmas between statements, declarations and
members only. An unknown pragma is dropped, with a warning. A known one that stands elsewhere is moved in front of the
statement or declaration that it is part of.
"""
import re

from . import pragmas
from .errors import Position

LINE_MARKER = re.compile(r'#\s*(?:line\s+)?(\d+)\s+"((?:\\.|[^"\\])*)"')
PRAGMA = re.compile(r"#\s*pragma\b\s*(\w*)")
KNOWN = {*pragmas.KINDS, *pragmas.LOOP, *pragmas.STATEMENT, *pragmas.SYMBOL, "ASM_TEXT", "INTERRUPT_NEXT"}
TOKEN = re.compile(r'"(?:\\.|[^"\\\n])*"|\'(?:\\.|[^\'\\\n])*\'|^\#[^\n]*|\w+|\n|[^\s\w]', re.M)
CONTROLS = {"if", "for", "while", "switch"}


class _Places:
    """Reads tokens and knows whether a statement, a declaration or a member may begin behind the last one."""

    def __init__(self):
        self.open = []     # (bracket, whether a block or the parentheses of a control statement)
        self.begins = True
        self.choices = 0   # "?" whose ":" is still to come
        self.before = [""] * 2  # the last two words
        self.start = 0, 1, ""   # offset, line and file behind the token that the current statement follows

    def take(self, word, end, line, file):
        last, inside = self.before[-1], self.open[-1] if self.open else ("{", True)
        self.begins = False
        if word in "([":
            self.open.append((word, word == "(" and last in CONTROLS))
        elif word == "{":
            is_list = last in ("=", ",", "(", "[") or (last == "{" and not inside[1]) or "enum" in self.before
            self.open.append((word, not is_list))
            self.begins = not is_list
        elif word in ")]}" and self.open:
            _, self.begins = self.open.pop()
        elif word == ";":
            self.begins = inside == ("{", True)
        elif word == "?":
            self.choices += 1
        elif word == ":" and self.choices:
            self.choices -= 1
        elif word in (":", "else", "do"):
            self.begins = True
        if self.begins and word in ";{}":
            self.start = end, line, file
        self.before = [last, word]


def settle(text, warn):
    """The text with each pragma where the parser library takes it. Other tokens keep their lines."""
    places, line, file, ahead, cuts = _Places(), 1, "", {}, []
    for token in TOKEN.finditer(text):
        word = token[0]
        if word == "\n":
            line += 1
        elif word[0] != "#":
            places.take(word, token.end(), line, file)
        elif found := PRAGMA.match(word):
            if found[1] not in KNOWN:
                warn(Position(file, line, found.start(1) + 1), f"the pragma '{found[1]}' is not known here and is ignored")
            elif places.begins:
                continue
            else:
                place, place_line, place_file = places.start
                ahead.setdefault(place, [place_line, place_file, ""])[2] += f'\n# {line} "{file}"\n{word}'
            cuts.append((token.start(), token.end(), ""))
        elif marker := LINE_MARKER.match(word):
            line, file = int(marker[1]) - 1, marker[2]
    cuts += [(place, place, f'{lines}\n# {line} "{file}"\n') for place, (line, file, lines) in ahead.items()]
    out, last = [], 0
    for start, end, instead in sorted(cuts):
        out += [text[last:start], instead]
        last = end
    return "".join(out) + text[last:]
