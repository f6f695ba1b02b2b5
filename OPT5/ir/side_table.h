// Something for each block while a pass runs, beside the blocks and not in them.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"

#include <algorithm>
#include <unordered_set>
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

// A set that takes no more room than its members, for what is made anew for each block: most blocks have one or two
// successors, but a switch may have thousands.
class SMALL_BLOCK_SET {
public:
    // Whether it was not in before.
    bool add(const BBLK* bb) {
        if (find(bb) != few + count || many.count(bb)) return false;
        if (count < FEW)
            few[count++] = bb;
        else
            many.insert(bb);
        return true;
    }
    // Whether it was in.
    bool remove(const BBLK* bb) {
        const BBLK** at = find(bb);
        if (at == few + count) return many.erase(bb) != 0;
        *at = few[--count];
        return true;
    }

private:
    static constexpr size_t FEW = 8;
    const BBLK** find(const BBLK* bb) { return std::find(few, few + count, bb); }

    const BBLK* few[FEW];
    size_t count = 0;
    std::unordered_set<const BBLK*> many; // the rest; membership only
};
