// The table of steps: the order of all optimization in the program.
//
// The steps ahead of the first barrier are pass 1: they run over every function while the whole program is not yet
// known. The barriers do the work on the whole program. The steps behind them are pass 2. The serial number of a step
// is its place here; a step that does nothing keeps its place, so that the numbers of the others do not move.
#include "OPT5/driver/frames.h"
#include "OPT5/driver/passes.h"

#include "BANNER/banner.h"
#include "OPT5/alias/alias.h"
#include "OPT5/alias/points_to.h"
#include "OPT5/alias/points_to_checks.h"
#include "OPT5/cd/cd.h"
#include "OPT5/cd/vectors.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/dd/merge.h"
#include "OPT5/dd/ssa.h"
#include "OPT5/ipa/inline.h"
#include "OPT5/ipa/ipcp.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/remark.h"
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
#include "OPT5/scalar/rename.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/target/target.h"
#include "OPT5/vp/vp.h"

#include <set>

namespace {

register_option pass_enable_loop_fusion("enable:fusion");

// ---- Conditions

bool L2_with_branches() { return L2() && currfuninfo->bb_count >= 2; }
bool L2_with_branches_on_28() { return L2_with_branches() && cpu_version == 28; }
bool L2_and_SIMD() { return L2() && currfuninfo->simd_allowed; }
// What such a row does is for loops alone: a function without needs not be brought into the form of its frame.
bool L2_with_loops() { return L2() && has_loops(); }
bool L2_without_loops() { return L2() && !has_loops(); }
bool L2_with_loops_to_unroll() { return L2_with_loops() && size_speed_goal() >= 3; }
bool L2_with_loops_for_speed() { return L2_with_loops() && size_speed_goal() >= 4; }
// A unified memory is on both buses at once.
bool L2_with_loops_on_dual_hardware() { return L2_with_loops() && cpu_version == 28 && rtc_unified_memory; }
bool L2_with_assertions() { return L2() && currfuninfo->has_nasserts; }
bool is_stack_shared() { return L1() || !has_hardware_float(); }
bool fusion_is_enabled() { return L2() && pass_enable_loop_fusion; }

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
    reset_alias_info();
    build_stack_sharing_type();
}

void intraprocedural_MVP() {
    if (print_debug) debug_printf("~~~#MAIN#1 do_int_MVP=%d %s()\n", do_int_MVP, currfunc->name);
    if (!do_int_MVP) return;
    initialize_ssa_pointsto_mvp();
    do_integer_value_propagation();
    wrap_up_ssa_pointsto_mvp();
}

void value_propagation_for_SIMD() {
    init_dd_aliasing();
    do_value_propagation();
    simpcfg(0, 0);
    rebuildcfg();
    simpcfg(0, 0);
}

void late_points_to() {
    propagate_PT_info();
    insert_PT_checks();
}

void global_CSE() {
    unbuild_loop_hierarchy();
    annotate_cfg();
    gcse();
    restructure_loops();
    clean_up_gdflow_bitvecs();
    clean_up_alias_analysis_bitvecs_etc();
    clean_up_assert_RELOPs();
}

// ---- Actions on loops

// The root of the hierarchy, null without one.
struct LOOP* root() {
    return currfuninfo->bb_list ? currfuninfo->bb_list->loop : nullptr;
}

// What the hierarchy knows of loops is not true of them any more where something was promoted.
void promote_to_registers(bool with_assertions) {
    if (pass_debug_bare_SSA)
        enter_and_leave_SSA_form(false, false, false);
    else if (promote_vars_to_registers(with_assertions)) {
        if (with_assertions) changed(fact::graph); // the first promotion may leave fewer objects whose address is taken
        forget_hierarchy();
    }
}

template <class F>
void with_hierarchy(F work) {
    if (root()) work();
}

void promote_in_loops() {
    if (!pass_debug_bare_SSA) with_hierarchy([] { name_invariant_places(root()); });
    promote_to_registers(false);
}

void DMAC_conversion() {
    if (special_DMAC_conversion()) drop_hierarchy();
}

void sink_definitions() {
    if (sink_unused_definitions(root())) drop_hierarchy();
}

// The programmer is told of loops as they are written.
void tell_ahead_of_copies() {
    if (!remarks_are_wanted) return;
    init_dependence_analysis();
    tell_of_loops(root());
    wrapup_dependence_analysis(false);
}

