// What a function's pointer parameters may refer to, by all calls of it: their summaries.
//
// Needs: the call graph with its flags, the bodies of all functions. Leaves: FUNINFO::formals.
// Sound because only a function is given summaries that nothing but calls by name enters, in bodies that are all looked
// at. A summary starts with nothing and takes in the argument of each call, as the callee sees it, until no more is added;
// a parameter that is passed on gives what its own summary holds by then. Calls that are made later on are copies of these,
// with the same arguments.
#include "OPT5/alias/points_to.h"
#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ipa/ipcp.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <unordered_set>

namespace {

constexpr int LEAST_LEVEL = 3;

class CURRENT {
public:
    explicit CURRENT(FUNINFO* f) {
        currfuninfo = f;
        currfunc = f->symbol;
    }
    ~CURRENT() {
        currfuninfo = nullptr;
        currfunc = nullptr;
    }
    CURRENT(const CURRENT&) = delete;
    CURRENT& operator=(const CURRENT&) = delete;
};

class SUMMARIES {
public:
    void run();

private:
    void find_candidates();
    void drop_callees(const FUNINFO* f);
    void drop_synonyms();
    bool calls_a_candidate(const FUNINFO* f) const;

    std::unordered_set<const FUNINFO*> candidates; // membership only
    std::vector<AARG> arguments;
};

bool has_pointer_parameter(const FUNINFO* f) {
    const std::vector<SYMTAB*> parameters = parameters_in_order(*f);
    return std::any_of(parameters.begin(), parameters.end(), [](const SYMTAB* s) { return s->type->is_pointer(); });
}

void SUMMARIES::find_candidates() {
    constexpr uint64_t ENTERED_OTHERWISE = FUN_is_cg_root | FUN_is_anonymous | FUN_is_main | FUN_is_interrupt;
    for (const FUNLIST* p = program.funlist; p; p = p->next) {
        FUNINFO* f = p->fun;
        if (function_is_defined(f) && f->bb_list && !TEST_FLAG(f, ENTERED_OTHERWISE) && !symbol_is_preemptible(f->symbol) &&
            has_pointer_parameter(f))
            candidates.insert(f);
    }
    for (const FUNLIST* p = program.funlist; p; p = p->next)
        if (!p->fun->bb_list) drop_callees(p->fun);
    drop_synonyms();
}

void SUMMARIES::drop_callees(const FUNINFO* f) {
    for (const CALLEE* c = f->callees; c; c = c->next) candidates.erase(c->callee);
}

// To the linker both names are one function.
void SUMMARIES::drop_synonyms() {
    for (SYMTAB* s = global_symbols; s; s = s->next) {
        if (!s->is_function()) continue;
        for (const PRAGMA* p = s->pragma; p; p = p->next) {
            if (p->kind != PRG_FUNC_SYNONYM) continue;
            candidates.erase(make_FUNINFO(s));
            if (!p->args.empty()) candidates.erase(make_FUNINFO(skip_name_prefix(p->args[0].c_str())));
        }
    }
}

bool SUMMARIES::calls_a_candidate(const FUNINFO* f) const {
    for (const CALLEE* c = f->callees; c; c = c->next)
        if (candidates.count(c->callee)) return true;
    return false;
}

// So that what is passed on is known when it is needed, but for cycles.
std::vector<FUNINFO*> callers_first() {
    std::vector<FUNINFO*> order;
    std::unordered_set<const FUNINFO*> seen; // membership only
    for (const FUNLIST* list : {cg_list, program.funlist})
        for (const FUNLIST* p = list; p; p = p->next)
            if (seen.insert(p->fun).second) order.push_back(p->fun);
    return order;
}

void SUMMARIES::run() {
    if (!cg_list) return;
    find_candidates();
    if (candidates.empty()) return;
    for (const FUNLIST* p = program.funlist; p; p = p->next) {
        FUNINFO* f = p->fun;
        if (!candidates.count(f)) continue;
        for (const SYMTAB* s : parameters_in_order(*f)) f->formals.push_back({s->name, s->type->is_pointer(), FPARM::NO_CALL, nullptr});
    }
    for (FUNINFO* f : callers_first()) {
        if (!f->bb_list || !calls_a_candidate(f)) continue;
        const CURRENT current(f);
        find_pointer_arguments(arguments);
    }
    for (bool changed = true; changed;) {
        changed = false;
        for (const AARG& a : arguments) changed |= meet_FPARM_with_PT_info(&a.callee->formals[a.index], &a);
    }
}

} // namespace

void summarize_pointer_parameters() {
    if (opt_level() >= LEAST_LEVEL) SUMMARIES().run();
}
