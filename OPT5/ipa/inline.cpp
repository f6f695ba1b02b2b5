// What the step table and the writer call of this room. Each leaves the program as it is: the trees keep their
// meaning, and what is not known is assumed not to hold.
#include "OPT5/ipa/inline.h"

void create_inliner() {}
void init_proc_integration() {}
void auto_inline_call_sites() {}
void integrate_calls_in_function() {}
void dump_psnrefs() {}
