// Layout of loops, ahead of the output: one conditional branch closes a loop.
//
// First whole stretches of the layout are exchanged; then a test that still stands on top of a loop is copied to where the
// loop jumps back to it, first tests that are decided are passed by, and the blocks find their order (layout.cpp).
//
// Needs: block numbers, which are layout positions here. Leaves: them.
// Sound because the order of blocks in the output means nothing by itself: the writer adds a jump where a block does
// not fall into its successor; a copied test is asked where the original would have been asked next. Only a pragma that promises something of the loop behind it in the text depends on the
// layout, so no block moves in between.

#include "OPT5/scalar/simpcfg.h"
#include "OPT5/scalar/tail_copies.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <unordered_set>
#include <vector>

namespace {

bool first_IF_ends_loop(const BBLK* bb) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (s->first->op == IF) return s->first->left->op == ENDLOOP;
    return false;
}

bool holds_LOOP(const BBLK* bb) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (s->first->op == LOOP) return true;
    return false;
}

// A loop whose test stands on top, in the layout
//
//     A          falls into the loop
//     B .. C     the test; C leads out, to F
//     D .. E     the body; E jumps back to B
//     F          what follows, if anything
//
// becomes A, D .. E, B .. C, F: A jumps to B once, and C closes the loop with its conditional branch back to D. A
// block's dfn is its place in the layout.
class ROTATION {
public:
    explicit ROTATION(BBLK* end) : E(end) {}

    bool find() {
        BBLK* target = highest_successor(E);
        if (!target || target->dfn >= E->dfn || target == currfuninfo->bb_list) return false;
        if (first_IF_ends_loop(E) || holds_LOOP(target)) return false;
        F = E->dflink;
        C = end_of_stretch();
        if (!C || C == currfuninfo->bb_list || C == E) return false;
        D = C->dflink;
        if (D != E && first_IF_ends_loop(D)) return false;
        B = start_of_stretch();
        if (!B || B == currfuninfo->bb_list) return false;
        A = B->rdflink;
        return A != nullptr && B->dfn <= C->dfn && (!ends_in_promise(A) || is_in_loop(D));
    }

    void apply() {
        if (print_debug)
            debug_printf("\n\tCandidate: A=%d, B=%d, C=%d, D=%d, E=%d, F=%d\n", A->dfn, B->dfn, C->dfn, D->dfn, E->dfn,
                         F ? F->dfn : 0);
        const int first = B->dfn;
        link(A, D);
        link(E, B);
        C->dflink = F;
        if (F)
            F->rdflink = C;
        else
            currfuninfo->bb_list->rdflink = C;
        int n = first;
        for (BBLK* bb = D; bb != F; bb = bb->dflink) bb->dfn = n++;
        graph_was_changed(currfuninfo);
        if (print_debug) {
            debug_printf("\n\tAfter loop rotation:\n\n");
            if (fdebug) prbbinfix(fdebug);
        }
    }

private:
    static void link(BBLK* before, BBLK* after) {
        before->dflink = after;
        after->rdflink = before;
    }

    static BBLK* highest_successor(const BBLK* bb) {
        BBLK* highest = nullptr;
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (!highest || e->first->dfn > highest->dfn) highest = e->first;
        return highest;
    }

    // Whether control can come from `bb` to E, which leads back to B, without passing B.
    bool is_in_loop(const BBLK* bb) const {
        std::unordered_set<const BBLK*> seen{B, E};
        std::vector<const BBLK*> work{E};
        while (!work.empty()) {
            const BBLK* at = work.back();
            work.pop_back();
            if (at == bb) return true;
            for (const EDGE* e = at->predecessors; e; e = e->rest)
                if (seen.insert(e->first).second) work.push_back(e->first);
        }
        return false;
    }

    // C: the last block ahead of E that leads to F; where nothing follows, the nearest one ahead of E that leads out.
    BBLK* end_of_stretch() const {
        if (F) {
            BBLK* highest = nullptr;
            for (const EDGE* e = F->predecessors; e; e = e->rest)
                if (e->first->dfn < E->dfn && (!highest || e->first->dfn > highest->dfn)) highest = e->first;
            return highest;
        }
        for (BBLK* bb = E->rdflink; bb && bb != currfuninfo->bb_list; bb = bb->rdflink) {
            if (!bb->successors) return bb;
            for (const EDGE* e = bb->successors; e; e = e->rest)
                if (e->first->dfn > E->dfn) return bb;
        }
        return nullptr;
    }

    // B: of the blocks up to C that E leads to, the last.
    BBLK* start_of_stretch() const {
        BBLK* highest = nullptr;
        for (const EDGE* e = E->successors; e; e = e->rest)
            if (e->first->dfn <= C->dfn && (!highest || e->first->dfn > highest->dfn)) highest = e->first;
        return highest;
    }

    BBLK *A = nullptr, *B = nullptr, *C = nullptr, *D = nullptr, *E, *F = nullptr;
};

// ---- A loop whose test still stands on top

constexpr int MAX_TEST_NODES = 12;

