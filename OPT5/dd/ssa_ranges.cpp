// Live ranges in SSA form: of what these passes are for, this target needs nothing.
#include "OPT5/dd/ssa.h"

#include "OPT5/ir/global.h"

void split_live_SSA_ranges() {
    if (print_debug) debug_printf("\n\n\t\t\t------- ENTERING 'split_live_SSA_ranges' -----------\n");
}

void coalesce_SSA_variables() {
    if (print_debug) debug_printf("\n\n\t\t\t------- ENTERING 'coalesce_SSA_variables' ----------\n");
}

void reduce_critical_paths_and_cycles() {}
