// Fast constant and copy propagation over a function, and what goes with it.
#pragma once

class NODE;

// Propagates constants and copies; `mode` 0 late, 4 early; `all` takes every variable instead of the scalars alone.
void fast_CP(int mode, int all);

// Puts the known initial values of immutable globals into a tree; consumes it and returns what it became.
NODE* propagate_global_constants(NODE* tree);

// Joins assignments to adjacent memory into wider ones.
void combine_asgs_to_memory();
