// IF_CLIENT: the one interface between the I-file layer and whoever uses it. The reader calls these operations as records
// arrive.
//
// Trees and symbols passed in belong to the client from then on, except where told. Texts and arrays are borrowed for
// the time of the call. Positions live as long as the I_FILE.
#pragma once

#include "IFILE/base_node.h"
#include "IFILE/i_symtab.h"
#include "IFILE/pragma.h"

#include <cstdint>
#include <string>
#include <vector>

enum EHT_ENTRY_KIND { EHK_ROOT_NODE, EHK_CLEANUP, EHK_CATCH, EHK_CLEANUP_END, EHK_CATCH_END, EHK_THROW_TERMINATE };
constexpr uint32_t EHT_ROOT_ID = 0;

struct I_CATCH_ENTRY {
    std::string type_name;
    uint32_t label = 0;
    bool flag = false;
};

// One entry of a function's exception table in its file form.
struct EHT_ENTRY {
    uint32_t id = 0;
    uint32_t kind = EHK_ROOT_NODE;
    uint32_t next = 0;
    uint32_t count = 0;           // catch clauses
    BASE_NODE* cleanup = nullptr; // EHK_CLEANUP only
    std::vector<I_CATCH_ENTRY> catches;
};

// One element of a dependence vector in its file form.
struct DD_ENTRY {
    uint8_t direction;
    int8_t distance;
};

class IF_CLIENT {
public:
    virtual ~IF_CLIENT() = default;

    // Makes a node for the reader to fill. `op` is at most 163 and has a row in `if_node_info`; `type` may be null.
    virtual BASE_NODE* new_node(int op, TYPE* type) = 0;
    // Gives back a tree that the reader read and does not pass on.
    virtual void drop_tree(BASE_NODE* tree) = 0;

    virtual bool cl_magic(int version, int cpu) = 0; // false refuses the file
    virtual void cl_option_set(unsigned id, const std::vector<std::string>& options) = 0;
    virtual I_SYMTAB* cl_symbol_create(const char* name, TYPE* type, TYPE* second_type, uint64_t size, uint32_t align,
                                       uint32_t value, int sclass, uint16_t cqual, PSN* psn, uint32_t location,
                                       uint32_t option_set, I_SYMTAB::RETENTION_POLICY retention) = 0;
    // The pragma belongs to the client. `sym` is null for one that follows no symbol.
    virtual void cl_pragma(I_SYMTAB* sym, PRAGMA* pragma) = 0;
    virtual void cl_symbol_init(I_SYMTAB* sym, std::vector<BASE_NODE*>& list) = 0; // the last tree is ENDINIT
    virtual void cl_symbol_def(I_SYMTAB* sym) = 0;
    virtual void cl_expr(BASE_NODE* tree, PSN* psn) = 0; // tree is null for an expression header without a tree
    virtual void cl_begin_func(I_SYMTAB* sym, PSN* psn) = 0;
    virtual void cl_end_args(PSN* psn) = 0;
    virtual void cl_begin_block(PSN* psn) = 0;
    virtual void cl_end_locals(PSN* psn) = 0;
    virtual void cl_end_block(PSN* psn) = 0;
    virtual void cl_end_func(PSN* psn) = 0;
    virtual void cl_source(const char* name) = 0;
    virtual void cl_label(uint32_t label) = 0;
    virtual void cl_inline_asm(const char* text, PSN* psn) = 0;
    virtual void cl_comment(const char* text) = 0;
    virtual void cl_merge_type_defs() = 0;
    virtual void cl_preprocess_statics() = 0;
    virtual void cl_func_info(uint8_t info) = 0;
    virtual bool cl_func_eht(EHT_ENTRY* entries, uint32_t count) = 0; // true: the layer frees the array
    virtual void cl_loop_def(uint32_t id, uint32_t outer, uint32_t min, uint32_t max, uint32_t factor,
                             uint16_t flags) = 0;
    virtual void cl_loop_header(uint32_t id, I_SYMTAB* lcv, uint8_t flags) = 0;
    virtual void cl_dd_vector(uint32_t id, uint8_t flags, uint32_t count,
                              const uint16_t* elements) = 0; // direction low
    virtual void cl_dd_edge(uint32_t from, uint32_t to, uint32_t vector) = 0;
    virtual void cl_mbank(uint32_t a, uint32_t b, uint32_t c, uint32_t d, uint32_t e) = 0;
    virtual void cl_ldspec_induct(uint32_t id, uint32_t word, int32_t step, TYPE* type, I_SYMTAB* sym) = 0;
    virtual void cl_ldspec_rand(uint32_t id, uint32_t word, uint32_t word2, TYPE* type, I_SYMTAB* sym) = 0;
    virtual void cl_ldspec_region(uint32_t id, uint32_t label) = 0;
    virtual void cl_ir_begin_func(uint32_t a, uint32_t b, int c, uint32_t d, PSN* psn) = 0;
    virtual void cl_ir_end_func(PSN* psn) = 0;
    virtual void cl_ir_ins(PSN* psn) = 0;
};
