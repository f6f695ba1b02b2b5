"""Statements that signal processing is made of; each writes into a Body."""
from .scope import Var, field_of, literal
from .types import FLOAT, INT, LDOUBLE, LLONG, LONG, UINT, ULONG
from .values import Value, binary, cast, coerced, integer, real, shift


def _rows(body, fits=lambda array: True, least=4):
    """Arrays of one dimension to walk over."""
    return [a for a in body.scope.arrays if len(a.dims) == 1 and a.dims[0] >= least and not a.volatile and fits(a)]


def _store(body, value):
    """Puts a result where the rest of the program sees it."""
    target = body.objects(value.is_float, written=True) or body.target()
    body.put(f"{target.text} = {coerced(body.rng, value, *_place(target.kind)).text};")


def _place(kind):
    return kind.type, kind.lo, kind.hi


def _with(body, var, make):
    """What `make` gives while `var` may be used."""
    body.scope.scalars.append(var)
    value = make()
    body.scope.scalars.remove(var)
    return value


SUMS = {  # the factors' arrays, and the type of the sum
    "16x16": (lambda a: a.kind.type.bits == 16 and a.kind.type.signed, LONG),
    "32x32": (lambda a: a.kind.type is LONG, LLONG),
    "modular": (lambda a: not a.kind.type.is_float, ULONG),
    "short modular": (lambda a: not a.kind.type.is_float, UINT),
    "float": (lambda a: a.kind.type is FLOAT, FLOAT),
    "long double": (lambda a: a.kind.type.is_float, LDOUBLE),
}


def _term(body, arrays, total, share):
    """A product that stays within `share` of a signed sum's range: shifted down where it would not."""
    rng = body.rng
    left, right = (body.element(rng.choice(arrays)).value for _ in range(2))
    if rng.random() < 0.15:
        right = real(rng.randint(-9, 9) / 4.0, FLOAT) if total.is_float else integer(rng.randint(-9, 99))
    product = binary(rng, "*", cast(left, total), cast(right, total) if rng.random() < 0.3 else right)
    if total.is_float:
        return product
    if product.type is not total:
        product = cast(product, total)
    excess = max(-product.lo, product.hi) // share
    return shift(">>", product, integer(excess.bit_length())) if total.signed and excess else product


def sum_of_products(body, _depth):
    """16 by 16 bits into 32, 32 by 32 into 64, unsigned ones that wrap, and floating ones."""
    rng = body.rng
    fits, total = SUMS[rng.choice(("16x16", "16x16", *SUMS))]
    arrays, loop = _rows(body, fits), body.new_loop(64)
    if not arrays or loop is None:
        return body.assignment()
    name = body.local("s", total.name, 0)
    body.put(f"{name} = {0 if total.is_float else rng.choice((0, 0, 1, 7, -100 if total.signed else 9))};")
    terms = rng.choice((1, 1, 2))
    share = 0 if total.is_float else (total.hi - 200) // (loop.most * terms)

    def write():
        body.indent += 1
        for _ in range(terms):
            product = _term(body, arrays, total, share)
            op = rng.choice("++-")
            body.put(f"{name} {op}= {product.text};" if rng.random() < 0.7 else f"{name} = {name} {op} {product.text};")
        if rng.random() < 0.2:
            body.block(0, 1)
        body.indent -= 1

    body.inside(loop, write)
    # The arrays' elements are at most 1000 in magnitude, and of a sum no more is known.
    most = 1e6 * loop.most * terms * 1.01
    _store(body, Value(name, total, -most, most) if total.is_float else Value(name, total, total.lo, total.hi))


def _walker(body, array, up, offset):
    """A pointer into `array` and the text of its next object: p++ from an element, or --p from behind one."""
    qualifier = "" if array.writable else "const "
    name = body.local("p", f"{qualifier}{array.kind.type.name} *")
    body.put(f"{name} = {array.name} + {offset};" if offset or body.rng.random() < 0.5 else f"{name} = {array.name};")
    return name, f"*{name}++" if up else f"*--{name}"


