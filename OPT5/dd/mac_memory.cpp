// A sum that a loop of one block keeps in memory is kept in a variable during the loop.
//
//     do w[j] += x * y; while (...);          s = w[j]; do s += x * y; while (...); w[j] = s;
//
// Needs: alias marks. Leaves: the graph, but for edges that it splits.
// Sound because the block runs at least once where it is entered, is left at its end alone, and nothing else in it
// reads or writes the place, whose address stays.
#include "OPT5/dd/mac.h"

#include "OPT5/dd/dd.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/code_motion.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/target/accumulators.h"

#include <algorithm>

namespace {

bool is_sum_in_memory(const NODE* t) {
    if (t->op != PLUSASG && t->op != MINUSASG) return false;
    if (!op_is_lvalue(t->left->op)) return false;
    if (!t->left->type->is_scalar() || lvalue_is_volatile(t->left) || tree_has_side_effects(t->left)) return false;
    return !is_a_likely_zelkova_accumulator(t->left, false) && is_a_zelkova_accumulator_type(t->left->type, false);
}

// The address is computed from variables that no store reaches.
bool has_plain_address(const NODE* place) {
    place = without_members(place);
    if (place->op == NAME) return true;
    auto reads_memory = [](const NODE* t) {
        return any_subtree(t, [](const NODE* n) {
            return op_is_load(n->op) || (n->op == NAME && !n->type->is_array() && !is_private_name(n));
        });
    };
    return !reads_memory(place->left) && !(place->right && reads_memory(place->right));
}

// acc = acc + m of a place.
bool is_spelled_out(const NODE* t) {
    return t->op == ASG && (t->right->op == PLUS || t->right->op == MINUS) &&
           trees_are_congruent(t->left, t->right->left, false);
}

} // namespace

bool SUM_IN_MEMORY::is_alone(const LIST* cell) const {
    const NODE *sum = cell->first, *place = sum->left;
    for (const LIST* s = loop.block->statements; s; s = s->rest) {
        const NODE* t = s == cell ? sum->right : s->first;
        if (may_leave(t) || tree_modifies_lvalue_in_tree(t, place)) return false;
        if (tree_touches_lvalue(t, place, nullptr, nullptr, true)) return false;
    }
    return true;
}

bool SUM_IN_MEMORY::keep_in_variable() {
    for (LIST* s = loop.block->statements; s->rest; s = s->rest) {
        if (is_spelled_out(s->first)) s->first = ASG_to_opASG(s->first);
        NODE* t = s->first;
        if (!is_sum_in_memory(t) || !has_plain_address(t->left) || !is_alone(s)) continue;
        for (BBLK* entry : loop.entries)
            if (!EDGE_STATEMENTS::may_insert(entry, loop.block)) return false; // a promise stays in front of its loop
        SYMTAB* sym = sym_temp('T', -1, t->left->type->stqs(), nullptr);
        NODE* place = t->left;
        t->left = mk_NAME(sym);
        if (!is_mac(t)) {
            erase_tree(t->left);
            t->left = place;
            continue;
        }
        for (BBLK*& entry : loop.entries) {
            if (entry->successors->rest) entry = split_cfg_edge(entry, loop.block, false);
            NODE* load = mk_ASG(mk_NAME(sym), copy_tree(place));
            around.push_back(load);
            insert_at_end_of_body(entry, load);
        }
        if (loop.exit->predecessors->rest) loop.exit = split_cfg_edge(loop.block, loop.exit, false);
        NODE* store = mk_ASG(place, mk_NAME(sym));
        around.push_back(store);
        insert_before(&loop.exit->statements, store, s->psn);
        return true;
    }
    return false;
}

void SUM_IN_MEMORY::drop() {
    std::vector<BBLK*> blocks = loop.entries;
    blocks.push_back(loop.exit);
    for (BBLK* bb : blocks) drop_statements(bb, around);
    around.clear();
}

bool may_leave(const NODE* t) {
    return any_subtree(t, [](const NODE* n) {
        if (n->op == PPRAGMA || n->op == ASM) return true;
        return op_is_call(n->op) && !pure_callee(n);
    });
}

void drop_statements(BBLK* bb, const std::vector<const NODE*>& trees) {
    for (LIST** link = &bb->statements; *link;)
        if (std::find(trees.begin(), trees.end(), (*link)->first) != trees.end())
            drop_statement(link);
        else
            link = &(*link)->rest;
}
