// Data-flow equations over the blocks of the current function.
//
// The sets of a block are bit vectors of one width. In the direction of the flow, what comes into a block is the union, or
// the intersection, of what leaves its neighbours against that direction; what leaves it is what its transfer function
// makes of that. A transfer function that never takes more away for a larger set (use and definition, generation and
// kill) has one extreme solution, the least for unions and the greatest for intersections, and that is what is found.
// Source: G. A. Kildall, "A Unified Approach to Global Program Optimization", 1973.
#pragma once

#include "BITVEC/bitvec.h"
#include "OPT5/ir/side_table.h"

#include <functional>

enum class FLOW { FORWARD, BACKWARD };
enum class MEET { UNION, INTERSECTION };

class DATAFLOW {
public:
    // `boundary` comes into the function's entry, or, backward, into every block without successors. `transfer` takes the
    // set from one end of the block to the other.
    DATAFLOW(FLOW flow, MEET meet, const BITVEC& boundary, const std::function<void(BBLK*, BITVEC&)>& transfer);

    const BITVEC& at_entry(const BBLK* bb) const { return flow == FLOW::FORWARD ? into[bb] : out_of[bb]; }
    const BITVEC& at_exit(const BBLK* bb) const { return flow == FLOW::FORWARD ? out_of[bb] : into[bb]; }

private:
    BITVEC joined(const BBLK* bb) const;
    const EDGE* sources(const BBLK* bb) const { return flow == FLOW::FORWARD ? bb->predecessors : bb->successors; }
    const EDGE* sinks(const BBLK* bb) const { return flow == FLOW::FORWARD ? bb->successors : bb->predecessors; }
    bool is_boundary(const BBLK* bb) const;

    const FLOW flow;
    const MEET meet;
    const BITVEC boundary;
    SIDE_TABLE<BITVEC> into, out_of; // in the direction of the flow
};
