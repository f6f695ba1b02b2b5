// What pointers are passed is known; the rest is not built yet: its passes leave the program as it is.
#include "OPT5/ipa/ipcp.h"

void init_ipcp_for_fun() {}
void do_interprocedural_propagation() { summarize_pointer_parameters(); }
void analyze_cg_for_ipcp() {}
void beta_parms() {}
void beta_convert() {}
