// Loads, stores and steps of variables, for each representation and each form of the address.
#include "tools/exec/ops.h"

namespace {
template <BASE B>
uint64_t checked_address(const XNODE* x, MACHINE& m, unsigned units) {
    const uint64_t address = address_of(B, x, m);
    if (B == B_EXPR) {
        m.check(address, units);
        if (address & x->m) m.unaligned(address);
    }
    return address;
}

template <REP R>
constexpr unsigned units_of = R == R_S16 || R == R_U16                 ? 1
                              : R == R_S32 || R == R_U32 || R == R_F32 ? 2
                                                                       : 4;

template <REP R>
int64_t normal(uint64_t bits) {
    switch (R) {
    case R_S16: return static_cast<int16_t>(bits);
    case R_U16: return static_cast<uint16_t>(bits);
    case R_S32: return static_cast<int32_t>(bits);
    case R_U32: return static_cast<uint32_t>(bits);
    case R_F32: {
        const uint32_t w = static_cast<uint32_t>(bits);
        float f;
        std::memcpy(&f, &w, 4);
        return from_float(f);
    }
    default: return static_cast<int64_t>(bits);
    }
}
template <REP R>
uint64_t bits_of(int64_t v) {
    if (R != R_F32) return static_cast<uint64_t>(v);
    const float f = static_cast<float>(as_float(v));
    uint32_t w;
    std::memcpy(&w, &f, 4);
    return w;
}

template <REP R, BASE B>
int64_t load(const XNODE* x, MACHINE& m) {
    return normal<R>(m.get(checked_address<B>(x, m, units_of<R>), units_of<R>));
}

// The value comes first, then the address.
template <REP R, BASE B>
int64_t store(const XNODE* x, MACHINE& m) {
    const int64_t v = run(x->b, m);
    m.put(checked_address<B>(x, m, units_of<R>), units_of<R>, bits_of<R>(v));
    return v;
}

template <REP R, BASE B, int OP, bool BEFORE>
int64_t update(const XNODE* x, MACHINE& m) {
    const int64_t by = run(x->b, m);
    const uint64_t address = checked_address<B>(x, m, units_of<R>);
    const int64_t old = normal<R>(m.get(address, units_of<R>));
    int64_t v;
    if constexpr (R == R_F32 || R == R_F64) {
        const double sum = OP == op::PLUS ? as_float(old) + as_float(by) : as_float(old) - as_float(by);
        v = from_float(R == R_F32 ? static_cast<double>(static_cast<float>(sum)) : sum);
    } else {
        const uint64_t a = static_cast<uint64_t>(old), b = static_cast<uint64_t>(by);
        v = normal<R>(OP == op::PLUS ? a + b : a - b);
    }
    m.put(address, units_of<R>, bits_of<R>(v));
    return BEFORE ? old : v;
}

template <BASE B>
int64_t address(const XNODE* x, MACHINE& m) {
    return static_cast<int64_t>(address_of(B, x, m));
}

// A field may lie across as many as five units.
unsigned field_units(const XNODE* x) { return (x->m + x->n + 15) / 16; }

int64_t field_get(const XNODE* x, MACHINE& m, uint64_t address) {
    unsigned __int128 v = 0;
    for (unsigned i = 0; i < field_units(x); i++) v |= static_cast<unsigned __int128>(m.memory[address + i]) << 16 * i;
    return wrap(static_cast<int64_t>(static_cast<uint64_t>(v >> x->m)), x->n, x->c != nullptr);
}

template <BASE B>
int64_t bits_load(const XNODE* x, MACHINE& m) {
    const uint64_t at = address_of(B, x, m);
    m.check(at, field_units(x));
    return field_get(x, m, at);
}

template <BASE B>
int64_t bits_store(const XNODE* x, MACHINE& m) {
    const int64_t v = run(x->b, m);
    const uint64_t at = address_of(B, x, m);
    m.check(at, field_units(x));
    const unsigned __int128 ones = (static_cast<unsigned __int128>(1) << x->n) - 1;
    const unsigned __int128 value = (static_cast<unsigned __int128>(static_cast<uint64_t>(v)) & ones) << x->m;
    for (unsigned i = 0; i < field_units(x); i++) {
        const uint16_t mask = static_cast<uint16_t>((ones << x->m) >> 16 * i);
        uint16_t& unit = m.memory[at + i];
        unit = static_cast<uint16_t>((unit & ~mask) | (static_cast<uint16_t>(value >> 16 * i) & mask));
    }
    return wrap(v, x->n, x->c != nullptr);
}

template <BASE B>
int64_t copy(const XNODE* x, MACHINE& m) {
    const uint64_t from = static_cast<uint64_t>(run(x->b, m));
    const uint64_t to = address_of(B, x, m);
    if (x->n == 0) return static_cast<int64_t>(to);
    m.check(from, x->n);
    m.check(to, x->n);
    if ((from | to) & x->m) m.unaligned(from & x->m ? from : to);
    std::memmove(&m.memory[to], &m.memory[from], size_t{x->n} * 2);
    return static_cast<int64_t>(to);
}

template <template <REP, BASE> class F, REP R>
EVAL by_base(BASE base) {
    return base == B_ABS ? F<R, B_ABS>::call : base == B_FRAME ? F<R, B_FRAME>::call : F<R, B_EXPR>::call;
}
template <template <REP, BASE> class F>
EVAL by_rep(REP rep, BASE base) {
    switch (rep) {
    case R_S16: return by_base<F, R_S16>(base);
    case R_U16: return by_base<F, R_U16>(base);
    case R_S32: return by_base<F, R_S32>(base);
    case R_U32: return by_base<F, R_U32>(base);
    case R_S64:
    case R_U64: return by_base<F, R_U64>(base);
    case R_F32: return by_base<F, R_F32>(base);
    case R_F64: return by_base<F, R_F64>(base);
    default: return nullptr;
    }
}
template <REP R, BASE B>
struct LOAD {
    static constexpr EVAL call = load<R, B>;
};
template <REP R, BASE B>
struct STORE {
    static constexpr EVAL call = store<R, B>;
};
template <REP R, BASE B>
struct ADD {
    static constexpr EVAL call = update<R, B, op::PLUS, false>;
};
template <REP R, BASE B>
struct SUBTRACT {
    static constexpr EVAL call = update<R, B, op::MINUS, false>;
};
template <REP R, BASE B>
struct STEP_UP {
    static constexpr EVAL call = update<R, B, op::PLUS, true>;
};
template <REP R, BASE B>
struct STEP_DOWN {
    static constexpr EVAL call = update<R, B, op::MINUS, true>;
};
} // namespace

