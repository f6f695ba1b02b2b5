// The vocabulary that passes are written in: makers, queries, substitution, copying and erasing of trees.
//
// Makers return fresh trees with a null scope unless told. Functions that take a tree and return one consume the first.
// Makers and calls are in tree_make.cpp, queries in tree_query.cpp, congruence in congruence.cpp, copying and erasing in
// tree_copy.cpp, texts in tree_print.cpp.
#pragma once

#include "OPT5/ir/list.h"
#include "OPT5/ir/node.h"
#include "OPT5/ir/symtab.h"

#include <cstdint>
#include <string>

class BBLK;
struct EDGE;

// ---- Makers
NODE* mk_ICON(INT65 value, TYPE* type); // a pointer type gives `long`; the value is truncated to the type
NODE* mk_integer_constant(INT65 value, TYPE* type);
NODE* mk_NAME(SYMTAB* sym, LS* ls = nullptr);
NODE* mk_ASG(NODE* lhs, NODE* rhs); // ASG, STASG or ARASG by the left type
NODE* mk_BRANCH(BBLK* bb, LS* ls = nullptr);
NODE* mk_LABELREF_to_bb(BBLK* bb, LS* ls = nullptr);
NODE* mk_LABELREF(int32_t index, uint32_t profile = NO_PROFILE);
NODE* mk_LABELREF(LBL* lbl, uint32_t profile = NO_PROFILE); // counts the reference
NODE* mk_LABELDEF(LBL* lbl);
NODE* mk_COMMAOP(NODE* a, NODE* b); // `b` alone if `a` is null
NODE* mk_EXCLAIM(NODE* t);
NODE* mk_MINUS(NODE* a, NODE* b);
NODE* mk_ICALL(const char* name, NODE* args, TYPE* type);
NODE* mk_MCALL(const char* name, NODE* args, TYPE* type);
NODE* mk_IF(NODE* cond, int32_t true_index, uint32_t true_profile, int32_t false_index, uint32_t false_profile,
            LS* ls = nullptr);
NODE* mk_IF(NODE* cond, NODE* true_labelref, NODE* false_labelref, LS* ls = nullptr);
NODE* mk_ASM(int kind, const char* text); // kind 47 a comment, 36 inline assembly
// Both keep the tree where the other form could give another value: `x op= e` evaluates e before it reads x, and
// computes in the combined type of x and e.
NODE* ASG_to_opASG(NODE* tree);
NODE* opASG_to_ASG(NODE* tree);
// `x op= e` computes in `wanted`, the type of `x op e`.
bool compound_ASG_computes_in(TYPE* wanted, int op, const NODE* x, const NODE* e);
void insert_stmt_before_stmt_in_bb(NODE* stmt, LIST* before, BBLK* bb, PSN* psn);
void promote_toplevel_COMMAOPs_in_list(LIST* list, const LIST* end = nullptr); // up to the cell `end`

// ---- Calls
int arg_list_count(const NODE* list);
NODE* arg_list_lookup(NODE* list, int n); // element n from 0; null beyond the end
NODE* arg_list_append(NODE* list, NODE* arg);
SYMTAB* get_callee_for_call(const NODE* call); // of CALL or UCALL through UAND(NAME), else null
NODE* get_arguments_to_call(const NODE* call);

