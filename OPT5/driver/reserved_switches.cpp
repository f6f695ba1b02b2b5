// Switches that the command line knows and that no code of this program reads.
//
// A switch moves from here to the code that reads it, under the same name; two objects of one name must not exist.
#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/driver/driver.h"

// Called at start-up so that the linker keeps this file.
void register_reserved_switches() {}

register_option pass_debug_NLC("debug:NLC");
register_option pass_debug_aggressive_vec("debug:aggressive_vec");
register_option pass_debug_cfg_folding("debug:cfg_folding");
register_option pass_debug_conservative_vec("debug:conservative_vec");
register_option pass_debug_dump_full_types("debug:dump_full_types");
register_option pass_debug_dump_infix("debug:dump_infix");
register_option pass_debug_dump_infix_regs("debug:dump_infix_regs");
register_option pass_debug_dump_infix_types("debug:dump_infix_types");
register_option pass_debug_dump_minimal("debug:dump_minimal");
register_option pass_debug_dump_otypes("debug:dump_otypes");
register_option pass_debug_dump_scope("debug:dump_scope");
register_option pass_debug_dump_sym_addr("debug:dump_sym_addr");
register_option pass_debug_dump_tree_hint("debug:dump_tree_hint");
register_option pass_debug_dump_trees("debug:dump_trees");
register_option pass_debug_dumprules("debug:dumprules");
register_option debug_lir_compare("debug:lir_compare");
register_option pass_debug_lir_no_sym_prefix("debug:lir_no_sym_prefix");
register_option pass_debug_lir_revert_dump_dag("debug:lir_revert_dump_dag");
register_option pass_debug_lir_serial_compact("debug:lir_serial_compact");
register_option pass_debug_lir_show("debug:lir_show");
register_option debug_lir_time("debug:lir_time");
register_option pass_debug_max_unroll_size("debug:max_unroll_size");
register_option pass_debug_mdebug("debug:mdebug");
register_option pass_debug_nfa_by_cost("debug:nfa_by_cost");
register_option pass_debug_noinstrument("debug:noinstrument");
register_option pass_debug_nthreads("debug:nthreads");
register_option pass_debug_optimizer_estimates("debug:optimizer_estimates");
register_option pass_debug_parsemd("debug:parsemd");
register_option pass_debug_synrules("debug:synrules");

register_option pass_disable_downcounters("disable:downcounters");
register_option pass_disable_ilp("disable:ilp");
register_option pass_disable_lir("disable:lir");
register_option pass_disable_lir_early("disable:lir_early");
register_option pass_disable_lir_early_default("disable:lir_early_default");
register_option pass_disable_lir_late("disable:lir_late");
register_option pass_disable_lir_late_default("disable:lir_late_default");
register_option pass_disable_lir_revert_clean("disable:lir_revert_clean");
register_option pass_disable_lir_ssa_coalesce("disable:lir_ssa_coalesce");
register_option pass_disable_lir_ssa_remove_copies("disable:lir_ssa_remove_copies");
register_option pass_disable_lir_vn_simp("disable:lir_vn_simp");
register_option pass_disable_loop_coalescing("disable:loop_coalescing");
register_option pass_disable_simple_rotation("disable:simple_rotation");
register_option pass_disable_switch_hoisting("disable:switch_hoisting");
register_option pass_disable_tail_duplication("disable:tail_duplication");
register_option pass_disable_target_expansion("disable:target_expansion");
register_option pass_disable_threads("disable:threads");
register_option pass_disable_vecvec("disable:vecvec");
register_option pass_disable_vn("disable:vn");

register_option enable_groupall("enable:groupall");
register_option
    pass_enable_interference_graph_phi_node_instantiation("enable:interference_graph_phi_node_instantiation");
register_option pass_enable_lir_early("enable:lir_early");
register_option pass_enable_lir_early_cse("enable:lir_early_cse");
register_option pass_enable_lir_early_dead_elim("enable:lir_early_dead_elim");
register_option pass_enable_lir_early_fwp("enable:lir_early_fwp");
register_option pass_enable_lir_early_null("enable:lir_early_null");
register_option pass_enable_lir_early_ssa("enable:lir_early_ssa");
register_option pass_enable_lir_late("enable:lir_late");
register_option pass_enable_lir_late_cse("enable:lir_late_cse");
register_option pass_enable_lir_late_dead_elim("enable:lir_late_dead_elim");
register_option pass_enable_lir_late_fwp("enable:lir_late_fwp");
register_option pass_enable_lir_late_null("enable:lir_late_null");
register_option pass_enable_lir_late_ssa("enable:lir_late_ssa");
register_option pass_enable_lir_revert_simp("enable:lir_revert_simp");
register_option pass_enable_lir_ssa_no_move_across_live_range("enable:lir_ssa_no_move_across_live_range");
register_option pass_enable_lir_ssa_remove_useless_phis("enable:lir_ssa_remove_useless_phis");
register_option pass_enable_lir_vn_loads("enable:lir_vn_loads");
register_option naive_phi_node_instantiation("enable:naive_phi_node_instantiation");
register_option pass_enable_static_profiling("enable:static_profiling");
