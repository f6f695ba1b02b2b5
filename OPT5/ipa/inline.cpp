// Automatic inlining: decides once for the file, when every function has been read and analysed.
#include "OPT5/ipa/inline.h"

#include "BITVEC/bitvec.h"
#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ipa/inliner.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/remark.h"
#include "UTIL/abort.h"

#include <cstdarg>
#include <cstdio>
#include <unordered_set>

register_option pass_debug_inline_commentary("debug:inline_commentary");
register_option pass_debug_inliner("debug:inliner"); // the strategy, 1 to 5

std::unique_ptr<INLINER> inliner;

void create_inliner() {
    switch (pass_debug_inliner) {
    case 2: inliner = std::make_unique<REVISED_OLD_INLINER>(); break;
    case 3: inliner = std::make_unique<NEW_INLINER>(); break;
    case 4: inliner = std::make_unique<NEWER_INLINER>(); break;
    case 5: inliner = std::make_unique<INLINER_5>(); break;
    default: inliner = std::make_unique<OLD_INLINER>();
    }
}
bool inline_recursion_is_limited() { return !inliner || inliner->warn_inline_recursion_limit(); }
void init_proc_integration() { unsuppressed_funinfos.clear(); }

bool inline_commentary_is_on() { return pass_debug_inline_commentary; }

void inline_commentary(const char* format, ...) {
    if (!pass_debug_inline_commentary) return;
    char text[2048];
    va_list args;
    va_start(args, format);
    std::vsnprintf(text, sizeof text, format, args);
    va_end(args);
    debug_printf("%s", text);
    if (write_opt_info) info_printf("%s", text);
}

// ---- Tests

bool has_inline_qualifier(const FUNINFO* f) { return f->symbol && f->symbol->cqual & CQ_INLINE; }

static bool says(const char** reason, const char* text, bool answer) {
    *reason = text;
    return answer;
}

bool is_inline_candidate(const CALLSITE& site, const char** reason) {
    FUNINFO* callee = site.callee;
    if (!callee || !callee->symbol) return says(reason, "unknown function", false);
    if (site.forced) return says(reason, "forceinline or always-inline", true);
    if (file_options && file_options->getopt(option_obj::OO_disable_inlining)) return says(reason, "--disable_inlining", false);
    if (has_inline_qualifier(callee)) return says(reason, "CQ_INLINE", true);
    if (!currfuninfo && site.caller->symbol->option_set) return says(reason, "defer to caller options", true);
    const bool is_only_site = callee->ncallers == 1 && !TEST_FLAG(callee, FUN_is_cg_root) && auto_inline() > 0;
    if (opt_level() >= 3 && callee->size && (callee->size < auto_inline() || is_only_site))
        return says(reason, "auto-inline or single-inline", true);
    return says(reason, "no inlining conditions apply", false);
}

bool has_body_to_copy(FUNINFO* f) {
    return f->symbol && f->size && f->bb_list && !f->symbol->type->getr(TYPE::tpk_func)->vararg();
}

bool is_inlineable(const CALLSITE& site, const char** reason) {
    FUNINFO* callee = site.callee;
    if (TEST_FLAG(callee, FUN_cannot_inline | FUN_never_returns)) return says(reason, "cannot-inline or never-returns", false);
    if (TEST_FLAG(callee, FUN_follows_call) && !has_inline_qualifier(callee) && !site.forced)
        return says(reason, "fun-follows-call auto-inline", false);
    if (!function_is_defined(callee)) return says(reason, "not defined", false);
    if (!has_body_to_copy(callee)) return says(reason, "varargs or body problems", false);
    return says(reason, "", true);
}

// ---- The decision

