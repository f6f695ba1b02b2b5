// Constants and copies: not built yet.
#include "OPT5/dd/ssa.h"

void propagate_SSA_constants(int) {}
