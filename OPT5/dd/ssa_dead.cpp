// Dead assignments, copies of assertions: not built yet.
#include "OPT5/dd/ssa.h"

void eliminate_dead_SSA_assignments() {}
void clone_SSA_NASSERTs() {}
