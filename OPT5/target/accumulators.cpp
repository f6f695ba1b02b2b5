#include "OPT5/target/accumulators.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/mac_operands.h"
#include "OPT5/target/target.h"

#include <utility>

namespace {

// ---- Types
bool is_signed_of(const TYPE* t, uint64_t bits) { return t->is_int() && t->is_signed() && t->size == bits; }
bool is_float_of(const TYPE* t, uint64_t bits) { return t->is_float() && t->size == bits; }
bool is_conversion(const NODE* t, uint64_t to, uint64_t from) {
    return t->op == SCONV && is_signed_of(t->type, to) && is_signed_of(t->left->type, from);
}
const NODE* without_conversion(const NODE* t, uint64_t to, uint64_t from) {
    return is_conversion(t, to, from) ? t->left : t;
}

bool is_count(const NODE* t, long least, long most) {
    return t->op == ICON && t->u.lval >= INT65(least) && t->u.lval <= INT65(most);
}

// ---- Products
// One factor from memory, in `bits`, the other one of the same type.
bool are_factors(const NODE* a, const NODE* b, uint64_t bits) {
    auto is_loaded = [&](const NODE* t) { return t->op == UMULT && is_signed_of(t->type, bits); };
    return (is_loaded(a) || is_loaded(b)) && compatible_types(a->type, b->type, true);
}

const NODE* without_shifts(const NODE* t, int* shift) { return strip_right_shift(strip_left_shift(t, shift), shift); }

const NODE* product_of_halves(const NODE* t, bool strip) {
    const NODE* m = t;
    int shift = 0;
    if (is_conversion(m, 32, 16))
        m = m->left;
    else if (strip)
        m = without_shifts(m, &shift);
    if (m->op != MULT || !(is_an_s32_operand(m) || is_an_s16_operand(m))) return nullptr;
    return are_factors(without_conversion(m->left, 32, 16), without_conversion(m->right, 32, 16), 16) ? m : nullptr;
}

// A shift to the left by a constant is a product as well.
bool is_long_product(const NODE* m) {
    const bool multiplies = m->op == MULT || (m->op == SLL && m->right->op == ICON);
    if (!multiplies || !(is_an_s64_operand(m->left) || is_an_s32_operand(m->left))) return false;
    const NODE* a = without_conversion(m->left, 64, 32);
    if (m->op == SLL) return a->op == UMULT && is_an_s32_operand(a);
    return are_factors(a, without_conversion(m->right, 64, 32), 32);
}

bool is_low_product(const NODE* t, bool strip) {
    const NODE* m = without_conversion(without_conversion(t, 32, 64), 64, 32);
    int shift = 0;
    if (m == t && strip) m = without_shifts(m, &shift);
    return shift <= 6 && is_long_product(m);
}

bool is_high_product(const NODE* t, bool strip) {
    const NODE* m = without_conversion(t, 32, 64);
    int shift = 0;
    if (strip) m = without_shifts(m, &shift);
    if (m->op == SRL && m->left->op == MULT)
        m = m->left;
    else if (shift < 32)
        return false;
    return m->op == MULT && is_long_product(m);
}

bool is_accumulation_of(const NODE* stmt, bool (*takes)(const NODE* m, TYPE* type)) {
    if (stmt->op != PLUSASG && stmt->op != MINUSASG) return false;
    return is_a_likely_zelkova_accumulator(stmt->left, false) && takes(stmt->right, stmt->left->type) &&
           !sym_appears_in_tree(stmt->left->u.sym, stmt->right);
}

bool is_sum_type(const TYPE* t) {
    return is_signed_of(t, 16) || is_signed_of(t, 32) || is_signed_of(t, 64) || is_float_of(t, 32) ||
           (is_fpu64 && is_float_of(t, 64));
}

} // namespace

bool is_a_zelkova_accumulator_type(const TYPE* t, bool allow_s16) {
    return is_signed_of(t, 32) || is_signed_of(t, 64) || is_float_of(t, 32) || (is_fpu64 && is_float_of(t, 64)) ||
           (allow_s16 && is_signed_of(t, 16));
}

bool is_a_likely_zelkova_register(const SYMTAB* s) {
    if (s->is_aliased() || s->level != 2 || s->type->qual_kind(true) & (QUAL_CONST | QUAL_VOLATILE)) return false;
    return (s->sclass == SC_AUTO || s->sclass == SC_REGISTER2) && !sym_appears_in_EHT(s);
}

