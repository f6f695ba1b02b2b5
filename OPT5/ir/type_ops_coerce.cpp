// Casts: the one place that decides whether a tree of one type may stand where another is wanted, and what makes it so.

#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "UTIL/abort.h"

namespace {

bool is_constant_arm(const NODE* t) {
    return t->op == ICON || t->op == FCON || (t->op == VPACKM && is_constant_arm(t->left));
}
bool is_integral(const TYPE* t) { return t->is_int() || t->is_enum(); }

bool is_bitfield_read(const NODE* t) {
    return (t->op == STDOT || t->op == STREF) && t->right && t->right->mval && t->right->mval->is_bitfld;
}

NODE* replace_by_operand(NODE* cast) {
    NODE* operand = cast->left;
    erase_node(cast);
    return operand;
}

NODE* coerce_vector(TYPE* t, NODE* tree) {
    if (t->size == tree->type->size) return maketree(VRCONV, tree, nullptr, t, tree->ls);
    if (t->is_vector() && tree->type->is_vector() && t->real->num_elem() == tree->type->real->num_elem())
        return maketree(VSCONV, tree, nullptr, t, tree->ls);
    abort_optimizer("a vector is converted to a type that it has no conversion to");
}

// Both arms and the node by the target. Only where the arms have the node's type, or one conversion would be lost.
bool coerce_arms(TYPE* t, NODE* colon, bool exact) {
    if (!equiv_mtypes(colon->left->type, colon->type) || !equiv_mtypes(colon->right->type, colon->type)) return false;
    colon->left = coerce_to_type(t, colon->left, exact);
    colon->right = coerce_to_type(t, colon->right, exact);
    colon->type = colon->left->type;
    return true;
}

NODE* coerce_pointer(TYPE* t, NODE* tree, bool exact) {
    if (tree->op == OUIALIGN || tree->op == NONALIGN) {
        tree->left = coerce_to_type(t, tree->left, exact);
        tree->type = tree->left->type;
        return tree;
    }
    if (tree->op == PCONV && tree->type->is_pointer()) {
        TYPE* pointee = tree->type->type_pointed_to();
        bool retypes = pointee->is_scalar() || (pointee->is_vector() && t->type_pointed_to()->is_vector());
        if (retypes) {
            LS* ls = tree->ls;
            NODE* operand = replace_by_operand(tree);
            bool fits = exact ? exact_types(operand->type, t) : compatible_types(operand->type, t, true);
            return fits ? operand : maketree(PCONV, operand, nullptr, t, ls);
        }
    }
    return maketree(PCONV, tree, nullptr, t, tree->ls);
}

// An integer cast whose bits beyond the target are dropped anyway. Conversions to `bool` look at all bits.
bool is_superfluous_below(const TYPE* t, const NODE* tree) {
    return tree->op == SCONV && is_integral(t) && is_integral(tree->type) && is_integral(tree->left->type) &&
           !t->is_bool() && !tree->type->is_bool() && t->size <= tree->type->size && t->size <= tree->left->type->size;
}

} // namespace

NODE* coerce_to_type(TYPE* t, NODE* tree, bool exact) {
    auto fits = [exact](TYPE* wanted, const NODE* n) {
        return exact ? exact_types(n->type, wanted) : compatible_types(n->type, wanted, true);
    };
    if (t->is_vector() || tree->type->is_vector()) return fits(t, tree) ? tree : coerce_vector(t, tree);
    if (t->is_enum()) t = tp->mk_qual(normalized_underlying_type(t), t->qual_kind(false));
    if (tree->op == NAME && tree->type->is_csu() && t->is_scalar()) {
        TYPE* address = tp->mk_ptr(tree->type);
        tree = maketree(UAND, tree, nullptr, address, tree->ls);
    }
    if (fits(t, tree) && !is_bitfield_read(tree)) return tree;
    if (tree->op == QUEST && (is_constant_arm(tree->right->left) || is_constant_arm(tree->right->right)) &&
        equiv_mtypes(tree->type, tree->right->type) && coerce_arms(t, tree->right, exact)) {
        tree->type = tree->right->type;
        return tree;
    }
    if (tree->op == COLON) {
        if (!coerce_arms(t, tree, exact)) { // mixed arms: each first to what the node says
            tree->left = coerce_to_type(tree->type, tree->left, exact);
            tree->right = coerce_to_type(tree->type, tree->right, exact);
            coerce_arms(t, tree, exact);
        }
        return tree;
    }
    if (t->is_pointer()) return coerce_pointer(t, tree, exact);
    if (!t->is_scalar() || !tree->type->is_scalar()) return tree;
    if (tree->type->is_complex() && !t->is_complex()) abort_optimizer("a complex value is converted to a real type");
    while (is_superfluous_below(t, tree)) {
        tree = replace_by_operand(tree);
        if (fits(t, tree) && !is_bitfield_read(tree)) return tree;
    }
    return maketree(SCONV, tree, nullptr, t, tree->ls);
}

