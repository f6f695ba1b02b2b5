"""The target's built-in functions, from the optimizer's own table of them."""
import re

from . import types as T
from .model import Op, read_rows

_ROW = re.compile(r'(\w+), (\w+), "([^"]*)", "([^"]*)", "([^"]*)"')
_BASE = {"void": T.VOID, "int": T.INT, "unsigned": T.UINT, "short": T.SHORT, "unsigned short": T.USHORT, "long": T.LONG,
         "unsigned long": T.ULONG, "long long": T.LLONG, "unsigned long long": T.ULLONG, "float": T.FLOAT,
         "F32": T.FLOAT, "double": T.DOUBLE, "long double": T.LDOUBLE, "schar": T.CHAR, "UADDRESS": T.ULONG}
_OPCODE = {"ICALL": (Op.ICALL, Op.UICALL), "UICALL": (Op.ICALL, Op.UICALL), "MCALL": (Op.MCALL, Op.UMCALL),
           "UMCALL": (Op.MCALL, Op.UMCALL)}


class Intrinsic:
    """`parameters` are types; None takes a value of any type. `op` is the opcode with arguments, `bare_op` without."""

    def __init__(self, kind, name, result, parameters):
        self.op, self.bare_op = _OPCODE[kind]
        self.name, self.result, self.parameters = name, result, parameters


def _type(text):
    text = text.replace("far ", "").strip()
    stars = text.count("*")
    type_ = _BASE[text.replace("*", "").strip()]
    for _ in range(stars):
        type_ = T.Pointer(type_)
    return type_


def _parameter(text):
    type_ = _type(text.rsplit(" ", 1)[0])
    return None if T.is_void(type_) else type_


# Names of the source that stand for an entry of the whole family.
_INSTANCES = {"MIN": ["__min"], "LMIN": ["__lmin"], "LLMIN": ["__llmin"], "MAX": ["__max"], "LMAX": ["__lmax"],
              "LLMAX": ["__llmax"], "FMIN": ["__fmin"], "FMAX": ["__fmax"], "DMIN": ["__fmin64"], "DMAX": ["__fmax64"],
              "DISABLE_INTERRUPTS": ["_disable_interrupts", "__disable_interrupts"],
              "ENABLE_INTERRUPTS": ["_enable_interrupts", "__enable_interrupts"],
              "RESTORE_INTERRUPTS": ["_restore_interrupts", "__restore_interrupts"]}


def _read():
    table = {}
    for row in read_rows("OPT5/target/bif.def", "BIF_ROW"):
        when, kind, name, result, parameters = _ROW.match(row).groups()
        for source_name in _INSTANCES.get(name, []) if when == "GENERIC" else [name]:
            types = [_parameter(p) for p in parameters.split(", ") if p]
            table[source_name] = Intrinsic(kind, source_name, _type(result), types)
    return table


TABLE = _read()
