// Lvalues: addresses, reads and writes, compound assignments.
//
// The right side of an assignment is evaluated first, then the address on the left.
#include "tools/exec/compile.h"

namespace {
int64_t give_old(const XNODE*, MACHINE& m) { return m.old_value; }
int64_t give_right(const XNODE*, MACHINE& m) { return m.right_value; }
int64_t give_place(const XNODE*, MACHINE& m) { return static_cast<int64_t>(m.place); }

// The steps of a compound assignment. Between the moment its operands are known and the store nothing else runs, so
// they can stand in the machine.
struct COMPOUND {
    const XNODE* right;
    const XNODE* address;
    const XNODE* read;
    const XNODE* combine; // of the old value and the right side
    const XNODE* write;
    bool before; // the result is the value before
};
int64_t compound_eval(const XNODE* x, MACHINE& m) {
    const COMPOUND& c = *static_cast<const COMPOUND*>(x->extra);
    const int64_t right = run(c.right, m);
    m.place = static_cast<uint64_t>(run(c.address, m));
    const int64_t old = run(c.read, m);
    m.old_value = old;
    m.right_value = right;
    m.right_value = run(c.combine, m);
    const int64_t stored = run(c.write, m);
    return c.before ? old : stored;
}
} // namespace

int64_t COMPILER::slot(uint64_t units) {
    if (!f) p.m.fail(EXEC_UNSUPPORTED, "an initializer needs a frame");
    f->frame = (f->frame + units + 3) & ~uint64_t{3};
    return -static_cast<int64_t>(f->frame);
}

void COMPILER::count_load(const LVALUE& lv) {
    accesses.loads++;
    accesses.memory_loads += !lv.is_register;
}

void COMPILER::count_store(const LVALUE& lv) {
    accesses.stores++;
    accesses.memory_stores += !lv.is_register;
}

LVALUE COMPILER::through(const XNODE* address, const SHAPE& shape) {
    LVALUE lv;
    lv.address = address;
    lv.shape = shape;
    return lv;
}

LVALUE COMPILER::name_lvalue(const IC_NODE* n) {
    const IC_SYMBOL* s = n->sym;
    if (!s) return through(failing(EXEC_UNSUPPORTED, "a name without a symbol"), shape_of(n->type));
    auto it = locals.find(s);
    if (it == locals.end()) {
        it = p.places.find(s);
        if (it == p.places.end())
            return through(failing(EXEC_MISSING, std::string("the object ") + s->name + " is nowhere defined"),
                           shape_of(n->type));
    }
    const PLACE& place = it->second;
    LVALUE lv;
    lv.base = place.base;
    lv.k = lv.low = place.at;
    lv.high = place.at + static_cast<int64_t>(place.units);
    lv.is_register = place.is_register;
    lv.shape = shape_of(s->type);
    const SHAPE as = shape_of(n->type);
    if (lv.shape.rep == R_AGG || lv.shape.rep == R_VOID) lv.shape = as;
    return lv;
}

LVALUE COMPILER::member_lvalue(const IC_NODE* n) {
    const IC_NODE* member = strip_marks(n->right);
    const IC_NODE* of = strip_marks(n->left);
    if (!member || member->op != op::FIELD || !member->member) return through(unsupported(n), shape_of(n->type));
    LVALUE lv = n->op == op::STREF ? through(value(of), SHAPE{}) : lvalue(of);
    const fkMDATA& m = *member->member;
    const int64_t offset = m.offset;
    if (m.is_bitfld) {
        lv.is_field = true;
        lv.bit = static_cast<unsigned>(offset & 15);
        lv.width = m.width;
        lv.k += (offset - (offset & 15)) / 16;
        lv.shape = shape_of(m.type);
        if (lv.shape.is_bool) lv.shape = int_shape(16, false);
    } else {
        lv.k += offset / 16;
        lv.is_field = false;
        const uint32_t mask = shape_of(m.type).align_mask;
        lv.shape = shape_of(n->type);
        // A member may lie closer than its type's alignment, in a packed structure.
        const SHAPE held = shape_of(member->field_csu());
        lv.shape.align_mask &= (offset / 16 & lv.shape.align_mask) ? 0 : std::min(mask, held.align_mask);
    }
    return lv;
}

