// What the code generator is told of loops, and the entry points that do the work of a step in a frame of their own.
//
// The analysis for the code generator runs when registers have their variables: it brings even those that live in
// memory into the form of references, builds the hierarchy, and keeps of each loop what its record says. Layout
// follows, so that the records are settled behind it (loop_records.cpp).
#include "OPT5/dd/dd.h"
#include "OPT5/dd/ssa.h"

#include "OPT5/alias/alias.h"
#include "OPT5/dd/dependence_graph.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/scope.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/target.h"

namespace {

// Conditions that the program asserts have served. Whether there were any.
bool delete_NASSERTs() {
    bool any = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link;)
            if ((*link)->first->op == NASSERT && *link != bb->last_statement()) {
                drop_statement(link);
                any = true;
            } else
                link = &(*link)->rest;
    currfuninfo->has_nasserts = false;
    return any;
}

// On this target copies of memory have no destinations to be wrapped, and memory has no banks to be told of.
void wrap_memcpy_destinations() {}
void write_dd_mbank_info() {}

// Deep sums keep the shape that the simplifier gave them.
NODE* untower_tree(NODE* t) { return t; }

void denormalize_for_output(bool keep_ddnodes) {
    trees_are_normalized = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest)
            s->first = untower_tree(simp_tree(denormalize_tree(s->first, keep_ddnodes), nullptr));
}

void find_records(struct LOOP* root) {
    wrap_memcpy_destinations();
    init_dependence_analysis();
    if (print_debug >= 2) report_all_dependences();
    DDGRAPH graph;
    graph.build(root, !use_g2, use_g2 != 0);
    unmark_singleton_clones(root);
    write_loop_icode(root);
    write_dd_mbank_info();
    write_dd_edges(graph);
    wrapup_dependence_analysis(true);
}

// Nothing is delayed: a hierarchy has blocks on edges that are none of the layout.
void remove_dead_assignments() {
    need(fact::live_variables);
    elim_dead_assigns(true, false);
}

} // namespace

void do_dd_analysis_for_be() {
    simpcfg(0, 0);
    if (opt_level() < 2 || !has_hardware_float()) return;
    debug_printf("\n\n\t\t\t---------- ENTERING 'do_dd_analysis_for_be' -------\n");
    if (print_debug) print_scopes();
    do_dd_for_be = true;
    normalize_all_trees();
    rebuildcfg();
    build_loop_hierarchy(false, false, false, 0);
    if (currfuninfo->has_nasserts && delete_NASSERTs()) remove_dead_assignments();
    elim_dd_dead_assignments = false;
    struct LOOP* root = loop_root();
    if (root) find_records(root);
    denormalize_for_output(root != nullptr);
    if (root) {
        erase_virtual_inits(root);
        unbuild_loop_hierarchy(); // pragmas go back first
    }
    changed(fact::graph);
    if (elim_dd_dead_assignments) remove_dead_assignments();
    do_dd_for_be = false;
}

void write_ldspec_advice() {}

// ---- Entry points with a frame of their own

namespace {

void begin_frame() {
    do_dd_for_be = false;
    elim_dd_dead_assignments = false;
    normalize_all_trees();
}

void end_frame() {
    struct LOOP* root = loop_root();
    denormalize_all_trees(false, true);
    if (root) {
        erase_virtual_inits(root);
        unbuild_loop_hierarchy();
    }
    changed(fact::graph);
}

template <class F>
void with_dependence(F work) {
    init_dependence_analysis();
    work();
    wrapup_dependence_analysis(false);
}

} // namespace

void do_dd_restructuring() {
    simpcfg(0, 0);
    if (opt_level() < 2) return;
    debug_printf("\n\n\t\t\t---------- ENTERING 'do_dd_restructuring' ----------\n");
    begin_frame();
    rebuildcfg();
    build_loop_hierarchy(false, false, true, -1);
    if (struct LOOP* root = loop_root())
        with_dependence([root] {
            remove_dead_assignments();
            collapse_dd_loops(root);
            coalesce_dd_loops(root);
        });
    end_frame();
    if (elim_dd_dead_assignments) remove_dead_assignments();
}

void do_dd_SSA_optimizations(bool constants, bool dead, bool promote) {
    if (!constants && !dead && !promote) return;
    debug_printf("\n\n\t\t\t-------- ENTERING 'do_dd_SSA_optimizations' --------\n");
    split_qualified_parameter_copies();
    begin_frame();
    build_loop_hierarchy(false, true, true, -1);
    if (loop_root() && (constants || dead))
        with_dependence([=] {
            construct_SSA_form(false, false, true);
            if (constants) propagate_SSA_constants(1);
            if (dead) eliminate_dead_SSA_assignments();
            deconstruct_SSA_form();
        });
    if (loop_root() && promote) with_dependence([] { promote_vars_to_registers(true); });
    end_frame();
}
