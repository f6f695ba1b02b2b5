// Layout of loops, ahead of the output: one conditional branch closes a loop.
//
// Needs: block numbers, which are layout positions here. Leaves: them.
// Sound because the order of blocks in the output means nothing by itself: the writer adds a jump where a block does not
// fall into its successor. Only a pragma that promises something of the loop behind it in the text depends on the
// layout, so no block moves in between.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
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
// becomes A, D .. E, B .. C, F: A jumps to B once, and C closes the loop with its conditional branch back to D. A block's
// dfn is its place in the layout.
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

// The test that a jump back leads to, if it is all of its block and cheap enough to stand twice.
const NODE* test_on_top(const BBLK* bb) {
    const NODE* control = bb->branch();
    if (!control || control->op != BRANCH) return nullptr;
    const BBLK* head = control->left->lbl->bblock;
    const LIST* test = head->statements;
    if (head->dfn > bb->dfn || bb->dflink == head || !test || test->rest || test->first->op != IF) return nullptr;
    if (test->first->left->op == ENDLOOP || count_nodes_in_tree(test->first->left) > MAX_TEST_NODES) return nullptr;
    for (const EDGE* e = head->predecessors; e; e = e->rest)
        if (ends_in_promise(e->first)) return nullptr;
    return test->first;
}

// Its copy takes the jump's place: one conditional branch in each iteration instead of a test and a jump.
void close_loops_by_tests() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (bb->is_in_LIR_form()) continue;
        const NODE* test = test_on_top(bb);
        if (!test) continue;
        LIST* last = bb->last_statement();
        disconnect(bb, last->first->left->lbl->bblock);
        erase_tree(last->first);
        last->first = copy_tree(test);
        fixup_edge_lists(bb, last->first);
    }
}

// ---- What a loop leaves to stands behind it

constexpr int MAX_RUN = 32; // blocks

bool falls_through(const BBLK* bb) { return bb->dflink && edge_memberp(bb->dflink, bb->successors); }

// The blocks from `first` that control falls along; null if that holds `without` or the entry, or is long. `first`
// itself must not be fallen into.
BBLK* end_of_run(BBLK* first, const BBLK* without) {
    if (first == currfuninfo->bb_list || falls_through(first->rdflink) || ends_in_promise(first->rdflink))
        return nullptr;
    BBLK* last = first;
    for (int n = 0; last != without; last = last->dflink) {
        if (!falls_through(last)) return ends_in_promise(last) ? nullptr : last;
        if (++n == MAX_RUN) break;
    }
    return nullptr;
}

void move_run(BBLK* first, BBLK* last, BBLK* behind) {
    BBLK* const entry = currfuninfo->bb_list;
    BBLK *before = first->rdflink, *after = last->dflink, *next = behind->dflink;
    before->dflink = after;
    (after ? after : entry)->rdflink = before;
    behind->dflink = first;
    first->rdflink = behind;
    last->dflink = next;
    (next ? next : entry)->rdflink = last;
}

// A body that ends in a jump ahead to its loop's test costs that jump in each iteration. Where nothing falls into it, it
// moves in front of the test, and what stood there jumps once.
void put_bodies_before_tests() {
    std::vector<BBLK*> jumps;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (bb->branch() && bb->branch()->op == BRANCH && !falls_through(bb)) jumps.push_back(bb);
    for (BBLK* bb : jumps) {
        BBLK* test = bb->successors->first;
        if (test->dfn <= bb->dfn || test->branch()->op != IF || falls_through(bb) || ends_in_promise(test->rdflink))
            continue;
        for (const EDGE* e = test->successors; e; e = e->rest) {
            if (e->first->dfn > bb->dfn || end_of_run(e->first, test) != bb) continue;
            move_run(e->first, bb, test->rdflink);
            break;
        }
    }
}

// A test neither of whose targets is the next block costs a jump on one of its edges. Where no block falls into the one
// that the loop is left to, that moves behind the test, and staying in the loop takes one conditional branch.
void put_exits_behind_tests() {
    std::vector<BBLK*> tests;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        const NODE* control = bb->branch();
        if (control && control->op == IF && control->left->op != ENDLOOP && !falls_through(bb) &&
            edge_length(bb->successors) == 2)
            tests.push_back(bb);
    }
    for (BBLK* bb : tests) {
        BBLK *exit = bb->successors->first, *stay = bb->successors->rest->first;
        // Of two back edges the one to the nearer header stays in the inner loop.
        if (stay->dfn > bb->dfn || (exit->dfn <= bb->dfn && exit->dfn > stay->dfn)) std::swap(exit, stay);
        if (falls_through(bb) || stay->dfn > bb->dfn) continue; // moved meanwhile, or no loop
        BBLK* last = end_of_run(exit, bb);
        if (last && last != bb) move_run(exit, last, bb);
    }
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
    constexpr int SIZE_MATTERS_MOST = 1;
    if (opt_level() > 0 && size_speed_goal() > SIZE_MATTERS_MOST) {
        close_loops_by_tests();
        put_bodies_before_tests();
        skip_decided_entry_tests();
        put_exits_behind_tests();
        renumber_bblocks();
    }
}
