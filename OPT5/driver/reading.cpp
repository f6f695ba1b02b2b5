// What happens to a function between its last record and pass 1, and what the passes are told of the input meanwhile.
//
// The rows begin with the function's statements as a list and end with its graph, in which the plainest improvements are
// done: they make what the barriers have to look at smaller.
#include "OPT5/driver/driver.h"
#include "OPT5/driver/pipeline.h"

#include "BITVEC/bitvec.h"
#include "OPT5/cd/vectors.h"
#include "OPT5/io/read.h"
#include "OPT5/ipa/ipcp.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/mvp/mvp.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/fcp.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/seq.h"

namespace {

// The call sites of the function, which inlining decides on.
void size_site_sets() {
    FUNINFO* f = currfuninfo;
    for (BITVEC** sites : {&f->inline_sites, &f->forced_sites, &f->deep_sites}) {
        delete *sites;
        *sites = new BITVEC(f->unique_call_index + 1);
    }
}

constexpr ROW::KIND F = ROW::FUNCTION, FIXED = ROW::FIXED, IDLE = ROW::IDLE;
using fact::alias_marks;
using fact::graph;
using fact::none;

// clang-format off
const ROW rows[] = {
    // kind, name, frame, condition, action, needs, leaves
    {F,     "find synonyms",               nullptr, always, check_for_synonym_function_in_pass_1, none, graph},
    {F,     "find integrable functions",   nullptr, always, check_integrable_definition, none, none},
    {FIXED, "sequence",                    nullptr, always, [] { seq_trees(L2() ? propagate_global_constants : nullptr); }, none, none},
    {FIXED, "build graph",                 nullptr, always, buildcfg, none, fact::block_numbers},
    {F,     "tail recursion",              nullptr, always, remove_tail_recursion, none, graph},
    {F,     "first simpcfg",               nullptr, always, [] { simpcfg(0, 0); }, none, graph},
    {F,     "first fast_CP",               nullptr, L1, [] { fast_CP(4, 1); }, alias_marks, graph | alias_marks},
    {FIXED, "scan definition",             nullptr, always, [] { preprocess_fundef(currfuninfo); }, none, graph},
    {F,     "does it return",              nullptr, L1, see_whether_body_returns, none, fact::every},
    {FIXED, "call sites",                  nullptr, always, size_site_sets, none, fact::every},
    {F,     "parameters",                  nullptr, always, init_ipcp_for_fun, none, fact::every},
    {IDLE,  "parameters by metavalues",    nullptr, [] { return do_IP_MVP; }, init_IP_MVP_for_current_function, none, none},
    {F,     "find local statics",          nullptr, always, identify_fl_statics_safe_for_auto, none, graph},
    {F,     "convert local statics",       nullptr, always, [] { convert_safe_fl_statics_to_auto(currfuninfo); }, none, graph},
};
// clang-format on

class PASS_LISTENER final : public READ_LISTENER {
    void symbol_is_complete(SYMTAB* sym) override {
        make_symbol_groupable(sym);
        if (sym->is_function()) check_fun_for_byref_asgs(sym);
    }
    void initializer_item(NODE* item) override { scan_for_funinfo(item); }
    void assembly(const char* text) override { program.assembly.push_back(text); }
    NODE* lane_access(NODE* access) override { return disguise_VFIELD_node(access); }
    void arguments_are_complete() override {
        if (do_beta_MVP)
            beta_parms_using_mvp_ip();
        else
            beta_parms();
    }
    void function_is_complete() override { run_rows_behind_reading(); }
};

} // namespace

ROWS rows_behind_reading() { return rows; }

READ_LISTENER& pass_listener() {
    static PASS_LISTENER listener;
    return listener;
}
