// Dependence of memory references: may two of them touch one object, and in iterations how far apart?
//
// Between `init_dependence_analysis` and `wrapup_dependence_analysis` each indirection (UMULT) of the function's blocks
// has a DDEPNODE, which knows its block and the form that its address is compared in. That form is found once for the
// analysis; whoever changes trees or blocks in between renews it with `redo_dependence_analysis`.
//
//     dependence_normal.cpp     DDEPNODEs, values known at a reference, the form that is compared
//     dependence.cpp            the vectors of a pair: loops, widths, bases
//     subscript_tests.cpp       subscripts that are linear in the counts of iterations
//     symbolic_test.cpp         other subscripts: factors, signs, ranges
//     dependence_effects.cpp    whether evaluating one tree may change what another reads
//
// Trees are borrowed and stay as they are. Lvalues are NAME, UMULT, STREF and STDOT trees in normal form, of statements
// of the loop that is named with them: the innermost loop around the statement, the root for none. Every question here
// is a "may": what cannot be decided is true, or has all distances. Outside of an analysis nothing is decided but what
// the alias rules tell.
#pragma once

#include "OPT5/dd/dependence_vectors.h"
#include "OPT5/ir/node.h"

#include <cstdint>

class BBLK;
struct LOOP;

// ---- Life
extern thread_local bool dependence_analysis_enabled;
void init_dependence_analysis();                  // of the current function, whose loop hierarchy must be there
void redo_dependence_analysis(struct LOOP* loop); // the DDEPNODEs are made anew after a change in the loop
void wrapup_dependence_analysis(bool keep);       // `keep`: the DDEPNODEs stay with their nodes
void flush_DDEPNODEs_for_loop(struct LOOP* loop); // and those in it
void report_all_dependences();                    // the references and their vectors, to the debug stream

// Null of a tree that is no UMULT with a record; members (STDOT) are looked below.
DDEPNODE* get_DDEPNODE_from_tree(const NODE* tree);
struct LOOP* get_loop_from_DDEPNODE_tree(const NODE* tree); // null without a record

// ---- Vectors. Null: independent.
// Of `v1`, evaluated in `l1`, and `v2` in `l2`. A distance of a level is the iteration of `v2` less that of `v1`, of
// the loop of that level around both. `order`: above 0, `v1` comes first in one iteration; below, `v2`; 0: not known.
// `*fwd` is the vector of dependences from `v1` to `v2`, made feasible in that order; `*bwd`, where `bwd` is not null,
// of those from `v2` to `v1`. `assumeRC`: the caller vouches that the bases do not change between the two. `spec` above 0:
// only the innermost `spec` loops are taken to carry a dependence. `byType`: accesses of types that tell them apart are
// independent, as they are where a load is to see what a store has stored.
void compute_dependence_vectors(DDEP_PTR* fwd, DDEP_PTR* bwd, int order, const NODE* v1, struct LOOP* l1,
                                const NODE* v2, struct LOOP* l2, bool assumeRC, int spec, bool byType = true);
// The vector with the distances of both orders.
DDEP_PTR compute_full_dependence_vector(const NODE* v1, struct LOOP* l1, const NODE* v2, struct LOOP* l2);
// Both in `loop` or in loops within: the distances at its level, dependences that outer loops carry left out.
void compute_distances_for_loop(DVE* out, const NODE* v1, const NODE* v2, struct LOOP* loop);

bool lvalues_collide_in_iteration(const NODE* v1, const NODE* v2, struct LOOP* loop);
bool lvalues_have_non_carried_dDeps_in_loop(const NODE* v1, const NODE* v2, struct LOOP* loop);
bool lvalues_are_dependent(const NODE* v1, const NODE* v2, struct LOOP* l1, struct LOOP* l2);

// ---- Effects. `sameIteration`: of one iteration of the innermost loops named; otherwise of any two.
// Whether evaluating `t1` may change what `t2` reads or writes.
bool tree_affects_tree(const NODE* t1, const NODE* t2, struct LOOP* l1, struct LOOP* l2, bool sameIteration);
bool trees_are_dependent(const NODE* t1, const NODE* t2, struct LOOP* l1, struct LOOP* l2, bool sameIteration);
// Whether evaluating `t` may read or write the object of `lv`.
bool tree_touches_lvalue(const NODE* t, const NODE* lv, struct LOOP* l1, struct LOOP* l2, bool sameIteration);

// ---- Subscripts. Results are new trees; null stands for 0.
NODE* canonicalize_ss_delta(const NODE* ss1, const NODE* ss2, struct LOOP* loop, bool simplify); // ss1 - ss2
NODE* canonicalize_symbolic_ss(const NODE* ss, struct LOOP* loop, bool simplify);
// Whether the tree has one value in all iterations that `vector` allows of the loops around `loop` and of itself; of
// all where it is null.
bool tree_is_RC_in_loop_nest(const NODE* tree, struct LOOP* loop, const DDEP* vector);
bool tree_is_RC_in_common_loop(const NODE* tree, struct LOOP* l1, struct LOOP* l2);
