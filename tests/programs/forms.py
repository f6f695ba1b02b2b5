#!/usr/bin/env python3
"""Programs in the other forms that the reader accepts.

A parser has one form for each thing; another parser has another. `rewrite` takes a unit as the parser made it and puts
each tree, at random, into forms that mean the same: casts left out where the operator says them, constants of other
types, increments as assignments and the other way, members through pointers, conditions turned over, loops that test at
their end or count down. It shares nothing with the optimizer: what it makes must print what the unit printed.

  forms.py --seed N [--rate R] [--only FORM,...] WORD...   the words are the parser's
"""
import argparse
import random
import sys
from pathlib import Path

sys.path.insert(0, str(Path(__file__).resolve().parent.parent.parent / "tools"))
from icparse_lib import cli, trees, types as T  # noqa: E402
from icparse_lib.model import Block, FunctionBody, Label, Node, Op, Pragma, Statement, Symbol  # noqa: E402
from icparse_lib.pragmas import SRC_LOOP  # noqa: E402

STREF, LOOP, ENDLOOP = 69, 74, 75
ARITHMETIC = {Op.PLUS, Op.MINUS, Op.MULT, Op.DIV, Op.MOD, Op.ANDB, Op.ORB, Op.XORB}
COMPOUND = {Op.PLUSASG: Op.PLUS, Op.MINUSASG: Op.MINUS, Op.MULTASG: Op.MULT, Op.ANDBASG: Op.ANDB, Op.ORBASG: Op.ORB,
            Op.XORBASG: Op.XORB, Op.DIVASG: Op.DIV, Op.MODASG: Op.MOD}
OPPOSITE_STEP = {Op.PLUSPLUS: Op.MINMIN, Op.MINMIN: Op.PLUSPLUS, Op.PLUSASG: Op.MINUSASG, Op.MINUSASG: Op.PLUSASG}
MIRROR = {Op.EQ: Op.EQ, Op.NEQ: Op.NEQ, Op.LT: Op.GT, Op.GT: Op.LT, Op.LE: Op.GE, Op.GE: Op.LE, Op.ULT: Op.UGT,
          Op.UGT: Op.ULT, Op.ULE: Op.UGE, Op.UGE: Op.ULE}
COMMUTATIVE = {Op.PLUS, Op.MULT, Op.ANDB, Op.ORB, Op.XORB}
INTEGERS = (T.CHAR, T.SHORT, T.INT, T.UINT, T.LONG, T.ULONG, T.LLONG, T.ULLONG)


def plain_integer(type_):
    """The integer type behind `type_`; None for what is no integer or has rules of its own."""
    bare = T.strip(type_)
    return bare if isinstance(bare, T.Integer) and bare.kind not in (0, 3) else None


def is_bit_field(node):
    return node.op in (Op.STDOT, STREF) and node.right.value[1].width is not None


def is_constant(node):
    return node.op == Op.ICON and plain_integer(node.type) is not None


def cast_operand(node):
    """What stands under a cast from one integer type to another that a wider operator makes by itself."""
    if node.op != Op.SCONV or not plain_integer(node.type) or is_bit_field(node.left):
        return None
    return node.left if plain_integer(node.left.type) else None


def is_variable(node):
    """A scalar variable that is read without an effect."""
    return (node.op == Op.NAME and T.is_scalar(node.type) and not T.is_complex(node.type) and
            not T.qualifiers(node.type) & T.VOLATILE)


def combined(a, b):
    return T.usual(T.promote(a), T.promote(b))


def label(number):
    return Node(Op.LABELREF, T.VOID, value=number)


