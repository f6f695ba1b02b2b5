#include "tools/treecheck/evaluator.h"

#include "OPT5/ir/trees.h"

#include <cmath>
#include <cstddef>
#include <cstring>

namespace treecheck {

namespace {

FORM make_form(const TYPE* type) {
    FORM f;
    if (type->is_complex() || type->is_vector()) return f; // no scalar
    if (type->is_pointer() || type->is_ref()) {
        f.is_pointer = true;
        f.bits = 32;
    } else if (type->is_float()) {
        f.is_float = f.is_signed = true;
        f.bits = type->size == 32 ? 32 : 64;
    } else if (type->is_int() || type->is_enum()) {
        f.is_bool = type->is_bool();
        f.is_signed = !f.is_bool && !type->is_unsigned();
        f.bits = static_cast<int>(type->size);
    }
    return f;
}

} // namespace

// Asked for several times at every node that is run, so that the answers for the types in use are kept.
FORM form_of(const TYPE* type) {
    struct ENTRY {
        const TYPE* type = nullptr;
        FORM form;
    };
    static thread_local ENTRY cache[256];
    ENTRY& e = cache[reinterpret_cast<uintptr_t>(type) / alignof(std::max_align_t) % 256];
    if (e.type != type) e = {type, make_form(type)};
    return e.form;
}

double as_double(BITS v) {
    double d;
    memcpy(&d, &v, sizeof d);
    return d;
}
BITS from_double(double v) {
    BITS b;
    memcpy(&b, &v, sizeof b);
    return b;
}

namespace {

constexpr FORM INT = {false, true, false, false, 16};
constexpr unsigned MOST_STEPS = 100000;

BITS wrap(BITS v, const FORM& f) {
    if (f.bits >= 64) return v;
    const BITS mask = (BITS(1) << f.bits) - 1;
    v &= mask;
    return f.is_signed && v >> (f.bits - 1) ? v | ~mask : v;
}

FORM promoted(FORM f) {
    if (f.is_float || f.is_pointer || f.bits > 16) return f;
    return {false, f.is_signed || f.is_bool || f.bits < 16, false, false, 16};
}

FORM usual(FORM a, FORM b) {
    if (a.is_pointer) return a;
    if (b.is_pointer) return b;
    if (a.is_float || b.is_float) return !a.is_float ? b : !b.is_float ? a : a.bits >= b.bits ? a : b;
    a = promoted(a), b = promoted(b);
    return a.bits != b.bits ? (a.bits > b.bits ? a : b) : a.is_signed ? b : a;
}

BITS mix(BITS h) {
    h ^= h >> 31;
    h *= 0x9E3779B97F4A7C15u;
    h ^= h >> 29;
    h *= 0xBF58476D1CE4E5B9u;
    return h ^ h >> 32;
}

BITS rounded(double v, const FORM& f) {
    return from_double(f.bits == 32 ? static_cast<double>(static_cast<float>(v)) : v);
}

double operate(int op, double a, double b) {
    switch (op) {
    case PLUS: return a + b;
    case MINUS: return a - b;
    case MULT: return a * b;
    default: return a / b;
    }
}

} // namespace

bool same_value(BITS a, BITS b, const FORM& form) {
    return a == b || (form.is_float && std::isnan(as_double(a)) && std::isnan(as_double(b)));
}

std::string value_text(BITS v, const FORM& form) {
    char text[40];
    if (form.is_float)
        snprintf(text, sizeof text, "%.17g", as_double(v));
    else if (form.is_signed)
        snprintf(text, sizeof text, "%lld", static_cast<long long>(v));
    else
        snprintf(text, sizeof text, "%llu", static_cast<unsigned long long>(v));
    return text;
}

BITS EVALUATOR::convert(BITS v, const FORM& from, const FORM& to) {
    if (to.is_float) {
        if (from.is_float) return rounded(as_double(v), to);
        if (from.is_signed) { // one rounding, from the integer to the format
            const auto s = static_cast<int64_t>(v);
            return from_double(to.bits == 32 ? static_cast<double>(static_cast<float>(s)) : static_cast<double>(s));
        }
        return from_double(to.bits == 32 ? static_cast<double>(static_cast<float>(v)) : static_cast<double>(v));
    }
    if (to.is_bool) return from.is_float ? as_double(v) != 0 : v != 0;
    if (!from.is_float) return wrap(v, to);
    const double d = std::trunc(as_double(v));
    const double high = std::ldexp(1.0, to.is_signed ? to.bits - 1 : to.bits);
    if (!(d < high) || d < (to.is_signed ? -high : 0)) return fail();
    return to.is_signed ? static_cast<BITS>(static_cast<int64_t>(d)) : static_cast<BITS>(d);
}

// ---- Memory
bool EVALUATOR::reaches(const PLACE& p, unsigned units) {
    const bool is_within = p.through_pointer ? p.unit + units > p.unit && w.pointer_may_reach(p.unit, units)
                                             : p.unit >= FIRST_UNIT && p.unit < w.end && p.unit + units <= w.end;
    undefined |= !is_within;
    return is_within;
}

BITS EVALUATOR::read(const PLACE& p) {
    const unsigned units = p.width ? (p.bit + p.width + 15) / 16 : static_cast<unsigned>(p.form.bits + 15) / 16;
    if (!p.form.bits) return p.unit;
    if (!reaches(p, units)) return 0;
    if (p.is_volatile) {
        events.push_back({'r', BITS(p.unit) << 8 | p.bit});
        return wrap(mix(seed + events.size()), p.form);
    }
    BITS v = 0;
    for (unsigned i = 0; i < units; ++i) v |= BITS(memory[p.unit + i]) << (16 * i);
    if (p.width) {
        FORM field = p.form;
        field.bits = static_cast<int>(p.width);
        return wrap(v >> p.bit, field);
    }
    if (p.form.is_float) {
        if (p.form.bits == 64) return v;
        const auto w = static_cast<uint32_t>(v);
        float f;
        memcpy(&f, &w, sizeof f);
        return from_double(f);
    }
    return wrap(v, p.form);
}

BITS EVALUATOR::write(const PLACE& p, BITS v) {
    const unsigned units = p.width ? (p.bit + p.width + 15) / 16 : static_cast<unsigned>(p.form.bits + 15) / 16;
    if (!reaches(p, units) || undefined) return v;
    BITS bits = v;
    if (p.form.is_float && std::isnan(as_double(v))) // the sign and the digits of a NaN are nobody's promise
        v = bits = from_double(std::copysign(std::nan(""), -1.0));
    if (p.form.is_float && p.form.bits == 32) {
        const float f = static_cast<float>(as_double(v));
        uint32_t w;
        memcpy(&w, &f, sizeof w);
        bits = w;
    }
    if (p.is_volatile) events.push_back({'w', mix(BITS(p.unit) << 8 | p.bit) ^ bits});
    if (p.width) {
        const BITS mask = ((BITS(1) << p.width) - 1) << p.bit;
        BITS old = 0;
        for (unsigned i = 0; i < units; ++i) old |= BITS(memory[p.unit + i]) << (16 * i);
        bits = (old & ~mask) | (bits << p.bit & mask);
        FORM field = p.form;
        field.bits = static_cast<int>(p.width);
        v = wrap(v, field);
    }
    for (unsigned i = 0; i < units; ++i) memory[p.unit + i] = static_cast<uint16_t>(bits >> (16 * i));
    return v;
}

EVALUATOR::PLACE EVALUATOR::member(const NODE* t) {
    PLACE p;
    if (t->op == STREF)
        p.unit = static_cast<uint32_t>(eval(t->left)), p.through_pointer = true;
    else
        p = place(t->left);
    const fkMDATA* m = t->right->mval;
    p.unit += static_cast<uint32_t>(m->offset) / 16;
    if (m->is_bitfld) {
        p.bit = static_cast<unsigned>(m->offset) & 15;
        p.width = m->width;
        p.form = form_of(m->type);
        if (p.form.is_bool) p.form = {false, false, false, false, 16};
    } else {
        p.width = 0;
        p.form = form_of(m->type);
    }
    p.is_volatile = p.is_volatile || lvalue_is_volatile(t);
    return p;
}

EVALUATOR::PLACE EVALUATOR::place(const NODE* t) {
    PLACE p;
    switch (t->op) {
    case NAME:
        p.unit = w.address(t->u.sym);
        p.form = form_of(t->u.sym->type);
        p.is_volatile = lvalue_is_volatile(t);
        return p;
    case STDOT:
    case STREF: return member(t);
    case UMULT:
        if (t->left->op == UAND) {
            p = place(t->left->left);
            p.bit = p.width = 0;
        } else {
            p.unit = static_cast<uint32_t>(eval(t->left));
            p.through_pointer = true;
        }
        p.form = form_of(t->type);
        p.is_volatile = p.is_volatile || lvalue_is_volatile(t);
        return p;
    case COMMAOP: eval(t->left); return place(t->right);
    case IDENTITY: return place(t->left);
    }
    undefined = true;
    return p;
}

// ---- Operators
BITS EVALUATOR::power(BITS base, BITS exponent, const FORM& f) {
    if (static_cast<int64_t>(exponent) < 0 && f.is_signed) {
        if (base == 1) return 1;
        if (base == ~BITS(0)) return exponent & 1 ? base : 1;
        return fail();
    }
    BITS r = 1;
    for (; exponent; exponent >>= 1, base *= base)
        if (exponent & 1) r *= base;
    return r;
}

BITS EVALUATOR::integer(int op, BITS a, BITS b, const FORM& f) {
    const bool by_sign = f.is_signed;
    const auto sa = static_cast<int64_t>(a), sb = static_cast<int64_t>(b);
    int64_t exact = 0;
    switch (op) {
    case PLUS:
        overflowed |= by_sign && (__builtin_add_overflow(sa, sb, &exact) || wrap(a + b, f) != a + b);
        return a + b;
    case MINUS:
        overflowed |= by_sign && (__builtin_sub_overflow(sa, sb, &exact) || wrap(a - b, f) != a - b);
        return a - b;
    case MULT:
        overflowed |= by_sign && (__builtin_mul_overflow(sa, sb, &exact) || wrap(a * b, f) != a * b);
        return a * b;
    case ANDB: return a & b;
    case ORB: return a | b;
    case XORB: return a ^ b;
    case DIV:
    case MOD:
        if (!b) return fail();
        if (!by_sign) return op == DIV ? a / b : a % b;
        overflowed |= sb == -1 && wrap(-a, f) == a && a;
        if (sb == -1) return op == DIV ? -a : 0;
        return static_cast<BITS>(op == DIV ? sa / sb : sa % sb);
    case EXPT: return power(a, b, f);
    }
    return fail();
}

BITS EVALUATOR::arithmetic(int op, BITS a, const FORM& fa, BITS b, const FORM& fb, const FORM& to) {
    if (op == SLL || op == SRL) {
        const FORM f = promoted(fa);
        a = wrap(a, f);
        if (static_cast<int64_t>(b) < 0 || b >= static_cast<BITS>(f.bits)) return fail();
        const BITS v = op == SLL ? a << b : f.is_signed ? static_cast<BITS>(static_cast<int64_t>(a) >> b) : a >> b;
        const BITS held = wrap(v, f);
        return convert(held, f, to);
    }
    const FORM f = usual(fa, fb);
    a = convert(a, fa, f);
    b = convert(b, fb, f);
    if (undefined) return 0;
    const BITS base = fa.is_pointer ? a : fb.is_pointer ? b : 0;
    // What a pointer is moved by stays within an object. A rewritten tree gets there by other steps.
    const auto by = static_cast<int32_t>(fa.is_pointer && !fb.is_pointer ? b : fb.is_pointer && !fa.is_pointer ? a : 0);
    overflowed |= !null_is_passed && (by >= 1 << 30 || by < -(1 << 30));
    if (base && !null_is_passed && wrap(integer(op, a, b, f), f) == 0 && !(fa.is_pointer && fb.is_pointer))
        return fail(); // no place in an object has the address null
    if (f.is_float) return convert(rounded(operate(op, as_double(a), as_double(b)), f), f, to);
    return convert(wrap(integer(op, a, b, f), f), f, to);
}

BITS EVALUATOR::unary(const NODE* t) {
    const FORM from = form_of(t->left->type), own = form_of(t->type);
    const bool is_float_function = t->op == SQRT || t->op == RECIP;
    const FORM f = is_float_function ? (from.is_float ? from : own) : promoted(from);
    const BITS v = convert(eval(t->left), from, f);
    if (undefined) return 0;
    BITS r;
    if (f.is_float) {
        const double d = as_double(v);
        switch (t->op) {
        case UMINUS: r = from_double(-d); break;
        case ABS: r = from_double(std::fabs(d)); break;
        case SQR: r = rounded(d * d, f); break;
        case SQRT: r = from_double(f.bits == 32 ? std::sqrt(static_cast<float>(d)) : std::sqrt(d)); break;
        case RECIP: r = rounded(1 / d, f); break;
        default: return fail();
        }
    } else {
        const bool is_negative = f.is_signed && static_cast<int64_t>(v) < 0;
        switch (t->op) {
        case UMINUS:
            r = -v;
            overflowed |= is_negative && wrap(r, f) == v;
            break;
        case NOTB: r = ~v; break;
        case ABS: r = is_negative ? -v : v; break;
        case SQR: r = integer(MULT, v, v, f); break;
        default: return fail();
        }
        r = wrap(r, f);
    }
    return convert(r, f, own);
}

bool EVALUATOR::compare(const NODE* t) {
    const FORM fa = form_of(t->left->type), fb = form_of(t->right->type), f = usual(fa, fb);
    BITS a = eval(t->left), b = eval(t->right);
    a = convert(a, fa, f);
    b = convert(b, fb, f);
    if (undefined) return false;
    if (f.is_float) {
        const double x = as_double(a), y = as_double(b);
        const int outcome = std::isnan(x) || std::isnan(y) ? 8 : x == y ? 1 : x < y ? 2 : 4;
        return op_is_float_compare(t->op) && (float_op_to_micro_ops[t->op - FEQ] & outcome);
    }
    // The operator says whether the comparison has a sign; addresses have none.
    const bool is_unsigned = t->op >= ULE || f.is_pointer;
    FORM as = f;
    as.is_signed = !is_unsigned && (f.is_signed || t->op >= LE);
    a = wrap(a, as);
    b = wrap(b, as);
    const auto sa = static_cast<int64_t>(a), sb = static_cast<int64_t>(b);
    switch (t->op) {
    case EQ: return a == b;
    case NEQ: return a != b;
    case LE:
    case ULE: return as.is_signed ? sa <= sb : a <= b;
    case LT:
    case ULT: return as.is_signed ? sa < sb : a < b;
    case GE:
    case UGE: return as.is_signed ? sa >= sb : a >= b;
    case GT:
    case UGT: return as.is_signed ? sa > sb : a > b;
    }
    return fail();
}

// ---- Effects
BITS EVALUATOR::compound(const NODE* t, int op, bool before) {
    const BITS by = t->right ? eval(t->right) : 1;
    const FORM form_of_by = t->right ? form_of(t->right->type) : INT;
    const PLACE p = place(t->left);
    const BITS old = read(p);
    const BITS held = write(p, arithmetic(op, old, p.form, by, form_of_by, p.form));
    return convert(before ? old : held, p.form, form_of(t->type));
}

void EVALUATOR::arguments(const NODE* list, BITS* hash) {
    if (!list) return;
    if (list->op == COMMA) {
        arguments(list->left, hash);
        arguments(list->right, hash);
        return;
    }
    const FORM f = form_of(list->type);
    const BITS v = eval(list);
    *hash = mix(*hash * 31 + (f.is_float && std::isnan(as_double(v)) ? 7 : v) + static_cast<BITS>(f.bits));
}

// A call sees the objects at file scope, and changes one of them.
BITS EVALUATOR::call(const NODE* t) {
    const SYMTAB* callee = t->left->op == UAND && t->left->left->op == NAME ? t->left->left->u.sym : nullptr;
    if (!callee) return fail();
    BITS hash = 0;
    if (t->op == CALL) arguments(t->right, &hash);
    if (undefined) return 0;
    for (const SYMTAB* s : w.objects)
        if (s->level == 0 && !s->type->is_volatile())
            for (uint32_t i = 0; i < (s->size + 15) / 16; ++i) hash = mix(hash + memory[w.address(s) + i]);
    events.push_back({callee->name[0], hash});
    const BITS r = mix(seed + 1000 + events.size());
    memory[w.address(w.globals[0])] ^= static_cast<uint16_t>(r >> 40);
    return wrap(r & 1 ? r : r >> 8 & 7, form_of(t->type));
}

// A conditional that computes both arms, marks that give their operand, minima and maxima. Of the latter the second
// argument wins where it is strictly less, or greater.
BITS EVALUATOR::intrinsic(const NODE* t) {
    const FORM own = form_of(t->type);
    const std::string name = t->u.name;
    if (name == "quest$colon") {
        const NODE *tested = t->left->left->left, *a = t->left->left->right, *b = t->left->right;
        const bool holds = truth(tested);
        const BITS x = convert(eval(a), form_of(a->type), own), y = convert(eval(b), form_of(b->type), own);
        return holds ? x : y;
    }
    if (name == "DONOTCSE") return convert(eval(t->left), form_of(t->left->type), own);
    const std::size_t minimum = name.find("min"), maximum = name.find("max");
    if (t->left->op != COMMA) { // an absolute value that saturates
        const BITS v = convert(eval(t->left), form_of(t->left->type), own),
                   most = wrap(~BITS(0) >> (65 - own.bits), own);
        if (name != "__abs16_sat") return fail();
        return static_cast<int64_t>(v) >= 0 ? v : wrap(-v, own) == v ? most : -v;
    }
    if (minimum == std::string::npos && maximum == std::string::npos) return fail();
    const NODE *first = t->left->left, *second = t->left->right;
    const BITS a = convert(eval(first), form_of(first->type), own),
               b = convert(eval(second), form_of(second->type), own);
    const bool less = own.is_float ? as_double(b) < as_double(a) : static_cast<int64_t>(b) < static_cast<int64_t>(a);
    const bool greater = own.is_float ? as_double(b) > as_double(a) : static_cast<int64_t>(b) > static_cast<int64_t>(a);
    return (minimum != std::string::npos ? less : greater) ? b : a;
}

void EVALUATOR::copy_record(const NODE* t) {
    const PLACE from = place(t->right), to = place(t->left);
    const unsigned units = static_cast<unsigned>(t->left->type->size / 16);
    if (!reaches(from, units) || !reaches(to, units)) return;
    for (unsigned i = 0; i < units; ++i) memory[to.unit + i] = memory[from.unit + i];
}

bool EVALUATOR::truth(const NODE* t) {
    const BITS v = eval(t);
    return form_of(t->type).is_float ? as_double(v) != 0 : v != 0;
}

BITS EVALUATOR::eval(const NODE* t) {
    if (undefined || ++steps > MOST_STEPS) return fail();
    const FORM own = form_of(t->type);
    switch (t->op) {
    case ICON:
        return own.is_pointer ? wrap(t->u.lval.value, own)
                              : convert(t->u.lval.value, FORM{false, true, false, false, 64}, own);
    case FCON: {
        double v;
        f_ftoh(t->u.fval, &v);
        return rounded(v, own);
    }
    case NAME:
    case UMULT:
    case STDOT:
    case STREF: {
        const PLACE p = place(t);
        return convert(read(p), p.form.bits ? p.form : own, own);
    }
    case UAND: return place(t->left).unit;
    case IDENTITY:
    case SCONV:
    case PCONV:
    case ACONV:
    case ISP2CHAR: return convert(eval(t->left), form_of(t->left->type), own);
    case PMCONV:
    case PVCONV: {
        const BITS v = convert(eval(t->left), form_of(t->left->type), own);
        const BITS by = convert(eval(t->right), form_of(t->right->type), own) / 16;
        return wrap(integer(t->op == PMCONV ? MULT : DIV, v, by, own), own);
    }
    case UMINUS:
    case NOTB:
    case ABS:
    case SQR:
    case SQRT:
    case RECIP: return unary(t);
    case EXCLAIM: return !truth(t->left);
    case ANDAND: return truth(t->left) && !undefined && truth(t->right);
    case OROR: return truth(t->left) || (!undefined && truth(t->right));
    case COMMAOP: eval(t->left); return convert(eval(t->right), form_of(t->right->type), own);
    case QUEST: {
        const NODE* arm = truth(t->left) ? t->right->left : t->right->right;
        return undefined ? 0 : convert(eval(arm), form_of(arm->type), own);
    }
    case ASG: {
        const BITS v = eval(t->right);
        const PLACE p = place(t->left);
        if (undefined) return 0;
        const BITS stored = convert(v, form_of(t->right->type), p.form);
        return convert(write(p, stored), p.form, own);
    }
    case STASG: copy_record(t); return 0;
    case MEMCPY: return copy_memory(t);
    case REAL:
    case IMAG:
    case VFIELD: {
        const std::vector<BITS> all = lanes(t->left);
        const BITS i = t->op == VFIELD ? eval(t->right) : t->op == IMAG;
        return undefined || i >= all.size() ? fail() : all[i];
    }
    case ICALL: return intrinsic(t);
    case CALL:
    case UCALL: return call(t);
    case PLUSPLUS: return compound(t, PLUS, true);
    case MINMIN: return compound(t, MINUS, true);
    }
    if (op_is_int_compare(t->op) || op_is_float_compare(t->op)) return compare(t);
    if (op_of_opASG[t->op] != ILLOP) return compound(t, op_of_opASG[t->op], false);
    if (!t->left || !t->right) return fail();
    const BITS a = eval(t->left), b = eval(t->right);
    return undefined ? 0 : arithmetic(t->op, a, form_of(t->left->type), b, form_of(t->right->type), own);
}

} // namespace treecheck
