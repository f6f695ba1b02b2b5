// Fast constant and copy propagation over a function, and the joining of neighbouring assignments (combine.cpp).
#pragma once

class NODE;

// Puts the one value that a local has in the whole function in place of its reads, drops what then has no effect, and
// lets the control-flow simplifier follow branches that became decided; at most `iterations` passes. `combine`:
// neighbouring assignments to one object in memory are joined first. Nothing at optimization level 0.
void fast_CP(int iterations, int combine);

// Whether a tree has the same value wherever in the function it is evaluated, and is cheap enough to be evaluated at
// every use. `uses` of them: a string is one object, and stays in one place.
bool expr_is_propagable(const NODE* tree, int uses);

// Puts the values of globals that never change in place of their reads; consumes the tree and returns what it became.
NODE* propagate_global_constants(NODE* tree);

// Joins two neighbouring assignments of a block to the same object in memory into one; nothing at level 0.
void combine_asgs_to_memory();
