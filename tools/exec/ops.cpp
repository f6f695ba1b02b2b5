// Arithmetic, comparisons and conversions. Integers wrap at their width; a single is rounded after every operation.
#include "tools/exec/ops.h"

#include <type_traits>

namespace {
template <REP>
struct HELD;
template <>
struct HELD<R_S16> {
    using type = int16_t;
};
template <>
struct HELD<R_U16> {
    using type = uint16_t;
};
template <>
struct HELD<R_S32> {
    using type = int32_t;
};
template <>
struct HELD<R_U32> {
    using type = uint32_t;
};
template <>
struct HELD<R_S64> {
    using type = int64_t;
};
template <>
struct HELD<R_U64> {
    using type = uint64_t;
};
template <>
struct HELD<R_F32> {
    using type = float;
};
template <>
struct HELD<R_F64> {
    using type = double;
};

template <class T>
T take(int64_t v) {
    if constexpr (std::is_floating_point_v<T>)
        return static_cast<T>(as_float(v));
    else
        return static_cast<T>(v);
}
template <class T>
int64_t give(T v) {
    if constexpr (std::is_floating_point_v<T>)
        return from_float(v);
    else
        return static_cast<int64_t>(v);
}

template <class T>
T divide(MACHINE& m, T a, T b, bool remainder) {
    if constexpr (std::is_floating_point_v<T>) {
        return a / b;
    } else {
        if (b == 0) m.fail(EXEC_DIVISION, "division by zero");
        // The most negative value by -1 wraps to itself.
        if (std::is_signed_v<T> && b == static_cast<T>(-1))
            return remainder ? T{0} : static_cast<T>(uint64_t{0} - static_cast<uint64_t>(a));
        return static_cast<T>(remainder ? a % b : a / b);
    }
}

template <class T, int OP>
T combine(MACHINE& m, T a, T b) {
    if constexpr (OP == op::DIV || OP == op::MOD) {
        if constexpr (OP == op::MOD && std::is_floating_point_v<T>)
            return static_cast<T>(std::fmod(a, b));
        else
            return divide(m, a, b, OP == op::MOD);
    } else if constexpr (std::is_floating_point_v<T>) {
        if constexpr (OP == op::PLUS) return a + b;
        if constexpr (OP == op::MINUS) return a - b;
        if constexpr (OP == op::MULT) return a * b;
        return 0;
    } else {
        const uint64_t x = static_cast<uint64_t>(a), y = static_cast<uint64_t>(b);
        if constexpr (OP == op::PLUS) return static_cast<T>(x + y);
        if constexpr (OP == op::MINUS) return static_cast<T>(x - y);
        if constexpr (OP == op::MULT) return static_cast<T>(x * y);
        if constexpr (OP == op::ANDB) return static_cast<T>(x & y);
        if constexpr (OP == op::ORB) return static_cast<T>(x | y);
        if constexpr (OP == op::XORB) return static_cast<T>(x ^ y);
        return 0;
    }
}

template <class T, int OP>
int64_t binary(const XNODE* x, MACHINE& m) {
    const T a = take<T>(run(x->a, m));
    const T b = take<T>(run(x->b, m));
    return give<T>(combine<T, OP>(m, a, b));
}

// A count outside the width shifts everything out: zeros, or the sign of a signed value.
template <class T, int OP>
int64_t shift(const XNODE* x, MACHINE& m) {
    const T a = static_cast<T>(run(x->a, m));
    const int64_t count = run(x->b, m);
    constexpr int width = sizeof(T) * 8;
    if (OP == op::SLL) {
        if (count < 0 || count >= width) return 0;
        return static_cast<int64_t>(static_cast<T>(static_cast<uint64_t>(a) << count));
    }
    if (count < 0 || count >= width) return std::is_signed_v<T> && a < 0 ? -1 : 0;
    return static_cast<int64_t>(static_cast<T>(a >> count));
}

template <class T, int OP>
int64_t compare(const XNODE* x, MACHINE& m) {
    using U = std::make_unsigned_t<T>;
    const int64_t va = run(x->a, m);
    const int64_t vb = run(x->b, m);
    const T a = static_cast<T>(va), b = static_cast<T>(vb);
    const U ua = static_cast<U>(va), ub = static_cast<U>(vb);
    switch (OP) {
    case op::EQ: return a == b;
    case op::NEQ: return a != b;
    case op::LE: return a <= b;
    case op::LT: return a < b;
    case op::GE: return a >= b;
    case op::GT: return a > b;
    case op::ULE: return ua <= ub;
    case op::ULT: return ua < ub;
    case op::UGE: return ua >= ub;
    default: return ua > ub;
    }
}

// Each operator is the set of outcomes for which it holds: 1 equal, 2 less, 4 greater, 8 unordered.
constexpr int outcomes[] = {1, 6, 3, 2, 5, 4, 9, 14, 11, 10, 13, 12, 7, 8};
template <int OP>
int64_t compare_float(const XNODE* x, MACHINE& m) {
    const double a = as_float(run(x->a, m));
    const double b = as_float(run(x->b, m));
    const int outcome = a < b ? 2 : a > b ? 4 : a == b ? 1 : 8;
    return (outcomes[OP - op::FEQ] & outcome) != 0;
}

template <class T, int OP>
int64_t unary(const XNODE* x, MACHINE& m) {
    const T a = take<T>(run(x->a, m));
    if constexpr (std::is_floating_point_v<T>) {
        switch (OP) {
        case op::UMINUS: return give<T>(-a);
        case op::ABS: return give<T>(std::fabs(a));
        case op::SQR: return give<T>(a * a);
        case op::SQRT: return give<T>(std::sqrt(a));
        case op::RECIP: return give<T>(1 / a);
        }
    } else {
        const uint64_t u = static_cast<uint64_t>(a);
        switch (OP) {
        case op::UMINUS: return give<T>(static_cast<T>(0 - u));
        case op::NOTB: return give<T>(static_cast<T>(~u));
        case op::ABS: return give<T>(a < 0 ? static_cast<T>(0 - u) : a);
        case op::SQR: return give<T>(static_cast<T>(u * u));
        }
    }
    return 0;
}

template <class T>
int64_t wrap_to(const XNODE* x, MACHINE& m) {
    return static_cast<int64_t>(static_cast<T>(run(x->a, m)));
}
int64_t wrap_odd(const XNODE* x, MACHINE& m) { return wrap(run(x->a, m), x->n, x->m != 0); }
int64_t to_bool(const XNODE* x, MACHINE& m) { return run(x->a, m) != 0; }
int64_t float_to_bool(const XNODE* x, MACHINE& m) { return as_float(run(x->a, m)) != 0; }
int64_t to_single(const XNODE* x, MACHINE& m) { return from_float(static_cast<float>(as_float(run(x->a, m)))); }
template <class FROM, class TO>
int64_t to_float(const XNODE* x, MACHINE& m) {
    return from_float(static_cast<TO>(static_cast<FROM>(run(x->a, m))));
}
int64_t float_to_int(const XNODE* x, MACHINE& m) {
    return convert_value(run(x->a, m), float_shape(64), int_shape(static_cast<int>(x->n), x->m != 0));
}

template <template <class, int> class F, int OP>
EVAL by_int_rep(REP rep) {
    switch (rep) {
    case R_S16: return F<int16_t, OP>::call;
    case R_U16: return F<uint16_t, OP>::call;
    case R_S32: return F<int32_t, OP>::call;
    case R_U32: return F<uint32_t, OP>::call;
    case R_S64: return F<int64_t, OP>::call;
    case R_U64: return F<uint64_t, OP>::call;
    default: return nullptr;
    }
}
template <template <class, int> class F, int OP>
EVAL by_rep(REP rep) {
    if (rep == R_F32) return F<float, OP>::call;
    if (rep == R_F64) return F<double, OP>::call;
    return by_int_rep<F, OP>(rep);
}
template <class T, int OP>
struct BINARY {
    static int64_t call(const XNODE* x, MACHINE& m) { return binary<T, OP>(x, m); }
};
template <class T, int OP>
struct SHIFT {
    static int64_t call(const XNODE* x, MACHINE& m) { return shift<T, OP>(x, m); }
};
template <class T, int OP>
struct COMPARE {
    static int64_t call(const XNODE* x, MACHINE& m) { return compare<T, OP>(x, m); }
};
template <class T, int OP>
struct UNARY {
    static int64_t call(const XNODE* x, MACHINE& m) { return unary<T, OP>(x, m); }
};
} // namespace

