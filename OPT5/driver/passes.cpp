// The table of steps: the order of all optimization in the program.
//
// The steps ahead of the first barrier are pass 1: they run over every function while the whole program is not yet
// known. The barriers do the work on the whole program. The steps behind them are pass 2. The serial number of a step
// is its place here; a step that does nothing keeps its place, so that the numbers of the others do not move.
#include "OPT5/driver/passes.h"

#include "BANNER/banner.h"
#include "OPT5/alias/alias.h"
#include "OPT5/cd/cd.h"
#include "OPT5/cd/vectors.h"
#include "OPT5/dd/dd.h"
#include "OPT5/ipa/inline.h"
#include "OPT5/ipa/ipcp.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/scope.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/lir/lir.h"
#include "OPT5/mvp/mvp.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/fcp.h"
#include "OPT5/scalar/gcse.h"
#include "OPT5/scalar/gdflow.h"
#include "OPT5/scalar/increments.h"
#include "OPT5/scalar/lcp.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/scalar/merge.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/target/target.h"
#include "OPT5/vp/vp.h"

#include <set>

namespace {

// ---- Tests at the head of actions

bool L1() { return opt_level() >= 1; }
bool L2() { return opt_level() >= 2; }
bool L2_with_branches() { return L2() && currfuninfo->bb_count >= 2; }

// ---- Actions that are more than a line

void pass_2_header() {
    if (write_opt_info && finfo) std::fflush(finfo);
    if (print_debug) debug_flush();
    std::printf("%s Pass 2\n", isa_and_tool_name());
}

bool is_left_out(FUNINFO* f) {
    if (TEST_FLAG(f, FUN_is_processed)) return true;
    return TEST_FLAG(f, FUN_is_suppressed) && !TEST_FLAG(f, FUN_cannot_suppress);
}

// From here on the functions come in call-graph order, and one that was folded into all its callers no longer runs.
// Only functions in work are taken: a function that left it comes back as an unsuppressed one.
void set_call_graph_order() {
    const std::list<SYMTAB*> in_work = functions;
    functions.clear();
    if (!cg_list) set_up_and_build_call_graph();
    if (!cg_list) {
        for (SYMTAB* sym : in_work)
            if (!is_left_out(make_FUNINFO(sym))) functions.push_back(sym);
        return;
    }
    std::set<const FUNINFO*> waiting;
    for (SYMTAB* sym : in_work) waiting.insert(make_FUNINFO(sym));
    for (const FUNLIST* p = cg_list; p; p = p->next)
        if (waiting.erase(p->fun) && !is_left_out(p->fun)) functions.push_back(p->fun->symbol);
}

void print_scopes() {
    if (!fdebug) return;
    if (currfuninfo->ls_root)
        currfuninfo->ls_root->print(fdebug);
    else
        debug_printf("<<NULL SCOPE>>\n");
}

void pass_2_inits() {
    if (print_debug) print_scopes();
    if (currfuninfo->ls_root) {
        if (GO_FOR_INSTRUMENTATION && TEST_FLAG(currfuninfo, FUN_is_main)) add_instrumentation_exit_routine_to_atexit();
        currfuninfo->ls_root->validate();
    }
    integrate_calls_in_function();
    promote_all_embedded_assignments();
    disguise_vector_operations();
    disclose_vector_operations(false);
    coalesce_local_vector_symbols();
    lower_vector_statements();
    disguise_vector_operations();
    sym_split(currfuninfo);
    if (do_beta_MVP) {
        beta_parms_using_mvp_ip();
        beta_convert_using_mvp_ip();
    } else {
        beta_parms();
        beta_convert();
    }
    simpcfg(0, 0);
}

void stack_sharing() {
    const bool hardware_float = (float_support | 1) == 11;
    if (!L1() && hardware_float) return;
    reset_alias_info();
    build_stack_sharing_type();
}

void intraprocedural_MVP() {
    if (!L2()) return;
    if (print_debug) debug_printf("~~~#MAIN#1 do_int_MVP=%d %s()\n", do_int_MVP, currfunc->name);
    if (!do_int_MVP) return;
    initialize_ssa_pointsto_mvp();
    do_integer_value_propagation();
    wrap_up_ssa_pointsto_mvp();
}

void value_propagation_for_SIMD() {
    if (!L2() || !currfuninfo->simd_allowed) return;
    init_dd_aliasing();
    do_value_propagation();
    simpcfg(0, 0);
    rebuildcfg();
    simpcfg(0, 0);
}

void global_CSE() {
    if (!L2_with_branches()) return;
    unbuild_loop_hierarchy();
    annotate_cfg();
    gcse();
    restructure_loops();
    clean_up_gdflow_bitvecs();
    clean_up_alias_analysis_bitvecs_etc();
    clean_up_assert_RELOPs();
}

void in_SSA_form(void (*work)()) {
    if (!L2()) return;
    construct_SSA_form(false, false, true);
    work();
    deconstruct_SSA_form();
}

void nothing() {}

struct STEP {
    enum KIND { FUNCTION, BARRIER } kind;
    const char* name;
    void (*action)();
};
constexpr STEP::KIND F = STEP::FUNCTION, B = STEP::BARRIER;

// clang-format off
const STEP steps_before_dd[] = {
    /*  0 */ {F, "pass 1 fcp/eda", [] { if (L2()) { fast_CP(4, 0); elim_dead_assigns(0, 0); } }},
    /*  1 */ {F, "pass 1 fast_CP(4,0)", [] { fast_CP(4, 0); }},
    /*  2 */ {F, "value propagation for pass 1", [] { if (L2()) { init_dd_aliasing(); do_value_propagation(); } }},
    /*  3 */ {B, "analyze globals", analyze_global_symbols},
    /*  4 */ {B, "detect_recursion", detect_recursion},
    /*  5 */ {B, "do_interprocedural_propagation", do_interprocedural_propagation},
    /*  6 */ {B, "auto_inline_call_sites", auto_inline_call_sites},
    /*  7 */ {B, "dump_call_graph_debug", dump_call_graph_debug},
    /*  8 */ {B, "collect_clustered_symbols", collect_clustered_symbols},
    /*  9 */ {B, "pass 2 header", pass_2_header},
    /* 10 */ {B, "set call-graph order", set_call_graph_order},
    /* 11 */ {F, "pass 2 inits", pass_2_inits},
    /* 12 */ {F, "stack sharing", stack_sharing},
    /* 13 */ {F, "CPS", straighten_cond_paths},
    /* 14 */ {F, "early LIR", early_LIR},
    /* 15 */ {F, "early fast_CP(4,1)", [] { fast_CP(4, 1); }},
    /* 16 */ {F, "MVP global assertions", [] { if (do_IP_MVP) add_MVP_IP_global_assertions(); }},
    /* 17 */ {F, "intraprocedural MVP", intraprocedural_MVP},
    /* 18 */ {F, "value propagation for SIMD", value_propagation_for_SIMD},
    /* 19 */ {F, "explode auto structs", [] { if (L2()) explode_auto_struct_vars(); }},
    /* 20 */ {F, "non-DD clone SSA NASSERTs", [] { in_SSA_form(clone_SSA_NASSERTs); }},
    /* 21 */ {F, "non-DD SSA CP", [] { in_SSA_form([] { propagate_SSA_constants(1); }); }},
    /* 22 */ {F, "non-DD SSA EDA", [] { in_SSA_form(eliminate_dead_SSA_assignments); }},
    /* 23 */ {F, "SSA RP with benign loads", [] { if (L2()) promote_vars_to_registers(true); }},
    /* 24 */ {F, "expand bitfields", expand_bitfields},
    /* 25 */ {F, "fast_CP(0,1)", [] { fast_CP(0, 1); }},
    /* 26 */ {F, "add profile loop annotations", add_loop_annotation_from_profile},
    /* 27 */ {F, "CD vectorizations", do_cd_vectorization},
};
// 28 to 60: add_dd_normal_order_passes
const STEP steps_after_dd[] = {
    /* 61 */ {F, "CD ILP", do_cd_ilp},
    /* 62 */ {F, "late fast_CP(4,1)", [] { fast_CP(4, 1); }},
    /* 63 */ {F, "Disclose Vectors", [] { disclose_vector_operations(false); }},
    /* 64 */ {F, "global CP", [] { if (L2_with_branches()) { unbuild_loop_hierarchy(); copyprop(1); } }},
    /* 65 */ {F, "late points-to", [] { if (L2_with_branches()) propagate_PT_info(); }},
    /* 66 */ {F, "global CSE", global_CSE},
    /* 67 */ {F, "Zelkova rotate loops", [] { if (L2_with_branches() && cpu_version == 28) rotate_loops_for_accumulators(); }},
    /* 68 */ {F, "late rename symbols", [] { if (L2_with_branches()) rename_symbols(); }},
    /* 69 */ {F, "merge symbols", [] { if (L2_with_branches()) merge_symbols(); }},
    /* 70 */ {F, "DD restructuring", nothing},
    /* 71 */ {F, "expand cluster refs", expand_cluster_refs},
    /* 72 */ {F, "CSU returning temp", subst_csu_returning_temp_for_local_var},
    /* 73 */ {F, "superblocks", [] { if (L1()) optimize_superblocks_in_cfg(); }},
    /* 74 */ {F, "subrange", [] { if (L1()) { reset_alias_info(); lcse_subrange_assignments(); elim_dead_subrange_assigns(); } }},
    /* 75 */ {F, "lcp", [] { if (L1()) copyprop(1); }},
    /* 76 */ {F, "sti-to-cinit", [] { if (L2()) convert_sti_to_cinit(); }},
    /* 77 */ {F, "lcse", [] { if (L1()) lcse(); }},
    /* 78 */ {F, "propagate increments", [] { if (L1()) propagate_increments(); }},
    /* 79 */ {F, "Disguise Vectors", disguise_vector_operations},
    /* 80 */ {F, "late LIR", late_LIR},
    // 81, "output function", belongs to the function loop.
};
// clang-format on

pass* make_step(const STEP& step) {
    if (step.kind == STEP::BARRIER) return new barrier_pass(step.name, step.action);
    return new pass(step.name, step.action);
}

} // namespace

void add_normal_order_passes(std::vector<pass*>& order) {
    for (const STEP& step : steps_before_dd) order.push_back(make_step(step));
    add_dd_normal_order_passes(order);
    for (const STEP& step : steps_after_dd) order.push_back(make_step(step));
}
