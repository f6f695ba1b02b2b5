// Edge lists and the graph edits that keep both ends of an edge in step.

#include "OPT5/ir/bblk.h"

#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <unordered_map>

EDGE* mkedge(BBLK* bb, EDGE* rest) { return new EDGE{bb, -1.0, rest}; }

EDGE* edge_memberp(const BBLK* bb, EDGE* list) {
    while (list && list->first != bb) list = list->rest;
    return list;
}

bool is_edge(const BBLK* from, const BBLK* to) {
    const EDGE *out = from->successors, *in = to->predecessors;
    for (; out && in; out = out->rest, in = in->rest)
        if (out->first == to || in->first == from) return true;
    return false;
}

EDGE* add_edge(BBLK* bb, EDGE* list, double prob) {
    if (edge_memberp(bb, list)) return list;
    return new EDGE{bb, prob, list};
}

EDGE* remove_edge(BBLK* bb, EDGE* list) {
    for (EDGE** link = &list; *link; link = &(*link)->rest) {
        if ((*link)->first != bb) continue;
        EDGE* gone = *link;
        *link = gone->rest;
        delete gone;
        break;
    }
    return list;
}

int edge_length(const EDGE* list) {
    int n = 0;
    for (; list; list = list->rest) ++n;
    return n;
}

bool any_edge_leads_back() {
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (e->first->dfn <= bb->dfn) return true;
    return false;
}

EDGE* rev_edge_list(EDGE* list) {
    EDGE* out = nullptr;
    while (list) {
        EDGE* next = list->rest;
        list->rest = out;
        out = list;
        list = next;
    }
    return out;
}

// By insertion: for short lists.
EDGE* sort_edge_list(EDGE* list) {
    EDGE* sorted = nullptr;
    while (list) {
        EDGE* next = list->rest;
        EDGE** link = &sorted;
        while (*link && (*link)->first->dfn <= list->first->dfn) link = &(*link)->rest;
        list->rest = *link;
        *link = list;
        list = next;
    }
    return sorted;
}

EDGE* fast_sort_edge_list(EDGE* list) {
    std::vector<EDGE*> cells;
    for (; list; list = list->rest) cells.push_back(list);
    std::stable_sort(cells.begin(), cells.end(),
                     [](const EDGE* a, const EDGE* b) { return a->first->dfn < b->first->dfn; });
    EDGE* sorted = nullptr;
    for (auto it = cells.rbegin(); it != cells.rend(); ++it) {
        (*it)->rest = sorted;
        sorted = *it;
    }
    return sorted;
}

EDGE* copy_edge_list(const EDGE* list) {
    EDGE* out = nullptr;
    EDGE** tail = &out;
    for (; list; list = list->rest) {
        *tail = new EDGE{list->first, list->prob, nullptr};
        tail = &(*tail)->rest;
    }
    return out;
}

void erase_edge(EDGE* edge) { delete edge; }

void erase_edge_list(EDGE* list) {
    while (list) {
        EDGE* next = list->rest;
        delete list;
        list = next;
    }
}

void connect(BBLK* from, BBLK* to, double prob) {
    if (is_edge(from, to)) return;
    from->successors = new EDGE{to, prob, from->successors};
    to->predecessors = new EDGE{from, prob, to->predecessors};
    edges_were_changed(from->owner());
}

void disconnect(BBLK* from, BBLK* to) {
    from->successors = remove_edge(to, from->successors);
    to->predecessors = remove_edge(from, to->predecessors);
    edges_were_changed(from->owner());
}

void change_successors(BBLK* bb, const std::vector<SUCCESSOR_CHANGE>& changes) {
    SMALL_BLOCK_SET successors;
    for (const EDGE* e = bb->successors; e; e = e->rest) successors.add(e->first);
    EDGE* fresh = nullptr;
    std::unordered_map<const BBLK*, double> prob_of; // looked up alone
    for (const SUCCESSOR_CHANGE& c : changes) prob_of[c.from] = -1.0;
    for (const EDGE* e = bb->successors; e; e = e->rest)
        if (auto gone = prob_of.find(e->first); gone != prob_of.end()) gone->second = e->prob;
    for (const SUCCESSOR_CHANGE& c : changes) {
        successors.remove(c.from);
        c.from->predecessors = remove_edge(bb, c.from->predecessors);
        if (!successors.add(c.to)) continue;
        fresh = new EDGE{c.to, prob_of[c.from], fresh};
        c.to->predecessors = new EDGE{bb, fresh->prob, c.to->predecessors};
    }
    EDGE** link = &bb->successors;
    while (EDGE* e = *link) {
        if (!prob_of.count(e->first)) {
            link = &e->rest;
            continue;
        }
        *link = e->rest;
        delete e;
    }
    for (EDGE* e = fresh; e; e = e->rest) {
        if (e->rest) continue;
        e->rest = bb->successors;
        bb->successors = fresh;
        break;
    }
    edges_were_changed(bb->owner());
}

