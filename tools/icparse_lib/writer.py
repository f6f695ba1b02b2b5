"""The bytes of an I-file.

A file is a stream of records (kind, size, payload): header, functions, initializers, option sets, types, file names,
global symbols. The header holds the sections' offsets and is put in place last.
"""
from . import types as T
from .model import Block, ExceptionEntry, FunctionBody, Label, Op, Pragma, Statement, Text

VERSION, TARGET = -71, 600
MAGIC = b"!<icode>\n\0"

BEGIN_FUNCTION, END_FUNCTION, BEGIN_BLOCK, END_BLOCK, END_ARGUMENTS, END_LOCALS = 1, 2, 3, 4, 5, 6
HEADER, SYMBOL, ASSEMBLY, LABEL, EXPRESSION, PRAGMA, NODE = 8, 35, 36, 42, 46, 94, 101
CATCHES, EXCEPTION, EXCEPTIONS = 63, 91, 93
INITIALIZER, OPTION_SET, TYPE, FILE_NAME = 105, 111, 116, 126
END = b"\xff"

LIST_HEADER, LIST_TRAILER = 254, 255
PARAMETERS, ENUMERATORS, MEMBERS = 0, 1, 7


BYTES = [bytes([value]) for value in range(256)]


def uint(value):
    if 0 <= value < 128:
        return BYTES[value]
    value &= (1 << 64) - 1
    out = bytearray()
    while value > 127:
        out.append(value & 127 | 128)
        value >>= 7
    out.append(value)
    return bytes(out)


def sint(value):
    out = bytearray()
    while not -64 <= value <= 63:
        out.append(value & 127 | 128)
        value >>= 7
    out.append(value & 127)
    return bytes(out)


def text(value):
    return (value if isinstance(value, bytes) else value.encode("utf-8", "surrogateescape")) + b"\0"


def flag(value):
    return b"\1" if value else b"\0"


def record(kind, payload):
    return BYTES[kind] + uint(len(payload)) + payload


def i32(value):
    return value.to_bytes(4, "little")


def i16(value):
    return (value & 0xFFFF).to_bytes(2, "little")


class FileTable:
    """Source file names, numbered from 1 by first use."""

    def __init__(self):
        self.numbers = {}

    def position(self, where):
        if where is None:
            return b"\0"
        number = self.numbers.setdefault(where.file or "NO_FILE", len(self.numbers) + 1)
        return uint(number) + uint(where.line) + uint(where.column)

    def section(self):
        return b"".join(record(FILE_NAME, text(name)) for name in self.numbers)


