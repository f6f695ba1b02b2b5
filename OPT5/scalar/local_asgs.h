// The assignments in force along a chain of blocks, each entered from the one before alone: what reads may be replaced by.
#pragma once

#include "OPT5/ir/symbol_table.h"

#include <cstdint>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

class BBLK;
class NODE;
class SYMTAB;
struct LIST;

enum LOCAL_ASG_KINDS : unsigned {
    ASGS_TO_NAMES = 1, // x = 3, x = y
    ASGS_TO_PARTS = 2, // p->a = 3, x = *p: values of places in memory; needs `fact::alias`
    ASGS_KEEP_TESTS = 4, // a branch goes on asking the variable that the loop behind it steps
};

// Whether reads of `target` may become `value`: a pointer that `restrict` speaks of is not mixed with others.
bool ok_to_propagate_for_pointer(const NODE* value, const NODE* target);

// What propagation reports of each replacement in its dump: `head` takes the number of the replacement.
void report_replacement(const char* head, const char* middle, const char* end, const NODE* old, const NODE* value);
// A copy of the value in the type of the name, whose tree it takes the place of and erases.
NODE* value_in_place_of(NODE* name, const NODE* value);

class LOCAL_ASGS {
public:
    explicit LOCAL_ASGS(unsigned kinds) : kinds(kinds) {}
    LOCAL_ASGS(const LOCAL_ASGS&) = delete;
    LOCAL_ASGS& operator=(const LOCAL_ASGS&) = delete;
    ~LOCAL_ASGS() { restart(); }

    void restart(); // nothing is known
    void assume(const NODE* asg) { learn(asg); } // x = 3 or x = y, which holds here
    // The next statement of the chain: its reads, then what it makes known. True if it was changed; the cell is left empty
    // where nothing of it remains.
    bool statement(LIST* s);

private:
    // The value of a variable since an assignment. It holds while neither variable has been changed since.
    struct NAMED {
        NODE* value = nullptr; // a constant, or a NAME
        int64_t depnum = -1;
        int64_t source_depnum = -1; // of the NAME
    };
    // Both are copies.
    struct PART {
        NODE* lvalue;
        NODE* value;
    };

    bool split(LIST* s);
    void inc_depnum(const SYMTAB* sym) { ++depnums[sym]; }
    void forget_names(const NODE* t);
    void learn(const NODE* t);
    void learn_name(const NODE* target, const NODE* value);
    void learn_part(const NODE* asg);
    void forget_parts(const NODE* t);

    NODE* read_names(NODE* t);
    const NODE* value_in_force(const SYMTAB* sym);
    NODE* lookup_ASG(NODE* name);
    NODE* cp_opASG_RL(NODE* t);
    void read_parts(NODE* t);
    NODE* parts_in_value(NODE* t);
    NODE* parts_in(NODE* t);
    NODE* parts_in_place(NODE* t);
    NODE* cp_indirect_RL(NODE* t);

    const unsigned kinds;
    SYMBOL_TABLE<int64_t> depnums; // the number of a variable's changes
    std::unordered_map<const SYMTAB*, NAMED> names;     // looked up, never walked but to free
    std::vector<PART> parts;
    bool any = false;     // replaced in the statement in work
    bool in_test = false; // of a branch, which only constants change
};

// The statements of the next block of the chain. `*any` is set if one was changed.
void walk_block(LOCAL_ASGS& known, BBLK* bb, bool* any);
