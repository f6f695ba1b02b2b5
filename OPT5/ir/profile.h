// Profile data: how often blocks run and which successors branches take.
#pragma once

class BBLK;
class NODE;

// Starts the state of the current function from its pragma, for a null `branch`; otherwise takes the entry count that a
// branch to the first label carries.
void initialize_the_profiling_state(const NODE* branch);
// The probabilities of the targets of a control statement, from the counts on its LABELREFs, in `NODE::weight`.
void initialize_labelref_probabilities(NODE* control);
// Frequencies of blocks and probabilities of edges of the current function, from counts where it has them, otherwise,
// with `estimate`, from the shape of the graph; nothing without a profile. With `check`, counts that do not add up are
// reported on the debug stream.
void initialize_CFG_profiling_annotation(bool estimate, bool check);
