// Propagation of facts about parameters from call sites to functions.
//
//     known_calls.cpp         which functions have formals: all of their calls are known
//     pointer_parameters.cpp  what their pointer parameters may refer to
//     ipcp.cpp                which of their parameters have one value
//     beta.cpp                such a parameter goes from the function, and its argument from all calls
#pragma once

class NODE;
struct LIST;

void init_ipcp_for_fun(); // when a definition has been read: whether its parameters may go
void do_interprocedural_propagation();
void summarize_pointer_parameters();
void analyze_cg_for_ipcp();
// Whether the tree, an argument, has the same value wherever the parameters in it have.
bool arg_is_valid_jump_function(const NODE* tree);

void beta_parms();   // SYMTAB::arg_needed of the current function's parameters
void beta_convert(); // of the current function: its calls, and its own parameters
