// Dominance frontiers: where values that come along different edges meet.
#pragma once

#include <cstddef>
#include <vector>

class BBLK;

// Of the current function's blocks by number, which `fact::dominators` numbers.
//
// Source: K. D. Cooper, T. J. Harvey, K. Kennedy, "A Simple, Fast Dominance Algorithm", 2001.
class FRONTIERS {
public:
    FRONTIERS();
    const std::vector<int>& of(int dfn) const { return frontier[static_cast<std::size_t>(dfn)]; }
    // The blocks at whose start a value that is set in the blocks `in` may be one of several, in ascending order.
    std::vector<int> iterated(const std::vector<int>& in) const;

private:
    std::vector<std::vector<int>> frontier;
};
