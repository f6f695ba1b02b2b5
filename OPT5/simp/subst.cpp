// A known value put in place of a tree, and what that makes of the operators above it.

#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"

namespace {

// The signed compare that an unsigned one of pointers stands for once no side is a pointer.
int signed_compare(int op) { return op >= ULE && op <= UGT ? op - (ULE - LE) : op; }

class SUBSTITUTION {
public:
    SUBSTITUTION(INT65 icon_value, TYPE* icon_type, const NODE* replaced)
        : value(icon_value), type(icon_type), target(replaced) {}

    NODE* apply(NODE* t) {
        if (t->op == target->op && trees_are_congruent(t, target, true)) return replace(t);
        const bool was_touched = touched;
        touched = false;
        const bool held_pointer = (t->left && t->left->type->is_pointer()) || (t->right && t->right->type->is_pointer());
        // What is written, or has its address taken, is no value.
        const bool left_is_place = opcode_is_ASG(t->op) || t->op == UAND || t->op == ARGREF;
        if (t->left && !(left_is_place && names_target(t->left))) t->left = apply(t->left);
        if (t->right) t->right = apply(t->right);
        if (touched) t = simp_node(retype(t, held_pointer), nullptr);
        touched = touched || was_touched;
        return t;
    }

private:
    bool names_target(const NODE* t) const { return trees_are_congruent(t, target, true); }

    NODE* replace(NODE* t) {
        touched = true;
        NODE* constant = mk_ICON(value, type);
        constant->ls = t->ls;
        return mk_COMMAOP(peel_for_effect(t), constant);
    }

    // An operator on pointers that lost them: compares take the operands' sign, sums their combined type.
    NODE* retype(NODE* t, bool held_pointer) const {
        if (!held_pointer || !t->left || !t->right) return t;
        if (t->left->type->is_pointer() || t->right->type->is_pointer()) return t;
        if (op_is_int_compare(t->op) && t->left->type->is_signed() && t->right->type->is_signed())
            t->op = signed_compare(t->op);
        else if (t->op == PLUS || t->op == MINUS) {
            TYPE* former = t->type;
            t->type = combined_type(t->left, t->right);
            return former->is_scalar() ? coerce_to_type(former, insert_mandatory_casts(t)) : t;
        }
        return t;
    }

    const INT65 value;
    TYPE* const type;
    const NODE* const target;
    bool touched = false;
};

} // namespace

NODE* simp_subst_icon(INT65 value, TYPE* type, const NODE* target, NODE* tree) {
    return SUBSTITUTION(value, type, target).apply(tree);
}
