// Loops with one back edge, a preheader and exit blocks of their own.
//
// Needs: no hierarchy. Leaves: numbered blocks, dominators and natural loops to be found anew where blocks were
// inserted.
// Sound because only empty blocks are put on edges. A promise of iterations in front of a loop that becomes two nested
// ones is true of neither and is removed. Edges of a dispatch of exceptions stay: the exception table names their targets.
#include "OPT5/dd/loop_shape.h"

#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/scope.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <climits>
#include <cstdio>

namespace {

PSN* end_psn(const BBLK* bb) {
    const LIST* last = bb->last_statement();
    return last ? last->psn : nullptr;
}

// Leads the edges of `sources` to `from` to the block `to`.
void move_edges(const std::vector<BBLK*>& sources, BBLK* from, BBLK* to) {
    for (BBLK* bb : sources) {
        subst_bb_for_bb_in_bb(to, from, bb);
        change_successors(bb, {{from, to}});
    }
    edges_were_changed(currfuninfo);
}

BBLK* insert_block(BBLK* behind, BBLK* target) {
    BBLK* made = insert_new_bb_with_branch(-1, behind, target, end_psn(behind));
    copy_live_at_entry(target, made);
    return made;
}

// ---- Shape

struct LATCHES {
    BBLK* head;
    std::vector<BBLK*> latches, entries; // sources of its back edges by number, and of the other edges to it
};

std::vector<LATCHES> find_latches() {
    std::vector<LATCHES> found;
    for (BBLK* head = currfuninfo->bb_list->dflink; head; head = head->dflink) {
        LATCHES l{head, {}, {}};
        for (const EDGE* e = head->predecessors; e; e = e->rest)
            (e->first->dfn >= head->dfn ? l.latches : l.entries).push_back(e->first);
        if (l.latches.empty()) continue;
        std::sort(l.latches.begin(), l.latches.end(), [](const BBLK* a, const BBLK* b) { return a->dfn < b->dfn; });
        found.push_back(std::move(l));
    }
    return found;
}

bool graph_is_connected() {
    const BBLK* entry = currfuninfo->bb_list;
    if (entry->predecessors) return false;
    for (const BBLK* bb = entry->dflink; bb; bb = bb->dflink)
        if (!bb->predecessors) return false;
    return true;
}

// Of the loop that starts at the head, in the blocks that lead to it and nowhere else but past it.
void drop_counts_ahead_of(const LATCHES& l) {
    for (BBLK* bb : l.entries)
        for (;;) {
            for (LIST** link = &bb->statements; *link && (*link)->rest;) {
                const NODE* t = (*link)->first;
                if (t->op == PPRAGMA && (t->pragma->kind == PRG_MUST_ITERATE || t->pragma->kind == PRG_PROB_ITERATE))
                    drop_statement(link);
                else
                    link = &(*link)->rest;
            }
            const EDGE* e = bb->predecessors;
            if (!e || e->rest || e->first->dfn >= bb->dfn) break;
            bb = e->first;
        }
}

void make_one_latch(const LATCHES& l) {
    if (l.latches.size() == 2) { // two nested loops, of which that of the last latch is the outer one
        drop_counts_ahead_of(l);
        std::vector<BBLK*> moved = l.entries;
        moved.push_back(l.latches.back());
        BBLK* outer = insert_block(l.head->rdflink, l.head);
        move_edges(moved, l.head, outer);
    } else if (l.latches.size() > 2) {
        BBLK* common = insert_block(l.latches.back(), l.head);
        move_edges(l.latches, l.head, common);
    }
}

// A test both outcomes of which are back edges closes two loops: the outer gets a latch of its own.
bool part_double_latches() {
    std::vector<BBLK*> closing_two;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        const NODE* branch = bb->branch();
        const EDGE* e = bb->successors;
        if (branch && branch->op == IF && e && e->rest && e->first->dfn <= bb->dfn && e->rest->first->dfn <= bb->dfn)
            closing_two.push_back(bb);
    }
    for (BBLK* bb : closing_two) {
        BBLK *a = bb->successors->first, *b = bb->successors->rest->first;
        split_cfg_edge(bb, a->dfn < b->dfn ? a : b, false);
    }
    return !closing_two.empty();
}

} // namespace

