"""Initializers: braces, designators and strings to the scalars of an object.

An initializer first becomes a nest of `Aggregate`s that follows the type; what it does not mention is missing there.
The nest is then laid out as the constants of a static object, in layout order, or as the assignments of an automatic
one.
"""
from pycparser import c_ast as A

from . import constants, literals, trees, types as T
from .errors import CompileError, position_of
from .model import Node, Op

SKIP_FROM = 16  # zeros in a row from which a static object's list counts them instead
LOOP_FROM = 16  # zeros in a row from which an automatic array is cleared by a loop


class Aggregate:
    """The initialized parts of an array or record, by element or member index; a part is an Aggregate or a tree."""

    def __init__(self, type_):
        self.type, self.parts = type_, {}
        bare = T.strip(type_)
        self.is_array = isinstance(bare, T.Array)
        self.is_union = not self.is_array and bare.is_union
        self.count = bare.count if self.is_array else len(bare.members)

    def part_type(self, index):
        bare = T.strip(self.type)
        if self.is_array:
            return bare.element
        return T.qualify(bare.members[index].type, T.qualifiers(self.type))

    def put(self, index, part):
        if self.is_union:
            self.parts.clear()
        self.parts[index] = part

    def inner(self, index):
        """The aggregate at `index`, made if it is not there."""
        part = self.parts.get(index)
        if not isinstance(part, Aggregate):
            part = Aggregate(self.part_type(index))
            self.put(index, part)
        return part

    def has(self, index):
        return (self.count is None or index < self.count) and not (self.is_union and index > 0)


class ZeroRun:
    """`count` zeros from element `first` of an automatic array on."""

    def __init__(self, array, first, count):
        self.array, self.first, self.count = array, first, count

    def element(self, index):
        """The element at a tree `index`."""
        base = trees.decay(self.array)
        pointer = trees.step(Op.PLUS, base, index, None)
        return Node(Op.UMULT, T.pointed_to(base.type), pointer)