def pointer_walk(body, _depth):
    """Reads an array through a pointer that moves, up or down, by a loop or up to an end."""
    rng, rows = body.rng, _rows(body)
    if not rows:
        return body.assignment()
    array = rng.choice(rows)
    size = array.dims[0]
    held = body.local("t", array.kind.type.name, 0)
    var = Var(held, array.kind)
    if rng.random() < 0.3 and body.factor * size <= 600:
        name, next_ = _walker(body, array, True, 0)
        end = f"{array.name} + {rng.randint(1, size)}"
        body.factor *= size
        body.put(f"while ({name} {rng.choice(('<', '!='))} {end}) {{", f"    {held} = {next_};")
        _with(body, var, lambda: body.block(0, 2))
        body.put("}")
        body.factor //= size
        return None
    loop = body.new_loop(size)
    if loop is None or loop.most > size:
        return body.assignment()
    up = rng.random() < 0.6
    room = rng.randint(0, size - loop.most)
    _, next_ = _walker(body, array, up, room if up else size - room)

    def write():
        body.indent += 1
        body.put(f"{held} = {next_};")
        body.indent -= 1
        _with(body, var, lambda: body.block(0, rng.randint(1, 2)))

    body.inside(loop, write)


def two_pointers(body, _depth):
    """Two pointers at a distance, of one array or of two, the one read and the other written."""
    rng, written = body.rng, _rows(body, lambda a: a.writable)
    if not written:
        return body.assignment()
    target = rng.choice(written)
    source = target if rng.random() < 0.5 else rng.choice(_rows(body))
    distance = rng.choice((0, 1, 1, 2, 3, 4))
    most = min(target.dims[0], source.dims[0]) - distance
    loop = body.new_loop(most)
    if loop is None or loop.most > most:
        return body.assignment()
    ahead = rng.random() < 0.5
    up = rng.random() < 0.7
    starts = [0 if up else loop.most, distance if up else loop.most + distance]
    _, read = _walker(body, source, up, starts[ahead])
    _, write_to = _walker(body, target, up, starts[not ahead])
    held = body.local("t", source.kind.type.name, 0)

    def write():
        body.indent += 1
        body.put(f"{held} = {read};")
        value = _with(body, Var(held, source.kind), lambda: body.of_kind(target.kind, 1)) if rng.random() < 0.7 else \
            coerced(rng, Value(held, *_place(source.kind)), *_place(target.kind))
        body.put(f"{write_to} = {value.text};")
        body.indent -= 1

    body.inside(loop, write)


def recurrence(body, _depth):
    """Elements made of earlier ones: a dependence of a known distance."""
    rng, rows = body.rng, _rows(body, lambda a: a.writable, 8)
    if not rows or body.factor * 40 > 600:
        return body.assignment()
    array, distance = rng.choice(rows), rng.choice((1, 1, 2, 3, 4))
    name, _ = body.free_index()
    earlier = Value(f"{array.name}[{name} {rng.choice('-+')} {distance}]", *_place(array.kind))
    other = body.of_kind(array.kind, 1)
    value = coerced(rng, binary(rng, rng.choice("+-*"), earlier, other), *_place(array.kind))
    body.factor *= 40
    body.put(f"for ({name} = {distance}; {name} < {array.dims[0] - distance}; {name}++) {{",
             f"    {array.name}[{name}] = {value.text};", "}")
    body.factor //= 40


