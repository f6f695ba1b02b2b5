// SSA operators taken off trees.
#include "OPT5/dd/ssa_build.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/simp/simp.h"

NODE* remove_SSA_operators_in_tree(NODE* t) {
    while (t && op_is_SSA(t->op)) {
        NODE* below = t->left;
        erase_node(t);
        t = below;
    }
    // Left chains in a loop: lists and sums lean left.
    for (NODE* n = t; n; n = n->left) {
        put_operand(n->right, remove_SSA_operators_in_tree(n->right));
        while (n->left && op_is_SSA(n->left->op)) {
            NODE* below = n->left->left;
            erase_node(n->left);
            n->left = below;
        }
    }
    return t;
}

NODE* copy_tree_removing_SSA_operators(const NODE* t) { return remove_SSA_operators_in_tree(copy_tree(t)); }
NODE* copy_dd_tree_removing_SSA_operators(const NODE* t) { return remove_SSA_operators_in_tree(copy_dd_tree(t)); }

static void leave_SSA_form_in(BBLK* bb) {
    for (LIST** link = &bb->statements; *link;) {
        LIST* cell = *link;
        cell->first = remove_SSA_operators_in_tree(cell->first);
        if (!cell->first && cell != bb->last_statement()) { // a phi
            drop_statement(link);
            continue;
        }
        if (cell->flag2 && !trees_are_normalized) {
            cell->flag2 = 0;
            if (!tree_is_arg_prolog(cell->first) && !is_def_assert_ICALL_tree(cell->first))
                cell->first = simp_tree(cell->first, nullptr);
        }
        link = &cell->rest;
    }
    promote_toplevel_COMMAOPs_in_list(bb->statements, bb->last_statement());
}

void deconstruct_SSA_form() {
    if (!function_is_in_SSA_form) return;
    function_is_in_SSA_form = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) leave_SSA_form_in(bb);
    ssa_state.variables.clear();
    ssa_state.definitions.clear();
    ssa_state.args.clear();
    ssa_state.direct.clear();
    ssa_state.indirect.clear();
}
