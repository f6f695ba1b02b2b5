#include "OPT5/scalar/merge.h"

void rename_symbols() {}