// A lane of a vector, or a part of a complex number.
LVALUE COMPILER::part(const IC_NODE* n) {
    const SHAPE s = shape_of(n->type);
    LVALUE lv = lvalue(strip_marks(n->left));
    lv.shape = s;
    if (n->op != op::VFIELD) {
        lv.k += n->op == op::IMAG ? s.units : 0;
        return lv;
    }
    const IC_NODE* lane = strip_marks(n->right);
    if (lane->op == op::ICON) {
        lv.k += lane->value * s.units;
        return lv;
    }
    const SHAPE index = int_shape(32, true);
    const XNODE* offset = p.node(binary_eval(op::MULT, R_S32), value_as(lane, index), constant(s.units));
    return through(p.node(binary_eval(op::PLUS, R_U32), address(lv), offset), s);
}

// The address is noted as it is computed: of a store that is behind its value.
LVALUE COMPILER::noted(const LVALUE& lv, const ACCESS& numbered) {
    ACCESS* access = p.make<ACCESS>();
    *access = numbered;
    access->rep = lv.shape.rep;
    access->bit = lv.is_field ? lv.bit : 0;
    access->width = lv.is_field ? lv.width : lv.shape.units * 16;
    XNODE* note = p.node(
        [](const XNODE* x, MACHINE& m) {
            const int64_t at = run(x->a, m);
            if (m.top->accesses)
                m.top->accesses->note(*static_cast<const ACCESS*>(x->extra), static_cast<uint64_t>(at), m);
            return at;
        },
        address(lv));
    note->extra = access;
    LVALUE there = lv;
    there.base = B_EXPR;
    there.k = 0;
    there.address = note;
    return there;
}

LVALUE COMPILER::lvalue(const IC_NODE* n) {
    n = strip_marks(n);
    const LVALUE lv = plain_lvalue(n);
    const auto found = numbered.find(n);
    return found == numbered.end() ? lv : noted(lv, found->second);
}

LVALUE COMPILER::plain_lvalue(const IC_NODE* n) {
    if (folded) folded->push_back(static_cast<uint16_t>(n->op));
    cost++;
    if (++depth > deepest) deepest = depth;
    const SHAPE s = shape_of(n->type);
    LVALUE lv;
    switch (n->op) {
    case op::NAME: lv = name_lvalue(n); break;
    case op::UMULT: {
        const IC_NODE* at = strip_marks(n->left);
        if (at->op == op::UAND &&
            !(strip_marks(at->left)->op == op::NAME && p.entries.count(strip_marks(at->left)->sym)))
            lv = lvalue(at->left);
        else
            lv = through(value(at), s);
        lv.shape = s;
        lv.is_field = false;
        break;
    }
    case op::STDOT:
    case op::STREF: lv = member_lvalue(n); break;
    case op::VFIELD:
    case op::REAL:
    case op::IMAG: lv = part(n); break;
    case op::SCONV:
    case op::PCONV:
    case op::ACONV:
    case op::VRCONV:
        if (s.rep == R_AGG && shape_of(strip_marks(n->left)->type).rep != R_AGG) {
            lv = through(value(n), s);
            break;
        }
        lv = lvalue(n->left);
        lv.shape = s;
        break;
    case op::VREG: {
        auto [it, fresh] = registers.try_emplace(n->number, 0);
        if (fresh) it->second = slot(4);
        lv.base = B_FRAME;
        lv.k = lv.low = it->second;
        lv.high = lv.low + 4;
        lv.shape = s;
        break;
    }
    case op::COMMAOP:
    case op::PCOMMA: {
        const XNODE* first = value(n->left);
        const LVALUE inner = lvalue(n->right);
        lv = through(address(inner), inner.shape);
        lv.address = p.node(
            [](const XNODE* x, MACHINE& m) {
                run(x->a, m);
                return run(x->b, m);
            },
            first, lv.address);
        break;
    }
    default:
        if (s.rep == R_AGG) // a call, a choice, an assignment: its value is the address
            lv = through(value(n), s);
        else
            lv = through(unsupported(n), s);
    }
    depth--;
    return lv;
}

void COMPILER::settle(LVALUE& lv) {
    if (lv.base == B_EXPR) return;
    const int64_t units = lv.is_field ? (lv.bit + lv.width + 15) / 16 : lv.shape.units;
    if (lv.k >= lv.low && lv.k + units <= lv.high) return;
    const XNODE* at = p.node(address_eval(lv.base), nullptr, nullptr, lv.k);
    lv.base = B_EXPR;
    lv.address = at;
    lv.k = 0;
}

const XNODE* COMPILER::address(const LVALUE& lv) {
    if (lv.base == B_EXPR && lv.k == 0) return lv.address;
    if (lv.base == B_ABS) return constant(static_cast<uint32_t>(lv.k));
    return p.node(address_eval(lv.base), lv.address, nullptr, lv.k);
}

