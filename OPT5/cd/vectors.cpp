// What the step table and the writer call of this room. Each leaves the program as it is: the trees keep their
// meaning, and what is not known is assumed not to hold.
#include "OPT5/cd/vectors.h"

void disguise_vector_operations() {}
void disclose_vector_operations(bool) {}
void coalesce_local_vector_symbols() {}
void lower_vector_statements() {}

// A lane access is an intrinsic of the code generator already; it stays as it was read.
NODE* disguise_VFIELD_node(NODE* t) { return t; }
