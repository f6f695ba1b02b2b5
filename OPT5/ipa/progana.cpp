// Which definitions call integration may copy, and what the reader asks of this room for passes that are not built yet.

#include "OPT5/ipa/progana.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/walks.h"

#include <algorithm>
#include <cstring>
#include <iterator>

namespace {

constexpr uint64_t WIDE = 17, WIDE_LOCALS_LIMIT = 256; // bits
constexpr uint8_t FIXED_PARAMETER = 27;                // `flags` of a parameter that stays where the caller put it

// Whether each expansion may have a copy of the local. `wide` sums up the bits of what no register holds.
bool may_be_copied(const SYMTAB* s, uint64_t* wide) {
    if (s->type->is_volatile() || (s->level == 1 && s->flags == FIXED_PARAMETER)) return false;
    if (s->cqual & (CQ_MARKS_FUNCTION | CQ_GLOBAL_REGISTER)) return true;
    switch (s->sclass) {
    case SC_AUTO:
    case SC_REGISTER:
    case SC_MEMORY:
    case SC_PARM:
    case SC_REGISTER2:
        if (s->size >= WIDE) *wide += s->size;
        return true;
    case SC_STATIC:
    case SC_EXTERN:
    case SC_DROPPED: return true;
    default: return false;
    }
}

// A call that is about the frame of the function that makes it: where it returns to again, or what is freed with it.
bool is_about_its_frame(const NODE* t) {
    constexpr const char* names[] = {"setjmp", "_setjmp", "sigsetjmp", "__sigsetjmp", "alloca", "__builtin_alloca"};
    const FUNINFO* callee = op_is_call(t->op) ? find_FUNINFO_for_call(t) : nullptr;
    return callee && std::any_of(std::begin(names), std::end(names), [callee](const char* name) {
               return !std::strcmp(skip_name_prefix(callee->name.c_str()), name);
           });
}

bool needs_its_own_frame(const FUNINFO* f) {
    bool found = false;
    for_each_tree(f, [&found](const NODE* tree) { found = found || any_subtree(tree, is_about_its_frame); });
    return found;
}

} // namespace

// A function that was asked to be inlined may have any amount of locals.
void check_integrable_definition() {
    FUNINFO* f = currfuninfo;
    const bool asked_for = f->symbol->cqual & CQ_INLINE || find_pragma(f->symbol, PRG_FUNC_ALWAYS_INLINE);
    uint64_t wide = 0;
    bool may = true;
    for (const SYMTAB* list : {f->new_syms, f->pending_syms, f->scalar_syms, f->memory_syms})
        for (const SYMTAB* s = list; s && may; s = s->next) may = may_be_copied(s, &wide);
    const bool is_too_wide = !asked_for && wide > WIDE_LOCALS_LIMIT;
    const char* const obstacle = needs_its_own_frame(f) ? "it speaks of its own frame, as setjmp and alloca do"
                                 : !may                 ? "it has a volatile variable, or one that stays where its caller puts it"
                                 : is_too_wide          ? "it has many or large local variables: declare it inline"
                                                        : nullptr;
    if (!obstacle) return;
    set_flags(f, FUN_cannot_suppress);
    forbid_inlining(f, obstacle);
}

// Symbols are laid out in groups on targets that address them from one base; this one has no groups.
void make_symbol_groupable(SYMTAB*) {}
