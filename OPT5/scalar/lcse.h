// Common subexpressions within chains of blocks (lcse.cpp), known values of parts of objects (lcp.cpp), and dead stores
// to them (subrange.cpp).
#pragma once

class NODE;

void lcse();
// Whether a tree is worth a temporary. Mask vectors count where they are allowed; there are none yet.
bool good_CSE_tree(const NODE* tree, bool allow_mask_vectors);
void lcse_subrange_assignments();
void elim_dead_subrange_assigns();
