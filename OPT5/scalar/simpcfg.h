// The control-flow simplifier, and the passes that shape the graph: cases, rotation, traces, superblocks, profile.
#pragma once

// Removes unreachable and empty blocks, joins blocks, simplifies branches; `last` is set ahead of the output.
void simpcfg(int last, int keep_loops);

void optimize_SWITCH_cases();
void rotate_loops();
void straighten_traces_in_cfg();
void straighten_cond_paths();
void optimize_superblocks_in_cfg();

// Profile data as frequencies and probabilities of blocks and edges.
void add_loop_annotation_from_profile();
void initialize_CFG_profiling_annotation(int keep, int exact);
void initialize_the_profiling_state(int status);
