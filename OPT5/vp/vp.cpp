// Not built yet. What is called here leaves the program as it is, and what it is asked is not known.
#include "OPT5/vp/vp.h"

void do_value_propagation() {}
