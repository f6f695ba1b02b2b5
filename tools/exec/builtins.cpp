// Built-in functions of the target whose result their operands and their definition fix; each row of the table is the
// definition. Three conventions hold for all of them:
//   - a function that is marked as free of side effects is a function of its operands alone: a rotation is one of its
//     operand's 32 bits, without the carry;
//   - a repeated step (__rpt_...) is done as often as the last operand says, and not at all for a count below 1;
//   - a product in fixed point is exact in 64 bits, shifted right arithmetically and cut to its type.
// What hangs on more than the operands, or is not settled, is listed in `refused` with the reason.
//
// The multiply-accumulate forms pass the accumulator A and the product holder P by reference. Each adds the last
// product, shifted by the product mode, to A and then puts this product in P: A and P have the types that the
// references point to.
#include "tools/exec/machine.h"

#include <algorithm>
#include <unordered_map>

namespace {
using A = LIBRARY_ARGS;
const SHAPE s16 = int_shape(16, true), s32 = int_shape(32, true), s64 = int_shape(64, true);

// Product mode: -1 shifts left by one, 0 not, 1 to 6 right.
int64_t product(int64_t p, int64_t mode) {
    return mode < 0 ? static_cast<int64_t>(static_cast<uint64_t>(p) << -mode) : p >> std::min<int64_t>(mode, 63);
}

int64_t read(A& a, size_t k, const SHAPE& s) { return a.m.load(a.pointee(k, s), a.p(k)); }
void write(A& a, size_t k, const SHAPE& s, int64_t v) {
    const SHAPE to = a.pointee(k, s);
    a.m.store(to, a.p(k), wrap(v, to.bits, to.is_signed()));
}
int64_t sum(int64_t x, int64_t y) { return static_cast<int64_t>(static_cast<uint64_t>(x) + static_cast<uint64_t>(y)); }
int64_t difference(int64_t x, int64_t y) {
    return static_cast<int64_t>(static_cast<uint64_t>(x) - static_cast<uint64_t>(y));
}

void accumulate(A& a, size_t acc, bool subtract, int64_t next) {
    const int64_t p = product(read(a, acc + 1, s32), wrap(a.i(acc + 2), 16, true)), old = read(a, acc, s32);
    write(a, acc, s32, subtract ? difference(old, p) : sum(old, p));
    write(a, acc + 1, s32, next);
    a.m.counts.multiplies++;
}
int64_t mpy16(A& a, size_t x, size_t y) { return wrap(a.i(x), 16, true) * wrap(a.i(y), 16, true); }
int64_t mpy32(A& a, bool high) {
    const int64_t v = wrap(a.i(0), 32, true) * wrap(a.i(1), 32, true);
    return high ? v >> 32 : v;
}
void accumulate_float(A& a, const SHAPE& s) {
    auto rounded = [&](double d) {
        return from_float(s.rep == R_F32 ? static_cast<double>(static_cast<float>(d)) : d);
    };
    const double acc = as_float(a.m.load(s, a.p(2))), p = as_float(a.m.load(s, a.p(3)));
    a.m.store(s, a.p(2), rounded(acc + p));
    a.m.store(s, a.p(3), rounded(a.f(0) * a.f(1)));
    a.m.counts.multiplies++;
}
// Two at once: the low halves of the operands into the first accumulator, the high halves into the second.
void dual(A& a) {
    const int64_t x = a.i(0), y = a.i(1), mode = wrap(a.i(4), 16, true);
    const int64_t low = int64_t{static_cast<int16_t>(x)} * static_cast<int16_t>(y);
    const int64_t high = int64_t{static_cast<int16_t>(x >> 16)} * static_cast<int16_t>(y >> 16);
    write(a, 2, s32, sum(read(a, 2, s32), product(low, mode)));
    write(a, 3, s32, sum(read(a, 3, s32), product(high, mode)));
    a.m.counts.multiplies += 2;
}

int64_t smaller(A& a, unsigned bits, bool is_signed, bool larger) {
    const int64_t x = wrap(a.i(0), bits, is_signed), y = wrap(a.i(1), bits, is_signed);
    const bool less = is_signed ? x < y : static_cast<uint64_t>(x) < static_cast<uint64_t>(y);
    return less != larger ? x : y;
}
double smaller_float(A& a, bool larger) {
    const double x = a.f(0), y = a.f(1);
    return larger ? (y > x ? y : x) : (y < x ? y : x);
}
void modify(A& a, const SHAPE& s, int64_t (*with)(int64_t, int64_t)) { write(a, 0, s, with(read(a, 0, s), a.i(1))); }
int64_t reversed(uint64_t v, unsigned bits) {
    uint64_t r = 0;
    for (unsigned i = 0; i < bits; i++) r |= (v >> i & 1) << (bits - 1 - i);
    return static_cast<int64_t>(r);
}
// Shifted left until the sign bit is the only one of its kind; the count is stored where argument 1 points.
int64_t normalized(A& a, unsigned bits) {
    int64_t v = wrap(a.i(0), bits, true), n = 0;
    if (v == 0)
        n = 0;
    else
        while (wrap(v, bits, true) >> (bits - 2) == (v < 0 ? -1 : 0)) {
            v = wrap(static_cast<int64_t>(static_cast<uint64_t>(v) << 1), bits, true);
            n++;
        }
    write(a, 1, s16, n);
    return v;
}
// At most n steps of normalization of operand 0; each moves the count in operand 1 by `step`. Zero is normal.
int64_t norm_steps(A& a, int step) {
    int64_t v = wrap(a.i(0), 32, true), count = a.i(1);
    for (int64_t n = a.i(2); n > 0 && v != 0 && v >> 30 == v >> 31; n--, count += step) v *= 2;
    return count;
}
int64_t rotated(uint64_t v, int64_t left) {
    const uint32_t w = static_cast<uint32_t>(v);
    const unsigned n = static_cast<unsigned>(left & 31);
    return static_cast<int64_t>(n ? w << n | w >> (32 - n) : w);
}
int64_t count(A& a, size_t k) { return std::max<int64_t>(a.i(k), 0); }

// Steps of unsigned division by conditional subtraction. The accumulator holds the remainder above the quotient; a
// step shifts it left by one and, where the divisor is not above the remainder, takes it off and sets the quotient's
// new bit. Sixteen steps on a dividend in the low half leave the remainder in the high half and the quotient in the
// low.
int64_t divide_steps(uint32_t acc, uint16_t divisor, int64_t n) {
    for (; n > 0; n--) {
        const uint64_t shifted = uint64_t{acc} << 1, taken = uint64_t{divisor} << 16;
        acc = static_cast<uint32_t>(shifted >= taken ? shifted - taken + 1 : shifted);
    }
    return acc;
}
// The same with remainder and quotient of 32 bits each: the quotient moves up in operand 0, whose top bit enters the
// remainder, where operand 2 points.
int64_t long_divide_steps(A& a, int64_t n) {
    const SHAPE u32 = int_shape(32, false);
    uint32_t quotient = static_cast<uint32_t>(a.i(0));
    uint64_t remainder = static_cast<uint64_t>(a.m.load(u32, a.p(2)));
    const uint64_t divisor = static_cast<uint32_t>(a.i(1));
    for (; n > 0; n--) {
        remainder = remainder << 1 | quotient >> 31;
        quotient <<= 1;
        if (remainder >= divisor) {
            remainder -= divisor;
            quotient |= 1;
        }
        remainder &= 0xFFFFFFFF;
    }
    a.m.store(u32, a.p(2), static_cast<int64_t>(remainder));
    return quotient;
}
void fill(A& a) {
    const int64_t n = count(a, 2);
    if (n) a.m.check(a.p(0), static_cast<uint64_t>(n));
    for (int64_t i = 0; i < n; i++) a.m.memory[a.p(0) + static_cast<uint64_t>(i)] = static_cast<uint16_t>(a.i(1));
}
int64_t byte_at(A& a) {
    const uint64_t i = static_cast<uint16_t>(a.i(1)), at = a.p(0) + i / 2;
    a.m.check(at, 1);
    return a.m.memory[at] >> (i & 1 ? 8 : 0) & 0xFF;
}
void index_of_extreme(A& a, const SHAPE& s, bool larger) {
    const double best = as_float(a.m.load(s, a.p(0))), v = a.f(1);
    if (!(larger ? v > best : v < best)) return;
    a.m.store(s, a.p(0), from_float(v));
    a.m.store(s, a.p(2), from_float(a.f(3)));
}
void swap_floats(A& a) {
    const SHAPE s = float_shape(32);
    const int64_t x = a.m.load(s, a.p(0)), y = a.m.load(s, a.p(1));
    a.m.store(s, a.p(0), y);
    a.m.store(s, a.p(1), x);
}
int64_t whole(double d) { return convert_value(from_float(d), float_shape(64), s64); }
double single(double d) { return static_cast<float>(d); }
constexpr double two_pi = 6.283185307179586476925;

#define INT(NAME, EXPR)                                                                                                \
    {                                                                                                                  \
        NAME, 'i', [](A& a) -> int64_t {                                                                               \
            (void)a;                                                                                                   \
            return EXPR;                                                                                               \
        }                                                                                                              \
    }
#define FLOAT(NAME, EXPR)                                                                                              \
    {                                                                                                                  \
        NAME, 'f', [](A& a) -> int64_t { return from_float(EXPR); }                                                    \
    }
#define NOTHING(NAME, EXPR)                                                                                            \
    {                                                                                                                  \
        NAME, 'v', [](A& a) -> int64_t {                                                                               \
            (void)a;                                                                                                   \
            EXPR;                                                                                                      \
            return 0;                                                                                                  \
        }                                                                                                              \
    }
const LIBRARY_ENTRY entries[] = {
    INT("__min", smaller(a, 16, true, false)),
    INT("__lmin", smaller(a, 32, true, false)),
    INT("__llmin", smaller(a, 64, true, false)),
    INT("__max", smaller(a, 16, true, true)),
    INT("__lmax", smaller(a, 32, true, true)),
    INT("__llmax", smaller(a, 64, true, true)),
    INT("MIN", smaller(a, 16, true, false)),
    INT("LMIN", smaller(a, 32, true, false)),
    INT("LLMIN", smaller(a, 64, true, false)),
    INT("MAX", smaller(a, 16, true, true)),
    INT("LMAX", smaller(a, 32, true, true)),
    INT("LLMAX", smaller(a, 64, true, true)),
    INT("MINU", smaller(a, 16, false, false)),
    INT("LMINU", smaller(a, 32, false, false)),
    INT("LLMINU", smaller(a, 64, false, false)),
    INT("MAXU", smaller(a, 16, false, true)),
    INT("LMAXU", smaller(a, 32, false, true)),
    INT("LLMAXU", smaller(a, 64, false, true)),
    FLOAT("__fmin", smaller_float(a, false)),
    FLOAT("__fmax", smaller_float(a, true)),
    FLOAT("__fmin64", smaller_float(a, false)),
    FLOAT("__fmax64", smaller_float(a, true)),
    FLOAT("FMIN", smaller_float(a, false)),
    FLOAT("FMAX", smaller_float(a, true)),
    FLOAT("DMIN", smaller_float(a, false)),
    FLOAT("DMAX", smaller_float(a, true)),
    FLOAT("LDMIN", smaller_float(a, false)),
    FLOAT("LDMAX", smaller_float(a, true)),
    NOTHING("__dmac", dual(a)),
    NOTHING("__parallel_mpy_add", accumulate(a, 2, false, mpy16(a, 0, 1))),
    NOTHING("__parallel_mpy_sub", accumulate(a, 2, true, mpy16(a, 0, 1))),
    NOTHING("__parallel_sqr_add", accumulate(a, 1, false, mpy16(a, 0, 0))),
    NOTHING("__parallel_sqr_sub", accumulate(a, 1, true, mpy16(a, 0, 0))),
    NOTHING("__parallel_mpy_add_s32_lo", accumulate(a, 2, false, mpy32(a, false))),
    NOTHING("__parallel_mpy_sub_s32_lo", accumulate(a, 2, true, mpy32(a, false))),
    NOTHING("__parallel_mpy_add_s32_hi", accumulate(a, 2, false, mpy32(a, true))),
    NOTHING("__parallel_mpy_sub_s32_hi", accumulate(a, 2, true, mpy32(a, true))),
    NOTHING("__parallel_mpy_add_f32", accumulate_float(a, float_shape(32))),
    NOTHING("__parallel_mpy_add_f64", accumulate_float(a, float_shape(64))),
    INT("__mpy", mpy16(a, 0, 1)),
    INT("__mpyu", wrap(a.i(0), 16, false) * wrap(a.i(1), 16, false)),
    INT("__mpyxu", wrap(a.i(0), 16, true) * wrap(a.i(1), 16, false)),
    INT("__mpyb", wrap(a.i(0), 16, true) * wrap(a.i(1), 16, false)),
    INT("__mpy_mov_t", (write(a, 2, s16, a.i(0)), mpy16(a, 0, 1))),
    INT("__IQ", whole(a.f(0) * std::ldexp(1.0, static_cast<int>(a.i(1))))),
    INT("__IQmpy", wrap(a.i(0), 32, true) * wrap(a.i(1), 32, true) >> (a.i(2) & 63)),
    INT("__IQsat", std::max(std::min(a.i(0), a.i(1)), a.i(2))),
    INT("__qmpy32", wrap(a.i(0), 32, true) * wrap(a.i(1), 32, true) >> (a.i(2) & 63)),
    INT("__qmpy32by16", wrap(a.i(0), 32, true) * wrap(a.i(1), 16, true) >> (a.i(2) & 63)),
    INT("__rol", rotated(static_cast<uint64_t>(a.i(0)), 1)),
    INT("__ror", rotated(static_cast<uint64_t>(a.i(0)), -1)),
    INT("__rpt_rol", rotated(static_cast<uint64_t>(a.i(0)), count(a, 1))),
    INT("__rpt_ror", rotated(static_cast<uint64_t>(a.i(0)), -count(a, 1))),
    INT("__subcu", divide_steps(static_cast<uint32_t>(a.i(0)), static_cast<uint16_t>(a.i(1)), 1)),
    INT("__rpt_subcu", divide_steps(static_cast<uint32_t>(a.i(0)), static_cast<uint16_t>(a.i(1)), count(a, 2))),
    INT("__subcul", long_divide_steps(a, 1)),
    INT("__rpt_subcul", long_divide_steps(a, count(a, 3))),
    INT("__rpt_norm_inc", norm_steps(a, 1)),
    INT("__rpt_norm_dec", norm_steps(a, -1)),
    NOTHING("__rpt_mov_imm", fill(a)),
    INT("__abs16_sat", std::min<int64_t>(std::abs(wrap(a.i(0), 16, true)), 32767)),
    INT("__satlow16", std::clamp<int64_t>(wrap(a.i(0), 32, true), -32768, 32767)),
    INT("__flip16", reversed(static_cast<uint64_t>(a.i(0)), 16)),
    INT("__flip32", reversed(static_cast<uint64_t>(a.i(0)), 32)),
    INT("__flip64", reversed(static_cast<uint64_t>(a.i(0)), 64)),
    INT("__tbit", a.i(0) >> (a.i(1) & 15) & 1),
    INT("__norm32", normalized(a, 32)),
    INT("__norm64", normalized(a, 64)),
    INT("__mov_byte", byte_at(a)),
    NOTHING("__inc", write(a, 0, s16, read(a, 0, s16) + 1)),
    NOTHING("__dec", write(a, 0, s16, read(a, 0, s16) - 1)),
    NOTHING("__add", modify(a, s16, sum)),
    NOTHING("__addl", modify(a, s32, sum)),
    NOTHING("__sub", modify(a, s16, difference)),
    NOTHING("__subl", modify(a, s32, difference)),
    NOTHING("__subr", modify(a, s16, [](int64_t x, int64_t y) { return difference(y, x); })),
    NOTHING("__subrl", modify(a, s32, [](int64_t x, int64_t y) { return difference(y, x); })),
    NOTHING("__and", modify(a, s16, [](int64_t x, int64_t y) { return x & y; })),
    NOTHING("__or", modify(a, s16, [](int64_t x, int64_t y) { return x | y; })),
    NOTHING("__xor", modify(a, s16, [](int64_t x, int64_t y) { return x ^ y; })),
    INT("__addr32_read_uint16", a.m.load(int_shape(16, false), a.p(0))),
    INT("__addr32_read_uint32", a.m.load(int_shape(32, false), a.p(0))),
    NOTHING("__addr32_write_uint16", a.m.store(int_shape(16, false), a.p(0), a.i(1))),
    NOTHING("__addr32_write_uint32", a.m.store(int_shape(32, false), a.p(0), a.i(1))),
    FLOAT("__divf32", single(single(a.f(0)) / single(a.f(1)))),
    FLOAT("__fracf32", a.f(0) - std::trunc(a.f(0))),
    FLOAT("__fracf64", a.f(0) - std::trunc(a.f(0))),
    FLOAT("__fsat", std::max(std::min(a.f(0), a.f(1)), a.f(2))),
    FLOAT("__mpy2pif32", single(a.f(0) * two_pi)),
    FLOAT("__div2pif32", single(a.f(0) / two_pi)),
    FLOAT("__sinpuf32", single(std::sin(a.f(0) * two_pi))),
    FLOAT("__cospuf32", single(std::cos(a.f(0) * two_pi))),
    FLOAT("__atanpuf32", single(std::atan(a.f(0)) / two_pi)),
    FLOAT("__atan2puf32", single(std::atan2(a.f(0), a.f(1)) / two_pi)),
    INT("__f32toi16r", whole(std::clamp(std::nearbyint(a.f(0)), -32768.0, 32767.0))),
    INT("__f32toui16r", whole(std::clamp(std::nearbyint(a.f(0)), 0.0, 65535.0))),
    NOTHING("__f32_max_idx", index_of_extreme(a, float_shape(32), true)),
    NOTHING("__f32_min_idx", index_of_extreme(a, float_shape(32), false)),
    NOTHING("__f64_max_idx", index_of_extreme(a, float_shape(64), true)),
    NOTHING("__f64_min_idx", index_of_extreme(a, float_shape(64), false)),
    NOTHING("__swapf", swap_floats(a)),
    NOTHING("__swapff", swap_floats(a)),
    INT("_symval", a.i(0)),
    INT("ANTIALIASED", 1),
    INT("SYM_IS_AFFINE_IV", 1),
    INT("_disable_interrupts", 0),
    INT("__disable_interrupts", 0),
    INT("_enable_interrupts", 0),
    INT("__enable_interrupts", 0),
    NOTHING("_restore_interrupts", (void)0),
    NOTHING("__restore_interrupts", (void)0),
    NOTHING("__eallow", (void)0),
    NOTHING("__edis", (void)0),
    NOTHING("BARRIER", (void)0),
    NOTHING("BARRIER_WITH_ARG", (void)0),
    NOTHING("_never_executed", a.m.fail(EXEC_UNREACHABLE, "reached a place that is never executed")),
};

// Built-in functions that cannot be executed, and why.
const char carry[] = "its result hangs on the carry", counter[] = "its result hangs on the overflow counter";
const char estimate[] = "the estimate's bits are the hardware's own", bounds[] = "its bounds are not settled";
const char half_unit[] = "its result is the address of half a unit";
const struct {
    const char *name, *why;
} refused[] = {
    {"__addcu", carry},
    {"__sbbu", carry},
    {"ETSI_L_ADD_C", carry},
    {"ETSI_L_SUB_C", carry},
    {"__sat", counter},
    {"ETSI_L_SAT", counter},
    {"__sat32", bounds},
    {"__sathigh16", bounds},
    {"__einvf32", estimate},
    {"__einvf64", estimate},
    {"__eisqrtf32", estimate},
    {"__eisqrtf64", estimate},
    {"__quadf32", "the numbers of the quadrants are not settled"},
    {"__IQxmpy", "the position of the product's point is not settled"},
    {"__rpt_mac", "where its second operand lies is not settled"},
    {"__rpt_mov_imm_far", "the pointer that it returns is not settled"},
    {"__byte", half_unit},
    {"__byte_peripheral_32", "it is for a peripheral's registers"},
};
#undef INT
#undef FLOAT
#undef NOTHING
} // namespace

const char* builtin_refusal(const std::string& name) {
    for (const auto& r : refused)
        if (name == r.name) return r.why;
    return nullptr;
}

const LIBRARY_ENTRY* find_builtin(const std::string& name) {
    static const auto table = [] {
        std::unordered_map<std::string, const LIBRARY_ENTRY*> t;
        for (const LIBRARY_ENTRY& e : entries) t.emplace(e.name, &e);
        return t;
    }();
    auto it = table.find(name);
    return it == table.end() ? find_basic_operator(name) : it->second;
}
