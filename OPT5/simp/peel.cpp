// What remains of a tree whose value isn't used: its side effects, in their order.

#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

namespace {

bool contains_output_argument(const NODE* t) { return tree_contains_op(t, ARGREF); }

NODE* erase_and_keep(NODE* t, NODE* kept) {
    erase_node(t);
    return kept;
}

// The effects of both operands, left first. Null operands are allowed.
NODE* peel_operands(NODE* t) {
    NODE* left = t->left ? peel_for_effect(t->left) : nullptr;
    NODE* right = t->right ? peel_for_effect(t->right) : nullptr;
    return erase_and_keep(t, rules::in_sequence(left, right));
}

// The object whose address is taken isn't read; a pointer that leads to it is.
NODE* peel_address(NODE* t) {
    NODE* object = t->left = taken_out_of_members(t->left);
    if (op_is_indirection(object->op)) {
        t->left = object->left;
        if (object->right) erase_tree(object->right);
        erase_node(object);
    } else if (object->op == NAME) {
        erase_tree(t);
        return nullptr;
    }
    return peel_operands(t);
}

NODE* peel_conditional(NODE* t) {
    NODE* colon = t->right;
    if (tree_has_side_effects(colon->left) || tree_has_side_effects(colon->right)) return t;
    erase_tree(colon);
    t->right = nullptr;
    return peel_operands(t);
}

NODE* peel_logical(NODE* t) {
    if (tree_has_side_effects(t->right)) return t;
    erase_tree(t->right);
    t->right = nullptr;
    return peel_operands(t);
}

// Operators that only compute.
bool computes_only(int op) {
    if (boolean_result[op] || op_is_arithmetic(op)) return true;
    switch (op) {
    case SQRT:
    case SQR:
    case RECIP:
    case EXPT:
    case SCONV:
    case PCONV:
    case ACONV:
    case ISP2CHAR:
    case PMCONV:
    case PVCONV:
    case VRCONV:
    case VSCONV:
    case VPACK:
    case VPACKM:
    case VPACK1P:
    case VFIELD:
    case COMPLEX:
    case REAL:
    case IMAG:
    case TOIEEE:
    case FRIEEE:
    case SIMDHI:
    case SIMDLO:
    case IDENTITY:
    case OUIALIGN:
    case NONALIGN:
    case COMMA:
    case COMMAOP:
    case SSA_USE: return true;
    default: return false;
    }
}

bool is_plain_leaf(int op) {
    return op == NAME || op == ICON || op == LCON || op == FCON || op == SCON || op == UICALL;
}

} // namespace

NODE* peel_for_effect(NODE* t) {
    if (!t) return t;
    switch (t->op) {
    case ANDAND:
    case OROR: return peel_logical(t);
    case QUEST: return peel_conditional(t);
    case UAND: return peel_address(t);
    case SSA_MU: return tree_has_side_effects(t->left) ? t : peel_operands(t);
    case ICALL:
        if (contains_output_argument(t->left)) return t;
        return peel_operands(t);
    case UMULT:
    case STREF:
    case STDOT:
        if (lvalue_is_volatile(t)) return t;
        if (t->right && t->right->op == FIELD) {
            erase_tree(t->right);
            t->right = nullptr;
        }
        return peel_operands(t);
    case NAME:
        if (lvalue_is_volatile(t)) return t;
        break;
    }
    if (is_plain_leaf(t->op)) return erase_and_keep(t, nullptr);
    return computes_only(t->op) ? peel_operands(t) : t;
}
