// Bits that matter: a tree under a mask, a shift or a narrowing cast need not compute the others.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

using namespace rules;

namespace {

constexpr int MOST_LEVELS = 6;

class NARROWING {
public:
    bool changed = false; // anywhere in the tree, also where its root stayed

    // A tree that agrees with `t` in the bits of `mask`.
    NODE* narrow(NODE* t, uint64_t mask, int levels) {
        mask &= mask_of(t->type);
        if (!levels || !is_integer(t->type) || mask == mask_of(t->type) || is_icon(t)) return t;
        switch (t->op) {
        case ANDB:
        case ORB:
        case XORB: return operands_have_type(t) ? bit_operator(t, mask, levels) : t;
        case NOTB: return operand_has_type(t) ? left_only(t, mask, levels) : t;
        case PLUS:
        case MINUS: return operands_have_type(t) ? sum(t, up_to_highest(mask), levels) : t;
        case MULT: return operands_have_type(t) ? both(t, up_to_highest(mask), levels) : t;
        case ABS:
            if (mask != 1 || !operand_has_type(t)) return t; // the lowest bit is the same of either sign
            return dropped(take_left(t), mask, levels - 1);
        case UMINUS: return operand_has_type(t) ? left_only(t, up_to_highest(mask), levels) : t;
        case SLL:
        case SRL: return shift(t, mask, levels);
        case SCONV: return cast(t, mask, levels);
        default: return t;
        }
    }

private:
    // A carry only moves upward.
    static uint64_t up_to_highest(uint64_t mask) {
        for (int s = 1; s < 64; s *= 2) mask |= mask >> s;
        return mask;
    }

    NODE* dropped(NODE* operand, uint64_t mask, int levels) {
        changed = true;
        return narrow(operand, mask, levels);
    }

    // The operands first, then the node if one of them changed. They are other numbers by then.
    NODE* operands(NODE* t, uint64_t mask, int levels, bool both) {
        const bool before = changed;
        changed = false;
        t->left = narrow(t->left, mask, levels - 1);
        if (both) t->right = narrow(t->right, mask, levels - 1);
        const bool any = changed;
        changed |= before;
        return any ? kept_exact(t, nullptr) : t;
    }
    NODE* left_only(NODE* t, uint64_t mask, int levels) { return operands(t, mask, levels, false); }
    NODE* both(NODE* t, uint64_t mask, int levels) { return operands(t, mask, levels, true); }

    // Whether an operand has none of the bits of the mask, or all of them, and no effects.
    static bool is_idle(const NODE* t, uint64_t mask, bool ones) {
        if (!t->left) return is_icon(t) && (bits_of(t) & mask) == (ones ? mask : 0);
        const KNOWN_BITS k = known_bits(t);
        return (mask & ~(ones ? k.ones : k.zeros)) == 0 && is_pure(t);
    }

    NODE* sum(NODE* t, uint64_t mask, int levels) {
        if (is_idle(t->right, mask, false)) return dropped(only_left(t), mask, levels - 1);
        if (!is_idle(t->left, mask, false)) return both(t, mask, levels);
        if (t->op == PLUS) return dropped(only_right(t), mask, levels - 1);
        if (is_icon(t->left, INT65(0))) return both(t, mask, levels);
        set_aside(&t->left);
        return dropped(kept_exact(t, nullptr), mask, levels - 1);
    }

    // Zero, in place of an operand whose bits do not count.
    static void set_aside(NODE** link) {
        NODE* zero = icon_of(INT65(0), *link);
        erase_tree(*link);
        *link = zero;
    }

    NODE* bit_operator(NODE* t, uint64_t mask, int levels) {
        if (!is_icon(t->right)) {
            const bool ones = t->op == ANDB;
            if (is_idle(t->right, mask, ones)) return dropped(only_left(t), mask, levels - 1);
            if (is_idle(t->left, mask, ones)) return dropped(only_right(t), mask, levels - 1);
            return both(t, mask, levels);
        }
        const uint64_t c = bits_of(t->right);
        const KNOWN_BITS k = known_bits(t->left);
        const bool idle = t->op == ANDB  ? (mask & ~(c | k.zeros)) == 0
                          : t->op == ORB ? (mask & c & ~k.ones) == 0
                                         : (mask & c) == 0;
        if (idle) return dropped(only_left(t), mask, levels - 1);
        return left_only(t, t->op == ANDB ? mask & c : t->op == ORB ? mask & ~c : mask, levels);
    }

    NODE* shift(NODE* t, uint64_t mask, int levels) {
        const int n = shift_count_of(t);
        if (!n) return t;
        if (t->op == SLL) return left_only(t, mask >> n, levels);
        NODE* inner = t->left;
        if (inner->op == SLL && shift_count_of(inner) == n &&
            (mask & ~(mask_of(t->type) >> n)) == 0) { // there and back
            erase_node(t->right);
            erase_node(inner->right);
            return dropped(take_left(take_left(t)), mask, levels - 1);
        }
        uint64_t below = (mask << n) & mask_of(t->type);
        if (is_signed(t->type) && mask & ~(mask_of(t->type) >> n)) below |= sign_bit(t->type);
        return left_only(t, below, levels);
    }

    // Between integers. A cast to or from `bool` looks at more than bits; a bit-field is read through its cast.
    NODE* cast(NODE* t, uint64_t mask, int levels) {
        TYPE* from = t->left->type;
        if (!is_integer(from) || is_bitfield_access(t->left)) return t;
        NODE* inner = t->left;
        if (inner->op == SCONV && is_integer(inner->left->type) && !is_bitfield_access(inner->left) &&
            (mask & ~mask_of(from)) == 0) {
            TYPE* type = t->type;
            changed = true;
            NODE* operand = take_left(take_left(t));
            return coerced(type, operand, nullptr);
        }
        uint64_t below = mask & mask_of(from);
        if (mask & ~mask_of(from) && is_signed(from)) below |= sign_bit(from);
        return left_only(t, below, levels);
    }
};

} // namespace

bool narrow_to_mask(NODE** link, uint64_t mask) {
    NARROWING narrowing;
    *link = narrowing.narrow(*link, mask, MOST_LEVELS);
    return narrowing.changed;
}

NODE* prop_mask_into_subtree(NODE* t, INT65 mask) {
    narrow_to_mask(&t, mask.value);
    return t;
}
