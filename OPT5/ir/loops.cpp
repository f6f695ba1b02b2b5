#include "OPT5/ir/loops.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"

#include <algorithm>

LOOP_CALLBACKS loop_callbacks;

size_t NATURAL_LOOPS::slot(const BBLK* bb) const { return static_cast<size_t>(bb->dfn); }

NATURAL_LOOPS::NATURAL_LOOPS() {
    need(fact::dominators);
    const auto count = static_cast<size_t>(currfuninfo->bb_count) + 1;
    original.resize(count);
    innermost.resize(count);
    first.resize(count);
    last.resize(count);
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) original[slot(bb)] = bb;
    number_dominator_tree();
    find_back_edges();
    nest();
    mark_irreducible();
}

void NATURAL_LOOPS::number_dominator_tree() {
    int n = 0;
    currfuninfo->dominators->depth_first_doms([&](BBLK* bb) { first[slot(bb)] = ++n; },
                                              [&](BBLK* bb) { last[slot(bb)] = n; });
}

bool NATURAL_LOOPS::dominates(const BBLK* a, const BBLK* b) const {
    const int at = first[slot(b)];
    return at && first[slot(a)] && first[slot(a)] <= at && at <= last[slot(a)];
}

bool NATURAL_LOOPS::dominates_latches(const BBLK* bb, const NATURAL_LOOP* loop) const {
    return std::all_of(loop->latches.begin(), loop->latches.end(), [&](const BBLK* l) { return dominates(bb, l); });
}

// ---- The loops

void NATURAL_LOOPS::find_back_edges() {
    for (BBLK* header = currfuninfo->bb_list; header; header = header->dflink) {
        auto loop = std::make_unique<NATURAL_LOOP>();
        for (const EDGE* e = header->predecessors; e; e = e->rest)
            if (dominates(header, e->first)) loop->latches.push_back(e->first);
        if (loop->latches.empty()) continue;
        loop->header = header;
        collect(loop.get());
        loops.push_back(std::move(loop));
    }
}

void NATURAL_LOOPS::collect(NATURAL_LOOP* loop) {
    loop->blocks.push_back(loop->header);
    BLOCK_SET is_in;
    is_in.add(loop->header);
    auto enter = [&](BBLK* bb) {
        if (first[slot(bb)] && is_in.add(bb)) loop->blocks.push_back(bb);
    };
    for (BBLK* latch : loop->latches) enter(latch);
    for (size_t i = 1; i < loop->blocks.size(); ++i)
        for (const EDGE* e = loop->blocks[i]->predecessors; e; e = e->rest) enter(e->first);
    std::sort(loop->blocks.begin() + 1, loop->blocks.end(),
              [](const BBLK* a, const BBLK* b) { return a->dfn < b->dfn; });
}

// Of two loops with a block in common the smaller lies in the other.
void NATURAL_LOOPS::nest() {
    std::stable_sort(loops.begin(), loops.end(),
                     [](const auto& a, const auto& b) { return a->blocks.size() < b->blocks.size(); });
    std::vector<NATURAL_LOOP*> outermost(original.size(), nullptr);
    for (const auto& owned : loops) {
        NATURAL_LOOP* loop = owned.get();
        for (BBLK* bb : loop->blocks) {
            NATURAL_LOOP*& outer = outermost[slot(bb)];
            if (!outer)
                innermost[slot(bb)] = loop;
            else if (!outer->parent) {
                outer->parent = loop;
                loop->inside = std::max(loop->inside, outer->inside + 1);
            }
            outer = loop;
        }
    }
}

// An edge back to a block that the walk is still in, but which does not dominate its source, closes a cycle with
// another entry.
void NATURAL_LOOPS::mark_irreducible() {
    enum { UNSEEN, OPEN, DONE };
    std::vector<char> state(original.size(), UNSEEN);
    std::vector<std::pair<BBLK*, EDGE*>> path;
    auto open = [&](BBLK* bb) {
        state[slot(bb)] = OPEN;
        path.emplace_back(bb, bb->successors);
    };
    open(currfuninfo->bb_list);
    while (!path.empty()) {
        auto& [from, rest] = path.back();
        if (!rest) {
            state[slot(from)] = DONE;
            path.pop_back();
            continue;
        }
        BBLK* to = rest->first;
        rest = rest->rest;
        if (state[slot(to)] == UNSEEN)
            open(to);
        else if (state[slot(to)] == OPEN && !dominates(to, from)) {
            other_cycles = true;
            for (NATURAL_LOOP* loop = innermost[slot(to)]; loop; loop = loop->parent)
                if (contains(loop, from)) loop->is_reducible = false;
        }
    }
}

NATURAL_LOOP* NATURAL_LOOPS::around(const BBLK* bb) const { return innermost[slot(bb)]; }

bool NATURAL_LOOPS::contains(const NATURAL_LOOP* loop, const BBLK* bb) const {
    const NATURAL_LOOP* l = around(bb);
    while (l && l != loop) l = l->parent;
    return l != nullptr;
}

// ---- Preheaders

BBLK* NATURAL_LOOPS::preheader(NATURAL_LOOP* loop) {
    std::vector<BBLK*> outside;
    for (const EDGE* e = loop->header->predecessors; e; e = e->rest)
        if (!contains(loop, e->first)) outside.push_back(e->first);
    if (outside.empty() || loop->header == currfuninfo->bb_list) return nullptr;
    BBLK* before = outside.front();
    if (outside.size() == 1 && !before->successors->rest && before->branch()->op == BRANCH) return before;
    for (const BBLK* bb : outside)
        if (ends_in_promise(bb) || bb->is_in_LIR_form() || tree_is_EH_SWITCH(bb->branch())) return nullptr;
    split = true;
    BBLK* ahead = split_cfg_edge(before, loop->header, false);
    for (size_t i = 1; i < outside.size(); ++i) {
        disconnect(outside[i], loop->header);
        subst_bb_for_bb_in_bb(ahead, loop->header, outside[i]);
        connect(outside[i], ahead);
    }
    ahead->dfn = static_cast<int>(original.size());
    original.push_back(ahead);
    innermost.push_back(loop->parent);
    first.push_back(0); // dominates nothing that is asked about
    last.push_back(0);
    for (NATURAL_LOOP* outer = loop->parent; outer; outer = outer->parent) outer->blocks.push_back(ahead);
    return ahead;
}

// ---- The fact

namespace {

void find(FACTS) { currfuninfo->loops = std::make_unique<NATURAL_LOOPS>(); }

bool still_hold() {
    const std::unique_ptr<NATURAL_LOOPS> known = std::move(currfuninfo->loops);
    find(fact::loops);
    const auto &a = known->inner_first(), &b = currfuninfo->loops->inner_first();
    return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](const auto& x, const auto& y) {
        return x->header == y->header && x->blocks == y->blocks && x->latches == y->latches;
    });
}

const FACT_FINDER loops("loops", fact::loops, fact::dominators, find, [] { currfuninfo->loops.reset(); }, still_hold);

} // namespace
