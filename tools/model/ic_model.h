// An I-file in memory, as the tools beside the optimizer hold it: read whole, looked at or executed, written again.
//
// Nodes, texts and records live in the unit's arena and are never freed one by one; a node is one cache line. Positions
// and file names belong to the I_FILE that was read, which the unit keeps open as long as it lives.
#pragma once

#include "IFILE/ifile.h"

#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

class IC_SYMBOL;

class IC_ARENA {
public:
    void* take(size_t size);
    const char* copy(const char* bytes, size_t length); // with a terminating 0
    const char* copy(const char* text) { return copy(text, std::strlen(text)); }

private:
    std::vector<std::unique_ptr<char[]>> blocks_m;
    char* next_m = nullptr;
    size_t left_m = 0;
};

class IC_NODE final : public BASE_NODE {
public:
    IC_NODE* left = nullptr;
    IC_NODE* right = nullptr;
    // `value` of ICON and, for its flags, of DDNODE; `text` of SCON, LCON, FCON and the calls by name; `sym` of NAME;
    // `member` of FIELD.
    union {
        int64_t value = 0;
        IC_SYMBOL* sym;
        const char* text;
        fkMDATA* member;
    };
    // Label, cases, skip count, register, length of SCON, kind of FIELD, variable arguments, id of DDNODE, edge count.
    uint32_t number = 0;
    uint32_t number2 = 0; // exception entry, locale of DDNODE

    explicit IC_NODE(IC_ARENA* arena) : arena_m(arena) {}

    I_SYMTAB* name_symbol() const override;
    int field_kind() const override { return static_cast<int32_t>(number); }
    fkMDATA* field_mval() const override { return member; }
    TYPE* field_csu() const override { return csu_m; }
    uint32_t icon_uvalue() const override { return static_cast<uint32_t>(value); }
    int32_t icon_svalue() const override { return static_cast<int32_t>(value); }
    const char* lcon_value() const override { return text; }
    const char* fcon_value() const override { return text; }
    const char* scon_value() const override { return text; }
    uint32_t scon_length() const override { return number; }
    uint32_t label_id() const override { return number; }
    int32_t vreg_id() const override { return static_cast<int32_t>(number); }
    uint32_t skip_count() const override { return number; }
    uint32_t case_count() const override { return number; }
    uint32_t ddnode_id() const override { return number; }
    uint32_t ddnode_locale() const override { return number2; }
    uint8_t ddnode_flags() const override { return static_cast<uint8_t>(value); }
    uint32_t call_num_vargs() const override { return number; }
    const char* icall_name() const override { return text; }
    uint32_t eh_entry_id() const override { return number2; }
    uint32_t get_edge_profile_value() const override { return number; }

    void set_edge_profile_value(uint32_t count) override { number = count; }
    void mk_name(I_SYMTAB* symbol) override;
    void mk_field(int kind, fkMDATA* m, TYPE* structure) override {
        number = static_cast<uint32_t>(kind);
        member = m;
        csu_m = structure;
    }
    void mk_icon(int64_t v) override { value = v; }
    void mk_lcon(const char* t) override { text = arena_m->copy(t); }
    void mk_fcon(const char* t) override { text = arena_m->copy(t); }
    void mk_scon(const char* bytes, uint32_t length) override {
        text = arena_m->copy(bytes, length);
        number = length;
    }
    void mk_label(uint32_t label) override { number = label; }
    void mk_vreg(int32_t n) override { number = static_cast<uint32_t>(n); }
    void mk_skip(uint32_t count) override { number = count; }
    void mk_switch(uint32_t cases) override { number = cases; }
    void mk_ddnode(uint32_t id, uint32_t locale, uint8_t f) override {
        number = id;
        number2 = locale;
        value = f;
    }
    void mk_call(uint32_t num_vargs, uint32_t eh_entry) override {
        number = num_vargs;
        number2 = eh_entry;
    }
    void mk_ucall(uint32_t eh_entry) override { number2 = eh_entry; }
    void mk_icall(const char* name) override { text = arena_m->copy(name); }

    BASE_NODE* left_operand() const override { return left; }
    BASE_NODE* right_operand() const override { return right; }
    void set_operands(BASE_NODE* l, BASE_NODE* r) override {
        left = static_cast<IC_NODE*>(l);
        right = static_cast<IC_NODE*>(r);
    }

private:
    union {
        IC_ARENA* arena_m; // until the payload is set
        TYPE* csu_m;       // of FIELD
    };
};
static_assert(sizeof(IC_NODE) <= 64);

