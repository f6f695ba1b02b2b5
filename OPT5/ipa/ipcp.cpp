// What the step table and the writer call of this room. Each leaves the program as it is: the trees keep their
// meaning, and what is not known is assumed not to hold.
#include "OPT5/ipa/ipcp.h"

void init_ipcp_for_fun() {}
void do_interprocedural_propagation() {}
void analyze_cg_for_ipcp() {}
void beta_parms() {}
void beta_convert() {}
