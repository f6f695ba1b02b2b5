"""Statements: from syntax to the records of a function's body."""
from pycparser import c_ast as A

from . import constants, literals, operators, pragmas, trees, types as T
from .errors import CompileError, position_of
from .initializers import ZeroRun
from .model import Block, ExceptionEntry, Label, Node, Op, Pragma, Statement, Text

_VALUE_OPERATORS = {Op.PLUS, Op.MINUS, Op.MULT, Op.DIV, Op.MOD, Op.ANDB, Op.ORB, Op.XORB, Op.SLL, Op.SRL, Op.SCONV,
                    Op.PCONV, Op.PMCONV, Op.UMINUS, Op.NOTB, Op.EXCLAIM, Op.UAND} | trees.COMPARISONS


class Switch:
    def __init__(self, type_):
        self.type, self.cases, self.default = type_, {}, None


class Statements:
    """Emits one function's statements. A fresh one serves each function."""

    def __init__(self, translator, body):
        self.translator, self.expressions, self.scopes = translator, translator.expressions, translator.scopes
        self.body = body
        self.items = body.block.items
        self.last_label = 0
        self.referenced = set()  # numbers of labels that a statement names
        self.labels = {}        # name: [number, defined, position of first use]
        self.break_labels, self.continue_labels, self.switches = [], [], []
        self.loop_pragmas = []  # for the next loop
        self.last_lines = {}  # of the syntax nodes of loops
        self.regions = []  # exception entries that calls are in, the innermost last
        self.reachable = True
        self.builders = {
            A.Compound: self._compound, A.If: self._if, A.While: self._while, A.DoWhile: self._do, A.For: self._for,
            A.Switch: self._switch, A.Case: self._case, A.Default: self._default, A.Return: self._return,
            A.Break: self._break, A.Continue: self._continue, A.Goto: self._goto, A.Label: self._label,
            A.Decl: self._declaration, A.DeclList: self._declarations, A.Typedef: self._declaration,
            A.Pragma: self._pragma, A.EmptyStatement: lambda node: None, A.StaticAssert: translator.static_assert,
        }

    # ---- Emitting
    def emit(self, tree, where):
        if self.regions:
            self._enter_calls(tree)
        self.items.append(Statement(tree, where))

    def new_label(self):
        self.last_label += 1
        return self.last_label

    def place_label(self, number):
        """A label that something names, or will: the head of a loop, a case, a label of the source."""
        self.items.append(Label(number))
        self.reachable = True

    def join(self, number):
        """A label that is only named by what stands before it, and left out if nothing does."""
        if number in self.referenced:
            self.place_label(number)

    def _reference(self, number):
        self.referenced.add(number)
        return Node(Op.LABELREF, T.VOID, value=number)

    def branch(self, number, where):
        self.emit(Node(Op.BRANCH, T.VOID, self._reference(number)), where)
        self.reachable = False

    def branch_if_false(self, condition, number, where):
        value = constants.integer_value(condition)
        if value is None:
            self.emit(Node(Op.CBRANCH, T.VOID, condition, self._reference(number)), where)
        elif value == 0:
            self.branch(number, where)

    def effects(self, tree, where):
        """Emits what evaluating `tree` does; its value is not wanted."""
        if operators.is_pure(tree):
            return
        if tree.op == Op.COMMAOP:
            self.effects(tree.left, where)
            self.effects(tree.right, where)
        elif tree.op in _VALUE_OPERATORS:
            self.effects(tree.left, where)
            if tree.right is not None:
                self.effects(tree.right, where)
        elif tree.op in (Op.ANDAND, Op.OROR):
            self._logical_effects(tree, where)
        elif tree.op == Op.QUEST:
            self._conditional_effects(tree, where)
        elif tree.op in (Op.UMULT, Op.STDOT, Op.NAME) and not T.qualifiers(tree.type) & T.VOLATILE:
            self.effects(tree.left, where)
        else:
            self.emit(tree, where)

    def _logical_effects(self, tree, where):
        if operators.is_pure(tree.right):
            self.effects(tree.left, where)
            return
        done = self.new_label()
        condition = tree.left if tree.op == Op.ANDAND else trees.falsity(tree.left)
        self.branch_if_false(condition, done, where)
        self.effects(tree.right, where)
        self.join(done)

    def _conditional_effects(self, tree, where):
        otherwise, done = self.new_label(), self.new_label()
        self.branch_if_false(tree.left, otherwise, where)
        self.effects(tree.right.left, where)
        self.branch(done, where)
        self.join(otherwise)
        self.effects(tree.right.right, where)
        self.join(done)

    # ---- Statements
    def statement(self, node):
        if node is None:
            return
        build = self.builders.get(type(node))
        if self.loop_pragmas and not isinstance(node, (A.For, A.While, A.DoWhile, A.Pragma)):
            self.translator.warn(position_of(node), "the loop pragma stands before no loop")
            self.loop_pragmas = []
        if build is not None:
            build(node)
            return
        where = position_of(node)
        if isinstance(node, A.FuncCall) and isinstance(node.name, A.ID) and node.name.name == "asm":
            self.items.append(Text(assembly_text(node, where), where))
            return
        if isinstance(node, A.FuncCall) and isinstance(node.name, A.ID) and node.name.name.startswith("__eh_"):
            self._exception_region(node.name.name, node.args.exprs if node.args else [], where)
            return
        self.effects(self.expressions.value(node), where)

    # ---- Exceptions: what zrun.h says of them
    def _enter_calls(self, tree):
        pending = [tree]
        while pending:
            node = pending.pop()
            if node.op in (Op.CALL, Op.UCALL):
                node.exception_entry = self.regions[-1]
            pending += [n for n in (node.left, node.right) if n is not None]

    def _exception_region(self, name, arguments, where):
        entries = self.body.exceptions
        if not entries:
            entries.append(ExceptionEntry(ExceptionEntry.PASS, 0))
        outer = self.regions[-1] if self.regions else 1
        if name == "__eh_end" and self.regions:
            self.regions.pop()
            return
        if name == "__eh_catch" and len(arguments) == 2 and isinstance(arguments[0], A.Constant):
            number = self._named_label(arguments[1].name, where)[0]
            self.referenced.add(number)
            entry = ExceptionEntry(ExceptionEntry.CATCH, outer, (arguments[0].value.strip('"'), number))
        elif name == "__eh_cleanup" and len(arguments) == 1:
            tree = self.expressions.value(arguments[0])
            self._enter_calls(tree) if self.regions else None
            entry = ExceptionEntry(ExceptionEntry.CLEANUP, outer, tree)
        elif name == "__eh_pass" and not arguments:
            self.regions.append(outer)
            return
        elif name == "__eh_terminate" and not arguments:
            entry = ExceptionEntry(ExceptionEntry.TERMINATE, outer)
        else:
            raise CompileError(where, f"{name} is wrong here")
        entries.append(entry)
        self.regions.append(len(entries))

    def function_body(self, compound):
        errors, depth, items = self.translator.errors, len(self.scopes.stack), self.items
        count = len(errors)
        for item in compound.block_items or []:
            try:
                self.statement(item)
            except CompileError as error:
                if isinstance(item, A.Decl):
                    raise  # what it was to declare is missing in all that follows
                errors.append(error)
                del self.scopes.stack[depth:]
                self.items = items
        if len(errors) > count:
            return
        if self.regions:
            raise CompileError(self.body.position, "a region of exceptions has no end")
        for name, (_, defined, where) in self.labels.items():
            if not defined:
                raise CompileError(where, f"label '{name}' is not defined")

    def _compound(self, node):
        self._in_scope(position_of(node), lambda: [self.statement(item) for item in node.block_items or []])

    def _in_scope(self, where, build):
        """Runs `build` with a scope of its own, which becomes a block if it has symbols."""
        outer, block = self.items, Block(where)
        self.items = block.items
        self.scopes.push(block)
        build()
        self.scopes.pop()
        self.items = outer
        if block.symbols:
            outer.append(block)
        else:
            outer += block.items

    def _declarations(self, node):
        for decl in node.decls:
            self._declaration(decl)

    def _declaration(self, node):
        self.translator.local_declaration(node, self)

    def initialize(self, place, type_, part, where):
        """Emits the assignments that initialize an automatic object."""
        for item in self.translator.initializers.assignments(place, type_, part, where):
            if isinstance(item, ZeroRun):
                self._clear(item, where)
            else:
                self.emit(item, where)

    def _clear(self, run, where):
        counter = self.translator.temporary(T.INT if run.first + run.count <= T.INT.maximum else T.LONG)
        top, done = self.new_label(), self.new_label()
        self.emit(trees.assign(counter, trees.integer(counter.type, run.first)), where)
        self.place_label(top)
        limit = trees.integer(counter.type, run.first + run.count)
        self.branch_if_false(Node(Op.LT, T.INT, counter, limit), done, where)
        element = run.element(counter)
        self.emit(trees.assign(element, trees.zero(element.type)), where)
        self.emit(Node(Op.PLUSPLUS, counter.type, counter, trees.integer(counter.type, 1)), where)
        self.branch(top, where)
        self.join(done)

    def _condition(self, node):
        return trees.truth(self.expressions.scalar(node, "the condition"))

    def _if(self, node):
        where = position_of(node)
        otherwise = self.new_label()
        self.branch_if_false(self._condition(node.cond), otherwise, where)
        self._in_scope(where, lambda: self.statement(node.iftrue))
        if node.iffalse is None:
            self.join(otherwise)
            return
        done = self.new_label()
        if self.reachable:
            self.branch(done, where)
        self.join(otherwise)
        self._in_scope(where, lambda: self.statement(node.iffalse))
        self.join(done)

    def _begin_loop(self, node, keyword):
        """Puts the loop's place in the source and the waiting loop pragmas right before its first label."""
        self.items.append(self._source_loop(node, keyword))
        self.items += self.loop_pragmas
        self.loop_pragmas = []
        labels = self.new_label(), self.new_label(), self.new_label()
        self.continue_labels.append(labels[1])
        self.break_labels.append(labels[2])
        return labels

    def _source_loop(self, node, keyword):
        """The pragma that reports name a loop by: first line, variable, last line, keyword."""
        where = position_of(node)
        start = str(where.line) if where.file == self.body.position.file else f"{where.file}:{where.line}"
        variable = loop_variable(node.next) if isinstance(node, A.For) else ""
        return Pragma(pragmas.SRC_LOOP, [start, variable, str(self._last_line(node)), keyword])

    def _last_line(self, node):
        """The greatest line number of a loop's syntax tree. The first call for an outer loop finds those of its inner ones."""
        if node not in self.last_lines:
            before, pending = [], [node]
            while pending:
                item = pending.pop()
                below = [child for _, child in item.children()]
                before.append((item, below))
                pending += below
            lines = {}
            for item, below in reversed(before):
                lines[item] = max([getattr(item.coord, "line", 0) or 0, *map(lines.get, below)])
                if isinstance(item, (A.For, A.While, A.DoWhile)):
                    self.last_lines[item] = lines[item]
        return self.last_lines[node]

    def _end_loop(self, done):
        self.continue_labels.pop()
        self.break_labels.pop()
        self.join(done)

    def _while(self, node):
        where = position_of(node)
        top, again, done = self._begin_loop(node, "while")
        self.continue_labels[-1] = again = top
        self.place_label(top)
        self.branch_if_false(self._condition(node.cond), done, where)
        self._in_scope(where, lambda: self.statement(node.stmt))
        self.branch(again, where)
        self._end_loop(done)

    def _do(self, node):
        where = position_of(node)
        top, again, done = self._begin_loop(node, "do")
        self.place_label(top)
        self._in_scope(where, lambda: self.statement(node.stmt))
        self.join(again)
        condition = self._condition(node.cond)
        at = position_of(node.cond) or where
        if constants.integer_value(condition) != 0:
            self.branch_if_false(condition, done, at)
            self.branch(top, at)
        self._end_loop(done)

    def _for(self, node):
        where = position_of(node)
        self._in_scope(where, lambda: self._for_in_scope(node, where))

    def _for_in_scope(self, node, where):
        waiting, self.loop_pragmas = self.loop_pragmas, []
        self.statement(node.init)
        self.loop_pragmas = waiting
        top, again, done = self._begin_loop(node, "for")
        self.place_label(top)
        if node.cond is not None:
            self.branch_if_false(self._condition(node.cond), done, where)
        self._in_scope(where, lambda: self.statement(node.stmt))
        self.join(again)
        if node.next is not None:
            self.effects(self.expressions.value(node.next), position_of(node.next) or where)
        self.branch(top, where)
        self._end_loop(done)

    def _switch(self, node):
        where = position_of(node)
        value = self.expressions.value(node.cond)
        if not T.is_integer(value.type):
            raise CompileError(where, f"switch on '{value.type}'")
        value = operators.promoted(value, where)
        done, switch = self.new_label(), Switch(T.as_integer(value.type))
        self.break_labels.append(done)
        self.switches.append(switch)
        at = len(self.items)
        self.reachable = False
        self._in_scope(where, lambda: self.statement(node.stmt))
        self.break_labels.pop()
        self.switches.pop()
        default = switch.default or done
        body, self.items[at:] = self.items[at:], []
        if switch.cases:
            cases = [Node(Op.CASE, T.VOID, trees.integer(switch.type, constant), self._reference(label))
                     for constant, label in switch.cases.items()]
            cases.append(Node(Op.DEFAULT, T.VOID, self._reference(default)))
            self.emit(Node(Op.SWITCH, switch.type, value, trees.chain(Op.COMMA, cases), len(switch.cases)), where)
        else:
            self.effects(value, where)
            self.emit(Node(Op.BRANCH, T.VOID, self._reference(default)), where)
        self.items += body
        self.join(done)

    def _case(self, node):
        where = position_of(node)
        if not self.switches:
            raise CompileError(where, "case outside a switch")
        switch = self.switches[-1]
        constant = constants.require_integer(self.expressions.value(node.expr), where, "the case label")
        constant = switch.type.wrap(constant)
        if constant in switch.cases:
            raise CompileError(where, f"duplicate case {constant}")
        switch.cases[constant] = self.new_label()
        self.place_label(switch.cases[constant])
        for item in node.stmts or []:
            self.statement(item)

    def _default(self, node):
        where = position_of(node)
        if not self.switches or self.switches[-1].default is not None:
            raise CompileError(where, "default outside a switch" if not self.switches else "duplicate default")
        self.switches[-1].default = self.new_label()
        self.place_label(self.switches[-1].default)
        for item in node.stmts or []:
            self.statement(item)

    def _break(self, node):
        if not self.break_labels:
            raise CompileError(position_of(node), "break outside a loop or switch")
        self.branch(self.break_labels[-1], position_of(node))

    def _continue(self, node):
        if not self.continue_labels:
            raise CompileError(position_of(node), "continue outside a loop")
        self.branch(self.continue_labels[-1], position_of(node))

    def _named_label(self, name, where):
        if name not in self.labels:
            self.labels[name] = [self.new_label(), False, where]
        return self.labels[name]

    def _goto(self, node):
        where = position_of(node)
        self.branch(self._named_label(node.name, where)[0], where)

    def _label(self, node):
        where = position_of(node)
        label = self._named_label(node.name, where)
        if label[1]:
            raise CompileError(where, f"duplicate label '{node.name}'")
        label[1] = True
        self.place_label(label[0])
        self.statement(node.stmt)

    def _return(self, node):
        where = position_of(node)
        result = self.translator.function.result
        function = Node(Op.NAME, self.body.symbol.type, value=self.body.symbol)
        if node.expr is None:
            if not T.is_void(result):
                raise CompileError(where, "return without a value")
            self.emit(Node(Op.URETURN, T.VOID, function), where)
        else:
            value = self.expressions.value(node.expr)
            if T.is_void(result):
                if not T.is_void(value.type):
                    raise CompileError(where, "return with a value in a function of type void")
                self.effects(value, where)
                self.emit(Node(Op.URETURN, T.VOID, function), where)
            else:
                value = self.expressions.convert_assigned(value, result, where)
                if T.is_record(result):
                    value = self.expressions.record_source(value)
                self.emit(Node(Op.RETURN, T.unqualified(result), function, value), where)
        self.reachable = False

    def end(self, where):
        """The end of the function, if it can be reached. Of main it returns 0."""
        if not self.reachable:
            return
        function = Node(Op.NAME, self.body.symbol.type, value=self.body.symbol)
        result = self.translator.function.result
        if self.translator.function.source_name == "main" and T.is_integer(result):
            self.emit(Node(Op.RETURN, T.unqualified(result), function, trees.integer(result, 0)), where)
        else:
            self.emit(Node(Op.URETURN, T.VOID, function), where)

    def _pragma(self, node):
        where = position_of(node)
        name, arguments = pragmas.split(node.string or "")
        if name in pragmas.LOOP:
            self.loop_pragmas.append(Pragma(*pragmas.loop_pragma(name, arguments, where)))
        elif name in pragmas.STATEMENT and not arguments:
            self.items.append(Pragma(pragmas.KINDS[name], []))
        else:
            self.translator.pragma(node)


def loop_variable(step):
    """The name that a for loop's step changes, if it is a plain one."""
    target = getattr(step, "expr", None) or getattr(step, "lvalue", None)
    return target.name if isinstance(target, A.ID) else ""


def assembly_text(node, where):
    """The text of `asm("...")`."""
    arguments = node.args.exprs if node.args else []
    if len(arguments) != 1 or not isinstance(arguments[0], A.Constant) or arguments[0].value[-1] != '"':
        raise CompileError(where, "asm takes one string")
    _, codes = literals.string_codes(arguments[0].value, where)
    return bytes(codes[:-1]).decode("utf-8", "surrogateescape")
