// SSA form of the current function, on its trees: for a pass that wants to know which definition a use reads.
//
// `construct_SSA_form` wraps the references of tracked variables in operators and `deconstruct_SSA_form` takes them off
// again. In between, a pass that adds a reference to a tracked variable wraps it, and a pass that removes a definition
// leaves no use of it.
//
//     SSA_USE(reference)    reads the variable; `ssa_reach` is its definition
//     SSA_DEF(assignment)   the assignment writes the whole variable; its left operand is bare. `x op= e`, `++x`: the
//     left
//                           operand is an SSA_USE
//     SSA_CHI(tree)         evaluating the tree may change the variable: a call, a write to what may overlap;
//                           `ssa_reach` is what it was before
//     SSA_MU(tree)          evaluating the tree may read it
//     SSA_PHI               at the start of a block, ahead of its statements: one argument for each predecessor
//
// Operators of one tree are in a chain: SSA_CHI(SSA_CHI(CALL ...)), SSA_CHI(SSA_DEF(ASG ...)). A definition is one of
// SSA_DEF, SSA_CHI, SSA_PHI and has a version, from 1; a reach of null, version 0, is the value on entry to the
// function.
//
// What is tracked: variables and members of integer, enumeration, pointer or floating-point type that are not volatile,
// structures as a whole, and the same behind a pointer variable at a constant distance. An object is not tracked
// at all if clean-up code of exceptions names it or if it is assigned within an expression. A reference that is not
// certain to be evaluated ahead of a write in the same statement is left bare: it reads nothing that is known.
//
// SSA is pruned: a phi or chi stands only where the variable may be read later by a wrapped reference. Whoever adds
// such a reference may take it from a place that the definition dominates without another definition in between.
//
//     ssa_variables.cpp what is tracked; which entries overlap      ssa_references.cpp operators in, and what may
//     change ssa_form.cpp liveness, phis, renaming                         ssa_removal.cpp operators out ssa_check.cpp
//     the verifier and the dump
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/node.h"
#include "OPT5/ir/trees.h"
#include "XINT/int65.h"

#include <cstdint>
#include <memory>
#include <vector>

class SYMTAB;
struct LOOP;

enum SSAVAR_FLAG : uint16_t {
    SSAVAR_entire_object = 0x1,
    SSAVAR_fixed_address = 0x2, // of a symbol, not behind a pointer
    SSAVAR_DEFd = 0x4,
    SSAVAR_USEd = 0x8,
    SSAVAR_aliased = 0x10,         // reached by other than its name; every entry behind a pointer is
    SSAVAR_array = 0x20,           // the object is an array, or holds one that was referenced
    SSAVAR_likely_register = 0x40, // a local scalar as a whole
    SSAVAR_global = 0x80,
    SSAVAR_multi_bb = 0x100, // referenced in more than one block; only these have phis
    SSAVAR_munged = 0x200,   // given up: its operators are to be ignored
    SSAVAR_unioned = 0x400,  // overlaps another entry of its ring
};

// A tracked variable: an object, a part of one, or what a pointer variable points to.
class SSAVAR {
public:
    SSAVAR* ring = nullptr;    // next entry of the same object or pointer, in a circle
    SYMTAB* sym = nullptr;     // null behind a pointer
    SYMTAB* pointer = nullptr; // null for a direct entry
    NODE* tree = nullptr;      // a copy of the reference without SSA operators; owned
    INT65 start, length;       // bits: in the object, or from where the pointer points
    uint32_t uid = 0;          // index in `ssa_variables()`
    uint16_t flags = 0;

    explicit SSAVAR(uint32_t uid) : uid(uid) {}
    SSAVAR(const SSAVAR&) = delete;
    SSAVAR& operator=(const SSAVAR&) = delete;
    ~SSAVAR();
    bool has(uint16_t bits) const { return (flags & bits) != 0; }
    SYMTAB* base() const { return sym ? sym : pointer; }
    bool is_memory() const { return has(SSAVAR_aliased | SSAVAR_global); } // calls or pointers may reach it
    bool overlaps(const SSAVAR* other) const;                              // of the same ring
    // Direct, entire, not volatile, of integer, pointer or floating-point type.
    bool is_a_simple_IV_candidate() const;
    bool occurs_in_tree(const NODE* t) const; // an operator of it does
};

// ---- The form of the current function

// `onlySSV`: local scalars alone; `onlyIV`: whole integers, pointers and floating-point variables alone; `vectorsToo`:
// also vectors; `onlyMemory`: not the local scalars that a register holds, whose references stay as they are. Blocks are numbered afterwards, alias marks and dominators are known. Where nothing is tracked, or too
// much, the function stays out of the form.
void construct_SSA_form(bool onlySSV, bool onlyIV, bool vectorsToo, bool onlyMemory = false);
void deconstruct_SSA_form(); // no effect out of the form
extern bool function_is_in_SSA_form;

