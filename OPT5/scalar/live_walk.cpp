#include "OPT5/scalar/live_walk.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <vector>

void BACKWARD_WALK::block(BBLK* bb) {
    cells.clear();
    for (LIST* s = bb->statements; s; s = s->rest) cells.push_back(s);
    bool kills = true;
    for (auto it = cells.rbegin(); it != cells.rend(); ++it) {
        LIST* s = *it;
        const bool is_dispatch = tree_is_EH_SWITCH(s->first);
        statement(s->first, kills);
        // The statement in front of a dispatch may be left in its middle.
        kills = !is_dispatch;
    }
}

void BACKWARD_WALK::statement(NODE*& tree, bool kills) {
    kills_now = kills;
    at_root = true;
    tree = walk(tree, true);
}

NODE* BACKWARD_WALK::walk(NODE* t, bool discard) {
    if (!t) return nullptr;
    const bool root = at_root;
    at_root = false;
    switch (t->op) {
    case NAME:
        if (int bit = live_index(t->u.sym); bit >= 0) read(bit);
        return t;
    case ASG:
    case PLUSPLUS:
    case MINMIN:
        if (!discard && !root) embedded_assignment();
        return walk_assignment(t, discard);
    case ANDAND:
    case OROR:
    case QUEST: return walk_conditional(t);
    case PCOMMA:
    case COMMAOP: return walk_commas(t, discard);
    case SWITCH:
    case IF:
    case STDOT:
    case STREF: t->left = walk(t->left, false); return t;
    default: break;
    }
    if (op_is_call(t->op) && discard && !call(t)) return walk_removed_call(t);
    if (op_of_opASG[t->op] != ILLOP) {
        if (!discard && !root) embedded_assignment();
        return walk_assignment(t, discard);
    }
    t->right = walk(t->right, false);
    t->left = walk(t->left, false);
    return t;
}

NODE* BACKWARD_WALK::walk_assignment(NODE* t, bool discard) {
    const int bit = t->left->op == NAME ? live_index(t->left->u.sym) : -1;
    if (bit < 0) {
        t->left = walk(t->left, false);
        t->right = walk(t->right, false);
        return t;
    }
    const bool reads_target = t->op != ASG;
    if (!write(bit, kills_now && !reads_target))
        if (NODE* rest = without_store(&t, discard); rest || !t) return walk(rest, discard);
    if (reads_target) read(bit);
    t->right = walk(t->right, false);
    return t;
}

// What is left of a dead assignment, which is consumed then: its effects, or the value that it would have stored. Null
// and the assignment kept where its value cannot be had without it.
NODE* BACKWARD_WALK::without_store(NODE** assignment, bool discard) {
    NODE* t = *assignment;
    NODE* rest = nullptr;
    if (discard)
        rest = peel_for_effect(t->right);
    else if (t->op == PLUSPLUS || t->op == MINMIN) {
        rest = t->left; // the old value
        t->left = nullptr;
        erase_tree(t->right);
    } else {
        t = *assignment = opASG_to_ASG(t);
        if (t->op != ASG) return nullptr;
        rest = coerce_to_type(t->left->type, t->right, true);
    }
    t->right = nullptr;
    erase_tree(t);
    *assignment = nullptr;
    removed();
    return rest;
}

NODE* BACKWARD_WALK::walk_removed_call(NODE* t) {
    NODE* arguments = peel_for_effect(t->right);
    t->right = nullptr;
    erase_tree(t);
    removed();
    return walk(arguments, true);
}

NODE* BACKWARD_WALK::walk_conditional(NODE* t) {
    const bool outer = kills_now;
    kills_now = false;
    if (t->op == QUEST) {
        NODE* arms = t->right;
        arms->right = walk(arms->right, false);
        arms->left = walk(arms->left, false);
    } else
        t->right = walk(t->right, false);
    kills_now = outer;
    t->left = walk(t->left, false);
    return t;
}

// The last of the chain is evaluated last; all but it, and the whole chain if that is a statement, are for effect.
NODE* BACKWARD_WALK::walk_commas(NODE* t, bool discard) {
    t->right = walk(t->right, discard || t->op == PCOMMA);
    t->left = walk(t->left, true);
    if (t->left && t->right) return t;
    NODE* kept = t->left ? t->left : t->right;
    t->left = t->right = nullptr;
    erase_node(t);
    return kept;
}
