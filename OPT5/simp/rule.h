// What the rules of the simplifier are written in: small questions about shapes, and the functions that put one node in
// the place of another. For the sources of this room.
//
// A rule owns the node that it is given, whose operands are simplified, and returns what stands for it. Operands that a
// rule drops keep their effects; operands change places only where neither order of evaluation shows.
#pragma once

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <utility>

struct LOOP;

namespace rules {

// ---- Types. Rules of integer algebra hold in two's complement at the operator's width, for operands of its own type.
// `wchar_t` has no sign of its own, and no rule.
inline bool is_integer(const TYPE* t) { return t->is_int() && !t->is_bool() && !t->is_wchar() && t->size <= 64; }
inline bool same_integers(const TYPE* a, const TYPE* b) {
    return is_integer(a) && is_integer(b) && a->size == b->size && a->is_unsigned() == b->is_unsigned();
}
inline bool operands_have_type(const NODE* t) {
    return same_integers(t->left->type, t->type) && same_integers(t->right->type, t->type);
}
inline bool operand_has_type(const NODE* t) { return same_integers(t->left->type, t->type); }
inline bool is_signed(const TYPE* t) { return !t->is_unsigned() && !t->is_bool(); }
inline uint64_t mask_of(const TYPE* t) { return type_mask(t).value; }
inline uint64_t sign_bit(const TYPE* t) { return uint64_t(1) << (t->size - 1); }

// ---- Constants
inline bool is_icon(const NODE* t) { return t->op == ICON; }
inline bool is_icon(const NODE* t, INT65 v) { return t->op == ICON && t->u.lval == v; }
inline uint64_t bits_of(const NODE* icon) { return icon->u.lval.value & mask_of(icon->type); }
inline bool is_all_ones(const NODE* t) { return t->op == ICON && bits_of(t) == mask_of(t->type); }
inline void set_icon(NODE* t, INT65 v) { t->u.lval = truncate_to_type(v, t->type); }
// Whether a constant of the type is the number, or computes as well without being it.
inline bool fits_or_wraps(INT65 v, TYPE* type) { return !is_signed(type) || truncate_to_type(v, type) == v; }
inline NODE* icon_of(INT65 v, const NODE* like) {
    NODE* t = mk_ICON(v, like->type->stqs());
    t->ls = like->ls;
    return t;
}
// The power of two that a constant is at its type's width: an unsigned 0x8000 is one, a signed -32768 is not.
inline int log2_of(const NODE* t) { return t->op == ICON ? power_of_2(t->u.lval) : -1; }
// The constant count of a shift by at least 1 and less than the width, else 0.
inline int shift_count_of(const NODE* t) {
    if ((t->op != SLL && t->op != SRL) || !is_icon(t->right) || !operand_has_type(t)) return 0;
    const INT65 n = t->right->u.lval;
    return n.is_negative() || n >= INT65(t->type->size) ? 0 : static_cast<int>(n.value);
}

// ---- Shapes
// A node of `op` whose operands have its own integer type.
inline bool is_node(const NODE* t, int op) { return t->op == op && operands_have_type(t); }
inline bool is_node_with_icon(const NODE* t, int op) {
    return t->op == op && is_icon(t->right) && operands_have_type(t);
}
inline bool is_unary(const NODE* t, int op) { return t->op == op && operand_has_type(t); }
inline bool is_bitfield_access(const NODE* t) {
    return (t->op == STDOT || t->op == STREF) && t->right && t->right->mval && t->right->mval->is_bitfld;
}

// A cast between the signed and the unsigned type of one width: the bits stay.
inline bool is_equal_width_cast(const NODE* t) {
    return t->op == SCONV && is_integer(t->type) && is_integer(t->left->type) && t->type->size == t->left->type->size &&
           !is_bitfield_access(t->left);
}

// ---- Effects. Looks at a bounded number of nodes, so that asking at every node stays linear: a tree too large to be
// looked through counts as impure.
bool is_pure(const NODE* t);
bool is_steady_leaf(const NODE* t); // a number or the address of an object: what no effect changes
// Congruence of values without effects. Ends at the first difference, so that it is cheap at every node of a deep tree.
inline bool same_value(const NODE* a, const NODE* b) { return a->op == b->op && trees_are_congruent(a, b, false); }

// ---- Families of rules. A rule gives null where it does not apply; what it gives is simplified.
using RULE = NODE* (*)(NODE* t, struct LOOP* loop);
template <std::size_t N>
NODE* first_that_applies(const RULE (&table)[N], NODE* t, struct LOOP* loop) {
    for (RULE rule : table)
        if (NODE* r = rule(t, loop)) return r;
    return t;
}
// A simplified node of `type`, which must be what the operator gives its operands.
NODE* made(int op, NODE* left, NODE* right, TYPE* type, struct LOOP* loop);
// The simplified tree under a cast to `type` if it needs one, which is simplified too.
NODE* coerced(TYPE* type, NODE* t, struct LOOP* loop);
// Operands of a commutative operator: constants to the right; a leaf right of what isn't one; EXPT to the left.
void order_operands(NODE* t);

// ---- Sequences
// a, b with either null; chains lean left. Right-leaning chains are short where they come from the rules.
NODE* in_sequence(NODE* a, NODE* b);
NODE* lean_left(NODE* commaop); // the same of a chain that is there

// ---- Replacement
NODE* take_left(NODE* t);  // frees the node alone: its left operand
NODE* take_right(NODE* t); // the same: its right operand
NODE* only_left(
    NODE* t); // frees the node and its right operand, which must have no effects; the left, of the node's type
NODE* only_right(NODE* t);
NODE* constant_for(NODE* t, INT65 value);                  // of the node's type, behind the effects of its operands
NODE* to_unary(NODE* t, int op, NODE* operand);            // reuses the node; its old operands are the caller's
NODE* to_binary(NODE* t, int op, NODE* left, NODE* right); // the same
NODE* replace_by(NODE* t, NODE* value); // erases what is left of the tree `t`; `value` is outside of it, in its type

} // namespace rules
