"""Pragmas of the source: those of a symbol wait for its name, those of a loop for the next loop."""
import re

from .errors import CompileError
from .model import Symbol, read_rows

_ROW = re.compile(r'(\d+), "(.*)"')
KINDS = {name: int(kind) for kind, name in (_ROW.match(row).groups()
                                            for row in read_rows("IFILE/pragma_names.def", "PRAGMA_NAME"))}

# Loop pragmas and the number of their arguments; a missing one is an empty text.
LOOP = {"UNROLL": 1, "UNROLL_AMOUNT": 1, "MUST_ITERATE": 3, "PROB_ITERATE": 2, "LOOP_FLAGS": 1, "LOOP_NO_ALIAS": 0,
        "NO_ALIAS_CLONE": 0, "PARALLEL_LOOP": 0, "MMA_LOOP": 0, "COALESCE_LOOP": 0, "NO_COALESCE_LOOP": 0, "NO_NLC": 0}
# Pragmas that inside a function speak of the calls in the next statement.
STATEMENT = {"FORCEINLINE", "FORCEINLINE_RECURSIVE", "NOINLINE"}
# Pragmas whose first argument names a symbol. INTERRUPT is a mark of the symbol and has no record of its own.
SYMBOL = {name for name in KINDS if name.startswith(("FUNC_", "DATA_", "SYM_", "FORCEINLINE", "NOINLINE"))} | {
    "QZ_WEAK", "CODE_SECTION", "INTERRUPT", "WEAK", "RETAIN"}
# Pragmas by which the source names kinds that the table knows under another name, or that have a meaning here alone.
ALIASES = {"WEAK": "QZ_WEAK", "RETAIN": "SYM_IS_REFERENCED"}

SCOPING_FUNC, NEVER_RETURNS, SRC_LOOP = (KINDS[n] for n in ("SCOPING_FUNC", "FUNC_NEVER_RETURNS", "SRC_LOOP"))


def split(text):
    """Name and argument texts of `NAME(a, b)` or `NAME a`."""
    found = re.match(r"\s*(\w+)\s*(.*)$", text, re.S)
    if not found:
        return "", []
    rest = found[2].strip()
    if rest.startswith("(") and rest.endswith(")"):
        rest = rest[1:-1]
    return found[1], [a.strip() for a in rest.split(",")] if rest.strip() else []


def loop_pragma(name, arguments, where):
    """(kind, texts) of a loop pragma."""
    wanted = LOOP[name]
    if len(arguments) > wanted:
        raise CompileError(where, f"#pragma {name} takes {wanted} arguments")
    values = []
    for argument in arguments:
        try:
            values.append(str(int(argument.strip("()uUlL"), 0)) if argument else "")
        except ValueError:
            raise CompileError(where, f"#pragma {name}: '{argument}' is not an integer") from None
    return KINDS[name], values + [""] * (wanted - len(values))


class SymbolPragmas:
    """Pragmas by symbol name, put on the symbols when the file has ended."""

    def __init__(self):
        self.waiting = []  # (name, symbol name, arguments, position)

    def add(self, name, arguments, where):
        if not arguments:
            raise CompileError(where, f"#pragma {name} needs the name of a symbol")
        self.waiting.append((name, arguments[0], [a.strip('"') for a in arguments[1:]], where))

    def settle(self, find):
        """Applies all; `find` gives the symbol of a source name or None (such a pragma has no effect)."""
        for name, who, arguments, where in self.waiting:
            symbol = find(who)
            if symbol is None:
                continue
            name = ALIASES.get(name, name)
            if name == "INTERRUPT":
                symbol.qualifier_bits |= Symbol.INTERRUPT_BIT
            elif name in KINDS:
                symbol.pragmas.append((KINDS[name], arguments))
                if name == "DATA_ALIGN":
                    symbol.align = max(symbol.align, self._alignment(arguments, where))
        self.waiting = []

    @staticmethod
    def _alignment(arguments, where):
        try:
            units = int(arguments[0], 0)
            if units > 0 and units & (units - 1) == 0:
                return units * 16
        except (ValueError, IndexError):
            pass
        raise CompileError(where, "#pragma DATA_ALIGN needs a power of two")
