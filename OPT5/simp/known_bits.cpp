// Known bits. Each rule takes the masks of the operands to the masks of the result; a value that an operator changes by
// a conversion of its operand is converted first, so that widths and signs are the target's.

#include "OPT5/simp/known_bits.h"

#include "OPT5/ir/trees.h"

#include <algorithm>

namespace {

constexpr int MOST_LEVELS = 6;

// `wchar_t` is neither signed nor unsigned to the type package: nothing is known of it.
bool is_integer(const TYPE* t) {
    return (t->is_int() || t->is_enum()) && !t->is_wchar() && t->size >= 1 && t->size <= 64;
}
uint64_t mask_of(const TYPE* t) { return t->size >= 64 ? ~uint64_t(0) : (uint64_t(1) << t->size) - 1; }
uint64_t sign_bit(const TYPE* t) { return uint64_t(1) << (t->size - 1); }
bool is_signed(const TYPE* t) { return !t->is_bool() && !t->is_unsigned(); }

KNOWN_BITS known(const NODE* t, int levels);

KNOWN_BITS of_constant(uint64_t value, uint64_t mask) { return {~value & mask, value & mask}; }

// From one integer type to another: the low bits stay, the new ones are zeros or copies of the sign.
KNOWN_BITS convert(KNOWN_BITS k, const TYPE* from, const TYPE* to) {
    if (to->is_bool() && !from->is_bool()) {
        const uint64_t upper = mask_of(to) & ~uint64_t(1);
        if (k.ones) return {upper, 1};
        return {k.zeros == mask_of(from) ? mask_of(to) : upper, 0};
    }
    const uint64_t fresh = mask_of(to) & ~mask_of(from);
    if (is_signed(from)) {
        if (k.zeros & sign_bit(from)) k.zeros |= fresh;
        if (k.ones & sign_bit(from)) k.ones |= fresh;
    } else {
        k.zeros |= fresh;
    }
    return {k.zeros & mask_of(to), k.ones & mask_of(to)};
}

KNOWN_BITS operand(const NODE* t, const TYPE* as, int levels) {
    if (!is_integer(t->type)) return {};
    return convert(known(t, levels), t->type, as);
}

// The sum with a carry in that is known. Bits are known up to where both operands and every carry below are.
KNOWN_BITS add(KNOWN_BITS a, KNOWN_BITS b, bool carry_in, uint64_t mask) {
    const uint64_t least = a.ones + b.ones + carry_in;                      // every unknown bit 0
    const uint64_t most = (~a.zeros & mask) + (~b.zeros & mask) + carry_in; // every unknown bit 1
    const uint64_t carries_known_zero = ~(most ^ a.zeros ^ b.zeros);        // no carry in even at most
    const uint64_t carries_known_one = least ^ a.ones ^ b.ones;             // a carry in even at least
    const uint64_t operands = (a.zeros | a.ones) & (b.zeros | b.ones);
    const uint64_t all = operands & (carries_known_zero | carries_known_one) & mask;
    return {~most & all, least & all};
}

uint64_t trailing_zeros_mask(uint64_t zeros) {
    return ~zeros & (zeros + 1) ? (zeros ^ (zeros + 1)) >> 1 : ~uint64_t(0);
}

// Zeros above the highest bit of the greatest value.
KNOWN_BITS at_most(uint64_t value, uint64_t mask) {
    for (int s = 1; s < 64; s *= 2) value |= value >> s;
    return {mask & ~value, 0};
}

KNOWN_BITS multiply(KNOWN_BITS a, KNOWN_BITS b, uint64_t mask) {
    // As many trailing zeros as both have together.
    int n = 0;
    for (uint64_t z = trailing_zeros_mask(a.zeros); z & 1; z >>= 1) ++n;
    for (uint64_t z = trailing_zeros_mask(b.zeros); z & 1; z >>= 1) ++n;
    KNOWN_BITS k;
    k.zeros = n >= 64 ? mask : ((uint64_t(1) << n) - 1) & mask;
    const unsigned __int128 most = static_cast<unsigned __int128>(~a.zeros & mask) * (~b.zeros & mask);
    if (most <= mask) k.zeros |= at_most(static_cast<uint64_t>(most), mask).zeros;
    return k;
}

KNOWN_BITS shift(const NODE* t, int levels) {
    const TYPE* type = t->type;
    const INT65 count = t->right->op == ICON ? t->right->u.lval : INT65(-1);
    if (count.is_negative() || count >= INT65(type->size) || !is_integer(t->left->type) ||
        t->left->type->size != type->size || is_signed(t->left->type) != is_signed(type))
        return {};
    const auto n = static_cast<unsigned>(count.value);
    const KNOWN_BITS k = known(t->left, levels);
    const uint64_t mask = mask_of(type);
    if (t->op == SLL) return {((k.zeros << n) | ((uint64_t(1) << n) - 1)) & mask, (k.ones << n) & mask};
    const uint64_t fresh = mask & ~(mask >> n);
    KNOWN_BITS r{k.zeros >> n, k.ones >> n};
    if (!is_signed(type) || k.zeros & sign_bit(type))
        r.zeros |= fresh;
    else if (k.ones & sign_bit(type))
        r.ones |= fresh;
    return r;
}

// A quotient or remainder of values that are not negative is no larger than the dividend; a remainder is smaller than a
// constant divisor.
KNOWN_BITS divide(const NODE* t, int levels) {
    const TYPE* type = t->type;
    const KNOWN_BITS a = operand(t->left, type, levels), b = operand(t->right, type, levels);
    if (is_signed(type) && !(a.zeros & sign_bit(type) && b.zeros & sign_bit(type))) return {};
    const uint64_t dividend = ~a.zeros & mask_of(type);
    if (t->op == MOD && t->right->op == ICON && b.ones && (b.ones | b.zeros) == mask_of(type))
        return at_most(std::min(dividend, b.ones - 1), mask_of(type));
    return at_most(dividend, mask_of(type));
}

KNOWN_BITS meet(KNOWN_BITS a, KNOWN_BITS b) { return {a.zeros & b.zeros, a.ones & b.ones}; }

KNOWN_BITS member(const NODE* t) {
    const fkMDATA* m = t->right && t->right->op == FIELD ? t->right->mval : nullptr;
    if (!m || !m->is_bitfld || m->width == 0 || m->width >= t->type->size) return {};
    // The declared type says how the field extends; only one that is unsigned throughout is sure.
    if (!m->type->is_unsigned() || !t->type->is_unsigned()) return {};
    return {mask_of(t->type) & ~((uint64_t(1) << m->width) - 1), 0};
}

KNOWN_BITS variable(const NODE* t) {
    if (!zeros_of_variables || !t->u.sym || t->u.sym->size != t->type->size) return {};
    auto it = zeros_of_variables->find(t->u.sym);
    return it == zeros_of_variables->end() ? KNOWN_BITS{} : KNOWN_BITS{it->second & mask_of(t->type), 0};
}

KNOWN_BITS truth_value(const TYPE* type) { return {mask_of(type) & ~uint64_t(1), 0}; }

KNOWN_BITS computed(const NODE* t, int levels) {
    const TYPE* type = t->type;
    const uint64_t mask = mask_of(type);
    switch (t->op) {
    case PLUS: return add(operand(t->left, type, levels), operand(t->right, type, levels), false, mask);
    case MINUS: {
        const KNOWN_BITS b = operand(t->right, type, levels);
        return add(operand(t->left, type, levels), {b.ones, b.zeros}, true, mask); // a + ~b + 1
    }
    case UMINUS: {
        const KNOWN_BITS b = operand(t->left, type, levels);
        return add(of_constant(0, mask), {b.ones, b.zeros}, true, mask);
    }
    case NOTB: {
        const KNOWN_BITS k = operand(t->left, type, levels);
        return {k.ones, k.zeros};
    }
    case MULT: return multiply(operand(t->left, type, levels), operand(t->right, type, levels), mask);
    case ANDB: {
        const KNOWN_BITS a = operand(t->left, type, levels), b = operand(t->right, type, levels);
        return {a.zeros | b.zeros, a.ones & b.ones};
    }
    case ORB: {
        const KNOWN_BITS a = operand(t->left, type, levels), b = operand(t->right, type, levels);
        return {a.zeros & b.zeros, a.ones | b.ones};
    }
    case XORB: {
        const KNOWN_BITS a = operand(t->left, type, levels), b = operand(t->right, type, levels);
        return {(a.zeros & b.zeros) | (a.ones & b.ones), (a.zeros & b.ones) | (a.ones & b.zeros)};
    }
    case SLL:
    case SRL: return shift(t, levels);
    case DIV:
    case MOD: return divide(t, levels);
    case SCONV: return operand(t->left, type, levels);
    case QUEST:
        return t->right->op == COLON
                   ? meet(operand(t->right->left, type, levels), operand(t->right->right, type, levels))
                   : KNOWN_BITS{};
    case COMMAOP: return operand(t->right, type, levels);
    case IDENTITY: return operand(t->left, type, levels);
    default: return {};
    }
}

KNOWN_BITS known(const NODE* t, int levels) {
    const TYPE* type = t->type;
    if (!is_integer(type)) return {};
    if (t->op == ICON) return of_constant(t->u.lval.value, mask_of(type));
    if (t->op == NAME && !type->is_bool()) return variable(t);
    if (t->op == STDOT || t->op == STREF) return type->is_bool() ? truth_value(type) : member(t);
    if (type->is_bool() || boolean_result[t->op]) {
        KNOWN_BITS k = levels > 0 ? computed(t, levels - 1) : KNOWN_BITS{};
        k.zeros |= mask_of(type) & ~uint64_t(1);
        return k;
    }
    return levels > 0 ? computed(t, levels - 1) : KNOWN_BITS{};
}

// Of sums and complements the lowest bit depends on the lowest bits of the operands alone, and a conversion keeps it.
bool lowest_is_unknown(const NODE* t, int levels) {
    for (;; t = t->left, --levels) {
        if (!is_integer(t->type)) return true;
        if (t->op == ICON || t->type->is_bool()) return false;
        if (t->op == NAME) return !zeros_of_variables;
        if (levels <= 0) return true;
        switch (t->op) {
        case PLUS:
        case MINUS:
        case XORB:
            if (lowest_is_unknown(t->right, levels - 1)) return true;
            break;
        case UMINUS:
        case NOTB:
        case SCONV: break;
        default: return t->op == UMULT;
        }
    }
}

} // namespace

