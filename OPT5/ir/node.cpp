// NODE: construction, and the constants as the I-file layer reads and sets them.
//
// Every reader of a small integer out of u.lval asserts that the value fits 32 bits: a value that does not is a fault
// of the pass that made it, and writing its low half would be a wrong program.

#include "OPT5/ir/node.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/pool.h"
#include "OPT5/ir/type_ops.h"
#include "UTIL/safemem.h"

#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string>

// ---- Memory
namespace {

// The operators of SSA form come in the order of a walk over the whole function, those for memory and where definitions
// meet behind the others, and go together. In cells of their own they lie in that order: taken from the cells that are
// free between the trees, they would send each walk over a large function to memory twice a node.
using TREE_CELLS = record_pool<sizeof(NODE)>;
using REFERENCE_CELLS = record_pool<sizeof(NODE), 1>; // SSA_USE, SSA_DEF
using MEETING_CELLS = record_pool<sizeof(NODE), 2>;   // the others

void* take_cell(int op) {
    if (!op_is_SSA(op)) return TREE_CELLS::take();
    return op == SSA_USE || op == SSA_DEF ? REFERENCE_CELLS::take() : MEETING_CELLS::take();
}

void give_cell(NODE* t, int op) {
    if (!op_is_SSA(op)) return TREE_CELLS::give(t);
    return op == SSA_USE || op == SSA_DEF ? REFERENCE_CELLS::give(t) : MEETING_CELLS::give(t);
}

} // namespace

const RARE_FIELDS NODE::no_rare_fields;

RARE_FIELDS& NODE::make_rare() {
    if (!rare_m) rare_m = new RARE_FIELDS;
    return *rare_m;
}

NODE* clone_node(const NODE* t) {
    NODE* c = new (take_cell(t->op)) NODE(*t);
    if (!t->rare_m) return c;
    c->rare_m = new RARE_FIELDS(*t->rare_m);
    c->rare_m->dd = nullptr;
    c->rare_m->dependence = nullptr;
    c->rare_m->ssa_args = nullptr;
    c->rare_m->ptenv = nullptr;
    return c;
}

// The destructor has nothing to do and is left out, so that a pooled cell keeps the ILLOP that marks it.
void free_node(NODE* t, int op) {
    delete t->rare_m;
    give_cell(t, op);
}

// ---- Construction
namespace {

// With one size for `char` and `short`, the normalized forms of both are the same, and a cast to a character pointer
// has to be told from any other by its opcode for alias analysis.
bool marks_char_access(const TYPE* type) {
    if (!chars_alias_other_types || !type->is_pointer() || tp->schar_t->size != tp->short_t->size) return false;
    const TYPE* pointee = type->type_pointed_to();
    return pointee->is_schar() || pointee->is_uchar();
}

void note_call() {
    if (currfuninfo) currfuninfo->no_calls = false;
}

} // namespace

NODE* new_node(int op, TYPE* type) {
    NODE* t = new (take_cell(op)) NODE;
    t->op = op;
    t->type = type;
    switch (op) {
    case UCALL: note_call(); break;
    case SCONV:
        if (type && type->is_enum()) t->type = normalized_underlying_type(type);
        break;
    case PCONV:
        if (type && marks_char_access(type)) t->op = ISP2CHAR;
        break;
    }
    return t;
}

NODE* maketree(int op, NODE* left, NODE* right, TYPE* type, LS* ls) {
    if (op == SCONV || op == PCONV || op == ACONV) type = type->stqs();
    NODE* t = new_node(op, type);
    t->left = left;
    t->right = right;
    t->ls = ls;
    return t;
}

NODE* mktree(int op, NODE* left, NODE* right, TYPE* type, SYMTAB* sym, INT65 lval) {
    NODE* t = maketree(op, left, right, type);
    if (sym)
        t->u.sym = sym;
    else
        t->u.lval = lval;
    return t;
}

// ---- What the writer asks
I_SYMTAB* NODE::name_symbol() const { return u.sym; }
int NODE::field_kind() const { return 1; }
fkMDATA* NODE::field_mval() const { return mval; }
TYPE* NODE::field_csu() const { return u.csu; }
uint32_t NODE::icon_uvalue() const { return u.lval.fits_in<uint32_t>(); }
int32_t NODE::icon_svalue() const { return u.lval.fits_in<int32_t>(); }
const char* NODE::lcon_value() const { return int2text(u.lval, nullptr, 10, 0); } // without a type: no suffix
const char* NODE::scon_value() const { return text; }
uint32_t NODE::scon_length() const { return u.lval.fits_in<uint32_t>(); }
// An internal label counts down from -1; in the file it is that number's 32-bit pattern.
uint32_t NODE::label_id() const {
    return u.lval.is_negative() ? static_cast<uint32_t>(u.lval.fits_in<int32_t>()) : u.lval.fits_in<uint32_t>();
}
int32_t NODE::vreg_id() const { return 0; }
uint32_t NODE::skip_count() const { return u.lval.fits_in<uint32_t>(); }
uint32_t NODE::case_count() const { return u.lval.fits_in<uint32_t>(); }
uint32_t NODE::ddnode_id() const { return rare().dd ? rare().dd->id : 0; }
uint32_t NODE::ddnode_locale() const { return 0; }
uint8_t NODE::ddnode_flags() const { return 0; }
uint32_t NODE::call_num_vargs() const { return u.lval.fits_in<uint32_t>(); }
const char* NODE::icall_name() const { return u.name; }
uint32_t NODE::eh_entry_id() const { return eh_entry(); }
uint32_t NODE::get_edge_profile_value() const { return edge_profile(); }

