// Records of the locals that may share stack space: a tree by lexical scope, in FUNINFO::overlaps.
#pragma once

#include <cstdint>

class SYMTAB;

// An empty tree for the current function.
void init_stack_sharing();
// Between the two, the current record is one for a scope of that depth. One that ends up empty is dropped.
void begin_stack_sharing_scope(uint32_t level);
void end_stack_sharing_scope();
void add_stack_sharing_variable(SYMTAB* sym); // to the current record
void delete_stack_sharing_variable(const SYMTAB* sym);
