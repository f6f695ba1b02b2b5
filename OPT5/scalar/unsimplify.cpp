// Ahead of the output: forms that serve the simplifier become the ones that the code generator selects instructions by.
//
//   pointer + index * n    the product is PMCONV, which is what scaled addressing is found by
//   x + -c                 x - c, whose immediate is the shorter one
//
// Needs: nothing; no row behind it simplifies. Leaves: every fact.
// Sound because every value stays the same, in the type that it had: a size that the type of the index cannot hold must
// not be written in that type. Reading the output brings the simplifier's forms back.

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lowering.h"

namespace {

constexpr long ADDRESS_UNIT = 16; // bits

// An index times a constant, in the type that scaling gives.
bool is_scaling(const NODE* t) {
    return t->op == MULT && t->right->op == ICON && t->right->u.lval > INT65(1) &&
           t->right->u.lval <= INT65(INT32_MAX / ADDRESS_UNIT) && t->left->type->is_int() &&
           equiv_mtypes(t->type, t->left->type) && equiv_mtypes(t->type, type_for_PMCONV(t->left->type));
}

// The terms of an offset. A size may need a wider type than the index, whose scale in units fits.
void scale_terms(NODE* t) {
    if (t->op == PLUS || t->op == MINUS) {
        scale_terms(t->left);
        scale_terms(t->right);
    } else if (is_scaling(t)) {
        const INT65 size = t->right->u.lval * INT65(ADDRESS_UNIT);
        NODE* bits = mk_ICON(size, truncate_to_type(size, t->type) == size ? t->type : tp->long_t);
        erase_tree(t->right);
        t->right = bits;
        t->op = PMCONV;
    }
}

// x + -c, and for an unsigned x a constant of the upper half.
void subtract_constant(NODE* t) {
    if (t->right->op != ICON) return;
    TYPE* type = t->right->type;
    const bool is_step =
        t->type->is_pointer() && type->is_int() && type->is_signed(); // an unsigned one would be widened
    if (!is_step && !(t->type->is_int() && equiv_mtypes(t->type, type))) return;
    const INT65 c = t->right->u.lval;
    const INT65 opposite = truncate_to_type(-c, type);
    const bool is_shorter = type->is_unsigned() ? opposite < c : c.is_negative() && !opposite.is_negative();
    if (!is_shorter) return;
    t->op = MINUS;
    t->right->u.lval = opposite;
}

void restore(NODE* t) {
    if (t->op == PLUS || t->op == MINUS) {
        if (t->type->is_pointer() && t->left->type->is_pointer() && t->right->type->is_int()) scale_terms(t->right);
        if (t->op == PLUS) subtract_constant(t);
    }
}

} // namespace

void unsimplify() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) for_each_node(s->first, restore);
}