class IC_SYMBOL final : public I_SYMTAB {
public:
    const char* name = "";
    uint64_t size = 0;
    uint32_t value = 0;
    uint32_t align = 0;
    TYPE* type = nullptr;
    TYPE* cpp_type = nullptr;
    PSN* psn = nullptr;
    int level = 0;
    int8_t sclass = 0;
    uint16_t cqual = 0;
    uint32_t location = 0;
    uint32_t option_set = 0;
    std::vector<std::unique_ptr<PRAGMA>> pragmas; // linked through `next` as well, in this order
    std::vector<IC_NODE*> init;                   // up to and with ENDINIT; empty: no initializer

    void add_pragma(std::unique_ptr<PRAGMA> pragma);

    const char* sym_name() const override { return name; }
    uint64_t sym_size() const override { return size; }
    uint32_t sym_value() const override { return value; }
    int sym_class() const override { return sclass; }
    uint16_t sym_cqual() const override { return cqual; }
    TYPE* sym_type() const override { return type; }
    TYPE* sym_cpp_type() const override { return cpp_type; }
    uint32_t sym_align() const override { return align; }
    PSN* sym_psn() const override { return psn; }
    PRAGMA* sym_pragma() const override { return pragmas.empty() ? nullptr : pragmas.front().get(); }
    int sym_prag_num() const override { return static_cast<int>(pragmas.size()); }
    uint32_t sym_location() const override { return location; }
    uint32_t sym_option_set() const override { return option_set; }
    int sym_level() const override { return level; }
    void set_level(int n) override { level = n; }
    void set_location(uint32_t offset) override { location = offset; }
    bool is_aliased() const override { return aliased_m; }
    int bitnum() const override { return bitnum_m; }
    int64_t depnum() const override { return depnum_m; }
    void set_is_aliased(bool aliased) override { aliased_m = aliased; }
    void set_bitnum(int n) override { bitnum_m = n; }
    void inc_bitnum() override { bitnum_m++; }
    void set_depnum(int64_t n) override { depnum_m = n; }
    void inc_depnum() override { depnum_m++; }

private:
    bool aliased_m = false;
    int bitnum_m = 0;
    int64_t depnum_m = 0;
};

// What the records of loops, dependences, hints and load speculation hold.
struct IC_FACTS {
    uint32_t word[5] = {};
    int flags = 0; // flags, or the subkind of load speculation
    TYPE* type = nullptr;
    IC_SYMBOL* sym = nullptr;
    std::vector<DD_ENTRY> elements;
};

// One record of the body, in file order. `kind` is an IF_RECORD_KIND.
struct IC_ITEM {
    uint8_t kind;
    uint32_t number = 0; // label, function info, count of exception entries
    PSN* psn = nullptr;
    union {
        IC_NODE* tree = nullptr;
        const char* text;
        IC_SYMBOL* sym; // symbol, begin function
        PRAGMA* pragma;
        IC_FACTS* facts;
        EHT_ENTRY* eht;
    };

    explicit IC_ITEM(int k, PSN* p = nullptr) : kind(static_cast<uint8_t>(k)), psn(p) {}
};

struct IC_FUNC {
    IC_SYMBOL* sym = nullptr;
    size_t first = 0, last = 0; // its items, from begin function up to and with end function
    std::vector<IC_SYMBOL*> locals;
};

// The one type package of a tool's run; made on first use.
TYPE_PKG* ic_type_package();

class IC_UNIT : public IF_CLIENT {
public:
    int version = IF_VERSION;
    int cpu = IF_CPU_ID;
    std::string source;
    std::vector<OPTION_SET> option_sets;
    std::vector<IC_SYMBOL*> globals;
    std::vector<IC_ITEM> items;
    std::vector<IC_FUNC> functions; // in file order

    IC_UNIT() = default;
    ~IC_UNIT() override;

    // Reads a whole unit; takes over `stream`. Throws `if_error` for a file that is none, with offset 0 for its header.
    void read(FILE* stream, TYPE_PKG* pkg);
    // Writes the unit as it was read; takes over `stream`. 1 if the stream failed, else 0.
    int write(FILE* stream, TYPE_PKG* pkg, bool keep_all_types);

