// Value-set propagation: which integers a variable may hold, at each point of the current function.
//
//     vpset.cpp              slices and sets: pure values
//     vpenv.cpp              environments: what the tracked variables hold, sharing what is equal
//     vp_eval.cpp            sets of trees, what conditions and statements do to an environment
//     vp_builtins.cpp        the same of built-in functions
//     vp_symbols.cpp         which variables are tracked
//     value_propagation.cpp  the fixpoint over the blocks
//     vp_loops.cpp           what the sets and the loop hierarchy tell each other
//     vp_formals.cpp         what all calls pass in parameters
//     vp_rewrite.cpp         what the sets settle
//     vp_check.cpp           sets as assertions
#pragma once

#include "OPT5/vp/vp_eval.h"

class BBLK;
class NODE;

// Rewrites the current function by its value sets; where there is a loop hierarchy, its loops learn from them too. Needs
// alias marks. Blocks and edges stay; conditions that are decided become constants.
void do_value_propagation();
void install_value_propagation(); // once: the loop hierarchy, and rooms below that ask for values, find it then

// ---- Environments of blocks, from `construct` to `deconstruct`
// What is going to be asked: whatever rewriting looks at, divisions and choices alone, or arguments of calls alone.
enum class VP_QUESTION { REWRITING, DIVISIONS, ARGUMENTS };
void construct_vpsets_for_cfg(int noLoops, VP_QUESTION question = VP_QUESTION::REWRITING); // none where nothing is asked
void deconstruct_vpsets_for_cfg();
// At the block's entry, or exit; null where no path leads there, or nothing is known.
const vpenv* bb_vpenv(const BBLK* bb, bool at_exit);

// ---- vp_symbols.cpp
bool find_tracked_symbols(VP_QUESTION question); // false: none, and there is no store of environments

// ---- Rewriting
// By an environment that holds while the tree is evaluated. `lvalue`: the tree is a place that is written or has its
// address taken. The tree is consumed; sets `vp_changed` where something became simpler.
NODE* prop_values_in_tree(NODE* tree, vpenv env, bool lvalue, BBLK* bb);
extern bool vp_changed;
NODE* comparison(int op, SYMTAB* sym, WIDE value); // of the variable with the number, in the variable's type
// The predicates that say what is known of the symbol, in new trees; `extra` is joined to the set if it is not null.
std::vector<NODE*> list_VP_predicate_trees(const vpset& set, const VPSLICE* extra, SYMTAB* sym);

// ---- vp_check.cpp
bool values_are_asserted(); // as a debug switch wants it
bool depends_on_bounds(int op); // the simplifier makes more of it where it knows what its operands may be
void assert_bindings(BBLK* bb, vpenv env);
// Of the symbol behind the argument prolog, the first statement: that it has the value, or one of the set where that is null.
void assert_values_on_entry(class FUNINFO* f, SYMTAB* sym, const vpset& set, const NODE* value);