XNODE* COMPILER::access(EVAL (*pick)(REP, BASE), const LVALUE& lv, const XNODE* b) {
    const EVAL e = pick(lv.shape.rep, lv.base);
    XNODE* x = p.node(e, lv.address, b, lv.k);
    x->m = lv.shape.align_mask;
    return x;
}

XNODE* COMPILER::field_access(EVAL (*pick)(BASE), const LVALUE& lv, const XNODE* b) {
    accesses.fields++;
    XNODE* x = p.node(pick(lv.base), lv.address, b, lv.k);
    x->m = lv.bit;
    x->n = lv.width;
    x->c = lv.shape.is_signed() ? x : nullptr;
    return x;
}

const XNODE* COMPILER::load(const LVALUE& from) {
    LVALUE lv = from;
    if (!lv.is_field && !lv.shape.is_int() && !lv.shape.is_float()) return address(lv);
    settle(lv);
    count_load(lv);
    if (lv.is_field) return field_access(bits_load_eval, lv, nullptr);
    const XNODE* x = access(load_eval, lv, nullptr);
    if (lv.shape.is_int() && lv.shape.bits < lv.shape.units * 16) {
        XNODE* narrowed = p.node(convert_eval(int_shape(64, true), lv.shape), x);
        set_convert(narrowed, lv.shape);
        return narrowed;
    }
    return x;
}

const XNODE* COMPILER::copy(const LVALUE& to, const XNODE* from) {
    LVALUE lv = to;
    count_store(lv);
    settle(lv);
    XNODE* x = p.node(copy_eval(lv.base), lv.address, from, lv.k);
    x->n = lv.shape.units;
    x->m = lv.shape.align_mask;
    return x;
}

const XNODE* COMPILER::assign(const IC_NODE* n) {
    const IC_NODE* right = strip_marks(n->right);
    const SHAPE s = shape_of(n->type);
    SHAPE from = shape_of(right->type);
    const XNODE* v = nullptr;
    const bool whole = n->op == op::STASG || n->op == op::ARASG;
    v = whole && from.rep != R_AGG ? address(lvalue(right)) : value(right);
    LVALUE lv = lvalue(n->left);
    if (lv.shape.rep == R_AGG && !lv.is_field) return copy(lv, v);
    if (!lv.shape.is_int() && !lv.shape.is_float()) return unsupported(n);
    settle(lv);
    count_store(lv);
    v = convert(v, from, lv.shape);
    const XNODE* x = lv.is_field ? field_access(bits_store_eval, lv, v) : access(store_eval, lv, v);
    return convert(x, lv.shape, s);
}

const XNODE* COMPILER::compound(const IC_NODE* n, int opcode, bool before) {
    const IC_NODE* right = strip_marks(n->right);
    const SHAPE s = shape_of(n->type), sb = right ? shape_of(right->type) : int_shape(16, true);
    if (s.rep == R_AGG && right && !before) return update_lanes(n, opcode);
    const XNODE* by = right ? value(right) : constant(1);
    LVALUE lv = lvalue(n->left);
    settle(lv);
    count_load(lv);
    count_store(lv);
    const SHAPE& at = lv.shape;
    if (!at.is_int() && !at.is_float()) return unsupported(n);
    const bool adds = opcode == op::PLUS || opcode == op::MINUS;
    const bool in_place =
        at.is_int() ? !at.is_bool && at.bits == at.units * 16 && sb.is_int() : combined(at, sb).rep == at.rep;
    if (adds && in_place && !lv.is_field) {
        const XNODE* step = at.is_float() ? convert(by, sb, at) : by;
        XNODE* x = p.node(before ? step_eval(at.rep, lv.base, opcode) : add_store_eval(at.rep, lv.base, opcode),
                          lv.address, step, lv.k);
        x->m = at.align_mask;
        return convert(x, at, s);
    }
    COMPOUND* c = p.make<COMPOUND>();
    c->right = by;
    c->address = address(lv);
    c->before = before;
    LVALUE there = lv;
    there.base = B_EXPR;
    there.k = 0;
    there.address = p.node(give_place);
    const ACCESSES counted = accesses;
    c->read = load(there);
    accesses = counted; // of the place that was counted
    c->combine = arithmetic(opcode, p.node(give_old), at, p.node(give_right), sb, at);
    const XNODE* result = p.node(give_right);
    c->write = lv.is_field ? field_access(bits_store_eval, there, result) : access(store_eval, there, result);
    XNODE* x = p.node(compound_eval);
    x->extra = c;
    return convert(x, at, s);
}