class Trees:
    """Other forms of one tree. Each method named after what it changes gives a new node or None."""

    def __init__(self, rng, rate, only):
        self.rng, self.rate = rng, rate
        self.forms = [getattr(self, name) for name in
                      ("scale", "other_constant", "without_cast", "step", "turned", "truth", "member", "object")
                      if not only or name in only]

    def chance(self):
        return self.rng.random() < self.rate

    def rewrite(self, node, lvalue=False):
        """A new tree. `lvalue`: an object that is written or whose address is taken stays one."""
        if node is None:
            return None
        is_place = node.op == Op.UAND or node.op in COMPOUND or node.op in (
            Op.ASG, Op.STASG, Op.PLUSPLUS, Op.MINMIN, Op.ARGREF, Op.STARG, Op.SLLASG, Op.SRLASG)
        left = self.rewrite(node.left, is_place or (lvalue and node.op == Op.STDOT))
        right = self.rewrite(node.right, lvalue and node.op == Op.COMMAOP)
        node = Node(node.op, node.type, left, right, node.value)
        for form in self.forms:
            if not (lvalue and node.op not in (Op.UMULT, Op.STDOT)) and self.chance():
                node = form(node) or node
        return node

    def constant(self, node, holds):
        """A constant of the same value in another integer type of which `holds` is true; None if there is none."""
        value = node.value
        fitting = [t for t in INTEGERS if t.minimum <= value <= t.maximum and t.key != node.type.key and holds(t)]
        if not fitting:
            return None
        other = trees.integer(self.rng.choice(fitting), value)
        return Node(Op.LCON, other.type, value=value) if self.rng.randrange(2) else other

    # ---- Expressions
    def scale(self, node):
        """An index of its own type: the scale computes in its node's, or in the index's where that is signed."""
        if node.op != Op.PMCONV:
            return None
        index = cast_operand(node.left)
        if index is None:
            return None
        kind, bits = plain_integer(index.type), node.right.value
        if kind.key == T.INT.key and self.chance():
            return Node(Op.PMCONV, T.INT, index, trees.integer(T.INT if bits < 32768 else T.LONG, bits))
        return Node(Op.PMCONV, node.type, index, node.right)

    def other_constant(self, node):
        """A constant whose type leaves the operator's as it is."""
        if node.right is None or not is_constant(node.right) or node.left is None:
            return None
        own = plain_integer(node.left.type)
        if own is None or is_bit_field(node.left):
            return None
        same = lambda t: combined(own, t).key == T.promote(own).key
        if node.op in ARITHMETIC and own.key == T.strip(node.type).key or node.op in MIRROR or node.op in COMPOUND:
            fits = same
        elif node.op in (Op.PLUSPLUS, Op.MINMIN, Op.SLL, Op.SRL):
            fits = lambda t: True
        elif node.op == Op.ASG:
            fits = lambda t: True
        else:
            return None
        other = self.constant(node.right, fits)
        return other and Node(node.op, node.type, node.left, other, node.value)

    def without_cast(self, node):
        left, right = node.left, node.right
        if node.op in (Op.ASG, Op.RETURN):
            if node.op == Op.ASG and (plain_integer(left.type) is None or is_bit_field(left)):
                return None
            bare, target = cast_operand(right), node.type if node.op == Op.RETURN else left.type
            if bare is None or T.strip(target).key != right.type.key:
                return None
            return Node(node.op, node.type, left, bare, node.value)
        if node.op in ARITHMETIC and T.is_pointer(node.type):
            if not T.is_pointer(left.type):
                return None
            bare = cast_operand(right)  # widened by its own sign either way
            if bare is None or T.promote(bare.type).size > right.type.size or T.promote(bare.type).key != T.strip(
                    bare.type).key or T.strip(right.type).size != 32:
                return None
            return Node(node.op, node.type, left, bare)
        if node.op in COMPOUND:
            bare = cast_operand(right)
            if bare is None or plain_integer(left.type) is None or is_bit_field(left):
                return None
            if combined(left.type, bare.type).key != combined(left.type, right.type).key:
                return None
            return Node(node.op, node.type, left, bare)
        if node.op in ARITHMETIC or node.op in MIRROR:
            sides = [cast_operand(left), cast_operand(right)]
            pick = self.rng.randrange(2)
            bare, other = sides[pick], (right, left)[pick]
            if bare is None or plain_integer(other.type) is None or is_bit_field(other):
                return None
            if combined(bare.type, other.type).key != combined(left.type, right.type).key:
                return None
            return Node(node.op, node.type, *((bare, right) if pick == 0 else (left, bare)))
        return None

    def step(self, node):
        """The same change of a variable by a constant as another operator. The value of `x++` is the old one."""
        if node.op not in OPPOSITE_STEP or not is_variable(node.left) or not is_constant(node.right):
            return None
        x, c = node.left, node.right
        kind = plain_integer(x.type)
        if kind is None and not T.is_pointer(x.type):
            return None
        if kind is not None and kind.size < 16:
            return None
        choice = self.rng.randrange(3)
        if node.op in (Op.PLUSPLUS, Op.MINMIN):
            if choice == 0 and kind is not None and T.promote(kind).key == kind.key:  # (x += c) - c
                adds = Node(Op.PLUSASG if node.op == Op.PLUSPLUS else Op.MINUSASG, node.type, x, c)
                return Node(Op.MINUS if node.op == Op.PLUSPLUS else Op.PLUS, kind, adds, trees.integer(kind, c.value))
        elif choice < 2:  # (x++, x)
            steps = Node(Op.PLUSPLUS if node.op == Op.PLUSASG else Op.MINMIN, node.type, x, c)
            return Node(Op.COMMAOP, T.unqualified(x.type), steps, x)
        if plain_integer(c.type).signed and -32767 <= c.value:
            return Node(OPPOSITE_STEP[node.op], node.type, x, trees.integer(c.type, -c.value))
        return None

    def turned(self, node):
        """The constant on the left; a signed difference with a constant as a sum; an integer ahead of its pointer."""
        if node.op in MIRROR and trees.is_integer_constant(node.right):
            return Node(MIRROR[node.op], node.type, node.right, node.left)
        if node.op in COMMUTATIVE and trees.is_integer_constant(node.right):
            return Node(node.op, node.type, node.right, node.left)
        if node.op == Op.MINUS and is_constant(node.right) and T.is_pointer(node.type):
            return Node(Op.PLUS, node.type, node.left, trees.integer(T.LONG, -node.right.value))
        return None

    def truth(self, node):
        """`x != 0` where a truth is asked for, `!c` as `c == 0`."""
        is_asked = node.op in (Op.CBRANCH, Op.QUEST, Op.EXCLAIM, Op.ANDAND, Op.OROR)
        if is_asked and node.left.op == Op.NEQ and trees.is_integer_constant(node.left.right) and (
                node.left.right.value == 0) and not is_bit_field(node.left.left) and plain_integer(node.left.left.type):
            return Node(node.op, node.type, node.left.left, node.right, node.value)
        if node.op == Op.EXCLAIM and plain_integer(node.left.type) and not is_bit_field(node.left):
            return Node(Op.EQ, T.INT, node.left, trees.integer(T.promote(node.left.type), 0))
        if is_asked and node.op != Op.EXCLAIM and node.left.op in trees.TRUTHS:
            inverse = Node(Op.EXCLAIM, T.INT, Node(Op.EXCLAIM, T.INT, node.left))
            return Node(node.op, node.type, inverse, node.right, node.value)
        return None

    def member(self, node):
        """`(*p).f` as `p->f`."""
        if node.op != Op.STDOT or node.left.op != Op.UMULT or not T.is_record(T.pointed_to(node.left.left.type)):
            return None
        return Node(STREF, node.type, node.left.left, node.right)

    def object(self, node):
        """A variable by its address; a condition's value by its truth."""
        if is_variable(node) and node.value.klass != Symbol.REGISTER:
            return Node(Op.UMULT, node.type, Node(Op.UAND, T.Pointer(node.type), node))
        return None


