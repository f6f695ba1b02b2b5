// SSA form: not built yet, functions stay out of it.
#include "OPT5/dd/ssa.h"

bool function_is_in_SSA_form = false;

void construct_SSA_form(bool, bool, bool) {}
void deconstruct_SSA_form() {}
