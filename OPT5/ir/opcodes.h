// Opcodes of tree nodes and the tables of their properties.
//
// The numbers 0 to 163 are the I-file's, 164 and up exist only inside the optimizer. ILLOP is at once the code of an
// erased node and the "no such operator" value in the tables. The tables are filled once by `init_opcode_tables` and are
// read-only afterwards.
#pragma once

#include <cstdint>

constexpr int NO_OPCODES = 225;   // table size
constexpr int NOT_BOOLEAN = 255;  // in opcodes.def: the result isn't a truth value

enum OPCODE : int {
#define OPCODE(code, name, operands, precedence, side_effect, sp, mirror, negation, base) name = code,
#include "OPT5/ir/opcodes.def"
#undef OPCODE
    EPVAL = 110, // stands in the I-file only: the reader folds it into its operand
};

extern const char* node_operator_name[NO_OPCODES]; // null in gaps; LABELREF is printed "LABEL"
extern uint8_t number_of_operands[NO_OPCODES];     // 255: no fixed count
extern uint8_t precedence[NO_OPCODES];
extern uint8_t side_effects[NO_OPCODES];           // 0 none, 1 writes left, 2 transfers control, 255 anything
extern bool op_OK_for_SP[NO_OPCODES];
extern uint8_t commute_inv[NO_OPCODES];            // the mirror, or ILLOP
extern bool boolean_result[NO_OPCODES];
extern uint8_t boolean_inv[NO_OPCODES];            // the logical opposite, or ILLOP
extern uint8_t op_of_opASG[NO_OPCODES];            // plain operator of a compound assignment, or ILLOP
// What walks ask of each node, from the tables above: an OP_TRAIT each.
extern uint8_t op_traits[NO_OPCODES];
enum OP_TRAIT : uint8_t {
    OP_ASSIGNS = 1,     // an assignment operator: plain, structure, array and compound, increments included
    OP_WRITES_LEFT = 2, // gives its left operand a value; a loop's counter is one; no operator of SSA form
    OP_ACTS = 4,        // may do more than compute a value: writes, calls, transfers control, or what is not known
};

// A floating compare as a set of outcomes: bit 1 equal, 2 less, 4 greater, 8 unordered. Indexed by op - FEQ.
constexpr int float_op_to_micro_ops[14] = {1, 6, 3, 2, 5, 4, 9, 14, 11, 10, 13, 12, 7, 8};
constexpr int FLOAT_ALWAYS_FALSE = 65536, FLOAT_ALWAYS_TRUE = 65537; // no opcodes
extern int float_micro_ops_to_op[16];

// Fills the tables, then checks them against the I-file layer's table; a mismatch ends the run.
void init_opcode_tables();

constexpr bool op_is_SSA(int op) { return op >= SSA_PHI && op <= SSA_CHI; }
constexpr bool op_wraps_for_SSA(int op) { return op >= SSA_USE && op <= SSA_CHI; } // stands for its operand
constexpr bool op_is_float_compare(int op) { return op >= FEQ && op <= FUNO; }
constexpr bool op_is_int_compare(int op) { return op >= EQ && op <= UGT; }
// Accesses: an object by its name, something behind a pointer, a member of one of them.
constexpr bool op_is_indirection(int op) { return op == UMULT || op == STREF; }
constexpr bool op_is_load(int op) { return op_is_indirection(op) || op == STDOT; }
constexpr bool op_is_lvalue(int op) { return op_is_load(op) || op == NAME; }
constexpr bool op_is_call(int op) { return op == CALL || op == UCALL; }
constexpr bool op_is_intrinsic(int op) { return op == ICALL || op == UICALL || op == MCALL || op == UMCALL; }
// Arithmetic on the values of one or two operands: sums, products, quotients, bits, shifts, and what takes one number.
constexpr bool op_is_arithmetic(int op) {
    switch (op) {
    case PLUS:
    case MINUS:
    case MULT:
    case DIV:
    case MOD:
    case ANDB:
    case ORB:
    case XORB:
    case SLL:
    case SRL:
    case UMINUS:
    case NOTB:
    case ABS: return true;
    default: return false;
    }
}
inline bool opcode_is_ASG(int op) { return op >= 0 && op < NO_OPCODES && op_traits[op] & OP_ASSIGNS; }
// A printable name; "OP#n" in a static buffer for a gap.
const char* opname(int op);
// The compound assignment whose base operator is `op`, or ILLOP.
int opASG_of_op(int op);
