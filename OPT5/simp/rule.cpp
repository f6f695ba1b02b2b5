// Questions about shapes, and replacements, that the rules of the simplifier share.

#include "OPT5/simp/rule.h"
#include "OPT5/ir/walks.h"

#include "OPT5/simp/simp.h"

namespace rules {

namespace {

constexpr int MOST_NODES = 48;

// False as soon as an effect is found or the budget is spent.
bool is_pure_within(const NODE* t, int* budget) {
    while (t) {
        if (--*budget < 0) return false;
        switch (t->op) {
        case NAME: return !lvalue_is_volatile(t);
        case UMULT:
        case STDOT:
        case STREF:
            if (lvalue_is_volatile(t)) return false;
            break;
        case UAND: // the address of what a pointer leads to is computed, what is there isn't read
            t = without_members(static_cast<const NODE*>(t->left));
            if (t->op == NAME) return true;
            if (op_is_indirection(t->op)) {
                if (t->op == UMULT && t->right && !is_pure_within(t->right, budget)) return false;
                t = t->left;
            }
            continue;
        case ICALL: return !tree_contains_op(t->left, ARGREF) && !tree_has_side_effects(t);
        default:
            if (op_has_effect(t->op)) return false;
        }
        if (t->right && !is_pure_within(t->right, budget)) return false;
        t = t->left;
    }
    return true;
}

} // namespace

bool is_pure(const NODE* t) {
    int budget = MOST_NODES;
    return is_pure_within(t, &budget);
}

bool is_steady_leaf(const NODE* t) {
    while (t->op == SCONV || t->op == PCONV || t->op == ISP2CHAR || t->op == VPACKM) t = t->left;
    return t->op == ICON || t->op == FCON || t->op == SCON || (t->op == UAND && t->left->op == NAME);
}

NODE* made(int op, NODE* left, NODE* right, TYPE* type, struct LOOP* loop) {
    LS* ls = left->ls ? left->ls : right ? right->ls : nullptr;
    return simp_node(maketree(op, left, right, type, ls), loop);
}

NODE* coerced(TYPE* type, NODE* t, struct LOOP* loop) {
    auto is_cast = [](const NODE* n) { return n->op == SCONV || n->op == PCONV; };
    NODE* r = coerce_to_type(type, t);
    if (r->op == QUEST && r->right->op == COLON) { // the cast may stand in the arms now
        bool any = false;
        for (NODE** arm : {&r->right->left, &r->right->right})
            if (is_cast(*arm)) {
                *arm = simp_node(*arm, loop);
                any = true;
            }
        return any ? simp_node(r, loop) : r;
    }
    return is_cast(r) ? simp_node(r, loop) : r;
}

static bool belongs_right(const NODE* t, const NODE* other) {
    auto is_number = [](const NODE* n) { return is_constant(n, ICON) || is_constant(n, FCON); };
    if (is_number(t) || is_number(other)) return is_number(t) && !is_number(other);
    if (is_effective_leaf(t) != is_effective_leaf(other)) return is_effective_leaf(t);
    return other->op == EXPT && t->op != EXPT;
}

void order_operands(NODE* t) {
    if (!belongs_right(t->left, t->right)) return;
    if (is_steady_leaf(t->left) || is_steady_leaf(t->right) || (is_pure(t->left) && is_pure(t->right)))
        std::swap(t->left, t->right);
}

constexpr int MOST_COMMAS = 16;

static NODE* lean_left_within(NODE* t, int levels) {
    while (levels-- > 0 && t->right->op == COMMAOP) { // a, (b, c) is (a, b), c
        NODE* inner = t->right;
        t->right = inner->left;
        t->type = t->right->type;
        inner->left = lean_left_within(t, levels);
        t = inner;
    }
    return t;
}

NODE* lean_left(NODE* commaop) { return lean_left_within(commaop, MOST_COMMAS); }

NODE* in_sequence(NODE* a, NODE* b) { return a && b ? lean_left(mk_COMMAOP(a, b)) : a ? a : b; }

NODE* take_left(NODE* t) {
    NODE* operand = t->left;
    erase_node(t);
    return operand;
}

NODE* take_right(NODE* t) {
    NODE* operand = t->right;
    erase_node(t);
    return operand;
}

NODE* only_left(NODE* t) {
    TYPE* type = t->type;
    erase_tree(t->right);
    return coerce_to_type(type, take_left(t));
}

NODE* only_right(NODE* t) {
    TYPE* type = t->type;
    erase_tree(t->left);
    return coerce_to_type(type, take_right(t));
}

NODE* constant_for(NODE* t, INT65 value) {
    NODE* result = icon_of(value, t);
    NODE* left = t->left ? peel_for_effect(t->left) : nullptr;
    NODE* right = t->right ? peel_for_effect(t->right) : nullptr;
    erase_node(t);
    return in_sequence(in_sequence(left, right), result);
}

NODE* to_unary(NODE* t, int op, NODE* operand) {
    t->op = op;
    t->left = operand;
    t->right = nullptr;
    return t;
}

NODE* to_binary(NODE* t, int op, NODE* left, NODE* right) {
    t->op = op;
    t->left = left;
    t->right = right;
    return t;
}

NODE* replace_by(NODE* t, NODE* value) {
    TYPE* type = t->type;
    erase_tree(t);
    return coerce_to_type(type, value);
}

} // namespace rules
