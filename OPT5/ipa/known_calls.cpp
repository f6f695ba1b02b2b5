// Which functions are entered by nothing but the calls by name that the file holds.
//
// Needs: the call graph with its flags, the bodies of all functions. Leaves: FUNINFO::formals, which nothing is known of yet.
// Sound because the address of such a function is not used, the outside does not call it, no other definition takes its
// place, and every body that calls it is at hand. Calls that are made later on are copies of those.
#include "OPT5/ipa/known_calls.h"

#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ipa/progana.h"

#include <unordered_set>

namespace {

bool is_entered_by_name_alone(FUNINFO* f) {
    constexpr uint64_t ENTERED_OTHERWISE = FUN_is_cg_root | FUN_is_anonymous | FUN_is_main | FUN_is_interrupt;
    return function_is_defined(f) && f->bb_list && !TEST_FLAG(f, ENTERED_OTHERWISE) && !symbol_is_preemptible(f->symbol);
}

// To the linker both names are one function.
void drop_synonyms() {
    for (SYMTAB* s = global_symbols; s; s = s->next) {
        if (!s->is_function()) continue;
        for (const PRAGMA* p = s->pragma; p; p = p->next) {
            if (p->kind != PRG_FUNC_SYNONYM) continue;
            make_FUNINFO(s)->formals.clear();
            if (!p->args.empty()) make_FUNINFO(skip_name_prefix(p->args[0].c_str()))->formals.clear();
        }
    }
}

} // namespace

bool enter_formals() {
    // Once for the file: calls may have lost arguments since.
    for (const FUNLIST* p = program.funlist; p; p = p->next)
        if (!p->fun->formals.empty()) return false;
    for (const FUNLIST* p = program.funlist; p; p = p->next) {
        FUNINFO* f = p->fun;
        if (!is_entered_by_name_alone(f)) continue;
        for (const SYMTAB* s : parameters_in_order(*f)) f->formals.emplace_back(s->name, s->type->is_pointer());
    }
    for (const FUNLIST* p = program.funlist; p; p = p->next)
        if (!p->fun->bb_list)
            for (const CALLEE* c = p->fun->callees; c; c = c->next) c->callee->formals.clear();
    drop_synonyms();
    for (const FUNLIST* p = program.funlist; p; p = p->next)
        if (!p->fun->formals.empty()) return true;
    return false;
}

std::vector<FUNINFO*> callers_first() {
    std::vector<FUNINFO*> order;
    std::unordered_set<const FUNINFO*> seen; // membership only
    for (const FUNLIST* list : {cg_list, program.funlist})
        for (const FUNLIST* p = list; p; p = p->next)
            if (seen.insert(p->fun).second) order.push_back(p->fun);
    return order;
}
