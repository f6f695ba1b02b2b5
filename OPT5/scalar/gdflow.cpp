// Not built yet. What is called here leaves the program as it is, and what it is asked is not known.
#include "OPT5/scalar/gdflow.h"

void annotate_cfg() {}
void clean_up_gdflow_bitvecs() {}
void clean_up_assert_RELOPs() {}
