// Promotion of values in memory to registers: not built yet.
#include "OPT5/dd/ssa.h"

void promote_vars_to_registers(bool) {}
