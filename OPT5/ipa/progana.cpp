// What the step table and the writer call of this room. Each leaves the program as it is: the trees keep their
// meaning, and what is not known is assumed not to hold.
#include "OPT5/ipa/progana.h"

FUNLIST* cg_list = nullptr;

void analyze_global_symbols() {}
void detect_recursion() {}
void dump_call_graph_debug() {}
void set_up_and_build_call_graph() {}
void preprocess_fundef(FUNINFO*) {}
void check_for_synonym_function_in_pass_1() {}
void check_integrable_definition() {}
void scan_for_funinfo(NODE*) {}
void check_fun_for_byref_asgs(SYMTAB*) {}
void make_symbol_groupable(SYMTAB*) {}