    const I_FILE* file() const { return file_m; }
    IC_ARENA* arena() { return &arena_m; }

    BASE_NODE* new_node(int op, TYPE* type) override;
    void drop_tree(BASE_NODE*) override {}
    bool cl_magic(int file_version, int cpu_id) override;
    void cl_option_set(unsigned id, const std::vector<std::string>& options) override;
    I_SYMTAB* cl_symbol_create(const char* name, TYPE* type, TYPE* second_type, uint64_t size, uint32_t align,
                               uint32_t value, int sclass, uint16_t cqual, PSN* psn, uint32_t location,
                               uint32_t option_set, I_SYMTAB::RETENTION_POLICY retention) override;
    void cl_pragma(I_SYMTAB* sym, PRAGMA* pragma) override;
    void cl_symbol_init(I_SYMTAB* sym, std::vector<BASE_NODE*>& list) override;
    void cl_symbol_def(I_SYMTAB* sym) override;
    void cl_expr(BASE_NODE* tree, PSN* psn) override;
    void cl_begin_func(I_SYMTAB* sym, PSN* psn) override;
    void cl_end_args(PSN* psn) override { add(IFR_END_ARGS, psn); }
    void cl_begin_block(PSN* psn) override { add(IFR_BEGIN_BLOCK, psn); }
    void cl_end_locals(PSN* psn) override { add(IFR_END_LOCALS, psn); }
    void cl_end_block(PSN* psn) override { add(IFR_END_BLOCK, psn); }
    void cl_end_func(PSN* psn) override;
    void cl_source(const char* name) override;
    void cl_label(uint32_t label) override { add(IFR_LABEL).number = label; }
    void cl_inline_asm(const char* text, PSN* psn) override { add(IFR_ASM, psn).text = arena_m.copy(text); }
    void cl_comment(const char* text) override { add(IFR_COMMENT).text = arena_m.copy(text); }
    void cl_merge_type_defs() override {}
    void cl_preprocess_statics() override { body_started_m = true; }
    void cl_func_info(uint8_t info) override { add(IFR_FUNC_INFO).number = info; }
    bool cl_func_eht(EHT_ENTRY* entries, uint32_t count) override;
    void cl_loop_def(uint32_t id, uint32_t outer, uint32_t min, uint32_t max, uint32_t factor, uint16_t flags) override;
    void cl_loop_header(uint32_t id, I_SYMTAB* lcv, uint8_t flags) override;
    void cl_dd_vector(uint32_t id, uint8_t flags, uint32_t count, const uint16_t* elements) override;
    void cl_dd_edge(uint32_t from, uint32_t to, uint32_t vector) override;
    void cl_mbank(uint32_t a, uint32_t b, uint32_t c, uint32_t d, uint32_t e) override;
    void cl_ldspec_induct(uint32_t id, uint32_t word, int32_t step, TYPE* type, I_SYMTAB* sym) override;
    void cl_ldspec_rand(uint32_t id, uint32_t word, uint32_t word2, TYPE* type, I_SYMTAB* sym) override;
    void cl_ldspec_region(uint32_t id, uint32_t label) override;
    void cl_ir_begin_func(uint32_t, uint32_t, int, uint32_t, PSN*) override {}
    void cl_ir_end_func(PSN*) override {}
    void cl_ir_ins(PSN*) override {}

private:
    IC_SYMBOL* known(I_SYMTAB* sym) const;
    IC_ITEM& add(int kind, PSN* psn = nullptr);
    IC_FACTS& add_facts(int kind, std::initializer_list<uint32_t> words, int flags = 0);
    void write_item(I_FILE* out, const IC_ITEM& item);
    void write_facts(I_FILE* out, int kind, const IC_FACTS& facts);

    I_FILE* file_m = nullptr;
    IC_ARENA arena_m;
    IC_FUNC* function_m = nullptr; // in work
    bool body_started_m = false;
    std::vector<std::unique_ptr<IC_SYMBOL>> symbols_m;
    std::vector<std::unique_ptr<PRAGMA>> loose_pragmas_m;
    std::vector<std::unique_ptr<IC_FACTS>> facts_m;
    std::vector<std::unique_ptr<EHT_ENTRY[]>> tables_m;
};
