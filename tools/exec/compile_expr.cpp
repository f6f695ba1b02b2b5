// Expressions: operators on values.
//
// An operator computes in the type that the usual conversions give for its operands; what comes out is then converted
// to the type that the node says.
#include "tools/exec/compile.h"

#include <cstdlib>

namespace {
int64_t give_constant(const XNODE* x, MACHINE&) { return x->k; }
int64_t comma(const XNODE* x, MACHINE& m) {
    run(x->a, m);
    return run(x->b, m);
}
int64_t choose(const XNODE* x, MACHINE& m) { return run(x->a, m) ? run(x->b, m) : run(x->c, m); }
int64_t both(const XNODE* x, MACHINE& m) { return run(x->a, m) && run(x->b, m); }
int64_t either(const XNODE* x, MACHINE& m) { return run(x->a, m) || run(x->b, m); }
int64_t negation(const XNODE* x, MACHINE& m) { return !run(x->a, m); }
int64_t is_nonzero(const XNODE* x, MACHINE& m) { return as_float(run(x->a, m)) != 0; }
int64_t fail(const XNODE* x, MACHINE& m) { m.fail(static_cast<int>(x->k), static_cast<const char*>(x->extra)); }
int64_t single_bits(const XNODE* x, MACHINE& m) {
    const float f = static_cast<float>(as_float(run(x->a, m)));
    uint32_t w;
    std::memcpy(&w, &f, 4);
    return w;
}
int64_t bits_single(const XNODE* x, MACHINE& m) {
    const uint32_t w = static_cast<uint32_t>(run(x->a, m));
    float f;
    std::memcpy(&f, &w, 4);
    return from_float(f);
}
int64_t same(const XNODE* x, MACHINE& m) { return run(x->a, m); }
int64_t check_holds(const XNODE* x, MACHINE& m) {
    if (!run(x->a, m)) m.fail(EXEC_CHECK, "an asserted condition is false");
    return 0;
}
int64_t count(const XNODE* x, MACHINE& m) {
    NODE_COUNTS& c = m.counts;
    const COUNTED& counted = *static_cast<const COUNTED*>(x->extra);
    for (uint16_t opcode : counted.ops) c.by_op[opcode]++;
    c.loads += counted.accesses.loads;
    c.stores += counted.accesses.stores;
    c.memory_loads += counted.accesses.memory_loads;
    c.memory_stores += counted.accesses.memory_stores;
    c.fields += counted.accesses.fields;
    return run(x->a, m);
}

int base_operator(int opcode) {
    switch (opcode) {
    case op::PLUSASG:
    case op::PLUSPLUS: return op::PLUS;
    case op::MINUSASG:
    case op::MINMIN: return op::MINUS;
    case op::MULTASG: return op::MULT;
    case op::ANDBASG: return op::ANDB;
    case op::ORBASG: return op::ORB;
    case op::XORBASG: return op::XORB;
    case op::DIVASG: return op::DIV;
    case op::MODASG: return op::MOD;
    case op::SLLASG: return op::SLL;
    case op::SRLASG: return op::SRL;
    }
    return 0;
}

bool has_effects(const IC_NODE* n) {
    if (!n) return false;
    switch (n->op) {
    case op::ASG:
    case op::STASG:
    case op::ARASG:
    case op::CALL:
    case op::UCALL:
    case op::MCALL:
    case op::UMCALL:
    case op::MEMCPY: return true;
    }
    return base_operator(n->op) || has_effects(n->left) || has_effects(n->right);
}
} // namespace

EVAL COMPILER::constant_eval() { return give_constant; }

const XNODE* COMPILER::value(const IC_NODE* n) {
    if (!n) return constant(0);
    n = strip_marks(n);
    cost++;
    if (++depth > deepest) deepest = depth;
    std::vector<uint16_t> ops{static_cast<uint16_t>(n->op)};
    std::vector<uint16_t>* outer = folded;
    const ACCESSES outer_accesses = accesses;
    folded = &ops;
    accesses = {};
    const XNODE* x = build(n);
    if (p.options.stats) x = counting(x, ops);
    folded = outer;
    accesses = outer_accesses;
    depth--;
    return x;
}

