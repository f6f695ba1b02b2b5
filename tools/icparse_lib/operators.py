"""The operators of C on trees: operand checks, the usual conversions, the opcode."""
from . import constants, trees, types as T
from .errors import CompileError
from .model import Node, Op

_PLAIN = {"*": Op.MULT, "/": Op.DIV, "%": Op.MOD, "&": Op.ANDB, "|": Op.ORB, "^": Op.XORB, "+": Op.PLUS, "-": Op.MINUS,
          "<<": Op.SLL, ">>": Op.SRL}
_ASSIGNING = {"*": Op.MULTASG, "/": Op.DIVASG, "%": Op.MODASG, "&": Op.ANDBASG, "|": Op.ORBASG, "^": Op.XORBASG,
              "+": Op.PLUSASG, "-": Op.MINUSASG, "<<": Op.SLLASG, ">>": Op.SRLASG}
_ACTING = {Op.CALL, Op.UCALL, Op.ICALL, Op.UICALL, Op.MCALL, Op.UMCALL, Op.ASG, Op.STASG, Op.PLUSPLUS, Op.MINMIN,
           *_ASSIGNING.values()}
_COMPARE = {"==": (Op.EQ, Op.EQ), "!=": (Op.NEQ, Op.NEQ), "<": (Op.LT, Op.ULT), "<=": (Op.LE, Op.ULE),
            ">": (Op.GT, Op.UGT), ">=": (Op.GE, Op.UGE)}
_INTEGER_ONLY = {"%", "&", "|", "^", "<<", ">>"}
# Operators whose low result bits depend only on the operands' low bits.
_MODULAR = {"+", "-", "*", "&", "|", "^"}


def promoted(node, where):
    return trees.convert(node, T.promote(node.type, trees.bit_width(node)), where)


def _bad_operands(operator, left, right, where):
    return CompileError(where, f"operator {operator} cannot take '{left.type}' and '{right.type}'")


def binary(operator, left, right, where):
    """A binary operator on two values, without the logical and the assigning ones."""
    if operator in _COMPARE:
        return compare(operator, left, right, where)
    if operator in "+-" and (T.is_pointer(left.type) or T.is_pointer(right.type)):
        return _pointer_arithmetic(operator, left, right, where)
    check = T.is_integer if operator in _INTEGER_ONLY else T.is_arithmetic
    if not check(left.type) or not check(right.type):
        raise _bad_operands(operator, left, right, where)
    left, right = promoted(left, where), promoted(right, where)
    if operator in ("<<", ">>"):
        return Node(_PLAIN[operator], T.as_integer(left.type), left, trees.convert(right, T.INT, where))
    common = T.usual(left.type, right.type)
    return Node(_PLAIN[operator], common, trees.convert(left, common, where), trees.convert(right, common, where))


def _pointer_arithmetic(operator, left, right, where):
    if T.is_pointer(left.type) and T.is_pointer(right.type):
        a, b = T.pointed_to(left.type), T.pointed_to(right.type)
        if operator == "+" or not T.compatible(T.unqualified(a), T.unqualified(b)):
            raise _bad_operands(operator, left, right, where)
        units = trees.units_of(a, where)
        difference = Node(Op.MINUS, T.PTRDIFF_T, left, trees.retype(right, T.unqualified(left.type)))
        return difference if units == 1 else Node(Op.DIV, T.PTRDIFF_T, difference, trees.integer(T.PTRDIFF_T, units))
    if operator == "+" and T.is_pointer(right.type):
        left, right = right, left
    if not T.is_pointer(left.type) or not T.is_integer(right.type):
        raise _bad_operands(operator, left, right, where)
    return trees.step(_PLAIN[operator], left, right, where)


def compare(operator, left, right, where):
    signed, unsigned = _COMPARE[operator]
    if signed not in (Op.EQ, Op.NEQ) and (T.is_complex(left.type) or T.is_complex(right.type)):
        raise _bad_operands(operator, left, right, where)
    if T.is_arithmetic(left.type) and T.is_arithmetic(right.type):
        left, right = promoted(left, where), promoted(right, where)
        common = T.usual(left.type, right.type)
        op = signed if T.is_floating(common) or common.signed else unsigned
        return Node(op, T.INT, trees.convert(left, common, where), trees.convert(right, common, where))
    left, right = _common_pointers(operator, left, right, where)
    return Node(unsigned, T.INT, left, right)


