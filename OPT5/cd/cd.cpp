// What the step table and the writer call of this room. Each leaves the program as it is: the trees keep their
// meaning, and what is not known is assumed not to hold.
#include "OPT5/cd/cd.h"

void do_cd_vectorization() {}
void do_cd_ilp() {}
void cd_unroll_loops_by_request() {}
void cd_unroll_loops_for_speed(bool) {}
void fuse_loops_at_loop_level(struct LOOP*) {}
