// The control-flow simplifier.
//
// One pass visits the blocks from the last to the first, so that a branch is threaded over blocks whose own branches
// are threaded already, and from the first to the last, so that a block takes over a whole chain of successors. A
// change can make another one possible (a merged block holds a constant test, a dead block leaves its successor one
// predecessor), so passes are repeated until nothing changes; each change removes a block, an edge or a control
// statement, and there are few passes in practice. Control statements are cached by depth-first number, since a block's
// list must be walked to find its last.
//
// Needs: no loop hierarchy, but ahead of the output. Leaves: a graph without unreachable blocks, with block numbers.
// Sound because every path through the graph runs the same statements as before: only jumps, blocks without statements,
// tests whose outcome is known and blocks that no path enters are removed. What a removed test computed stays for its
// effects.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

#include <unordered_map>
#include <unordered_set>

namespace {

constexpr int MAX_THREADED_JUMPS = 20;

// The target of a block that holds nothing but a jump; null for any other block. The entry stays, since nothing may
// jump to the block behind it in its place, and so does a block that jumps to itself.
BBLK* bypass_of(const BBLK* bb) {
    const LIST* only = bb->statements;
    if (!only || only->rest || only->first->op != BRANCH || bb == currfuninfo->bb_list || bb->is_in_LIR_form())
        return nullptr;
    BBLK* target = only->first->left->lbl->bblock;
    return target == bb ? nullptr : target;
}

// The block at the end of a chain of jumps that begins with `via`: `via` itself if that does more than jump, or if the
// jumps lead back to it.
BBLK* end_of_jumps(BBLK* via) {
    BBLK* target = via;
    for (int jump = 0; jump < MAX_THREADED_JUMPS; ++jump) {
        BBLK* next = bypass_of(target);
        if (!next) break;
        target = next;
        if (target == via) break;
    }
    return target;
}

// For blocks that only jump: what control statements name in their place. Looked up, never walked.
class REPLACEMENTS {
public:
    void add(BBLK* from, BBLK* to) {
        // A chain longer than `end_of_jumps` follows: its last block may itself be replaced later.
        if (targets.count(from))
            for (auto& [_, target] : to_of)
                if (target == from) target = to;
        to_of[from] = to;
        targets.insert(to);
    }
    void apply(NODE* control) const {
        for_each_branch_target(control, [this](NODE* ref) {
            const auto found = to_of.find(ref->lbl->bblock);
            if (found != to_of.end()) remap_labelrefs(ref, ref->lbl, label_of_bb(found->second));
        });
    }

private:
    std::unordered_map<BBLK*, BBLK*> to_of;
    std::unordered_set<BBLK*> targets;
};

bool is_written_as_do(const PRAGMA* p) { return p->kind == PRG_SRC_LOOP && p->args.size() > 3 && p->args[3] == "do"; }

bool is_promise(const NODE* t) {
    return t->op == PPRAGMA && (t->pragma->kind == PRG_MUST_ITERATE || t->pragma->kind == PRG_PROB_ITERATE);
}

// The link of the block's last cell.
LIST** drop_promises_from(LIST** link) {
    while (*link && (*link)->rest)
        if (is_promise((*link)->first))
            drop_statement(link);
        else
            link = &(*link)->rest;
    return link;
}

// A loop that has nothing but its test left, which stood on top, evaluates that once more than it has iterations: a
// pragma in front of it promised something of the iterations, and a reader would take it for the tests.
void drop_promises_of(BBLK* loop) {
    for (const EDGE* e = loop->predecessors; e; e = e->rest) {
        if (e->first == loop) continue;
        bool tested_last = false;
        for (LIST** link = &e->first->statements; *link && (*link)->rest;) {
            LIST* s = *link;
            const PRAGMA* p = s->first->op == PPRAGMA ? s->first->pragma : nullptr;
            if (p && is_written_as_do(p)) tested_last = true;
            if (tested_last || !is_promise(s->first)) {
                link = &s->rest;
                continue;
            }
            drop_statement(link);
        }
    }
}

// Control no longer passes from the block to the head of a loop, which remains, perhaps: an iteration that ends there is the
// last one, and is not counted as those are that are followed by another or by the test.
void drop_promises_without_edge(const BBLK* from, BBLK* head) {
    for (const EDGE* e = head->predecessors; e; e = e->rest)
        if (e->first != from) drop_promises_in(e->first);
}

// The block that a SWITCH on a constant reaches.
BBLK* target_of_constant_switch(const NODE* sw) {
    const INT65 value = sw->left->u.lval;
    NODE* chosen = nullptr;
    for (NODE* t = sw->right; t; t = t->op == COMMA ? t->left : nullptr) {
        NODE* element = t->op == COMMA ? t->right : t;
        if (element->op == DEFAULT) {
            if (!chosen) chosen = element->left;
        } else if (truncate_to_type(element->left->u.lval, sw->left->type) == value)
            chosen = element->right;
    }
    return chosen ? chosen->lbl->bblock : nullptr;
}

// The one block that a control statement leads to whatever it computes, or null.
BBLK* sole_target(NODE* control) {
    BBLK* sole = nullptr;
    bool several = false;
    for_each_branch_target(control, [&](NODE* ref) {
        if (sole && sole != ref->lbl->bblock) several = true;
        sole = ref->lbl->bblock;
    });
    return several ? nullptr : sole;
}

BBLK* decided_target(NODE* control) {
    if (control->op != IF && control->op != SWITCH) return nullptr;
    if (tree_is_EH_SWITCH(control)) return nullptr;
    if (BBLK* sole = sole_target(control)) return sole;
    if (control->left->op != ICON) return nullptr;
    if (control->op == SWITCH) return target_of_constant_switch(control);
    NODE* targets = control->right;
    return (control->left->u.lval.is_zero() ? targets->right : targets->left)->lbl->bblock;
}

class CFG_SIMPLIFIER {
public:
    bool run() {
        collect();
        bool changed = false;
        for (bool again = true; again; changed |= again) {
            again = false;
            for (auto it = blocks.rbegin(); it != blocks.rend(); ++it)
                if (is_live(*it)) again |= simplify_branch(*it);
            for (BBLK* bb : blocks)
                if (is_live(bb)) again |= take_over_successors(bb);
        }
        return changed;
    }

private:
    void collect() {
        BBLK* const entry = currfuninfo->bb_list;
        controls.push_back(nullptr);
        for (BBLK* bb = entry; bb; bb = bb->dflink) {
            blocks.push_back(bb);
            controls.push_back(bb->last_statement());
            OPT_ASSERT(bb->dfn + 1 == static_cast<int>(controls.size()));
        }
        for (BBLK* bb : blocks)
            if (bb != entry && !bb->predecessors) remove(bb);
    }