bool shape_loops(bool require_loops) {
    OPT_ASSERT(!currfuninfo->bb_list->is_in_LIR_form());
    rebuildcfg();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) bb->loop = nullptr;
    if (!graph_is_connected()) return false;
    const std::vector<LATCHES> found = find_latches();
    if (found.empty() && require_loops) return false;
    for (const LATCHES& l : found)
        for (const EDGE* e = l.head->predecessors; e; e = e->rest)
            if (tree_is_EH_SWITCH(e->first->branch())) return false;
    bool inserted = false;
    for (const LATCHES& l : found) {
        inserted |= l.latches.size() > 1;
        make_one_latch(l);
    }
    if (inserted) renumber_bblocks();
    if (part_double_latches()) renumber_bblocks();
    return true;
}

// ---- Discovery

namespace {

class DISCOVERY {
public:
    explicit DISCOVERY(HIERARCHY& h) : hierarchy(h) {}
    void run();

private:
    bool find_natural_loops();
    void make_root();
    void add_preheader(struct LOOP* loop);

    HIERARCHY& hierarchy;
};

// False where the graph is irreducible, or a loop may be left by an exception.
bool DISCOVERY::find_natural_loops() {
    need(fact::loops);
    const NATURAL_LOOPS& natural = *currfuninfo->loops;
    if (natural.has_other_cycles()) return false;
    for (const auto& found : natural.inner_first())
        if (found->latches.size() != 1) return false;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (natural.around(bb) && tree_is_EH_SWITCH(bb->branch())) return false;
    SIDE_TABLE<struct LOOP*> of_head(nullptr);
    for (const auto& found : natural.inner_first()) {
        hierarchy.loops.push_back(
            make_LOOP(found->header, found->latches.front(), static_cast<int>(hierarchy.loops.size()) + 1, nullptr));
        of_head[found->header] = hierarchy.loops.back().get();
    }
    for (const auto& found : natural.inner_first()) {
        struct LOOP* loop = of_head[found->header];
        if (found->parent) {
            loop->parent = of_head[found->parent->header];
            loop->parent->contents.push_back(loop->head);
        }
    }
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (const NATURAL_LOOP* found = natural.around(bb)) {
            bb->loop = of_head[found->header];
            bb->loop->contents.push_back(bb);
        }
    return true;
}

// The function's body, around what has no loop around it.
void DISCOVERY::make_root() {
    BBLK* entry = currfuninfo->bb_list;
    hierarchy.loops.insert(hierarchy.loops.begin(),
                           make_LOOP(entry, nullptr, static_cast<int>(hierarchy.loops.size()), nullptr));
    struct LOOP* root = hierarchy.loops.front().get();
    for (size_t i = 1; i < hierarchy.loops.size(); ++i)
        if (struct LOOP* loop = hierarchy.loops[i].get(); !loop->parent) {
            loop->parent = root;
            root->contents.push_back(loop->head);
        }
    for (BBLK* bb = entry; bb; bb = bb->dflink)
        if (!bb->loop) {
            bb->loop = root;
            root->contents.push_back(bb);
            root->tail = bb;
        }
}

void DISCOVERY::add_preheader(struct LOOP* loop) {
    std::vector<BBLK*> outside;
    for (const EDGE* e = loop->head->predecessors; e; e = e->rest)
        if (e->first != loop->tail) outside.push_back(e->first);
    OPT_ASSERT(!outside.empty());
    BBLK* before = outside.front();
    if (outside.size() == 1 && !before->successors->rest && before->loop == loop->parent) {
        loop->preheader = before;
        return;
    }
    debug_printf("\t\tAdding preheader for loop #%d with header BB%d.\n", loop->uid, loop->head->dfn);
    LS* scope = before->branch()->ls;
    for (const BBLK* bb : outside)
        if (scope) scope = bb->branch()->ls ? LS::innermost_common_scope(scope, bb->branch()->ls) : nullptr;
    BBLK* made = insert_block(loop->head->rdflink, loop->head);
    made->branch()->ls = scope;
    made->loop = loop->parent;
    loop->parent->contents.push_back(made);
    move_edges(outside, loop->head, made);
    loop->preheader = made;
}

void DISCOVERY::run() {
    const bool is_reducible = find_natural_loops();
    if (!is_reducible) {
        hierarchy.loops.clear();
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) bb->loop = nullptr;
    }
    make_root();
    struct LOOP* root = hierarchy.loops.front().get();
    root->irreducible = !is_reducible;
    for (struct LOOP* loop : loops_inner_first(root))
        if (!loop->is_root()) add_preheader(loop);
    assign_loop_levels(root, 0);
    add_exit_blocks(root);
    assign_loop_numbers(root, 0);
    renumber_bblocks();
    for (const auto& loop : hierarchy.loops) sort_loop_contents_into_DFO(loop.get());
    assign_loop_numbers(root, 0);
}

} // namespace

