// Walks over the trees of a function.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/trees.h"

#include <unordered_set>
#include <vector>

// Every tree that the function holds: statements as read, statements of blocks, and clean-up code of its exceptions.
template <class F>
void for_each_tree(const FUNINFO* f, const F& visit) {
    for (const LIST* s = f->statements; s; s = s->rest) visit(s->first);
    for (const BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest) visit(s->first);
    for (const EHT_ITEM& item : f->eht)
        if (item.cleanup) visit(item.cleanup);
}

// Every node, the holder before its operands. Left operands are followed in a loop: lists lean left.
template <class F>
void for_each_subtree(const NODE* t, const F& visit) {
    for (; t; t = t->left) {
        visit(t);
        for_each_subtree(t->right, visit);
    }
}

// Operators that give their left operand a value.
inline bool writes_left_operand(int op) {
    constexpr int WRITES_LEFT = 1;
    return side_effects[op] == WRITES_LEFT || op == ARASG || op == LOOP || op == INITLOOP || op == ENDLOOP;
}

// The NAME that a write to an lvalue goes to, wholly or in part; null where it goes through a pointer.
template <class N>
N* written_name(N* t) {
    while (t->op == STDOT || t->op == REAL || t->op == IMAG || t->op == VFIELD || t->op == SIMDHI || t->op == SIMDLO ||
           t->op == VRCONV || t->op == DDNODE || t->op == IDENTITY)
        t = t->left;
    return t->op == NAME ? t : nullptr;
}

// How the pointer variables of a function get their values.
struct POINTER_WRITES {
    // One value that a variable is given; null: one that is not known.
    struct DEFINITION {
        SYMTAB* sym;
        const NODE* value;
    };
    std::vector<DEFINITION> definitions; // those that step a pointer along its object left out
    std::unordered_set<const SYMTAB*> stepped;

    void collect(const NODE* t); // of one node
};
POINTER_WRITES pointer_writes(const FUNINFO* f);

void build_groups(const POINTER_WRITES& writes);
// What each pointer variable of the current function points into, in its SPMAP.
void find_pointees(const POINTER_WRITES& writes);