    LIST*& control_of(const BBLK* bb) { return controls[bb->dfn]; }
    bool is_live(const BBLK* bb) { return control_of(bb) != nullptr; }

    // A block without predecessors is removed, and with it the successors whose last predecessor it was. The objects
    // stay for `rebuildcfg`, which also finds the rings that nothing enters.
    void remove(BBLK* bb) {
        std::vector<BBLK*> work{bb};
        while (!work.empty()) {
            BBLK* dead = work.back();
            work.pop_back();
            if (!is_live(dead)) continue;
            erase_statements(dead);
            control_of(dead) = nullptr;
            while (dead->successors) {
                BBLK* next = dead->successors->first;
                disconnect(dead, next);
                if (!next->predecessors && next != currfuninfo->bb_list) work.push_back(next);
            }
        }
    }

    void remove_if_unreached(BBLK* bb) {
        if (!bb->predecessors && bb != currfuninfo->bb_list) remove(bb);
    }

    bool simplify_branch(BBLK* bb) {
        if (bb->is_in_LIR_form()) return false;
        const bool was_loop = control_of(bb)->first->op == IF && edge_memberp(bb, bb->successors);
        bool changed = thread(bb);
        LIST* control = control_of(bb);
        if (!was_loop && control->first->op == IF && edge_memberp(bb, bb->successors)) drop_promises_of(bb);
        if (BBLK* target = decided_target(control->first)) {
            const std::vector<BBLK*> old = successors_of(bb);
            make_branch(bb, control, target);
            control_of(bb) = control->rest ? control->rest : control;
            for (BBLK* s : old) {
                if (s != target) drop_promises_without_edge(bb, s);
                remove_if_unreached(s);
            }
            changed = true;
        }
        return changed;
    }

    static std::vector<BBLK*> successors_of(const BBLK* bb) {
        std::vector<BBLK*> list;
        for (const EDGE* e = bb->successors; e; e = e->rest) list.push_back(e->first);
        return list;
    }

    // Each successor that only jumps on is replaced by the block that it jumps to. The control statement, which may
    // have thousands of targets, is rewritten in one walk.
    bool thread(BBLK* bb) {
        std::vector<SUCCESSOR_CHANGE> changes;
        for (const EDGE* e = bb->successors; e; e = e->rest) {
            BBLK* target = end_of_jumps(e->first);
            if (target == e->first) continue;
            if (!bb->successors->rest && !e->first->predecessors->rest) drop_promises_in(bb);
            changes.push_back({e->first, target});
        }
        if (changes.empty()) return false;
        change_successors(bb, changes);
        REPLACEMENTS replacements;
        for (const SUCCESSOR_CHANGE& c : changes) replacements.add(c.from, c.to);
        replacements.apply(control_of(bb)->first);
        for (const SUCCESSOR_CHANGE& c : changes) remove_if_unreached(c.from);
        return true;
    }

    bool take_over_successors(BBLK* bb) {
        bool changed = false;
        LIST** link = &bb->statements; // of the first cell that may be a promise
        while (BBLK* next = mergeable_successor(bb)) {
            link = drop_promises_from(link); // `next` heads no loop
            take_over(bb, next);
            changed = true;
        }
        return changed;
    }