const XNODE* COMPILER::counting(const XNODE* x, const std::vector<uint16_t>& ops) {
    p.counted.push_back({ops, accesses});
    XNODE* counter = p.node(count, x);
    counter->extra = &p.counted.back();
    return counter;
}

const XNODE* COMPILER::convert(const XNODE* x, const SHAPE& from, const SHAPE& to) {
    EVAL e = convert_eval(from, to);
    if (!e) return x;
    if (x->run == give_constant) return constant(convert_value(x->k, from, to));
    XNODE* y = p.node(e, x);
    set_convert(y, to);
    return y;
}

const XNODE* COMPILER::value_as(const IC_NODE* n, const SHAPE& to) {
    n = strip_marks(n);
    return convert(value(n), n ? shape_of(n->type) : to, to);
}

const XNODE* COMPILER::truth(const IC_NODE* n) {
    n = strip_marks(n);
    const XNODE* x = value(n);
    return shape_of(n->type).is_float() ? p.node(is_nonzero, x) : x;
}

const XNODE* COMPILER::failing(int status, const std::string& text) {
    p.texts.push_back(text);
    XNODE* x = p.node(fail, nullptr, nullptr, status);
    x->extra = p.texts.back().c_str();
    return x;
}

const XNODE* COMPILER::unsupported(const IC_NODE* n) {
    const char* name = if_node_info[n->op].name;
    return failing(EXEC_UNSUPPORTED, std::string("cannot execute ") + (name ? name : "this operator") + " of type " +
                                         (n->type ? n->type->printstr() : "none"));
}

const XNODE* COMPILER::number(const IC_NODE* n, const SHAPE& s) {
    if (n->op == op::FCON)
        return constant(from_float(s.rep == R_F32 ? static_cast<double>(std::strtof(n->text, nullptr))
                                                  : std::strtod(n->text, nullptr)));
    int64_t v = n->value;
    bool huge = false;
    if (n->op == op::LCON) {
        huge = n->text[0] != '-';
        v = huge ? static_cast<int64_t>(std::strtoull(n->text, nullptr, 10)) : std::strtoll(n->text, nullptr, 10);
    }
    if (!s.is_int() && !s.is_float()) return constant(v);
    return constant(convert_value(v, int_shape(64, !huge), s));
}

const XNODE* COMPILER::arithmetic(int opcode, const XNODE* a, const SHAPE& sa, const XNODE* b, const SHAPE& sb,
                                  const SHAPE& result) {
    const bool is_shift = opcode == op::SLL || opcode == op::SRL;
    const SHAPE c = is_shift ? promoted(sa) : combined(sa, sb);
    const EVAL e = binary_eval(opcode, c.rep);
    if (!e)
        return failing(EXEC_UNSUPPORTED,
                       std::string("cannot execute ") + if_node_info[opcode].name + " on such operands");
    // An operand enters an operation modulo 2^width as it is; division needs its value in the common type.
    const bool exact = c.is_float() || opcode == op::DIV || opcode == op::MOD;
    if (exact || is_shift) a = convert(a, sa, c);
    if (exact) b = convert(b, sb, c);
    const XNODE* x = p.node(e, a, b);
    if (c.is_int() && c.bits < c.units * 16) {
        XNODE* narrowed = p.node(convert_eval(int_shape(64, true), c), x);
        set_convert(narrowed, c);
        x = narrowed;
    }
    return convert(x, c, result);
}

