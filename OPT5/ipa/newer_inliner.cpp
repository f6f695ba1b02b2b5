// Strategies by how often calls run: counts flow through the call graph, and a site is worth its share of the calls of its
// callee over its share of the time of the file.
#include "OPT5/ipa/inliner.h"

#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/profile.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <algorithm>
#include <cmath>

register_option pass_debug_inline_benefit_call("debug:inline_benefit_call");
register_option pass_debug_inline_benefit_fold("debug:inline_benefit_fold");
register_option pass_debug_inline_benefit_pressure("debug:inline_benefit_pressure");
register_option pass_debug_inline_pressure_limit("debug:inline_pressure_limit");
register_option pass_disable_inline_tiny_leaves("disable:inline_tiny_leaves");
// Registered so that command lines that name it stay valid; nothing asks for it.
register_option pass_disable_newinline("disable:newinline");

namespace {

constexpr uint32_t NO_COUNT = 0xFFFFFFFF, TINY = 20;
constexpr double MOST = 4294967294.0;

int given_or(const register_option& option, int otherwise) { return option ? int(option) : otherwise; }
uint32_t to_count(double x) { return x >= MOST ? static_cast<uint32_t>(MOST) : x > 0 ? static_cast<uint32_t>(x) : 0; }

// ---- Counts through the call graph

class COUNTS {
public:
    explicit COUNTS(INLINE_FILE& f) : file(f) {}

    void propagate() {
        for (FUNINFO* f : file.functions)
            if (TEST_FLAG(f, FUN_is_anonymous)) {
                anonymous.push_back(f);
                inline_commentary("[anonymous function:  %s]\n", f->name.c_str());
            }
        for (FUNINFO* f : file.functions) { // a caller precedes its callees
            if (f->entry_count == NO_COUNT) {
                f->entry_count = 1;
                inline_commentary("[count for %s now set to 1]\n", f->name.c_str());
            }
            for (const CALLSITE* site : file.sites_of(f)) pass_on(*site);
            inline_commentary("[count for %s (%p):  %d]\n", f->name.c_str(), static_cast<void*>(nullptr), static_cast<int>(f->entry_count));
        }
    }

private:
    static void add(FUNINFO* f, uint32_t count) {
        f->entry_count = to_count((f->entry_count == NO_COUNT ? 0.0 : f->entry_count) + double(count));
    }

    void pass_on(const CALLSITE& site) {
        const uint32_t count = to_count(site.caller->entry_count * site.temp + 0.5);
        inline_commentary("[%s:  callsite count %d]\n", site.description().c_str(), static_cast<int>(count));
        if (site.callee)
            add(site.callee, count);
        else
            split(site, count);
    }

    void split(const CALLSITE& site, uint32_t count) {
        std::vector<FUNINFO*> matching;
        for (FUNINFO* f : anonymous)
            if (f->symbol && site.type && compatible_types(f->symbol->type, site.type, true)) matching.push_back(f);
        if (matching.empty()) return;
        const auto share = static_cast<uint32_t>(count / matching.size());
        inline_commentary("[%zu matching anons, split_amount is %d]\n", matching.size(), static_cast<int>(share));
        for (FUNINFO* f : matching) {
            add(f, share);
            inline_commentary("[anon count for %s updated to %d]\n", f->name.c_str(), static_cast<int>(f->entry_count));
        }
    }

    INLINE_FILE& file;
    std::vector<FUNINFO*> anonymous;
};

void set_priorities(const INLINE_FILE& file, const SITES& sites) {
    for (CALLSITE* site : sites) {
        const double calls = site->caller->entry_count * site->temp, all = site->callee->entry_count;
        const double share = all > 0 ? calls / all : 0;
        const double time = file.linear() ? cost(*site) / static_cast<double>(file.linear()) : 0;
        site->priority = share == 0 ? 0.0F : time == 0 ? 3e38F : static_cast<float>(std::min(share / time, 3e38));
    }
}

} // namespace

void NEWER_INLINER::measure() {
    NEW_INLINER::measure();
    FUNINFO* f = currfuninfo;
    if (f->profile_status) return;
    f->profile_status = 1;
    initialize_CFG_profiling_annotation(true, false);
    f->profile_status = 0;
    measure_density(true);
}

namespace {

int benefit_by_frequency(const CALLSITE& site) {
    uint32_t frequency;
    if (site.temp != 0 && !profiles_are_ignored())
        frequency = to_count(site.temp * site.caller->entry_count);
    else
        frequency = to_count(std::pow(8.0, site.depth));
    int worth = given_or(pass_debug_inline_benefit_call, 2);
    if (folding_is_estimated() && site.fold_ratio > 1.01F) worth += given_or(pass_debug_inline_benefit_fold, 2);
    const int pressure = site.pressure + static_cast<int>(site.callee ? site.callee->est_pressure : 0);
    if (pressure > given_or(pass_debug_inline_pressure_limit, 15)) worth -= given_or(pass_debug_inline_benefit_pressure, 4);
    return static_cast<int32_t>(static_cast<uint32_t>(worth) * frequency);
}

void set_up_by_counts(INLINE_FILE& file, SITES& sites) {
    COUNTS(file).propagate();
    drop_undesirable_sites(sites);
    estimate_folding_of(sites);
    set_priorities(file, sites);
}

void list_by_priority(const SITES& sites) {
    inline_commentary("[Sorted candidates:]\n");
    for (const CALLSITE* site : sites)
        inline_commentary("[%g/%d/%d/%g (density %d):  %s]\n", static_cast<double>(site->priority),
                          benefit_by_frequency(*site), cost(*site), site->temp, static_cast<int>(site->callee->density),
                          site->description().c_str());
}

} // namespace

int NEWER_INLINER::site_benefit(const CALLSITE& site) { return benefit_by_frequency(site); }
int INLINER_5::site_benefit(const CALLSITE& site) { return benefit_by_frequency(site); }

void NEWER_INLINER::further_setup(INLINE_FILE& file, SITES& sites) {
    set_up_by_counts(file, sites);
    std::stable_sort(sites.begin(), sites.end(), [](const CALLSITE* a, const CALLSITE* b) { return a->priority > b->priority; });
    set_limits(file);
    list_by_priority(sites);
}

void INLINER_5::further_setup(INLINE_FILE& file, SITES& sites) {
    set_up_by_counts(file, sites);
    sort_by_worth(sites);
    set_limits(file);
    list_by_priority(sites);
}

void NEWER_INLINER::auto_inlining_passes(INLINE_FILE& file, const SITES& sites) {
    pass_of_single_sites(file, sites);
    if (auto_inline() > 0 && !pass_disable_inline_tiny_leaves)
        waves(file, sites,
              [](const CALLSITE& s) { return s.callee->est_ncalls == 0 && s.callee->size >= 1 && s.callee->size <= TINY; },
              "tiny leaf ", growth_limits(static_limit, 0));
    NEW_INLINER::auto_inlining_passes(file, sites);
}