class TypeTable:
    """Types, numbered by first mention. A record has its number before its members, since it may refer to itself."""

    def __init__(self, files):
        self.files, self.numbers, self.types = files, {}, []

    def number(self, type_):
        if type_ is None:
            return b"\0"
        found = self.numbers.get(type_.key)
        if found is None:
            self.types.append(type_)
            found = self.numbers[type_.key] = len(self.types)
        return uint(found)

    def section(self):
        """Records first, then their members, then the rest; every type stands before what mentions it."""
        self._reach_all()
        out, self.written = [], set()
        records = [t for t in self.types if isinstance(t, T.Record)]
        for type_ in records:
            self.written.add(type_.key)
            out.append(self._record(type_))
        for type_ in records:
            for member in type_.members:
                self._write(member.type, out)
            if type_.members:
                out += self._list(type_, MEMBERS, [self._member(m) for m in type_.members])
        for type_ in self.types:
            self._write(type_, out)
        return b"".join(out)

    @staticmethod
    def _parts(type_):
        if isinstance(type_, T.Pointer):
            return [type_.target]
        if isinstance(type_, T.Array):
            return [type_.element]
        if isinstance(type_, T.Complex):
            return [type_.part]
        if isinstance(type_, T.Function):
            return [type_.result, *type_.parameters]
        if isinstance(type_, (T.Qualified, T.Typedef)):
            return [type_.base]
        if isinstance(type_, T.Enum):
            return [type_.underlying or T.INT]
        if isinstance(type_, T.Record):
            return [m.type for m in type_.members]
        return []

    def _reach_all(self):
        for type_ in self.types:  # grows while it is walked
            for part in self._parts(type_):
                self.number(part)

    def _write(self, type_, out):
        if type_.key in self.written:
            return
        self.written.add(type_.key)
        for part in self._parts(type_):
            self._write(part, out)
        own = self.number(type_)
        out.append(record(TYPE, own + self._payload(type_)))
        if isinstance(type_, T.Function):
            elements = [bytes([21]) + self.number(p) + flag(False) + uint(0) + text("") for p in type_.parameters]
            out += self._list(type_, PARAMETERS, elements)
        elif isinstance(type_, T.Enum):
            write = sint if (type_.underlying or T.INT).signed else uint
            elements = [bytes([23]) + text(name) + write(value) + self.files.position(where)
                        for name, value, where in type_.enumerators]
            out += self._list(type_, ENUMERATORS, elements)

    def _payload(self, type_):
        extent = uint(type_.size) + uint(type_.align)
        if isinstance(type_, T.Void):
            return bytes([49])
        if isinstance(type_, T.Integer):
            boolean = flag(type_.kind == 0)
            tag = type_.kind if type_.kind < 10 else type_.kind + 40
            return bytes([tag]) + flag(type_.explicit_sign) + extent + boolean + boolean
        if isinstance(type_, T.Floating):
            return bytes([10 + type_.kind]) + extent
        if isinstance(type_, T.Complex):
            return bytes([36]) + extent + self.number(type_.part)
        if isinstance(type_, T.Pointer):
            return bytes([15]) + self.number(type_.target) + extent
        if isinstance(type_, T.Qualified):
            return bytes([17]) + self.number(type_.base) + uint(type_.bits) + extent
        if isinstance(type_, T.Typedef):
            return (bytes([14]) + text(type_.name) + self.number(type_.base) + extent + flag(False) + flag(False) +
                    self.files.position(type_.position))
        if isinstance(type_, T.Array):
            return (bytes([18]) + self.number(type_.element) + uint(type_.count or 0) + extent + flag(False) +
                    flag(type_.complete) + flag(False))
        if isinstance(type_, T.Function):
            return (bytes([20]) + self.number(type_.result) + flag(type_.variadic) + flag(type_.prototype) + b"\0" +
                    flag(False))
        return (bytes([22]) + text(type_.name) + extent + self.number(type_.underlying or T.INT) + flag(False) +
                self.files.position(type_.position))

    def _record(self, type_):
        return record(TYPE, self.number(type_) + bytes([24, int(type_.is_union)]) + text(type_.name) +
                      flag(type_.complete) + flag(False) + uint(type_.size) + uint(type_.align) + flag(type_.members) +
                      flag(False) + flag(False) + self.files.position(type_.position))

    def _member(self, member):
        return (bytes([28]) + uint(member.number) + text(member.name or "") + self.number(member.type) + b"\0" +
                sint(member.offset) + b"\0" + uint(member.width or 0) + flag(member.width is not None) + flag(False) +
                flag(False) + self.files.position(member.position))

    def _list(self, type_, which, elements):
        own = self.number(type_)
        yield record(TYPE, own + bytes([LIST_HEADER, which]))
        for element in elements:
            yield record(TYPE, own + element)
        yield record(TYPE, own + bytes([LIST_TRAILER, which]))


