// Vector operations in trees: disclosed as operators for the optimizer, disguised as intrinsics for the code generator.
#pragma once

void disguise_vector_operations();
void disclose_vector_operations(bool all);

// One lane access just read. Consumes the node and returns what stands for it.
class NODE* disguise_VFIELD_node(class NODE* t);

void coalesce_local_vector_symbols();
void lower_vector_statements();
