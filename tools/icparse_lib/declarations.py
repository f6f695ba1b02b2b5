"""From declarators and specifiers to types."""
from pycparser import c_ast as A

from . import constants, types as T
from .errors import CompileError, position_of
from .scopes import EnumConstant

# Specifier words in alphabetical order, without what adds nothing: "signed" (but for char) and "int" beside others.
_SPECIFIERS = {
    "void": T.VOID, "_Bool": T.BOOL, "char": T.CHAR, "char signed": T.SCHAR, "char unsigned": T.UCHAR, "short": T.SHORT,
    "short unsigned": T.USHORT, "": T.INT, "unsigned": T.UINT, "long": T.LONG, "long unsigned": T.ULONG,
    "long long": T.LLONG, "long long unsigned": T.ULLONG, "float": T.FLOAT, "double": T.DOUBLE,
    "double long": T.LDOUBLE, "__wchar_t": T.WCHAR,
}
_TAKES_INT = {"", "short", "short unsigned", "unsigned", "long", "long unsigned", "long long", "long long unsigned"}


def basic(names, where):
    """The type of a list of specifier words in any order."""
    words = sorted(names)
    ints, signs = words.count("int"), words.count("signed")
    kept = " ".join(w for w in words if w != "int" and (w != "signed" or "char" in words))
    sound = ints <= 1 and signs <= 1 and words.count("unsigned") + signs <= 1
    if kept not in _SPECIFIERS or not sound or ((ints or signs and "char" not in words) and kept not in _TAKES_INT):
        raise CompileError(where, f"'{' '.join(names)}' is not a type")
    return _SPECIFIERS[kept]


