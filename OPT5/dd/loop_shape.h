// The graph as the hierarchy needs it, and the loops in it. Used by the build alone.
#pragma once

#include <memory>
#include <vector>

struct LOOP;

// All loops of a function; `loops[0]` is the root once they are found.
struct HIERARCHY {
    std::vector<std::unique_ptr<struct LOOP>> loops;
};

// Blocks are inserted so that each loop has one back edge and each block closes one loop at most. False where the
// function can have no hierarchy: its entry is in a loop, or it has no loop where one is required.
bool shape_loops(bool require_loops);
// Finds the loops of a graph that `shape_loops` has made; each has a preheader and exit blocks afterwards, and the
// blocks are numbered. The root alone, marked, where the graph is irreducible.
std::unique_ptr<HIERARCHY> discover_loops();
