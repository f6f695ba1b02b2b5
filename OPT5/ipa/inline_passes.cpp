// The pass engine: sites are applied to the estimates one by one, and taken back where the file would grow too large.
//
// What a site adds to its caller, everything gets that the caller was expanded into already. The sums of the times are
// kept as they change, so that a test costs nothing.
#include "OPT5/ipa/inliner.h"

#include "BITVEC/bitvec.h"
#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <map>

register_option pass_debug_inline_n("debug:inline_n");

namespace {

// Squares are of 32 bits, their sum of 64.
int64_t square(uint32_t time) { return static_cast<int64_t>(static_cast<uint32_t>(time * time)); }

bool may_go_away(FUNINFO* f) { return f->sites_left == 0 && !TEST_FLAG(f, FUN_cannot_suppress); }

bool is_validating() {
    const register_option* validate = register_option::get_option("debug:validate");
    return validate && *validate;
}

// All that a site changes before it is accepted.
std::vector<uint32_t> estimates_of(const std::vector<FUNINFO*>& functions) {
    std::vector<uint32_t> all;
    for (const FUNINFO* f : functions)
        for (uint32_t x : {f->est_time, f->est_bbs, f->est_syms, f->est_loops, f->est_ncalls, f->est_pressure, uint32_t(f->sites_left)})
            all.push_back(x);
    return all;
}

} // namespace

struct INLINE_FILE::TRIAL {
    DELTAS given;                      // to the caller and everything above it
    uint32_t time, bbs, syms, loops, ncalls; // the callee's before
    uint32_t pressure;                 // the caller's before
};

void INLINE_FILE::measure() {
    quadratic_m = linear_m = 0;
    for (const FUNINFO* f : functions) {
        quadratic_m += square(f->est_time);
        linear_m += f->est_time;
    }
}

void INLINE_FILE::set_time(FUNINFO* f, uint32_t time) {
    quadratic_m += square(time) - square(f->est_time);
    linear_m += static_cast<int64_t>(time) - static_cast<int64_t>(f->est_time);
    f->est_time = time;
}

void INLINE_FILE::add(FUNINFO* f, const DELTAS& d) {
    set_time(f, f->est_time + d.time);
    f->est_bbs += d.bbs;
    f->est_syms += d.syms;
    f->est_loops += d.loops;
    f->est_ncalls += d.ncalls;
}

// Callers of callers come behind in call-graph order, but for cycles, which are not followed.
void INLINE_FILE::cascade(FUNINFO* into, const DELTAS& d) {
    struct WAITING {
        FUNINFO* f = nullptr;
        DELTAS sum;
        int depth = 0; // of the longest path of expansions
    };
    std::map<int, WAITING, std::greater<int>> waiting;
    auto pass_on = [&](const FUNINFO* f, const DELTAS& delta, int depth) {
        auto it = into_m.find(f);
        if (it == into_m.end()) return;
        for (const CALLSITE* s : it->second) {
            if (s->caller->cg_order >= f->cg_order) continue;
            auto& [g, sum, d] = waiting[s->caller->cg_order];
            g = s->caller;
            d = std::max(d, depth);
            sum.time += delta.time;
            sum.bbs += delta.bbs;
            sum.syms += delta.syms;
            sum.loops += delta.loops;
            sum.ncalls += delta.ncalls;
        }
    };
    pass_on(into, d, 1);
    while (!waiting.empty()) {
        auto [f, delta, depth] = waiting.begin()->second;
        waiting.erase(waiting.begin());
        if (static_cast<int32_t>(delta.time) > 0) inline_commentary("[cascaded inline (depth %d) into %s]\n", depth, f->name.c_str());
        add(f, delta);
        pass_on(f, delta, depth + 1);
    }
}

void INLINE_FILE::apply(const CALLSITE& site, TRIAL* trial) {
    FUNINFO *caller = site.caller, *callee = site.callee;
    *trial = {{}, callee->est_time, callee->est_bbs, callee->est_syms, callee->est_loops, callee->est_ncalls,
              caller->est_pressure};
    DELTAS& d = trial->given;
    if (caller->est_time) d.time = static_cast<uint32_t>(cost(site));
    d.bbs = callee->est_bbs;
    d.syms = callee->est_syms;
    d.loops = callee->est_loops;
    d.ncalls = callee->est_ncalls - 1;
    caller->est_pressure = std::max(caller->est_pressure, static_cast<uint32_t>(site.pressure) + callee->est_pressure);
    add(caller, d);
    --callee->sites_left;
    if (may_go_away(callee)) {
        set_time(callee, 0);
        callee->est_bbs = callee->est_syms = callee->est_loops = 0;
    }
    cascade(caller, d);
}

void INLINE_FILE::undo(const CALLSITE& site, const TRIAL& trial) {
    FUNINFO *caller = site.caller, *callee = site.callee;
    const DELTAS& d = trial.given;
    const DELTAS back{0 - d.time, 0 - d.bbs, 0 - d.syms, 0 - d.loops, 0 - d.ncalls};
    cascade(caller, back);
    ++callee->sites_left;
    set_time(callee, trial.time);
    callee->est_bbs = trial.bbs;
    callee->est_syms = trial.syms;
    callee->est_loops = trial.loops;
    callee->est_ncalls = trial.ncalls;
    if (caller == callee) { // what it was before it took itself in
        caller->est_pressure = trial.pressure;
        return;
    }
    add(caller, back);
    caller->est_pressure = trial.pressure;
}

