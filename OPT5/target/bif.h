// Built-in functions: calls that the optimizer understands without a body. They stand in trees as ICALL, UICALL, MCALL
// or UMCALL and carry their name in the node. All descriptors are made at start-up, found by name, and never change
// after.
//
// A generic entry describes a function of the family; the names of the source are instances of generic entries or
// entries of their own. An operation that only needs to know what the optimizer's own marks are ("quest$colon",
// DONOTCSE) asks `find_BIF_descriptor`; what applies to source names asks `find_target_BIF_descriptor`.
#pragma once

#include "OPT5/ir/trees.h"

#include <cstdint>
#include <string>

struct LOOP;

enum BIF_FLAGS : uint32_t {
    IS_SELF_ASSOCIATIVE = 0x000001,
    TOWERS_LIKE_MINUS = 0x000002,
    TOWERS_LIKE_PLUS = 0x000004,
    OPDS_0_1_COMMUTE = 0x000008,
    OPDS_1_2_COMMUTE = 0x000010,
    LIKES_UMULT_OPDS = 0x000020,
    MAXVAL_IS_KNOWN = 0x000040,
    MINVAL_IS_KNOWN = 0x000080,
    RETURNS_1_OR_0 = 0x000100,
    OPDS_MUST_NOT_CSE = 0x000200,
    MUST_NOT_CSE = 0x000400,
    MUST_EXPAND = 0x000800,
    IS_GENERIC = 0x001000,
    IS_PROPER_ABSVAL = 0x002000,
    IS_PROPER_EXTRACT = 0x004000,
    IS_PROPER_MINVAL = 0x008000,
    IS_PROPER_MAXVAL = 0x010000,
    is_EFI = 0x020000,
    IS_MULTIPLY_ACCUMULATE = 0x040000,
    IS_MCALL_FOR_ONE_STAGE = 0x080000, // an ICALL that is an MCALL while the pipeline must not reorder it
    IS_BARRIER = 0x100000,
    IS_SIMPLE_VECTOR_OP = 0x200000,
    POINTS_INTO_OPERAND_0 = 0x400000,
    FORBIDS_SIMD = 0x800000,
};

struct BIF {
    using SIMPLIFIER = NODE* (*)(NODE* call, struct LOOP* loop);
    using EVALUATOR = NODE* (*)(NODE* call);

    BIF* partner = nullptr;             // generic entry and its instance, each the partner of the other
    BIF* associative_partner = nullptr; // the other version of an associative pair
    TYPE* return_type = nullptr;
    NODE* parameters = nullptr; // NAMEs chained by COMMA, null for none
    NODE* semantics = nullptr;  // an equivalent tree, or null
    INT65 minval, maxval;       // valid with MINVAL_IS_KNOWN, MAXVAL_IS_KNOWN
    uint64_t funinfo_flags = 0;
    SIMPLIFIER simplifier = nullptr;
    EVALUATOR evaluator = nullptr;
    uint32_t flags = 0;
    uint8_t opcode = 0;
    uint8_t nparams = 0;
    std::string name;

    bool has(uint32_t bits) const { return (flags & bits) != 0; }
};

// Once, after `init_target` and `init_types`.
void init_BIF_descriptors();
void init_BIFs_for_target();

// ---- Making. A misuse ends the run with "INTERNAL ERROR in <function>()" on stderr.
BIF* make_BIF_descriptor(int opcode, const char* name, int nparams, TYPE* ret);
BIF* make_simple_BIF(int opcode, const char* name, int nparams, TYPE* ret, ...); // the parameters' types; named a, b, c
void def_BIF_parameter(BIF* bif, int index, TYPE* type, char letter);            // in order of the indexes
NODE* get_BIF_parameter(char letter, BIF* bif);
void add_BIF_semantics(BIF* bif, NODE* tree, bool must_expand);
BIF* instantiate_generic_BIF(const char* name, BIF* generic);
BIF* instantiate_associative_BIF(const char* name, BIF* bif);
void set_BIF_callbacks(const char* name, BIF::SIMPLIFIER simplifier, BIF::EVALUATOR evaluator); // the instances' too

// ---- Finding. Null for an unknown name.
BIF* find_BIF_descriptor(const char* name);
BIF* find_target_BIF_descriptor(const char* name); // of a generic entry its instance, which may be null
void dump_BIF_descriptors(bool generics, bool non_generics);

// What the rule base declares of a call that has no descriptor; null while there is no rule base.
struct BIF_CALLBACKS {
    bool (*declared_flags)(const NODE* call, uint32_t* flags) = nullptr;
    uint32_t (*unCSEable_operands)(const NODE* call) = nullptr; // 255 without a declaration
    bool (*calculate_bounds)(const NODE* tree, struct LOOP* loop, INT65* min, INT65* max) = nullptr;
};
extern BIF_CALLBACKS bif_callbacks;

// ---- Calls in trees
// Coerces the arguments to the parameters' types, and the result from the return type to the type that the node had.
NODE* fix_BIF_types(NODE* call);
NODE* fix_pack_types(NODE* call);
// Bounds of a call's value; the limits of its type where nothing is known.
INT65 calculate_maxval_for_BIF_call(const NODE* call, struct LOOP* loop);
INT65 calculate_minval_for_BIF_call(const NODE* call, struct LOOP* loop);
bool ok_to_CSE_ICALL(const NODE* call);
bool ok_to_CSE_ICALL_opds(const NODE* call);
uint32_t find_unCSEable_opds(const NODE* call);
bool is_ICALL_callee(const NODE* call, const char* name, int nargs);
// An argument that the call reads and writes: stores the symbol behind it.
bool tree_is_IN_OUT_argument(const NODE* t, SYMTAB** sym);
// A call of the multiply-accumulate hardware: it acts on its operands alone, in registers.
bool is_multiply_accumulate_MCALL(const NODE* t);
bool is_barrier_MCALL(const char* name);    // a name of the source, without its language prefix
bool MCALL_stands_for_ICALL(const NODE* t); // an MCALL that is to be an ICALL again
bool is_EFI_MCALL(const NODE* t);
bool is_def_assert_ICALL_name(const char* name);
bool is_def_entry_ICALL_name(const char* name);
bool is_def_entry_ICALL_tree(const NODE* t);

// The call that stands for the dispatch of an exception, and the assignment of its value.
bool is_magic_EH_MCALL_ASG(const NODE* t);

// Conditionals whose arms are both computed.
bool is_strict_ternary_ICALL(const NODE* t);
NODE* make_strict_ternary_ICALL(NODE* quest);                    // QUEST over COLON
NODE* undo_strict_ternary_ICALL(NODE* call, bool arms_to_temps); // back to QUEST over COLON
NODE* make_AFFINE_IV_sym_ICALL(SYMTAB* sym);
bool is_AFFINE_IV_sym_ICALL(const NODE* t, const SYMTAB* sym);
NODE* make_ANTIALIASED_ICALL(NODE* p, NODE* q);
bool is_ANTIALIASED_ICALL(const NODE* t);

// ---- What other members of the family have and this one does not
NODE* subst_ICALLs_in_tree(NODE* tree);
NODE* map_16x16_MULT_to_ICALL(NODE* tree);
NODE* prop_values_thru_ICALL(NODE* tree);
NODE* simp_MPY_ICALL(NODE* tree, struct LOOP* loop);
bool name_is_16x16_MULT(const char* name);
[[noreturn]] const char* name_16x16_MULT();
