// Propagation of data along SSA form: which sequence of values a definition gives, from one iteration of its loop to
// the next.
//
// Definitions that depend on each other form strongly connected regions. A region is looked at in the innermost loop
// that its definitions stand in; what is defined outside that loop is invariant there, and what an inner loop defines
// is not known.
#pragma once

#include "OPT5/dd/ssa.h"

#include <cstdint>
#include <cstdio>
#include <vector>

struct LOOP;

enum IV_CLASS : uint32_t {
    IVC_NONE,
    IVC_LITERAL_CONSTANT,
    IVC_REGION_CONSTANT,
    IVC_AFFINE_LINEAR,    // the same amount is added in each iteration
    IVC_PSEUDO_LINEAR,    // amounts that are known, and differ from path to path
    IVC_SIMPLE_GEOMETRIC, // multiplied by a constant
    IVC_POLYNOMIAL,       // a sequence is added
    IVC_WRAPAROUND,       // a sequence, one iteration late
    IVC_FLIP_FLOP,        // two values change places
    IVC_SHIFT_RIGHT,
    IVC_MONOTONIC_OTHER, // an invariant of known sign is added
    IVC_SIMPLE_LIST,     // what it points to holds the next one
};
extern const char* const ivClass_names[];

enum SSADATA_FLAG : uint8_t {
    SSADATA_lattice_bot = 0x1,
    SSADATA_level_1_parameter = 0x2,
    SSADATA_loop_merging_phi = 0x4,
    SSADATA_monotonic_decr = 0x8,
    SSADATA_monotonic_incr = 0x10,
    SSADATA_strict_monotonic = 0x20,
    SSADATA_trivial_cycle = 0x40,
    SSADATA_visited = 0x80,
};

// Of one definition.
struct SSADATA {
    NODE* node = nullptr;
    BBLK* block = nullptr;
    std::vector<NODE*> duChain;     // SSA_USE, SSA_MU and phis that read it
    std::vector<NODE*> constraints; // conditions that hold of the value; owned, without SSA operators
    NODE* value = nullptr;          // closed form where the class has one; owned, without SSA operators
    NODE* recurrence = nullptr;     // of the head of a cycle: what is added, or multiplied by; owned
    SSADATA* cycleHead = nullptr;
    int64_t pathLength = 0, cycleMin = 0, cycleDif = 0; // cycleDif: the largest step less the smallest
    int64_t lexicalNumber = 0;
    uint32_t scrNumber = 0;
    uint32_t ivClass = IVC_NONE;
    uint8_t flags = 0;

    SSADATA() = default;
    SSADATA(const SSADATA&) = delete;
    SSADATA& operator=(const SSADATA&) = delete;
    ~SSADATA();
    bool has(uint8_t bits) const { return (flags & bits) != 0; }
    bool is_lattice_bot() const { return has(SSADATA_lattice_bot); }
    bool is_loop_merging_phi() const { return has(SSADATA_loop_merging_phi); }
    bool is_monotonic_decr() const { return has(SSADATA_monotonic_decr); }
    bool is_monotonic_incr() const { return has(SSADATA_monotonic_incr); }
    bool is_visited() const { return has(SSADATA_visited); }
    bool is_lattice_top() const { return ivClass == IVC_NONE && !value && !is_lattice_bot(); }
};

// Between these the function is in SSA form, with decorations. Works without a hierarchy too: nothing is a loop then.
void begin_SSA_data_propagation();
void wrap_up_SSA_data_propagation();
SSADATA* SSADATA_of(const NODE* definition); // null for null and for what is no definition
void dump_SSADATA_information(FILE* out);
// A tree of the value of a definition; whether it is of the class. Fills the record.
bool classify_literal_constant(NODE* value, SSADATA* data);
bool classify_region_constant(NODE* value, SSADATA* data);
bool is_a_loop_merging_phi(const NODE* phi); // at a loop's head, one argument from outside and one from the loop

// ---- What reaches a loop's entry: LOOP::rdefs
void add_rdef_at_loop_entry(NODE* definition, struct LOOP* loop);
void add_rdefs_from_loop_preheader(struct LOOP* loop);
void add_rdefs_at_function_entry();
NODE* find_rdef_at_loop_entry(const NODE* lvalue, const struct LOOP* loop); // null: not known
// The value on entry to a loop, as a new tree without SSA operators, or null.
NODE* find_SSA_sym_init(SYMTAB* sym, struct LOOP* loop);
NODE* find_SSA_expr_init(const NODE* expr, struct LOOP* loop);

// Region constants, assertions and induction variables of the hierarchy, with what the propagation finds besides.
void find_SSA_loop_vars_and_assertions();
