#include "OPT5/ir/facts.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <cstdio>

namespace {

// By the number of the fact's bit. Filled during static initialization, in any order.
const FACT_FINDER* finders[fact::count];

template <class F>
void for_each_fact(FACTS facts, F&& visit) {
    for (int i = 0; i < fact::count; ++i)
        if (facts >> i & 1) visit(FACTS(1) << i, finders[i]);
}

FACTS with_what_rests_on(FACTS gone) {
    for (FACTS before = fact::none; before != gone;) {
        before = gone;
        for_each_fact(fact::every, [&](FACTS one, const FACT_FINDER* finder) {
            if (finder && finder->rests_on & gone) gone |= one;
        });
    }
    return gone;
}

} // namespace

FACT_FINDER::FACT_FINDER(const char* name, FACTS finds, FACTS rests_on, void (*find)(FACTS), void (*forget)(),
                         bool (*still_holds)())
    : name(name), finds(finds), rests_on(rests_on), find(find), forget(forget), still_holds(still_holds) {
    for_each_fact(finds, [this](FACTS one, const FACT_FINDER*) {
        for (int i = 0; i < fact::count; ++i)
            if (one == FACTS(1) << i) finders[i] = this;
    });
}

void need(FACTS wanted) {
    FUNINFO* f = currfuninfo;
    for (FACTS missing; (missing = wanted & ~f->facts) != 0;) {
        const FACT_FINDER* finder = nullptr;
        for_each_fact(missing, [&](FACTS, const FACT_FINDER* candidate) {
            if (!finder) finder = candidate;
        });
        OPT_ASSERT(finder != nullptr);
        need(finder->rests_on);
        finder->find(finder->finds & missing);
        f->facts |= finder->finds & missing;
    }
}

void changed(FACTS stays) {
    FUNINFO* f = currfuninfo;
    const FACTS gone = with_what_rests_on(~stays) & f->facts;
    f->facts &= ~gone;
    for_each_fact(gone, [](FACTS, const FACT_FINDER* finder) {
        if (finder && finder->forget) finder->forget();
    });
}

bool is_known(FACTS facts) { return currfuninfo && (currfuninfo->facts & facts) == facts; }

void graph_was_changed(FUNINFO* f) { f->facts &= ~fact::graph; }
void edges_were_changed(FUNINFO* f) { f->facts &= ~(fact::dominators | fact::loops); }

int validate_facts() {
    int wrong = 0;
    for_each_fact(currfuninfo->facts, [&](FACTS, const FACT_FINDER* finder) {
        if (!finder->still_holds || finder->still_holds()) return;
        std::fprintf(fdebug ? fdebug : stderr, " +++++ what is known of %s is no longer true\n", finder->name);
        ++wrong;
    });
    return wrong;
}