// A function stays out of the form if it has more tracked variables, more phis and chis than this and four for each
// reference, or variables that are live at the start of so many blocks that finding out would take the square of its size.
constexpr uint32_t MOST_SSA_VARIABLES = 65535, MOST_SSA_DEFINITIONS = 65535;

const std::vector<std::unique_ptr<SSAVAR>>& ssa_variables();
struct SSA_DEFINITION {
    NODE* node = nullptr; // SSA_DEF, SSA_CHI or SSA_PHI; null: gone, or version 0
    BBLK* block = nullptr;
};
std::vector<SSA_DEFINITION>& ssa_definitions(); // by version; [0] is empty
// For a new SSA_DEF, SSA_CHI or SSA_PHI: gives it the next version. The node has its variable and operand.
void enter_ssa_definition(NODE* node, SSAVAR* variable, BBLK* block);

// ---- Operators

inline bool op_is_SSA_definition(int op) { return op == SSA_PHI || op == SSA_DEF || op == SSA_CHI; }
inline SSAVAR* ssa_variable(const NODE* t) { return t->u.ssa; }
// The statement is simplified when the function leaves the form, or, in normal form, when its trees leave that.
void note_changed_statement(LIST* cell);
// Of a definition its own; of SSA_USE and SSA_MU that of the definition that they read.
uint32_t ssa_version(const NODE* t);
// SSA_USE, SSA_MU, SSA_CHI: the definition that reaches; null: the value on entry to the function.
inline NODE* ssa_reach(const NODE* t) { return t->reach; }
inline void set_ssa_reach(NODE* t, NODE* definition) { t->reach = definition; }

struct SSA_ARG {
    BBLK* block = nullptr;      // the predecessor
    NODE* definition = nullptr; // null: the value on entry to the function
};
std::vector<SSA_ARG>& ssa_args(NODE* phi);
const std::vector<SSA_ARG>& ssa_args(const NODE* phi);

NODE* make_SSA_USE(NODE* reference, SSAVAR* variable, NODE* definition); // consumes the reference
NODE* make_SSA_USE_for_rdef(NODE* definition, SSAVAR* variable);         // of a copy of the variable's tree
// The assignment of an SSA_DEF (ASG, STASG, a compound one, ++, --), null of another definition.
NODE* ssa_assignment(NODE* definition);
bool ssa_value_is_likely_register(const NODE* tree); // an SSA_USE of one, or a NAME that would be
bool scalar_analysis_IV_candidate(const NODE* lvalue);
bool tree_is_level_1_parameter(const NODE* tree);

// Every definition that is no phi and every use of a tree, operands ahead of what holds them and the right operand
// ahead of the left: the order of renaming.
template <class F>
void for_each_SSA_operator(NODE* t, F&& visit) {
    if (!t) return;
    for_each_SSA_operator(t->right, visit);
    for_each_SSA_operator(t->left, visit);
    if (op_is_SSA(t->op)) visit(t);
}

// ---- Giving up and taking off

// `v` and what overlaps it is given up; with `keepSelf` all but `v`.
void munge_SSAVAR_until_no_good(SSAVAR* v, int keepSelf);
NODE* copy_tree_removing_SSA_operators(const NODE* t);
NODE* copy_dd_tree_removing_SSA_operators(const NODE* t); // records of dependence too
NODE* remove_SSA_operators_in_tree(NODE* t);              // consumes; null for a phi

// ---- ssa_check.cpp
int validate_SSA_form(); // what is wrong, to the debug stream or stderr; the number of findings
void dump_SSA_function_body();
// Into the form and out of it; a statement that is not what it was before ends the run.
void enter_and_leave_SSA_form(bool onlySSV, bool onlyIV, bool vectorsToo);

// ---- ssa_decorations.cpp: definitions for facts. Out of the form.
// x = def$assert((x, IDENTITY(condition))) where the condition holds from there on, g = def$entry(g) for globals.
void insert_SSA_decoration_trees();
void remove_SSA_decoration_trees();

// ---- Passes on the form; each does nothing out of it. What they find is in the headers of the files.
void propagate_SSA_constants(int passes);
void eliminate_dead_SSA_assignments();
void clone_SSA_NASSERTs();
void hoist_SSA_region_constants();
// With two forms of its own. Whether anything was promoted.
bool promote_vars_to_registers(bool withAssertions);
// Write their line to the debug stream, and have no effect.
void split_live_SSA_ranges();
void coalesce_SSA_variables();
void reduce_critical_paths_and_cycles();
