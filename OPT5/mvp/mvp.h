// Metavalue propagation: facts about values along SSA form, within a function and between functions.
#pragma once

void initialize_ssa_pointsto_mvp();
void do_integer_value_propagation();
void wrap_up_ssa_pointsto_mvp();

// Between functions.
void init_IP_MVP_for_current_function();
void do_IP_metavalue_propagation(); // the solver, when all functions have been read
void add_MVP_IP_global_assertions();
void beta_parms_using_mvp_ip();
void beta_convert_using_mvp_ip();