EVAL load_eval(REP rep, BASE base) { return by_rep<LOAD>(rep, base); }
EVAL store_eval(REP rep, BASE base) { return by_rep<STORE>(rep, base); }
EVAL add_store_eval(REP rep, BASE base, int opcode) {
    return opcode == op::PLUS ? by_rep<ADD>(rep, base) : by_rep<SUBTRACT>(rep, base);
}
EVAL step_eval(REP rep, BASE base, int opcode) {
    return opcode == op::PLUS ? by_rep<STEP_UP>(rep, base) : by_rep<STEP_DOWN>(rep, base);
}
EVAL address_eval(BASE base) {
    return base == B_ABS ? address<B_ABS> : base == B_FRAME ? address<B_FRAME> : address<B_EXPR>;
}
EVAL bits_load_eval(BASE base) {
    return base == B_ABS ? bits_load<B_ABS> : base == B_FRAME ? bits_load<B_FRAME> : bits_load<B_EXPR>;
}
EVAL bits_store_eval(BASE base) {
    return base == B_ABS ? bits_store<B_ABS> : base == B_FRAME ? bits_store<B_FRAME> : bits_store<B_EXPR>;
}
EVAL copy_eval(BASE base) { return base == B_ABS ? copy<B_ABS> : base == B_FRAME ? copy<B_FRAME> : copy<B_EXPR>; }
