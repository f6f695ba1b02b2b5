// Constants as leaves: reading, replacing and recognizing them, also spread over a vector.

#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/fold.h"
#include "OPT5/simp/simp.h"

#include <cstdlib>

static const NODE* scalar_of(const NODE* t) { return t->op == VPACKM ? t->left : t; }
static NODE* scalar_of(NODE* t) { return t->op == VPACKM ? t->left : t; }

bool is_constant(const NODE* tree, int op) { return scalar_of(tree)->op == op; }

bool is_constant_and_zero(const NODE* tree) {
    const NODE* t = scalar_of(tree);
    return (t->op == ICON && t->u.lval.is_zero()) || (t->op == FCON && f_is_zero(t->u.fval));
}

bool is_effective_leaf(const NODE* tree) {
    while (tree->op == VPACKM || tree->op == SCONV || tree->op == PCONV || tree->op == ISP2CHAR) tree = tree->left;
    return !tree->left && !tree->right;
}

bool is_name(const NODE* tree) { return below_SSA(tree)->op == NAME; }

SYMTAB* symbol_of_name(const NODE* tree) {
    tree = below_SSA(tree);
    return tree->op == NAME ? tree->u.sym : nullptr;
}

INT65 ICON_value_of_integer_constant(const NODE* tree) {
    tree = scalar_of(tree);
    OPT_ASSERT(tree->op == ICON);
    return tree->u.lval;
}

NODE* change_integer_constant_value(NODE* tree, INT65 value) {
    NODE* t = scalar_of(tree);
    OPT_ASSERT(t->op == ICON);
    t->u.lval = truncate_to_type(value, t->type);
    return tree;
}

const simul_fval* FCON_value_of_fp_constant(const NODE* tree) {
    tree = scalar_of(tree);
    OPT_ASSERT(tree->op == FCON);
    return tree->u.fval;
}

NODE* change_fp_constant_value(NODE* tree, const simul_fval& value) {
    NODE* t = scalar_of(tree);
    OPT_ASSERT(t->op == FCON);
    *t->u.fval = value;
    truncate_fval_to_target(t->u.fval, t->type);
    free(t->text); // the print form of the old value
    t->text = nullptr;
    return tree;
}

// ---- Results of folding: one leaf in the place of a tree
NODE* integer_in_place_of(NODE* tree, INT65 value, TYPE* type) {
    NODE* t = mk_ICON(type->is_bool() ? INT65(value.is_zero() ? 0 : 1) : value, type);
    t->ls = tree->ls;
    erase_tree(tree);
    return t;
}

NODE* float_in_place_of(NODE* tree, const simul_fval& value, TYPE* type) {
    NODE* t = new_node(FCON, type);
    t->u.fval = new simul_fval(value);
    t->ls = tree->ls;
    erase_tree(tree);
    return t;
}

NODE* truncate_RHS_for_assignment(const NODE* lhs, NODE* rhs) {
    TYPE* type = lhs->type->stqs();
    if (!is_constant(rhs, ICON) && !is_constant(rhs, FCON)) return rhs;
    if (!compatible_types(rhs->type, type, true)) rhs = fold_constants(coerce_to_type(type, rhs));
    const fkMDATA* m = (lhs->op == STDOT || lhs->op == STREF) && lhs->right ? lhs->right->mval : nullptr;
    if (!m || !m->is_bitfld || m->width == 0 || m->width >= 64 || rhs->op != ICON || m->type->is_bool()) return rhs;
    INT65 mask = (INT65(1) << INT65(m->width)) - INT65(1);
    INT65 value = rhs->u.lval & mask;
    bool is_negative = m->type->is_signed() && !(value >> INT65(m->width - 1)).is_zero();
    return change_integer_constant_value(rhs, is_negative ? value | ~mask : value);
}
