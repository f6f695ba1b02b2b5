// The client object of the reader. Its operations are spread over the read_*.cpp files by subject.
#pragma once

#include "OPT5/io/read.h"

#include <unordered_set>
#include <vector>

struct LIST;

class OPT_CLIENT final : public IF_CLIENT {
public:
    BASE_NODE* new_node(int op, TYPE* type) override;
    void drop_tree(BASE_NODE* tree) override;
    bool cl_magic(int, int) override { return true; }
    void cl_option_set(unsigned id, const std::vector<std::string>& options) override;
    I_SYMTAB* cl_symbol_create(const char* name, TYPE* type, TYPE* second_type, uint64_t size, uint32_t align, uint32_t value,
                               int sclass, uint16_t cqual, PSN* psn, uint32_t location, uint32_t option_set,
                               I_SYMTAB::RETENTION_POLICY retention) override;
    void cl_pragma(I_SYMTAB* sym, PRAGMA* pragma) override;
    void cl_symbol_init(I_SYMTAB* sym, std::vector<BASE_NODE*>& list) override;
    void cl_symbol_def(I_SYMTAB* sym) override;
    void cl_expr(BASE_NODE* tree, PSN* psn) override;
    void cl_begin_func(I_SYMTAB* sym, PSN* psn) override;
    void cl_end_args(PSN* psn) override;
    void cl_begin_block(PSN* psn) override;
    void cl_end_locals(PSN* psn) override;
    void cl_end_block(PSN* psn) override;
    void cl_end_func(PSN* psn) override;
    void cl_source(const char*) override {}
    void cl_label(uint32_t label) override;
    void cl_inline_asm(const char* text, PSN* psn) override;
    void cl_comment(const char* text) override;
    void cl_merge_type_defs() override;
    void cl_preprocess_statics() override;
    void cl_func_info(uint8_t) override {}
    bool cl_func_eht(EHT_ENTRY* entries, uint32_t count) override;
    // What an earlier run of an optimizer learned is dropped: it is learned anew.
    void cl_loop_def(uint32_t, uint32_t, uint32_t, uint32_t, uint32_t, uint16_t) override {}
    void cl_loop_header(uint32_t, I_SYMTAB*, uint8_t) override {}
    void cl_dd_vector(uint32_t, uint8_t, uint32_t, const uint16_t*) override {}
    void cl_dd_edge(uint32_t, uint32_t, uint32_t) override {}
    void cl_mbank(uint32_t, uint32_t, uint32_t, uint32_t, uint32_t) override {}
    void cl_ldspec_induct(uint32_t, uint32_t, int32_t, TYPE*, I_SYMTAB*) override {}
    void cl_ldspec_rand(uint32_t, uint32_t, uint32_t, TYPE*, I_SYMTAB*) override {}
    void cl_ldspec_region(uint32_t, uint32_t) override {}
    void cl_ir_begin_func(uint32_t, uint32_t, int, uint32_t, PSN*) override {}
    void cl_ir_end_func(PSN*) override {}
    void cl_ir_ins(PSN*) override {}

private:
    struct SCOPE_RECORD {
        PSN* psn;
        SYMTAB* outer; // head of the function's symbols when the scope began
    };

    void append(NODE* tree, PSN* psn);
    void note_label(uint32_t label);
    void note_references(const NODE* tree);
    void make_ptr_entries(const SYMTAB* outer);
    void close_scope(PSN* psn);
    void apply_function_pragma(SYMTAB* sym, const PRAGMA& pragma);
    void check_references();
    void add_return_pointer_assertion();

    std::vector<SCOPE_RECORD> open_scopes;
    std::unordered_set<uint32_t> labels; // defined in the function so far
    std::vector<uint32_t> labels_named;  // by its statements
    bool has_exception_entries = false;  // some call names one
    int64_t next_depnum = 0;
};

// Ends reading with what is wrong with the input, at the reader's position.
[[noreturn]] void refuse_input(const std::string& text);
// The same for a fault of a tree; nothing where there is none.
void refuse_if_faulty(const std::string& fault);

extern READ_LISTENER* read_listener; // never null while records are read
