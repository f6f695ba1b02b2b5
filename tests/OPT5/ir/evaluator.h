// An evaluator of expression trees that shares no rule with the system under test: C's conversions are made by width
// and sign, integers are computed in 128 bits, floats by the host. And a maker of random trees for it.
#pragma once

#include "tree_builder.h"

#include <cmath>
#include <map>
#include <random>
#include <vector>

namespace test_trees {

using I128 = __int128;

struct VALUE {
    bool undefined = false; // the program may not do this
    bool is_float = false;
    I128 i = 0;
    double f = 0;
    bool operator==(const VALUE& o) const {
        if (is_float != o.is_float) return false;
        if (!is_float) return i == o.i;
        return std::isnan(f) ? std::isnan(o.f) : f == o.f && std::signbit(f) == std::signbit(o.f);
    }
};

inline std::ostream& operator<<(std::ostream& out, const VALUE& v) {
    if (v.undefined) return out << "undefined";
    if (v.is_float) return out << v.f;
    return out << static_cast<long long>(v.i);
}

// What counts of a type: its width, its sign, whether it is floating or a truth value.
struct SHAPE {
    bool is_float, is_signed, is_bool;
    int bits;
};
inline SHAPE shape(const TYPE* t) { return {t->is_float(), t->is_signed(), t->is_bool(), static_cast<int>(t->size)}; }
inline SHAPE promoted(SHAPE s) {
    if (s.is_float || s.bits > 16) return s;
    return {false, s.is_signed || s.is_bool, false, 16};
}
inline SHAPE usual(SHAPE a, SHAPE b) {
    if (a.is_float || b.is_float) return !a.is_float ? b : !b.is_float ? a : a.bits >= b.bits ? a : b;
    a = promoted(a), b = promoted(b);
    return a.bits != b.bits ? (a.bits > b.bits ? a : b) : a.is_signed ? b : a;
}

inline I128 wrap(I128 v, SHAPE s) {
    I128 range = I128(1) << s.bits;
    v &= range - 1;
    return s.is_signed && v >= range / 2 ? v - range : v;
}

inline VALUE integer(I128 v, SHAPE s) {
    VALUE r;
    r.i = wrap(v, s);
    return r;
}
inline VALUE real(double v, SHAPE s) {
    VALUE r;
    r.is_float = true;
    r.f = s.bits == 32 ? static_cast<float>(v) : v;
    return r;
}

inline VALUE convert(VALUE v, SHAPE to) {
    if (v.undefined) return v;
    if (to.is_float) {
        if (v.is_float) return real(v.f, to);
        bool fits_signed = v.i >= INT64_MIN && v.i <= INT64_MAX; // one rounding, from the integer to the format
        int64_t s = static_cast<int64_t>(v.i);
        uint64_t u = static_cast<uint64_t>(v.i);
        if (to.bits == 32) return real(fits_signed ? static_cast<float>(s) : static_cast<float>(u), to);
        return real(fits_signed ? static_cast<double>(s) : static_cast<double>(u), to);
    }
    if (to.is_bool) return integer(v.is_float ? v.f != 0 : v.i != 0, to);
    if (!v.is_float) return integer(v.i, to);
    VALUE r;
    if (std::isnan(v.f) || std::fabs(v.f) > 1e20 || wrap(static_cast<I128>(v.f), to) != static_cast<I128>(v.f))
        r.undefined = true;
    else
        r.i = static_cast<I128>(v.f);
    return r;
}

inline VALUE undefined_value() {
    VALUE r;
    r.undefined = true;
    return r;
}

inline VALUE compute(int op, VALUE a, VALUE b, SHAPE s) {
    if (s.is_float) {
        if (s.bits == 32) { // the host's own single precision
            float x = static_cast<float>(a.f), y = static_cast<float>(b.f);
            return op == PLUS    ? real(x + y, s)
                   : op == MINUS ? real(x - y, s)
                   : op == MULT  ? real(x * y, s)
                                 : real(x / y, s);
        }
        return op == PLUS    ? real(a.f + b.f, s)
               : op == MINUS ? real(a.f - b.f, s)
               : op == MULT  ? real(a.f * b.f, s)
                             : real(a.f / b.f, s);
    }
    switch (op) {
    case PLUS: return integer(a.i + b.i, s);
    case MINUS: return integer(a.i - b.i, s);
    case MULT:
        return integer(static_cast<I128>(static_cast<unsigned __int128>(a.i) * static_cast<unsigned __int128>(b.i)), s);
    case ANDB: return integer(a.i & b.i, s);
    case ORB: return integer(a.i | b.i, s);
    case XORB: return integer(a.i ^ b.i, s);
    case DIV: return b.i == 0 ? undefined_value() : integer(a.i / b.i, s);
    case MOD: return b.i == 0 ? undefined_value() : integer(a.i % b.i, s);
    case SLL:
        return b.i < 0 || b.i >= s.bits ? undefined_value()
                                        : integer(static_cast<I128>(static_cast<unsigned __int128>(a.i) << b.i), s);
    case SRL: return b.i < 0 || b.i >= s.bits ? undefined_value() : integer(a.i >> b.i, s);
    }
    return undefined_value();
}

inline bool compare(int op, VALUE a, VALUE b, SHAPE s) {
    if (op >= FEQ && op <= FUNO) {
        int o = std::isnan(a.f) || std::isnan(b.f) ? 8 : a.f == b.f ? 1 : a.f < b.f ? 2 : 4;
        return float_op_to_micro_ops[op - FEQ] & o;
    }
    int base = op >= ULE ? op - (ULE - LE) : op;
    int order = s.is_float ? (a.f < b.f ? -1 : a.f > b.f) : (a.i < b.i ? -1 : a.i > b.i);
    switch (base) {
    case EQ: return order == 0;
    case NEQ: return order != 0;
    case LE: return order <= 0;
    case LT: return order < 0;
    case GE: return order >= 0;
    default: return order > 0;
    }
}

class EVALUATOR {
public:
    std::map<const SYMTAB*, VALUE> variables;