// ---- Targets of control statements

EDGE* list_branch_targets(NODE* tree, EDGE* list) {
    SMALL_BLOCK_SET listed; // a block may be the target of many cases
    for (const EDGE* e = list; e; e = e->rest) listed.add(e->first);
    for_each_branch_target(tree, [&](NODE* ref) {
        BBLK* target = ref->lbl ? ref->lbl->bblock : nullptr;
        if (target && listed.add(target)) list = mkedge(target, list);
    });
    return list;
}

void fixup_edge_lists(BBLK* bb, NODE* tree) {
    EDGE* targets = list_branch_targets(tree, nullptr);
    for (EDGE* e = targets; e; e = e->rest) connect(bb, e->first);
    erase_edge_list(targets);
}

void remap_labelrefs(NODE* tree, LBL* from, LBL* to) {
    for_each_node(tree, [=](NODE* t) {
        if (t->op != LABELREF || t->lbl != from) return;
        t->lbl = to;
        t->u.lval = INT65(to->index);
        if (from->refcount) --from->refcount;
        ++to->refcount;
    });
}

void subst_bb_for_bb_in_stmts(BBLK* to, BBLK* from, LIST* list) {
    LBL* target = label_of_bb(to);
    for (; list; list = list->rest)
        for (LBL* lbl = from->label; lbl; lbl = lbl->next) remap_labelrefs(list->first, lbl, target);
}

void subst_bb_for_bb_in_bb(BBLK* to, BBLK* from, BBLK* in) { subst_bb_for_bb_in_stmts(to, from, in->last_statement()); }

// ---- Splitting

namespace {

// Makes block n between `a` and `b`; the depth-first numbers are stale afterwards.
BBLK* make_block_on_edge(BBLK* a, BBLK* b) {
    LIST* last = a->last_statement();
    a->successors = remove_edge(b, a->successors);
    b->predecessors = remove_edge(a, b->predecessors);
    BBLK* n = insert_new_bb_with_branch(-1, a, b, last ? last->psn : nullptr);
    a->successors = add_edge(n, a->successors);
    n->predecessors = mkedge(a, nullptr);
    subst_bb_for_bb_in_bb(n, b, a);
    copy_live_at_entry(b, n);
    edges_were_changed(a->owner());
    return n;
}

// An edge that need not be split unless every critical edge must be: a forward edge outside loops, and the back edge
// of a loop.
bool edge_may_stay(const BBLK* a, const BBLK* b) {
    if (!a->loop) return a->dfn < b->dfn;
    return a->loop == b->loop && loop_callbacks.is_back_edge && loop_callbacks.is_back_edge(a, b);
}

} // namespace

BBLK* split_cfg_edge(BBLK* a, BBLK* b, bool renumber) {
    BBLK* n = make_block_on_edge(a, b);
    if (renumber) renumber_bblocks();
    return n;
}

void split_critical_edges(bool all) {
    if (!currfuninfo->bb_list) return;
    bool changed = false;
    BBLK* const entry = currfuninfo->bb_list;
    for (BBLK* a = entry->rdflink; a; a = a == entry ? nullptr : a->rdflink) {
        if (!a->successors || !a->successors->rest) continue;
        for (EDGE* e = a->successors; e;) {
            BBLK* b = e->first;
            e = e->rest;
            if (!b->predecessors || !b->predecessors->rest || (!all && edge_may_stay(a, b))) continue;
            debug_printf("Splitting critical edge between BB%d and BB%d\n", a->dfn, b->dfn);
            BBLK* n = make_block_on_edge(a, b);
            if (a->loop && b->loop && loop_callbacks.edge_was_split) loop_callbacks.edge_was_split(a, n, b);
            e = a->successors; // the list has changed
            changed = true;
        }
    }
    if (changed) renumber_bblocks();
}

bool bb_is_split_critical_edge(const BBLK* bb) {
    if (edge_length(bb->predecessors) != 1 || edge_length(bb->successors) != 1) return false;
    return edge_length(bb->predecessors->first->successors) >= 2 &&
           edge_length(bb->successors->first->predecessors) >= 2;
}
