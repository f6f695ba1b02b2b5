// The control-flow simplifier, and the passes that shape the graph: cases, rotation, traces, superblocks, profile.
//
//     simpcfg.cpp         the simplifier, `split_block`       switch_cases.cpp    cases of switches
//     implied_tests.cpp   tests that an earlier one decides   rotate.cpp          layout of loops
//     entry_tests.cpp     first tests of loops                traces.cpp          layout by profile, annotations
//     cross_jump.cpp      shared tails                        cond_paths.cpp      copies of tests on edges
//     diamonds.cpp        selects                             superblocks.cpp     constants along chains of blocks
//     layout.cpp          the order of blocks                 tail_copies.cpp     copies of tails in place of jumps
#pragma once

#include <cstdio>
#include <vector>

class BBLK;
class NODE;
class PSN;
struct LIST;

// Keeps the graph small: decided and pointless branches, jumps to jumps, straight-line blocks, tests that an earlier
// one decides, unreachable blocks. With `quest_is_ok`, ahead of the output, also shared tails and diamonds that become
// selects. A loop hierarchy must be gone unless `quest_is_ok` is set. `keep_loops` is given by all callers as 0.
void simpcfg(bool quest_is_ok, bool keep_loops);

// The statements behind `cell` go to a new block that follows; the first block then ends in a BRANCH to it. The new
// block, which takes over the successors. With `renumber` the depth-first numbers are valid afterwards.
BBLK* split_block(BBLK* bb, LIST* cell, bool renumber);

// Blocks that end the function in the same statements become one; the others jump there. The simplifier ahead of the output
// does it by itself; no row does it earlier: paths that share a tail no longer tell constants apart, nor bounds.
void do_early_cross_jumping();

void optimize_SWITCH_cases();
// Lays the block of a loop's test behind the loop's body, so that one conditional branch closes the loop.
void rotate_loops();
void straighten_traces_in_cfg();
void straighten_cond_paths();
void optimize_superblocks_in_cfg();

// Gives the loops' annotations their trip counts from the profile.
void add_loop_annotation_from_profile();

// ---- Used between the files of the control-flow simplifier. Each returns whether it changed the graph, and leaves
// unreachable blocks to `rebuildcfg`.

// The control statement of `bb` becomes a BRANCH to `target`; what it computed stays for its effects.
void make_branch(BBLK* bb, LIST* control, BBLK* target);
// Promises of iterations that the block makes of a loop that it no longer leads to: they would be taken for promises of the
// next one in the text.
void drop_promises_in(BBLK* bb);
// Drops the edges that the control statement no longer names, and adds those that it does.
bool resync_edges(BBLK* bb);
bool remove_redundant_tests();
bool cross_jump();
// Loops whose first test is decided are entered behind it; needs layout positions for depth-first numbers.
bool skip_decided_entry_tests();
// Orders the blocks for as few jumps as possible; blocks are numbered before and after.
void lay_out_blocks();
bool join_diamonds();
bool may_be_arm_of_select(const NODE* assignment); // cheap, and safe where the condition does not hold
// The block ends in a test of which variable, or which of two values of one, is to be assigned: the arms are single
// assignments of that kind. `choose_value` makes a statement of it, whether or not the target has an instruction for it.
bool is_choice_of_value(const BBLK* bb);
bool choose_value(BBLK* bb);
