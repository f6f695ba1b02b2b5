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

// A fact rests on facts of lower bits alone, so that one walk over the bits takes each behind what it rests on.
FACTS with_what_rests_on(FACTS gone) {
    for_each_fact(fact::every, [&](FACTS one, const FACT_FINDER* finder) {
        if (finder && finder->rests_on & gone) gone |= one;
    });
    return gone;
}

} // namespace

FACT_FINDER::FACT_FINDER(const char* name, FACTS fact, FACTS rests_on, void (*find)(FACTS), void (*forget)(),
                         bool (*still_holds)(), FACTS found_too)
    : name(name), rests_on(rests_on), found_too(found_too), find(find), forget(forget), still_holds(still_holds) {
    for (int i = 0; i < fact::count; ++i)
        if (fact >> i & 1) finders[i] = this;
}

void need(FACTS wanted) {
    FUNINFO* f = currfuninfo;
    if (!(wanted & ~f->facts)) return;
    for (int i = fact::count - 1; i >= 0; --i)
        if (wanted >> i & 1) {
            OPT_ASSERT(finders[i] != nullptr);
            wanted |= finders[i]->rests_on;
        }
    for (int i = 0; i < fact::count; ++i) {
        const FACTS one = FACTS(1) << i;
        if (!(wanted & ~f->facts & one)) continue;
        const FACTS found = one | (finders[i]->found_too & wanted & ~f->facts);
        finders[i]->find(found);
        f->facts |= found;
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

void graph_was_changed(FUNINFO* f) { f->facts &= ~(fact::graph | fact::points_to); }
void edges_were_changed(FUNINFO* f) { f->facts &= ~(fact::dominators | fact::loops | fact::points_to); }

int validate_facts() {
    int wrong = 0;
    for_each_fact(currfuninfo->facts, [&](FACTS, const FACT_FINDER* finder) {
        if (!finder->still_holds || finder->still_holds()) return;
        std::fprintf(fdebug ? fdebug : stderr, " +++++ what is known of %s is no longer true\n", finder->name);
        ++wrong;
    });
    return wrong;
}
