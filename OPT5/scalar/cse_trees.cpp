// Which trees common subexpressions are made of, and the form that they are looked for in.
#include "OPT5/scalar/lcse.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/target/target.h"

namespace {

// A pointer at file level is loaded for each access through it.
bool is_pointer_in_memory(const NODE* name) {
    const SYMTAB* sym = name->u.sym;
    return sym && sym->type->is_pointer() && !lvalue_is_volatile(name) &&
           (sym->sclass == SC_EXTDEF || sym->sclass == SC_STATIC || sym->sclass == SC_EXTERN) &&
           !(sym->cqual & (CQ_MARKS_FUNCTION | CQ_GLOBAL_REGISTER));
}

// A constant displacement belongs to the access, unless no addressing mode has room for it.
bool displacement_is_free(const NODE* t) {
    if (!t->type->is_pointer() || t->right->op != ICON) return false;
    const INT65 by = t->op == PLUS ? t->right->u.lval : -t->right->u.lval;
    return by.is_negative() || offset_is_in_range(by, t->type, 1);
}

} // namespace

bool good_CSE_tree(const NODE* t, bool) {
    if (!t->type->is_scalar() || t->type->is_complex()) return false;
    switch (t->op) {
    case OUIALIGN:
    case NONALIGN:
    case SCON:
    case ICON:
    case FCON: return false;
    case NAME: return is_pointer_in_memory(t);
    case PLUS:
    case MINUS: return !displacement_is_free(t);
    case UAND:
    case ARGREF: return false; // a constant, or the sum below it
    case SCONV:                // a product of two of them is the short one, which one of variables would not be
    case PCONV:
    case ISP2CHAR: return false;
    default: return true;
    }
}

bool is_likely_register(const NODE* t) {
    while (t->op == SCONV || t->op == PCONV || t->op == ISP2CHAR || op_is_arithmetic(t->op)) t = t->left;
    return is_private_name(t) && !good_CSE_tree(t, false);
}

// ---- Addresses

namespace {

// Takes constants out of an index: those of sums and products that are the numbers themselves, also ahead of a widening.
NODE* take_constants(NODE* t, INT65* constant) {
    const bool has_constant = t->right && t->right->op == ICON && is_exact_by_rule(t->op, t->type);
    if (has_constant && (t->op == PLUS || t->op == MINUS)) {
        *constant = t->op == PLUS ? *constant + t->right->u.lval : *constant - t->right->u.lval;
        NODE* rest = t->left;
        erase_tree(t->right);
        erase_node(t);
        return take_constants(rest, constant);
    }
    const bool widens = t->op == SCONV && t->type->is_int() && t->left->type->is_int() && !t->type->is_unsigned() &&
                        !t->left->type->is_unsigned() && t->type->size >= t->left->type->size;
    if (widens) t->left = take_constants(t->left, constant);
    if (has_constant && t->op == MULT) {
        INT65 inner(0);
        t->left = take_constants(t->left, &inner);
        *constant = *constant + inner * t->right->u.lval;
    }
    return t;
}

} // namespace

NODE* normalize_ptr_for_indexing(NODE* t) {
    if (t->op != PLUS || !t->type->is_pointer() || !t->left->type->is_pointer() || t->right->op == ICON) return t;
    INT65 displacement(0);
    t->left = normalize_ptr_for_indexing(t->left);
    t->right = take_constants(t->right, &displacement);
    if (t->left->op == PLUS && t->left->right->op == ICON && t->left->left->type->is_pointer() &&
        t->left->type->stqs() == t->type->stqs()) {
        NODE* base = t->left;
        displacement = displacement + base->right->u.lval;
        t->left = base->left;
        erase_tree(base->right);
        erase_node(base);
    }
    if (displacement.is_zero()) return t;
    return maketree(PLUS, t, mk_ICON(displacement, tp->long_t), t->type->stqs(), t->ls);
}
