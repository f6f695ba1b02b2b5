// The C type rules for operators, and the facts about the target's scalar types that follow from its sizes.

#include "OPT5/ir/type_ops.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstring>

uint32_t max_scalar_alignment;
uint64_t max_scalar_stride, pointer_type_stride;
TYPE_OPS_CALLBACKS type_ops_callbacks;

namespace {

// Normalized, by IKIND: so in order of rank.
constexpr int IKINDS = TYPE::ik_ullong + 1;
TYPE* widening_integers[IKINDS];

TYPE* normalized(TYPE* t) { return t->normalized_type(); }

bool is_narrow(const TYPE* t) { return t->size < tp->int_t->size; }

} // namespace

uint64_t type_stride(const TYPE* t) { return t->align ? (t->size + t->align - 1) / t->align * t->align : t->size; }

void init_types() {
    TYPE* integers[IKINDS] = {tp->bool_t, tp->schar_t, tp->uchar_t, tp->wchar_t_, tp->short_t, tp->ushort_t,
                              tp->int_t,  tp->uint_t,  tp->long_t,  tp->ulong_t,  tp->llong_t, tp->ullong_t};
    TYPE* others[] = {tp->void_ptr_t,
                      tp->float_t,
                      tp->double_t,
                      tp->ldouble_t,
                      tp->mk_complex(tp->schar_t),
                      tp->mk_complex(tp->short_t),
                      tp->mk_complex(tp->int_t),
                      tp->mk_complex(tp->float_t),
                      tp->mk_complex(tp->double_t)};
    max_scalar_alignment = 0;
    max_scalar_stride = 0;
    auto count = [](const TYPE* t) {
        max_scalar_alignment = std::max(max_scalar_alignment, t->align);
        max_scalar_stride = std::max(max_scalar_stride, type_stride(t));
    };
    for (int k = 0; k < IKINDS; ++k) {
        count(integers[k]);
        widening_integers[k] = normalized(integers[k]);
    }
    for (const TYPE* t : others) count(t);
    pointer_type_stride = type_stride(tp->void_ptr_t);
}

TYPE* normalized_underlying_type(TYPE* t) { return normalized(t->underlying_type()); }

TYPE* normalized_value_type(TYPE* t) {
    if (!t) return t;
    TYPE* n = normalized(t);
    return n->is_enum() ? tp->mk_qual(normalized_underlying_type(n), n->qual_kind(false)) : n;
}

// ---- Conversions
TYPE* promoted_type(TYPE* t) {
    if (t->is_enum()) t = normalized_underlying_type(t);
    if (!t->is_int()) return t;
    switch (t->ikind()) {
    case TYPE::ik_bool:
    case TYPE::ik_schar:
    case TYPE::ik_short:
    case TYPE::ik_int: return tp->int_t;
    case TYPE::ik_uchar:
    case TYPE::ik_ushort: return is_narrow(t) && !kr_flag ? tp->int_t : tp->uint_t;
    case TYPE::ik_wchar: // may be wider than `int`, and keeps its value then
        if (t->size > tp->int_t->size) return tp->ulong_t;
        return is_narrow(t) && !kr_flag ? tp->int_t : tp->uint_t;
    default: return t->stqs();
    }
}

TYPE* combined_type_for_types(TYPE* a, TYPE* b) {
    if (!a->is_arithmetic() && !a->is_complex()) return a;
    if (!b->is_arithmetic() && !b->is_complex()) return b;
    if (a->is_complex() || b->is_complex()) {
        TYPE* part =
            combined_type_for_types(a->is_complex() ? a->part_type() : a, b->is_complex() ? b->part_type() : b);
        return get_complex_type(part);
    }
    a = promoted_type(a);
    b = promoted_type(b);
    if (a->is_fixed()) return a;
    if (b->is_fixed()) return b;
    auto either_float = [a, b](TYPE::FKIND k) { return a->is_fkind(k) || b->is_fkind(k); };
    auto either = [a, b](TYPE::IKIND k) { return a->is_ikind(k) || b->is_ikind(k); };
    if (either_float(TYPE::fk_ldouble)) return tp->ldouble_t;
    if (either_float(TYPE::fk_double)) return tp->double_t;
    if (either_float(TYPE::fk_float)) return tp->float_t;
    if (either(TYPE::ik_ullong)) return tp->ullong_t;
    if (either(TYPE::ik_llong)) return tp->llong_t;
    if (either(TYPE::ik_ulong)) return tp->ulong_t;
    if (either(TYPE::ik_long)) {
        bool unsigned_too = either(TYPE::ik_uint) && (kr_flag || tp->long_t->size == tp->int_t->size);
        return unsigned_too ? tp->ulong_t : tp->long_t;
    }
    return either(TYPE::ik_uint) ? tp->uint_t : tp->int_t;
}

