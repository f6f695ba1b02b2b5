// Factors of values, for this room.
#pragma once

#include "OPT5/simp/range.h"

#include <cstdint>

inline unsigned trailing_zeros(uint64_t v) { return v ? static_cast<unsigned>(__builtin_ctzll(v)) : 64; }
// Low bits of the value that are zero for certain.
unsigned trailing_zeros_of_tree(const NODE* tree, struct LOOP* loop);
