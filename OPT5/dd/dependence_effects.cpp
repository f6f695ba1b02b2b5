// Whether evaluating one tree may change what another reads, iteration by iteration.
//
// Sound because every write of the one is held against every access of the other: of places by their dependence, in
// the same iteration or in any, and of what calls, copies and assembly do by the rules on effects. Those ask for
// the object that a place lies in for certain, whatever its address is in an iteration.
#include "OPT5/dd/dependence.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/walks.h"

namespace {

struct LOOPS {
    struct LOOP *l1, *l2;
    bool sameIteration;
};

struct LOOP* loop_of(const NODE* place, struct LOOP* otherwise) {
    struct LOOP* loop = get_loop_from_DDEPNODE_tree(place);
    return loop ? loop : otherwise;
}

bool places_meet(const NODE* x, const NODE* y, const LOOPS& in) {
    if (!op_is_lvalue(x->op) || !op_is_lvalue(y->op)) return true;
    if (x == y || (x->op == NAME && y->op == NAME && x->u.sym == y->u.sym)) return true;
    if (!in.l1 || !in.l2) return lvalues_may_be_aliased(x, y, loop_root());
    if (in.sameIteration && in.l1 == in.l2 && !in.l1->is_root()) return lvalues_collide_in_iteration(x, y, in.l1);
    return lvalues_are_dependent(x, y, loop_of(x, in.l1), loop_of(y, in.l2));
}

// The places that a tree reads or writes, parts of them as the parts; `visit` tells whether to stop.
template <class F>
bool any_access(const NODE* t, const F& visit) {
    if (!t) return false;
    if (t->op == NAME) return visit(t);
    if (op_is_load(t->op)) {
        if (visit(t)) return true;
        const NODE* object = without_members(t);
        return object->op != NAME &&
               (any_access(object->left, visit) || (object->op == UMULT && any_access(object->right, visit)));
    }
    if (t->op == UAND && name_of_place(t->left)) return false;
    return any_access(t->left, visit) || any_access(t->right, visit);
}

// Acts on more than the places it shows: a call, a copy of memory, assembly.
bool acts_on_memory(const NODE* t) {
    return op_is_call(t->op) || t->op == MEMCPY || t->op == ASM || may_write_indirectly(t);
}

bool call_may_access(const NODE* call, const NODE* place) {
    return call_may_modify(call, place) || call_may_read(call, place);
}

bool any_call(const NODE* t) { return any_subtree(t, acts_on_memory); }

// Whether the write may reach a place that evaluating `t` reads or writes: two writes of one place have an order too.
bool write_reaches(const WRITE& w, const NODE* t, const LOOPS& in) {
    const NODE* x = w.place && w.by->op != MEMCPY ? access_of_place(w.place) : nullptr; // a copy writes on behind
    if (any_access(t, [&](const NODE* y) { return x ? places_meet(x, y, in) : call_may_modify(w.by, y); })) return true;
    return any_subtree(t, [x](const NODE* n) { return acts_on_memory(n) && (!x || call_may_access(n, x)); });
}

bool is_volatile_access(const NODE* t) { return op_is_lvalue(t->op) && lvalue_is_volatile(t); }

} // namespace

bool tree_affects_tree(const NODE* t1, const NODE* t2, struct LOOP* l1, struct LOOP* l2, bool sameIteration) {
    if (tree_contains_op(t2, ASM) || tree_contains_op(t1, ASM)) return true;
    const LOOPS in{l1, l2, sameIteration};
    bool affects = false;
    for_each_write(t1, [&](const WRITE& w) { affects = affects || write_reaches(w, t2, in); });
    if (affects) return true;
    // Reading what is volatile is an act, which keeps its place among others and among calls.
    return any_subtree(t1, is_volatile_access) && (any_subtree(t2, is_volatile_access) || any_call(t2));
}

bool trees_are_dependent(const NODE* t1, const NODE* t2, struct LOOP* l1, struct LOOP* l2, bool sameIteration) {
    return tree_affects_tree(t1, t2, l1, l2, sameIteration) || tree_affects_tree(t2, t1, l2, l1, sameIteration);
}

bool tree_touches_lvalue(const NODE* t, const NODE* lv, struct LOOP* l1, struct LOOP* l2, bool sameIteration) {
    if (tree_contains_op(t, ASM)) return true;
    const LOOPS in{l1, l2, sameIteration};
    if (any_access(t, [&](const NODE* x) { return places_meet(x, lv, in); })) return true;
    return any_subtree(t, [&](const NODE* n) { return acts_on_memory(n) && call_may_access(n, lv); });
}