    VALUE eval(const NODE* t) {
        SHAPE own = shape(t->type);
        switch (t->op) {
        case ICON: {
            I128 v = static_cast<I128>(t->u.lval.value);
            return integer(t->u.lval.is_negative() ? v - (I128(1) << 64) : v, own);
        }
        case FCON: {
            double v;
            f_ftoh(t->u.fval, &v);
            return real(v, own);
        }
        case NAME: return convert(variables.at(t->u.sym), own);
        case SCONV: return convert(eval(t->left), own);
        case UMINUS:
        case NOTB:
        case ABS: return unary(t);
        case EXCLAIM: {
            VALUE v = eval(t->left);
            return v.undefined ? v : truth(!is_true(v), t);
        }
        case ANDAND: return logical(t, false);
        case OROR: return logical(t, true);
        case COMMAOP: eval(t->left); return eval(t->right);
        case QUEST: {
            VALUE c = eval(t->left);
            if (c.undefined) return c;
            return convert(eval(is_true(c) ? t->right->left : t->right->right), own);
        }
        case ASG: return store(t->left, eval(t->right), own);
        }
        if (op_is_int_compare(t->op) || op_is_float_compare(t->op)) return comparison(t);
        if (op_of_opASG[t->op] != ILLOP) {
            VALUE e = eval(t->right), x = eval(t->left);
            return store(t->left, binary(op_of_opASG[t->op], x, shape(t->left->type), e, shape(t->right->type)), own);
        }
        VALUE a = eval(t->left);
        return convert(binary(t->op, a, shape(t->left->type), eval(t->right), shape(t->right->type)), own);
    }

private:
    static bool is_true(VALUE v) { return v.is_float ? v.f != 0 : v.i != 0; }
    static VALUE truth(bool b, const NODE* t) { return integer(b, shape(t->type)); }

    VALUE store(const NODE* lhs, VALUE v, SHAPE result) {
        if (v.undefined) return v;
        VALUE stored = convert(v, shape(lhs->u.sym->type));
        variables[lhs->u.sym] = stored;
        return convert(stored, result);
    }
    VALUE binary(int op, VALUE a, SHAPE sa, VALUE b, SHAPE sb) {
        if (a.undefined || b.undefined) return undefined_value();
        bool is_shift = op == SLL || op == SRL;
        SHAPE s = is_shift ? promoted(sa) : usual(sa, sb);
        return compute(op, convert(a, s), is_shift ? b : convert(b, s), s);
    }
    VALUE unary(const NODE* t) {
        VALUE a = eval(t->left);
        if (a.undefined) return a;
        SHAPE s = promoted(shape(t->left->type));
        a = convert(a, s);
        if (t->op == NOTB) return convert(integer(~a.i, s), shape(t->type));
        bool negate = t->op == UMINUS || (s.is_float ? std::signbit(a.f) && !std::isnan(a.f) : a.i < 0);
        VALUE r = s.is_float ? real(negate ? -a.f : a.f, s) : integer(negate ? -a.i : a.i, s);
        return convert(r, shape(t->type));
    }
    VALUE logical(const NODE* t, bool deciding) {
        VALUE a = eval(t->left);
        if (a.undefined || is_true(a) == deciding) return a.undefined ? a : truth(deciding, t);
        VALUE b = eval(t->right);
        return b.undefined ? b : truth(is_true(b), t);
    }
    VALUE comparison(const NODE* t) {
        VALUE a = eval(t->left), b = eval(t->right);
        if (a.undefined || b.undefined) return undefined_value();
        SHAPE s = usual(shape(t->left->type), shape(t->right->type));
        return truth(compare(t->op, convert(a, s), convert(b, s), s), t);
    }
};

// Random trees, typed as C types them, without casts between the operands.
class TREE_MAKER {
public:
    std::mt19937_64 rng;
    std::vector<SYMTAB*> variables; // empty: constants only
    std::vector<TYPE*> types;

