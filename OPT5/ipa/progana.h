// Whole-file facts: the call graph, and what each function and global may do and suffer.
//
// Every definition is scanned once, when it has been read. The barrier steps then close the facts over the call graph,
// so that what a flag guarantees holds for everything a call may set off.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

class FUNINFO;
class NODE;
class SYMTAB;
struct CALLEE;
struct PRAGMA;

// The steps between pass 1 and pass 2.
void analyze_global_symbols();
void detect_recursion();
void dump_call_graph_debug();

struct FUNLIST {
    FUNINFO* fun;
    FUNLIST* next;
};
FUNLIST* mkFUNLIST(FUNINFO* f, FUNLIST* next);

enum FILE_FLAG : uint8_t {
    FILE_defines_main = 1,
    FILE_has_root = 2,
    FILE_defines_external = 4,
    FILE_calls_outside = 8, // or through a pointer that may lead outside
};

// What is known of the file.
struct PROGRAM {
    FUNLIST* funlist = nullptr;            // every function with a definition
    CALLEE* anonymous_functions = nullptr; // used other than in a direct call, with the number of such uses
    CALLEE* system_callees = nullptr;      // called and not defined here
    CALLEE* outside_callees = nullptr;
    FUNINFO* file_fun = nullptr; // stands for the outside world; its callees are the roots
    uint8_t file_flags = 0;
    int32_t cg_count = 0; // numbered functions plus one: the width of `FUNINFO::reach`
    bool main_runs_once = true;
    std::vector<std::string> assembly; // texts, which may name any symbol
};
extern PROGRAM program;

// The functions in call-graph order, the record of the file first: a caller precedes what it calls, but for cycles.
// Null until the graph is built, and where there is no function.
extern FUNLIST* cg_list;
void set_up_and_build_call_graph();

// Whether the call may lead back into the current function.
bool call_may_be_recursive(const NODE* call);
// Of the symbols that a copied body names: direct callees are kept for good.
void scan_for_calls_and_uses(NODE* tree);

// ---- While reading
void preprocess_fundef(FUNINFO* f); // a definition has been read
void scan_for_funinfo(NODE* tree, bool value_unused, FUNINFO* f, bool in_prolog);
void scan_for_funinfo(NODE* initializer_item);
void check_fun_for_byref_asgs(SYMTAB* sym); // drops the guarantee about parameters where no parameter is a pointer
void add_call_edge(FUNINFO* caller, FUNINFO* callee, bool value_unused);
bool propagate_call_flags(FUNINFO* caller, FUNINFO* callee); // whether the caller's flags changed; null: anything
// Sets FUNINFO::body_returns of the current function, whose graph is built; then, of all functions of the list, the flag
// FUN_surely_returns. Their callees are entered (returns.cpp).
void see_whether_body_returns();
void close_returns(const std::vector<FUNINFO*>& functions);
// A body that only passes its parameters on to another function makes the two synonyms.
void check_for_synonym_function_in_pass_1();
bool is_synonym_function(const FUNINFO* f);
// Marks a definition that call integration must not copy: a volatile local, a class that fits no copy, too many wide locals.
void check_integrable_definition();
void make_symbol_groupable(SYMTAB* sym);

// ---- Questions
PRAGMA* symbol_has_pragma(const SYMTAB* sym, int kind);
bool assembly_names(const SYMTAB* sym); // a text of the file, which may use what it names as it likes
bool symbol_is_preemptible(const SYMTAB* sym);
