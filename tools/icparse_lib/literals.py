"""Numbers, characters and strings of the source."""
from fractions import Fraction
import re

from . import trees, types as T
from .errors import CompileError
from .model import Node, Op

_ESCAPES = {"n": 10, "t": 9, "r": 13, "a": 7, "b": 8, "f": 12, "v": 11, "0": 0, "\\": 92, "'": 39, '"': 34, "?": 63}
_CHARACTER = re.compile(r"\\x([0-9a-fA-F]+)|\\u([0-9a-fA-F]{4})|\\U([0-9a-fA-F]{8})|\\([0-7]{1,3})|\\(.)|(.)", re.S)
_INTEGER = re.compile(r"(0[xX][0-9a-fA-F]+|0[bB][01]+|[0-9]+)([uUlL]*)$")
_LADDER = (T.INT, T.UINT, T.LONG, T.ULONG, T.LLONG, T.ULLONG)


def number(text, where):
    """An integer constant: the first type of the standard's ladder that holds it."""
    found = _INTEGER.match(text)
    if not found:
        raise CompileError(where, f"bad number '{text}'")
    digits, suffix = found[1], found[2].lower()
    if suffix.replace("u", "", 1) not in ("", "l", "ll"):
        raise CompileError(where, f"bad suffix of '{text}'")
    decimal = digits[0] != "0" or digits == "0"
    try:
        value = int(digits, 0) if decimal or digits[1] in "xXbB" else int(digits, 8)
    except ValueError:
        raise CompileError(where, f"bad number '{text}'") from None
    rank = T.INT.rank + suffix.count("l")
    for type_ in _LADDER:
        if type_.rank < rank or value > type_.maximum or ("u" in suffix and type_.signed):
            continue
        if decimal and not type_.signed and "u" not in suffix and type_ is not T.ULLONG:
            continue
        return trees.integer(type_, value)
    raise CompileError(where, f"'{text}' fits no type")


def real(text, where):
    body, type_ = text, T.DOUBLE
    hexadecimal = text[:2] in ("0x", "0X")
    if text[-1] in "lL":
        body, type_ = text[:-1], T.LDOUBLE
    elif text[-1] in "fF" and not (hexadecimal and "p" not in text.lower()):
        body, type_ = text[:-1], T.FLOAT
    try:
        if hexadecimal:
            mantissa, exponent = body[2:].lower().split("p")
            whole, _, part = mantissa.partition(".")
            value = Fraction(int(whole + part, 16)) * Fraction(2) ** (int(exponent) - 4 * len(part))
        else:
            value = Fraction(body)
    except ValueError:
        raise CompileError(where, f"bad number '{text}'") from None
    return trees.floating(type_, value)


def characters(body, where):
    """The codes of the text between the quotes."""
    codes = []
    for hexa, u4, u8, octal, escape, plain in _CHARACTER.findall(body):
        if hexa or u4 or u8:
            codes.append(int(hexa or u4 or u8, 16))
        elif octal:
            codes.append(int(octal, 8))
        elif escape:
            if escape not in _ESCAPES:
                raise CompileError(where, f"unknown escape '\\{escape}'")
            codes.append(_ESCAPES[escape])
        else:
            codes += plain.encode("utf-8", "surrogateescape")
    return codes


def character(text, where):
    wide = text[0] == "L"
    codes = characters(text[1 + wide:-1], where)
    if not codes:
        raise CompileError(where, "empty character constant")
    if wide:
        return trees.integer(T.WCHAR, codes[-1])
    return trees.integer(T.INT, T.CHAR.wrap(codes[-1]))


_STRING = re.compile(r'(L?)"((?:\\.|[^"\\])*)"', re.S)


def string_codes(text, where):
    """(character type, codes with the final 0) of one literal or of several written side by side."""
    wide, codes = False, []
    for prefix, body in _STRING.findall(text):
        wide |= prefix == "L"
        codes += characters(body, where)
    return (T.WCHAR if wide else T.CHAR), codes + [0]


def string(text, where, make_static):
    """A string as an object of array type. One with characters beyond a byte becomes a nameless static array."""
    type_, codes = string_codes(text, where)
    array = T.Array(type_, len(codes))
    if type_ is T.CHAR and max(codes) < 256:
        return Node(Op.SCON, array, value=bytes(codes))
    return trees.name(make_static(array, [trees.integer(type_, code) for code in codes]))
