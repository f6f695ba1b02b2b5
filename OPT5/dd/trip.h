// What the files that count trips share.
#pragma once

#include "OPT5/dd/loop.h"

#include "OPT5/simp/linear.h"
#include "OPT5/simp/range.h"

#include <optional>

// The values of an integer tree; false for another.
bool bounds_of(const NODE* tree, const struct LOOP* loop, RANGE* range);
// A conversion that keeps every value of its operand.
bool keeps_values(const NODE* conversion);
// The condition of an assertion that can be asked, or null for another statement.
const NODE* asserted_condition(const NODE* statement);

// The number of steps from `init` until `v op limit` fails, of numbers without bounds, at least `first` (0 or 1); nothing
// where it never does.
std::optional<WIDE> steps_to_exit(WIDE init, WIDE limit, WIDE step, int op, int first);

// The count of a loop that is tested by a variable which takes constants in turn, as a new ICON, or null (trip_trial.cpp).
NODE* count_by_trial(struct LOOP* loop);

// A new tree of values as they are written in statements.
NODE* denormalized_copy(const NODE* tree);

// Whether the exit test of the control variable would let the value on entry pass: so the guard of a bottom-tested
// loop, or what is known of the values, says.
bool first_test_holds(const struct LOOP* loop);

// Whether control comes from the head of each iteration to where the graph says. Of innermost loops alone: one in it may
// never end (loop_bounds.cpp).
bool always_comes_to_its_end(const struct LOOP* loop);
// The same of a loop with loops in it that are counted: a test for != in it is not left out by what never comes back, so
// that a signed counter meets the limit, or overflows.
bool always_comes_to_its_test(const struct LOOP* loop);

// Adds a multiple of the tree to the sum, by operators alone that give the number itself; false where that has no room.
bool read_exact_sum(const NODE* tree, int64_t coefficient, LINEAR_FORM* sum);

// Visits the straight line of blocks that ends in the loop's preheader, the nearest first, for as long as `visit(block,
// test, sense)` returns true: the line came through the side `sense` of the block's IF `test`, which is null for
// another end and for the preheader.
template <class F>
void for_each_block_ahead(const struct LOOP* loop, F&& visit);

// ---- Inline

constexpr int MOST_BLOCKS_AHEAD = 16;

template <class F>
void for_each_block_ahead(const struct LOOP* loop, F&& visit) {
    const BBLK* bb = loop->preheader;
    if (!bb || !visit(bb, static_cast<const NODE*>(nullptr), false)) return;
    for (int n = 0; n < MOST_BLOCKS_AHEAD; ++n) {
        const BBLK* before = only_block(bb->predecessors);
        if (!before || before->dfn >= bb->dfn) return;
        const NODE* test = before->branch();
        if (!test || test->op != IF || test->left->op == ENDLOOP) test = nullptr;
        bool sense = false;
        if (test) {
            sense = test->right->left->lbl->bblock == bb;
            if (sense == (test->right->right->lbl->bblock == bb)) test = nullptr;
        }
        if (!visit(before, test, sense)) return;
        bb = before;
    }
}