const std::unordered_map<const SYMTAB*, uint64_t>* zeros_of_variables = nullptr;

uint64_t known_zeros_as(const NODE* tree, const TYPE* type) {
    return is_integer(type) ? operand(tree, type, MOST_LEVELS).zeros : 0;
}

bool lowest_bit_is_unknown(const NODE* tree) { return lowest_is_unknown(tree, MOST_LEVELS); }

KNOWN_BITS known_bits(const NODE* tree) { return known(tree, MOST_LEVELS); }

INT65 find_known_zeros(const NODE* tree, TYPE*) { return INT65(0, known_bits(tree).zeros); }
INT65 find_known_ones(const NODE* tree, TYPE*) { return INT65(0, known_bits(tree).ones); }
INT65 find_known_zeros_in_ANDB(const NODE* tree, TYPE* type) { return find_known_zeros(tree, type); }

namespace {
// The bits above the highest in which the ends of the range differ are the same throughout, if it does not cross zero.
INT65 common_prefix(INT65 low, INT65 high) {
    if (low.is_negative() != high.is_negative()) return 0;
    INT65 differing = low ^ high, below = 0;
    for (; !differing.is_zero(); differing = differing >> INT65(1)) below = (below << INT65(1)) | INT65(1);
    return ~below;
}
} // namespace

INT65 find_known_zeros_in_range(INT65 low, INT65 high) { return ~high & common_prefix(low, high); }
INT65 find_known_ones_in_range(INT65 low, INT65 high) { return high & common_prefix(low, high); }
