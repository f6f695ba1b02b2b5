#include "OPT5/ir/frontiers.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"

#include <algorithm>

FRONTIERS::FRONTIERS() {
    need(fact::dominators);
    frontier.resize(static_cast<size_t>(currfuninfo->bb_count) + 1);
    const std::vector<int>& idom = currfuninfo->dominators->idom;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (!bb->predecessors || !bb->predecessors->rest) continue;
        const int join = bb->dfn, end = idom[static_cast<size_t>(join)];
        for (const EDGE* e = bb->predecessors; e; e = e->rest)
            for (int from = e->first->dfn; from > 0 && from != end; from = idom[static_cast<size_t>(from)]) {
                std::vector<int>& f = frontier[static_cast<size_t>(from)];
                if (!f.empty() && f.back() == join) break; // and so have those above it
                f.push_back(join);
            }
    }
}

std::vector<int> FRONTIERS::iterated(const std::vector<int>& in) const {
    std::vector<int> found, waiting = in;
    std::vector<bool> is_found(frontier.size());
    while (!waiting.empty()) {
        const int bb = waiting.back();
        waiting.pop_back();
        for (int join : of(bb))
            if (!is_found[static_cast<size_t>(join)]) {
                is_found[static_cast<size_t>(join)] = true;
                found.push_back(join);
                waiting.push_back(join);
            }
    }
    std::sort(found.begin(), found.end());
    return found;
}
