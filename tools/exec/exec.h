// Executes an I-file with the target's arithmetic, straight from the file's trees.
//
// The unit is the file as it was read (tools/model); nothing here knows the optimizer, so that a program's behaviour
// before and after optimization is judged by the same eyes.
#pragma once

#include "tools/model/ic_model.h"

#include <cstdint>
#include <cstdio>
#include <string>

// What ended a run, other than the program itself; also the exit status of `icrun`.
enum EXEC_STATUS : int {
    EXEC_USAGE = 64,       // of the command line
    EXEC_BAD_FILE = 65,    // no I-file
    EXEC_UNSUPPORTED = 66, // an operator, built-in function or statement that cannot be executed
    EXEC_MISSING = 67,     // a function or object that is nowhere defined
    EXEC_BAD_ADDRESS = 68, // an access outside memory, at or near address 0, or through no function's address
    EXEC_UNALIGNED = 69,   // an access to an object that is not at a multiple of its alignment
    EXEC_DIVISION = 70,    // division by zero
    EXEC_STEPS = 71,       // more nodes than --max-steps
    EXEC_STACK = 72,       // the target's stack, or the tree's nesting, is deeper than memory
    EXEC_ABORT = 73,       // abort() was called
    EXEC_UNREACHABLE = 74, // a place that is declared never to be reached
    EXEC_CHECK = 75,       // an annotation does not hold (--check)
    EXEC_TRIPS = 76,       // a loop iterates more or less often than promised (--check)
};

struct EXEC_OPTIONS {
    uint64_t max_steps = 0;         // nodes; 0: no limit
    uint64_t max_memory = 1u << 24; // 16-bit units of data, heap and stack together
    bool stats = false;
    bool profile = false;
    bool check = false;
    bool innermost = false; // of a checked run: dependences that a loop around the innermost one carries are not told
    bool globals = false;
};

struct EXEC_RESULT {
    int status = 0;      // the program's own, or an EXEC_STATUS
    bool failed = false; // `status` is an EXEC_STATUS
    std::string error;   // what, in which function, at which line
};

// Runs `main` of a unit that was read whole. What the program prints is written to `out`, reports are written to
// `report`.
EXEC_RESULT execute(const IC_UNIT& unit, const EXEC_OPTIONS& options, FILE* out, FILE* report);
