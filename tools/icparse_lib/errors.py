"""The one way in which a translation fails."""


class CompileError(Exception):
    """An error of the program being translated, at a position (`Position` or None)."""

    def __init__(self, where, message):
        super().__init__(message)
        self.where, self.message = where, message

    def __str__(self):
        return f"{self.where}: error: {self.message}" if self.where else f"error: {self.message}"


class CompileErrors(CompileError):
    """More than one, in the order of the source."""

    def __init__(self, errors):
        super().__init__(errors[0].where, errors[0].message)
        self.errors = errors

    def __str__(self):
        return "\n".join(map(str, self.errors))


def all_errors(error):
    return getattr(error, "errors", [error])


class Position:
    """File, line and column of something in the source."""
    __slots__ = ("file", "line", "column")

    def __init__(self, file, line, column):
        self.file, self.line, self.column = file, line, column

    def __str__(self):
        return f"{self.file}:{self.line}:{self.column}"


def position_of(node):
    """The position of a syntax node, or None if the parser gave none."""
    coord = getattr(node, "coord", None)
    return Position(coord.file, coord.line or 0, coord.column or 0) if coord else None