class TypeBuilder:
    """Builds types for a `Translator`, entering tags and enumerators in its scopes."""

    def __init__(self, translator):
        self.translator, self.scopes = translator, translator.scopes
        self.defined = {}  # syntax node of a tag's definition: its type; the declarators of one declaration share it

    def type_of(self, node):
        """The type of a declarator tree."""
        where = position_of(node)
        if isinstance(node, (A.Typename, A.Decl, A.Typedef)):
            return self.type_of(node.type)
        if isinstance(node, A.TypeDecl):
            return T.qualify(self._specified(node.type), self._bits(node.quals))
        if isinstance(node, A.PtrDecl):
            target = self.type_of(node.type)
            return T.qualify(T.Pointer(target), self._bits(node.quals))
        if isinstance(node, A.ArrayDecl):
            return self._array(node, where)
        if isinstance(node, A.FuncDecl):
            return self._function(node, where)
        return self._specified(node)

    @staticmethod
    def _bits(words):
        return sum({T.QUALIFIER_BITS[w] for w in words or [] if w in T.QUALIFIER_BITS})

    def _specified(self, node):
        where = position_of(node)
        if isinstance(node, A.IdentifierType):
            if len(node.names) == 1:
                known = self.scopes.find(node.names[0])
                if isinstance(known, T.Typedef):
                    return known
            if "_Complex" in node.names:
                return self._complex(node.names, where)
            return basic(node.names, where)
        if node in self.defined:
            return self.defined[node]
        if isinstance(node, (A.Struct, A.Union)):
            type_, defines = self._record(node, where), node.decls is not None
        elif isinstance(node, A.Enum):
            type_, defines = self._enum(node, where), node.values is not None
        else:
            raise CompileError(where, "unsupported type")
        if defines:
            self.defined[node] = type_
        return type_

    @staticmethod
    def _complex(names, where):
        words = list(names)
        words.remove("_Complex")
        part = basic(words, where) if words else T.DOUBLE
        if part not in (T.FLOAT, T.DOUBLE):  # the optimizer has no complex type of long double
            raise CompileError(where, f"'{' '.join(names)}' is not supported")
        return T.Complex(part)

    def _array(self, node, where):
        element = self.type_of(node.type)
        if T.is_function(element) or not element.complete:
            raise CompileError(where, f"array of '{element}'")
        if node.dim is None:
            return T.Array(element, None)
        size = self.translator.expressions.value(node.dim)
        if T.is_integer(size.type) and constants.integer_value(size) is None:
            raise CompileError(where, "the array size is no constant; arrays of variable length are not supported")
        count = constants.require_integer(size, where, "the array size")
        if count < 0:
            raise CompileError(where, "negative array size")
        return T.Array(element, count)

    def adjusted(self, type_):
        """A parameter's type: arrays and functions become pointers."""
        bare = T.strip(type_)
        if isinstance(bare, T.Array):
            return T.Pointer(bare.element)
        return T.Pointer(type_) if isinstance(bare, T.Function) else type_

    def _parameter_type(self, parameter):
        declarator = parameter.type
        if isinstance(declarator, A.ArrayDecl):  # the size of the outermost dimension does not matter
            element = self.type_of(declarator.type)
            bits = self._bits(w for w in declarator.dim_quals or [] if isinstance(w, str))
            return T.qualify(T.Pointer(element), bits)
        return self.adjusted(self.type_of(parameter))

    def _function(self, node, where):
        result = self.type_of(node.type)
        if T.is_array(result) or T.is_function(result):
            raise CompileError(where, f"a function cannot return '{result}'")
        parameters = list(node.args.params) if node.args else []
        if not parameters or any(isinstance(p, A.ID) for p in parameters):
            return T.Function(result, [], prototype=False)
        variadic = isinstance(parameters[-1], A.EllipsisParam)
        if variadic:
            parameters.pop()
        self.scopes.push()
        types = [self._parameter_type(p) for p in parameters]
        self.scopes.pop()
        if len(types) == 1 and T.is_void(types[0]) and not variadic:
            types = []
        for parameter, type_ in zip(parameters, types):
            if T.is_void(type_):
                raise CompileError(position_of(parameter), "parameter of type void")
        return T.Function(result, types, variadic)

    def _record(self, node, where):
        is_union = isinstance(node, A.Union)
        record = None
        if node.name:
            record = self.scopes.find_tag(node.name, here=node.decls is not None)
            if record is not None and (not isinstance(record, T.Record) or record.is_union != is_union):
                raise CompileError(where, f"'{node.name}' is another kind of tag")
        if record is None:
            record = T.Record(is_union, node.name, where)
            if node.name:
                self.scopes.enter_tag(node.name, record)
        if node.decls is not None:
            if record.complete:
                raise CompileError(where, f"redefinition of '{record}'")
            record.lay_out(self._members(node.decls, record))
        return record

    def _members(self, declarations, record):
        members, seen = [], set()
        for decl in declarations:
            where = position_of(decl)
            if isinstance(decl, A.Pragma):
                continue
            if isinstance(decl, A.StaticAssert):
                self.translator.static_assert(decl)
                continue
            type_ = self.type_of(decl)
            width = None
            if getattr(decl, "bitsize", None) is not None:
                width = self._width(decl, type_, where)
            elif T.is_function(type_) or not type_.complete:
                flexible = T.is_array(type_) and decl is declarations[-1] and members and not record.is_union
                if not flexible:
                    raise CompileError(where, f"member '{decl.name or ''}' has incomplete type '{type_}'")
            name = decl.name
            if name is None and width is None and not T.is_record(type_):
                continue
            if name is None and width is None and T.strip(type_).tag:
                continue  # declares a tag, no member
            for one in [name] if name else self._inner_names(type_) if width is None else []:
                if one in seen:
                    raise CompileError(where, f"duplicate member '{one}'")
                seen.add(one)
            members.append(T.Member(name, type_, width, where))
        return members

    def _inner_names(self, type_):
        for member in T.strip(type_).members:
            if member.name:
                yield member.name
            elif T.is_record(member.type):
                yield from self._inner_names(member.type)

    def _width(self, decl, type_, where):
        width = constants.require_integer(self.translator.expressions.value(decl.bitsize), where, "the bit-field width")
        if not T.is_integer(type_):
            raise CompileError(where, f"a bit-field cannot have type '{type_}'")
        limit = 1 if T.as_integer(type_).kind == 0 else type_.size
        if width == 0 and decl.name is not None:
            raise CompileError(where, f"the bit-field '{decl.name}' has width 0, which only one without a name may have")
        if not 0 <= width <= limit:
            wider = next((t for t in (T.LONG, T.LLONG) if limit > 1 and t.size >= width > 0), None)
            hint = f"; '{wider}' has {wider.size}" if wider else ""
            raise CompileError(where, f"bad bit-field width {width}: a bit-field has at most the bits of its type, and "
                               f"'{type_}' has {limit}{hint}")
        return width

    def _enum(self, node, where):
        enum = self.scopes.find_tag(node.name, here=node.values is not None) if node.name else None
        if enum is not None and not isinstance(enum, T.Enum):
            raise CompileError(where, f"'{node.name}' is another kind of tag")
        if enum is None:
            enum = T.Enum(node.name, where)
            if node.name:
                self.scopes.enter_tag(node.name, enum)
        if node.values is None:
            return enum
        if enum.complete:
            raise CompileError(where, f"redefinition of '{enum}'")
        value, constants_ = -1, []
        for item in node.values.enumerators:
            at = position_of(item)
            value += 1
            if item.value is not None:
                value = constants.require_integer(self.translator.expressions.value(item.value), at, "the enumerator")
            self.translator.check_new_name(item.name, at)
            constant = EnumConstant(value, self._holder([value]))
            self.scopes.enter(item.name, constant)
            constants_.append(constant)
            enum.enumerators.append((item.name, value, at))
        enum.underlying = self._holder([e[1] for e in enum.enumerators])
        enum.complete = True
        return enum

    @staticmethod
    def _holder(values):
        """The first integer type from int on that holds all the values."""
        for type_ in (T.INT, T.UINT, T.LONG, T.ULONG, T.LLONG, T.ULLONG):
            if all(type_.minimum <= v <= type_.maximum for v in values):
                return type_
        return T.LLONG
