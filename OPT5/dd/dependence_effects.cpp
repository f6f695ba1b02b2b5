// Whether evaluating one tree may change what another reads, iteration by iteration.
//
// Sound because every write of the one is held against every access of the other: of places by their dependence, in
// the same iteration or in any, and of what calls, copies and assembly do by the rules on effects. Those rules compare
// places as evaluated with the same values of their variables; a place whose address varies in the loops is asked in
// the loop around both instead.
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

bool is_lvalue(const NODE* t) { return t->op == NAME || t->op == UMULT || t->op == STDOT || t->op == STREF; }

bool places_meet(const NODE* x, const NODE* y, const LOOPS& in) {
    if (!is_lvalue(x) || !is_lvalue(y)) return true;
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
    if (t->op == STDOT || t->op == UMULT || t->op == STREF) {
        if (visit(t)) return true;
        const NODE* object = without_members(t);
        return object->op != NAME && (any_access(object->left, visit) ||
                                      (object->op == UMULT && any_access(object->right, visit)));
    }
    if (t->op == UAND && name_of_place(t->left)) return false;
    return any_access(t->left, visit) || any_access(t->right, visit);
}

// Acts on more than the places it shows: a call, a copy of memory, assembly.
bool acts_on_memory(const NODE* t) { return op_is_call(t->op) || t->op == MEMCPY || t->op == ASM || may_write_indirectly(t); }

// By its variables' present values the call's own question cannot be put to a place of another iteration.
bool is_call_kept_from(const NODE* call, const NODE* place, bool reads_count) {
    return !call_may_modify(call, place) && !(reads_count && call_may_read(call, place));
}

bool any_call(const NODE* t) { return any_subtree(t, acts_on_memory); }

// Whether a write by `by` may reach a place that `t` reads, or writes where `writes_count`.
bool write_reaches(const WRITE& w, const NODE* t, const LOOPS& in, bool writes_count) {
    const NODE* x = w.place && w.by->op != MEMCPY ? access_of_place(w.place) : nullptr; // a copy writes on behind
    auto is_reached = [&](const NODE* y) { return x ? places_meet(x, y, in) : !is_call_kept_from(w.by, y, false); };
    if (!writes_count && writes_left_operand(t->op)) {
        // The place that is given a value is not read by a plain assignment; what its address is made of is.
        const bool is_plain = t->op == ASG || t->op == STASG || t->op == ARASG;
        const NODE* place = access_of_place(t->left);
        const bool by_left = is_plain ? place->op != NAME && any_access(without_members(place)->left, is_reached)
                                      : any_access(t->left, is_reached);
        if (by_left || (is_plain && without_members(place)->op == UMULT &&
                        any_access(without_members(place)->right, is_reached)))
            return true;
        if (t->right && write_reaches(w, t->right, in, writes_count)) return true;
    } else if (any_access(t, is_reached)) {
        return true;
    }
    return any_subtree(t, [&](const NODE* n) {
        if (!acts_on_memory(n)) return false;
        return !x || call_may_read(n, x) || (writes_count && call_may_modify(n, x));
    });
}

bool is_volatile_access(const NODE* t) { return is_lvalue(t) && lvalue_is_volatile(t); }

} // namespace

bool tree_affects_tree(const NODE* t1, const NODE* t2, struct LOOP* l1, struct LOOP* l2, bool sameIteration) {
    if (tree_contains_op(t2, ASM) || tree_contains_op(t1, ASM)) return true;
    const LOOPS in{l1, l2, sameIteration};
    bool affects = false;
    for_each_write(t1, [&](const WRITE& w) { affects = affects || write_reaches(w, t2, in, false); });
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
    return any_subtree(t, [&](const NODE* n) { return acts_on_memory(n) && !is_call_kept_from(n, lv, true); });
}
