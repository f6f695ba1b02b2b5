// Cases, traces, superblocks and profile.
#include "OPT5/scalar/simpcfg.h"

void straighten_traces_in_cfg() {}
void straighten_cond_paths() {}
void optimize_superblocks_in_cfg() {}
void add_loop_annotation_from_profile() {}
void initialize_CFG_profiling_annotation(int, int) {}
void initialize_the_profiling_state(int) {}