const XNODE* COMPILER::binary(const IC_NODE* n) {
    const SHAPE s = shape_of(n->type), sa = shape_of(strip_marks(n->left)->type),
                sb = shape_of(strip_marks(n->right)->type);
    if (s.rep == R_AGG || sa.rep == R_AGG || sb.rep == R_AGG) return parts(n);
    const XNODE* a = value(n->left);
    const XNODE* b = value(n->right);
    return arithmetic(n->op, a, sa, b, sb, s);
}

const XNODE* COMPILER::unary(const IC_NODE* n) {
    const SHAPE s = shape_of(n->type);
    if (s.rep == R_AGG) return parts(n);
    const SHAPE sa = shape_of(strip_marks(n->left)->type);
    const SHAPE c = n->op == op::SQRT || n->op == op::RECIP ? (sa.is_float() ? sa : s) : promoted(sa);
    const EVAL e = unary_eval(n->op, c.rep);
    if (!e) return unsupported(n);
    return convert(p.node(e, value_as(n->left, c)), c, s);
}

const XNODE* COMPILER::comparison(const IC_NODE* n) {
    const SHAPE sa = shape_of(strip_marks(n->left)->type), sb = shape_of(strip_marks(n->right)->type);
    if (sa.rep == R_AGG || sb.rep == R_AGG) return parts(n);
    SHAPE c = combined(sa, sb);
    int opcode = n->op;
    if (opcode >= op::FEQ && !c.is_float()) c = float_shape(64);
    if (opcode < op::FEQ && c.is_float()) opcode = if_float_relop(opcode);
    const XNODE* a = value_as(n->left, c);
    const XNODE* b = value_as(n->right, c);
    // The operator says whether the comparison is signed; addresses have no sign.
    if (opcode >= op::LE && opcode <= op::GT && c.is_int() && !c.is_pointer && !c.is_signed()) {
        const SHAPE s = int_shape(c.bits, true);
        a = convert(a, c, s);
        b = convert(b, c, s);
        c = s;
    }
    const EVAL e = compare_eval(opcode, c.rep);
    if (!e) return unsupported(n);
    return p.node(e, a, b);
}

const XNODE* COMPILER::quest(const IC_NODE* n) {
    const IC_NODE* arms = strip_marks(n->right);
    if (!arms || arms->op != op::COLON) return unsupported(n);
    const SHAPE s = shape_of(n->type);
    XNODE* x = p.node(choose, truth(n->left));
    x->b = value_as(arms->left, s);
    x->c = value_as(arms->right, s);
    return x;
}

// PMCONV scales an index by an element's size, which is in bits; PVCONV is its inverse on a difference of addresses.
const XNODE* COMPILER::pointer_scale(const IC_NODE* n) {
    const SHAPE s = shape_of(n->type);
    const IC_NODE* size = strip_marks(n->right);
    const XNODE* by;
    const SHAPE sb = shape_of(size->type);
    if (size->op == op::ICON || size->op == op::LCON) {
        const XNODE* bits = number(size, sb);
        cost++;
        by = constant(bits->k / 16);
    } else {
        by = p.node(binary_eval(op::DIV, sb.rep), value(size), constant(16));
    }
    const int opcode = n->op == op::PMCONV ? op::MULT : op::DIV;
    if (!s.is_int()) return unsupported(n);
    return p.node(binary_eval(opcode, s.rep), value_as(n->left, s), convert(by, sb, s));
}

const XNODE* COMPILER::cast(const IC_NODE* n) {
    const IC_NODE* from = strip_marks(n->left);
    const SHAPE s = shape_of(n->type), sa = shape_of(from->type);
    if (s.rep == R_AGG && n->op != op::VRCONV) return sa.rep == R_AGG && sa.units == s.units ? value(from) : parts(n);
    if (n->op == op::VRCONV && s.units == sa.units && s.is_float() != sa.is_float() && (s.is_int() || sa.is_int())) {
        // The same bits seen as another type.
        if (s.rep == R_F32) return p.node(bits_single, value(from));
        if (sa.rep == R_F32) return convert(p.node(single_bits, value(from)), int_shape(32, false), s);
        return p.node(same, value(from));
    }
    if (n->op == op::VRCONV && s.rep != sa.rep && (s.rep == R_AGG || sa.rep == R_AGG)) return parts(n);
    return convert(value(from), sa, s);
}

