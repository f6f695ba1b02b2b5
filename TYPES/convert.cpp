// Conversions of the language, containers of bit-fields, names of overloaded built-ins.
#include "TYPES/type_impl.h"

// ---- The language's conversions of arithmetic types

// The result is the promoted type without qualifiers and typedefs. A type that is no integer keeps its form.
TYPE* c_integral_promotions(TYPE* t) {
    TYPE* r = t->real;
    if (r->kind == TYPE::tpk_enum) r = r->component()->real;
    if (r->kind != TYPE::tpk_int) return r;
    const TYPE_PKG* p = t->pkg;
    switch (r->ikind()) {
    case TYPE::ik_bool:
    case TYPE::ik_schar:
    case TYPE::ik_short: return p->int_t;
    case TYPE::ik_uchar:
    case TYPE::ik_ushort: return r->size < p->int_t->size ? p->int_t : p->uint_t;
    case TYPE::ik_wchar:
        if (r->size > p->int_t->size) return p->long_t;
        return r->size < p->int_t->size ? p->int_t : p->uint_t;
    default: return r;
    }
}

static TYPE* wider_float(TYPE* a, TYPE* b) {
    if (!a->is_float()) return b;
    if (!b->is_float()) return a;
    return a->fkind() >= b->fkind() ? a : b;
}

TYPE* c_usual_arith_conv(TYPE* a, TYPE* b) {
    if (!a || !b || !a->is_arithmetic() || !b->is_arithmetic()) tp_die("Bad type:  c_usual_arith_conv()");
    if (!a->uid || !b->uid) tp_die("Unregistered type:  c_usual_arith_conv()");
    TYPE_PKG* p = a->pkg;
    if (a->is_complex() || b->is_complex()) {
        auto part = [](TYPE* t) { return t->is_complex() ? t->part_type() : t; };
        return p->mk_complex(c_usual_arith_conv(part(a), part(b)));
    }
    if (a->is_float() || b->is_float()) return wider_float(a->real, b->real);
    if (a->is_fixed() || b->is_fixed()) {
        if (!a->is_fixed()) return b->real;
        if (!b->is_fixed()) return a->real;
        return a->size >= b->size ? a->real : b->real;
    }
    a = c_integral_promotions(a);
    b = c_integral_promotions(b);
    if (a->rank() == b->rank()) return a->is_unsigned() ? a : b;
    TYPE *high = a->rank() > b->rank() ? a : b, *low = high == a ? b : a;
    if (high->is_unsigned() || low->is_signed() || high->size > low->size) return high;
    return p->mk_unsigned(high); // a signed type that does not hold all values of the unsigned one
}

// ---- Bit-field containers

bool get_container_offset_for_field(int start, int container_bits, int offset, int width, int* out) {
    if (container_bits <= 0 || width <= 0 || offset < start) return false;
    int64_t end = int64_t{offset} + width - start;
    int64_t container = (end + container_bits - 1) / container_bits * container_bits - container_bits + start;
    if (container > offset || container > INT32_MAX) return false;
    *out = static_cast<int>(container);
    return true;
}

bool is_legal_container_for_field(int start, int container_bits, int offset, int width) {
    int container;
    return get_container_offset_for_field(start, container_bits, offset, width, &container);
}

// ---- Overloaded built-ins

// Letters of the Itanium scheme. Pointers, arrays and vectors are a prefix to the code of what they are built on.
static void append_code(std::string& out, const TYPE* t) {
    static const char* const ints = "bahwstijlmxy";
    static const char* const floats = "fde";
    for (t = t->real;; t = t->component()->real) {
        switch (t->kind) {
        case TYPE::tpk_pointer: out += 'P'; continue;
        case TYPE::tpk_ref: out += 'R'; continue;
        case TYPE::tpk_complex: out += 'C'; continue;
        case TYPE::tpk_array: out += (t->is_vector() ? "Dv" : "A") + std::to_string(t->num_elem()) + "_"; continue;
        case TYPE::tpk_func: out += 'F'; continue;
        case TYPE::tpk_fixed: out += 'Q'; continue;
        case TYPE::tpk_ptm: out += 'M'; continue;
        case TYPE::tpk_void: out += 'v'; return;
        case TYPE::tpk_int: out += t->is_plain_char() ? 'c' : ints[t->ikind()]; return;
        case TYPE::tpk_float: out += floats[t->fkind()]; return;
        default: out += std::to_string(t->name().size()) + t->name(); return;
        }
    }
}

std::string mangle_overloaded_builtin_function_argtypes(const std::string& name, const std::vector<TYPE*>& args) {
    std::string out = name;
    if (args.empty()) out += 'v';
    for (const TYPE* t : args) append_code(out, t);
    return out;
}
