// Whole-file facts: the call graph, and what each function may read and write.
#pragma once

class FUNINFO;
class NODE;
class SYMTAB;

// The steps between pass 1 and pass 2.
void analyze_global_symbols();
void detect_recursion();
void dump_call_graph_debug();

// The functions in call-graph order, the record of the file first; null until the graph is built, and where it cannot be.
struct FUNLIST {
    FUNINFO* fun;
    FUNLIST* next;
};
extern FUNLIST* cg_list;
void set_up_and_build_call_graph();

// What the reader calls for each function, tree and symbol.
void preprocess_fundef(FUNINFO* funinfo);
void check_for_synonym_function_in_pass_1();
void check_integrable_definition();
void scan_for_funinfo(NODE* tree);
void check_fun_for_byref_asgs(SYMTAB* sym);
void make_symbol_groupable(SYMTAB* sym);
