// Writing functions and the end of the unit into the output I-file.
#pragma once

#include "UTIL/psn.h"

#include <string>
#include <vector>

class NODE;
class SYMTAB;
struct LBL;
struct LIST;

// Ahead of writing the current function: locals that nothing names any more are not declared to the code generator; the
// operand that stood for the state of the machine is removed.
void drop_unused_locals();
void strip_implicit_states();
// The records of the current function. Its blocks are consumed.
void write_function();
// After the last function: symbols' final types and retention, then the initializers. The caller closes the file.
void write_end_of_unit();

void write_func_header();
void write_func_body();
void finalize_ldspec_advice(); // the load speculation records
void wrbblocks();
void wrexpr(LIST* element);
void wrbdlr(const LBL* labels);             // a label record for each label that is referenced
NODE* wrtree(NODE* tree);                   // the pre-write walk, then the tree's records; returns what the tree became
NODE* prepare_tree_for_writing(NODE* tree); // the pre-write walk alone
void wrasmr(int kind, const char* text, PSN* psn); // 47 a comment, 36 inline assembly
void wrstcr(int kind, PSN* psn);                   // a control record
void wrsfid(const char* name);                     // a source file record in the body
// Gives a symbol its declared type back where the type it was worked on with means the same.
void revert_symbol_type(SYMTAB* sym);
// Removes what no call can reach from the current function's exception table and renumbers the rest.
void prune_exception_table();

// Comments of the register allocator, one a symbol; written and emptied with the function.
struct REGISTER_ASSIGNMENT {
    SYMTAB* sym;
    std::string comment;
};
extern std::vector<REGISTER_ASSIGNMENT> register_assignments;
