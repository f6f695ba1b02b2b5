// Shapes of types, conversions between them, checked memory access by shape.
#include "tools/exec/machine.h"

namespace {
REP int_rep(unsigned bits, bool is_signed) {
    if (bits <= 16) return is_signed ? R_S16 : R_U16;
    if (bits <= 32) return is_signed ? R_S32 : R_U32;
    return is_signed ? R_S64 : R_U64;
}

unsigned rep_units(REP rep) {
    switch (rep) {
    case R_S16:
    case R_U16: return 1;
    case R_S32:
    case R_U32:
    case R_F32: return 2;
    case R_S64:
    case R_U64:
    case R_F64: return 4;
    default: return 0;
    }
}

// The integer part of a floating value, modulo 2^64 for what an unsigned 64-bit integer holds, at the nearest bound
// beyond; 0 for what is no number.
int64_t truncate(double d) {
    if (std::isnan(d)) return 0;
    if (d >= 18446744073709551616.0) return -1;
    if (d >= 9223372036854775808.0) return static_cast<int64_t>(static_cast<uint64_t>(d));
    if (d < -9223372036854775808.0) return INT64_MIN;
    return static_cast<int64_t>(d);
}
} // namespace

SHAPE int_shape(int bits, bool is_signed) {
    SHAPE s;
    s.rep = int_rep(static_cast<unsigned>(bits), is_signed);
    s.bits = static_cast<uint8_t>(bits);
    s.units = rep_units(s.rep);
    s.align_mask = s.units > 1 ? 1 : 0;
    return s;
}

SHAPE float_shape(int bits) {
    SHAPE s;
    s.rep = bits <= 32 ? R_F32 : R_F64;
    s.bits = bits <= 32 ? 32 : 64;
    s.units = rep_units(s.rep);
    s.align_mask = 1;
    return s;
}

SHAPE shape_of(TYPE* type) {
    SHAPE s;
    if (!type) return s;
    TYPE* t = find_type(type)->real;
    while (t->is_enum() || t->is_fixed()) t = t->underlying_type()->real;
    switch (t->kind) {
    case TYPE::tpk_void: return s;
    case TYPE::tpk_int: {
        const unsigned bits = t->size ? static_cast<unsigned>(t->size) : 16;
        s = int_shape(static_cast<int>(bits > 64 ? 64 : bits), t->is_signed());
        s.is_bool = t->is_ikind(TYPE::ik_bool);
        break;
    }
    case TYPE::tpk_float: s = float_shape(static_cast<int>(t->size)); break;
    case TYPE::tpk_pointer:
    case TYPE::tpk_ref:
        s = int_shape(32, false);
        s.is_pointer = true;
        break;
    case TYPE::tpk_func: s.rep = R_FUNC; return s;
    default:
        s.rep = R_AGG;
        s.units = static_cast<uint32_t>((t->size + 15) / 16);
        break;
    }
    const uint64_t align = (type->align ? type->align : t->align) / 16;
    s.align_mask = 0;
    while (align > 1 && uint64_t{s.align_mask} * 2 + 2 <= align) s.align_mask = s.align_mask * 2 + 1;
    return s;
}

SHAPE promoted(const SHAPE& s) {
    if (!s.is_int() || s.bits > 16 || s.is_pointer) return s;
    return int_shape(16, s.is_signed() || s.is_bool || s.bits < 16);
}

SHAPE combined(const SHAPE& a, const SHAPE& b) {
    if (!a.is_int() && !a.is_float()) return a;
    if (!b.is_int() && !b.is_float()) return b;
    if (a.is_pointer) return a;
    if (b.is_pointer) return b;
    if (a.is_float() || b.is_float()) {
        if (!b.is_float()) return a;
        if (!a.is_float()) return b;
        return a.bits >= b.bits ? a : b;
    }
    const SHAPE x = promoted(a), y = promoted(b);
    if (x.bits != y.bits) return x.bits > y.bits ? x : y;
    return x.is_signed() ? y : x;
}

