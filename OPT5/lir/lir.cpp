// Not built yet. What is called here leaves the program as it is, and what it is asked is not known.
#include "OPT5/lir/lir.h"

void early_LIR() {}
void late_LIR() {}
