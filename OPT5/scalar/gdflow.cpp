// What the step table and the writer call of this room. Each leaves the program as it is: the trees keep their
// meaning, and what is not known is assumed not to hold.
#include "OPT5/scalar/gdflow.h"

void annotate_cfg() {}
void clean_up_gdflow_bitvecs() {}
void clean_up_assert_RELOPs() {}
