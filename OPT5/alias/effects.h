// What evaluating a tree reads and changes: the one answer for every pass.
//
// Questions with "may" are answered true where that cannot be decided. They rely on the marks of `init_aliasing_info`:
// without those every object can be reached. A variable that only its NAME reaches (`only_its_name_reaches`) is changed
// by what `for_each_written_name` visits and by nothing else.
#pragma once

#include "OPT5/alias/address_form.h"
#include "OPT5/ir/walks.h"

#include <deque>
#include <vector>

class BBLK;
class BITVEC;
class SYMTAB;
struct LS;

// ---- Writes

struct WRITE {
    const NODE* by;    // the operator
    const NODE* place; // null: what pointers reach, or the object of a pointer that is not known
};

// Whether the node itself acts on what pointers reach: calls, copies of memory, assembly. Its operands are not looked
// at; a call that is known to write nothing counts as none.
bool may_write_indirectly(const NODE* node);
// The place that the pointer of a copy points to, where the tree shows it, or null.
const NODE* place_of_pointer(const NODE* pointer);

namespace effects {
template <class F>
void visit_places(const NODE* by, const NODE* place, const F& visit) {
    const NODE* object = object_of_place(place);
    if (object->op == QUEST && object->right) { // one of two
        visit_places(by, object->right->left, visit);
        visit_places(by, object->right->right, visit);
    } else
        visit(WRITE{by, place});
}
} // namespace effects

// What one node writes, its operands aside.
template <class F>
void for_each_write_of_node(const NODE* t, const F& visit) {
    if (!(op_traits[t->op] & OP_ACTS)) return;
    if (t->op == ARGREF) // the callee of a machine call gets it to write to
        effects::visit_places(t, t->left, visit);
    else if (t->op == MEMCPY)
        visit(WRITE{t, place_of_pointer(arg_list_lookup(t->left, 0))});
    else if (writes_left_operand(t->op) && t->left)
        effects::visit_places(t, t->left, visit);
    else if (may_write_indirectly(t))
        visit(WRITE{t, nullptr});
}

// Whatever evaluating `tree` may write, nested assignments included.
template <class F>
void for_each_write(const NODE* tree, const F& visit) {
    for_each_subtree(tree, [&visit](const NODE* t) { for_each_write_of_node(t, visit); });
}

// The NAMEs that are written, wholly or in part: `visit(name, by)`.
template <class F>
void for_each_written_name(const NODE* tree, const F& visit) {
    for_each_write(tree, [&visit](const WRITE& w) {
        if (const NODE* name = w.place ? name_of_place(w.place) : nullptr) visit(name, w.by);
    });
}

// Whether the node's left operand is a place with a variable in it, not a value to be computed: nothing may take the
// variable's place there.
inline bool left_names_variable(const NODE* t) {
    if (!t->left || !(writes_left_operand(t->op) || t->op == UAND || t->op == ARGREF || t->op == STDOT)) return false;
    bool names = false;
    effects::visit_places(t, t->left, [&names](const WRITE& w) { names = names || name_of_place(w.place); });
    return names;
}

// The variable that an assignment operator, the root of `t`, writes as a whole; null for another place or operator.
SYMTAB* assigned_variable(const NODE* t);
// Whether evaluating `tree` does anything but compute a value; reading a volatile object is no act here.
bool tree_acts(const NODE* tree);
// Whether evaluating `tree` leaves all that a tree may read as it is: its only acts are calls that write nothing.
bool tree_changes_nothing(const NODE* tree);
// What a call, a CALL or an ICALL, computes by: the callee's symbol or the built-in's descriptor. Null unless it does
// nothing but compute a scalar from its arguments, the same each time, if it returns.
const void* pure_callee(const NODE* call);
// The same of a callee that may read memory also, as `*reads_memory` tells then.
const void* computing_callee(const NODE* call, bool* reads_memory);

// The outermost lvalues that a tree reads, and those that their addresses are computed from.
std::vector<const NODE*> lvalues_read_in(const NODE* tree);

// ---- Control
//
// What may trap is evaluated only where the program evaluates it, or where it is certain to come to that. It so stays behind
// whatever may not pass control on, as the check in `if (!b) exit(3); q = a / b;`, and behind events outside the program,
// which may never come, or be the last that others see of it.
// A callee that may trap is no such thing if it is certain to come back otherwise. A run in which it traps is undefined from
// there on, and nothing that is defined lies between the place where the mover's trap comes now and that one.

