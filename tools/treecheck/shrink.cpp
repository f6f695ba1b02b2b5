// Cuts a tree down while a property of it stays: a node is replaced by one of its operands or by a small constant.

#include "tools/treecheck/checker.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

namespace treecheck {

namespace {

// A position at which any value of the right type may stand.
struct SLOT {
    int index; // in the order of a walk, the root first
    bool takes_values;
};

bool left_is_value(const NODE* t) {
    switch (t->op) {
    case UAND:
    case STDOT:
    case ARGREF:
    case CALL:
    case UCALL:
    case REAL:
    case IMAG:
    case VFIELD:
    case VSCONV:
    case VRCONV: return false;
    case VPACK:
    case MEMCPY:
    case ICALL: return t->left->op != COMMA;
    }
    return !opcode_is_ASG(t->op);
}
bool right_is_value(const NODE* t) {
    return t->op != QUEST && t->op != STDOT && t->op != STREF && t->op != PMCONV && t->op != STASG && t->op != VFIELD;
}

void list_slots(const NODE* t, bool takes_values, std::vector<SLOT>* slots) {
    if (!t) return;
    slots->push_back({static_cast<int>(slots->size()), takes_values && form_of(t->type).bits != 0 && t->op != COMMA});
    list_slots(t->left, left_is_value(t), slots);
    list_slots(t->right, right_is_value(t), slots);
}

NODE** slot_at(NODE** t, int* index) {
    if (!*t) return nullptr;
    if ((*index)-- == 0) return t;
    if (NODE** found = slot_at(&(*t)->left, index)) return found;
    return slot_at(&(*t)->right, index);
}

void add_values(const NODE* t, std::vector<const NODE*>* out) {
    if (!t) return;
    if (t->op == COLON || t->op == COMMA || t->op == UAND || t->op == FIELD || !form_of(t->type).bits) {
        add_values(t->left, out);
        add_values(t->right, out);
    } else {
        out->push_back(t);
    }
}

// What may stand for the node, each a fresh tree.
std::vector<NODE*> candidates(const NODE* t) {
    std::vector<NODE*> out;
    const FORM own = form_of(t->type);
    TYPE* type = normalized_value_type(t->type->stqs());
    std::vector<const NODE*> operands;
    add_values(t->left, &operands);
    add_values(t->right, &operands);
    for (const NODE* o : operands)
        if (form_of(o->type).is_pointer == own.is_pointer) out.push_back(cast_to(type, copy_tree(o)));
    if (own.is_pointer || own.is_float) return out;
    if (t->op != ICON) {
        for (int v : {0, 1}) out.push_back(mk_ICON(INT65(v), type));
    } else {
        const INT65 v = t->u.lval;
        for (INT65 smaller : {INT65(0), INT65(1), INT65(2), v / INT65(2), v / INT65(8)})
            out.push_back(mk_ICON(smaller, type));
    }
    return out;
}

// Nodes first, then the constants.
struct SIZE {
    int nodes = 0, effects = 0;
    double constants = 0;
    bool operator<(const SIZE& o) const {
        if (nodes != o.nodes) return nodes < o.nodes;
        return effects != o.effects ? effects < o.effects : constants < o.constants;
    }
};
SIZE size_of(const NODE* t) {
    SIZE s;
    for_each_node(const_cast<NODE*>(t), [&](const NODE* n) {
        ++s.nodes;
        s.effects += op_has_effect(n->op);
        if (n->op == ICON)
            s.constants += n->u.lval.is_negative() ? 1.0 + static_cast<double>((-n->u.lval).value)
                                                   : static_cast<double>(n->u.lval.value);
    });
    return s;
}

// The first cut that keeps the property, or null.
NODE* cut(const NODE* tree, const std::function<bool(const NODE*)>& fails) {
    std::vector<SLOT> slots;
    list_slots(tree, true, &slots);
    const SIZE size = size_of(tree);
    for (const SLOT& slot : slots) {
        if (!slot.takes_values) continue;
        int at = slot.index;
        NODE* original = const_cast<NODE*>(tree);
        const NODE* here = *slot_at(&original, &at);
        NODE* found = nullptr;
        for (NODE* candidate : candidates(here)) {
            NODE* t = found ? nullptr : copy_tree(tree);
            if (!t) {
                erase_tree(candidate);
                continue;
            }
            at = slot.index;
            NODE** place = slot_at(&t, &at);
            erase_tree(*place);
            *place = candidate;
            if (size_of(t) < size && fails(t))
                found = t;
            else
                erase_tree(t);
        }
        if (found) return found;
    }
    return nullptr;
}

} // namespace

NODE* shrink(NODE* tree, const std::function<bool(const NODE*)>& fails) {
    while (NODE* smaller = cut(tree, fails)) {
        erase_tree(tree);
        tree = smaller;
    }
    return tree;
}

} // namespace treecheck