EVAL binary_eval(int opcode, REP rep) {
    switch (opcode) {
    case op::PLUS: return by_rep<BINARY, op::PLUS>(rep);
    case op::MINUS: return by_rep<BINARY, op::MINUS>(rep);
    case op::MULT: return by_rep<BINARY, op::MULT>(rep);
    case op::DIV: return by_rep<BINARY, op::DIV>(rep);
    case op::MOD: return by_rep<BINARY, op::MOD>(rep);
    case op::ANDB: return by_int_rep<BINARY, op::ANDB>(rep);
    case op::ORB: return by_int_rep<BINARY, op::ORB>(rep);
    case op::XORB: return by_int_rep<BINARY, op::XORB>(rep);
    case op::SLL: return by_int_rep<SHIFT, op::SLL>(rep);
    case op::SRL: return by_int_rep<SHIFT, op::SRL>(rep);
    }
    return nullptr;
}

EVAL compare_eval(int opcode, REP rep) {
    switch (opcode) {
    case op::EQ: return by_int_rep<COMPARE, op::EQ>(rep);
    case op::NEQ: return by_int_rep<COMPARE, op::NEQ>(rep);
    case op::LE: return by_int_rep<COMPARE, op::LE>(rep);
    case op::LT: return by_int_rep<COMPARE, op::LT>(rep);
    case op::GE: return by_int_rep<COMPARE, op::GE>(rep);
    case op::GT: return by_int_rep<COMPARE, op::GT>(rep);
    case op::ULE: return by_int_rep<COMPARE, op::ULE>(rep);
    case op::ULT: return by_int_rep<COMPARE, op::ULT>(rep);
    case op::UGE: return by_int_rep<COMPARE, op::UGE>(rep);
    case op::UGT: return by_int_rep<COMPARE, op::UGT>(rep);
    case op::FEQ: return compare_float<op::FEQ>;
    case op::FNEQ: return compare_float<op::FNEQ>;
    case op::FLE: return compare_float<op::FLE>;
    case op::FLT: return compare_float<op::FLT>;
    case op::FGE: return compare_float<op::FGE>;
    case op::FGT: return compare_float<op::FGT>;
    case op::FEQN: return compare_float<op::FEQN>;
    case op::FNEQN: return compare_float<op::FNEQN>;
    case op::FLEN: return compare_float<op::FLEN>;
    case op::FLTN: return compare_float<op::FLTN>;
    case op::FGEN: return compare_float<op::FGEN>;
    case op::FGTN: return compare_float<op::FGTN>;
    case op::FORD: return compare_float<op::FORD>;
    case op::FUNO: return compare_float<op::FUNO>;
    }
    return nullptr;
}

