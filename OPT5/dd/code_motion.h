// Where an access is best placed so that one serves for several: partial redundancy elimination over a few candidates at
// once, in either direction.
//
// Forward, the occurrences are loads and one is inserted where a later one becomes redundant. Backward, they are stores: a
// store that is overwritten later is the mirror image of a load whose value is known already. What is inserted is never
// more than what is removed, on any path from the entry to the end.
//
// Sources: J. Knoop, O. Ruething, B. Steffen, "Lazy Code Motion", 1992; K.-H. Drechsler, M. P. Stadel, "A Variation of
// Knoop, Ruething and Steffen's Lazy Code Motion", 1993; R. Lo et al., "Register Promotion by Sparse Partial Redundancy
// Elimination of Loads and Stores", 1998.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

class BBLK;
class NATURAL_LOOPS;
class NODE;

using CANDIDATES = uint64_t; // a set of at most 64
constexpr size_t MOST_CANDIDATES = 64;

// The blocks of the current function by `dfn`, as the direction of the motion sees them.
struct MOTION_GRAPH {
    explicit MOTION_GRAPH(bool backward); // of the current function
    explicit MOTION_GRAPH(const std::vector<std::vector<size_t>>& after); // of numbers from 1 alone, seen forward

    const bool is_backward;
    std::vector<bool> is_closed; // by block: no statement can be put on some edge to its start
    std::vector<BBLK*> blocks; // [0] is null
    std::vector<std::vector<size_t>> before, after;
    std::vector<size_t> order;
};

// What a block does to the candidates, between its start and its end in the direction of the motion.
struct MOTION_SETS {
    CANDIDATES first = 0;   // has an occurrence that could stand at the start
    CANDIDATES last = 0;    // has one whose value is good at the end
    CANDIDATES passes = 0;  // what is good at the start is good at the end
    CANDIDATES demands = 0; // an occurrence at the end could stand at the start
    CANDIDATES closed = 0;  // none can be inserted on an edge to the start
    CANDIDATES cut = 0;     // nothing is kept across the start
};

// By the block at the end of an edge and its place among what is before that.
using INSERTIONS = std::vector<std::vector<CANDIDATES>>;

class MOTION {
public:
    explicit MOTION(const MOTION_GRAPH& graph);
    std::vector<MOTION_SETS> sets; // by block; filled by the caller, but for what the graph closes

    // An occurrence is certain to follow each start of a block, before anything that bars it.
    std::vector<CANDIDATES> anticipated() const;
    // The value is good at the start of the block, on each path to it.
    std::vector<CANDIDATES> available(const INSERTIONS& inserted) const;
    INSERTIONS no_insertions() const;
    INSERTIONS latest_insertions() const;
    // The same without any on the edge from a loop back to its header: it would run in each iteration, in a block of its
    // own, for the sake of the first one. `loops` are of the graph.
    INSERTIONS latest_insertions_off_back_edges(const NATURAL_LOOPS& loops);

private:
    CANDIDATES leaves(size_t b, CANDIDATES at_start) const { return sets[b].last | (at_start & sets[b].passes); }

    const MOTION_GRAPH& graph;
};

// Where a value is kept in a register, forward: its reads and the places that set it anew, of each block, and on edges.
struct VALUE_LIFE {
    explicit VALUE_LIFE(const MOTION& motion);
    std::vector<CANDIDATES> reads; // ahead of any place of the block that sets it
    std::vector<CANDIDATES> sets;
    INSERTIONS edge_reads, edge_sets;

    // The reads still to come at the end of each block, of a graph that is seen forward.
    std::vector<CANDIDATES> live_at_end(const MOTION_GRAPH& graph) const;
};

// Statements on edges, put where they run if control takes the edge: at the end of the block before, at the start of
// the block behind, or in a block of their own.
class EDGE_STATEMENTS {
public:
    // Whether that is possible: an edge out of the dispatch of exceptions is left alone, and none is split between a
    // promise and its loop.
    static bool may_insert(BBLK* from, BBLK* to);
    void add(BBLK* from, BBLK* to, NODE* statement);
    // Puts all of them in. The numbers of blocks are right behind it.
    void insert();
    bool empty() const { return all.empty(); }

private:
    struct ENTRY {
        BBLK *from, *to;
        NODE* statement;
    };
    std::vector<ENTRY> all;
};
