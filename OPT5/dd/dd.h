// Loops: normal form, dependence, SSA form, and the transformations on loops. The hierarchy is in loop.h.
#pragma once

#include "OPT5/dd/dependence.h"
#include "UTIL/psn.h"

class NODE;
struct LOOP; // written out where it is used: an opcode has the same name

// The normal form that loop work runs on (normal_form.cpp). Trees are consumed; what they became is returned.
NODE* normalize_tree(NODE* tree, NODE* statement); // a part of the statement, or all of it
// `keep_ddnodes`: a reference with a dependence record comes out under a DDNODE, which has the record then.
NODE* denormalize_tree(NODE* tree, bool keep_ddnodes);
// A reference in either form as the source may have written it, a[i]; for remarks.
std::string reference_text(const NODE* tree);
// The integer terms of a pointer go to the right operand of the indirection it is of; what is left of it. Not null.
NODE* partition_pointer_under_UMULT(NODE* pointer, NODE* umult);
NODE* strip_ddep_info_from_tree(NODE* tree); // records of dependence and DDNODEs go
// All statements of the current function; `trees_are_normalized` tells the form that they have.
void normalize_all_trees();
void denormalize_all_trees(bool keep_ddnodes, bool simplify);
void denormalize_unchanged_trees(); // of steps whose trees are simplified: what the form made, or was marked, is

// A parameter copy of the argument prolog that copies a scalar with a qualifier that bars optimization is split: a
// local without the qualifier takes the value.
void split_qualified_parameter_copies();

// Advice on pointers that nothing tells apart, of the loop and those in it (alias_advice.cpp): pragmas of the loops, and
// text in the information file.
void report_ambiguous_aliases(struct LOOP* loop);
// Remarks on the counts of loops and on what keeps their iterations in order (loop_remarks.cpp).
void tell_of_loops(struct LOOP* root);
PSN place_of_loop(const struct LOOP* loop); // in the source; its line is 0 where that is not known

// The loop transformations, on the loop and those within. `sink_unused_definitions` tells whether anything moved.
bool sink_unused_definitions(struct LOOP* loop);
// Places that innermost loops write, and whose address stays, get pointers of their own (invariant_places.cpp).
void name_invariant_places(struct LOOP* root);
// Quotients and remainders of counters by what their loops leave alone step as well (stepping_quotients.cpp).
void count_quotients(struct LOOP* root);
void undeltafy_dd_loops(struct LOOP* loop);
void collapse_dd_loops(struct LOOP* loop);
void coalesce_dd_loops(struct LOOP* loop);
void sr_circular_addressing_in_loop(struct LOOP* loop);
void sr_DIV_and_MOD_in_loop(struct LOOP* loop, bool recurse);
void do_loop_if_interchange(struct LOOP* loop);
void unroll_and_jam_loop_nest(struct LOOP* loop, bool recurse, bool all);
void unroll_loops_for_SP(struct LOOP* loop);
void interleave_reductions_in_loop(struct LOOP* loop, bool recurse);
void explode_local_arrays();

// Forms of the dual multiply-accumulate, in normal form, and of its accumulators (mac_dual.cpp, mac_rotation.cpp). The first
// tells whether it converted anything: the hierarchy is stale then.
bool special_DMAC_conversion();
void rotate_loops_for_accumulators();

// What the code generator is told (code_generator.cpp, loop_records.cpp, dependence_records.cpp): FUNINFO::code_records.
// The analysis keeps what the hierarchy knows of loops and of the dependences of accesses, which are numbered: DDNODE.
// What is said of loops is settled when the blocks have their final order; accesses that are no longer in the loops that
// they were found in lose their numbers then. Last, edges of accesses that went are dropped.
void do_dd_analysis_for_be();
void write_loop_icode(struct LOOP* root);
class DDGRAPH;
void write_dd_edges(const DDGRAPH& graph);
void settle_loop_records();
void finalize_dd_edges();
void write_ldspec_advice();

// Self-contained: with a frame of their own. No step of the table calls them.
void do_dd_restructuring();
void do_dd_SSA_optimizations(bool constants, bool dead, bool promote);

// Self-check of the dependence vectors, for the debug stream.
void do_DVE_unit_testing();