    explicit TREE_MAKER(uint64_t seed) : rng(seed) {
        types = {tp->schar_t, tp->uchar_t, tp->short_t,  tp->ushort_t, tp->int_t,   tp->uint_t,  tp->long_t,
                 tp->ulong_t, tp->llong_t, tp->ullong_t, tp->bool_t,   tp->float_t, tp->double_t};
    }
    unsigned pick(unsigned n) { return static_cast<unsigned>(rng() % n); }

    INT65 interesting(const TYPE* t) {
        int bits = static_cast<int>(t->size);
        uint64_t v = rng();
        switch (pick(6)) {
        case 0: v = pick(4); break;
        case 1: v = -static_cast<uint64_t>(pick(4)); break;
        case 2: v = uint64_t(1) << pick(static_cast<unsigned>(bits)); break;
        case 3: v = (uint64_t(1) << (bits - 1)) - pick(2); break;
        case 4: v = pick(70); break;
        }
        return INT65(static_cast<int64_t>(v));
    }
    double interesting_float(TYPE* t) {
        static const double some[] = {0.0,  -0.0,   1.0,     -1.0,       0.5,  3.0,         0.1,
                                      1e30, -1e-30, 65536.0, 16777217.0, 1e38, 4294967296.0};
        double v = some[pick(13)];
        if (pick(3) == 0) v = std::ldexp(static_cast<double>(rng() >> 11), static_cast<int>(pick(120)) - 110);
        return t->size == 32 ? static_cast<float>(v) : v;
    }
    NODE* constant(TYPE* t) {
        if (!t->is_float()) {
            NODE* n = mk_ICON(interesting(t), t);
            if (t->is_bool()) n->u.lval = INT65(pick(2));
            return n;
        }
        NODE* n = new_node(FCON, t);
        n->u.fval = new simul_fval;
        double v = interesting_float(t);
        uint64_t bits;
        memcpy(&bits, &v, sizeof bits);
        ieee_cvt_dtos(static_cast<uint32_t>(bits >> 32), static_cast<uint32_t>(bits), n->u.fval);
        return n;
    }
    NODE* leaf() {
        if (!variables.empty() && pick(3)) return name(variables[pick(static_cast<unsigned>(variables.size()))]);
        return constant(types[pick(static_cast<unsigned>(types.size()))]);
    }
    NODE* expression(int depth) {
        if (depth == 0 || pick(8) == 0) return leaf();
        NODE* a = expression(depth - 1);
        static const int binaries[] = {PLUS, MINUS, MULT, DIV, MOD, ANDB, ORB, XORB, SLL, SRL};
        switch (pick(9)) {
        case 0: return un(SCONV, a, types[pick(static_cast<unsigned>(types.size()))]);
        case 1: {
            int op = pick(3) ? (pick(2) ? UMINUS : ABS) : a->type->is_float() ? UMINUS : NOTB;
            return un(op, a, operator_type_for_operand_types(op, a->type, nullptr, nullptr, nullptr));
        }
        case 2: {
            NODE* b = expression(depth - 1);
            bool is_float = a->type->is_float() || b->type->is_float();
            SHAPE s = usual(shape(a->type), shape(b->type));
            int op = is_float ? FEQ + static_cast<int>(pick(14)) : EQ + static_cast<int>(pick(6));
            if (!is_float && op >= LE && !s.is_signed) op += ULE - LE;
            return bin(op, a, b);
        }
        case 3:
            if (pick(3) == 0) return mk_EXCLAIM(a);
            return bin(pick(2) ? ANDAND : OROR, a, expression(depth - 1));
        }
        int op = binaries[pick(10)];
        NODE* b = op == SLL || op == SRL ? mk_ICON(INT65(pick(16)), tp->int_t) : expression(depth - 1);
        if ((a->type->is_float() || b->type->is_float()) && op > DIV) op = DIV;
        if ((a->type->is_float() || b->type->is_float()) && op != PLUS && op != MINUS && op != MULT) op = DIV;
        return bin(op, a, b);
    }
};

} // namespace test_trees
