// Basic blocks and labels: making, placing, numbering and erasing them.

#include "OPT5/ir/bblk.h"

#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <cstdio>

int internal_label_index = 0;
std::map<int32_t, LBL*> label_mapping;

const char* BBLK::str() const {
    static char buffers[8][32];
    static unsigned turn = 0;
    char* out = buffers[turn++ % 8];
    if (pass_debug_dump_serial)
        std::snprintf(out, sizeof buffers[0], "BB%d(#%u)", dfn, serial);
    else
        std::snprintf(out, sizeof buffers[0], "BB%d", dfn);
    return out;
}

LIST* BBLK::last_statement() const {
    if (!control || control->rest) control = last_cell(control ? control : statements);
    return control;
}

NODE* BBLK::branch() const {
    const LIST* last = last_statement();
    return last ? last->first : nullptr;
}

// ---- Labels

namespace {

constexpr int32_t LOWEST_INTERNAL_LABEL = -30000;

// Numbers may repeat in a function of more labels than that; references are told by the record, not by the number.
int32_t fresh_internal_label() {
    int32_t& counter = currfuninfo->label_counters[internal_label_index];
    counter = counter <= LOWEST_INTERNAL_LABEL ? -1 : counter - 1;
    return counter;
}

} // namespace

LBL* mklabel(int32_t index, NODE* tree, BBLK* bb) {
    auto* lbl = new LBL;
    lbl->index = index > 0 ? index : fresh_internal_label();
    lbl->tree = tree;
    lbl->bblock = bb;
    return lbl;
}

LBL* find_label(int32_t index) {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LBL* lbl = bb->label; lbl; lbl = lbl->next)
            if (lbl->index == index) return lbl;
    return mklabel(index, nullptr, nullptr);
}

LBL* label_of_bb(BBLK* bb) {
    if (!bb->label) bb->label = mklabel(0, nullptr, bb);
    return bb->label;
}

namespace {

// The control statement of every block in list order, for callers that look more than once.
std::vector<NODE*> collect_branches() {
    std::vector<NODE*> branches;
    branches.reserve(static_cast<size_t>(currfuninfo->bb_count));
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (NODE* branch = bb->branch()) branches.push_back(branch);
    return branches;
}

void recount(const std::vector<NODE*>& branches) {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LBL* lbl = bb->label; lbl; lbl = lbl->next) lbl->refcount = 0;
    for (NODE* branch : branches)
        for_each_branch_target(branch, [](NODE* ref) {
            if (ref->lbl) ++ref->lbl->refcount;
        });
}

// ---- Blocks

void find_positions(BBLK* bb) {
    bb->first_psn = bb->last_psn = nullptr;
    for (const LIST* s = bb->statements; s; s = s->rest) {
        if (!s->psn) continue;
        if (!bb->first_psn) bb->first_psn = s->psn;
        bb->last_psn = s->psn;
    }
}

} // namespace

BBLK* mkbblock(LIST* list, BBLK* next, FUNINFO* funinfo) {
    auto* bb = new BBLK(funinfo);
    bb->dflink = bb->uolink = next;
    bb->statements = list;
    find_positions(bb);
    graph_was_changed(funinfo);
    return bb;
}

BBLK* insert_new_bb(int uon, BBLK* after, LIST* list) {
    BBLK* bb = mkbblock(list, nullptr, after->owner());
    bb->uon = uon;
    bb->dfn = -1;
    bb->uolink = after->uolink;
    after->uolink = bb;
    bb->dflink = after->dflink;
    bb->rdflink = after;
    after->dflink = bb;
    (bb->dflink ? bb->dflink : after->owner()->bb_list)->rdflink = bb;
    label_of_bb(bb);
    return bb;
}

BBLK* insert_new_bb_with_branch(int uon, BBLK* after, BBLK* target, PSN* psn) {
    BBLK* bb = insert_new_bb(uon, after, mkelist(mk_BRANCH(target), nullptr, psn));
    bb->first_psn = bb->last_psn = psn;
    bb->successors = add_edge(target, bb->successors);
    target->predecessors = add_edge(bb, target->predecessors);
    return bb;
}

void set_text_order(const std::vector<BBLK*>& order) {
    BBLK* last = nullptr;
    for (BBLK* bb : order) {
        if (last) last->dflink = bb;
        bb->rdflink = last;
        last = bb;
    }
    last->dflink = nullptr;
    order.front()->rdflink = last;
    graph_was_changed(currfuninfo);
}