std::unique_ptr<HIERARCHY> discover_loops() {
    auto hierarchy = std::make_unique<HIERARCHY>();
    DISCOVERY(*hierarchy).run();
    return hierarchy;
}

// ---- Preheaders and exits

void ensure_proper_preheader_for_loop(struct LOOP* loop) {
    if (loop->is_root()) return;
    BBLK* bb = loop->preheader;
    if (!bb->successors->rest) {
        if (bb->successors->first != loop->head) abort_optimizer("a preheader leads elsewhere");
        return;
    }
    BBLK* made = split_cfg_edge(bb, loop->head);
    made->loop = loop->parent;
    loop->parent->contents.push_back(made);
    loop->preheader = made;
    sort_loop_contents_into_DFO(loop->parent);
}

namespace {

bool is_in(const BBLK* bb, const struct LOOP* loop) { return loop_is_subloop_of_loop(bb->loop, loop, true); }

class EXITS {
public:
    explicit EXITS(struct LOOP* of) : loop(of) {}
    void find() {
        loop->exits.clear();
        loop->flags &= ~LOOP_early_exit;
        const std::vector<BBLK*> contents = loop->contents;
        for (BBLK* bb : contents)
            if (bb->loop != loop)
                take_over(bb->loop);
            else
                enter_exits_of(bb);
        std::sort(loop->exits.begin(), loop->exits.end(),
                  [](const BBLK* a, const BBLK* b) { return a->serial < b->serial; });
    }

private:
    void enter(BBLK* exit) {
        if (is_exit.add(exit)) loop->exits.push_back(exit);
    }
    void take_over(const struct LOOP* inner) {
        for (BBLK* exit : inner->exits)
            if (!is_in(exit, loop)) {
                enter(exit);
                loop->flags |= LOOP_early_exit;
            }
    }
    void enter_exits_of(BBLK* bb) {
        std::vector<BBLK*> left_to;
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (!is_in(e->first, loop)) left_to.push_back(e->first);
        for (BBLK* to : left_to) {
            enter(of_loop_alone(bb, to));
            if (bb != loop->tail) loop->flags |= LOOP_early_exit;
        }
    }
    // The exit block on the edge: `to`, unless it is also reached from outside.
    BBLK* of_loop_alone(BBLK* from, BBLK* to) {
        bool is_shared = false;
        for (const EDGE* e = to->predecessors; e && !is_shared; e = e->rest) is_shared = !is_in(e->first, loop);
        if (!is_shared) return to;
        for (BBLK* exit : made_here)
            if (exit->successors->first == to) {
                move_edges({from}, to, exit);
                return exit;
            }
        BBLK* made = insert_block(from, to);
        struct LOOP* outer = to->loop;
        made->loop = outer;
        outer->contents.push_back(made);
        if (to == outer->head && !outer->is_root()) outer->tail = made; // it left a loop by the latch of one around it
        move_edges({from}, to, made);
        made_here.push_back(made);
        return made;
    }

    struct LOOP* loop;
    BLOCK_SET is_exit;
    std::vector<BBLK*> made_here; // those of a loop in it must not get other predecessors
};

} // namespace

void add_exit_blocks(struct LOOP* root) {
    for (struct LOOP* loop : loops_inner_first(root)) EXITS(loop).find();
}
