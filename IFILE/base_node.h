// A tree node as the I-file layer sees it. The optimizer's NODE and each tool's own node derive from this.
#pragma once

#include "IFILE/pragma.h"

#include <cstdint>

class TYPE;
struct fkMDATA;
class I_SYMTAB;

class BASE_NODE {
public:
    TYPE* type = nullptr; // type of the value
    int op = 0;           // opcode, which is the number of the I-file's record as well

    // ---- What the writer asks. A value that does not fit the result is an assertion failure.
    virtual I_SYMTAB* name_symbol() const = 0;
    virtual int field_kind() const = 0;
    virtual fkMDATA* field_mval() const = 0;
    virtual TYPE* field_csu() const = 0;
    virtual uint32_t icon_uvalue() const = 0;
    virtual int32_t icon_svalue() const = 0;
    virtual const char* lcon_value() const = 0; // decimal text, valid until the next call
    virtual const char* fcon_value() const = 0; // text, owned by the node
    virtual const char* scon_value() const = 0; // `scon_length` bytes, not terminated
    virtual uint32_t scon_length() const = 0;
    virtual uint32_t label_id() const = 0;
    virtual int32_t vreg_id() const = 0;
    virtual uint32_t skip_count() const = 0;
    virtual uint32_t case_count() const = 0;
    virtual uint32_t ddnode_id() const = 0;
    virtual uint32_t ddnode_locale() const = 0;
    virtual uint8_t ddnode_flags() const = 0;
    virtual uint32_t call_num_vargs() const = 0;
    virtual const char* icall_name() const = 0;
    virtual uint32_t eh_entry_id() const = 0;
    virtual uint32_t get_edge_profile_value() const = 0;

    // ---- What the reader sets, once, on a node fresh from `IF_CLIENT::new_node`. Texts are borrowed and must be
    // copied.
    virtual void set_edge_profile_value(uint32_t count) = 0;
    virtual void mk_name(I_SYMTAB* sym) = 0; // null for "no symbol"
    virtual void mk_field(int kind, fkMDATA* member, TYPE* csu) = 0;
    virtual void mk_icon(int64_t value) = 0;
    virtual void mk_lcon(const char* text) = 0;
    virtual void mk_fcon(const char* text) = 0;
    virtual void mk_scon(const char* bytes, uint32_t length) = 0;
    virtual void mk_label(uint32_t label) = 0;
    virtual void mk_vreg(int32_t number) = 0;
    virtual void mk_skip(uint32_t count) = 0;
    virtual void mk_switch(uint32_t cases) = 0;
    virtual void mk_ddnode(uint32_t id, uint32_t locale, uint8_t flags) = 0;
    virtual void mk_call(uint32_t num_vargs, uint32_t eh_entry) = 0;
    virtual void mk_ucall(uint32_t eh_entry) = 0;
    virtual void mk_icall(const char* name) = 0;
    virtual ~BASE_NODE() = default;

    // ---- Shape. The reader sets both operands of a node after its payload; null for one that the opcode lacks.
    virtual BASE_NODE* left_operand() const = 0;
    virtual BASE_NODE* right_operand() const = 0;
    virtual void set_operands(BASE_NODE* left, BASE_NODE* right) = 0;
};
