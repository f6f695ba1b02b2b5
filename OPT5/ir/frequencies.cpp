#include "OPT5/ir/frequencies.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/side_table.h"

#include <algorithm>

namespace {

constexpr double ITERATIONS = 8;

const NATURAL_LOOPS& current_loops() {
    need(fact::loops);
    return *currfuninfo->loops;
}

std::vector<BBLK*> reverse_postorder() {
    std::vector<BBLK*> order;
    std::vector<std::pair<BBLK*, const EDGE*>> path;
    BLOCK_SET seen;
    auto open = [&](BBLK* bb) {
        if (seen.add(bb)) path.emplace_back(bb, bb->successors);
    };
    open(currfuninfo->bb_list);
    while (!path.empty()) {
        auto& [bb, rest] = path.back();
        if (!rest) {
            order.push_back(bb);
            path.pop_back();
            continue;
        }
        BBLK* next = rest->first;
        rest = rest->rest;
        open(next);
    }
    std::reverse(order.begin(), order.end());
    return order;
}

} // namespace

const FREQUENCIES::ENTRY& FREQUENCIES::entry(const BBLK* bb) const { return entries[static_cast<size_t>(bb->dfn)]; }

FREQUENCIES::FREQUENCIES() : loops(current_loops()), entries(static_cast<size_t>(currfuninfo->bb_count) + 1) {
    describe_successors();
    propagate();
}

void FREQUENCIES::describe_successors() {
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const NATURAL_LOOP* loop = loops.around(bb); loop; loop = loop->parent)
            ++entries[static_cast<size_t>(bb->dfn)].depth;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        ENTRY& own = entries[static_cast<size_t>(bb->dfn)];
        for (const EDGE* e = bb->successors; e; e = e->rest) own.deepest = std::max(own.deepest, entry(e->first).depth);
        for (const EDGE* e = bb->successors; e; e = e->rest)
            (entry(e->first).depth == own.deepest ? own.likely : own.unlikely)++;
    }
}

// Along edges that do not lead back; an edge into a cycle that is no loop may count for nothing.
void FREQUENCIES::propagate() {
    const std::vector<BBLK*> order = reverse_postorder();
    SIDE_TABLE<size_t> place(order.size());
    for (size_t i = 0; i < order.size(); ++i) place[order[i]] = i;
    entries[static_cast<size_t>(currfuninfo->bb_list->dfn)].runs = 1;
    for (size_t i = 0; i < order.size(); ++i) {
        ENTRY& own = entries[static_cast<size_t>(order[i]->dfn)];
        for (const EDGE* e = order[i]->predecessors; e; e = e->rest)
            if (place[e->first] < i) own.runs += of_edge(e->first, order[i]);
        const NATURAL_LOOP* loop = loops.around(order[i]);
        if (loop && loop->header == order[i]) own.runs *= ITERATIONS;
    }
}

double FREQUENCIES::of(const BBLK* bb) const { return entry(bb).runs; }

double FREQUENCIES::of_edge(const BBLK* from, const BBLK* to) const {
    const ENTRY& own = entry(from);
    const bool is_likely = entry(to).depth == own.deepest;
    double share = 1;
    if (own.likely && own.unlikely) share = is_likely ? 1 - 1 / ITERATIONS : 1 / ITERATIONS;
    return own.runs * share / (is_likely ? own.likely : own.unlikely);
}

bool FREQUENCIES::is_back_edge(const BBLK* from, const BBLK* to) const { return loops.dominates(to, from); }