    BBLK* mergeable_successor(BBLK* bb) {
        BBLK* next = only_block(bb->successors);
        if (!next || control_of(bb)->first->op != BRANCH || bb->is_in_LIR_form()) return nullptr;
        if (next == bb || next == currfuninfo->bb_list || next->is_in_LIR_form()) return nullptr;
        return only_block(next->predecessors) ? next : nullptr;
    }

    // The BRANCH's cell becomes the first of the successor's statements.
    void take_over(BBLK* bb, BBLK* next) {
        LIST* cell = control_of(bb);
        LIST* first = next->statements;
        erase_tree(cell->first);
        cell->first = first->first;
        cell->psn = first->psn;
        cell->flag1 = first->flag1;
        cell->flag2 = first->flag2;
        cell->rest = first->rest;
        control_of(bb) = control_of(next) == first ? cell : control_of(next);
        bb->control = control_of(bb); // the cell may be dropped now, as a promise
        delete first;
        control_of(next) = nullptr;
        set_statements(next, nullptr);

        disconnect(bb, next);
        bb->successors = next->successors;
        next->successors = nullptr;
        for (EDGE* e = bb->successors; e; e = e->rest)
            if (EDGE* back = edge_memberp(next, e->first->predecessors)) back->first = bb;
        if (currfuninfo->exit_bb == next) currfuninfo->exit_bb = bb;
        if (!bb->first_psn) bb->first_psn = next->first_psn;
        if (next->last_psn) bb->last_psn = next->last_psn;
        bb->dFreqOut = next->dFreqOut;
    }

    std::vector<BBLK*> blocks;
    std::vector<LIST*> controls; // by dfn; null for a block that is gone
};

} // namespace

void drop_promises_in(BBLK* bb) { drop_promises_from(&bb->statements); }

void make_branch(BBLK* bb, LIST* control, BBLK* target) {
    NODE* tree = control->first;
    LS* ls = tree->ls;
    NODE* effects = peel_for_effect(tree->left);
    tree->left = nullptr;
    erase_tree(tree);
    control->first = mk_BRANCH(target, ls);
    if (effects) {
        // The cell is the block's last: the effects take it, and the branch gets a new one behind.
        end_block_with(bb, control, control->first);
        control->first = effects;
    }
    for (EDGE* e = bb->successors; e;) {
        BBLK* old = e->first;
        e = e->rest;
        if (old != target) disconnect(bb, old);
    }
    connect(bb, target);
}

bool resync_edges(BBLK* bb) {
    NODE* control = bb->branch();
    if (!control || bb->is_in_LIR_form()) return false;
    EDGE* targets = list_branch_targets(control, nullptr);
    SMALL_BLOCK_SET missing; // targets whose edge is not found yet
    for (const EDGE* e = targets; e; e = e->rest) missing.add(e->first);
    bool changed = false;
    for (EDGE* e = bb->successors; e;) {
        BBLK* old = e->first;
        e = e->rest;
        if (missing.remove(old)) continue;
        disconnect(bb, old);
        changed = true;
    }
    for (EDGE* e = targets; e; e = e->rest) {
        if (!missing.remove(e->first)) continue;
        connect(bb, e->first);
        changed = true;
    }
    erase_edge_list(targets);
    return changed;
}

void simpcfg(bool quest_is_ok, bool) {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list) return;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'simpcfg' ----------\n");
    OPT_ASSERT(quest_is_ok || currfuninfo->bb_list->loop == NULL);
    renumber_bblocks();
    bool changed = false;
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) changed |= resync_edges(bb);
    for (bool again = true; again; changed |= again) {
        again = false;
        if (quest_is_ok && f->profile_status == 0) again |= cross_jump();
        again |= CFG_SIMPLIFIER().run();
        again |= remove_redundant_tests();
        if (quest_is_ok) again |= join_diamonds();
        if (again) rebuildcfg();
    }
    if (changed) rebuildcfg();
}

BBLK* split_block(BBLK* bb, LIST* cell, bool renumber) {
    LIST* behind = cell->rest;
    OPT_ASSERT(behind != nullptr);
    BBLK* next = insert_new_bb(-1, bb, behind);
    end_block_with(bb, cell, mk_BRANCH(next));
    next->first_psn = behind->psn;
    next->last_psn = bb->last_psn;
    next->dFreqIn = next->dFreqOut = bb->dFreqOut;
    next->loop = bb->loop;
    next->successors = bb->successors;
    bb->successors = nullptr;
    for (EDGE* e = next->successors; e; e = e->rest)
        if (EDGE* back = edge_memberp(bb, e->first->predecessors)) back->first = next;
    if (bb->owner()->exit_bb == bb) bb->owner()->exit_bb = next;
    connect(bb, next);
    if (renumber) renumber_bblocks();
    return next;
}
