// The reader of the rows of patterns.def.
#pragma once

#include "OPT5/simp/patterns.h"

#include <utility>
#include <vector>

namespace rules {

using TERM_PAIR = std::pair<const TERM*, const TERM*>;  // the two sides
std::vector<TERM_PAIR> orders_of_row(const char* text); // all orders

} // namespace rules
