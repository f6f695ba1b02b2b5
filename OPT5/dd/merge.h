// The inductions of a loop are as few as will do: addresses become pointers, counters that only count go.
#pragma once

class NATURAL_LOOPS;
class SYMTAB;

void merge_symbols();

// Computes ahead of each loop what its iterations would compute alike (invariants.cpp).
void hoist_invariants(NATURAL_LOOPS& loops);

// The pointers of the current function that a use of them has an offset to: their steps cannot all ride on accesses, which
// the propagation of increments, not built yet, is to ask.
void init_skewed_offset_syms();
bool is_skewed_offset_sym(const SYMTAB* sym);
