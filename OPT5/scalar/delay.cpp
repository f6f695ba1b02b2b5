// Delayed assignments: a value that only one successor of its block reads is computed on the edge to that.
//
// Needs: live variables. Leaves: live variables; block numbers where no edge was split.
// Sound because the assignment may pass what follows it in the block only if nothing there names its target or changes
// what its value is computed from. Its one read lies behind the edge that it moves to, so that every path computes it as
// often as before or less often.

#include "OPT5/scalar/delay.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/simp/seq.h"

#include <vector>

namespace {

constexpr size_t MAX_PASSED = 16; // statements that an assignment is moved over

bool reads_memory(const NODE* t) {
    return tree_contains_matching_node(t, [](const NODE* n) {
        return op_is_load(n->op) || (n->op == NAME && !n->type->is_scalar());
    });
}

class DELAY {
public:
    bool run() {
        FUNINFO* f = currfuninfo;
        count_reads();
        std::vector<BBLK*> blocks;
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) blocks.push_back(bb);
        for (auto it = blocks.rbegin(); it != blocks.rend(); ++it) block(*it);
        if (split) renumber_bblocks();
        return split;
    }

private:
    void count_reads() {
        reads.assign(static_cast<size_t>(currfuninfo->lva_sym_count), 0);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) {
                for_each_node(s->first, [this](const NODE* t) {
                    if (t->op != NAME) return;
                    if (int bit = live_index(t->u.sym); bit >= 0) ++reads[static_cast<size_t>(bit)];
                });
                const NODE* t = s->first;
                if (t->op != ASG || t->left->op != NAME) continue;
                if (int bit = live_index(t->left->u.sym); bit >= 0) --reads[static_cast<size_t>(bit)];
            }
    }

    void block(BBLK* bb) {
        if (!bb->successors || !bb->successors->rest || bb->is_in_LIR_form()) return;
        std::vector<LIST*> cells;
        for (LIST* s = bb->statements; s; s = s->rest) cells.push_back(s);
        if (tree_is_EH_SWITCH(cells.back()->first)) return;
        std::vector<const NODE*> passed{cells.back()->first};
        for (size_t i = cells.size() - 1; i-- > 0 && passed.size() < MAX_PASSED;) {
            BBLK* target = way_for(bb, cells[i]->first, passed);
            if (!target) {
                passed.push_back(cells[i]->first);
                continue;
            }
            move(bb, i == 0 ? nullptr : cells[i - 1], cells[i], target);
        }
    }

    // The one successor that reads what the statement assigns, if it may move there.
    BBLK* way_for(const BBLK* bb, const NODE* t, const std::vector<const NODE*>& passed) const {
        if (t->op != ASG || t->left->op != NAME || tree_is_arg_prolog(t)) return nullptr;
        const int bit = live_index(t->left->u.sym);
        if (bit < 0 || reads[static_cast<size_t>(bit)] != 1 || tree_has_side_effects(t->right)) return nullptr;
        if (!currfuninfo->stack_is_laid_out && reads_memory(t->right)) return nullptr;
        BBLK* target = nullptr;
        for (const EDGE* e = bb->successors; e; e = e->rest) {
            if (!live_at_entry_is_known(e->first)) return nullptr;
            if (!is_live_at_entry(e->first, bit)) continue;
            if (target) return nullptr;
            target = e->first;
        }
        if (!target) return nullptr;
        // A test that closes a loop stays the end of the iteration: what is promised of their count is of that.
        if (target->predecessors->rest && target->dfn <= bb->dfn) return nullptr;
        // A new block for a mere copy costs more than it saves.
        if (target->predecessors->rest && !t->right->left) return nullptr;
        for (const NODE* p : passed)
            if (sym_appears_in_tree(t->left->u.sym, p) || tree_modifies_lvalue_in_tree(p, t->right)) return nullptr;
        return target;
    }

    void move(BBLK* bb, LIST* before, LIST* cell, BBLK* target) {
        if (target->predecessors->rest) {
            target = split_cfg_edge(bb, target, false);
            split = true;
        }
        NODE* assignment = cell->first;
        insert_before(&target->statements, assignment, cell->psn);
        cell->first = nullptr;
        drop_statement(before ? &before->rest : &bb->statements);
        set_live_at_entry(target, live_index(assignment->left->u.sym), false);
        for_each_node(assignment->right, [target](const NODE* t) {
            if (t->op != NAME) return;
            if (int bit = live_index(t->u.sym); bit >= 0) set_live_at_entry(target, bit, true);
        });
    }

    std::vector<int> reads; // by bit
    bool split = false;
};

} // namespace

bool delay_assignments() {
    if (currfuninfo->lva_sym_count == 0) return false;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'delay_assignments' ----------\n");
    return DELAY().run();
}