class Initializers:
    def __init__(self, translator):
        self.translator = translator

    # ---- From syntax to parts
    def parse(self, type_, init, where):
        """(type with its array size known, part) of an initializer."""
        bare = T.strip(type_)
        if isinstance(bare, T.Array) and bare.count is None:
            part = self._part(type_, init, where)
            if not isinstance(part, Aggregate):
                raise CompileError(where, "an array needs a list of values")
            return T.Array(bare.element, max(part.parts, default=-1) + 1), part
        return type_, self._part(type_, init, where)

    def _part(self, type_, init, where):
        where = position_of(init) or where
        if isinstance(init, A.InitList):
            if T.is_scalar(type_):
                if len(init.exprs) != 1 or isinstance(init.exprs[0], A.NamedInitializer):
                    raise CompileError(where, f"one value is wanted for '{type_}'")
                return self._part(type_, init.exprs[0], where)
            if T.is_array(type_) and len(init.exprs) == 1 and self._is_string_for(type_, init.exprs[0]):
                return self._string(type_, init.exprs[0], where)
            if not type_.complete and not T.is_array(type_):
                raise CompileError(where, f"'{type_}' is incomplete")
            aggregate = Aggregate(type_)
            self._fill(aggregate, init.exprs or [], where)
            return aggregate
        if T.is_array(type_):
            if self._is_string_for(type_, init):
                return self._string(type_, init, where)
            raise CompileError(where, "an array needs a list of values")
        return self.translator.expressions.assigned(init, type_, where)

    @staticmethod
    def _is_string_for(type_, init):
        if not isinstance(init, A.Constant) or init.value[-1] != '"':
            return False
        element = T.strip(T.strip(type_).element)
        wide = init.value[0] == "L"
        return isinstance(element, T.Integer) and (element.size == T.WCHAR.size if wide else element.rank == 1)

    def _string(self, type_, init, where):
        _, codes = literals.string_codes(init.value, where)
        aggregate = Aggregate(type_)
        if aggregate.count is not None:
            if len(codes) - 1 > aggregate.count:
                raise CompileError(where, "the string is longer than the array")
            codes = codes[:aggregate.count]
        element = aggregate.part_type(0)
        for index, code in enumerate(codes):
            aggregate.put(index, trees.integer(element, code))
        return aggregate

    def _fill(self, outer, items, where):
        """Puts the items of a brace list in their places; without inner braces they run on into inner aggregates."""
        places = [[outer, 0]]  # innermost last, each with the index that comes next
        for item in items:
            where = position_of(item) or where
            if isinstance(item, A.NamedInitializer):
                places = self._designate(outer, item.name, where)
                self._place(places, item.expr, where)
                continue
            while len(places) > 1 and not places[-1][0].has(places[-1][1]):
                places.pop()
            if not places[-1][0].has(places[-1][1]):
                raise CompileError(where, "too many initializers")
            self._place(places, item, where)

    def _place(self, places, expression, where):
        value = None
        while True:
            aggregate, index = places[-1]
            type_ = aggregate.part_type(index)
            places[-1][1] = aggregate.count if aggregate.is_union else index + 1
            if isinstance(expression, A.InitList) or (T.is_array(type_) and self._is_string_for(type_, expression)):
                aggregate.put(index, self._part(type_, expression, where))
                return
            if value is None and not T.is_array(type_):
                value = self.translator.expressions.value(expression)
            if not T.is_array(type_) and (
                    T.is_scalar(type_) or T.strip(value.type).key == T.strip(type_).key):
                aggregate.put(index, self.translator.expressions.convert_assigned(value, type_, where))
                return
            inner = aggregate.inner(index)
            if inner.count == 0:
                raise CompileError(where, "too many initializers")
            places.append([inner, 0])

    def _designate(self, outer, designators, where):
        """The places on the way to what `.a[1].b` designates, innermost last; each but the last is passed already."""
        places = []
        for designator in designators:
            aggregate = outer
            if places:
                type_ = places[-1][0].part_type(places[-1][1])
                if T.is_scalar(type_):
                    raise CompileError(where, f"the designator does not fit '{type_}'")
                aggregate = self._enter(places)
            if aggregate.is_array:
                places.append([aggregate, self._designated_element(aggregate, designator, where)])
            else:
                self._designated_member(aggregate, designator, places, where)
        return places

    @staticmethod
    def _enter(places):
        """The aggregate at the innermost place, which is thereby passed."""
        aggregate, index = places[-1]
        places[-1][1] = aggregate.count if aggregate.is_union else index + 1
        return aggregate.inner(index)

    def _designated_element(self, aggregate, designator, where):
        value = self.translator.expressions.value(designator)
        index = constants.require_integer(value, where, "the designator")
        if index < 0 or (aggregate.count is not None and index >= aggregate.count):
            raise CompileError(where, f"index {index} is outside the array")
        return index

    def _designated_member(self, aggregate, designator, places, where):
        name = designator.name if isinstance(designator, A.ID) else None
        path = T.strip(aggregate.type).find(name) if name else None
        if path is None:
            raise CompileError(where, f"'{aggregate.type}' has no member '{name or '[]'}'")
        for step, member in enumerate(path):
            places.append([self._enter(places) if step else aggregate, member.number - 1])

    # ---- Static objects
    def static_items(self, type_, part, where):
        """The trees of a static object's initializer: every scalar in layout order, long runs of zeros counted."""
        items = []
        self._flatten(type_, part, where, items)
        out, run = [], []
        for item in items + [None]:
            if item is not None and item.op == Op.ICON and item.value == 0:
                run.append(item)
                continue
            out += [Node(Op.SKIP, T.INT, run[0], value=len(run))] if len(run) >= SKIP_FROM else run
            run = []
            if item is not None:
                out.append(item)
        return out

    def _flatten(self, type_, part, where, out):
        bare = T.strip(type_)
        if isinstance(bare, T.Array):
            for index in range(bare.count or 0):
                self._flatten(bare.element, part.parts.get(index) if part else None, where, out)
        elif isinstance(bare, T.Record):
            if part is not None and not isinstance(part, Aggregate):
                raise CompileError(where, "the initializer is not constant")
            if bare.is_union:
                self._flatten_union(bare, part, where, out)
                return
            for index, member in enumerate(bare.members):
                self._flatten(member.type, part.parts.get(index) if part else None, where, out)
        elif isinstance(bare, T.Complex):
            out += constants.complex_items(part, bare, where)
        elif part is None:
            out.append(trees.zero(bare))
        else:
            out.append(constants.initializer_item(part, type_, where))

    def _flatten_union(self, union, part, where, out):
        """A union's list is that of its first member; another member's value is carried over bit by bit."""
        if not union.members:
            return
        first = union.members[0].type
        chosen = next(iter(part.parts), 0) if part else 0
        if chosen == 0:
            self._flatten(first, part.parts.get(0) if part else None, where, out)
            return
        image = Image(where)
        image.store(union.members[chosen].type, 0, iter(self._scalars(union.members[chosen].type, part.parts[chosen],
                                                                      where)))
        out += image.load(first, 0)
        image.require_all_read()

    def _scalars(self, type_, part, where):
        out = []
        self._flatten(type_, part, where, out)
        return out

    # ---- Automatic objects
    def assignments(self, place, type_, part, where):
        """Assignments and ZeroRuns that initialize the object `place`, in layout order."""
        bare = T.strip(type_)
        if isinstance(bare, T.Array):
            return self._array_assignments(place, bare, part, where)
        if isinstance(bare, T.Record) and (part is None or isinstance(part, Aggregate)):
            out = []
            indexes = range(len(bare.members))
            if bare.is_union:
                indexes = [next(iter(part.parts), 0) if part else 0] if bare.members else []
            for index in indexes:
                member = bare.members[index]
                inner = trees.dot(place, [member])
                out += self.assignments(inner, member.type, part.parts.get(index) if part else None, where)
            return out
        if part is None:
            part = trees.zero(bare)
        if T.is_record(type_):
            part = self.translator.expressions.record_source(part)
        return [Node(Op.STASG if T.is_record(type_) else Op.ASG, T.unqualified(type_), place, part)]

    def _array_assignments(self, place, array, part, where):
        out, index = [], 0
        parts = part.parts if part else {}
        while index < array.count:
            end = index
            while end < array.count and end not in parts:
                end += 1
            if end - index >= LOOP_FROM and T.is_scalar(array.element):
                out.append(ZeroRun(place, index, end - index))
                index = end
                continue
            element = ZeroRun(place, 0, 0).element(trees.integer(T.LONG, index))
            out += self.assignments(element, array.element, parts.get(index), where)
            index += 1
        return out

    def compound_literal(self, type_, init, where):
        type_, part = self.parse(type_, init, where)
        translator = self.translator
        if translator.function is None:
            return trees.name(translator.nameless_static(type_, self.static_items(type_, part, where)))
        place = translator.temporary(type_)
        setup = None
        for item in self.assignments(place, type_, part, where):
            for tree in self._spelled_out(item):
                setup = tree if setup is None else trees.comma(setup, tree)
        return place if setup is None else trees.comma(setup, place, trees.LITERAL)

    @staticmethod
    def _spelled_out(item):
        if not isinstance(item, ZeroRun):
            yield item
            return
        for index in range(item.first, item.first + item.count):
            element = item.element(trees.integer(T.LONG, index))
            yield trees.assign(element, trees.zero(element.type))