def _common_pointers(operator, left, right, where):
    """Two operands, one of them a pointer, under one pointer type."""
    if trees.is_null_constant(right) and T.is_pointer(left.type):
        return left, trees.zero(left.type)
    if trees.is_null_constant(left) and T.is_pointer(right.type):
        return trees.zero(right.type), right
    if not T.is_pointer(left.type) or not T.is_pointer(right.type):
        raise _bad_operands(operator, left, right, where)
    return left, trees.retype(right, T.unqualified(left.type))


def logical(operator, left, right, where):
    for operand in (left, right):
        if not T.is_scalar(operand.type):
            raise _bad_operands(operator, left, right, where)
    op = Op.ANDAND if operator == "&&" else Op.OROR
    return Node(op, T.INT, trees.truth(left), trees.truth(right))


def unary(operator, operand, where):
    """`+ - ~ !` on a value."""
    accepts = {"!": T.is_scalar, "~": T.is_integer}.get(operator, T.is_arithmetic)
    if not accepts(operand.type):
        raise CompileError(where, f"operator {operator} cannot take '{operand.type}'")
    if operator == "!":
        return trees.falsity(operand)
    operand = promoted(operand, where)
    if operator == "+":
        return operand
    type_ = T.as_integer(operand.type) if T.is_integer(operand.type) else T.strip(operand.type)
    node = Node(Op.UMINUS if operator == "-" else Op.NOTB, type_, operand)
    literal = trees.is_integer_constant(operand) or operand.op == Op.FCON
    return constants.fold(node) or node if literal else node


def conditional(condition, yes, no, where):
    """`?:` on values that are no records."""
    test = trees.truth(condition)
    if T.is_void(yes.type) or T.is_void(no.type):
        return Node(Op.QUEST, T.VOID, test, Node(Op.COLON, T.VOID, yes, no))
    if T.is_arithmetic(yes.type) and T.is_arithmetic(no.type):
        yes, no = promoted(yes, where), promoted(no, where)
        common = T.usual(yes.type, no.type)
        yes, no = trees.convert(yes, common, where), trees.convert(no, common, where)
    elif T.is_pointer(yes.type) or T.is_pointer(no.type):
        if T.is_pointer(yes.type) and T.is_pointer(no.type) and not trees.is_null_constant(yes) and not (
                trees.is_null_constant(no)):
            common = _merged_pointer(yes.type, no.type)
            yes, no = trees.retype(yes, common), trees.retype(no, common)
        else:
            yes, no = _common_pointers("?:", yes, no, where)
            common = T.unqualified(yes.type)
    else:
        raise _bad_operands("?:", yes, no, where)
    return Node(Op.QUEST, common, test, Node(Op.COLON, common, yes, no))


def _merged_pointer(left, right):
    """The pointer type of a conditional: qualifiers of both targets, void if either target is."""
    a, b = T.pointed_to(left), T.pointed_to(right)
    base = a if T.is_void(a) or not T.is_void(b) else b
    bits = T.qualifiers(a) | T.qualifiers(b)
    return T.Pointer(T.qualify(base, bits & ~T.qualifiers(base)))


# ---- Assignments
def require_modifiable(target, where):
    if not trees.is_object(target) or trees.is_temporary(target) or target.op == Op.SCON:
        raise CompileError(where, "the left operand of an assignment must be an object")
    if T.qualifiers(target.type) & T.CONST or (T.is_record(target.type) and _has_const(T.strip(target.type))):
        raise CompileError(where, f"assignment to an object of type '{target.type}'")
    if T.is_array(target.type) or not target.type.complete:
        raise CompileError(where, f"assignment to an object of type '{target.type}'")


def _has_const(record):
    for member in record.members:
        if T.qualifiers(member.type) & T.CONST:
            return True
        inner = T.strip(member.type)
        if isinstance(inner, T.Record) and _has_const(inner):
            return True
    return False


