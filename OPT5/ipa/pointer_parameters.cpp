// What a function's pointer parameters may refer to, by all calls of it: their summaries.
//
// Needs: FUNINFO::formals (known_calls.cpp). Leaves: the summaries in them.
// Sound because only a function has formals that nothing but calls by name enters. A summary starts with nothing and takes
// in the argument of each call, as the callee sees it, until no more is added; a parameter that is passed on gives what its
// own summary holds by then. Calls that are made later on are copies of these, with the same arguments.
#include "OPT5/alias/points_to.h"
#include "OPT5/ipa/ipcp.h"
#include "OPT5/ipa/known_calls.h"

#include <algorithm>

namespace {

class SUMMARIES {
public:
    void run();

private:
    bool calls_a_candidate(const FUNINFO* f) const;

    std::vector<AARG> arguments;
};

bool has_pointer_formal(const FUNINFO* f) {
    return std::any_of(f->formals.begin(), f->formals.end(), [](const FPARM& p) { return p.is_pointer; });
}

bool SUMMARIES::calls_a_candidate(const FUNINFO* f) const {
    for (const CALLEE* c = f->callees; c; c = c->next)
        if (has_pointer_formal(c->callee)) return true;
    return false;
}

void SUMMARIES::run() {
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

void summarize_pointer_parameters() { SUMMARIES().run(); }
