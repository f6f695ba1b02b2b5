// Control flow between the statements of a compiled function, and the innermost natural loops in it.
#pragma once

#include "tools/exec/machine.h"

using TARGETS = std::vector<uint32_t>; // indexes of statements

TARGETS successors(const std::vector<STMT>& code, uint32_t at);

// A natural loop: what leads back to its head without passing the head, which dominates all of it.
struct LOOP_BODY {
    uint32_t head;
    TARGETS latches;
    std::vector<uint8_t> inside; // by statement
};
// In the order of their heads. `*is_reducible`: all cycles lead through heads.
std::vector<LOOP_BODY> natural_loops(const std::vector<STMT>& code, bool* is_reducible);

// How an innermost loop closes, and what that cost in the run so far.
struct LOOP_COUNTS {
    uint32_t line = 0;
    int tests = 0, jumps = 0;              // in the loop: conditional branches and switches; other branches
    uint64_t iterations = 0, branches = 0; // executed; each run of a latch ends an iteration
    bool has_own_tests() const { return tests > 1; }
};

std::vector<LOOP_COUNTS> count_innermost_loops(const std::vector<STMT>& code);