void delink_old_bb(BBLK* bb) {
    FUNINFO* f = bb->owner();
    if (f->bb_list == bb)
        f->bb_list = bb->dflink;
    else
        bb->rdflink->dflink = bb->dflink;
    if (bb->dflink)
        bb->dflink->rdflink = bb->rdflink;
    else if (f->bb_list && f->bb_list->rdflink == bb)
        f->bb_list->rdflink = bb->rdflink;
    for (BBLK* b = f->bb_list; b; b = b->dflink)
        if (b->uolink == bb) b->uolink = bb->uolink;
    if (f->exit_bb == bb) f->exit_bb = nullptr;
    graph_was_changed(f);
    erase_bblock(bb);
    delete bb;
}

void erase_bblock(BBLK* bb) {
    erase_statements(bb);
    for (LBL* lbl = bb->label; lbl;) {
        LBL* next = lbl->next;
        delete lbl;
        lbl = next;
    }
    bb->label = nullptr;
    erase_edge_list(bb->predecessors);
    erase_edge_list(bb->successors);
    bb->predecessors = bb->successors = nullptr;
}

bool BB_is_in_bb_list(const BBLK* bb) {
    for (const BBLK* b = currfuninfo->bb_list; b; b = b->dflink)
        if (b == bb) return true;
    return false;
}

// ---- Numbering

namespace {

// Labels that a branch names get their place in block order as number, so that output and dumps read in order.
void renumber_labels(const std::vector<NODE*>& branches) {
    int32_t running = 0;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LBL* lbl = bb->label; lbl; lbl = lbl->next)
            if (lbl->refcount) lbl->index = ++running;
    for (NODE* branch : branches)
        for_each_branch_target(branch, [](NODE* ref) {
            if (ref->lbl) ref->u.lval = INT65(ref->lbl->index);
        });
}

// No path leaves a function in which every block has a successor.
void note_endless_function() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (!bb->successors) return;
    constexpr uint64_t COMPUTES = FUN_is_pure_fun | FUN_only_reads;
    if (TEST_FLAG(currfuninfo, FUN_never_returns) || !TEST_FLAG(currfuninfo, COMPUTES)) return;
    set_flags(currfuninfo, FUN_never_returns);
    clear_flags(currfuninfo, COMPUTES);
}

} // namespace

void renumber_bblocks() {
    BBLK* previous = nullptr;
    int n = 0;
    bool moved = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        moved |= bb->dfn != ++n;
        bb->dfn = n;
        bb->rdflink = previous;
        previous = bb;
    }
    if (currfuninfo->bb_list) currfuninfo->bb_list->rdflink = previous;
    currfuninfo->bb_count = n;
    const std::vector<NODE*> branches = collect_branches();
    recount(branches);
    renumber_labels(branches);
    if (n) note_endless_function();
    // Dominators and loops are kept by number.
    if (moved) edges_were_changed(currfuninfo);
    currfuninfo->facts |= fact::block_numbers;
}

namespace {

bool numbers_still_hold() {
    int n = 0;
    bool in_order = true;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) in_order &= bb->dfn == ++n;
    return in_order && currfuninfo->bb_count == n;
}

const FACT_FINDER numbers(
    "block numbers", fact::block_numbers, fact::none, [](FACTS) { renumber_bblocks(); }, nullptr, numbers_still_hold);

} // namespace

// ---- Dumps

void prbbinfix(FILE* out) {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        std::fprintf(out, "\n%s:", bb->str());
        for (const LBL* lbl = bb->label; lbl; lbl = lbl->next)
            if (lbl->refcount) std::fprintf(out, " L%d", lbl->index);
        std::fputs("\tpred:", out);
        for (const EDGE* e = bb->predecessors; e; e = e->rest) std::fprintf(out, " %s", e->first->str());
        std::fputs("\tsucc:", out);
        for (const EDGE* e = bb->successors; e; e = e->rest) std::fprintf(out, " %s", e->first->str());
        std::fputc('\n', out);
        for (const LIST* s = bb->statements; s; s = s->rest)
            std::fprintf(out, "%8ld\t%s\n", s->psn ? s->psn->line : 0L, stmt2infix(s->first).c_str());
    }
    std::fputc('\n', out);
}

void prbblocks(BBLK* first, BBLK* last) {
    if (!fdebug) return;
    for (BBLK* bb = first; bb; bb = bb == last ? nullptr : bb->dflink) {
        debug_printf("%s uon=%d dfn=%d depth=%d", bb->str(), bb->uon, bb->dfn, int(bb->depth));
        for (const EDGE* e = bb->predecessors; e; e = e->rest) debug_printf(" <-%s", e->first->str());
        for (const EDGE* e = bb->successors; e; e = e->rest) debug_printf(" ->%s", e->first->str());
        debug_printf("\n");
        for (const LIST* s = bb->statements; s; s = s->rest) print_tree(fdebug, s->first, 4);
    }
}