int64_t wrap(int64_t v, unsigned bits, bool is_signed) {
    if (bits == 0) return 0;
    if (bits >= 64) return v;
    const uint64_t mask = (uint64_t{1} << bits) - 1;
    uint64_t x = static_cast<uint64_t>(v) & mask;
    if (is_signed && (x >> (bits - 1) & 1)) x |= ~mask;
    return static_cast<int64_t>(x);
}

int64_t convert_value(int64_t v, const SHAPE& from, const SHAPE& to) {
    if (to.is_float()) {
        if (from.is_float()) return to.rep == R_F32 ? from_float(static_cast<float>(as_float(v))) : v;
        if (from.rep == R_U64) {
            const uint64_t u = static_cast<uint64_t>(v);
            return from_float(to.rep == R_F32 ? static_cast<float>(u) : static_cast<double>(u));
        }
        return from_float(to.rep == R_F32 ? static_cast<float>(v) : static_cast<double>(v));
    }
    if (!to.is_int()) return v;
    if (to.is_bool) return from.is_float() ? as_float(v) != 0 : v != 0;
    return wrap(from.is_float() ? truncate(as_float(v)) : v, to.bits, to.is_signed());
}

// ---- Memory

void MACHINE::bad_address(uint64_t address, uint64_t units) const {
    if (address < null_page)
        fail(EXEC_BAD_ADDRESS, "access through a null pointer, address " + std::to_string(address));
    fail(EXEC_BAD_ADDRESS,
         "access outside memory, address " + std::to_string(address) + ", " + std::to_string(units) + " units");
}

void MACHINE::unaligned(uint64_t address) const {
    fail(EXEC_UNALIGNED, "access to an unaligned object, address " + std::to_string(address));
}

uint64_t MACHINE::get_reversed(uint64_t address, unsigned units) const {
    uint64_t v = 0;
    for (unsigned i = 0; i < units; i++) v = v << 16 | memory[address + i];
    return v;
}

void MACHINE::put_reversed(uint64_t address, unsigned units, uint64_t v) {
    for (unsigned i = units; i-- > 0; v >>= 16) memory[address + i] = static_cast<uint16_t>(v);
}

int64_t MACHINE::load(const SHAPE& shape, uint64_t address) const {
    if (shape.rep == R_AGG || shape.rep == R_FUNC) return static_cast<int64_t>(address);
    check(address, shape.units);
    if (address & shape.align_mask) unaligned(address);
    const uint64_t v = get(address, shape.units);
    if (shape.rep == R_F32) {
        const uint32_t w = static_cast<uint32_t>(v);
        float f;
        std::memcpy(&f, &w, 4);
        return from_float(f);
    }
    if (shape.rep == R_F64) return static_cast<int64_t>(v);
    return wrap(static_cast<int64_t>(v), shape.bits, shape.is_signed());
}

void MACHINE::store(const SHAPE& shape, uint64_t address, int64_t value) {
    if (shape.rep == R_VOID || shape.rep == R_FUNC) return;
    check(address, shape.units);
    if (address & shape.align_mask) unaligned(address);
    if (shape.rep == R_AGG) {
        check(static_cast<uint64_t>(value), shape.units);
        std::memmove(&memory[address], &memory[static_cast<uint64_t>(value)], shape.units * 2);
        return;
    }
    uint64_t bits = static_cast<uint64_t>(value);
    if (shape.rep == R_F32) {
        const float f = static_cast<float>(as_float(value));
        uint32_t w;
        std::memcpy(&w, &f, 4);
        bits = w;
    }
    put(address, shape.units, bits);
}

SHAPE LIBRARY_ARGS::pointee(size_t k, const SHAPE& fallback) const {
    if (k >= n || !type[k] || !type[k]->is_pointer()) return fallback;
    const SHAPE s = shape_of(type[k]->type_pointed_to());
    return s.is_int() || s.is_float() ? s : fallback;
}

int64_t run_library(const LIBRARY_ENTRY& entry, LIBRARY_ARGS& args, const SHAPE& result) {
    const int64_t v = entry.run(args);
    if (entry.result == 'v' || result.rep == R_VOID) return 0;
    return convert_value(v, entry.result == 'f' ? float_shape(64) : int_shape(64, true), result);
}
