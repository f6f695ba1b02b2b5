// From the flat statement list of a function to blocks, edges and depth-first numbers.
//
// `buildcfg` runs once, at the end of a function's reading, when its statements hold no control flow inside expressions.
// The raw list stands last statement first, so the walk makes the last block first. `rebuildcfg` repeats the numbering
// after passes changed successors. True afterwards: every block ends in one control statement, is reachable, and stands
// in `dflink` order by reverse postorder; both ends of every edge name each other.

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <vector>

namespace {

bool ends_a_block(int op) { return op == RETURN || op == BRANCH || op == URETURN; }

NODE* make_URETURN() { return maketree(URETURN, mk_NAME(currfunc), nullptr, tp->void_t, LS::level_2_scope()); }

// The reader has refused a function in which a label is defined twice or not at all.
class GRAPH_BUILDER {
public:
    explicit GRAPH_BUILDER(FUNINFO* funinfo) : f(funinfo) {}

    void run() {
        make_exit_block();
        ensure_closed_end();
        split_statements();
        map_labels();
        resolve_branches();
    }

private:
    void make_exit_block() {
        BBLK* exit = mkbblock(mkelist(make_URETURN(), nullptr, f->end_psn), nullptr, f);
        label_of_bb(exit);
        f->exit_bb = exit;
        f->bb_list = exit;
    }

    // Control must not fall off the end.
    void ensure_closed_end() {
        if (!f->statements || !ends_a_block(f->statements->first->op))
            f->statements = mkelist(make_URETURN(), f->statements, f->end_psn);
    }

    // `cur` holds the statements of the block in work in source order, since each is pushed before the ones behind it.
    void close_block() {
        if (!cur) return;
        f->bb_list = mkbblock(cur, f->bb_list, f);
        cur = nullptr;
    }

    void push(LIST* cell) {
        cell->rest = cur;
        cur = cell;
    }

    void split_statements() {
        LIST* raw = f->statements;
        f->statements = nullptr;
        while (raw) {
            LIST* cell = raw;
            raw = raw->rest;
            switch (cell->first->op) {
            case RETURN:
            case BRANCH:
            case URETURN:
            case IF:
                close_block();
                push(cell);
                break;
            case SWITCH:
                start_switch(cell);
                break;
            case LABELDEF: raw = start_labelled_block(cell, raw); break;
            case PPRAGMA:
                // The argument prolog stays first.
                if (cur && tree_is_arg_prolog(cur->first)) {
                    cell->rest = cur->rest;
                    cur->rest = cell;
                } else
                    push(cell);
                break;
            default: push(cell); break;
            }
        }
        close_block();
    }

    // A switch ends its block: a DEFAULT takes the place of falling through.
    void start_switch(LIST* cell) {
        NODE* sw = cell->first;
        NODE* last = sw->right && sw->right->op == COMMA ? sw->right->right : sw->right;
        LIST* fall_through = cur;
        cur = nullptr;
        if (!last || last->op != DEFAULT) {
            NODE* ref;
            if (fall_through && fall_through->first->op == BRANCH)
                ref = copy_tree(fall_through->first->left);
            else {
                cur = fall_through;
                fall_through = nullptr;
                close_block();
                ref = mk_LABELREF(label_of_bb(f->bb_list));
            }
            NODE* dflt = maketree(DEFAULT, ref, nullptr, tp->int_t, sw->ls);
            sw->right = sw->right ? maketree(COMMA, sw->right, dflt, tp->int_t, sw->ls) : dflt;
        } else if (fall_through && fall_through->first->op != BRANCH) {
            cur = fall_through;
            fall_through = nullptr;
            close_block();
        }
        // Nothing reaches a branch behind a switch that names all its targets.
        erase_tree_list(fall_through);
        push(cell);
    }

    // The label's block is what was collected so far; whatever stands before the label jumps to it explicitly.
    LIST* start_labelled_block(LIST* cell, LIST* before) {
        LBL* lbl = cell->first->lbl;
        close_block();
        lbl->next = f->bb_list->label;
        lbl->tree = nullptr;
        lbl->bblock = f->bb_list;
        f->bb_list->label = lbl;
        PSN* psn = before ? before->psn : cell->psn;
        erase_node(cell->first);
        delete cell;
        const int op = before ? before->first->op : NOP;
        // Two labels in a row start one block.
        if (op == BRANCH || op == URETURN || op == IF || op == LABELDEF || op == RETURN || op == CBRANCH) return before;
        return mkelist(maketree(BRANCH, mk_LABELREF(lbl), nullptr, tp->int_t, LS::level_2_scope()), before, psn);
    }

    void map_labels() {
        label_mapping.clear();
        for (BBLK* bb = f->bb_list; bb; bb = bb->uolink)
            for (LBL* lbl = bb->label; lbl; lbl = lbl->next) label_mapping[lbl->index] = lbl;
    }

