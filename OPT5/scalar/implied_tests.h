// Whether one condition decides another.
#pragma once

#include "OPT5/alias/effects.h"

#include <optional>
#include <vector>

class BBLK;
class NODE;
class SYMTAB;
struct LIST;

// What `q` is where `p` has the truth value `sense`: 1 true, 0 false, -1 unknown. Neither may have side effects; both
// are evaluated on the same values. A NaN is no integer: floating conditions decide only themselves and their exact
// opposite.
int pred_implies_pred(const NODE* p, bool sense, const NODE* q);

bool is_test(const NODE* control); // an IF on a value
// Tests of such blocks are left where they are: an edge past a loop's test would enter the loop in its middle.
bool has_back_edge(const BBLK* bb);

// Whether a condition is true or false on the edges into its block. Valid while the blocks that the graph had at
// construction keep their edges; blocks made later decide nothing. `ask_for` names the condition that the other
// questions are about.
class TEST_OUTCOMES {
public:
    TEST_OUTCOMES();
    LIST* control_of(const BBLK* bb); // the last cell of its statements, or null
    void refresh(BBLK* bb);           // its statements have changed
    bool ask_for(NODE* condition);    // false if nothing can be said of it; borrowed
    // At the end of `pred`, where it assigns a constant to the variable of the condition.
    std::optional<bool> behind_constant(const BBLK* pred);
    // On the edge from `pred` to `bb`, by an earlier test. That is looked for in `pred` and back along sole
    // predecessors; nothing behind it may change what the condition reads.
    std::optional<bool> on_edge(const BBLK* pred, const BBLK* bb);
    // The first statement of the block that may change what the condition reads, or null. The control statement is not
    // looked at; in a very long block the last statement that was looked at is given.
    const LIST* first_that_may_change(const BBLK* bb);

private:
    struct LAST_STATEMENTS {
        LIST* control = nullptr;
        std::vector<const LIST*> statements; // found when they are asked for
    };
    LAST_STATEMENTS* last_of(const BBLK* bb);
    const std::vector<const LIST*>& statements_back(const BBLK* bb);
    bool may_change_between(const BBLK* test, const BBLK* last);
    bool block_may_change(const BBLK* bb, size_t* budget);
    const NODE* constant_assignment(const BBLK* pred);

    std::vector<LAST_STATEMENTS> blocks; // by depth-first number
    const NODE* q = nullptr;
    READ_SET reads;
    const SYMTAB* variable = nullptr; // the only one that `q` reads
};

// An edge into the block of a test on which the test's outcome is known.
struct DECIDED_EDGE {
    BBLK* from;
    bool outcome;
    bool by_constant; // not by a test
};
// Whether the test at the end of `bb` and the one in front of `from` each only choose a value for a variable. They are
// left alone: two selects cost no jump, an edge past the second would cost one.
bool joins_selects(TEST_OUTCOMES& outcomes, const BBLK* from, const BBLK* bb);
// Adds the edges into `bb` on which the outcome is known; returns whether those are all. Where very many edges lead
// into it some are not looked at.
bool find_outcomes(TEST_OUTCOMES& outcomes, const BBLK* bb, std::vector<DECIDED_EDGE>* edges);
