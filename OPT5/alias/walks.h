// Walks over the trees of a function, for the sources of this room.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/trees.h"

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
    return opcode_is_ASG(op) || op == LOOP || op == INITLOOP || op == ENDLOOP || op == SSA_DEF || op == SSA_CHI ||
           op == SSA_PHI;
}

// What each pointer variable of the current function points into, in its SPMAP.
void find_pointees();
