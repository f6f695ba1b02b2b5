// Steps 28 to 60: the work on loops and on SSA form.
//
// These steps run on normalized trees. A frame stands around each: its first half brings the trees into normal form
// and, for the steps that need it, builds the loop hierarchy; its second half brings the trees back and simplifies
// them. The hierarchy stays from step to step until one erases it. Below level 2 a framed step does nothing.
#include "OPT5/driver/passes.h"

#include "OPT5/alias/alias.h"
#include "OPT5/cd/cd.h"
#include "OPT5/dd/dd.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"
#include "OPT5/vp/vp.h"

namespace {

register_option pass_enable_loop_fusion("enable:fusion");

using WORK = void (*)();

bool L2() { return opt_level() >= 2; }

// The root of the hierarchy, null without one.
struct LOOP* root() {
    return currfuninfo->bb_list ? currfuninfo->bb_list->loop : nullptr;
}

// ---- Frames

void normalize_statements() {
    init_dd_aliasing();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) s->first = normalize_tree(s->first, s->first);
    trees_are_normalized = true;
}

void denormalize_statements() {
    trees_are_normalized = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) s->first = simp_tree(denormalize_tree(s->first, false), nullptr);
}

void begin_frame(bool force) {
    if (!root()) simpcfg(0, 0);
    do_dd_for_be = false;
    widen_user_variables();
    split_qualified_parameter_copies();
    normalize_statements();
    if (force || !root()) build_loop_hierarchy(force, false, force, true);
}

void end_frame() {
    denormalize_statements();
    widen_user_variables();
    lva_cleanup();
}

// D: the whole frame.
void D(WORK work) {
    if (!L2()) return;
    begin_frame(false);
    work();
    end_frame();
}

// D around work that only makes sense with a hierarchy.
void D_with_hierarchy(WORK work) {
    if (!L2()) return;
    begin_frame(false);
    if (root()) work();
    end_frame();
}

// D with dependence analysis active during the work.
void D_with_dependence(WORK work) {
    if (!L2()) return;
    begin_frame(false);
    init_dependence_analysis();
    work();
    wrapup_dependence_analysis(false);
    end_frame();
}

// DF: the forced frame; building the full hierarchy anew is the work.
void DF() {
    if (!L2()) return;
    begin_frame(true);
    end_frame();
}

// N: the narrow frame, normal form alone.
void N(WORK work) {
    if (!L2()) return;
    normalize_statements();
    work();
    denormalize_statements();
}

// ---- Actions

template <bool SCALARS_ONLY, class F>
void in_SSA_form(F work) {
    construct_SSA_form(false, false, SCALARS_ONLY);
    work();
    deconstruct_SSA_form();
}

void SSA_hoist() {
    D([] { in_SSA_form<true>(hoist_SSA_region_constants); });
}
void SSA_NASSERTs() {
    N([] { in_SSA_form<false>(clone_SSA_NASSERTs); });
}
void SSA_propagate() {
    D([] { in_SSA_form<false>([] { propagate_SSA_constants(3); }); });
}
void SSA_propagate_vector() {
    D([] { in_SSA_form<true>([] { propagate_SSA_constants(3); }); });
}
void SSA_deadasg() {
    N([] { in_SSA_form<false>(eliminate_dead_SSA_assignments); });
}

void drop_hierarchy_and_rebuild() {
    reinsert_loop_pragmas();
    erase_loop_hierarchy();
    rebuildcfg();
}

void sink_definitions() {
    if (!sink_unused_definitions(root())) return;
    drop_hierarchy_and_rebuild();
    simpcfg(0, 0);
}

void collapse_loops() {
    init_dependence_analysis();
    collapse_dd_loops(root());
    wrapup_dependence_analysis(false);
}

void circular_addressing() {
    sr_circular_addressing_in_loop(root());
    sr_DIV_and_MOD_in_loop(root(), true);
}

void loop_if_interchange() {
    if (print_debug >= 2) {
        debug_printf("\n  DEPENDENCE MATRIX INFO\n\n");
        report_all_dependences();
    }
    report_ambiguous_aliases(root());
    do_loop_if_interchange(root());
}

