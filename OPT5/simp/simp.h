// The tree simplifier: a tree in, a tree of the same value with the same side effects in the same order out, in the
// form that the passes match.
//
// An operation here owns the tree that it is given and returns what stands for it, which may be any node, also one of
// the given tree. `loop`, where not null, is the loop that the tree stands in, whose facts may be used.
#pragma once

#include "OPT5/ir/trees.h"

struct LOOP;

// Once, after `init_types` and `init_BIF_descriptors`: tells the type rules on trees what the simplifier knows of
// values, and the descriptors how calls of built-in functions simplify.
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

// The operands of a chain of one associative integer operator, equal ones and constants joined. A chain with nothing to
// join comes back as it is; so does one with side effects, or of more than a bounded number of nodes.
NODE* simp_assoc(NODE* tree, struct LOOP* loop);
NODE* simp_ss_tree(NODE* tree, struct LOOP* loop); // a subscript or an address; null stays null
// A tree with the same bits as `tree` where `mask` has ones, and no bits computed that do not count for them.
NODE* prop_mask_into_subtree(NODE* tree, INT65 mask);
// Of a chain of integer sums, or of one commutative operator, without effects: the term that is congruent to `term`
// stands first, and all others in the right operand. `term` is borrowed. Another tree, or one without the term, stays.
NODE* bubble_term_to_top(NODE* tree, const NODE* term);

// Puts an ICON of `value` and `type` in place of every subtree that is congruent to `target`, effects of which stay in
// front of it, and simplifies the operators above. What an assignment writes or an address is taken of is left alone.
// `target` is borrowed and must not be part of `tree`.
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