    void resolve_branches() {
        f->bb_count = 0;
        for (BBLK* bb = f->bb_list; bb; bb = bb->uolink) {
            bb->uon = ++f->bb_count;
            LIST* last = bb->last_statement();
            if (last->first->op == URETURN && bb != f->exit_bb) {
                NODE* branch = mk_BRANCH(f->exit_bb, last->first->ls);
                branch->left->set_edge_profile(f->entry_count);
                erase_tree(last->first);
                last->first = branch;
            }
            for_each_branch_target(last->first, [](NODE* ref) {
                if (ref->lbl) return;
                auto it = label_mapping.find(ref->u.lval.fits_in<int32_t>());
                OPT_ASSERT(it != label_mapping.end());
                ref->lbl = it->second;
            });
            bb->successors = rev_edge_list(list_branch_targets(last->first, nullptr));
        }
    }

    FUNINFO* f;
    LIST* cur = nullptr;
};

// ---- Numbering

// The walk visits successors in list order and gives numbers from the end, so what is visited last numbers next to its
// predecessor: blocks without successors and then forks come behind straight-line paths.
void order_successors(BBLK* bb) {
    if (!bb->successors || !bb->successors->rest) return;
    EDGE *single = nullptr, *fork = nullptr, *none = nullptr;
    EDGE **single_tail = &single, **fork_tail = &fork;
    for (EDGE* e = bb->successors; e;) {
        EDGE* next = e->rest;
        e->rest = nullptr;
        const EDGE* out = e->first->successors;
        if (!out) {
            e->rest = none;
            none = e;
        } else if (!out->rest) {
            *single_tail = e;
            single_tail = &e->rest;
        } else {
            *fork_tail = e;
            fork_tail = &e->rest;
        }
        e = next;
    }
    *single_tail = fork;
    if (fork)
        *fork_tail = none;
    else
        *single_tail = none;
    bb->successors = single;
}

// Reverse postorder; returns the new list. Blocks that it does not reach keep dfn 0.
BBLK* depth_first_order(BBLK* entry) {
    struct VISIT {
        BBLK* bb;
        const EDGE* next; // to be followed from it
    };
    std::vector<VISIT> stack{{entry, entry->successors}};
    BBLK* finished = nullptr;
    entry->dfn = 1;
    while (!stack.empty()) {
        auto& [bb, next] = stack.back();
        if (next) {
            BBLK* to = next->first;
            next = next->rest;
            if (to->dfn) continue;
            to->dfn = 1;
            stack.push_back({to, to->successors});
            continue;
        }
        bb->dflink = finished;
        finished = bb;
        stack.pop_back();
    }
    return finished;
}

void drop_unreachable_blocks(FUNINFO* f, BBLK* in_source_order) {
    BBLK* last_kept = nullptr;
    for (BBLK* bb = in_source_order; bb;) {
        BBLK* next = bb->uolink;
        if (bb->dfn) {
            if (last_kept) last_kept->uolink = bb;
            last_kept = bb;
            bb->uolink = nullptr;
        } else {
            if (bb->statements) debug_printf("\nUNREACHABLE BASIC BLOCK: UON==%d\n", bb->uon);
            if (f->exit_bb == bb) f->exit_bb = nullptr;
            erase_bblock(bb);
            delete bb;
        }
        bb = next;
    }
}

// Numbers what is reachable from the entry and drops the rest. `all` is every block, through `uolink`.
void number_blocks(FUNINFO* f, BBLK* all) {
    BBLK* entry = f->bb_list;
    for (BBLK* bb = all; bb; bb = bb->uolink) {
        erase_edge_list(bb->predecessors);
        bb->predecessors = nullptr;
        bb->dfn = 0;
    }
    for (BBLK* bb = all; bb; bb = bb->uolink) order_successors(bb);
    f->bb_list = depth_first_order(entry);
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (const EDGE* e = bb->successors; e; e = e->rest)
            e->first->predecessors = new EDGE{bb, e->prob, e->first->predecessors};
    drop_unreachable_blocks(f, all);
    renumber_bblocks();
    edges_were_changed(f);
}

// Every block on one `uolink` chain: source order from the entry, then those that a pass put outside it.
BBLK* chain_in_source_order(FUNINFO* f) {
    std::vector<BBLK*> blocks;
    BLOCK_SET seen;
    for (BBLK* bb = f->bb_list; bb && seen.add(bb); bb = bb->uolink) blocks.push_back(bb);
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        if (seen.add(bb)) blocks.push_back(bb);
    for (size_t i = 0; i < blocks.size(); ++i) blocks[i]->uolink = i + 1 < blocks.size() ? blocks[i + 1] : nullptr;
    return blocks.empty() ? nullptr : blocks.front();
}

} // namespace

void rebuildcfg() {
    FUNINFO* f = currfuninfo;
    if (!f->bb_list) return;
    number_blocks(f, chain_in_source_order(f));
}

void buildcfg() {
    FUNINFO* f = currfuninfo;
    GRAPH_BUILDER(f).run();
    number_blocks(f, f->bb_list);
    const LIST* first = f->bb_list->statements;
    erase_tree(f->arg_prolog);
    f->arg_prolog = first && tree_is_arg_prolog(first->first) && !f->bb_list->is_in_LIR_form() ? copy_tree(first->first) : nullptr;
}