void unroll_by_request() {
    tell_ahead_of_copies();
    if (cd_unroll_loops_by_request()) drop_hierarchy();
}

void unroll_completely() {
    bool any = cd_unroll_inner_loops_completely();
    any |= cd_unroll_loops_for_speed(true);
    if (any) drop_hierarchy();
}

void unroll_for_speed() {
    if (cd_unroll_loops_for_speed(false)) drop_hierarchy();
}

// Dependence analysis is active for as long as there is a hierarchy to collapse.
void collapse_loops() {
    if (!root()) return;
    init_dependence_analysis();
    collapse_dd_loops(root());
    wrapup_dependence_analysis(false);
}

void circular_addressing() {
    sr_circular_addressing_in_loop(root());
    sr_DIV_and_MOD_in_loop(root(), true);
    count_quotients(root());
}

void loop_if_interchange() {
    if (print_debug >= 2) {
        debug_printf("\n  DEPENDENCE MATRIX INFO\n\n");
        report_all_dependences();
    }
    report_ambiguous_aliases(root());
    do_loop_if_interchange(root());
}

// A hierarchy that is built propagates values by itself.
void value_propagation() {
    do_value_propagation();
    if (!vp_changed) return;
    changed(fact::graph);
    simpcfg(0, 0);
}

void nothing() {}

constexpr ROW::KIND F = ROW::FUNCTION, B = ROW::BARRIER, L = ROW::IDLE;
using fact::alias;
using fact::alias_marks;
using fact::dominators;
using fact::every;
using fact::graph;
using fact::live_variables;
using fact::none;