const XNODE* COMPILER::assertion(const IC_NODE* n) {
    if (!p.options.check || !n->left || has_effects(n->left)) return constant(0);
    const IC_NODE* condition = strip_marks(n->left);
    if (n->op == op::ASSERT && condition->op == op::COMMA) condition = condition->left;
    return p.node(check_holds, truth(condition));
}

const XNODE* COMPILER::build(const IC_NODE* n) {
    if (const int base = base_operator(n->op)) return compound(n, base, n->op == op::PLUSPLUS || n->op == op::MINMIN);
    if ((n->op >= op::EQ && n->op <= op::UGT) || (n->op >= op::FEQ && n->op <= op::FUNO)) return comparison(n);
    const SHAPE s = shape_of(n->type);
    switch (n->op) {
    case op::NOP: return constant(0);
    case op::ICON:
    case op::LCON:
    case op::FCON: return number(n, s);
    case op::SCON: return constant(static_cast<int64_t>(p.text_address(n)));
    case op::NAME:
        if (auto it = n->sym ? p.entries.find(n->sym) : p.entries.end(); it != p.entries.end())
            return constant(it->second);
        [[fallthrough]];
    case op::STDOT:
    case op::STREF:
    case op::UMULT:
    case op::VREG:
    case op::VFIELD:
    case op::REAL:
    case op::IMAG: {
        const LVALUE lv = lvalue(n);
        return convert(load(lv), lv.shape, s);
    }
    case op::UAND:
    case op::ARGREF: {
        const IC_NODE* of = strip_marks(n->left);
        if (of->op == op::NAME && of->sym && p.entries.count(of->sym)) return constant(p.entries[of->sym]);
        return address(lvalue(of));
    }
    case op::STARG:
        return shape_of(strip_marks(n->left)->type).rep == R_AGG ? value(n->left) : address(lvalue(n->left));
    case op::PLUS:
    case op::MINUS:
    case op::MULT:
    case op::DIV:
    case op::MOD:
    case op::ANDB:
    case op::ORB:
    case op::XORB:
    case op::SLL:
    case op::SRL: return binary(n);
    case op::UMINUS:
    case op::NOTB:
    case op::ABS:
    case op::SQR:
    case op::SQRT:
    case op::RECIP: return unary(n);
    case op::ANDAND: return p.node(both, truth(n->left), truth(n->right));
    case op::OROR: return p.node(either, truth(n->left), truth(n->right));
    case op::EXCLAIM: return p.node(negation, truth(n->left));
    case op::QUEST: return quest(n);
    case op::COMMA:
    case op::COMMAOP:
    case op::PCOMMA: {
        const XNODE* first = value(n->left);
        return p.node(comma, first, value_as(n->right, s.rep == R_VOID ? shape_of(strip_marks(n->right)->type) : s));
    }
    case op::SCONV:
    case op::PCONV:
    case op::ACONV:
    case op::VRCONV:
    case op::TOIEEE:
    case op::FRIEEE: return cast(n);
    case op::PMCONV:
    case op::PVCONV: return pointer_scale(n);
    case op::ASG:
    case op::STASG:
    case op::ARASG: return assign(n);
    case op::CALL:
    case op::UCALL: return call(n);
    case op::ICALL:
    case op::UICALL:
    case op::MCALL:
    case op::UMCALL:
    case op::MEMCPY: return intrinsic(n);
    case op::NASSERT:
    case op::ASSERT: return assertion(n);
    case op::COMPLEX:
    case op::VPACK:
    case op::VPACKM:
    case op::VPACK1P: return parts(n);
    }
    return unsupported(n);
}