class Writer:
    def __init__(self, unit):
        self.unit = unit
        self.files = FileTable()
        self.types = TypeTable(self.files)
        self.out = bytearray()

    def bytes(self):
        """The whole file."""
        unit = self.unit
        for index, symbol in enumerate(unit.symbols):
            symbol.index = index
        self.out += self._header([0] * 5)
        for item in unit.items:
            if isinstance(item, FunctionBody):
                self._function(item)
            else:
                self._item(item)
        offsets = [0] * 5
        offsets[1] = self._initializers()
        self.out += END
        offsets[0] = self._section(b"".join(
            record(OPTION_SET, uint(number) + uint(len(words)) + b"".join(map(text, words)))
            for number, words in sorted(unit.option_sets.items())))
        symbols = b"".join(map(self._symbol, unit.symbols))
        types = self.types.section()
        offsets[2] = self._section(types)
        offsets[3] = self._section(self.files.section())
        offsets[4] = len(self.out)
        self.out += symbols + END
        header = self._header(offsets)
        self.out[:len(header)] = header
        return bytes(self.out)

    def _header(self, offsets):
        return record(HEADER, MAGIC + i16(VERSION) + i16(TARGET) + b"".join(map(i32, offsets)) +
                      text(self.unit.source_name) + i32(0))

    def _section(self, records):
        if not records:
            return 0
        offset = len(self.out)
        self.out += records + END
        return offset

    def _initializers(self):
        initialized = [s for s in self.unit.symbols if s.initializer is not None]
        if not initialized:
            return 0
        self.out += END
        offset = len(self.out)
        for symbol in initialized:
            symbol.location = len(self.out)
            self.out += record(INITIALIZER, uint(symbol.index))
            for tree in symbol.initializer:
                self._tree(tree)
            self.out += record(NODE, bytes([Op.ENDINIT]) + self.types.number(T.VOID))
        return offset

    def _symbol(self, symbol):
        number = self.types.number(symbol.type)
        function = T.is_function(symbol.type)
        size, align = (32, 32) if function else (symbol.type.size, max(symbol.align, symbol.type.align))
        out = record(SYMBOL, text(symbol.name) + uint(size) + uint(0) + bytes([symbol.klass]) +
                     i16(symbol.qualifier_bits) + number + number + uint(align) + bytes([len(symbol.pragmas)]) +
                     uint(symbol.location) + uint(0) + self.files.position(symbol.position) + b"\0")
        return out + b"".join(self._pragma(kind, arguments) for kind, arguments in symbol.pragmas)

    @staticmethod
    def _pragma(kind, arguments):
        return record(PRAGMA, uint(kind) + uint(len(arguments)) + b"".join(map(text, arguments)))

    def _function(self, body):
        self.locals = 0
        where = self.files.position(body.position)
        body.symbol.location = len(self.out)
        self.out += record(BEGIN_FUNCTION, where + uint(body.symbol.index))
        for symbol in body.parameters:
            self._local(symbol, 1)
        self.out += record(END_ARGUMENTS, where)
        for symbol in body.block.symbols:
            self._local(symbol, 2)
        self.out += record(END_LOCALS, where)
        self._items(body.block.items, 2)
        self._exceptions(body.exceptions)
        self.out += record(END_FUNCTION, self.files.position(body.end))

    def _exceptions(self, entries):
        if entries:
            self.out += record(EXCEPTIONS, uint(len(entries)))
        for number, entry in enumerate(entries, 1):
            catches = entry.kind == ExceptionEntry.CATCH
            self.out += record(EXCEPTION, uint(number) + uint(entry.kind) + uint(entry.next) + uint(catches))
            if catches:
                self.out += record(CATCHES, text(entry.what[0]) + uint(entry.what[1]) + flag(False))
            elif entry.kind == ExceptionEntry.CLEANUP:
                self.out += record(EXPRESSION, self.files.position(None))
                self._tree(entry.what)

    def _local(self, symbol, level):
        symbol.index, symbol.level = self.locals, level
        self.locals += 1
        self.out += self._symbol(symbol)

    def _items(self, items, level):
        for item in items:
            if isinstance(item, Block):
                self.out += record(BEGIN_BLOCK, self.files.position(item.position))
                for symbol in item.symbols:
                    self._local(symbol, level + 1)
                self._items(item.items, level + 1)
                self.out += record(END_BLOCK, self.files.position(item.end))
            else:
                self._item(item)

    def _item(self, item):
        if isinstance(item, Statement):
            self.out += record(EXPRESSION, self.files.position(item.position))
            self._tree(item.tree)
        elif isinstance(item, Label):
            self.out += record(LABEL, uint(item.number))
        elif isinstance(item, Text):
            self.out += record(ASSEMBLY, text(item.text) + self.files.position(item.position))
        else:
            assert isinstance(item, Pragma)
            self.out += self._pragma(item.kind, item.arguments)

    def _tree(self, tree):
        """Prefix order; long right spines and left-leaning lists must not need a deep stack."""
        pending = [tree]
        while pending:
            node = pending.pop()
            self.out += record(NODE, BYTES[node.op] + self.types.number(node.type) + self._value(node))
            if node.right is not None:
                pending.append(node.right)
            if node.left is not None:
                pending.append(node.left)

    def _value(self, node):
        op, value = node.op, node.value
        if op == Op.NAME:
            symbol = value.link or value
            return uint(symbol.level) + uint(symbol.index)
        if op == Op.ICON:
            integer = T.as_integer(node.type) if T.is_integer(node.type) else T.ULONG
            return sint(value) if integer.signed else uint(value)
        if op in (Op.LCON, Op.FCON):
            return text(str(value))
        if op == Op.SCON:
            return uint(len(value)) + value
        if op == Op.FIELD:
            csu, member = value
            return b"\1" + uint(member.number) + self.types.number(csu)
        if op == Op.CALL:
            return uint(value or 0) + uint(node.exception_entry)
        if op == Op.UCALL:
            return uint(node.exception_entry)
        if op in (Op.LABELREF, Op.SWITCH, Op.SKIP):
            return uint(value)
        if op in (Op.ICALL, Op.UICALL, Op.MCALL, Op.UMCALL):
            return text(value)
        return b""
