// Dead assignments and live variables of a function.
#pragma once

class FUNINFO;

// Removes assignments whose value no one reads; returns how many.
int elim_dead_assigns(int keep_sets, int early);

// Computes the live sets of all blocks, and frees them.
void find_live_variables(int scalars_only, int with_memory);
void lva_cleanup();

// Function-local statics that are written before they are read in every call become automatic variables.
void identify_fl_statics_safe_for_auto();
void convert_safe_fl_statics_to_auto(FUNINFO* funinfo);

// Folds a chain of bit-clearing compound assignments to one object into one.
void fold_ANDBASGs();
