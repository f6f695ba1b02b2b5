// Common subexpressions within chains of blocks (lcse.cpp), known values of parts of objects (lcp.cpp), dead stores to
// them (subrange.cpp), and which trees are worth a temporary (cse_trees.cpp).
#pragma once

class NODE;

void lcse();
// Whether a tree is worth a temporary. Mask vectors count where they are allowed; there are none yet.
bool good_CSE_tree(const NODE* tree, bool allow_mask_vectors);
// Whether the value is computed from what the code generator most likely keeps in a register.
bool is_likely_register(const NODE* tree);
// The address of an access as (base + index) + displacement, so that accesses a constant apart share the sum and each has
// its constant in the addressing mode. Consumes the tree.
NODE* normalize_ptr_for_indexing(NODE* pointer);
void lcse_subrange_assignments();
void elim_dead_subrange_assigns();