bool INLINE_FILE::is_too_big(const CALLSITE& site, const INLINE_LIMITS& limits) const {
    if (pass_debug_inline_n) return false;
    return (limits.quadratic > 0 && quadratic_m > limits.quadratic) || (limits.linear > 0 && linear_m > limits.linear) ||
           (limits.loops && site.caller->est_loops > limits.loops) ||
           (limits.blocks && site.caller->est_bbs > limits.blocks);
}

void INLINE_FILE::accept(CALLSITE& site) {
    FUNINFO *caller = site.caller, *callee = site.callee;
    site.is_accepted = true;
    accepted.push_back(&site);
    into_m[callee].push_back(&site);
    caller->inline_sites->set(site.id);
    site.forced ? caller->forced_sites->set(site.id) : caller->forced_sites->clear(site.id);
    site.forced_deep ? caller->deep_sites->set(site.id) : caller->deep_sites->clear(site.id);
    if (!TEST_FLAG(callee, FUN_is_inlined)) {
        sym_split(callee);
        save_cfg(callee);
        set_flags(callee, FUN_is_inlined);
        if (!has_inline_qualifier(callee)) {
            if (print_debug) debug_printf("\n\tMaking this function inlineable: %s()\n\n", callee->name.c_str());
            if (write_opt_info) info_printf("\nMaking this function inlineable: %s()\n", callee->name.c_str());
        }
    }
    if (callee->sites_left) {
        inline_commentary("[new limit %ld]\n", static_cast<long>(quadratic_m));
    } else if (may_go_away(callee)) {
        set_flags(callee, FUN_is_suppressed);
        if (print_debug) debug_printf("\tInlineable function will be suppressed: %s()\n\n", callee->name.c_str());
        if (write_opt_info) info_printf("Inlineable function will be suppressed: %s()\n", callee->name.c_str());
    }
}

void INLINE_FILE::pass(const SITES& sites, const SITE_PREDICATE& predicate, const char* label, const INLINE_LIMITS& limits) {
    for (CALLSITE* s : sites) {
        CALLSITE& site = *s;
        if (pass_debug_inline_n && accepted.size() >= static_cast<size_t>(static_cast<int>(pass_debug_inline_n))) return;
        if (site.is_accepted || (predicate && !predicate(site))) continue;
        FUNINFO *caller = site.caller, *callee = site.callee;
        const int benefit = inliner->site_benefit(site);
        inline_commentary("[%scandidate:  %s (size %d sites %d);  loop %d nargs %d nconstargs %d postdom %s ncalls %d;  "
                          "benefit %d cost %d temp %.2f]\n",
                          label, site.description().c_str(), callee ? static_cast<int>(callee->size) : 0,
                          callee ? callee->sites_left : 0, site.loop, site.nargs, site.nconstargs,
                          site.postdom ? "yes" : "no", callee ? static_cast<int>(callee->est_ncalls) : 0, benefit, cost(site),
                          site.temp);
        if (!callee) {
            inline_commentary("  [can't do this one:  unknown callee.]\n");
            continue;
        }
        OPT_ASSERT(caller != NULL);
        TRIAL trial;
        std::vector<uint32_t> before;
        if (limits.any() && is_validating()) before = estimates_of(functions);
        apply(site, &trial);
        const auto quadratic = static_cast<long>(quadratic_m);
        const auto linear = static_cast<int>(linear_m);
        const auto loops = static_cast<int>(caller->est_loops), bbs = static_cast<int>(caller->est_bbs);
        if (is_too_big(site, limits)) {
            inline_commentary("  [can't do this one:  too big (%ld vs %ld, %d vs %d, %d vs %d, %d vs %d).]\n", quadratic,
                              static_cast<long>(limits.quadratic), linear, static_cast<int>(limits.linear), loops,
                              static_cast<int>(limits.loops), bbs, static_cast<int>(limits.blocks));
            undo(site, trial);
            OPT_ASSERT(before.empty() || before == estimates_of(functions));
            continue;
        }
        inline_commentary("  [accepting:  %ld vs %ld, %d vs %d, %d vs %d, pressure %d.]\n", quadratic,
                          static_cast<long>(limits.quadratic), linear, static_cast<int>(limits.linear), loops,
                          static_cast<int>(limits.loops), static_cast<int>(caller->est_pressure));
        inline_commentary("    [in %s:  est syms %d, est bbs %d]\n", caller->name.c_str(), static_cast<int>(caller->est_syms), bbs);
        inline_commentary("[accepted:  %s (size %d sites %d);  benefit %d cost %d]\n", site.description().c_str(),
                          static_cast<int>(callee->size), callee->sites_left, benefit, cost(site));
        accept(site);
    }
}