class Image:
    """The bits of an object whose value is known, by which it is read under another type. Addresses stay whole."""

    def __init__(self, where):
        self.where, self.bits, self.width, self.addresses = where, 0, 0, {}

    def store(self, type_, offset, scalars):
        self._walk(type_, offset, lambda t, at, width: self._put(next(scalars), t, at, width))

    def load(self, type_, offset):
        out = []
        self._walk(type_, offset, lambda t, at, width: out.append(self._get(t, at, width)))
        return out

    def _walk(self, type_, offset, visit, width=None):
        bare = T.strip(type_)
        if isinstance(bare, T.Array):
            for index in range(bare.count or 0):
                self._walk(bare.element, offset + index * bare.element.size, visit)
        elif isinstance(bare, T.Record):
            for member in bare.members[:1] if bare.is_union else bare.members:
                self._walk(member.type, offset + member.offset, visit, member.width)
        elif isinstance(bare, T.Complex):
            visit(bare.part, offset, bare.part.size)
            visit(bare.part, offset + bare.part.size, bare.part.size)
        else:
            visit(bare, offset, width or bare.size)

    def _put(self, tree, type_, at, width):
        if tree.op in (Op.ICON, Op.LCON):
            value = tree.value
        elif tree.op == Op.FCON:
            pack = "<f" if type_.size == 32 else "<d"
            value = int.from_bytes(trees.struct.pack(pack, float.fromhex(tree.value)), "little")
        elif tree.op == Op.PCONV and trees.is_integer_constant(tree.left):
            value = tree.left.value
        else:
            self.addresses[at] = tree
            self.width = max(self.width, at + width)
            return
        self.bits |= (value & ((1 << width) - 1)) << at
        self.width = max(self.width, at + width)

    def _get(self, type_, at, width):
        tree = self.addresses.pop(at, None)
        if tree is not None:
            if not isinstance(type_, T.Pointer):
                raise CompileError(self.where, "an address initializes a union whose first member is no pointer")
            return trees.retype(tree, type_)
        value = self.bits >> at & ((1 << width) - 1)
        self.bits &= ~(((1 << width) - 1) << at)
        if isinstance(type_, T.Floating):
            pack = ("<f", 4) if type_.size == 32 else ("<d", 8)
            return trees.floating(type_, trees.struct.unpack(pack[0], value.to_bytes(pack[1], "little"))[0])
        if isinstance(type_, T.Pointer):
            return trees.zero(type_) if value == 0 else trees.convert(trees.integer(T.ULONG, value), type_, self.where)
        kind = T.as_integer(type_)
        if width < kind.size and kind.signed and value >> (width - 1):
            value -= 1 << width
        return trees.integer(type_, value)

    def require_all_read(self):
        if self.bits or self.addresses:
            raise CompileError(self.where, "the union's first member cannot hold this initializer")
