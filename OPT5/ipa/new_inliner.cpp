// Strategies by benefit and cost, within limits on the time of the whole file: the sum of squared times keeps single
// functions from growing without bound.
#include "OPT5/ipa/inliner.h"

#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/profile.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <algorithm>
#include <cmath>
#include <cstdio>

register_option pass_debug_inline_auto_limit("debug:inline_auto_limit");
register_option pass_debug_inline_restrict("debug:inline_restrict");
register_option pass_debug_inline_small_limit("debug:inline_small_limit");
register_option pass_debug_inline_static_limit("debug:inline_static_limit");
register_option pass_disable_inline_folding("disable:inline_folding");
register_option pass_disable_inline_profiled("disable:inline_profiled");
register_option pass_disable_inline_waves("disable:inline_waves");

namespace {

constexpr double STATIC_FACTOR = 7.0, AUTO_FACTOR = 2.0, PER_LOOP = 8.0;
constexpr int64_t SMALL_LIMIT = 1000000;
constexpr uint32_t NO_COUNT = 0xFFFFFFFF;

int64_t scaled(int64_t measure, int percent, double otherwise) {
    return static_cast<int64_t>(static_cast<double>(measure) * (percent ? percent / 100.0 : otherwise));
}

double factor_by_goal() {
    if (file_options && file_options->getopt(option_obj::OO_opt_for_cache)) return 1.0;
    const int goal = size_speed_goal();
    return goal >= 5 ? 2.0 : goal == 4 ? 1.25 : goal >= 1 ? 1.0 : 0.8;
}

bool is_given_size() { return file_options && file_options->getnumarg(option_obj::OO_auto_inline) > 0; }
int32_t wrapped_product(int a, int b) { return static_cast<int32_t>(static_cast<uint32_t>(a) * static_cast<uint32_t>(b)); }

// ---- Measures of the current function

bool is_irreducible() {
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (e->first->dfn <= bb->dfn && !loops.dominates(e->first, bb)) return true;
    return false;
}

// By the loops around each block.
void set_frequencies() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        int depth = 0;
        for (const NATURAL_LOOP* l = currfuninfo->loops->around(bb); l; l = l->parent) ++depth;
        bb->dFreqIn = std::pow(PER_LOOP, depth);
    }
}

// ---- The filter

bool pointers_may_clash(const SYMTAB* callee) {
    for (int i = 0; TYPE* a = type_of_nth_parameter(i, callee); ++i)
        for (int j = 0; j < i; ++j) {
            TYPE* b = type_of_nth_parameter(j, callee);
            if (a->is_pointer() && b->is_pointer() && compatible_types(a, b, true)) return true;
        }
    return false;
}

const char* why_undesirable(const CALLSITE& site) {
    FUNINFO* callee = site.callee;
    if (site.forced) return nullptr;
    if (find_pragma(site.caller->symbol, PRG_FUNC_SYNONYM)) return "synonym";
    if (pass_debug_inline_restrict && pointer_args_are_disjoint && !has_inline_qualifier(callee) &&
        pointers_may_clash(callee->symbol)) {
        if (inline_commentary_is_on()) std::fprintf(stderr, "Hey, punted %s for pointer clash!\n", callee->name.c_str());
        return "-mt implied restrict";
    }
    if (const int benefit = inliner->site_benefit(site); benefit < 0)
        inline_commentary("[benefit < 0 for %s:  %d]\n", site.description().c_str(), benefit);
    if (callee->irreducible) return "irreducible CFG";
    if (TEST_FLAG(callee, FUN_is_SYSTEM) && !has_inline_qualifier(callee)) return "auto-inline system function";
    return nullptr;
}

bool comes_first(const CALLSITE* a, const CALLSITE* b) {
    const int cost_a = cost(*a), cost_b = cost(*b);
    const int benefit_a = inliner->site_benefit(*a), benefit_b = inliner->site_benefit(*b);
    if (cost_a == cost_b && benefit_a != benefit_b) return benefit_a > benefit_b;
    if (benefit_a == benefit_b && cost_a != cost_b) return cost_a < cost_b;
    const int32_t worth_a = wrapped_product(benefit_a, cost_b), worth_b = wrapped_product(benefit_b, cost_a);
    if (worth_a != worth_b) return worth_a > worth_b;
    const int32_t index_a = a->caller->symbol->index, index_b = b->caller->symbol->index;
    return index_a != index_b ? index_a > index_b : a->id < b->id;
}

SITE_PREDICATE has_qualifier() {
    return [](const CALLSITE& site) { return site.callee && has_inline_qualifier(site.callee); };
}

} // namespace

void drop_undesirable_sites(SITES& sites) {
    sites.erase(std::remove_if(sites.begin(), sites.end(),
                               [](const CALLSITE* site) {
                                   const char* why = why_undesirable(*site);
                                   if (why) inline_commentary("[%s is not desirable (%s)]\n", site->description().c_str(), why);
                                   return why != nullptr;
                               }),
                sites.end());
}

void estimate_folding_of(const SITES& sites) {
    if (pass_disable_inline_folding) return;
    for (CALLSITE* site : sites) estimate_folding(*site);
}

bool folding_is_estimated() { return !pass_disable_inline_folding; }
bool profiles_are_ignored() { return pass_disable_inline_profiled; }

void measure_density(bool known_only) {
    double sum = 0;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (known_only && !(bb->dFreqIn >= 0)) continue;
        int instructions = 0;
        for (const LIST* s = bb->statements; s; s = s->rest) instructions += count_nodes_in_tree(s->first, true);
        sum += std::floor(instructions * bb->dFreqIn + 0.5);
    }
    currfuninfo->density = static_cast<uint32_t>(std::min(sum, 4294967295.0));
}

// ---- REVISED_OLD_INLINER

