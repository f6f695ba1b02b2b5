// Region graphs: vectorization, unrolling and instruction-level parallelism by the target's rules.
#pragma once

struct LOOP; // written out where it is used: an opcode has the same name

void do_cd_vectorization();
void do_cd_ilp();

// Unrolling, of innermost loops (unroll.cpp). Whether a loop was unrolled: the hierarchy is stale then.
bool cd_unroll_loops_by_request(); // of pragmas
bool cd_unroll_inner_loops_completely();
bool cd_condx_unroll_loop_completely(struct LOOP* loop); // if that pays, or a pragma asks for it
bool cd_unroll_loops_for_speed(bool completely);                    // by trial; `completely`: or not at all

void fuse_loops_at_loop_level(struct LOOP* loop);