EVAL unary_eval(int opcode, REP rep) {
    switch (opcode) {
    case op::UMINUS: return by_rep<UNARY, op::UMINUS>(rep);
    case op::NOTB: return by_int_rep<UNARY, op::NOTB>(rep);
    case op::ABS: return by_rep<UNARY, op::ABS>(rep);
    case op::SQR: return by_rep<UNARY, op::SQR>(rep);
    case op::SQRT: return rep == R_F32 ? unary<float, op::SQRT> : rep == R_F64 ? unary<double, op::SQRT> : nullptr;
    case op::RECIP: return rep == R_F32 ? unary<float, op::RECIP> : rep == R_F64 ? unary<double, op::RECIP> : nullptr;
    }
    return nullptr;
}

namespace {
EVAL int_wrap_eval(const SHAPE& from, const SHAPE& to) {
    if (to.bits >= 64) return nullptr;
    const bool fits = from.bits < to.bits ? !from.is_signed() || to.is_signed()
                                          : from.bits == to.bits && from.is_signed() == to.is_signed();
    if (fits && !from.is_bool) return nullptr;
    switch (to.bits) {
    case 16: return to.is_signed() ? wrap_to<int16_t> : wrap_to<uint16_t>;
    case 32: return to.is_signed() ? wrap_to<int32_t> : wrap_to<uint32_t>;
    default: return wrap_odd;
    }
}
} // namespace

EVAL convert_eval(const SHAPE& from, const SHAPE& to) {
    if (to.is_float()) {
        if (from.is_float()) return from.rep == R_F64 && to.rep == R_F32 ? to_single : nullptr;
        if (to.rep == R_F32) return from.rep == R_U64 ? to_float<uint64_t, float> : to_float<int64_t, float>;
        return from.rep == R_U64 ? to_float<uint64_t, double> : to_float<int64_t, double>;
    }
    if (!to.is_int()) return nullptr;
    if (to.is_bool) return from.is_float() ? float_to_bool : from.is_bool ? nullptr : to_bool;
    if (from.is_float()) return float_to_int;
    if (!from.is_int()) return nullptr; // an address
    return int_wrap_eval(from, to);
}

void set_convert(XNODE* x, const SHAPE& to) {
    x->n = to.bits;
    x->m = to.is_signed();
}