// The hexadecimal form holds every bit of the target's value, the decimal one need not. Infinities and NaN take the
// words that the text conversion knows.
const char* NODE::fcon_value() const {
    if (text) return text;
    char buffer[128];
    if (f_is_nan(u.fval))
        strcpy(buffer, "nan");
    else if (f_is_inf(u.fval))
        strcpy(buffer, u.fval->sign ? "-inf" : "inf");
    else
        f_ftoa(buffer, "%a", u.fval);
    const_cast<NODE*>(this)->text = safestrdup(buffer);
    return text;
}

// ---- What the reader sets
void NODE::set_edge_profile_value(uint32_t count) { set_edge_profile(count); }

void NODE::mk_name(I_SYMTAB* sym) {
    u.sym = static_cast<SYMTAB*>(sym);
    if (!u.sym) return;
    if ((u.sym->cqual & CQ_MARKS_FUNCTION) && currfuninfo) currfuninfo->has_cqual10_name = true;
}

void NODE::mk_field(int kind, fkMDATA* member, TYPE* csu) {
    if (kind != 1) abort_optimizer();
    mval = member;
    u.csu = csu->real; // the structure that has the member, not a qualified or named form of it
    while (u.csu->equiv) u.csu = u.csu->equiv;
    if (member && member->is_bitfld && currfuninfo) currfuninfo->has_bitfield_access = true;
    if (!type) return;
    std::lock_guard<std::recursive_mutex> guard(mk_ptr_lock);
    type = type->normalized_type();
}

// A file may give a constant any type; one that no constant has is refused where the tree is checked.
static void set_constant(NODE* t, INT65 value) {
    const bool wraps = t->type && (t->type->is_int() || t->type->is_enum() || t->type->is_pointer());
    t->u.lval = wraps ? truncate_to_type(value, t->type) : value;
}

// The file carries 32 bits, read by the sign of the node's type.
void NODE::mk_icon(int64_t value) {
    bool is_32_bits = value >= INT32_MIN && value <= UINT32_MAX;
    if (!is_32_bits)
        u.lval = INT65(value);
    else if (type && type->is_signed())
        u.lval = INT65(static_cast<int32_t>(value));
    else
        u.lval = INT65(static_cast<uint32_t>(value));
    set_constant(this, u.lval);
}

void NODE::mk_lcon(const char* digits) {
    bool negative = *digits == '-';
    if (negative || *digits == '+') ++digits;
    INT65 value = static_cast<int64_t>(strtoull(digits, nullptr, 10));
    value.sign = 0;
    op = ICON;
    set_constant(this, negative ? -value : value);
}

void NODE::mk_fcon(const char* number) {
    u.fval = new simul_fval;
    {
        std::lock_guard<std::mutex> guard(atof_lock);
        f_atof(number, u.fval);
    }
    truncate_fval_to_target(u.fval, type);
}

void NODE::mk_scon(const char* bytes, uint32_t length) {
    text = static_cast<char*>(safemalloc(length + 1));
    if (length) memcpy(text, bytes, length);
    text[length] = 0;
    u.lval = INT65(length);
}

void NODE::mk_label(uint32_t label) { u.lval = INT65(label); }
void NODE::mk_vreg(int32_t) {}
void NODE::mk_skip(uint32_t count) { u.lval = INT65(count); }
void NODE::mk_switch(uint32_t cases) { u.lval = INT65(cases); }
void NODE::mk_ddnode(uint32_t, uint32_t, uint8_t) {}

void NODE::mk_call(uint32_t num_vargs, uint32_t entry) {
    u.lval = INT65(num_vargs);
    set_eh_entry(entry);
    note_call();
}

void NODE::mk_ucall(uint32_t entry) {
    set_eh_entry(entry);
    note_call();
}

void NODE::mk_icall(const char* name) {
    u.name = safestrdup(name);
    if (currfuninfo) currfuninfo->has_intrinsics = true;
}
