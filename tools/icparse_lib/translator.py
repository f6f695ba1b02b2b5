"""A translation: file-scope declarations, functions, and what the builders of types, trees and statements share."""
from contextlib import contextmanager
import sys

from pycparser import c_ast as A

from . import constants, literals, pragmas, trees, types as T
from .declarations import TypeBuilder
from .errors import CompileError, CompileErrors, position_of
from .expressions import Expressions
from .initializers import Initializers
from .model import FunctionBody, Op, Statement, Symbol, Text
from .preprocess import BUILT_IN_NAMES
from .scopes import Scopes
from .statements import Statements


class FunctionContext:
    """The function whose body is being translated."""

    def __init__(self, source_name, result, body):
        self.source_name, self.result, self.body = source_name, result, body
        self.parameters = []


class Translator:
    """Translates one source file into a unit. `linked` maps names of external linkage to symbols, over all files."""

    def __init__(self, unit, linked, warnings=sys.stderr):
        self.unit, self.linked, self.warnings = unit, linked, warnings
        self.scopes = Scopes()
        self.function = None
        self.types = TypeBuilder(self)
        self.expressions = Expressions(self)
        self.initializers = Initializers(self)
        self.symbol_pragmas = pragmas.SymbolPragmas()
        self.errors = []  # of declarations and statements that were left behind
        self.next_is_interrupt = False  # the next function declared is an interrupt routine

    # ---- Services
    def warn(self, where, message):
        if self.warnings is not None:
            print(f"{where}: warning: {message}", file=self.warnings)

    @contextmanager
    def unevaluated(self):
        """What is translated inside leaves no symbols behind."""
        count = len(self.unit.symbols)
        locals_ = len(self.function.body.block.symbols) if self.function else 0
        yield
        del self.unit.symbols[count:]
        if self.function:
            del self.function.body.block.symbols[locals_:]

    def temporary(self, type_):
        """A NAME of a new local of the function."""
        symbols = self.function.body.block.symbols
        symbol = Symbol(f"tmp${self.unit.next_serial()}", type_, Symbol.AUTO, 2, self.function.body.position)
        symbols.append(symbol)
        return trees.name(symbol)

    def nameless_static(self, type_, items):
        symbol = self.unit.new_symbol(f"_anon${self.unit.next_serial()}", type_, Symbol.STATIC, None)
        symbol.initializer, symbol.used = items, True
        if self.function:
            symbol.pragmas.append((pragmas.SCOPING_FUNC, [self.function.body.symbol.name]))
        return symbol

    def body_symbol(self, symbol):
        """What a use of a name means in the body: of a parameter its local."""
        if symbol.klass != Symbol.PARAMETER:
            return symbol
        if symbol.local is None:
            declared = symbol.function_type
            symbol.local = Symbol(symbol.name, declared, Symbol.AUTO, 2, symbol.position)
        return symbol.local

    def static_assert(self, node):
        value = constants.require_integer(self.expressions.value(node.cond), position_of(node), "the assertion")
        if value == 0:
            text = node.message.value if node.message else ""
            raise CompileError(position_of(node), f"static assertion failed: {text}")

    def check_new_name(self, name, where):
        """Names of one scope differ."""
        if self.scopes.find_here(name) is not None:
            raise CompileError(where, f"redefinition of '{name}'")

    # ---- The file
    def file(self, tree):
        for node in tree.ext:
            try:
                self._external(node)
            except CompileError as error:
                self.errors.append(error)
                del self.scopes.stack[1:]
                self.function = None
        if self.errors:
            raise self.errors[0] if len(self.errors) == 1 else CompileErrors(self.errors)
        self.symbol_pragmas.settle(self._pragma_symbol)

    def _external(self, node):
        if isinstance(node, A.FuncDef):
            self._function(node)
        elif isinstance(node, A.Pragma):
            self.pragma(node)
        elif isinstance(node, A.StaticAssert):
            self.static_assert(node)
        elif isinstance(node, A.Typedef):
            self._typedef(node)
        else:
            self._global(node)

    def _pragma_symbol(self, name):
        found = self.scopes.find(name)
        return (found.link or found) if isinstance(found, Symbol) else None

    def pragma(self, node):
        where = position_of(node)
        name, arguments = pragmas.split(node.string or "")
        if name == "ASM_TEXT":
            _, codes = literals.string_codes(node.string, where)
            self.unit.items.append(Text(bytes(codes[:-1]).decode("utf-8", "surrogateescape"), where))
        elif name == "INTERRUPT_NEXT":
            self.next_is_interrupt = True
        elif name in pragmas.SYMBOL:
            self.symbol_pragmas.add(name, arguments, where)

    def _typedef(self, node):
        if node.name in BUILT_IN_NAMES:
            return
        where = position_of(node)
        type_ = T.Typedef(node.name, self.types.type_of(node), where)
        known = self.scopes.find_here(node.name)
        if known is not None and not (isinstance(known, T.Typedef) and T.compatible(known.base, type_.base)):
            raise CompileError(where, f"redefinition of '{node.name}'")
        if known is None:
            self.scopes.enter(node.name, type_)

    # ---- Objects and functions of file scope
    def _global(self, node):
        type_ = self.types.type_of(node)
        if node.name is None:
            return
        self._check_specifiers(node)
        where = position_of(node)
        if T.is_function(type_) and node.init is not None:
            raise CompileError(where, "a function cannot be initialized")
        symbol = self._declare(node.name, type_, node.storage, node.funcspec, where)
        if node.init is not None:
            self._define_object(symbol, node, where)
        elif not T.is_function(type_) and "extern" not in node.storage:
            if T.is_void(type_):
                raise CompileError(where, f"'{node.name}' has type void")
            target = symbol.link or symbol
            if target.klass == Symbol.EXTERNAL:
                target.klass = Symbol.DEFINED
            self.unit.tentative.append(target)
        self._align(symbol, node)

    def _check_specifiers(self, node):
        if "_Thread_local" in node.storage or "_Atomic" in (node.quals or []):
            raise CompileError(position_of(node), "threads are not supported")

    def _align(self, symbol, node):
        for spec in getattr(node, "align", None) or []:
            operand = spec.alignment
            units = (self.types.type_of(operand).align // T.UNIT if isinstance(operand, A.Typename) else
                     constants.require_integer(self.expressions.value(operand), position_of(node), "the alignment"))
            if units & (units - 1):
                raise CompileError(position_of(node), "the alignment is no power of two")
            target = symbol.link or symbol
            target.align = max(target.align, units * T.UNIT)

    def _define_object(self, symbol, node, where):
        target = symbol.link or symbol
        if target.initializer is not None:
            raise CompileError(where, f"redefinition of '{node.name}'")
        target.klass = Symbol.STATIC if target.klass == Symbol.STATIC else Symbol.DEFINED
        type_, part = self.initializers.parse(symbol.type, node.init, where)
        symbol.type = target.type = type_
        target.position = where
        target.initializer = self.initializers.static_items(type_, part, where)

    def _declare(self, name, type_, storage, specifiers, where):
        """The symbol of a declaration with linkage, entered in the current scope."""
        known = self.scopes.find_here(name)
        if known is None and not self.scopes.at_file_scope:
            known = self.scopes.stack[0].names.get(name)
        if known is not None:
            if not isinstance(known, Symbol) or not T.compatible(known.type, type_):
                raise CompileError(where, f"conflicting declarations of '{name}'")
            if "static" in storage and (known.link or known).klass != Symbol.STATIC:
                raise CompileError(where, f"static declaration of '{name}' follows one that is not")
            known.type = T.composite(known.type, type_)
            symbol = known
        else:
            symbol = self._new_symbol(name, type_, storage, specifiers, where)
        self._specify(symbol.link or symbol, specifiers or [])
        self.scopes.enter(name, symbol)
        if not self.scopes.at_file_scope:
            self.scopes.stack[0].names.setdefault(name, symbol)
        return symbol

    def _specify(self, symbol, specifiers):
        if "inline" in specifiers:
            symbol.qualifier_bits |= Symbol.INLINE_BIT
        if "_Noreturn" in specifiers and (pragmas.NEVER_RETURNS, []) not in symbol.pragmas:
            symbol.pragmas.append((pragmas.NEVER_RETURNS, []))
        if self.next_is_interrupt and T.is_function(symbol.type):
            symbol.qualifier_bits |= Symbol.INTERRUPT_BIT
            self.next_is_interrupt = False

    def declare_function(self, name, type_, where):
        """Declares a function that is called without a declaration."""
        self._declare(name, type_, [], [], where)

    def _new_symbol(self, name, type_, storage, specifiers, where):
        # An inline function without "extern" has its definition for this file alone.
        local = "static" in storage or ("inline" in (specifiers or []) and "extern" not in storage)
        if local:
            return self.unit.new_symbol(self.unit.name_prefix + name, type_, Symbol.STATIC, where)
        first = self.linked.get(name)
        if first is None:
            first = self.linked[name] = self.unit.new_symbol(self.unit.name_prefix + name, type_, Symbol.EXTERNAL, where)
            return first
        view = Symbol(first.name, type_, first.klass, 0, where)  # this file's view of another file's symbol
        view.link = first
        return view

    # ---- Functions
    def _function(self, node):
        where = position_of(node.decl)
        type_ = self._definition_type(node)
        symbol = self._declare(node.decl.name, type_, node.decl.storage, node.decl.funcspec, where)
        target = symbol.link or symbol
        if target.body is not None:
            raise CompileError(where, f"redefinition of '{node.decl.name}'")
        if target.klass == Symbol.EXTERNAL:
            target.klass = Symbol.DEFINED
        symbol.klass = target.klass
        symbol.type = target.type = type_
        target.position, target.used = where, True
        function = T.strip(type_)
        if not T.is_void(function.result) and not function.result.complete:
            raise CompileError(where, f"a function cannot return '{function.result}'")
        body = target.body = FunctionBody(target, where)
        self.function = FunctionContext(node.decl.name, function.result, body)
        self.scopes.push(body.block)
        self._parameters(node, function)
        statements = Statements(self, body)
        statements.function_body(node.body)
        body.end = position_of((node.body.block_items or [node.body])[-1]) or where
        statements.end(body.end)
        self._prolog(body)
        self.scopes.pop()
        self.function = None
        self.unit.items.append(body)

    def _definition_type(self, node):
        """The type of a function being defined. One with a list of names alone has no prototype."""
        type_ = self.types.type_of(node.decl)
        if not T.is_function(type_):
            raise CompileError(position_of(node.decl), f"'{node.decl.name}' is no function")
        declarator = node.decl.type
        if declarator.args is None:
            return T.Function(T.strip(type_).result, [])
        return type_

    def _parameters(self, node, function):
        declarator = node.decl.type.args
        if declarator is None:
            return
        names = [p for p in declarator.params if not isinstance(p, A.EllipsisParam)]
        old_style = bool(names) and isinstance(names[0], A.ID)
        declared = {d.name: d for d in node.param_decls or []}
        if not old_style and not function.parameters:
            return
        for index, parameter in enumerate(names):
            where = position_of(parameter)
            if parameter.name is None and not old_style:
                raise CompileError(position_of(node.decl), "a parameter has no name")
            if old_style:
                decl = declared.get(parameter.name)
                own = self.types.adjusted(self.types.type_of(decl)) if decl else T.INT
                passed = T.DOUBLE if T.strip(own).key == T.FLOAT.key else T.promote(own) if T.is_integer(own) else own
            else:
                own = passed = function.parameters[index]
            self.check_new_name(parameter.name, where)
            symbol = Symbol(parameter.name, passed, Symbol.PARAMETER, 1, where)
            symbol.function_type = own
            self.scopes.enter(parameter.name, symbol)
            self.function.parameters.append(symbol)
            self.function.body.parameters.append(symbol)

    def _prolog(self, body):
        """Each parameter that the body uses is copied to its local in one statement at the start."""
        copies, locals_ = [], []
        for symbol in body.parameters:
            if symbol.local is not None:
                locals_.append(symbol.local)
                target, value = trees.name(symbol.local), trees.name(symbol)
                if not T.is_record(symbol.type):
                    value = trees.convert(value, target.type, symbol.position)
                copies.append(trees.assign(target, value))
        body.block.symbols[:0] = locals_
        if copies:
            body.block.items.insert(0, Statement(trees.chain(Op.PCOMMA, copies), body.position))

    # ---- Declarations inside functions
    def local_declaration(self, node, statements):
        where = position_of(node)
        if isinstance(node, A.Typedef):
            self._typedef(node)
            return
        type_ = self.types.type_of(node)
        if node.name is None:
            return
        self._check_specifiers(node)
        if T.is_function(type_) or "extern" in node.storage:
            if node.init is not None:
                raise CompileError(where, f"'{node.name}' cannot be initialized here")
            self._declare(node.name, type_, node.storage, node.funcspec, where)
        elif "static" in node.storage:
            self._static_local(node, type_, where)
        else:
            self._automatic(node, type_, where, statements)

    def _static_local(self, node, type_, where):
        self.check_new_name(node.name, where)
        symbol = self.unit.new_symbol(f"_{node.name}${self.unit.next_serial()}", type_, Symbol.STATIC, where)
        symbol.pragmas.append((pragmas.SCOPING_FUNC, [self.function.body.symbol.name]))
        symbol.used = True
        self.scopes.enter(node.name, symbol)
        part = None
        if node.init is not None:
            symbol.type, part = self.initializers.parse(type_, node.init, where)
        if not symbol.type.complete:
            raise CompileError(where, f"'{node.name}' has incomplete type '{type_}'")
        symbol.initializer = self.initializers.static_items(symbol.type, part, where)
        self._align(symbol, node)

    def _automatic(self, node, type_, where, statements):
        self.check_new_name(node.name, where)
        symbol = Symbol(node.name, type_, Symbol.AUTO, 2, where)
        self.scopes.enter(node.name, symbol)
        self.scopes.current.block.symbols.append(symbol)
        part = None
        if node.init is not None:
            symbol.type, part = self.initializers.parse(type_, node.init, where)
        if not symbol.type.complete:
            raise CompileError(where, f"'{node.name}' has incomplete type '{type_}'")
        if part is not None:
            statements.initialize(trees.name(symbol), symbol.type, part, where)
        self._align(symbol, node)


def finish(unit):
    """Gives zeros to what no file initialized, and drops the declarations that nothing uses."""
    for symbol in unit.tentative:
        if symbol.initializer is None:
            if not symbol.type.complete and T.is_array(symbol.type):
                symbol.type = T.Array(T.strip(symbol.type).element, 1)
            if not symbol.type.complete:
                name = symbol.name[len(unit.name_prefix):]
                raise CompileError(symbol.position, f"'{name}' has incomplete type '{symbol.type}'")
            symbol.initializer = Initializers(None).static_items(symbol.type, None, symbol.position)
    unit.symbols = [s for s in unit.symbols if s.used or s.klass != Symbol.EXTERNAL]


