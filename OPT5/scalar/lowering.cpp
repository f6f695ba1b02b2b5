// What the step table and the writer call of this room. Each leaves the program as it is: the trees keep their
// meaning, and what is not known is assumed not to hold.
#include "OPT5/scalar/lowering.h"

int GO_FOR_INSTRUMENTATION = 0;

void expand_cluster_refs() {}
void collect_clustered_symbols() {}
void add_instrumentation_exit_routine_to_atexit() {}
