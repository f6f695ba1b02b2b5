// INT65 values of the target's types: wrapping, limits, text.
//
// A signed type wraps by its top bit, an unsigned one by its mask. `bool` counts as unsigned, its values are 0 and 1;
// `wchar_t` counts as signed, as the integer that it normalizes to.
#include "TYPES/type.h"
#include "XINT/int65.h"

static const TYPE* long_type(const TYPE* t) { return t->pkg->long_t; }

// The integer or enumeration that a value of `type` is made of.
static const TYPE* integer_type(const TYPE* type) {
    if (type->is_pointer() || type->is_ref()) return long_type(type);
    if (type->is_vector()) type = type->raw_elem_type();
    if (type->is_pointer()) return long_type(type);
    if (!type->is_int() && !type->is_enum()) optassert("TYPE_IS_INT(type)", __FILE__, __LINE__);
    return type->real;
}

static bool wraps_unsigned(const TYPE* t) { return t->is_unsigned() || t->is_ikind(TYPE::ik_bool); }

INT65 type_mask(const TYPE* type) {
    if (type->size == 0 || type->size >= 64) return INT65(0, ~uint64_t{0});
    return INT65(0, (uint64_t{1} << type->size) - 1);
}

static INT65 top_bit(INT65 mask) { return INT65(0, mask.value ^ mask.value >> 1); }

INT65 truncate_to_type(INT65 v, TYPE* type) {
    const TYPE* t = integer_type(type);
    INT65 m = type_mask(t);
    if (wraps_unsigned(t) || (v & top_bit(m)).is_zero()) return v & m;
    if (t->is_enum() && !v.is_negative()) return v & m;
    return v | ~m;
}

static TYPE* signed_twin(TYPE* type, bool short_too) {
    const TYPE_PKG* p = type->pkg;
    if (type->is_pointer()) return type->size <= p->int_t->size ? p->int_t : p->long_t;
    if (!type->is_int()) return type;
    switch (type->ikind()) {
    case TYPE::ik_uint: return p->int_t;
    case TYPE::ik_ulong: return p->long_t;
    case TYPE::ik_ullong: return p->llong_t;
    case TYPE::ik_uchar: return short_too ? p->schar_t : type;
    case TYPE::ik_ushort: return short_too ? p->short_t : type;
    default: return type;
    }
}

INT65 sign_extend_by_type(INT65 v, TYPE* type) { return truncate_to_type(v, signed_twin(type, false)); }
INT65 sign_extend_by_type_size(INT65 v, TYPE* type) { return truncate_to_type(v, signed_twin(type, true)); }

INT65 int_type_min(TYPE* type) {
    const TYPE* t = integer_type(type);
    return wraps_unsigned(t) ? INT65(0) : -top_bit(type_mask(t));
}

INT65 int_type_max(TYPE* type) {
    const TYPE* t = integer_type(type);
    INT65 m = type_mask(t);
    return wraps_unsigned(t) ? m : INT65(0, m.value >> 1);
}

// Stricter than truncation, which lets an enumeration hold values of the other sign.
static bool holds(TYPE* type, INT65 v) {
    return truncate_to_type(v, type) == v && int_type_min(type) <= v && v <= int_type_max(type);
}

bool sum_may_overflow(INT65 a, INT65 b, TYPE* type) {
    int overflow = 0;
    return !holds(type, a) || !holds(type, b) || !holds(type, long_add(a, b, &overflow)) || overflow;
}

bool prod_may_overflow(INT65 a, INT65 b, TYPE* type) {
    int overflow = 0;
    return !holds(type, a) || !holds(type, b) || !holds(type, long_multiply(a, b, &overflow)) || overflow;
}

TYPE* default_ICON_type(INT65 v, int flag) {
    TYPE* const types[] = {tp->int_t, tp->uint_t, tp->long_t, tp->ulong_t, tp->llong_t, tp->ullong_t};
    for (TYPE* t : types)
        if ((flag || t->is_signed()) && int_type_min(t) <= v && v <= int_type_max(t)) return t;
    return tp->ullong_t;
}

const char* int2text(INT65 v, const TYPE* type, int radix, int slot) {
    static char slots[8][31];
    const TYPE* t = type ? type : tp->int_t;
    if (!t->is_int() && !t->is_enum()) {
        t = t->pkg->int_t;
        radix = 16;
    }
    bool is_unsigned = wraps_unsigned(t);
    INT65 m = type_mask(t);
    if (is_unsigned) v = v & m;
    if (radix == 0) radix = is_unsigned && (v > INT65(0xFFFFFF) || v > INT65(0, m.value >> 1)) ? 16 : 10;
    if (radix < 8 || radix > 16) radix = 10; // fewer digits than a slot holds
    bool minus = radix != 16 && v.is_negative();
    if (radix == 16) v = v & m;
    // -2^64 has a magnitude of its own.
    unsigned __int128 rest = minus ? (v.value ? -v.value : static_cast<unsigned __int128>(1) << 64) : v.value;

    char* p = slots[slot & 7] + 31;
    *--p = 0;
    if (t->size > t->pkg->long_t->size) *--p = 'L';
    if (t->size > t->pkg->int_t->size) *--p = 'L';
    if (is_unsigned && !t->is_ikind(TYPE::ik_bool)) *--p = 'u';
    do {
        *--p = "0123456789abcdef"[static_cast<int>(rest % radix)];
        rest /= radix;
    } while (rest);
    if (radix == 16) {
        *--p = 'x';
        *--p = '0';
    }
    if (minus) *--p = '-';
    return p;
}
