// Names of variables: separate live ranges get symbols of their own, and the inductions of a loop are as few as will
// do. `rename_symbols` and `clone_symbol` are in rename.cpp, `eliminate_single_use_temps` in single_use.cpp, the rest in merge.cpp.
#pragma once

class NATURAL_LOOPS;
class SYMTAB;

void rename_symbols();
void merge_symbols();

// A new local with the type and scope of `sym`, whose name is told apart by `n`. What is known of a pointer is copied.
SYMTAB* clone_symbol(SYMTAB* sym, int n);

// Computes the value of a variable that is set once and read once where it is read. The bits of the candidates stand.
void eliminate_single_use_temps();

// Computes ahead of each loop what its iterations would compute alike (invariants.cpp).
void hoist_invariants(NATURAL_LOOPS& loops);

// The pointers of the current function that a use of them has an offset to: their steps cannot all ride on accesses, which
// the propagation of increments, not built yet, is to ask.
void init_skewed_offset_syms();
bool is_skewed_offset_sym(const SYMTAB* sym);