// clang-format off
const ROW steps[] = {
    // kind, name, frame, condition, action, needs, leaves
    /*  0 */ {F, "pass 1 fcp/eda", nullptr, L2, [] { fast_CP(4, 0); elim_dead_assigns(0, 0); }, alias_marks, graph | alias_marks},
    /*  1 */ {F, "pass 1 fast_CP(4,0)", nullptr, L1, [] { fast_CP(4, 0); }, alias_marks, graph | alias_marks},
    /*  2 */ {F, "value propagation for pass 1", nullptr, L2, value_propagation, alias_marks, graph | alias_marks},
    /*  3 */ {B, "analyze globals", nullptr, always, analyze_global_symbols, none, none},
    /*  4 */ {B, "detect_recursion", nullptr, always, detect_recursion, none, none},
    /*  5 */ {B, "do_interprocedural_propagation", nullptr, always, do_interprocedural_propagation, none, none},
    /*  6 */ {B, "auto_inline_call_sites", nullptr, always, auto_inline_call_sites, none, none},
    /*  7 */ {B, "dump_call_graph_debug", nullptr, always, dump_call_graph_debug, none, none},
    /*  8 */ {B, "collect_clustered_symbols", nullptr, always, collect_clustered_symbols, none, none},
    /*  9 */ {B, "pass 2 header", nullptr, always, pass_2_header, none, none},
    /* 10 */ {B, "set call-graph order", nullptr, always, set_call_graph_order, none, none},
    /* 11 */ {F, "pass 2 inits", nullptr, always, pass_2_inits, none, graph},
    /* 12 */ {F, "stack sharing", nullptr, is_stack_shared, stack_sharing, none, graph},
    /* 13 */ {F, "CPS", nullptr, always, straighten_cond_paths, none, graph},
    /* 14 */ {L, "early LIR", nullptr, always, early_LIR, none, none},
    /* 15 */ {F, "early fast_CP(4,1)", nullptr, L1, [] { fast_CP(4, 1); }, alias_marks, graph | alias_marks},
    /* 16 */ {L, "MVP global assertions", nullptr, [] { return do_IP_MVP; }, add_MVP_IP_global_assertions, none, none},
    /* 17 */ {L, "intraprocedural MVP", nullptr, L2, intraprocedural_MVP, none, none},
    /* 18 */ {L, "value propagation for SIMD", nullptr, L2_and_SIMD, value_propagation_for_SIMD, none, none},
    /* 19 */ {F, "explode auto structs", nullptr, L2, explode_auto_struct_vars, none, every},
    /* 20 */ {F, "non-DD clone SSA NASSERTs", &S, L2_with_assertions, clone_SSA_NASSERTs, none, every},
    /* 21 */ {F, "non-DD SSA CP", &S, L2, [] { propagate_SSA_constants(1); }, none, every},
    /* 22 */ {F, "non-DD SSA EDA", &S, L2, eliminate_dead_SSA_assignments, none, every},
    /* 23 */ {F, "SSA RP with benign loads", nullptr, L2, [] { promote_to_registers(true); }, none, every},
    /* 24 */ {F, "expand bitfields", nullptr, always, expand_bitfields, none, every},
    /* 25 */ {F, "fast_CP(0,1)", nullptr, L1, [] { fast_CP(0, 1); }, alias_marks, graph | alias_marks},
    /* 26 */ {F, "add profile loop annotations", nullptr, always, add_loop_annotation_from_profile, none, graph | alias_marks},
    /* 27 */ {L, "CD vectorizations", nullptr, always, do_cd_vectorization, none, none},
    /* 28 */ {F, "forward_substitution", &DF, L2_with_loops, nothing, none, graph | alias_marks},
    /* 29 */ {F, "SSA_hoist", &D_and_S, L2_with_loops_for_speed, hoist_SSA_region_constants, none, every},
    /* 30 */ {F, "SSA_NASSERTs", &N_and_S, L2_with_assertions, clone_SSA_NASSERTs, none, every},
    /* 31 */ {F, "SSA_propagate", &D_and_S, L2_with_loops, [] { propagate_SSA_constants(3); }, none, every},
    /* 32 */ {F, "SSA_deadasg", &N_and_S, L2_with_loops, eliminate_dead_SSA_assignments, none, every},
    /* 33 */ {F, "SSA_reg_promote", &N, L2, promote_in_loops, none, every},
    /* 34 */ {F, "loop_assertions", &D, L2_with_loops, [] { with_hierarchy([] { find_loop_assertions(nullptr); }); }, none, graph | alias_marks},
    /* 35 */ {F, "sink_unused_definitions", &D, L2_with_loops, [] { with_hierarchy(sink_definitions); }, none, graph | alias_marks},
    /* 36 */ {L, "undeltafy", &D, L2, [] { undeltafy_dd_loops(root()); }, none, none},
    /* 37 */ {L, "add_downcounters", &D, L2, [] { with_hierarchy([] { add_downcounters_to_loops(root(), true, true); }); }, none, none},
    /* 38 */ {L, "collapse_loops", &D, L2, [] { with_hierarchy(collapse_loops); }, none, none},
    /* 39 */ {F, "circular_addressing", &D, L2_with_loops, [] { with_hierarchy(circular_addressing); }, none, graph | alias_marks},
    /* 40 */ {L, "loop_if_interchange", &D_with_dependence, L2, loop_if_interchange, none, none},
    /* 41 */ {F, "cd_unroll_by_request", &D, L2_with_loops, [] { with_hierarchy(unroll_by_request); }, none, graph | alias_marks},
    /* 42 */ {F, "DMAC_conversion", &D, L2_with_loops_on_dual_hardware, [] { with_hierarchy(DMAC_conversion); }, none, graph | alias_marks},
    /* 43 */ {F, "cd_unroll_completely_for_speed", &D, L2_with_loops, [] { with_hierarchy(unroll_completely); }, none, graph | alias_marks},
    /* 44 */ {L, "unroll_completely_for_SP", nullptr, always, nothing, none, none},
    /* 45 */ {L, "unroll_and_jam", &D_with_dependence, L2, [] { unroll_and_jam_loop_nest(root(), true, true); }, none, none},
    /* 46 */ {L, "loop fusion", &D_with_dependence, fusion_is_enabled, [] { fuse_loops_at_loop_level(root()); }, none, none},
    /* 47 */ {L, "runtime_alias_predication", nullptr, always, nothing, none, none},
    /* 48 */ {L, "peel_and_unroll", nullptr, always, nothing, none, none},
    /* 49 */ {F, "cd_unroll_for_speed", &D, L2_with_loops_to_unroll, [] { with_hierarchy(unroll_for_speed); }, none, graph | alias_marks},
    /* 50 */ {L, "PT_info", &D, L2, [] { with_hierarchy(propagate_PT_info); }, none, none},
    /* 51 */ {L, "explode_arrays", nullptr, L2, explode_local_arrays, none, none},
    /* 52 */ {L, "unroll_for_SP", &D_with_dependence, L2, [] { unroll_loops_for_SP(root()); }, none, none},
    /* 53 */ {L, "simplify_useless_loop_clones", nullptr, always, nothing, none, none},
    /* 54 */ {F, "alias_advice", &D_with_dependence, L2_with_loops, [] { report_ambiguous_aliases(root()); }, none, every},
    /* 55 */ {L, "reduction_interleaving", &D_with_dependence, L2, [] { interleave_reductions_in_loop(root(), true); }, none, none},
    /* 56 */ {F, "value_propagation", nullptr, L2_without_loops, value_propagation, alias_marks, graph | alias_marks},
    /* 57 */ {F, "DIVs_by_ICONs", &D_where_loops_are, always, transform_DIVs_by_ICONs, none, every},
    /* 58 */ {F, "SSA_propagate_vector", &D_and_S, L2_with_loops, [] { propagate_SSA_constants(3); }, none, every},
    /* 59 */ {F, "SSA_deadasg", &N_and_S, L2_with_loops, eliminate_dead_SSA_assignments, none, every},
    /* 60 */ {F, "SSA_reg_promote_with_simpcfg", &N_and_no_hierarchy, L2, [] { promote_to_registers(false); }, none, every},
    /* 61 */ {L, "CD ILP", nullptr, always, do_cd_ilp, none, none},
    /* 62 */ {F, "late fast_CP(4,1)", nullptr, L1, [] { fast_CP(4, 1); }, alias_marks, graph | alias_marks},
    /* 63 */ {L, "Disclose Vectors", nullptr, always, [] { disclose_vector_operations(false); }, none, none},
    /* 64 */ {F, "global CP", nullptr, L2_with_branches, [] { unbuild_loop_hierarchy(); copyprop(2); }, none, every},
    /* 65 */ {F, "late points-to", nullptr, L2_with_branches, late_points_to, none, every},
    /* 66 */ {F, "global CSE", nullptr, L2_with_branches, global_CSE, none, graph | alias_marks},
    /* 67 */ {F, "Zelkova rotate loops", nullptr, L2_with_branches_on_28, rotate_loops_for_accumulators, alias_marks, graph},
    /* 68 */ {F, "late rename symbols", nullptr, L2_with_branches, [] { rename_symbols(); drop_needless_masks(); }, dominators | live_variables, every},
    /* 69 */ {F, "merge symbols", nullptr, L2_with_branches, merge_symbols, fact::loops | live_variables, graph | alias_marks},
    /* 70 */ {L, "DD restructuring", nullptr, always, nothing, none, none},
    /* 71 */ {L, "expand cluster refs", nullptr, always, expand_cluster_refs, none, none},
    /* 72 */ {F, "CSU returning temp", nullptr, always, subst_csu_returning_temp_for_local_var, none, graph},
    /* 73 */ {F, "superblocks", nullptr, L1, optimize_superblocks_in_cfg, alias_marks, graph | alias_marks},
    /* 74 */ {F, "subrange", nullptr, L1, [] { lcse_subrange_assignments(); elim_dead_subrange_assigns(); }, alias, every},
    /* 75 */ {F, "lcp", nullptr, L1, [] { copyprop(1); }, none, every},
    /* 76 */ {F, "sti-to-cinit", nullptr, L2, convert_sti_to_cinit, none, every},
    /* 77 */ {F, "lcse", nullptr, L1, lcse, alias, graph | alias_marks},
    /* 78 */ {F, "propagate increments", nullptr, L1, propagate_increments, alias_marks, graph | alias_marks},
    /* 79 */ {L, "Disguise Vectors", nullptr, always, disguise_vector_operations, none, none},
    /* 80 */ {L, "late LIR", nullptr, always, late_LIR, none, none},
    // 81, "output function", belongs to the function loop.
};
// clang-format on
constexpr int FIRST_DD = 28, BEHIND_DD = 61, COUNT = 81;
static_assert(sizeof steps / sizeof steps[0] == COUNT);

void add(int first, int behind, std::vector<pass*>& order) {
    for (int i = first; i < behind; ++i) {
        const ROW& row = steps[i];
        order.push_back(row.kind == B ? new barrier_pass(row) : new pass(row));
    }
}

} // namespace

ROWS rows_of_steps() { return steps; }

void add_dd_normal_order_passes(std::vector<pass*>& order) { add(FIRST_DD, BEHIND_DD, order); }

void add_normal_order_passes(std::vector<pass*>& order) {
    add(0, FIRST_DD, order);
    add_dd_normal_order_passes(order);
    add(BEHIND_DD, COUNT, order);
}
