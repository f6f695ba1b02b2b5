// Region graphs: vectorization, unrolling and instruction-level parallelism by the target's rules.
#pragma once

struct LOOP; // written out where it is used: an opcode has the same name

void do_cd_vectorization();
void do_cd_ilp();
void cd_unroll_loops_by_request();
void cd_unroll_loops_for_speed(bool completely);

void fuse_loops_at_loop_level(struct LOOP* loop);
