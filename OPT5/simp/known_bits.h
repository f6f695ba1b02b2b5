// What is known of the bits of an integer value, from the shape of the tree that computes it.
#pragma once

#include "OPT5/ir/node.h"
#include "OPT5/simp/symbolic.h"

#include <cstdint>
#include <unordered_map>

// Bits of a value at its type's width that are zero, or one, whatever the variables hold. A bit is in at most one mask.
struct KNOWN_BITS {
    uint64_t zeros = 0;
    uint64_t ones = 0;
};

// Of an integer or enumeration tree of at most 64 bits; nothing is known of another. Looks a fixed number of levels
// deep, so that asking at every node of a tree stays linear.
KNOWN_BITS known_bits(const NODE* tree);
// Tells of most values that are no constant, without looking at all bits: false where the lowest one may be known.
bool lowest_bit_is_unknown(const NODE* tree);

// The bits of variables that are zero in each value they hold, as whoever set this found; null at other times.
extern const std::unordered_map<const SYMTAB*, uint64_t>* zeros_of_variables; // looked up only
// Bits of the tree's value that are zero once it is converted to the type.
uint64_t known_zeros_as(const NODE* tree, const TYPE* type);

// The same as masks within the type's width; `type` is the tree's own.
INT65 find_known_zeros(const NODE* tree, TYPE* type);
INT65 find_known_ones(const NODE* tree, TYPE* type);
INT65 find_known_zeros_in_ANDB(const NODE* tree, TYPE* type);
// Bits that are equal in every value from `low` to `high`, as masks of 65-bit values.
INT65 find_known_zeros_in_range(INT65 low, INT65 high);
INT65 find_known_ones_in_range(INT65 low, INT65 high);
