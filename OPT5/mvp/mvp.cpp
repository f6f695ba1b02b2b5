// Not built yet: the passes leave the program as it is, and every question is answered with "not known".
#include "OPT5/mvp/mvp.h"

void initialize_ssa_pointsto_mvp() {}
void do_integer_value_propagation() {}
void wrap_up_ssa_pointsto_mvp() {}
void init_IP_MVP_for_current_function() {}
void do_IP_metavalue_propagation() {}
void add_MVP_IP_global_assertions() {}
void beta_parms_using_mvp_ip() {}
void beta_convert_using_mvp_ip() {}