NODE* push_down_pointer_cast(TYPE* t, NODE* tree) {
    while ((tree->op == PCONV || tree->op == ISP2CHAR) && tree->left->type->is_pointer() &&
           !compatible_types(tree->type, t, true))
        tree = replace_by_operand(tree);
    if (compatible_types(tree->type, t, true)) return tree;
    bool is_sum =
        (tree->op == PLUS || tree->op == MINUS) && tree->left->type->is_pointer() && is_integral(tree->right->type);
    INT65 element(t->type_pointed_to()->size_in_bytes());
    if (!is_sum || element.is_zero() || !type_ops_callbacks.constant_divides_expr ||
        !type_ops_callbacks.constant_divides_expr(element, tree->right))
        return coerce_to_type(t, tree);
    tree->left = push_down_pointer_cast(t, tree->left);
    tree->type = tree->left->type;
    return tree;
}

// ---- Members
static TYPE* structure_of(const NODE* stdot) {
    TYPE* t = stdot->left->type;
    return stdot->op == STREF && t->is_pointer() ? t->type_pointed_to() : t;
}

TYPE* merge_qualifiers_for_STDOT(TYPE* t, const NODE* stdot) {
    unsigned bits = structure_of(stdot)->qual_kind(false);
    if (stdot->right && stdot->right->mval) bits |= stdot->right->mval->type->qual_kind(false);
    return tp->mk_qual(t, bits & ~static_cast<unsigned>(QUAL_PACKED));
}

NODE* mk_member(NODE* object, fkMDATA* m) {
    NODE* field = new_node(FIELD, m->type);
    field->mk_field(1, m, object->type);
    NODE* t = maketree(STDOT, object, field, normalized_value_type(m->type), object->ls);
    t->type = merge_qualifiers_for_STDOT(t->type, t);
    return t;
}

bool must_preserve_STDOT(const NODE* tree) {
    for (; tree && (tree->op == STDOT || tree->op == STREF); tree = tree->left) {
        const fkMDATA* m = tree->right ? tree->right->mval : nullptr;
        if (m && (m->flag1 || m->flag4 || (m->type->qual_kind(false) & QUAL_PACKED))) return true;
        if ((tree->type->qual_kind(false) | structure_of(tree)->qual_kind(false)) & QUAL_PACKED) return true;
    }
    return false;
}

// ---- Repairs
NODE* fix_type_info(NODE* tree) {
    switch (tree->op) {
    case STDOT:
    case STREF:
        if (!tree->right || !tree->right->mval) break;
        tree->type = merge_qualifiers_for_STDOT(tree->type, tree);
        break;
    case UMULT:
        if (volit_vars) tree->type = tp->mk_qual(tree->type, QUAL_VOLATILE);
        break;
    case NAME: {
        const SYMTAB* sym = tree->u.sym;
        if (!sym || !sym->type || sym->type->is_func()) break;
        unsigned bits = sym->type->qual_kind(false);
        bool is_static = sym->sclass == SC_EXTDEF || sym->sclass == SC_STATIC || sym->sclass == SC_EXTERN;
        if (volit_vars && is_static) bits |= QUAL_VOLATILE;
        bits |= tree->type->qual_kind(false) & QUAL_VOLATILE; // an access that was volatile stays so
        if (tree->type->qual_kind(false) != bits) tree->type = tp->mk_qual(tree->type->stqs(), bits);
        break;
    }
    }
    return tree;
}
