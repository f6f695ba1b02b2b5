// Not built yet. What is called here leaves the program as it is, and what it is asked is not known.
#include "OPT5/cd/cd.h"

void do_cd_vectorization() {}
void do_cd_ilp() {}
void cd_unroll_loops_by_request() {}
void cd_unroll_loops_for_speed(bool) {}
void fuse_loops_at_loop_level(struct LOOP*) {}
