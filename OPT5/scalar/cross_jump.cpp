// Shared tails: blocks that end the function in the same statements, and tests that stand twice.
//
// A block is compared with those of the same shape alone: the opcodes of its statements make a key.
//
// Needs: nothing. Leaves: unreachable blocks and stale block numbers, which `rebuildcfg` mends.
// Sound because only code is shared: the block that stays does what the removed one did, so nothing is evaluated more
// or less often or in another order, and side effects are no obstacle. The entry block never takes a predecessor: its
// parameters would be set anew.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"

#include <map>

namespace {

bool is_mere_return(const BBLK* bb) {
    const LIST* first = bb->statements;
    return first && !first->rest &&
           (first->first->op == URETURN ||
            (first->first->op == RETURN && (!first->first->right || !first->first->right->left)));
}

std::vector<int> shape_of(const BBLK* bb) {
    std::vector<int> ops;
    for (const LIST* s = bb->statements; s; s = s->rest) {
        ops.push_back(s->first->op);
        for (const NODE* side : {s->first->left, s->first->right}) ops.push_back(side ? side->op : -1);
    }
    return ops;
}

void print_block(const BBLK* bb) {
    for (const LIST* s = bb->statements; s; s = s->rest) debug_printf("\t\t%s\n", stmt2infix(s->first).c_str());
}

void jump_instead(BBLK* later, BBLK* earlier) {
    PSN* psn = later->statements->psn;
    LS* ls = later->statements->first->ls;
    erase_statements(later);
    while (later->successors) disconnect(later, later->successors->first);
    set_statements(later, mkelist(mk_BRANCH(earlier, ls), nullptr, psn));
    if (currfuninfo->exit_bb == later) currfuninfo->exit_bb = earlier;
    connect(later, earlier);
}

// Two blocks of one test each, with the same condition and the same targets: the later one's predecessors use the
// earlier. The entry takes no predecessors.
bool share_tests() {
    bool changed = false;
    for (BBLK* bb = currfuninfo->bb_list->dflink; bb; bb = bb->dflink) {
        const EDGE* e = bb->predecessors;
        if (!e || !e->rest || e->rest->rest) continue;
        BBLK *earlier = e->first, *later = e->rest->first;
        if (earlier->dfn > later->dfn) std::swap(earlier, later);
        if (earlier == later || earlier == currfuninfo->bb_list) continue;
        const LIST *a = earlier->statements, *b = later->statements;
        if (a->rest || b->rest || a->first->op != IF || b->first->op != IF) continue;
        if (!trees_are_congruent_se_ok(a->first, b->first)) continue;
        if (print_debug)
            debug_printf("\n\tIF in bb %d is redundant with bb %d:\n\t\t%s\n", later->dfn, earlier->dfn,
                         stmt2infix(b->first).c_str());
        jump_instead(later, earlier);
        changed = true;
    }
    return changed;
}

bool share_tails() {
    bool changed = false;
    std::map<std::vector<int>, std::vector<BBLK*>> by_shape;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (bb->successors || bb->is_in_LIR_form() || is_mere_return(bb)) continue;
        std::vector<BBLK*>& candidates = by_shape[shape_of(bb)];
        BBLK* same = nullptr;
        for (BBLK* earlier : candidates) {
            if (!tree_lists_are_congruent(earlier->statements, bb->statements)) continue;
            same = earlier;
            break;
        }
        if (!same) {
            // The entry takes no predecessors.
            if (bb != currfuninfo->bb_list && candidates.size() < 32) candidates.push_back(bb);
            continue;
        }
        if (print_debug) {
            debug_printf("\n\tBB %d is redundant with BB %d\n", bb->dfn, same->dfn);
            print_block(bb);
            print_block(same);
        }
        jump_instead(bb, same);
        changed = true;
    }
    return changed;
}

} // namespace

bool cross_jump() {
    if (opt_level() == 0 || !currfuninfo->bb_list->dflink) return false;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'cross_jump' ----------\n");
    bool changed = share_tails();
    if (opt_level() >= 2) changed |= share_tests();
    return changed;
}

void do_early_cross_jumping() {
    if (!currfuninfo->bb_list) return;
    if (cross_jump()) rebuildcfg();
}
