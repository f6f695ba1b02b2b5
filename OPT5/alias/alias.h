// Which memory references may meet: the one place that answers for every pass that moves a load or a store. What trees
// read and change is asked of effects.h.
//
// Every question here is a "may": where it cannot be decided the answer is true. Lvalues are NAME, UMULT, STREF and
// STDOT trees, also under DDNODE, SSA operators and the transparent wrappers; they are borrowed and left alone.
// `lvalues_may_be_aliased` and what is built on it rely on `fact::alias_marks`.
#pragma once

#include "IFILE/base_node.h"

#include <vector>

class FUNINFO;
class NODE;
class SYMTAB;
class TYPE;
struct LOOP;
struct LS;
struct fkMDATA;

// alias.cpp has the rules on pairs, type_rules.cpp the rule on types, address_taken.cpp the marks, pointers.cpp what
// pointers are based on, alignment.cpp the alignments. Where `fact::points_to` is known it sharpens the answers on pairs,
// see points_to.h.

// ---- Life
// A pass asks for what it relies on with `need`: `fact::alias_marks` sets `is_aliased` of every symbol of the current
// function and of the globals, true for an object that something other than its own NAME may reach; `fact::pointees` fills
// the SPMAP; `fact::pointer_groups` builds the equivalence groups of pointers, if the scopes are known.
// Finds the three anew, the groups only with `groups`.
void init_aliasing_info(bool groups);
// Marks the vector and complex variables that are accessed by parts or as another type. `clear_bitnum` also takes them
// out of the candidates that are numbered by `bitnum`; `aliased` is the mark that they get.
void mark_aliased_vector_and_complex_symbols(bool clear_bitnum, bool aliased);
void reset_alias_info(); // what is known of the current function's references is dropped
void clean_up_alias_analysis_bitvecs_etc();
void init_dd_aliasing();
// Whether the uses of every file-scope symbol have been entered in its `cqual`: from the step that analyzes them on.
extern bool file_symbols_are_known;
bool file_symbol_may_be_aliased(const SYMTAB* sym); // reached other than by its name, as far as the program is known

bool may_be_reached_by_pointers(const SYMTAB* sym); // true as well while the marks are not known

// ---- Pairs
// `exactN`: the lvalue is known to have that declared type, so that access as a character does not excuse it.
bool types_may_be_aliased(TYPE* t1, bool exact1, TYPE* t2, bool exact2);
// Whether `a` and `b` may share memory: evaluated with the same values of the variables in them where `loop` is null,
// in any two iterations of `loop` where it is not. `by_type` false leaves out the rule on types. `*unsure` is set where
// the answer true is a guess.
bool lvalues_may_be_aliased(const NODE* a, const NODE* b, struct LOOP* loop = nullptr, bool by_type = true,
                            bool* unsure = nullptr);
bool object_symbols_may_alias(const SYMTAB* a, const SYMTAB* b);
bool unaliased_by_scope(const NODE* a, const NODE* b); // by `restrict`
// Whether an assertion of a loop around both says that what `p` and `q` point to is disjoint.
bool pointers_are_antialiased(const NODE* p, const NODE* q, struct LOOP* loop_p, struct LOOP* loop_q);
// Whether two accesses of a loop are disjoint from now on, since a test ahead of the loop makes sure of it.
bool build_the_umults_alias_free_by_predication_lists(const NODE* a, const NODE* b, struct LOOP* loop);
void add_antialiasing_loop_assertion(const NODE* p, const NODE* q, struct LOOP* loop_p, struct LOOP* loop_q);

// ---- Shapes
TYPE* true_type(const NODE* tree, bool* exact); // the declared type of the object that an lvalue accesses
const NODE* pointer_basis(const NODE* pointer); // what a pointer is computed from: NAME, UMULT, STDOT, UAND or null
const NODE* address_expr_base(const NODE* pointer);
bool may_be_an_internal_lvalue(const NODE* tree);
SYMTAB* get_vector_or_complex_symbol(const NODE* tree); // the vector or complex variable that an lvalue is part of
bool is_an_array_reference(const NODE* lvalue);

// ---- Known alignment in bits, 16 at the least
unsigned pointee_alignment(const NODE* pointer, struct LOOP* loop);
unsigned nonaligned_pointee_alignment(const NODE* pointer, struct LOOP* loop); // not trusting the pointer's own type
unsigned lvalue_alignment(const NODE* lvalue, struct LOOP* loop);
bool is_lvalue_sufficiently_aligned(const NODE* lvalue, unsigned bits, struct LOOP* loop);
