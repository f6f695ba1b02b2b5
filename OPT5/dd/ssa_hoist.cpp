// Hoisting of region constants: not built yet.
#include "OPT5/dd/ssa.h"

void hoist_SSA_region_constants() {}
