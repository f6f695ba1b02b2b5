// The strategy by size: small functions everywhere, larger ones where few sites want them.
#include "OPT5/ipa/inliner.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <algorithm>

namespace {

constexpr uint32_t SMALL = 21, LARGE = 99; // units of size: below the one at every site, above the other at a last one only
constexpr int64_t RECURSIVE_LIMIT = 2000, RECURSIVE_LIMIT_FOR_SIZE = 500;

bool is_seen_from_outside(const FUNINFO* f) {
    return (f->symbol->sclass == SC_EXTDEF || f->symbol->sclass == SC_EXTERN) && !no_outside_callers;
}

// What expanding everything below the function would make of it, or `limit` if that is no more than it would be.
int64_t recursive_size(FUNINFO* f, int64_t ncalls, int64_t limit) {
    if (TEST_FLAG(f, FUN_follows_call | FUN_cannot_inline) || f->size == 0) return 0;
    int64_t sum = f->size;
    for (const CALLEE* c = f->callees; c && sum * ncalls < limit; c = c->next)
        if (c->callee != f) sum += recursive_size(c->callee, c->ncalls, limit - sum);
    return std::min(sum * ncalls, limit);
}

uint32_t size_with_expansions(const FUNINFO* f) {
    uint32_t s = f->size;
    for (const CALLEE* c = f->callees; c; c = c->next)
        if (TEST_FLAG(c->callee, FUN_is_inlined)) s += c->callee->size;
    return s;
}

bool is_last_site(FUNINFO* callee) {
    return inline_single && callee->sites_left == 1 && !TEST_FLAG(callee, FUN_cannot_suppress);
}

bool is_worth_its_size(const CALLSITE& site) {
    FUNINFO* callee = site.callee;
    if (auto_inline() == 0 || callee->size == 0) return is_last_site(callee);
    if (find_pragma(callee->symbol, PRG_FUNC_ALWAYS_INLINE)) return true;
    const uint32_t s = size_with_expansions(callee);
    const bool is_used_otherwise = TEST_FLAG(callee, FUN_is_anonymous | FUN_follows_call | FUN_is_cg_root);
    const int64_t times = callee->ncallers + (is_used_otherwise ? 1 : 0);
    const bool has_few_callees = !callee->callees || !callee->callees->next;
    if (s < SMALL && has_few_callees) return true;
    if (s <= LARGE) {
        if ((opt_level() >= 3 || has_inline_qualifier(callee)) && !is_seen_from_outside(callee) &&
            !TEST_FLAG(callee, FUN_cannot_suppress) && !is_used_otherwise && callee->ncallers == 1)
            return true;
    }
    if (times * s <= auto_inline()) return true;
    return is_last_site(callee);
}

} // namespace

void measure_sizes() {
    FUNINFO* f = currfuninfo;
    f->est_loops = 0;
    f->est_time = f->size;
    f->est_bbs = static_cast<uint32_t>(f->bb_count);
    f->est_syms = 0;
    for (const SYMTAB* s = f->scalar_syms; s; s = s->next) ++f->est_syms;
    f->is_leaf_estimate = f->no_calls;
}

void OLD_INLINER::collect_pass_1_info(INLINE_FILE& file) {
    measure_sizes();
    const bool shows_pressure = inline_commentary_is_on(); // it decides nothing
    if (shows_pressure) need(fact::live_variables);
    collect_call_sites(file, shows_pressure ? register_pressure_for_block : nullptr);
}

SITE_PREDICATE OLD_INLINER::static_inlining_predicate() {
    const int64_t limit = size_speed_goal() < 2 ? RECURSIVE_LIMIT_FOR_SIZE : RECURSIVE_LIMIT;
    return [limit](const CALLSITE& site) {
        return site.callee && has_inline_qualifier(site.callee) && recursive_size(site.callee, 1, limit) < limit;
    };
}

void OLD_INLINER::further_setup(INLINE_FILE&, SITES& sites) {
    static_limit = 0;
    std::stable_sort(sites.begin(), sites.end(), [](const CALLSITE* a, const CALLSITE* b) {
        const FUNINFO *callee_a = a->callee, *callee_b = b->callee;
        OPT_ASSERT(callee_a != NULL && callee_b != NULL);
        return callee_a->cg_order > callee_b->cg_order;
    });
}

void OLD_INLINER::auto_inlining_passes(INLINE_FILE& file, const SITES& sites) {
    file.pass(sites, is_worth_its_size, "", {});
}
