// The tree simplifier: a tree in, a tree of the same value with the same side effects in the same order out, in the
// form that the passes match.
//
// An operation here owns the tree that it is given and returns what stands for it, which may be any node, also one of
// the given tree. `loop`, where not null, is the loop that the tree stands in, whose facts may be used.
#pragma once

#include "OPT5/ir/trees.h"

struct LOOP;

// Once, after `init_types`: tells the type rules on trees what the simplifier knows of values.
void init_simplifier();

void simp_all_trees();                          // every statement of the current function
NODE* simp_tree(NODE* tree, struct LOOP* loop); // operands first
NODE* simp_node(NODE* tree, struct LOOP* loop); // operands are simplified already
// Of a tree that is used for its truth value alone: zero stays zero, and what isn't zero stays so.
NODE* simp_for_control(NODE* tree, struct LOOP* loop);
NODE* make_boolean(NODE* tree, struct LOOP* loop); // the truth value as an `int` of 0 or 1
NODE* invert_boolean_tree(NODE* tree);             // the logical opposite
// What remains of a tree whose value isn't used, or null.
NODE* peel_for_effect(NODE* tree);

// Puts an ICON of `value` and `type` in place of every subtree that is congruent to `target`, effects of which stay in front
// of it, and simplifies the operators above. What an assignment writes or an address is taken of is left alone. `target` is
// borrowed and must not be part of `tree`.
NODE* simp_subst_icon(INT65 value, TYPE* type, const NODE* target, NODE* tree);

// ---- Constants
// Folds what consists of constants: the value that the target computes, bit for bit. What may trap, is undefined, or
// cannot be told exactly stays as it is.
NODE* fold_constants(NODE* tree);
bool is_constant(const NODE* tree, int op); // `op` (ICON, FCON), or VPACKM of it
bool is_constant_and_zero(const NODE* tree);
bool is_effective_leaf(const NODE* tree); // a leaf, or a leaf under VPACKM or a cast
bool is_name(const NODE* tree);           // NAME, also under an SSA operator
SYMTAB* symbol_of_name(const NODE* tree); // null for another tree
INT65 ICON_value_of_integer_constant(const NODE* tree);
NODE* change_integer_constant_value(NODE* tree, INT65 value); // truncated to the constant's own type
const simul_fval* FCON_value_of_fp_constant(const NODE* tree);
NODE* change_fp_constant_value(NODE* tree, const simul_fval& value);
// A constant right side as the value that the assignment stores; `lhs` may be a bit-field.
NODE* truncate_RHS_for_assignment(const NODE* lhs, NODE* rhs);