// ---- Queries
// What the SSA operators on a tree stand for; a phi stays, and so does null.
inline const NODE* below_SSA(const NODE* t) {
    while (t && op_wraps_for_SSA(t->op)) t = t->left;
    return t;
}
inline NODE* below_SSA(NODE* t) { return const_cast<NODE*>(below_SSA(static_cast<const NODE*>(t))); }
bool tree_has_side_effects(const NODE* t);    // a volatile read is one
bool lvalue_is_volatile(const NODE* t);       // of NAME, UMULT, STDOT, STREF, by the node, its object and `volit_vars`
bool is_def_assert_ICALL_tree(const NODE* t); // a fact attached to a value: ICALL "def$assert"(value, fact, text)
bool tree_is_trivially_invertible(const NODE* t); // has an operator for its logical opposite
bool trees_are_congruent(const NODE* a, const NODE* b, bool se_ok);
inline bool trees_are_congruent_se_ok(const NODE* a, const NODE* b) { return trees_are_congruent(a, b, true); }
bool bools_are_congruent(const NODE* a, const NODE* b, bool negated, bool se_ok);
bool tree_lists_are_congruent(const LIST* a, const LIST* b);
bool expr_is_constant(const NODE* t);
bool expr_is_globally_evaluable(const NODE* t);
// Whether it saves the environment, to which control may come back later.
bool calls_setjmp(const NODE* t);
bool tree_is_ASM_comment(const NODE* t);
// The call that stands for the dispatch of an exception, and the SWITCH on it, which follows a statement that may
// throw.
constexpr char MAGIC_EH_NAME[] = "eh$dispatch";
bool is_magic_EH_MCALL(const NODE* t);
bool tree_is_EH_SWITCH(const NODE* t); // `t` may be null
bool vector_types_exist_in_tree(const NODE* t);
bool complex_types_exist_in_tree(const NODE* t);
bool tree_is_arg_prolog(const NODE* t);
bool stmt_is_arg_prolog(const LIST* stmt);
bool tree_is_extended_arg_prolog(const NODE* t, const NODE* first);
bool tree_references_NAME(const NODE* t, const NODE* name);
bool sym_appears_in_tree(const SYMTAB* sym, const NODE* t);
bool sym_appears_in_bb(const SYMTAB* sym, const BBLK* bb);
bool sym_appears_in_list(const SYMTAB* sym, const LIST* list);
bool tree_contains_op(const NODE* t, int op);
bool tree_contains_matching_node(const NODE* t, bool (*predicate)(const NODE*));
bool tree_has_DDNODE_subtrees(const NODE* t);
bool tree_is_subtree_of_tree(const NODE* a, const NODE* b);
bool tree_is_strict_subtree_of_tree(const NODE* a, const NODE* b);
// All nodes; without leaves, and the hidden state argument of machine calls, for `skip_leaves`; without the root and
// the COMMAs below it, which only hold a statement together, for `statement_spine`.
int count_nodes_in_tree(const NODE* t, bool skip_leaves = false, bool statement_spine = false);
int count_lvalues_in_tree(const NODE* t, const NODE* lvalue);
int count_calls_in_tree(const NODE* t);
// The sum of the constant terms of an lvalue's address or of a pointer, in 16-bit units.
long byte_offset_on_indirection(const NODE* t);
// Stores that sum; false if the pointer is not one base plus constants, or a term does not fit.
bool total_pointer_offset_value(const NODE* t, INT65* offset);
bool pointer_is_an_adcon(const NODE* t);         // known before the run, up to linking
bool pointer_contains_adcon_term(const NODE* t); // the address of an object plus something, so never null
bool lvalue_is_a_ref_parm(const NODE* t);        // what a pointer parameter points to
bool tree_addresses_an_argument(const NODE* t);  // takes the address of a parameter or its local copy
// A parameter (level 1) and the local (level 2) that the argument prolog copies it into; null where there is none.
SYMTAB* map_sym_to_parm(const SYMTAB* sym);
SYMTAB* map_parm_to_sym(const SYMTAB* parm);
SYMTAB* object_name_if_known(const NODE* tree); // the object that an lvalue lies in for certain, or null
// The pointer that a call of a built-in derives its value from, or null for any other tree.
const NODE* pointer_behind_builtin(const NODE* tree);
// The object that a pointer points into for certain, or null: whatever is added, it stays in it.
SYMTAB* pointee_name_if_known(const NODE* pointer);

// ---- Substitution
NODE* subst_sym_for_sym_in_tree(SYMTAB* from, SYMTAB* to, NODE* t);
NODE* subst_sym_pairs_in_tree(NODE* t, const SYMPAIRLIST* pairs);
// Copies of `replacement` for what is congruent to `lvalue`. One that is no lvalue replaces reads only.
NODE* subst_tree_for_lvalue_in_tree(const NODE* replacement, const NODE* lvalue, NODE* t);
NODE* expunge_IDENTITY_ops_from_tree(NODE* t);

// ---- Copying
NODE* copy_tree(const NODE* t, bool keep_scope = true);
NODE* copy_dd_tree(const NODE* t, bool keep_scope = true);
NODE* copy_node(const NODE* t, bool keep_scope = true); // operands stay shared
NODE* copy_dd_node(const NODE* t, bool keep_scope);
NODE* copy_tree_0(const NODE* t, FUNINFO* funinfo); // across functions
NODE* copy_node_if_changed(NODE* node, NODE* left, NODE* right);
LIST* copy_statements(const LIST* list, bool keep_scope = true);
LIST* copy_shared_statements(const LIST* list);
LIST* copy_dd_statements(const LIST* list, bool keep_scope = true);

// ---- Erasing. A node erased twice is an internal error. LABELREFs are not discounted: their labels may be freed by
// then.
void erase_tree(NODE* t);
void erase_node(NODE* t);              // one node with what it owns, not its operands
NODE* taken_out_of_members(NODE* place); // the object below the STDOTs of a place, which are erased
void erase_tree_list(LIST* list);      // trees and cells
void erase_tree_list_only(LIST* list); // cells
void erase_tree_list_to_entry(LIST* list, LIST* entry);

// For walks that rewrite few of the trees that they look at: a store of what is there already would send each node of a
// large function back to memory.
inline void put_operand(NODE*& operand, NODE* now) {
    if (operand != now) operand = now;
}

// ---- Walking. `visit` sees every node, operands before the node that holds them.
template <class F>
void for_each_node(NODE* t, F&& visit) {
    if (!t) return;
    for_each_node(t->left, visit);
    for_each_node(t->right, visit);
    visit(t);
}
// Replaces every node, operands first, by what `rewrite` makes of it.
template <class F>
NODE* rewrite_tree(NODE* t, F&& rewrite) {
    if (!t) return nullptr;
    put_operand(t->left, rewrite_tree(t->left, rewrite));
    put_operand(t->right, rewrite_tree(t->right, rewrite));
    return rewrite(t);
}

// ---- Text
std::string tree_to_infix(const NODE* t);                  // C-like, parentheses by precedence
std::string stmt2infix(const NODE* t);                     // as a statement
void print_tree(FILE* out, const NODE* t, int indent = 0); // one line a node, operands indented