def search(body, _depth):
    """Looks for an element and leaves the loop; where it stopped is used after it."""
    rng, rows = body.rng, _rows(body)
    if not rows or body.factor * 40 > 600:
        return body.assignment()
    array = rng.choice(rows)
    size, (name, type_) = array.dims[0], body.free_index()
    limit = literal(rng, array.kind)
    text = real(limit, array.kind.type).text if array.kind.type.is_float else integer(limit, array.kind.type).text
    body.factor *= size
    body.put(f"for ({name} = 0; {name} < {size}; {name}++) {{",
             f"    if ({array.name}[{name}] {rng.choice(('>', '==', '<'))} {text}) break;", "}")
    body.factor //= size
    _store(body, Value(name, type_, 0, size))


def swap_loop(body, _depth):
    """Turns an array round with two subscripts that meet."""
    rng, rows = body.rng, _rows(body, lambda a: a.writable)
    if not rows or body.factor * 20 > 600:
        return body.assignment()
    array = rng.choice(rows)
    first, _ = body.free_index()
    second = next(name for name in "jkmi" if name != first and name not in {i.name for i in body.scope.indices})
    held = body.local("t", array.kind.type.name, 0)
    body.factor *= 20
    body.put(f"for ({first} = 0, {second} = {array.dims[0] - 1}; {first} < {second}; {first}++, {second}--) {{",
             f"    {held} = {array.name}[{first}];", f"    {array.name}[{first}] = {array.name}[{second}];",
             f"    {array.name}[{second}] = {held};", "}")
    body.factor //= 20


def halving(body, _depth):
    """A loop whose count depends on a value: at most one step a bit."""
    rng, type_ = body.rng, body.rng.choice((UINT, ULONG))
    if body.factor * type_.bits > 600:
        return body.assignment()
    value, steps = body.local("h", type_.name, 0), body.local("c", INT.name, 0)
    body.put(f"{value} = {coerced(rng, body.expression(2), type_, 0, type_.hi).text};", f"{steps} = 0;")
    body.factor *= type_.bits
    body.put(f"while ({value} > {rng.randint(0, 20)}) {{",
             f"    {value} {rng.choice(('/= 2', '>>= 1', '/= 3', '>>= 2'))};", f"    {steps}++;", "}")
    body.factor //= type_.bits
    _store(body, Value(steps, INT, 0, type_.bits))


def record_pointer(body, _depth):
    """Fields through a pointer to one structure, or to one after the other; and structures copied whole."""
    rng = body.rng
    if not body.scope.records:
        return body.assignment()
    records = rng.choice(body.scope.records)
    name = body.local("q", f"struct {records.tag} *")
    fields = [field_of(records, name, member, arrow=True) for member in records.fields]
    body.put(f"{name} = &{records.name}[{body.subscript(records.size)}];")
    shape = rng.randrange(3)
    if shape == 0:
        return body.put(f"*{name} = {records.name}[{body.subscript(records.size)}];")
    walk = shape == 2 and body.factor * records.size <= 600
    if walk:
        body.factor *= records.size
        body.put(f"for ({name} = {records.name}; {name} < {records.name} + {records.size}; {name}++) {{")
        body.indent += 1
    for member in rng.sample(fields, min(2, len(fields))):
        source = rng.choice(fields)
        value = _with(body, source, lambda: body.of_kind(member.kind, 2))
        body.put(f"{member.text} = {value.text};")
    if walk:
        body.indent -= 1
        body.put("}")
        body.factor //= records.size
    return None


def fill(body, _depth):
    """Sets or copies a part of an array."""
    rng, rows = body.rng, _rows(body, lambda a: a.writable)
    if not rows or body.factor * 40 > 600:
        return body.assignment()
    array, (name, _) = rng.choice(rows), body.free_index()
    sources = [a for a in _rows(body, lambda a: a.kind == array.kind)]
    source = rng.choice(sources)
    size = min(array.dims[0], source.dims[0])
    value = f"{source.name}[{name}]" if rng.random() < 0.6 else body.of_kind(array.kind, 0).text
    body.factor *= size
    body.put(f"for ({name} = 0; {name} < {rng.randint(1, size)}; {name}++) {array.name}[{name}] = {value};")
    body.factor //= size