// The test of a loop on top of it, if it is cheap enough to stand twice with the few statements in front of it.
const NODE* test_on_top(const BBLK* head) {
    const NODE* test = head->branch();
    if (!test || test->op != IF || head->is_in_LIR_form() || nodes_of_tail(head) < 0) return nullptr;
    if (test->left->op == ENDLOOP || count_nodes_in_tree(test->left) > MAX_TEST_NODES) return nullptr;
    return test;
}

bool ends_in_jump_to(const BBLK* bb, const BBLK* target) {
    const NODE* control = bb->branch();
    return control && control->op == BRANCH && control->left->lbl->bblock == target && !bb->is_in_LIR_form();
}

// The blocks that jump to a test on top of a loop, and are to test for themselves.
struct TEST_TAKERS {
    std::vector<BBLK*> back;
    BBLK* ahead = nullptr;     // the one that leads into the loop, where all take the test
    BBLK* promising = nullptr; // the same, if it holds a promise about the loop
};

// A promise must be followed by the label of its loop: by the body's, if all who come to the test take a copy, the
// block ahead too, so that no label is left at the test.
bool find_takers(const NATURAL_LOOPS& loops, const BBLK* head, TEST_TAKERS* takers) {
    bool promises = false, all_jump = true;
    std::vector<BBLK*> ahead;
    for (const EDGE* e = head->predecessors; e; e = e->rest) {
        const bool is_back = loops.dominates(head, e->first), jumps = ends_in_jump_to(e->first, head);
        if (is_back && jumps) takers->back.push_back(e->first);
        if (!is_back) ahead.push_back(e->first);
        promises |= ends_in_promise(e->first);
        all_jump &= jumps;
    }
    if (takers->back.empty()) return false;
    if (!all_jump || ahead.size() != 1) return !promises;
    takers->ahead = ahead.front();
    if (!promises) return true;
    takers->promising = takers->ahead;
    return ends_in_promise(takers->promising);
}

// Puts `first`, and what must stand behind it, behind `promising`; false where that cannot be.
bool put_behind_promise(BBLK* promising, BBLK* first) {
    BBLK *const entry = currfuninfo->bb_list, *last = first;
    if (promising->dflink == first) return true;
    for (; ends_in_promise(last); last = last->dflink)
        if (last == promising || !last->dflink) return false;
    if (first == entry || last == promising || ends_in_promise(first->rdflink)) return false;
    BBLK *before = first->rdflink, *after = last->dflink;
    before->dflink = after;
    (after ? after : entry)->rdflink = before;
    BBLK* next = promising->dflink;
    promising->dflink = first;
    first->rdflink = promising;
    last->dflink = next;
    (next ? next : entry)->rdflink = last;
    return true;
}

BBLK* body_behind_test(const NATURAL_LOOPS& loops, const NATURAL_LOOP* loop, const NODE* test) {
    BBLK *left = test->right->left->lbl->bblock, *right = test->right->right->lbl->bblock;
    return loops.contains(loop, left) ? left : right;
}

// A copy of the test takes the jump's place: one conditional branch in each iteration instead of a test and a jump.
// True if a test is reached no more.
bool close_loops_by_tests() {
    need(fact::loops);
    const NATURAL_LOOPS& loops = *currfuninfo->loops; // kept until they are needed anew
    bool unreached = false;
    for (const auto& loop : loops.inner_first()) {
        const BBLK* head = loop->header;
        const NODE* test = test_on_top(head);
        if (!test || head == currfuninfo->bb_list) continue;
        TEST_TAKERS takers;
        if (!find_takers(loops, head, &takers)) continue;
        // Where no promise keeps it in its place, the layout closes a loop whose test does not stand alone.
        if (head->statements->rest && !takers.promising) continue;
        if (takers.promising && !put_behind_promise(takers.promising, body_behind_test(loops, loop.get(), test)))
            continue;
        if (takers.ahead) take_copy_of_tail(takers.ahead, loop->header);
        for (BBLK* bb : takers.back) take_copy_of_tail(bb, loop->header);
        unreached |= !head->predecessors;
    }
    return unreached;
}

} // namespace

void rotate_loops() {
    if (!currfuninfo->bb_list) return;
    renumber_bblocks();
    if (currfuninfo->bb_count < 3) return;
    bool changed = false;
    for (BBLK *E = currfuninfo->bb_list->rdflink, *before; E && E != currfuninfo->bb_list; E = before) {
        before = E->rdflink;
        ROTATION rotation(E);
        if (!rotation.find()) continue;
        rotation.apply();
        changed = true;
    }
    if (changed) renumber_bblocks();
    constexpr int SIZE_MATTERS_MOST = 1, SPEED_MATTERS = 3;
    if (opt_level() > 0 && size_speed_goal() > SIZE_MATTERS_MOST) {
        if (close_loops_by_tests()) rebuildcfg();
        if (skip_decided_entry_tests()) rebuildcfg(); // what a test led to alone is no longer there
        if (opt_level() >= 2 && size_speed_goal() >= SPEED_MATTERS && duplicate_tails()) {
            renumber_bblocks();
            if (skip_decided_entry_tests()) rebuildcfg();
        }
        lay_out_blocks();
    }
}
