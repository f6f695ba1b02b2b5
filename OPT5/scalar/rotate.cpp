// Layout of loops, ahead of the output.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

#include <algorithm>

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

// The neighbours' numbers below stand for layout positions: after `renumber_bblocks` a block's dfn is its place.
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
        return A != nullptr && B->dfn <= C->dfn;
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

    // The block whose way leads to F, the loop's test on top; without a next block, the nearest one before E that
    // control does not fall out of.
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

    BBLK* start_of_stretch() const {
        BBLK* highest = nullptr;
        for (const EDGE* e = E->successors; e; e = e->rest)
            if (e->first->dfn <= C->dfn && (!highest || e->first->dfn > highest->dfn)) highest = e->first;
        return highest;
    }

    BBLK *A = nullptr, *B = nullptr, *C = nullptr, *D = nullptr, *E, *F = nullptr;
};

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
}
