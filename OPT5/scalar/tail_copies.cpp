// Tails: what stands at the end of several paths is copied to the end of one.
//
//     if (c) { A } else { B }  T; if (d) goto L;      becomes     if (c) { A; T; if (d) goto L } else { B; T; if (d)
//     ... }
//
// The block that jumps to a small one that ends in a test or a return takes a copy of it in place of the jump. Of the
// blocks that jump there the one that runs most keeps the original, which the layout lets it fall into.
//
// Needs: block numbers and loops. Leaves: a graph without block numbers where anything was copied.
// Sound because the copy runs the same statements to the same targets. What must stand once in a function, what marks
// its place in the text, and the header of a loop, which would get a second one, are not copied.
//
// Growth is bounded: a tail is a few nodes, all copies together a part of the function, dearest jumps first.

#include "OPT5/scalar/tail_copies.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frequencies.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/lowering.h"

#include <algorithm>
#include <vector>

namespace {

constexpr int LARGEST_TAIL = 24;      // nodes of what is copied
constexpr int LEAST_GROWTH = 64;      // nodes that any function may grow by
constexpr int SHARE_OF_FUNCTION = 12; // and beyond that one in so many of its own

bool may_be_copied(NODE* t) {
    switch (t->op) {
    case PPRAGMA:
    case ASM:
    case LABELDEF:
    case LOOP:
    case PCOMMA:
    case ASSERT:
    case NASSERT: return false;
    default: return !tree_contains_op(t, ASM) && !tree_is_arg_prolog(t) && !calls_setjmp(t);
    }
}

} // namespace

int nodes_of_tail(const BBLK* bb) {
    int nodes = 0;
    for (const LIST* s = bb->statements; s->rest; s = s->rest) {
        if (!may_be_copied(s->first)) return -1;
        nodes += count_nodes_in_tree(s->first);
        if (nodes > LARGEST_TAIL) return -1;
    }
    return nodes;
}

int growth_by_copies() {
    int nodes = 0;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest) nodes += count_nodes_in_tree(s->first);
    return LEAST_GROWTH + nodes / SHARE_OF_FUNCTION;
}

LIST* copy_of_tail(const BBLK* bb, NODE* control) {
    LIST *tail = nullptr, **end = &tail;
    const LIST* s = bb->statements;
    for (; s->rest; s = s->rest, end = &(*end)->rest) *end = mkelist(copy_tree(s->first), nullptr, s->psn);
    *end = mkelist(control, nullptr, s->psn);
    return tail;
}

void take_copy_of_tail(BBLK* bb, BBLK* tail) {
    NODE* control = copy_tree(tail->branch());
    LIST* copy = copy_of_tail(tail, control);
    LIST* jump = bb->last_statement();
    disconnect(bb, tail);
    erase_tree(jump->first);
    *jump = *copy;
    delete copy;
    set_statements(bb, bb->statements); // they have another end
    fixup_edge_lists(bb, control);
}

namespace {

constexpr double SELDOM = 0.5; // runs of a jump that is let stand

struct CANDIDATE {
    BBLK *from, *tail;
    int nodes;
    double saves; // jumps
};

class TAIL_COPIES {
public:
    bool run() {
        std::vector<CANDIDATE> all;
        for (BBLK* bb = currfuninfo->bb_list->dflink; bb; bb = bb->dflink) collect(bb, &all);
        std::stable_sort(all.begin(), all.end(),
                         [](const CANDIDATE& a, const CANDIDATE& b) { return a.saves * b.nodes > b.saves * a.nodes; });
        int growth_left = all.empty() ? 0 : growth_by_copies();
        bool changed = false;
        for (const CANDIDATE& c : all) {
            if (c.nodes > growth_left) continue;
            growth_left -= c.nodes;
            take_copy_of_tail(c.from, c.tail);
            changed = true;
        }
        return changed;
    }

private:
    static bool jumps_to(const BBLK* bb, const BBLK* tail) {
        const NODE* control = bb->branch();
        return control && control->op == BRANCH && control->left->lbl->bblock == tail && !bb->is_in_LIR_form();
    }

    // The branches that a copy saves each time: where it ends in a test, the colder target takes a jump of its own.
    double gain_of(const BBLK* tail) const {
        const NODE* control = tail->branch();
        if (!control || tail->is_in_LIR_form() || frequencies.of(tail) <= 0) return 0;
        if (control->op == RETURN) return may_be_copied(tail->branch()) ? 1 : 0;
        if (control->op != IF || control->left->op == ENDLOOP || !may_be_copied(tail->branch()) ||
            edge_length(tail->successors) != 2)
            return 0;
        const BBLK *a = tail->successors->first, *b = tail->successors->rest->first;
        return 1 - std::min(frequencies.of_edge(tail, a), frequencies.of_edge(tail, b)) / frequencies.of(tail);
    }

    bool is_header(const BBLK* bb) const {
        const NATURAL_LOOP* loop = loops.around(bb);
        return loop && loop->header == bb;
    }

    void collect(BBLK* tail, std::vector<CANDIDATE>* all) const {
        const double gain = gain_of(tail);
        if (gain <= 0 || !tail->predecessors || !tail->predecessors->rest || is_header(tail)) return;
        int nodes = nodes_of_tail(tail);
        if (nodes < 0 || ends_in_promise(tail)) return;
        nodes += count_nodes_in_tree(tail->branch());
        if (nodes > LARGEST_TAIL) return;
        std::vector<BBLK*> from;
        for (const EDGE* e = tail->predecessors; e; e = e->rest)
            if (jumps_to(e->first, tail)) from.push_back(e->first);
        if (from.empty()) return;
        std::stable_sort(from.begin(), from.end(), [this](const BBLK* a, const BBLK* b) {
            return frequencies.of(a) != frequencies.of(b) ? frequencies.of(a) > frequencies.of(b) : a->dfn < b->dfn;
        });
        for (auto bb = from.begin() + 1; bb != from.end(); ++bb)
            if (frequencies.of(*bb) >= SELDOM && !ends_in_promise(*bb))
                all->push_back({*bb, tail, nodes, frequencies.of(*bb) * gain});
    }

    const FREQUENCIES frequencies;
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
};

} // namespace

bool duplicate_tails() { return TAIL_COPIES().run(); }
