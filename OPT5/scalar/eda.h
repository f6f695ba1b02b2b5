// Live variables, dead assignments, and assignments that stand inside expressions.
//
//     live_variables.cpp    the analysis, and its fact          prop_asg.cpp      assignments into tests
//     dead_assigns.cpp      removal of assignments              promote.cpp       assignments out of expressions
//     destructor.cpp        stores of a destructor              statics.cpp       function-local statics
#pragma once

class BBLK;
class FUNINFO;
class NODE;
class SYMTAB;
struct LIST;

// ---- Live variables
// Gives every local scalar that only its own NAME can reach a bit, `bitnum`, and finds the sets of all blocks: what
// `need(fact::live_variables)` does where they are not known.
void find_live_variables();
void lva_cleanup();
// The bit of a symbol that is a candidate, or -1.
int live_index(const SYMTAB* sym);

// ---- Dead assignments
// Removes assignments whose value no path reads, takes assignments out of expressions, and delays those that only one
// successor of their block needs; with `keep_embedded` the last two are left out. Returns how many assignments were
// removed. With `early` the graph is left to the caller to simplify.
int elim_dead_assigns(bool keep_embedded, bool early);
// In the latch of `loop`, where the live sets exist: assignments to its counters whose value no one reads are removed. It
// belongs to the forwarding of definitions by the analysis of loops, which is not built yet.
void elim_locally_dead_assignments_in_bb(BBLK* bb, struct LOOP* loop);
// `x = e; y = x;` with `x` not read again becomes `y = e` in the first cell.
bool combine_assignments(LIST* cell);
// A destructor need not store to members that no later statement reads.
void remove_unneeded_stores_from_destructor();

// Puts the assignment in front of a test into it, where the test compares the variable with a constant: the value need
// not be read again. Needs the bits of the candidates.
void prop_asg_into_if(BBLK* bb);
// The same in every block, ahead of register allocation; also counts the loops around each block, in BBLK::depth. Needs
// `fact::live_variables`.
void propagate_assignments_into_tests();

// ---- Assignments inside expressions become statements of their own, in front of where they stood
void promote_all_embedded_assignments();
bool promote_embedded_assignments_in_bb(BBLK* bb); // whether it made any

// Function-local statics that are written before they are read in every call become automatic variables.
void identify_fl_statics_safe_for_auto();
void convert_safe_fl_statics_to_auto(FUNINFO* funinfo);

// Folds a chain of bit-clearing compound assignments to one object into one.
void fold_ANDBASGs();
