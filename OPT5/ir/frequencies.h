// How often blocks and edges run, for one run of the current function, by the shape of the graph: a loop iterates eight
// times, a test leads rather into a loop and stays in it than behind it, and other targets of a branch are alike.
// Counts of a profile are in `ir/profile`.
//
// Needs block numbers and loops, and is of the graph as it was when it was made.
#pragma once

#include <cstddef>
#include <vector>

class BBLK;
class NATURAL_LOOPS;

class FREQUENCIES {
public:
    FREQUENCIES();
    double of(const BBLK* bb) const;
    double of_edge(const BBLK* from, const BBLK* to) const;
    bool is_back_edge(const BBLK* from, const BBLK* to) const;

private:
    struct ENTRY {
        double runs = 0;
        int depth = 0;                // of loops around it
        int deepest = 0;              // of the loops around its successors
        int likely = 0, unlikely = 0; // successors in the deepest loops, and others
    };
    const ENTRY& entry(const BBLK* bb) const;
    void describe_successors();
    void propagate();

    const NATURAL_LOOPS& loops;
    std::vector<ENTRY> entries; // by number
};