class Function:
    """Other shapes of a function's statements."""

    def __init__(self, body, rng, rate, only):
        self.body, self.rng, self.rate, self.only = body, rng, rate, only
        self.trees = Trees(rng, rate, only)
        self.last_label = max((item.number for item in self.all_items(body.block)
                               if isinstance(item, Label)), default=0) + 10000
        self.counters, self.counts = 0, {}  # by the label at the top of a loop: a counter and the label that it goes to

    def all_items(self, block):
        for item in block.items:
            yield item
            if isinstance(item, Block):
                yield from self.all_items(item)

    def chance(self, form):
        return (not self.only or form in self.only) and self.rng.random() < self.rate

    def new_label(self):
        self.last_label += 1
        return self.last_label

    def rewrite(self):
        self.block(self.body.block)

    def block(self, block):
        heads = {}  # label at the top of a loop: the test that follows it, and a label behind that
        out = []
        items = block.items
        for at, item in enumerate(items):
            if isinstance(item, Block):
                self.block(item)
                out.append(item)
            elif isinstance(item, Statement):
                self.statement(item, heads, out)
            elif self.is_loop(items, at) and self.chance("count"):
                self.count(item, out)
            else:
                out.append(item)
            is_test = isinstance(item, Statement) and item.tree.op == Op.CBRANCH
            if is_test and at and self.is_loop(items, at - 1) and self.chance("loop"):
                inner = self.new_label()
                heads[items[at - 1].number] = item.tree, inner
                out.append(Label(inner))
        block.items = out

    @staticmethod
    def is_loop(items, at):
        """Whether items[at] is a label that a later branch of the same list goes back to. Nothing is promised of it."""
        if not isinstance(items[at], Label):
            return False
        if at and isinstance(items[at - 1], Pragma) and items[at - 1].kind != SRC_LOOP:
            return False
        return any(isinstance(item, Statement) and item.tree.op == Op.BRANCH and
                   item.tree.left.value == items[at].number for item in items[at + 1:])

    def count(self, top, out):
        """A counter is set ahead of the loop. Its end counts down, and goes on as before once the count is out."""
        self.counters += 1
        symbol = Symbol(f"$count{self.counters}", T.INT, Symbol.AUTO, 2, self.body.position)
        self.body.block.symbols.append(symbol)
        counter, inner = Node(Op.NAME, T.INT, value=symbol), self.new_label()
        put = lambda t: out.append(Statement(t, self.body.position))
        put(trees.assign(counter, trees.integer(T.INT, self.rng.randrange(6))))
        out.append(top)
        put(Node(LOOP, T.VOID, counter, label(inner)))
        self.counts[top.number] = counter, inner

    def statement(self, item, heads, out):
        tree, where = item.tree, item.position
        put = lambda t: out.append(Statement(t, where))
        if tree.op == Op.CBRANCH:
            self.branch_if_false(self.trees.rewrite(tree).left, tree.right.value, put, out)
            return
        if tree.op == Op.BRANCH:
            if tree.left.value in self.counts:
                counter, inner = self.counts[tree.left.value]
                put(Node(ENDLOOP, T.VOID, counter, label(inner)))
            if tree.left.value in heads:
                test, inner = heads[tree.left.value]
                self.branch_if_false(self.trees.rewrite(test).left, test.right.value, put, out)
                put(Node(Op.BRANCH, T.VOID, label(inner)))
                return
        if tree.op == Op.SWITCH and self.chance("switch"):
            self.cases(tree)
        new = self.trees.rewrite(tree)
        if new.op == Op.COMMAOP:  # the value is not wanted
            put(new.left)
            if new.right.op != Op.NAME:
                put(new.right)
        elif new.op in (Op.MINUS, Op.PLUS) and tree.op in OPPOSITE_STEP:
            put(new.right if trees.is_integer_constant(new.left) else new.left)
        else:
            put(new)

    def cases(self, tree):
        """Cases in another order; the default is the last."""
        items, lst = [], tree.right
        while lst.op == Op.COMMA:
            items.insert(0, lst.right)
            lst = lst.left
        items.insert(0, lst)
        cases, rest = items[:-1], items[-1:]
        self.rng.shuffle(cases)
        tree.right = trees.chain(Op.COMMA, cases + rest)

    def branch_if_false(self, condition, target, put, out):
        if condition.op in (Op.ANDAND, Op.OROR) and self.chance("branches"):
            if condition.op == Op.ANDAND:
                self.branch_if_false(condition.left, target, put, out)
                self.branch_if_false(condition.right, target, put, out)
                return
            past = self.new_label()
            self.branch_if_false(Node(Op.EXCLAIM, T.INT, condition.left), past, put, out)
            self.branch_if_false(condition.right, target, put, out)
            out.append(Label(past))
        elif self.chance("inverted"):
            past = self.new_label()
            put(Node(Op.CBRANCH, T.VOID, Node(Op.EXCLAIM, T.INT, condition), label(past)))
            put(Node(Op.BRANCH, T.VOID, label(target)))
            out.append(Label(past))
        else:
            put(Node(Op.CBRANCH, T.VOID, condition, label(target)))


def main(arguments):
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("--seed", default="0")
    parser.add_argument("--rate", type=float, default=0.5, help="how often each form is taken (0.5)")
    parser.add_argument("--only", default="", help="names of forms")
    own, words = parser.parse_known_args(arguments)
    rng, only = random.Random(own.seed), own.only.split(",") if own.only else []

    def rewrite(unit):
        for item in unit.items:
            if isinstance(item, FunctionBody):
                Function(item, rng, own.rate, only).rewrite()

    return cli.main(words, rewrite)


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
