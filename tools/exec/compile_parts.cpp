// Vectors and complex numbers: the value is a place in the frame, one lane or part behind the other.
//
// Vectors compute lane by lane, in the type of the lanes; so do sums of complex numbers. A scalar operand stands for
// a vector that has it in every lane, or for a complex number without an imaginary part. A product is that of the
// formula, each step rounded to the part's type; a quotient is (a * conjugate(b)) / |b|^2.
#include "tools/exec/compile.h"

namespace {
struct PACK {
    std::vector<const XNODE*> lanes; // values; a short list repeats its last
    SHAPE lane;
    uint32_t count;
    int64_t slot;
};
int64_t pack(const XNODE* x, MACHINE& m) {
    const PACK& k = *static_cast<const PACK*>(x->extra);
    const uint64_t to = m.fp + static_cast<uint64_t>(k.slot);
    std::vector<int64_t> values;
    for (const XNODE* lane : k.lanes) values.push_back(run(lane, m));
    for (uint32_t i = 0; i < k.count; i++)
        m.store(k.lane, to + uint64_t{i} * k.lane.units, values[std::min<size_t>(i, values.size() - 1)]);
    return static_cast<int64_t>(to);
}

// An operand of a lane-wise operation.
struct LANE_SOURCE {
    const XNODE* x = nullptr; // the address of the lanes, or a scalar's value
    SHAPE lane;
    bool scalar = true;
    bool complex = false;

    int64_t at(MACHINE& m, int64_t value, uint32_t i) const {
        if (scalar) return complex && i ? 0 : value;
        return m.load(lane, static_cast<uint64_t>(value) + uint64_t{i} * lane.units);
    }
};
struct LANES {
    LANE_SOURCE a, b;
    const XNODE* combine = nullptr; // of MACHINE::old_value and right_value, to the shape of a lane
    SHAPE lane;
    uint32_t count;
    int64_t slot;
    int opcode;
};
int64_t by_lanes(const XNODE* x, MACHINE& m) {
    const LANES& k = *static_cast<const LANES*>(x->extra);
    const int64_t a = run(k.a.x, m), b = k.b.x ? run(k.b.x, m) : 0;
    const uint64_t to = m.fp + static_cast<uint64_t>(k.slot);
    const int64_t old_value = m.old_value, right_value = m.right_value;
    for (uint32_t i = 0; i < k.count; i++) {
        m.old_value = k.a.at(m, a, i);
        if (k.b.x) m.right_value = k.b.at(m, b, i);
        m.store(k.lane, to + uint64_t{i} * k.lane.units, run(k.combine, m));
    }
    m.old_value = old_value;
    m.right_value = right_value;
    return static_cast<int64_t>(to);
}

template <class T>
void multiply(const double* a, const double* b, double* out) {
    const T re = static_cast<T>(a[0]), im = static_cast<T>(a[1]), re2 = static_cast<T>(b[0]),
            im2 = static_cast<T>(b[1]);
    const T p = re * re2, q = im * im2, r = re * im2, s = im * re2;
    out[0] = p - q;
    out[1] = r + s;
}
template <class T>
void divide(const double* a, const double* b, double* out) {
    const T re = static_cast<T>(b[0]), im = static_cast<T>(b[1]), x = re * re, y = im * im, size = x + y;
    const double conjugate[] = {b[0], -b[1]};
    multiply<T>(a, conjugate, out);
    out[0] = static_cast<T>(out[0]) / size;
    out[1] = static_cast<T>(out[1]) / size;
}
int64_t complex_product(const XNODE* x, MACHINE& m) {
    const LANES& k = *static_cast<const LANES*>(x->extra);
    const int64_t a = run(k.a.x, m), b = run(k.b.x, m);
    double operands[2][2], out[2];
    for (uint32_t i = 0; i < 2; i++) {
        operands[0][i] = as_float(convert_value(k.a.at(m, a, i), k.a.lane, k.lane));
        operands[1][i] = as_float(convert_value(k.b.at(m, b, i), k.b.lane, k.lane));
    }
    const bool single = k.lane.rep == R_F32;
    const auto compute = k.opcode == op::MULT ? (single ? multiply<float> : multiply<double>)
                                              : (single ? divide<float> : divide<double>);
    compute(operands[0], operands[1], out);
    const uint64_t to = m.fp + static_cast<uint64_t>(k.slot);
    for (uint32_t i = 0; i < 2; i++) m.store(k.lane, to + uint64_t{i} * k.lane.units, from_float(out[i]));
    return static_cast<int64_t>(to);
}
int64_t complex_equal(const XNODE* x, MACHINE& m) {
    const LANES& k = *static_cast<const LANES*>(x->extra);
    const int64_t a = run(k.a.x, m), b = run(k.b.x, m);
    bool equal = true;
    for (uint32_t i = 0; i < 2; i++) {
        const int64_t u = convert_value(k.a.at(m, a, i), k.a.lane, k.lane);
        const int64_t v = convert_value(k.b.at(m, b, i), k.b.lane, k.lane);
        equal &= k.lane.is_float() ? as_float(u) == as_float(v) : u == v;
    }
    return equal == (k.opcode == op::EQ || k.opcode == op::FEQ);
}

struct UPDATE {
    const XNODE *address, *value;
    uint32_t units;
};
int64_t updated_place(const XNODE*, MACHINE& m) { return static_cast<int64_t>(m.place); }
int64_t update(const XNODE* x, MACHINE& m) {
    const UPDATE& u = *static_cast<const UPDATE*>(x->extra);
    const uint64_t outer = m.place, place = static_cast<uint64_t>(run(u.address, m));
    m.place = place;
    const uint64_t from = static_cast<uint64_t>(run(u.value, m));
    m.place = outer;
    m.check(place, u.units);
    std::memmove(&m.memory[place], &m.memory[from], size_t{u.units} * 2);
    return static_cast<int64_t>(place);
}

bool in_lanes(const TYPE* t) { return t && (t->is_complex() || t->is_vector()); }
SHAPE lane_shape(TYPE* t) {
    if (!in_lanes(t)) return shape_of(t);
    return shape_of(t->is_complex() ? t->real->part_type() : t->real->raw_elem_type());
}
} // namespace

