// NODE: the tree node. One record serves every expression and statement kind; every node has all fields.
//
// A subtree has one parent. Trees are owned by the place that holds them. A node lives from `new_node` to `erase_node`,
// which sets `op` to ILLOP and frees it, so that a walker of an erased tree stops rather than misreads.
#pragma once

#include "FPSIM/fpsim.h"
#include "IFILE/base_node.h"
#include "OPT5/ir/opcodes.h"
#include "TYPES/type.h"
#include "XINT/int65.h"

#include <cstddef>
#include <cstdint>

class NODE;
class SYMTAB;
class SSAVAR;
class PTENV;
struct LIST;
struct LS;
class BBLK;

constexpr uint32_t NO_PROFILE = 0xFFFFFFFF;

// A label. Owned by the block that it starts once the graph is built, by `label_mapping` of the reader before.
struct LBL {
    LBL* next = nullptr;       // next label of the same block
    NODE* tree = nullptr;      // its definition, while that stands in a statement
    BBLK* bblock = nullptr;    // the block that it starts
    int32_t index = 0;         // label number; internal labels count down from -1
    uint32_t refcount = 0;     // LABELREFs that name it
};

// Links a node with dependence data to its node of the dependence graph.
struct DDNODE_RECORD {
    DDNODE_RECORD* next = nullptr;
    NODE* node = nullptr;
    NODE* copy = nullptr;
    uint16_t id = 0;
};

class NODE final : public BASE_NODE {
public:
    // `op` and `type` come from BASE_NODE.
    NODE* left = nullptr;
    NODE* right = nullptr;
    union U {
        INT65 lval; // ICON, LCON value; SCON length; LABELREF index; SKIP, SWITCH counts; CALL extra arguments; ASM kind
        struct {
            uint64_t pad;
            union {
                void* rval;
                SYMTAB* sym;       // NAME
                simul_fval* fval;  // FCON, owned
                TYPE* csu;         // FIELD
                char* name;        // ICALL, UICALL, MCALL, UMCALL, owned
                SSAVAR* ssa;       // SSA operators
            };
        };
        U() : lval() {}
    } u;
    union {
        fkMDATA* mval; // FIELD
        NODE* ssa_args;
    };
    union {
        NODE* reach;         // SSA_USE; metavalue slot of SSA definitions
        intptr_t branch_hint; // LABELREF: below zero unlikely, above zero likely
    };
    void* scratch = nullptr;   // of the SSA and value propagation passes
    LS* ls = nullptr;          // source scope, null for none
    int64_t depnum = 0;
    TYPE* orig_type = nullptr; // the type as first declared
    double weight = -1.0;      // LABELREF profile weight, -1.0 for none
    DDNODE_RECORD* dd = nullptr;
    union {
        LBL* lbl;       // LABELREF, LABELDEF
        char* text;     // SCON bytes, ASM text, FCON print form, NAME alternative name; owned
        PRAGMA* pragma; // PPRAGMA, owned
    };
    PTENV* ptenv = nullptr;
    uint32_t edge_profile = NO_PROFILE; // LABELREF: count of the edge
    uint32_t scratch_word = 0;
    uint32_t eh_entry = 0; // CALL, UCALL: exception table entry, 0 for none
    bool varargs = false;

    // ---- BASE_NODE
    I_SYMTAB* name_symbol() const override;
    int field_kind() const override;
    fkMDATA* field_mval() const override;
    TYPE* field_csu() const override;
    uint32_t icon_uvalue() const override;
    int32_t icon_svalue() const override;
    const char* lcon_value() const override;
    const char* fcon_value() const override;
    const char* scon_value() const override;
    uint32_t scon_length() const override;
    uint32_t label_id() const override;
    int32_t vreg_id() const override;
    uint32_t skip_count() const override;
    uint32_t case_count() const override;
    uint32_t ddnode_id() const override;
    uint32_t ddnode_locale() const override;
    uint8_t ddnode_flags() const override;
    uint32_t call_num_vargs() const override;
    const char* icall_name() const override;
    uint32_t eh_entry_id() const override;
    uint32_t get_edge_profile_value() const override;
    void set_edge_profile_value(uint32_t count) override;
    void mk_name(I_SYMTAB* sym) override;
    void mk_field(int kind, fkMDATA* member, TYPE* csu) override;
    void mk_icon(int64_t value) override;
    void mk_lcon(const char* text) override;
    void mk_fcon(const char* text) override;
    void mk_scon(const char* bytes, uint32_t length) override;
    void mk_label(uint32_t label) override;
    void mk_vreg(int32_t number) override;
    void mk_skip(uint32_t count) override;
    void mk_switch(uint32_t cases) override;
    void mk_ddnode(uint32_t id, uint32_t locale, uint8_t flags) override;
    void mk_call(uint32_t num_vargs, uint32_t eh_entry) override;
    void mk_ucall(uint32_t eh_entry) override;
    void mk_icall(const char* name) override;
    BASE_NODE* left_operand() const override { return left; }
    BASE_NODE* right_operand() const override { return right; }
    void set_operands(BASE_NODE* l, BASE_NODE* r) override {
        left = static_cast<NODE*>(l);
        right = static_cast<NODE*>(r);
    }

    static void* operator new(std::size_t size);
    static void operator delete(void* p);

private:
    friend NODE* new_node(int op, TYPE* type);
    friend NODE* clone_node(const NODE* t);
    friend void free_node(NODE* t);
    NODE() : mval(nullptr), reach(nullptr), lbl(nullptr) {}
    NODE(const NODE&) = default;
    ~NODE() override = default;
};

// A fresh node with zeroed fields and the construction rules of calls and casts applied.
NODE* new_node(int op, TYPE* type);
// A plain copy of the record; the caller puts its owned parts and operands right. Used by `copy_node`.
NODE* clone_node(const NODE* t);
// Gives the record back without touching what it owns. Used by `erase_node`.
void free_node(NODE* t);

// A node with operands. SCONV, PCONV and ACONV take the type without its qualifiers.
NODE* maketree(int op, NODE* left, NODE* right, TYPE* type, LS* ls = nullptr);
// The same; `sym` goes to u.rval if it is not null, `lval` to u.lval otherwise.
NODE* mktree(int op, NODE* left, NODE* right, TYPE* type, SYMTAB* sym, INT65 lval);