def is_pure(node):
    """Whether evaluating a tree twice is the same as once: no side effects, no calls, nothing volatile."""
    if node is None:
        return True
    if node.op in _ACTING:
        return False
    if node.op in (Op.NAME, Op.UMULT, Op.STDOT) and T.qualifiers(node.type) & T.VOLATILE:
        return False
    return is_pure(node.left) and is_pure(node.right)


def stable(target, make_temporary):
    """(set-up tree or None, object that may be named twice) for an object whose address may have side effects."""
    if target.op == Op.STDOT:
        setup, base = stable(target.left, make_temporary)
        return setup, Node(Op.STDOT, target.type, base, target.right)
    if target.op == Op.COMMAOP:
        setup, base = stable(target.right, make_temporary)
        return target.left if setup is None else trees.comma(target.left, setup), base
    if target.op == Op.UMULT and not is_pure(target.left):
        pointer = make_temporary(T.unqualified(target.left.type))
        return trees.assign(pointer, target.left), Node(Op.UMULT, target.type, pointer)
    return None, target


def _in_place(operator, target, value):
    """Whether `target op= value` may run in the target's own type; then that type, else None."""
    own = T.strip(target.type)
    if isinstance(own, T.Floating):
        if not T.is_arithmetic(value.type):
            return None
        return own if T.usual(own, T.promote(value.type)).key == own.key else None
    if isinstance(own, T.Complex):
        return None
    own = T.as_integer(own)
    if own.kind == 0 or not T.is_integer(value.type):
        return None
    work = T.promote(target.type, trees.bit_width(target))
    if operator in ("<<", ">>"):
        return own if work.size == own.size and work.signed == own.signed else None
    common = T.usual(work, T.promote(value.type, trees.bit_width(value)))
    if common.size == own.size and common.signed == own.signed:
        return own
    return own if operator in _MODULAR and not own.signed and trees.bit_width(target) is None else None


def compound(operator, target, value, where, make_temporary):
    """`target operator= value`."""
    require_modifiable(target, where)
    type_ = T.unqualified(target.type)
    if T.is_pointer(type_):
        if operator not in "+-" or not T.is_integer(value.type):
            raise _bad_operands(operator + "=", target, value, where)
        return Node(_ASSIGNING[operator], type_, target, trees.scaled(value, T.pointed_to(type_), where))
    check = T.is_integer if operator in _INTEGER_ONLY else T.is_arithmetic
    if not check(type_) or not check(value.type):
        raise _bad_operands(operator + "=", target, value, where)
    own = _in_place(operator, target, value)
    if own is not None:
        operand = trees.convert(value, T.INT if operator in ("<<", ">>") else own, where)
        return Node(_ASSIGNING[operator], type_, target, operand)
    # The operation is wider than the target: it is written out, the target's address computed once.
    setup, place = stable(target, make_temporary)
    result = trees.assign(place, trees.convert(binary(operator, place, value, where), type_, where))
    return result if setup is None else trees.comma(setup, result)


def increment(operator, postfix, target, where, make_temporary):
    """`++` and `--`, before or after their operand."""
    require_modifiable(target, where)
    if not T.is_scalar(target.type) or T.is_complex(target.type):
        raise CompileError(where, f"operator {operator} cannot take '{target.type}'")
    sign = operator[0]
    if not postfix or T.strip(target.type).key == T.BOOL.key:
        one = trees.integer(T.INT, 1)
        if not postfix:
            return compound(sign, target, one, where, make_temporary)
        setup, place = stable(target, make_temporary)
        old = make_temporary(T.unqualified(target.type))
        after = trees.comma(compound(sign, place, one, where, make_temporary), old)
        result = trees.comma(trees.assign(old, place), after)
        return result if setup is None else trees.comma(setup, result)
    type_ = T.unqualified(target.type)
    if T.is_pointer(type_):
        by = trees.scaled(trees.integer(T.INT, 1), T.pointed_to(type_), where)
    elif T.is_floating(type_):
        by = trees.floating(type_, 1.0)
    else:
        by = trees.integer(T.as_integer(type_), 1)
    return Node(Op.PLUSPLUS if sign == "+" else Op.MINMIN, type_, target, by)
