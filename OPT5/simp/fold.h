// Constant folding, for the sources of this room.
#pragma once

#include "OPT5/simp/simp.h"

// Each gives the tree back unchanged where the value cannot be told. Operands are constants, and casts are in place.
NODE* fold_float_node(NODE* tree);
bool is_float_fold(const NODE* tree); // a floating operand or result

// A fresh constant with the scope of `tree`, which is erased.
NODE* integer_in_place_of(NODE* tree, INT65 value, TYPE* type);
NODE* float_in_place_of(NODE* tree, const simul_fval& value, TYPE* type);
