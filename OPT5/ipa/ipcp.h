// Propagation of facts about parameters from call sites to functions, and parameters passed by value in place of by
// address.
#pragma once

void init_ipcp_for_fun();
void do_interprocedural_propagation();
void summarize_pointer_parameters(); // at level 3: FUNINFO::formals of all functions
void analyze_cg_for_ipcp();

void beta_parms();
void beta_convert();
