// Walks over trees, the places that operators name, and what an operator does by itself.
//
// What a whole tree reads or changes, calls and pointers included, is asked of `OPT5/alias/effects.h`.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/trees.h"

// ---- Walks. Constant trees stay constant: `visit` takes `const NODE*` then.

// Every node, the holder before its operands. Left operands are followed in a loop: lists lean left.
template <class N, class F>
void for_each_subtree(N* t, const F& visit) {
    for (; t; t = t->left) {
        visit(t);
        for_each_subtree(static_cast<N*>(t->right), visit);
    }
}

template <class P>
bool any_subtree(const NODE* t, const P& predicate) {
    for (; t; t = t->left)
        if (predicate(t) || any_subtree(static_cast<const NODE*>(t->right), predicate)) return true;
    return false;
}

// Every tree that the function holds: statements as read, statements of blocks, and clean-up code of its exceptions.
template <class F>
void for_each_tree(const FUNINFO* f, const F& visit) {
    for (const LIST* s = f->statements; s; s = s->rest) visit(s->first);
    for (const BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest) visit(s->first);
    for (const EHT_ITEM& item : f->eht)
        if (item.cleanup) visit(item.cleanup);
}

// ---- What an operator does, whatever its operands hold

// Anything but computing its value: writing, transferring control, or what is not known.
inline bool op_has_effect(int op) { return side_effects[op] != 0; }
inline bool op_transfers_control(int op) { return side_effects[op] == 2; }
// Gives its left operand a value. A loop's counter is one; an operator of SSA form speaks of what stands below it.
inline bool writes_left_operand(int op) { return op_traits[op] & OP_WRITES_LEFT; }

// ---- Places: what is written, or has its address taken

// The place that a place is a part or another form of: below STDOT, REAL, a cast and the like. Null for NAME, and for
// UMULT and STREF, which hold a pointer.
template <class N>
N* place_below(N* t) {
    switch (t->op) {
    case NAME:
    case UMULT:
    case STREF:
    case QUEST: return nullptr;
    case COMMAOP:
    case PCOMMA:
    case CSE_DUPE:
    case CSE_ORIG: return t->right;
    default: return t->left;
    }
}

// The whole object, or the indirection, that a place lies in.
template <class N>
N* object_of_place(N* t) {
    while (N* below = place_below(t)) t = below;
    return t;
}

// The access with its members, without what stands over that: an lvalue for the alias rules.
template <class N>
N* access_of_place(N* t) {
    while (t->op != STDOT) {
        N* below = place_below(t);
        if (!below) break;
        t = below;
    }
    return t;
}

// The NAME that is accessed as a whole, in normal form through its address; null of another tree.
inline const NODE* name_accessed(const NODE* t) {
    if (t->op == UMULT && !t->right && t->left->op == UAND) t = t->left->left;
    return t->op == NAME ? t : nullptr;
}

// The NAME that a place is, wholly or in part; null where it lies behind a pointer.
template <class N>
N* name_of_place(N* t) {
    t = object_of_place(t);
    return t->op == NAME ? t : nullptr;
}

template <class N>
N* without_members(N* t) {
    while (t->op == STDOT) t = t->left;
    return t;
}
inline NODE** link_without_members(NODE** link) { // the link that holds it
    while ((*link)->op == STDOT) link = &(*link)->left;
    return link;
}

// The same where the members are first ones, no bit-fields: the place begins where what is returned does.
template <class N>
N* without_first_members(N* t) {
    while (t->op == STDOT && t->right->mval && t->right->mval->offset == 0 && !t->right->mval->is_bitfld) t = t->left;
    return t;
}

// The same; `*offset` grows by where the members lie in what is returned, in bits.
template <class N>
N* without_members(N* t, int64_t* offset) {
    for (; t->op == STDOT; t = t->left) *offset += static_cast<int64_t>(t->right->mval->offset);
    return t;
}

// Whether an access is one of an object, or a member of one, by its NAME: it is there.
inline bool is_access_by_name(const NODE* t) { return name_accessed(without_members(t)) != nullptr; }
