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

// By block, of the graph seen forward: nothing behind it is certain to come. A path that never comes to an end of the
// function could be said to contain anything: it is cut at the header of the loop that has no exit or, where cycles are no
// natural loops, wherever no end is reached.
std::vector<bool> dead_ends(const MOTION_GRAPH& forward, const NATURAL_LOOPS& loops);

// What a block does to the candidates, between its start and its end in the direction of the motion.
struct MOTION_SETS {
    CANDIDATES ANTLOC = 0;  // has an occurrence that could stand at the start
    CANDIDATES AVLOC = 0;   // has one whose value is good at the end
    CANDIDATES passes = 0;  // what is good at the start is good at the end
    CANDIDATES demands = 0; // an occurrence at the end could stand at the start
    CANDIDATES closed = 0;  // none can be inserted on an edge to the start
    CANDIDATES cut = 0;     // nothing is kept across the start
};

// By the block at the end of an edge and its place among what is before that.
using INSERTIONS = std::vector<std::vector<CANDIDATES>>;

// A place where a candidate occurs, or where what it stands for may change.
struct MOTION_EVENT {
    enum KIND : uint8_t { USE, DEF, KILL, STEP }; // STEP: it changes by an amount, and the temporary may go along
    KIND kind;
    size_t block;
    int order;                   // of the statement in its block
    bool is_conditional = false; // it is not certain that the statement evaluates it
    bool is_new = false;         // a use that is not there yet, to be made at the end of the block
    // What was decided. Local: by what the block itself does ahead of it.
    bool is_deleted = false, is_saved = false, is_local = false;
};

// The events, in the order of blocks, a block at a time: `visit(block, begin, end)`.
template <class EVENTS, class F>
void for_each_block(const EVENTS& events, F&& visit) {
    for (size_t begin = 0, end; begin < events.size(); begin = end) {
        for (end = begin + 1; end < events.size() && events[end].block == events[begin].block;) ++end;
        visit(events[begin].block, begin, end);
    }
}

struct VALUE_LIFE;

class MOTION {
public:
    explicit MOTION(const MOTION_GRAPH& graph);
    std::vector<MOTION_SETS> sets; // by block; filled by the caller, but for what the graph closes

    // Enters the events of a block. What may trap does not move ahead of a statement of the order `first_stop` or later,
    // which may not pass control on.
    template <class EVENTS>
    void enter_block(CANDIDATES bit, const EVENTS& events, size_t begin, size_t end, int first_stop);

    // An occurrence is certain to follow each start of a block, before anything that bars it.
    std::vector<CANDIDATES> compute_ANTIN() const;
    // The value is good at the start of the block, on each path to it, and at its end.
    struct AVAILABLE {
        std::vector<CANDIDATES> AVIN, AVOUT;
    };
    AVAILABLE compute_AVOUT(const INSERTIONS& inserted) const;
    INSERTIONS no_insertions() const;
    INSERTIONS latest_insertions() const;
    // The same without any on the edge from a loop back to its header: it would run in each iteration, in a block of its
    // own, for the sake of the first one. `loops` are of the graph.
    INSERTIONS latest_insertions_off_back_edges(const NATURAL_LOOPS& loops);

private:
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

template <class EVENTS>
void MOTION::enter_block(CANDIDATES bit, const EVENTS& events, size_t begin, size_t end, int first_stop) {
    MOTION_SETS& s = sets[events[begin].block];
    bool is_changed = false;
    for (size_t i = begin; i < end; ++i) {
        const MOTION_EVENT& e = events[i];
        if (e.kind == MOTION_EVENT::STEP) continue;
        if (e.kind == MOTION_EVENT::USE) {
            if (e.is_conditional) continue;
            if (!is_changed && e.order <= first_stop) s.ANTLOC |= bit;
            s.AVLOC |= bit;
            continue;
        }
        is_changed = true;
        s.demands &= ~bit;
        s.passes &= ~bit;
        if (e.kind == MOTION_EVENT::DEF)
            s.AVLOC |= bit;
        else
            s.AVLOC &= ~bit;
    }
}

// Which uses have their value, and so are deleted. Whether any is that was there.
template <class EVENTS>
bool decide_reads(EVENTS& events, CANDIDATES bit, const std::vector<CANDIDATES>& known, VALUE_LIFE& life) {
    bool any_deleted = false;
    for_each_block(events, [&](size_t b, size_t begin, size_t end) {
        bool is_known = known[b] & bit, is_local = false, is_set = false;
        for (size_t i = begin; i < end; ++i) {
            MOTION_EVENT& e = events[i];
            if (e.kind == MOTION_EVENT::STEP) continue;
            if (e.kind == MOTION_EVENT::USE) {
                e.is_deleted = is_known;
                e.is_local = is_local;
                any_deleted |= is_known && !e.is_new;
                if (is_known && !e.is_new && !is_set) life.reads[b] |= bit;
                if (e.is_conditional || is_known) continue;
            }
            is_known = e.kind != MOTION_EVENT::KILL;
            is_local = is_set = true;
        }
        if (is_set) life.sets[b] |= bit;
    });
    return any_deleted;
}

// Which occurrences set the temporary: those whose value is read from it. Which steps it takes: those ahead of a read.
template <class EVENTS>
void decide_saves(EVENTS& events, CANDIDATES bit, const std::vector<CANDIDATES>& live_at_end) {
    for_each_block(events, [&](size_t b, size_t begin, size_t end) {
        bool is_live = live_at_end[b] & bit;
        for (size_t i = end; i-- > begin;) {
            MOTION_EVENT& e = events[i];
            if (e.kind == MOTION_EVENT::STEP)
                e.is_saved = is_live;
            else if (e.kind == MOTION_EVENT::USE && e.is_deleted)
                is_live |= !e.is_new;
            else if (!e.is_conditional) {
                e.is_saved = is_live && e.kind != MOTION_EVENT::KILL;
                is_live = false;
            }
        }
    });
}

// Statements on edges, put where they run if control takes the edge: at the end of the block before, at the start of
// the block behind, or in a block of their own.
class EDGE_STATEMENTS {
public:
    // Whether that is possible: an edge out of the dispatch of exceptions is left alone, and none is split between a
    // promise and its loop.
    static bool may_insert(BBLK* from, BBLK* to);
    void add(BBLK* from, BBLK* to, NODE* statement);
    // Puts all of them in. True if that took blocks of their own; the numbers of blocks are right then.
    bool insert_useful_blocks();
    bool empty() const { return all.empty(); }

private:
    struct ENTRY {
        BBLK *from, *to;
        NODE* statement;
    };
    std::vector<ENTRY> all;
};
