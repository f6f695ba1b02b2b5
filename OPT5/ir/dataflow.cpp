#include "OPT5/ir/dataflow.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"

#include <algorithm>

namespace {

BITVEC extreme(MEET meet, uint32_t bits) {
    BITVEC set(bits);
    if (meet == MEET::INTERSECTION) set.set_all();
    return set;
}

} // namespace

bool DATAFLOW::is_boundary(const BBLK* bb) const {
    return flow == FLOW::FORWARD ? bb == currfuninfo->bb_list : !bb->successors;
}

BITVEC DATAFLOW::joined(const BBLK* bb) const {
    BITVEC set = is_boundary(bb) ? boundary : extreme(meet, boundary.bits);
    for (const EDGE* e = sources(bb); e; e = e->rest) {
        if (meet == MEET::UNION)
            set |= out_of[e->first];
        else
            set &= out_of[e->first];
    }
    return set;
}

// Blocks wait on a stack, at first in an order in which an acyclic graph takes one visit a block.
DATAFLOW::DATAFLOW(FLOW flow, MEET meet, const BITVEC& boundary, const std::function<void(BBLK*, BITVEC&)>& transfer)
    : flow(flow), meet(meet), boundary(boundary), into(extreme(meet, boundary.bits)), out_of(extreme(meet, boundary.bits)) {
    std::vector<BBLK*> waiting;
    BLOCK_SET is_waiting;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        waiting.push_back(bb);
        is_waiting.add(bb);
    }
    if (flow == FLOW::FORWARD) std::reverse(waiting.begin(), waiting.end());
    while (!waiting.empty()) {
        BBLK* bb = waiting.back();
        waiting.pop_back();
        is_waiting.remove(bb);
        BITVEC set = joined(bb);
        into[bb] = set;
        transfer(bb, set);
        if (set == out_of[bb]) continue;
        out_of[bb] = set;
        for (const EDGE* e = sinks(bb); e; e = e->rest)
            if (is_waiting.add(e->first)) waiting.push_back(e->first);
    }
}
