// The natural loops of the current function's graph, and the place ahead of one.
//
// A back edge leads to a block that dominates its source; the loop of a header is what reaches a back edge to it
// without passing the header. Cycles that are entered in two places are no loops here.
//
// `fact::loops` keeps them in FUNINFO::loops. A pass that splits edges in the middle of its work keeps using the record
// that it holds: the block that `preheader` makes is entered in it.
#pragma once

#include <cstddef>
#include <memory>
#include <vector>

class BBLK;

struct NATURAL_LOOP {
    BBLK* header = nullptr;
    std::vector<BBLK*> blocks; // the header first; those of inner loops too
    std::vector<BBLK*> latches;
    NATURAL_LOOP* parent = nullptr;
    int inside = 0;           // levels of loops in it
    bool is_reducible = true; // no cycle in it but through headers
};

class NATURAL_LOOPS {
public:
    NATURAL_LOOPS(); // of the current function, whose blocks are numbered
    const std::vector<std::unique_ptr<NATURAL_LOOP>>& inner_first() const { return loops; }
    // The innermost loop around a block, or null.
    NATURAL_LOOP* around(const BBLK* bb) const;
    bool contains(const NATURAL_LOOP* loop, const BBLK* bb) const;
    // Of blocks that the graph had at construction.
    bool dominates(const BBLK* a, const BBLK* b) const;
    // Whether there is a cycle that is no natural loop: it is entered in two places.
    bool has_other_cycles() const { return other_cycles; }
    bool dominates_latches(const BBLK* bb, const NATURAL_LOOP* loop) const;

    // The block whose one successor is the header, and which every entry of the loop passes. Made if there is none: the
    // numbers of the blocks are stale then. Null where it would stand between a pragma and the loop that it speaks of.
    BBLK* preheader(NATURAL_LOOP* loop);
    bool has_split_edges() const { return split; }

private:
    void number_dominator_tree();
    void find_back_edges();
    void collect(NATURAL_LOOP* loop);
    void nest();
    void mark_irreducible();
    size_t slot(const BBLK* bb) const;

    std::vector<BBLK*> original; // by number
    std::vector<std::unique_ptr<NATURAL_LOOP>> loops;
    std::vector<int> first, last;         // numbers of the walk over the dominator tree, by block
    std::vector<NATURAL_LOOP*> innermost; // by block
    bool split = false;
    bool other_cycles = false;
};
