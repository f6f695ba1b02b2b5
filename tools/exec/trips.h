// Promises of how often a loop iterates, held against how often it does.
//
// The promise of a pragma stands before the label that heads the loop. The loop is all that leads back to the head without
// leaving what the head dominates; each back edge is an iteration more, and the statement by which the loop is left tells
// whether the last iteration began.
//
// The promise of a loop record is of the loop that has its id: statements have ids by the records of loop variables. Ids and
// nesting must be those of the natural loops of the code, unless it has cycles that are none; then there is no loop but the
// function. Such a promise counts how often the tail is executed where the loop is entered: at least once may be none.
#pragma once

#include "tools/exec/machine.h"

// A promise from the texts of a MUST_ITERATE pragma, or from numbers; the head is not yet known. False: nothing is promised.
bool read_promise(const PRAGMA& pragma, TRIP_PROMISE& promise);
bool make_promise(uint64_t min, uint64_t max, uint64_t multiple, TRIP_PROMISE& promise);

// Finds the loops of a function whose code is complete, and drops promises before labels that head none.
void find_promised_loops(FUNCTION& f);

// Adds the promises of loop records. Empty, or how the records are not those of the code's loops.
std::string bind_loop_records(FUNCTION& f);

// The promised loops of one activation.
class TRIP_WATCH {
public:
    explicit TRIP_WATCH(const FUNCTION& f) : f_m(f), backs_m(f.promises.size()) {}
    // Control passes from a statement to another; `to` is the size of the code when the function returns.
    void step(uint32_t from, uint32_t to, MACHINE& m);

private:
    void left(const TRIP_PROMISE& p, uint64_t backs, uint32_t from, MACHINE& m) const;

    const FUNCTION& f_m;
    std::vector<uint64_t> backs_m; // back edges since the loop was entered
};