SITE_PREDICATE REVISED_OLD_INLINER::static_inlining_predicate() { return has_qualifier(); }

void REVISED_OLD_INLINER::further_setup(INLINE_FILE& file, SITES& sites) {
    OLD_INLINER::further_setup(file, sites);
    static_limit = scaled(file.quadratic(), pass_debug_inline_static_limit, STATIC_FACTOR);
}

// ---- NEW_INLINER

SITE_PREDICATE NEW_INLINER::static_inlining_predicate() { return has_qualifier(); }

void NEW_INLINER::measure() {
    FUNINFO* f = currfuninfo;
    measure_sizes();
    need(fact::loops | fact::live_variables);
    f->est_loops = static_cast<uint32_t>(f->loops->inner_first().size());
    f->irreducible = is_irreducible();
    f->est_pressure = 0;
    for (const BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        f->est_pressure = std::max(f->est_pressure, static_cast<uint32_t>(register_pressure_for_block(bb)));
    initialize_CFG_profiling_annotation(true, false);
    if (f->profile_status == 0) set_frequencies();
    measure_density(false);
}

void NEW_INLINER::collect_pass_1_info(INLINE_FILE& file) {
    std::vector<std::pair<double, double>> frequencies; // of passes behind this one
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) frequencies.emplace_back(bb->dFreqIn, bb->dFreqOut);
    measure();
    collect_call_sites(file, register_pressure_for_block);
    auto old = frequencies.begin();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink, ++old) {
        bb->dFreqIn = old->first;
        bb->dFreqOut = old->second;
    }
}

int NEW_INLINER::site_benefit(const CALLSITE& site) {
    int benefit = site.loop == 1 ? 10 : site.loop == 2 ? 5 : 0;
    benefit += site.postdom - 1;
    if (!folding_is_estimated())
        benefit += site.nargs ? site.nconstargs * 5 / site.nargs : 0;
    else
        benefit += static_cast<int>(site.fold_ratio * 5.0F);
    if (site.callee) {
        benefit += site.callee->is_leaf_estimate;
        if (site.callee->sites_left == 1) benefit += size_speed_goal() < 2 ? 10 : 1;
    }
    if (!profiles_are_ignored() && site.caller->entry_count != NO_COUNT)
        benefit += static_cast<int>(std::min(std::floor(site.caller->entry_count * site.temp + 0.5), 1e9));
    return benefit;
}

void NEW_INLINER::set_limits(const INLINE_FILE& file) {
    static_limit = scaled(file.quadratic(), pass_debug_inline_static_limit, STATIC_FACTOR);
    auto_limit = scaled(file.quadratic(), pass_debug_inline_auto_limit, AUTO_FACTOR);
    inline_commentary("[Initial:  limit %ld]\n", static_cast<long>(file.quadratic()));
}

void NEW_INLINER::sort_by_worth(SITES& sites) { std::stable_sort(sites.begin(), sites.end(), comes_first); }

void NEW_INLINER::further_setup(INLINE_FILE& file, SITES& sites) {
    drop_undesirable_sites(sites);
    estimate_folding_of(sites);
    sort_by_worth(sites);
    set_limits(file);
    inline_commentary("[Sorted candidates:]\n");
    for (const CALLSITE* site : sites) inline_commentary("[%s]\n", site->description().c_str());
}

void NEW_INLINER::waves(INLINE_FILE& file, const SITES& sites, const SITE_PREDICATE& predicate, const char* label,
                        const INLINE_LIMITS& limits) {
    for (int n = 1;; ++n) {
        inline_commentary("[Wave %d]\n", n);
        const size_t before = file.accepted.size();
        file.pass(sites, predicate, label, limits);
        if (file.accepted.size() == before) break;
    }
    inline_commentary("[End of waves]\n");
}

void NEW_INLINER::pass_of_single_sites(INLINE_FILE& file, const SITES& sites) {
    file.pass(sites, [](const CALLSITE& s) { return s.callee->sites_left == 1 && !TEST_FLAG(s.callee, FUN_cannot_suppress); },
              "suppressible-single-site ", growth_limits(static_limit, 0));
}

INLINE_LIMITS NEW_INLINER::growth_limits(int64_t quadratic, int64_t linear) {
    return {quadratic, linear, static_cast<uint32_t>(inline_loops_limit), static_cast<uint32_t>(inline_blocks_limit)};
}

void NEW_INLINER::auto_inlining_passes(INLINE_FILE& file, const SITES& sites) {
    int64_t quadratic = pass_debug_inline_small_limit ? int(pass_debug_inline_small_limit) : SMALL_LIMIT;
    quadratic = std::max(quadratic, auto_limit);
    auto linear = static_cast<int64_t>(factor_by_goal() * static_cast<double>(file.linear()));
    if (is_given_size()) quadratic = linear = 0;
    const long ratio = auto_limit ? static_cast<long>(100 * file.quadratic() / auto_limit) : 0x7FFFFFFF;
    inline_commentary("[After static-inline:  time %ld limit %ld (ratio %ld)]\n", static_cast<long>(file.quadratic()),
                      static_cast<long>(auto_limit), ratio);
    if (write_opt_info)
        for (const CALLSITE* site : sites) inline_commentary("[initial candidate:  %s]\n", site->description().c_str());
    const INLINE_LIMITS limits = growth_limits(quadratic, linear);
    if (!pass_disable_inline_waves)
        waves(file, sites, [](const CALLSITE& s) { return s.callee->est_ncalls == 0; }, "", limits);
    pass_of_single_sites(file, sites);
    SITE_PREDICATE last;
    if (is_given_size()) last = [](const CALLSITE& s) { return has_inline_qualifier(s.callee) || !s.forced; };
    file.pass(sites, last, "", limits);
}