// Whether a CALL or UCALL comes back for certain: in finite time, and with no event outside the program in between.
bool call_surely_returns(const NODE* call);
// Whether nothing but its value, and what evaluating its arguments does, would be missed if a CALL or UCALL were not made.
bool call_only_computes(const NODE* call);
// One node, its operands and the callee of a call aside: an operation of the machine, but for those that multiply and
// accumulate, assembly, or a volatile access.
bool node_may_stop_or_wait(const NODE* t);
// Whether control may not come to what follows evaluating the tree. A volatile access passes it on.
bool may_not_pass_control(const NODE* tree);
// The same, or an event outside the program is part of it: what may trap does not move ahead of it, and stores ahead of it
// are made.
bool may_leave_in_the_middle(const NODE* tree);
// Whether evaluating the tree where the program does not may end it, or keep control: a quotient, unless by a constant
// other than 0 and -1, a load through a pointer, a call.
bool may_trap(const NODE* tree);

// ---- Changes

// Whether evaluating `a` may change what `t` reads: the objects, and the addresses it reads them by.
bool tree_modifies_lvalue_in_tree(const NODE* a, const NODE* t);
bool bb_modifies_lvalue_in_tree(const BBLK* bb, const NODE* t);
// Whether evaluating `a` may write to, or may read or write, the object of `lvalue`.
bool tree_modifies_lvalue(const NODE* a, const NODE* lvalue);
bool tree_touches_lvalue(const NODE* a, const NODE* lvalue);

// What trees do to memory, listed once for trees that are asked about many lvalues. The trees must stand.
class ACCESS_LISTS {
public:
    size_t add(const NODE* tree); // the number to ask by
    // Whether the tree touches the lvalue, or modifies what its address is computed from. Types tell nothing apart from
    // what the tree writes.
    bool touches(size_t number, const COMPARED_LVALUE& lvalue) const;

private:
    struct ACT {
        const NODE* node;
        size_t places_end; // those that it writes end there
    };
    struct RANGE {
        const NODE* tree;
        size_t acts, acts_end, places, reads, reads_end;
    };
    bool act_may_touch(const ACT& act, size_t places, const COMPARED_LVALUE& lvalue) const;
    bool act_may_modify(const ACT& act, size_t places, const COMPARED_LVALUE& lvalue) const;

    std::vector<ACT> acts;              // of each tree: the nodes that act
    std::deque<COMPARED_LVALUE> places; // of each tree: those that they write, then the lvalues it reads
    std::vector<RANGE> trees;
};

// What a tree reads, summed up, for a tree about which many others are asked. Coarser than the alias rules: one access
// through a pointer may meet any object that is reached by pointers.
class READ_SET {
public:
    READ_SET() = default;
    explicit READ_SET(const NODE* tree);
    // False if it reads what the tree does not show: a call or assembly stands in it.
    bool is_complete() const { return complete; }
    bool may_be_changed_by(const NODE* tree) const;
    const SYMTAB* only_variable() const; // the one that all reads are of, or null

private:
    bool may_be_changed(const WRITE& w) const;

    std::vector<const SYMTAB*> symbols;
    bool indirect = false; // through pointers
    bool exposed = false;  // a symbol that a pointer or a call may reach
    bool complete = true;
};

// ---- Calls
// What a call does outside its own frame: to the object of `lvalue`, which may be null for "anything at all".
bool call_may_modify(const NODE* call, const NODE* lvalue);
bool call_may_read(const NODE* call, const NODE* lvalue);
bool call_assigns_thru_byref_args(const NODE* call);
bool byref_arg_is_not_assigned_thru(int index, SYMTAB* callee); // argument from 0; null: unknown

// ---- Sets
// The lvalues that a pass keeps facts on, numbered by their place; a set of `kill_aliases_*` has a bit for each. Trees
// other than lvalues are killed with what they read. The trees must stand until `clean_up_alias_analysis_bitvecs_etc`.
void compute_alias_sets(const std::vector<const NODE*>& lvalues);
void kill_aliases_of_lvalue(const NODE* lvalue, BITVEC* set);
// What an access of unknown address changes, in `scope` if that is not null; `tree` is the access or null.
void kill_aliases_indirect(const LS* scope, const NODE* tree, BITVEC* set, unsigned flags = 0);
void kill_aliases_on_call(const NODE* call, BITVEC* set);
void kill_assertions(BITVEC* set);
