// What pointers may refer to, place by place: bindings of pointer variables, and of the accesses through them.
//
// `fact::points_to` finds them for the current function; a pass asks for it with `need` and may read the bindings of
// accesses until it says `changed`. A binding is a record of one access where it stands: it speaks of every address that
// this node is evaluated with, in one activation of the function. So
//   - a copy has none, as it may stand at another place. A pass that keeps a copy in the place of an access that still
//     stands, and asks of no execution that does not come from there, may carry the binding over (`carry_PT_info`);
//   - a tree that stands for several accesses must have what holds for all of them (`share_PT_info`);
//   - an edit of blocks or edges ends the fact at once, and so does every pass that does not say that it stays.
// Bindings are kept by the function, not by the nodes, and are shared.
#pragma once

#include "OPT5/ir/facts.h"
#include "XINT/int65.h"

#include <cstdint>
#include <string>
#include <vector>

class BBLK;
class FUNINFO;
class NODE;
class SYMTAB;
class TYPE;
struct ADDRESS_FORM;
struct FPARM;

// Kinds of storage.
enum PT_CATEGORY : uint32_t {
    PT_NULL = 0x1,
    PT_ADCON = 0x2, // a fixed address
    PT_SCON = 0x4,
    PT_HEAP = 0x8,
    PT_AUTOF = 0x10, // autos of other activations, of this function too
    PT_AUTOL = 0x20, // of this one
    PT_STATICF = 0x40,
    PT_STATICL = 0x80,
    PT_STATICG = 0x100,
    PT_EXTERN = 0x200,
    PT_ALL = 0xFFFFFFFF,
};

// The pointer lies in `base`, at `offset` from its start, or any multiple of `stride` from there. 16-bit units; with a
// stride the offset is reduced by it.
struct PTVAR {
    SYMTAB* base;
    int64_t offset, stride;
    unsigned align; // bits
};

// One binding. A null binding stands for "anything".
struct PTENV {
    std::vector<PTVAR> targets;           // by `uid` of their bases, each base once, none that `categories` cover
    SYMTAB* parm = nullptr;               // the value is what this parameter held on entry, plus
    int64_t parm_offset = 0, parm_stride = 0; // as of a target
    unsigned align = 0;                   // bits, of what `targets` do not cover; 0: there is nothing else
    uint32_t categories = 0;
};

// ---- The analysis
void propagate_PT_info(); // the fact, for the current function

// ---- Bindings of accesses: UMULT and STREF, also below members and wrappers
const PTENV* PT_info_of(const NODE* lvalue); // null where nothing is known, or no longer
void carry_PT_info(NODE* copy, const NODE* original); // of the two lvalues, not of those inside
// The accesses, which are congruent, get what holds for all of them.
void share_PT_info(const std::vector<NODE*>& accesses);

// ---- Across calls. Only a function that nothing but the calls that are looked at enters has `formals`
// What a call passes in a pointer parameter.
struct AARG {
    FUNINFO *caller, *callee;
    size_t index;             // of the parameter, from 0
    bool is_known;            // the fields below say what it is; otherwise it is anything
    PTENV value;              // as the callee sees it: without locals of the caller, and without `parm`
    std::string parm;         // where it is not empty: what the caller got in this parameter, and so far on
    int64_t parm_offset, parm_stride;
    std::string text;         // for the debug stream
};
// Adds those of all calls in the current function's body, where the callee has `formals`. Needs no fact.
void find_pointer_arguments(std::vector<AARG>& arguments);
// Takes what is passed into the parameter's summary. Whether that changed it: to be done until nothing changes.
bool meet_FPARM_with_PT_info(FPARM* formal, const AARG* argument);
// Whether there is a summary of the parameter `sym` of the current function, which lives as long as its record.
bool find_PT_in_formal_parms(const PTENV** out, const SYMTAB* sym);

// ---- Questions. Bindings may be null
unsigned overall_PT_align(const PTENV* e); // 16 for null
// The one object that the pointer lies in, or null.
SYMTAB* single_pointsto_target_if_known(const PTENV* e);
// A fresh tree, of the pointer's type, for the value of a pointer at the block's end where that is one place in a global, or
// null.
NODE* find_var_init_in_PT_info(SYMTAB* pointer, const BBLK* bb);
// What holds of a pointer variable whenever the block begins; null where nothing is known.
const PTENV* PT_info_at_start(const SYMTAB* pointer, const BBLK* bb);
// Whether two accesses, in any two executions in one activation, may touch. The forms are those of the accesses.
bool UMULT_PT_targets_may_overlap(const NODE* a, const ADDRESS_FORM& x, const NODE* b, const ADDRESS_FORM& y);
void dump_ptr_PT_binding(const SYMTAB* pointer, const PTENV* e); // to the debug stream