// An operator whose result, or one of whose operands, is a vector or a complex number.
// `left_value` stands for the left operand where that was computed already.
const XNODE* COMPILER::lanes(const IC_NODE* n, int opcode, const XNODE* left_value) {
    const IC_NODE *left = strip_marks(n->left), *right = n->right ? strip_marks(n->right) : nullptr;
    TYPE* t = in_lanes(n->type) || !in_lanes(left->type) ? n->type : left->type;
    const bool equality = opcode == op::EQ || opcode == op::NEQ || opcode == op::FEQ || opcode == op::FNEQ;
    const bool complex = left->type->is_complex() || (right && right->type->is_complex()) || t->is_complex();
    if (equality && right && complex && !in_lanes(t)) t = right->type;
    if (!f || !in_lanes(t) || (complex ? !t->is_complex() : shape_of(n->type).rep != R_AGG)) return unsupported(n);
    LANES* k = p.make<LANES>();
    k->opcode = opcode;
    k->lane = lane_shape(t);
    k->count = complex ? 2 : t->real->num_elem();
    auto source = [&](const IC_NODE* of, const XNODE* x) {
        return LANE_SOURCE{x ? x : value(of), lane_shape(of->type), !in_lanes(of->type), complex};
    };
    k->a = source(left, left_value);
    if (right) k->b = source(right, nullptr);
    const uint32_t units = k->a.lane.units * k->count;
    if (!k->a.scalar && units != shape_of(left->type).units) return unsupported(n);
    if (equality && complex) {
        k->lane = combined(k->a.lane, k->b.lane);
        XNODE* x = p.node(complex_equal);
        x->extra = k;
        return x;
    }
    k->slot = slot(uint64_t{k->count} * k->lane.units);
    XNODE* x = p.node(by_lanes);
    x->extra = k;
    if (complex && (opcode == op::MULT || opcode == op::DIV)) {
        if (!k->lane.is_float()) return unsupported(n);
        x->run = complex_product;
        return x;
    }
    k->combine = lane_operation(opcode, complex, k->a.lane, k->b.lane, k->lane);
    return k->combine ? x : unsupported(n);
}

// The operation on one lane of each operand.
const XNODE* COMPILER::lane_operation(int opcode, bool complex, const SHAPE& a, const SHAPE& b, const SHAPE& to) {
    const XNODE *x = p.node([](const XNODE*, MACHINE&m) { return m.old_value; }),
                *y = p.node([](const XNODE*, MACHINE&m) { return m.right_value; });
    switch (opcode) {
    case op::SCONV:
    case op::ACONV: return convert(x, a, to);
    case op::UMINUS:
    case op::NOTB:
    case op::ABS:
    case op::SQR:
    case op::SQRT:
    case op::RECIP: {
        const EVAL e = unary_eval(opcode, a.rep);
        const bool by_part = !complex || opcode == op::UMINUS;
        return e && by_part ? convert(p.node(e, x), a, to) : nullptr;
    }
    case op::PLUS:
    case op::MINUS:
    case op::MULT:
    case op::DIV:
    case op::MOD:
    case op::ANDB:
    case op::ORB:
    case op::XORB:
    case op::SLL:
    case op::SRL: return arithmetic(opcode, x, a, y, b, to);
    }
    return nullptr;
}

// The object is read, combined and written in one place; the address is computed once.
const XNODE* COMPILER::update_lanes(const IC_NODE* n, int opcode) {
    const LVALUE lv = lvalue(n->left);
    count_load(lv);
    count_store(lv);
    UPDATE* u = p.make<UPDATE>();
    u->address = address(lv);
    u->value = lanes(n, opcode, p.node(updated_place));
    u->units = lv.shape.units;
    XNODE* x = p.node(update);
    x->extra = u;
    return x;
}

const XNODE* COMPILER::parts(const IC_NODE* n) {
    TYPE* t = n->type->real;
    const bool complex = n->op == op::COMPLEX && t->is_complex();
    const bool pair = n->op == op::VPACK1P; // the first lane, and all others
    const bool vector = (n->op == op::VPACK || n->op == op::VPACKM || pair) && t->is_vector();
    if (!complex && !vector) return lanes(n, n->op);
    if (!f) return unsupported(n);
    PACK* k = p.make<PACK>();
    k->lane = shape_of(complex ? t->part_type() : t->raw_elem_type());
    k->count = complex ? 2 : t->num_elem();
    std::vector<const IC_NODE*> lanes;
    auto collect = [&](auto&& self, const IC_NODE* list) -> void {
        list = strip_marks(list);
        if (list->op == op::COMMA) {
            self(self, list->left);
            self(self, list->right);
        } else
            lanes.push_back(list);
    };
    collect(collect, n->left);
    if (complex || pair) collect(collect, n->right);
    if (lanes.size() != 1 && lanes.size() != k->count && !pair) return unsupported(n);
    for (const IC_NODE* lane : lanes) k->lanes.push_back(value_as(lane, k->lane));
    k->slot = slot(uint64_t{k->count} * k->lane.units);
    XNODE* x = p.node(pack);
    x->extra = k;
    return x;
}
