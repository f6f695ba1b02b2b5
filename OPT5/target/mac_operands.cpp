#include "OPT5/target/mac_operands.h"

#include "OPT5/target/accumulators.h"

namespace {

bool is_signed_of(const NODE* t, uint64_t bits) {
    return t->type->is_int() && t->type->is_signed() && t->type->size == bits;
}
bool is_float_of(const NODE* t, uint64_t bits) { return t->type->is_float() && t->type->size == bits; }
bool is_register(const NODE* t) {
    return t->op == ARGREF && t->left->op == NAME && is_a_likely_zelkova_register(t->left->u.sym);
}
bool is_constant_of(const NODE* t, long least, long most) {
    return t->op == ICON && t->type->is_int() && t->type->size <= 32 && t->u.lval >= INT65(least) &&
           t->u.lval <= INT65(most);
}

} // namespace

bool is_an_s16_operand(const NODE* opd) { return is_signed_of(opd, 16); }
bool is_an_s32_operand(const NODE* opd) { return is_signed_of(opd, 32); }
bool is_an_s64_operand(const NODE* opd) { return is_signed_of(opd, 64); }
bool is_an_f32_operand(const NODE* opd) { return is_float_of(opd, 32); }
bool is_an_f64_operand(const NODE* opd) { return is_float_of(opd, 64); }

bool is_an_s16_UMULT_operand(const NODE* opd) { return opd->op == UMULT && is_an_s16_operand(opd); }
bool is_an_s32_UMULT_operand(const NODE* opd) { return opd->op == UMULT && is_an_s32_operand(opd); }
bool is_an_f32_UMULT_operand(const NODE* opd) { return opd->op == UMULT && is_an_f32_operand(opd); }
bool is_an_f64_UMULT_operand(const NODE* opd) { return opd->op == UMULT && is_an_f64_operand(opd); }

bool is_an_s32_RW_register_operand(const NODE* opd) { return is_register(opd) && is_an_s32_operand(opd->left); }

bool is_an_s16_constant_operand(const NODE* opd) {
    return is_constant_of(opd, opd->type->is_int() && opd->type->is_signed() ? -32768 : 0, 32767);
}
bool is_an_s16_PM_constant_operand(const NODE* opd, bool narrow) { return is_constant_of(opd, -1, narrow ? 2 : 6); }