bool is_a_likely_zelkova_accumulator(const SYMTAB* s, bool allow_s16) {
    return is_a_likely_zelkova_register(s) && is_a_zelkova_accumulator_type(s->type, allow_s16);
}
bool is_a_likely_zelkova_accumulator(const NODE* t, bool allow_s16) {
    return t->op == NAME && t->u.sym && is_a_likely_zelkova_accumulator(t->u.sym, allow_s16);
}

const NODE* strip_left_shift(const NODE* t, int* shift) {
    if (*shift != 0) return t;
    const bool multiplies = t->op == MULT && is_count(t->right, 1, 2) && compatible_types(t->left->type, t->type, true);
    if (!multiplies && !(t->op == SLL && is_count(t->right, 1, 1))) return t;
    *shift = multiplies && t->right->u.lval == INT65(1) ? 0 : -1;
    return t->left;
}

const NODE* strip_right_shift(const NODE* t, int* shift) {
    if (*shift != 0 || t->op != SRL) return t;
    const bool low = is_count(t->right, 0, 6),
               high = is_count(t->right, 32, 38) && is_an_s64_operand(t) && is_an_s64_operand(t->left);
    if (!low && !high) return t;
    *shift = static_cast<int>(t->right->u.lval.value);
    return t->left;
}

const NODE* get_mpy_for_zelkova_mac(const NODE* t, bool strip) {
    for (uint64_t bits : {32, 64})
        if (is_float_of(t->type, bits)) {
            const bool has_unit = bits == 64 ? is_fpu64 : float_support != 0;
            const bool multiplies =
                t->op == MULT && is_float_of(t->left->type, bits) && is_float_of(t->right->type, bits);
            return has_unit && multiplies ? t : nullptr;
        }
    if (is_an_s32_operand(t) || is_an_s16_operand(t))
        if (const NODE* m = product_of_halves(t, strip)) return m;
    if (!is_an_s64_operand(t) && !is_an_s32_operand(t)) return nullptr;
    return is_low_product(t, strip) || is_high_product(t, strip) ? t : nullptr;
}

bool is_a_likely_mpy_for_zelkova_mac(const NODE* t, bool strip) { return get_mpy_for_zelkova_mac(t, strip) != nullptr; }

bool has_a_likely_mpy_for_zelkova_mac(const NODE* t, TYPE* type) {
    while (!is_a_likely_mpy_for_zelkova_mac(t, true)) {
        if ((t->op != PLUS && t->op != MINUS) || !compatible_types(t->left->type, type, true) ||
            !compatible_types(t->right->type, type, true))
            return false;
        if (is_a_likely_mpy_for_zelkova_mac(t->right, true)) return true;
        t = t->left; // sums lean left
    }
    return true;
}

bool is_a_likely_serial_zelkova_mac(const NODE* stmt) {
    return is_accumulation_of(stmt, [](const NODE* m, TYPE*) { return is_a_likely_mpy_for_zelkova_mac(m, true); });
}
bool has_a_likely_serial_zelkova_mac(const NODE* stmt) {
    return is_accumulation_of(stmt, has_a_likely_mpy_for_zelkova_mac);
}

NODE* normalize_zelkova_accumulation(NODE* t) {
    if (t->op != ASG || !is_a_likely_zelkova_accumulator(t->left, false)) return t;
    NODE* sum = t->right;
    if (sum->op != PLUS && sum->op != MINUS) return t;
    if (!is_sum_type(sum->type) || !is_sum_type(sum->left->type) || !is_sum_type(sum->right->type)) return t;
    if (!trees_are_congruent(sum->left, t->left, false)) {
        if (sum->op != PLUS || !trees_are_congruent(sum->right, t->left, false)) return t;
        if (tree_has_side_effects(sum->left)) return t;
        std::swap(sum->left, sum->right);
    }
    // x op= e computes in the wider of both types and converts, as the sum did.
    if (!equiv_mtypes(sum->type, t->left->type)) return t;
    t->op = sum->op == PLUS ? PLUSASG : MINUSASG;
    t->right = sum->right;
    erase_tree(sum->left);
    erase_node(sum);
    return t;
}
