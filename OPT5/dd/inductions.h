// Induction variables of a natural loop, its exit tests, and its trip count.
#pragma once

#include "OPT5/dd/linear_address.h"

#include <cstdint>
#include <unordered_map>
#include <vector>

class BBLK;
class NODE;
class SYMTAB;
struct LIST;
struct NATURAL_LOOP;
class NATURAL_LOOPS;

// Levels of loops in a loop that is looked at: each looks at everything in it, what is further out stays.
constexpr int DEEPEST = 8;

// A variable that every assignment of the loop steps by an invariant amount, in a statement of its own.
struct INDUCTION {
    struct STEP {
        BBLK* bb;
        NODE* statement;
        int64_t by;         // 1 or -1 with an amount
        const NODE* amount; // invariant, a part of the statement; null for the constant alone
    };
    SYMTAB* sym;
    std::vector<STEP> steps;
    int64_t start = 0; // on entry to the loop, if that is known
    bool start_is_known = false;
    NODE* start_statement = nullptr; // which assigns it, if that is in the block ahead
    bool wraps = true;               // a narrow unsigned one: not shown not to
};

// A test that may leave the loop and is evaluated once in each iteration.
struct LOOP_TEST {
    BBLK* bb = nullptr;
    NODE* branch = nullptr;       // the IF
    INDUCTION* counter = nullptr; // which has one step in each iteration, by a constant
    const NODE* limit = nullptr;  // invariant; of a test for truth, `counter` or `counter + constant`, made for it
    int stay_op = 0;              // control stays in the loop while `counter stay_op limit`
    bool stays_if_true = false;   // of the compare as it stands
    bool step_comes_first = false;
};

class LOOP_FACTS final : public LINEAR_LEAVES {
public:
    LOOP_FACTS(const NATURAL_LOOPS& all, NATURAL_LOOP* of);
    ~LOOP_FACTS() override;
    LOOP_FACTS(const LOOP_FACTS&) = delete;
    LOOP_FACTS& operator=(const LOOP_FACTS&) = delete;
    // False for a loop that is better left alone: it holds what is not understood, or has another entry than its header.
    bool is_usable() const { return usable; }
    INDUCTION* induction(const SYMTAB* sym);
    const std::vector<INDUCTION*>& all_inductions() const { return in_order; }
    const std::vector<LOOP_TEST>& tests() const { return exits; }
    // Of a test behind its counter's step: whether one ahead of the loop lets it start only where the counter has not reached
    // the limit, so that a step leads to the limit at the farthest.
    bool is_guarded(const LOOP_TEST& test) const;
    double trip_count_estimate() const { return estimate; }
    int mentions(const SYMTAB* sym) const;       // NAMEs in the loop
    bool is_used_after(const SYMTAB* sym) const; // its value may be read where the loop is left

    using LINEAR_LEAVES::is_induction;
    bool is_induction(const SYMTAB* sym) const override { return inductions.count(sym) != 0; }
    bool is_invariant(const NODE* tree) override;
    // Of a variable with one assignment in the loop, at the statement that `look_at` named: what that assigned in the
    // same iteration, if no induction has stepped since.
    const NODE* value_of(const SYMTAB* sym) override;
    void look_at(const BBLK* bb, const NODE* statement);
    struct DEFINITION {
        BBLK* bb;
        NODE* statement;
    };
    const DEFINITION* definition(const SYMTAB* sym) const; // the one assignment of the loop, if it is a statement
    bool stays_linear_when_widened(const SYMTAB* sym) const override;

private:
    void collect_assignments();
    void enter_statement(BBLK* bb, NODE* t);
    bool steps_by_invariants(const INDUCTION& i);
    void keep_inductions();
    void order_steps();
    void find_starts();
    const NODE* limit_of_truth(const NODE*& t);
    void find_tests();
    bool runs_once_in_each_iteration(const BBLK* bb) const;
    void judge_wrapping();
    void estimate_trip_count();
    bool is_entered_under(NODE* condition) const;
    bool is_unchanged(const SYMTAB* sym, const NODE* name);

    const NATURAL_LOOPS& loops;
    NATURAL_LOOP* loop;
    bool usable = true;
    double estimate;
    std::unordered_map<const SYMTAB*, INDUCTION> inductions; // looked up
    std::vector<INDUCTION*> in_order;
    std::unordered_map<const SYMTAB*, int> assignments; // of private variables, in the loop
    std::unordered_map<const SYMTAB*, int> names;
    std::unordered_map<const SYMTAB*, bool> unchanged; // other variables that were asked about
    std::vector<LOOP_TEST> exits;
    std::vector<NODE*> made; // limits that the text does not name
    std::unordered_map<const SYMTAB*, DEFINITION> definitions; // the last seen
    std::unordered_map<const NODE*, int> place;                // of a statement in its block
    const BBLK* looking_in = nullptr;
    int looking_at = 0;
    std::unordered_map<const BBLK*, int> first_step; // its place
    bool steps_end_iterations = false;
    int questions_left = 16; // each looks at the whole loop
};

// Makes two inductions one that are equal throughout the loop (equal_inductions.cpp); whether it found two. `facts` is then
// stale.
bool unite_equal_inductions(const NATURAL_LOOPS& all, NATURAL_LOOP* loop, LOOP_FACTS& facts);
// Gives the test of a counter that nothing else needs to a pointer that steps beside it, and drops the counter's step
// (pointer_tests.cpp); whether it did. `facts` is then stale.
bool map_test_to_pointer(NATURAL_LOOPS& all, NATURAL_LOOP* loop, LOOP_FACTS& facts);
// Whether only its NAME reads and writes a local scalar.
bool is_private_scalar(const SYMTAB* sym);
// The constant trip count that a test allows, or -1; `first` gets the counter's value at the first test that
// leaves the loop.
int64_t constant_trip_count(const LOOP_TEST& test, int64_t* last_value);