void loop_fusion() {
    if (pass_enable_loop_fusion) D_with_dependence([] { fuse_loops_at_loop_level(root()); });
}

// Only where the frame has built no hierarchy: building one has propagated values already.
void value_propagation() {
    if (!root()) do_value_propagation();
}

void DIVs_by_ICONs() {
    if (L2())
        D(transform_DIVs_by_ICONs);
    else
        transform_DIVs_by_ICONs();
}

void SSA_reg_promote_with_simpcfg() {
    if (!L2()) return;
    N([] { promote_vars_to_registers(false); });
    if (root()) {
        drop_hierarchy_and_rebuild();
        simpcfg(0, 0);
    }
    simpcfg(0, 0);
}

void nothing() {}

struct STEP {
    const char* name;
    WORK action;
};

// clang-format off
const STEP steps[] = {
    /* 28 */ {"forward_substitution", DF},
    /* 29 */ {"SSA_hoist", SSA_hoist},
    /* 30 */ {"SSA_NASSERTs", SSA_NASSERTs},
    /* 31 */ {"SSA_propagate", SSA_propagate},
    /* 32 */ {"SSA_deadasg", SSA_deadasg},
    /* 33 */ {"SSA_reg_promote", [] { N([] { promote_vars_to_registers(false); }); }},
    /* 34 */ {"loop_assertions", [] { D_with_hierarchy([] { find_loop_assertions(nullptr); }); }},
    /* 35 */ {"sink_unused_definitions", [] { D_with_hierarchy(sink_definitions); }},
    /* 36 */ {"undeltafy", [] { D([] { undeltafy_dd_loops(root()); }); }},
    /* 37 */ {"add_downcounters", [] { D_with_hierarchy([] { add_downcounters_to_loops(root(), true, true); }); }},
    /* 38 */ {"collapse_loops", [] { D_with_hierarchy(collapse_loops); }},
    /* 39 */ {"circular_addressing", [] { D(circular_addressing); }},
    /* 40 */ {"loop_if_interchange", [] { D_with_dependence(loop_if_interchange); }},
    /* 41 */ {"cd_unroll_by_request", [] { D(cd_unroll_loops_by_request); }},
    /* 42 */ {"DMAC_conversion", [] { D_with_dependence(special_DMAC_conversion); }},
    /* 43 */ {"cd_unroll_completely_for_speed", [] { D([] { cd_unroll_loops_for_speed(true); }); }},
    /* 44 */ {"unroll_completely_for_SP", nothing},
    /* 45 */ {"unroll_and_jam", [] { D_with_dependence([] { unroll_and_jam_loop_nest(root(), true, true); }); }},
    /* 46 */ {"loop fusion", loop_fusion},
    /* 47 */ {"runtime_alias_predication", nothing},
    /* 48 */ {"peel_and_unroll", nothing},
    /* 49 */ {"cd_unroll_for_speed", [] { D([] { cd_unroll_loops_for_speed(false); }); }},
    /* 50 */ {"PT_info", [] { D_with_hierarchy(propagate_PT_info); }},
    /* 51 */ {"explode_arrays", [] { if (L2()) explode_local_arrays(); }},
    /* 52 */ {"unroll_for_SP", [] { D_with_dependence([] { unroll_loops_for_SP(root()); }); }},
    /* 53 */ {"simplify_useless_loop_clones", nothing},
    /* 54 */ {"alias_advice", [] { D_with_dependence([] { report_ambiguous_aliases(root()); }); }},
    /* 55 */ {"reduction_interleaving", [] { D_with_dependence([] { interleave_reductions_in_loop(root(), true); }); }},
    /* 56 */ {"value_propagation", [] { D(value_propagation); }},
    /* 57 */ {"DIVs_by_ICONs", DIVs_by_ICONs},
    /* 58 */ {"SSA_propagate_vector", SSA_propagate_vector},
    /* 59 */ {"SSA_deadasg", SSA_deadasg},
    /* 60 */ {"SSA_reg_promote_with_simpcfg", SSA_reg_promote_with_simpcfg},
};
// clang-format on

} // namespace

void add_dd_normal_order_passes(std::vector<pass*>& order) {
    for (const STEP& step : steps) order.push_back(new pass(step.name, step.action));
}
