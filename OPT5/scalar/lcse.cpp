// Not built yet. What is called here leaves the program as it is, and what it is asked is not known.
#include "OPT5/scalar/lcse.h"

void lcse() {}
