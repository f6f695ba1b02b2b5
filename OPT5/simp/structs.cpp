// Structures as values: their addresses, and copies of small ones member by member.

#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

namespace {

constexpr uint64_t SMALL_STRUCTURE = 32; // bits
constexpr int MOST_MEMBERS = 2;

bool is_const_object(const NODE* t) {
    return t->op == NAME && t->u.sym && t->u.sym->type->is_const() && !lvalue_is_volatile(t) && t->type->is_csu() &&
           !t->type->is_union();
}

} // namespace

NODE* apply_UAND_to_struct(NODE* tree) {
    TYPE* pointer = tp->mk_ptr(tree->type);
    switch (tree->op) {
    case UMULT: {
        if (tree->right) break;
        NODE* address = tree->left;
        erase_node(tree);
        return coerce_to_type(pointer, address);
    }
    case COMMAOP:
    case QUEST:
        tree->right = apply_UAND_to_struct(tree->right);
        tree->type = tree->right->type;
        return tree;
    case COLON:
        tree->left = apply_UAND_to_struct(tree->left);
        tree->right = apply_UAND_to_struct(tree->right);
        tree->type = tree->left->type;
        return tree;
    }
    return maketree(UAND, tree, nullptr, pointer, tree->ls);
}

bool is_small_constant_STASG(const NODE* tree) {
    return tree->op == STASG && tree->right && is_const_object(tree->right) &&
           tree->right->type->size <= SMALL_STRUCTURE &&
           csu_type_has_only_simple_scalar_members(tree->right->type, MOST_MEMBERS) &&
           !tree_has_side_effects(tree->left) && !type_may_contain_volatile(tree->left->type) &&
           compatible_types(tree->left->type, tree->right->type, true);
}

NODE* convert_STASG_to_asgs(NODE* tree) {
    NODE *to = tree->left, *from = tree->right, *assignments = nullptr;
    for (fkMDATA* m = from->type->mdata(); m; m = m->next) {
        NODE *target = mk_member(copy_tree(to), m), *value = mk_member(copy_tree(from), m);
        assignments = mk_COMMAOP(assignments, mk_ASG(target, value));
    }
    erase_tree(tree);
    return assignments;
}
