// Not built yet: nothing is known and nothing changes.
#include "OPT5/dd/loop.h"

bool BY_UID::operator()(const SYMTAB* a, const SYMTAB* b) const { return a->uid < b->uid; }
LOOPIV::~LOOPIV() {}
void build_loop_hierarchy(bool, bool, bool, int) {}
void build_minimal_loop_hierarchy(bool) {}
void unbuild_loop_hierarchy() {}
void erase_loop_hierarchy() {}
