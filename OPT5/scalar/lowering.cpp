// Not built yet. What is called here leaves the program as it is, and what it is asked is not known.
#include "OPT5/scalar/lowering.h"

int GO_FOR_INSTRUMENTATION = 0;

void expand_cluster_refs() {}
void collect_clustered_symbols() {}
void add_instrumentation_exit_routine_to_atexit() {}
