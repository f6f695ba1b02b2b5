// NODE: the tree node. One record serves every expression and statement kind. There are millions of them, and most
// walks wait for memory: what few nodes need is kept in a record of its own, which a node gets when something is put
// there.
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
#include <vector>

class NODE;
class SYMTAB;
class SSAVAR;
struct SSA_ARG;
struct LIST;
struct LS;
struct PTENV;
class BBLK;
class FUNINFO;

constexpr uint32_t NO_PROFILE = 0xFFFFFFFF;

// A label. Owned by the block that it starts once the graph is built, by `label_mapping` of the reader before.
struct LBL {
    LBL* next = nullptr;    // next label of the same block
    NODE* tree = nullptr;   // its definition, while that stands in a statement
    BBLK* bblock = nullptr; // the block that it starts
    int32_t index = 0;      // label number; internal labels count down from -1
    uint32_t refcount = 0;  // LABELREFs that name it
};

// Links a node with dependence data to its node of the dependence graph.
struct DDNODE_RECORD {
    DDNODE_RECORD* next = nullptr;
    NODE* node = nullptr;
    NODE* copy = nullptr;
    uint32_t id = 0;
};

// What dependence analysis knows of a reference, a UMULT. Owned by the node.
struct DDEPNODE {
    BBLK* block = nullptr;      // its `loop` is the reference's
    NODE* root = nullptr;       // the outermost STDOT above the node, or the node
    NODE* normalized = nullptr; // the form that is compared; null where that is the node itself. Owned
    int32_t number = 0;         // in the analysis, from 0
    virtual ~DDEPNODE() = default;
};

// What few nodes need: those with a profile, and those that an analysis of loops or of SSA form is at work on.
struct RARE_FIELDS {
    double weight = -1.0;     // LABELREF profile weight, -1.0 for none
    intptr_t branch_hint = 0; // LABELREF: below zero unlikely, above zero likely
    std::vector<SSA_ARG>* ssa_args = nullptr; // SSA_PHI, of the node, not of its copies; owned by the form
    DDNODE_RECORD* dd = nullptr; // of the node, not of its copies
    DDEPNODE* dependence = nullptr; // UMULT, of the node, not of its copies
    // UMULT, STREF: what the pointer may refer to where the node stands, of the node, not of its copies. It belongs to the
    // run of points-to propagation that found it, and is read through OPT5/alias/points_to.h alone.
    const PTENV* ptenv = nullptr;
    uint32_t ptenv_run = 0;
};

// Where a call of the source stands. A copy keeps what the call was copied from.
struct CALL_RECORD {
    FUNINFO* caller;       // the function that the call was read in
    uint32_t id;           // of the call in that function, from 0: the index of its bit in the sets of call sites
    uint16_t inline_depth; // how many expansions it came through
};

class NODE final : public BASE_NODE {
    uint32_t number = 0; // eh_entry, or the edge's count plus 1

public:
    // `op` and `type` come from BASE_NODE. The type as first declared is the symbol's or the member's.
    NODE* left = nullptr;
    NODE* right = nullptr;
    union U {
        INT65
            lval; // ICON, LCON value; SCON length; LABELREF index; SKIP, SWITCH counts; CALL extra arguments; ASM kind
        struct {
            uint64_t version; // SSA definitions
            union {
                void* rval;
                SYMTAB* sym;      // NAME
                simul_fval* fval; // FCON, owned
                TYPE* csu;        // FIELD
                char* name;       // ICALL, UICALL, MCALL, UMCALL, owned
                SSAVAR* ssa;      // SSA operators
            };
        };
        U() : lval() {}
    } u;
    union {
        fkMDATA* mval;  // FIELD
        LBL* lbl;       // LABELREF, LABELDEF
        char* text;     // SCON bytes, ASM text, FCON print form, NAME alternative name; owned
        PRAGMA* pragma; // PPRAGMA, owned
        CALL_RECORD* call; // CALL, UCALL; owned, null until the call sites are numbered
        NODE* reach;    // SSA_USE, SSA_MU, SSA_CHI: the definition that reaches
    };
    LS* ls = nullptr; // source scope, null for none

    const RARE_FIELDS& rare() const { return rare_m ? *rare_m : no_rare_fields; }
    RARE_FIELDS& make_rare();

    uint32_t eh_entry() const { return op_is_call(op) ? number : 0; } // exception table entry, 0 for none
    void set_eh_entry(uint32_t entry) {
        if (op_is_call(op)) number = entry;
    }
    // LABELREF, EPVAL: count of the edge, NO_PROFILE for none.
    uint32_t edge_profile() const { return op == LABELREF || op == EPVAL ? number - 1 : NO_PROFILE; }
    void set_edge_profile(uint32_t count) {
        if (op == LABELREF || op == EPVAL) number = count + 1;
    }

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

private:
    friend NODE* new_node(int op, TYPE* type);
    friend NODE* clone_node(const NODE* t);
    friend void free_node(NODE* t, int op);
    NODE() : mval(nullptr) {}
    NODE(const NODE&) = default;
    ~NODE() override = default;

    RARE_FIELDS* rare_m = nullptr; // owned; null while all fields have their initial values
    static const RARE_FIELDS no_rare_fields;
};
static_assert(sizeof(NODE) <= 80, "what few nodes need goes to RARE_FIELDS");

// A fresh node with zeroed fields and the construction rules of calls and casts applied.
NODE* new_node(int op, TYPE* type);
// A copy of the record, with what an analysis keeps of the node left out; the caller puts its owned parts and operands
// right. Used by `copy_node`.
NODE* clone_node(const NODE* t);
// Gives the record of a node that was an `op` back, with its rare fields, but without touching what else it owns. Used
// by `erase_node`.
void free_node(NODE* t, int op);

// A node with operands. SCONV, PCONV and ACONV take the type without its qualifiers.
NODE* maketree(int op, NODE* left, NODE* right, TYPE* type, LS* ls = nullptr);
// The same; u.rval is `sym` if that is not null, otherwise u.lval is `lval`.
NODE* mktree(int op, NODE* left, NODE* right, TYPE* type, SYMTAB* sym, INT65 lval);
