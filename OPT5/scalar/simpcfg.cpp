// What the step table and the writer call of this room. Each leaves the program as it is: the trees keep their
// meaning, and what is not known is assumed not to hold.
#include "OPT5/scalar/simpcfg.h"

void simpcfg(int, int) {}
void optimize_SWITCH_cases() {}
void rotate_loops() {}
void straighten_traces_in_cfg() {}
void straighten_cond_paths() {}
void optimize_superblocks_in_cfg() {}
void add_loop_annotation_from_profile() {}
void initialize_CFG_profiling_annotation(int, int) {}
void initialize_the_profiling_state(int) {}
