// The target model: which silicon, which optional units, what an access costs, and the entry points that a register
// allocator would fill. Registers are assigned in the next tool of the chain; this stage only prepares for it.
#pragma once

#include "OPT5/ir/list.h"
#include "OPT5/ir/node.h"
#include "OPT5/ir/symtab.h"

class BITVEC;

extern int float_support; // 0 none, 10 a single-precision unit, 11 a double-precision unit as well
extern bool is_fpu64;
inline bool has_hardware_float() { return (float_support | 1) == 11; }

// By TYPE::ekind(): [0] the 16-bit units of a memory access, 0 where the kind has no access of its own; the rest is 0.
constexpr int EKINDS = 27;
extern const int32_t target_memref[EKINDS][4];

// From the file's options, once they are known. Unknown values are warned of and the defaults kept.
void init_target();

bool target_is_this_version(const char* text);                   // true
bool target_is_superset_of_target(const char* a, const char* b); // false
bool reserve_global_register(const char* name);                  // false: no register can be reserved
int init_reg_defs();                                             // resets the count of stack variables; 0
bool leaf_is_immediate(const NODE* t);
bool offset_is_in_range(INT65 offset, const TYPE* type, int scale); // of an addressing mode: 0 to 32767
// The operands that the 16-bit multiply reads from memory itself where it makes the product `t`: 1 the left one, 2 the right
// one, or both; a cast of one is part of the access. 0: it does not make the product, or from registers.
unsigned mpy16_memory_operands(const NODE* t);
inline const NODE* without_mpy16_cast(const NODE* operand) { return operand->op == SCONV ? operand->left : operand; }
NODE* cpu_bit_test_subtree(NODE* t);                                // what a test of one bit is made on
long cost_for_DIV_to_MULT_expr(const NODE* t);

// Gives the automatic variables that can lie anywhere on the stack their class and number. Returns the list.
SYMTAB* sort_stack_variables(SYMTAB* list);
void lower_addresses(); // of every statement of the current function, into the forms that instructions take
void allocate_regs(); // the pass, over the current function

// The factor, at least 1, by which a loop of one block pays to be unrolled: a divisor of `count`, its trip count.
// `statements` are its body, of which the last is the branch.
INT65 loop_unrolling_factor(const LIST* statements, INT65 count);

bool tree_is_OK_for_unrolling(const NODE* stmt);

// ---- What a register allocator asks of the target; nothing to do here
void find_target_conflicts(NODE* t, BITVEC* live, BITVEC* conflicts, long index);
void mark_live_across_call(BITVEC* live, NODE* call);
void target_lra_uses(NODE* t, BITVEC* uses);
void target_lra_defs(NODE* t, BITVEC* defs);
void mark_outgoing_arg_vars(NODE* call);
void copy_reg_preferences(SYMTAB* from, unsigned long from_index, SYMTAB* to, unsigned long to_index);
void wrapup_allocation();
bool op_affects_RPTB_regs(const NODE* t);
void add_reg_to_set(const SYMTAB* sym, BITVEC* set); // by register number, if that is below 64
void remove_reg_from_set(const SYMTAB* sym, BITVEC* set);
