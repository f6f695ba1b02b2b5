"""Expressions: from syntax to trees."""
from pycparser import c_ast as A

from . import constants, intrinsics, literals, operators, trees, types as T
from .errors import CompileError, position_of
from .model import Node, Op, Symbol
from .scopes import EnumConstant


class Expressions:
    """Builds expression trees for a `Translator`."""

    def __init__(self, translator):
        self.translator, self.scopes = translator, translator.scopes
        self.builders = {
            A.Constant: self._constant, A.ID: self._identifier, A.BinaryOp: self._binary, A.UnaryOp: self._unary,
            A.Assignment: self._assignment, A.TernaryOp: self._conditional, A.FuncCall: self._call,
            A.ArrayRef: self._subscript, A.StructRef: self._member, A.Cast: self._cast, A.ExprList: self._comma,
            A.CompoundLiteral: self._compound_literal,
        }

    # ---- Entrances
    def tree(self, node):
        """The tree of an expression, an array or function still being one."""
        build = self.builders.get(type(node))
        if build is None:
            raise CompileError(position_of(node), f"{type(node).__name__} cannot stand in an expression")
        return build(node)

    def value(self, node):
        """The value of an expression; arrays and functions decay."""
        return trees.decay(self.tree(node))

    def scalar(self, node, what):
        value = self.value(node)
        if not T.is_scalar(value.type):
            raise CompileError(position_of(node), f"{what} has type '{value.type}'")
        return value

    def assigned(self, node, type_, where):
        """The value of `node` as an initializer or assigned value of `type_`."""
        return self.convert_assigned(self.value(node), type_, where)

    def convert_assigned(self, value, type_, where):
        """`value` converted as by assignment."""
        if T.is_record(type_):
            if not T.is_record(value.type) or T.strip(type_).key != T.strip(value.type).key:
                raise CompileError(where, f"'{value.type}' cannot be assigned to '{type_}'")
            return value
        if not T.is_scalar(value.type) or not T.is_scalar(type_):
            raise CompileError(where, f"'{value.type}' cannot be assigned to '{type_}'")
        if T.is_pointer(type_) != T.is_pointer(value.type) and T.strip(type_).key != T.BOOL.key:
            if not T.is_integer(type_) and not T.is_integer(value.type):
                raise CompileError(where, f"'{value.type}' cannot be assigned to '{type_}'")
            if not trees.is_null_constant(value):
                self.translator.warn(where, f"'{value.type}' assigned to '{type_}' without a cast")
        elif T.is_pointer(type_) and T.is_pointer(value.type) and not trees.is_null_constant(value):
            a, b = T.pointed_to(type_), T.pointed_to(value.type)
            if not (T.is_void(a) or T.is_void(b) or T.compatible(T.unqualified(a), T.unqualified(b))):
                self.translator.warn(where, f"'{value.type}' assigned to '{type_}' without a cast")
            elif T.qualifiers(b) & ~T.qualifiers(a) & (T.CONST | T.VOLATILE):
                self.translator.warn(where, f"'{value.type}' assigned to '{type_}' loses qualifiers")
        return trees.convert(value, type_, where)

    # ---- Primaries
    def _constant(self, node):
        where = position_of(node)
        if node.type == "string" or node.value[-1] == '"':
            return literals.string(node.value, where, self.translator.nameless_static)
        if node.value[-1] == "'":
            return literals.character(node.value, where)
        if node.type.split()[-1] in ("float", "double"):
            return literals.real(node.value, where)
        return literals.number(node.value, where)

    def _identifier(self, node):
        where = position_of(node)
        found = self.scopes.find(node.name)
        if isinstance(found, EnumConstant):
            return trees.integer(found.type, found.value)
        if isinstance(found, Symbol):
            return trees.name(self.translator.body_symbol(found))
        if node.name == "__func__" and self.translator.function:
            text = self.translator.function.source_name.encode() + b"\0"
            return Node(Op.SCON, T.Array(T.qualify(T.CHAR, T.CONST), len(text)), value=text)
        raise CompileError(where, f"'{node.name}' is not declared" if found is None else f"'{node.name}' is a type")

    def _compound_literal(self, node):
        type_ = self.translator.types.type_of(node.type)
        return self.translator.initializers.compound_literal(type_, node.init, position_of(node))

    # ---- Operators
    def _binary(self, node):
        where = position_of(node)
        left, right = self.value(node.left), self.value(node.right)
        if node.op in ("&&", "||"):
            return operators.logical(node.op, left, right, where)
        return operators.binary(node.op, left, right, where)

    def _comma(self, node):
        result = None
        for expression in node.exprs:
            value = self.value(expression)
            result = value if result is None else trees.comma(result, value)
        return result

    def _unary(self, node):
        where, op = position_of(node), node.op
        if op in ("sizeof", "_Alignof", "__alignof__"):
            return self._sizeof(node, where)
        if op == "&":
            return self._address(node.expr, where)
        if op == "*":
            pointer = self.value(node.expr)
            if not T.is_pointer(pointer.type) or T.is_void(T.pointed_to(pointer.type)):
                raise CompileError(where, f"operator * cannot take '{pointer.type}'")
            return trees.indirect(pointer)
        if op in ("++", "--", "p++", "p--"):
            target = self.tree(node.expr)
            return operators.increment(op[-2:], op[0] == "p", target, where, self.translator.temporary)
        return operators.unary(op, self.value(node.expr), where)

    def _sizeof(self, node, where):
        if isinstance(node.expr, (A.Typename, A.Decl)):
            type_ = self.translator.types.type_of(node.expr)
        else:
            with self.translator.unevaluated():
                operand = self.tree(node.expr)
            if trees.bit_width(operand) is not None:
                raise CompileError(where, "sizeof of a bit-field")
            type_ = operand.type
        if T.is_function(type_) or not type_.complete:
            raise CompileError(where, f"{node.op} of '{type_}'")
        return trees.integer(T.SIZE_T, (type_.size if node.op == "sizeof" else type_.align) // T.UNIT)

    def _address(self, operand, where):
        tree = self.tree(operand)
        if T.is_function(tree.type):
            return trees.decay(tree)
        if not trees.is_object(tree) or trees.is_temporary(tree):
            raise CompileError(where, "operator & needs an object")
        if trees.bit_width(tree) is not None:
            raise CompileError(where, "the address of a bit-field cannot be taken")
        return trees.address(tree)

    def _assignment(self, node):
        where = position_of(node)
        target = self.tree(node.lvalue)
        if node.op != "=":
            value = self.value(node.rvalue)
            return operators.compound(node.op[:-1], target, value, where, self.translator.temporary)
        operators.require_modifiable(target, where)
        value = self.convert_assigned(self.value(node.rvalue), target.type, where)
        if T.is_record(target.type):
            return trees.assign(target, self.record_source(value))
        return trees.assign(target, value)

    def record_source(self, value):
        """A record value in a form that a copy can start from: an object, or a call."""
        if value.op == Op.STASG:
            setup, place = operators.stable(value.left, self.translator.temporary)
            copy = Node(Op.STASG, value.type, place, value.right)
            return trees.comma(copy if setup is None else trees.comma(setup, copy), place, trees.TEMPORARY)
        return value

    def record_object(self, value):
        """A record value as an object in memory; a call's result goes to a temporary."""
        value = self.record_source(value)
        if trees.is_object(value):
            return value
        if value.op == Op.COMMAOP:
            inner = self.record_object(value.right)
            return trees.comma(value.left, inner, trees.TEMPORARY)
        place = self.translator.temporary(T.unqualified(value.type))
        return trees.comma(trees.assign(place, value), place, trees.TEMPORARY)

    def _conditional(self, node):
        where = position_of(node)
        condition = self.scalar(node.cond, "the condition")
        yes, no = self.value(node.iftrue), self.value(node.iffalse)
        if T.is_record(yes.type) and T.is_record(no.type):
            if T.strip(yes.type).key != T.strip(no.type).key:
                raise CompileError(where, f"operator ?: cannot take '{yes.type}' and '{no.type}'")
            place = self.translator.temporary(T.unqualified(yes.type))
            arms = [trees.assign(place, self.record_source(arm)) for arm in (yes, no)]
            choice = Node(Op.QUEST, T.VOID, trees.truth(condition), Node(Op.COLON, T.VOID, *arms))
            return trees.comma(choice, place, trees.TEMPORARY)
        return operators.conditional(condition, yes, no, where)

    def _cast(self, node):
        where = position_of(node)
        type_ = self.translator.types.type_of(node.to_type)
        value = self.value(node.expr)
        if not T.is_void(type_) and not T.is_scalar(type_):
            raise CompileError(where, f"cast to '{type_}'")
        if T.is_void(type_):
            return Node(value.op, T.VOID, value.left, value.right, value.value) if value.op == Op.QUEST else value
        if trees.bit_width(value) is not None:
            # A field of its own declared type would pass for converted, and be promoted by its width afterwards.
            value = operators.promoted(value, where)
        result = trees.convert(value, type_, where)
        if T.is_pointer(value.type) and T.is_integer(type_):
            return constants.fold(result) or result
        return result

    def _subscript(self, node):
        where = position_of(node)
        base, index = self.value(node.name), self.value(node.subscript)
        if T.is_pointer(index.type):
            base, index = index, base
        if not T.is_pointer(base.type) or not T.is_integer(index.type):
            raise CompileError(where, f"'{base.type}' cannot be subscripted by '{index.type}'")
        pointer = trees.step(Op.PLUS, base, index, where)
        return Node(Op.UMULT, T.pointed_to(base.type), pointer)

    def _member(self, node):
        where = position_of(node.field) or position_of(node)
        if node.type == "->":
            pointer = self.value(node.name)
            if not T.is_pointer(pointer.type):
                raise CompileError(where, f"operator -> cannot take '{pointer.type}'")
            base = trees.indirect(pointer)
        else:
            base = self.tree(node.name)
        record = T.strip(base.type)
        if not isinstance(record, T.Record):
            raise CompileError(where, f"'{base.type}' has no members")
        path = record.find(node.field.name)
        if path is None:
            what = f"has no member '{node.field.name}'" if record.complete else "is incomplete"
            raise CompileError(where, f"'{record}' {what}")
        return trees.dot(self.record_object(base), path)

    # ---- Calls
    def _call(self, node):
        where = position_of(node)
        arguments = node.args.exprs if node.args else []
        if isinstance(node.name, A.ID):
            special = self._special_call(node.name.name, arguments, where)
            if special is not None:
                return special
        callee = self.value(node.name)
        if not T.is_pointer(callee.type) or not T.is_function(T.pointed_to(callee.type)):
            raise CompileError(where, f"'{callee.type}' cannot be called")
        function = T.strip(T.pointed_to(callee.type))
        values = self._arguments(function, arguments, where)
        result = T.unqualified(function.result)
        if not values:
            return Node(Op.UCALL, result, callee)
        extra = len(values) - len(function.parameters) if function.variadic else 0
        return Node(Op.CALL, result, callee, trees.chain(Op.COMMA, values), extra)

    def _arguments(self, function, arguments, where):
        fixed = len(function.parameters)
        if function.prototype and (len(arguments) < fixed or (len(arguments) > fixed and not function.variadic)):
            raise CompileError(where, f"{len(arguments)} arguments given, {fixed} wanted")
        values = []
        for index, argument in enumerate(arguments):
            at = position_of(argument) or where
            if index < fixed:
                value = self.assigned(argument, function.parameters[index], at)
            else:
                value = self.default_promoted(self.value(argument), at)
            if T.is_record(value.type):
                value = Node(Op.STARG, T.unqualified(value.type), self.record_object(value))
            values.append(value)
        return values

    def default_promoted(self, value, where):
        """The default argument promotions."""
        if T.is_record(value.type):
            return value
        if not T.is_scalar(value.type):
            raise CompileError(where, f"an argument has type '{value.type}'")
        if T.is_floating(value.type):
            return trees.convert(value, T.DOUBLE, where) if T.strip(value.type).key == T.FLOAT.key else value
        return operators.promoted(value, where) if T.is_integer(value.type) else value

    def _special_call(self, name, arguments, where):
        """Calls that are no calls of functions, or None."""
        found = self.scopes.find(name)
        if name == "__builtin_va_start" and len(arguments) == 2:
            return self._va_start(arguments, where)
        if name == "__builtin_complex" and len(arguments) == 2:
            return self._complex(arguments, where)
        if name in ("__builtin_real", "__builtin_imag") and len(arguments) == 1:
            return self._complex_part(Op.REAL if name == "__builtin_real" else Op.IMAG, arguments[0], where)
        if name in intrinsics.TABLE and (found is None or getattr(found, "klass", None) == Symbol.EXTERNAL):
            return self._intrinsic(intrinsics.TABLE[name], arguments, where)
        if found is None:
            self.translator.warn(where, f"function '{name}' is not declared")
            self.translator.declare_function(name, T.Function(T.INT, [], prototype=False), where)
        return None

    def _complex(self, arguments, where):
        """A complex number of two real ones."""
        parts = [self.value(argument) for argument in arguments]
        if not all(T.is_floating(part.type) for part in parts):
            raise CompileError(where, "__builtin_complex takes two floating numbers")
        type_ = T.usual(parts[0].type, parts[1].type)
        if type_ == T.LDOUBLE:
            raise CompileError(where, "'long double _Complex' is not supported")
        return Node(Op.COMPLEX, T.Complex(type_), *(trees.convert(part, type_, where) for part in parts))

    def _complex_part(self, op, argument, where):
        value = self.value(argument)
        if not T.is_arithmetic(value.type):
            raise CompileError(where, f"'{value.type}' is no complex number")
        if not T.is_complex(value.type):
            value = operators.promoted(value, where)
            part = T.strip(value.type) if T.is_floating(value.type) else T.DOUBLE
            value = trees.convert(value, T.Complex(part), where)
        return Node(op, T.strip(value.type).part, value)

    def _va_start(self, arguments, where):
        """The list starts right behind the last named parameter."""
        target = self.tree(arguments[0])
        symbol = self.scopes.find(arguments[1].name) if isinstance(arguments[1], A.ID) else None
        function = self.translator.function
        if function is None or not function.parameters or symbol is not function.parameters[-1]:
            raise CompileError(where, "va_start needs the last parameter of the function")
        start = Node(Op.UAND, T.Pointer(symbol.type), Node(Op.NAME, symbol.type, value=symbol))
        behind = trees.step(Op.PLUS, start, trees.integer(T.INT, 1), where)
        return trees.assign(target, trees.convert(behind, target.type, where))

    def _intrinsic(self, intrinsic, arguments, where):
        if len(arguments) != len(intrinsic.parameters):
            raise CompileError(where, f"{intrinsic.name} takes {len(intrinsic.parameters)} arguments")
        values = []
        for argument, type_ in zip(arguments, intrinsic.parameters):
            at = position_of(argument) or where
            if type_ is not None and T.is_pointer(type_):
                values.append(self._intrinsic_place(argument, type_, at))
            elif type_ is None:
                values.append(self.scalar(argument, "an argument"))
            else:
                values.append(self.assigned(argument, type_, at))
        if not values:
            return Node(intrinsic.bare_op, intrinsic.result, value=intrinsic.name)
        return Node(intrinsic.op, intrinsic.result, trees.chain(Op.COMMA, values), value=intrinsic.name)

    def _intrinsic_place(self, argument, type_, where):
        """An operand that the built-in reads and writes in place: its address, or the object itself."""
        tree = self.tree(argument)
        if trees.is_object(tree) and T.is_arithmetic(tree.type):
            tree = self._address(argument, where)
        value = trees.decay(tree)
        if not T.is_pointer(value.type):
            raise CompileError(where, f"an argument has type '{value.type}' where an object is wanted")
        if T.is_void(T.pointed_to(type_)):
            return value
        return self.convert_assigned(value, type_, where)