TYPE* combined_type(const NODE* x, const NODE* y) { return combined_type_for_types(x->type, y->type); }

TYPE* type_for_PMCONV(TYPE* t) {
    t = promoted_type(t);
    if (t->is_unsigned()) t = tp->mk_signed(next_wider_type(t));
    return t->size > tp->long_t->size ? tp->long_t : t;
}

TYPE* get_complex_type(TYPE* part) {
    bool valid = part->is_float() ? !part->is_fkind(TYPE::fk_ldouble) || normalized(part)->is_fkind(TYPE::fk_double)
                                  : part->is_int() && part->is_signed();
    if (!valid) {
        fputs("part_type is not valid\n", stderr);
        abort_optimizer();
    }
    return tp->mk_complex(part->stqs());
}

// ---- Wider types
TYPE* essential_type(TYPE* t) {
    t = t->stqs();
    if (t->is_enum()) t = normalized_underlying_type(t);
    if (!t->is_int()) return t;
    if (t->is_bool()) return tp->int_t;
    if (t->is_wchar()) return t->size > tp->int_t->size ? tp->long_t : tp->int_t;
    return tp->mk_signed(t);
}

TYPE* next_wider_type(TYPE* t) {
    if (t->is_fkind(TYPE::fk_float)) return tp->double_t;
    if (t->is_fkind(TYPE::fk_double)) return tp->ldouble_t;
    if (!t->is_int() && !t->is_enum()) return t;
    for (TYPE* wider : widening_integers)
        if (wider->size > t->size) return essential_type(wider);
    return t;
}

TYPE* wide_enough_int_type(INT65 v) {
    for (int k = TYPE::ik_int; k < IKINDS; ++k)
        if (truncate_to_type(v, widening_integers[k]) == v) return widening_integers[k];
    return tp->ullong_t;
}

// ---- Operators
static TYPE* shift_type(TYPE* t) {
    if (t->is_enum()) t = normalized_underlying_type(t);
    if (!is_narrow(t) && !t->is_bool()) return t->is_int() && t->size == tp->int_t->size ? promoted_type(t) : t->stqs();
    return t->is_unsigned() ? tp->uint_t : tp->int_t;
}

TYPE* operator_type_for_operand_types(int op, TYPE* a, TYPE* b, TYPE* c, const char* name) {
    if (boolean_result[op]) return tp->int_t;
    if (opcode_is_ASG(op)) return a;
    switch (op) {
    case MINUS:
        if (a->is_pointer() && b->is_pointer()) return tp->long_t;
        return combined_type_for_types(a, b);
    case PLUS:
    case MULT:
    case DIV:
    case MOD:
    case ANDB:
    case ORB:
    case XORB:
    case COLON: return combined_type_for_types(a, b);
    case PVCONV: return tp->long_t;
    case PMCONV: return tp->mk_signed(type_for_PMCONV(a));
    case UMINUS:
    case ABS:
    case NOTB:
    case SQRT:
    case SQR:
    case RECIP: return promoted_type(a);
    case SLL:
    case SRL: return shift_type(a);
    case UMULT: return a->type_pointed_to();
    case UAND:
    case ARGREF: return tp->mk_ptr(a);
    case QUEST:
    case COMMAOP: return b;
    case IDENTITY:
    case OUIALIGN:
    case NONALIGN:
    case CSE_DUPE:
    case CSE_ORIG: return a ? a : b;
    case SCON: return tp->mk_ptr(tp->schar_t);
    case COMPLEX: return get_complex_type(combined_type_for_types(a, b));
    case REAL:
    case IMAG: return a->part_type();
    case ICALL:
    case UICALL:
    case MCALL:
    case UMCALL: // null where the name is unknown: the node keeps the type that it has
        return type_ops_callbacks.builtin_return_type ? type_ops_callbacks.builtin_return_type(name) : c;
    case PCOMMA:
    case URETURN:
    case PPRAGMA:
    case ASM: return tp->void_t;
    case NOP:
    case LABELREF:
    case LABELDEF:
    case COMMA:
    case IF:
    case CBRANCH:
    case BRANCH:
    case SWITCH:
    case CASE:
    case DEFAULT:
    case RETURN:
    case LOOP:
    case ENDLOOP:
    case INITLOOP:
    case ASSERT:
    case NASSERT:
    case SKIP: return tp->int_t;
    default: abort_optimizer();
    }
}
