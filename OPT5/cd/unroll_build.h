// Copies of the body of an innermost loop, one behind the other in one iteration of the loop or in its place.
#pragma once

#include "OPT5/dd/mac.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/symtab.h"

#include <vector>

struct LOOP;

constexpr int MOST_COPIES_OF_A_BODY = 64;

// A variable that one statement of the body steps by a constant in each iteration, and that nothing else writes. In
// copies it is not stepped until the last: what reads it in between reads a sum.
struct STEPPED {
    VARIABLE_STEP step;
    const NODE* statement;
    size_t block;             // of the statement, in UNROLLED_BODY::blocks
    std::vector<bool> behind; // by block: whether it runs behind that one in an iteration
    bool start_is_known;      // what it holds on entry to the loop
    INT65 start;
};

// What is left over where the count is no multiple of the factor.
struct REST {
    NODE* trips = nullptr;   // a tree that changes nothing, in normal form; of the caller
    int64_t count = -1;      // the iterations left over, where that is a constant
    int64_t multiple = 1;    // a factor of the count
    bool may_be_less = true; // the count may be below the factor
};

class UNROLLED_BODY {
public:
    // The loop is bottom-tested, its test changes nothing, and no other loop is in it.
    explicit UNROLLED_BODY(struct LOOP* of);

    // Statements that copies leave out; they are the same in each.
    const std::vector<STEPPED>& steps() const { return stepped; }
    const STEPPED* step_of(const SYMTAB* sym) const; // null for another variable
    // One of the body's blocks that runs once in each iteration.
    bool runs_always(const BBLK* bb) const;

    // The count is a multiple of the factor: the test of the last copy is the loop's.
    void unroll(int factor);
    // It is not, perhaps: the copies run as often as they can, behind them the iterations left over.
    //
    //     do { body; i++; } while (i < n)     t = n - i; end = i + (t & -4);
    //                                         if (t >= 4) do { body; body; body; body; i += 4; } while (i != end)
    //                                         if (t & 2) { body; body; }
    //                                         if (t & 1) body;
    void unroll(int factor, const REST& rest);
    // It runs so often whenever it is entered.
    void unroll_completely(int count);

private:
    using BLOCKS = std::vector<BBLK*>; // of a copy, in the order of `blocks`

    void find_steps();
    bool is_read_often(const STEPPED& v) const;
    bool reaches(size_t from, size_t to, size_t without) const;
    size_t place_of(const BBLK* bb) const; // blocks.size() for one outside
    BLOCKS new_blocks(struct LOOP* in);
    void fill(const BLOCKS& copy, int k, int of, NODE* control, PSN* psn);
    LIST* statements_of(size_t block, int k, int of) const;
    const INT65* known_start(const STEPPED& v) const;
    NODE* in_copy(const NODE* statement, size_t block, int k, int of) const;
    BBLK* new_block(struct LOOP* in);
    BBLK* new_part(int count, BBLK* behind);
    BBLK* new_rest(int factor, const REST& rest, const NODE* over);
    void guard(const NODE* trips, int factor, BBLK* otherwise);
    NODE* kept_ahead(NODE* value);
    void replace_body(int count, NODE* control);
    NODE* main_loop_end(const NODE* trips, int factor);
    NODE* test_of_end(NODE* end) const;
    BBLK* counter_at_end(const NODE* end, BBLK* behind);

    struct LOOP* loop;
    BLOCKS blocks; // by number; the head first
    BBLK* exit;    // where the test leaves to
    BBLK* last;    // in the text, of what was made so far
    bool stays_if_true;
    std::vector<STEPPED> stepped;
    bool in_place = false;   // the copies run once, from where the loop begins
    bool is_in_loop = false; // what is copied stays in the loop, where facts were found of it
};