namespace {

void mark_functions_that_follow_calls(const std::vector<FUNINFO*>& functions) {
    for (FUNINFO* f : functions)
        for (const CALLEE* c = f->callees; c; c = c->next)
            if (f->cg_order >= c->callee->cg_order) set_flags(c->callee, FUN_follows_call);
}

bool may_be_suppressed(FUNINFO* f) {
    const SYMTAB* s = f->symbol;
    if (!s || TEST_FLAG(f, FUN_is_anonymous)) return false;
    const bool is_shared = s->retention == 2 || s->retention == 3;
    if (TEST_FLAG(f, FUN_is_cg_root) && !is_shared) return false;
    if ((s->sclass == SC_EXTDEF || s->sclass == SC_EXTERN) && !no_outside_callers && !is_shared) return false;
    return opt_level() > 2 || has_inline_qualifier(f);
}

void consider(CALLSITE* site, SITES* sites) {
    const char*& reason = site->refusal;
    inline_commentary("[considering:  %s]\n", site->description().c_str());
    if (!is_inline_candidate(*site, &reason))
        inline_commentary("[%s is not a candidate (%s)]\n", site->description().c_str(), reason);
    else if (!is_inlineable(*site, &reason))
        inline_commentary("[%s is not inlineable (%s)]\n", site->description().c_str(), reason);
    else if (!site->inlineable) {
        reason = "not inlineable";
        inline_commentary("[%s is not inlineable]\n", site->description().c_str());
    } else {
        reason = nullptr;
        sites->push_back(site);
    }
}

void collect(INLINE_FILE& file, SITES* sites) {
    FUNINFO* const before = currfuninfo;
    SYMTAB* const before_symbol = currfunc;
    for (FUNINFO* f : file.functions) {
        if (!f->bb_list || !f->inline_sites) continue;
        currfuninfo = f;
        currfunc = f->symbol;
        f->sites_left = f->ncallers;
        inliner->collect_pass_1_info(file);
        const SITES& own = file.sites_of(f);
        f->est_ncalls = static_cast<uint32_t>(own.size());
        for (CALLSITE* site : own) consider(site, sites);
    }
    currfuninfo = before;
    currfunc = before_symbol;
}

// ---- What the programmer is told

const char* help_for(const CALLSITE& site, const std::string& reason) {
    if (!site.callee) return "it is called through a pointer that may point to several functions";
    if (!function_is_defined(site.callee)) return nullptr; // of a library: nothing to be done here
    if (reason == "--disable_inlining") return "--disable_inlining was given";
    if (reason == "no inlining conditions apply")
        return opt_level() < 3 ? "declare it inline, or optimize at level 3"
                               : "it is larger than --auto_inline allows: declare it inline, or #pragma FUNC_ALWAYS_INLINE";
    if (reason == "cannot-inline or never-returns")
        return site.callee->inline_obstacle ? site.callee->inline_obstacle : "it never returns";
    if (reason == "fun-follows-call auto-inline") return "it calls its caller, or itself: declare it inline";
    if (reason == "varargs or body problems")
        return site.callee->symbol->type->getr(TYPE::tpk_func)->vararg() ? "it takes a variable number of arguments"
                                                                         : "it has no body to copy";
    return "NOINLINE, recursion, or arguments that its parameters do not take";
}

// A name of C stands behind an underscore.
std::string source_name(const std::string& name) { return name.compare(0, 1, "_") == 0 ? name.substr(1) : name; }

void tell(const CALLSITE& site) {
    const std::string name = site.callee ? source_name(site.callee->name) + "()" : "the function";
    if (site.is_accepted)
        return remark("inline", site.psn, REMARK::DONE, name + " is expanded here");
    if (!site.refusal)
        return remark("inline", site.psn, REMARK::MISSED,
                      name + " is not expanded: the file would grow too large; declare it inline, or #pragma FORCEINLINE");
    if (const char* help = help_for(site, site.refusal))
        remark("inline", site.psn, REMARK::MISSED, name + " is not expanded: " + help);
}

void tell_of_sites(const INLINE_FILE& file) {
    FUNINFO* const before = currfuninfo;
    for (const auto& site : file.owned) {
        currfuninfo = site->caller;
        tell(*site);
    }
    currfuninfo = before;
}

// A site that is forced with the calls below it needs the bodies of all of those.
void save_bodies_below(const INLINE_FILE& file) {
    std::unordered_set<const FUNINFO*> seen; // membership only
    std::vector<FUNINFO*> work;
    for (const CALLSITE* site : file.accepted)
        if (site->forced_deep && seen.insert(site->callee).second) work.push_back(site->callee);
    while (!work.empty()) {
        FUNINFO* f = work.back();
        work.pop_back();
        for (const CALLEE* c = f->callees; c; c = c->next) {
            FUNINFO* callee = c->callee;
            if (!seen.insert(callee).second) continue;
            work.push_back(callee);
            if (callee->saved_cfg || TEST_FLAG(callee, FUN_cannot_inline) || !has_body_to_copy(callee)) continue;
            sym_split(callee);
            save_cfg(callee);
        }
    }
}

} // namespace

void auto_inline_call_sites() {
    if (!cg_list) set_up_and_build_call_graph();
    if (!cg_list || !inliner) return;
    std::vector<FUNINFO*> functions;
    for (const FUNLIST* p = cg_list; p; p = p->next) functions.push_back(p->fun);
    mark_functions_that_follow_calls(functions);
    for (FUNINFO* f : functions)
        if (!may_be_suppressed(f)) set_flags(f, FUN_cannot_suppress);
    INLINE_FILE file(functions);
    SITES sites;
    collect(file, &sites);
    file.measure();
    inliner->further_setup(file, sites);
    file.pass(sites, [](const CALLSITE& s) { return s.forced; }, "always-inline ", {});
    file.pass(sites, inliner->static_inlining_predicate(), "static-inline ",
              {inliner->static_limit, 0, static_cast<uint32_t>(inline_loops_limit), static_cast<uint32_t>(inline_blocks_limit)});
    inliner->auto_inlining_passes(file, sites);
    save_bodies_below(file);
    if (remarks_are_wanted) tell_of_sites(file);
}
