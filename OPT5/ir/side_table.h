// Something for each block while a pass runs, beside the blocks and not in them.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"

#include <vector>

// A vector by serial number: constant time, no hashing, no field of the block that two passes could both take for theirs.
// A block that was made since has the value that every block began with.
template <class V>
class SIDE_TABLE {
public:
    explicit SIDE_TABLE(const V& initial = V()) : initial(initial), values(currfuninfo->objects.size(), initial) {}

    typename std::vector<V>::reference operator[](const BBLK* bb) {
        if (bb->serial >= values.size()) values.resize(bb->serial + 1, initial);
        return values[bb->serial];
    }
    typename std::vector<V>::const_reference operator[](const BBLK* bb) const {
        return bb->serial < values.size() ? values[bb->serial] : initial;
    }

private:
    V initial;
    std::vector<V> values;
};

// A set of blocks.
class BLOCK_SET {
public:
    // Whether it was not in before.
    bool add(const BBLK* bb) {
        if (bb->serial >= is_in.size()) is_in.resize(bb->serial + 1, false);
        const bool is_new = !is_in[bb->serial];
        is_in[bb->serial] = true;
        return is_new;
    }
    void remove(const BBLK* bb) {
        if (bb->serial < is_in.size()) is_in[bb->serial] = false;
    }

private:
    std::vector<bool> is_in;
};
