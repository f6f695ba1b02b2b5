// What the reader asks of this room for passes that are not built yet.

#include "OPT5/ipa/progana.h"

void check_integrable_definition() {}
void make_symbol_groupable(SYMTAB*) {}
