// A walk over statements against the order of evaluation, as the analysis of live variables takes it.
#pragma once

#include "OPT5/scalar/eda.h"

#include <vector>

class NODE;
class BBLK;
struct LIST;

// Visits reads and writes of candidate variables, last first. What stands in a part that is evaluated under a
// condition, or in a statement that an exception may leave, does not kill: an earlier value may survive it.
class BACKWARD_WALK {
public:
    virtual ~BACKWARD_WALK() = default;
    void block(BBLK* bb); // every statement
    // `kills`: nothing leaves the statement before its assignments are done.
    void statement(NODE*& tree, bool kills);

protected:
    virtual void read(int bit) = 0;
    // An assignment to a candidate, before its right side is visited. False: it is dead, and the walk removes it but
    // for its effects and a value that is used.
    virtual bool write(int bit, bool kills) = 0;
    // A call whose value is not used. False: the walk removes it but for the effects of its arguments.
    virtual bool call(const NODE*) { return true; }
    virtual void removed() {}
    virtual void embedded_assignment() {} // one that is not the root of its statement

private:
    NODE* walk(NODE* t, bool discard);
    NODE* walk_assignment(NODE* t, bool discard);
    NODE* walk_removed_call(NODE* t);
    NODE* walk_conditional(NODE* t);
    NODE* without_store(NODE** assignment, bool discard);
    NODE* walk_commas(NODE* t, bool discard);
    std::vector<LIST*> cells; // of the block in work
    bool kills_now = true;
    bool at_root = false;
};
