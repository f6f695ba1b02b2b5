#include "OPT5/scalar/structure_copy.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

namespace {

// Whether a pointer has the same value whatever is stored through it: no memory is read for it.
bool is_steady_pointer(const NODE* t) {
    switch (t->op) {
    case ICON: return true;
    case NAME: return is_private_name(t);
    case PLUS:
    case MINUS: return is_steady_pointer(t->left) && is_steady_pointer(t->right);
    case MULT:
    case SLL: return is_steady_pointer(t->left) && t->right->op == ICON;
    case SCONV:
    case PCONV: return is_steady_pointer(t->left);
    case UAND: return t->left->op == NAME;
    default: return false;
    }
}

} // namespace

bool is_steady_place(const NODE* t) {
    if (type_may_contain_volatile(t->type) || lvalue_is_volatile(t)) return false;
    t = without_members(t);
    if (t->op == NAME) return true;
    return op_is_indirection(t->op) && (t->op == STREF || !t->right) && is_steady_pointer(t->left);
}

void copy_by_members(const NODE* to, const NODE* from, std::vector<NODE*>* copies) {
    for (fkMDATA* m = to->type->real->mdata(); m; m = m->next) {
        if (m->is_bitfld && m->width == 0) continue;
        NODE *target = mk_member(copy_tree(to), m), *value = mk_member(copy_tree(from), m);
        if (m->type->is_csu()) {
            copy_by_members(target, value, copies);
            erase_tree(target);
            erase_tree(value);
        } else
            copies->push_back(mk_ASG(target, value));
    }
}
