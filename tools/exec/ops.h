// The compiled form's operations: one function for each operator at each representation.
#pragma once

#include "tools/exec/machine.h"

// Where an lvalue's address comes from: XNODE::k alone, the frame plus k, or the value of operand `a` plus k.
enum BASE : uint8_t { B_ABS, B_FRAME, B_EXPR };

// The operators, by their codes in the file.
namespace op {
enum : int {
    NOP = 0,
    LABEL,
    NAME,
    SCON,
    ICON,
    FCON,
    PLUS,
    PLUSASG,
    MINUS,
    MINUSASG,
    UMINUS,
    MULT,
    MULTASG,
    UMULT,
    ANDB,
    ANDBASG,
    UAND,
    ORB,
    ORBASG,
    XORB,
    XORBASG,
    QUEST,
    COLON,
    ANDAND,
    OROR,
    LCON,
    FIELD,
    ABS,
    RETURN = 36,
    SWITCH = 40,
    DEFAULT = 46,
    CASE,
    COMMA = 56,
    PCOMMA,
    ASG,
    COMMAOP,
    DIV,
    DIVASG,
    MOD,
    MODASG,
    SLL,
    SLLASG,
    SRL,
    SRLASG,
    STDOT,
    STREF,
    CALL,
    UCALL = 72,
    LOOP = 74,
    ENDLOOP,
    EXCLAIM,
    NOTB,
    PLUSPLUS,
    MINMIN,
    EQ,
    NEQ,
    LE,
    LT,
    GE,
    GT,
    ULE,
    ULT,
    UGE,
    UGT,
    STFIELD = 96,
    ARGREF,
    STASG,
    STARG,
    ARASG = 103,
    SCONV,
    PCONV,
    PMCONV,
    PVCONV,
    ACONV,
    CBRANCH,
    EPVAL,
    ENDINIT = 112,
    BRANCH = 114,
    SKIP,
    URETURN = 118,
    DDNODE,
    SQRT = 121,
    SQR,
    NASSERT,
    ASSERT,
    MEMCPY,
    TOIEEE = 127,
    FRIEEE,
    ICALL,
    UICALL,
    RECIP,
    MCALL,
    UMCALL,
    VPACK,
    VPACKM,
    VPACK1P,
    VFIELD = 138,
    VRCONV,
    COMPLEX,
    REAL,
    IMAG,
    FEQ,
    FNEQ,
    FLE,
    FLT,
    FGE,
    FGT,
    FEQN,
    FNEQN,
    FLEN,
    FLTN,
    FGEN,
    FGTN,
    FORD,
    FUNO,
    VREG = 163,
};
}

// Operands a and b, both of the representation; null for what the representation does not have.
EVAL binary_eval(int opcode, REP rep);
EVAL compare_eval(int opcode, REP rep);
EVAL unary_eval(int opcode, REP rep); // UMINUS, NOTB, ABS, SQR, SQRT, RECIP
// Reads and writes at the node's address; of a store, operand b is the value, which is the result as well. `m` is the
// alignment mask. The address of B_ABS and B_FRAME is known to be good.
EVAL load_eval(REP rep, BASE base);
EVAL store_eval(REP rep, BASE base);
EVAL add_store_eval(REP rep, BASE base, int opcode); // lvalue += b, -= b in the lvalue's own representation
EVAL step_eval(REP rep, BASE base, int opcode);      // the same; the value is what was there before
EVAL address_eval(BASE base);
// A field of `n` bits from bit `m` of the unit at the address; `c` non-null: signed.
EVAL bits_load_eval(BASE base);
EVAL bits_store_eval(BASE base);
// A structure of `n` units from the address that b gives to the node's address.
EVAL copy_eval(BASE base);
// Between shapes; null if the value stays as it is. Uses `n` and `m` of the node, which `set_convert` fills.
EVAL convert_eval(const SHAPE& from, const SHAPE& to);
void set_convert(XNODE* x, const SHAPE& to);

inline uint64_t address_of(BASE base, const XNODE* x, MACHINE& m) {
    if (base == B_ABS) return static_cast<uint64_t>(x->k);
    if (base == B_FRAME) return m.fp + static_cast<uint64_t>(x->k);
    return static_cast<uint32_t>(run(x->a, m) + x->k);
}
