// Small diamonds become selects.
//
// `if (c) x = a; else x = b;` and `return c ? a : b` in two blocks cost two jumps; as one statement the code generator
// may use a conditional instruction, or the target's minimum and maximum.
//
// Needs: nothing. Leaves: unreachable blocks, which `rebuildcfg` removes.
// Sound because the condition is evaluated first as before, and the code generator, which may then compute both arms,
// finds none that has a side effect or needs the condition as its guard: `if (p) x = *p;` stays.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/minmax.h"
#include "OPT5/simp/simp.h"

#include <utility>

namespace {

constexpr int MAX_ARM_NODES = 8; // both arms are computed: they have to be cheap

// An access through a pointer, a division and a call are only safe, or only worth it, where the condition holds.
bool rhs_may_need_guard_in_lhs(const NODE* rhs) {
    bool guard = false;
    for_each_subtree(rhs, [&](const NODE* t) {
        switch (t->op) {
        case UMULT:
        case STREF:
        case DIV:
        case MOD:
        case CALL:
        case UCALL:
        case UICALL:
        case MCALL:
        case UMCALL:
        case QUEST: guard = true; break;
        case ICALL: guard = guard || !is_minmax_call(t); break;
        default: break;
        }
    });
    return guard;
}

bool is_plain_arm(const NODE* value) {
    return count_nodes_in_tree(value) <= MAX_ARM_NODES && !tree_has_side_effects(value) &&
           !rhs_may_need_guard_in_lhs(value);
}

bool is_plain_target(const NODE* lvalue) {
    return lvalue->op == NAME && lvalue->type->is_scalar() && !lvalue_is_volatile(lvalue);
}

// ---- Values

bool is_truth_value(const NODE* t, long value) {
    return t->op == ICON && t->type->is_int() && t->u.lval == INT65(value);
}

// `c ? a : b` as a value of `type`; null where it is better left alone. Consumes nothing.
NODE* make_select(const NODE* c, const NODE* a, const NODE* b, TYPE* type) {
    if (type->is_int() && is_truth_value(a, 1) && is_truth_value(b, 0))
        return coerce_to_type(type, make_boolean(copy_tree(c), nullptr));
    if (type->is_int() && is_truth_value(a, 0) && is_truth_value(b, 1))
        return coerce_to_type(type, invert_boolean_tree(copy_tree(c)));
    if (NODE* call = make_minmax(c, a, b, type)) return call;
    NODE* arms = maketree(COLON, coerce_to_type(type, copy_tree(a)), coerce_to_type(type, copy_tree(b)), type);
    return simp_node(maketree(QUEST, copy_tree(c), arms, type), nullptr);
}

// ---- Shapes

BBLK* arm_of(const NODE* ref, const BBLK* bb) {
    BBLK* arm = ref->lbl->bblock;
    const EDGE* e = arm->predecessors;
    return arm != bb && e && !e->rest && !arm->is_in_LIR_form() ? arm : nullptr;
}

// The one assignment of a block that then jumps on.
NODE* sole_assignment(const BBLK* arm) {
    const LIST* s = arm->statements;
    if (!s || !s->rest || s->rest->rest || s->first->op != ASG || s->rest->first->op != BRANCH) return nullptr;
    return tree_is_arg_prolog(s->first) || !is_plain_target(s->first->left) ? nullptr : s->first;
}

// One whose value may be computed where the block is not reached.
NODE* sole_plain_assignment(const BBLK* arm) {
    NODE* asg = sole_assignment(arm);
    return asg && is_plain_arm(asg->right) ? asg : nullptr;
}

NODE* sole_return(const BBLK* arm) {
    const LIST* s = arm->statements;
    if (!s || s->rest || s->first->op != RETURN || !s->first->right || !s->first->right->type->is_scalar())
        return nullptr;
    return is_plain_arm(s->first->right) ? s->first : nullptr;
}

void drop_arm(BBLK* bb, BBLK* arm) {
    disconnect(bb, arm);
    while (arm->successors) disconnect(arm, arm->successors->first);
}

// The test gives way to `statement` and a jump to `join`, or to `statement` alone.
void replace_test(BBLK* bb, LIST* test, NODE* statement, BBLK* join) {
    LS* ls = test->first->ls;
    erase_tree(test->first);
    test->first = statement;
    if (!join) return;
    end_block_with(bb, test, mk_BRANCH(join, ls));
    connect(bb, join);
}

bool join_assignments(BBLK* bb, LIST* test, BBLK* on_true, BBLK* on_false) {
    NODE *a = sole_plain_assignment(on_true), *b = sole_plain_assignment(on_false);
    BBLK* join = only_block(on_true->successors);
    if (!a || !b || !join || join != only_block(on_false->successors) || join == on_true || join == on_false) return false;
    if (!trees_are_congruent(a->left, b->left, false)) return false;
    NODE* value = make_select(test->first->left, a->right, b->right, a->left->type);
    NODE* statement = mk_ASG(copy_tree(a->left), value);
    drop_arm(bb, on_true);
    drop_arm(bb, on_false);
    replace_test(bb, test, statement, join);
    return true;
}

bool join_returns(BBLK* bb, LIST* test, BBLK* on_true, BBLK* on_false) {
    NODE *a = sole_return(on_true), *b = sole_return(on_false);
    if (!a || !b || !equiv_mtypes(a->right->type, b->right->type)) return false;
    NODE* value = make_select(test->first->left, a->right, b->right, a->right->type);
    NODE* statement = maketree(RETURN, copy_tree(a->left), value, a->type, a->ls);
    drop_arm(bb, on_true);
    drop_arm(bb, on_false);
    replace_test(bb, test, statement, nullptr);
    return true;
}

// `x < 0 ? -x : x`, or null.
NODE* make_absolute_value(const NODE* c, const NODE* a, const NODE* b, TYPE* type) {
    if ((a->op != UMINUS && b->op != UMINUS) || !is_plain_arm(a) || !is_plain_arm(b)) return nullptr;
    NODE* value = make_select(c, a, b, type);
    if (value->op == ABS) return value;
    erase_tree(value);
    return nullptr;
}

// `if (a < x) x = a;` and `if (x < 0) x = -x;`: one arm is empty, which pays where the target has the instruction. The
// condition computes what an extremum chooses from.
bool join_extremum(BBLK* bb, LIST* test, BBLK* arm, BBLK* join, bool holds) {
    if (!arm || arm == join || only_block(arm->successors) != join) return false;
    NODE* asg = sole_assignment(arm);
    if (!asg) return false;
    NODE* condition = test->first->left;
    if (tree_has_side_effects(condition)) return false;
    const NODE *a = asg->right, *b = asg->left;
    if (!holds) std::swap(a, b);
    NODE* value = make_minmax(condition, a, b, asg->left->type);
    if (!value) value = make_absolute_value(condition, a, b, asg->left->type);
    if (!value) return false;
    NODE* statement = mk_ASG(copy_tree(asg->left), value);
    drop_arm(bb, arm);
    disconnect(bb, join);
    replace_test(bb, test, statement, join);
    return true;
}

// The cell of the test that ends the block; null if none does.
LIST* test_of(const BBLK* bb) {
    LIST* test = bb->last_statement();
    return !test || test->first->op != IF || test->first->left->op == ENDLOOP || bb->is_in_LIR_form() ? nullptr : test;
}

bool join_diamond(BBLK* bb) {
    LIST* test = test_of(bb);
    if (!test) return false;
    const NODE* targets = test->first->right;
    BBLK *on_true = arm_of(targets->left, bb), *on_false = arm_of(targets->right, bb);
    if (on_true && on_false && on_true != on_false)
        if (join_assignments(bb, test, on_true, on_false) || join_returns(bb, test, on_true, on_false)) return true;
    return join_extremum(bb, test, on_true, targets->right->lbl->bblock, true) ||
           join_extremum(bb, test, on_false, targets->left->lbl->bblock, false);
}

// The plain assignment that is the one arm of the block's test, where the other edge leads to where the arm ends.
struct LONE_ARM {
    BBLK *block = nullptr, *join = nullptr;
    NODE* asg = nullptr;
    bool holds = false; // it is taken where the condition holds
};

bool find_lone_arm(const BBLK* bb, LONE_ARM* arm) {
    const LIST* test = test_of(bb);
    if (!test || tree_has_side_effects(test->first->left)) return false;
    const NODE* targets = test->first->right;
    for (bool holds : {true, false}) {
        BBLK *block = arm_of(holds ? targets->left : targets->right, bb), *join = (holds ? targets->right : targets->left)->lbl->bblock;
        if (!block || block == join || only_block(block->successors) != join) continue;
        NODE* asg = sole_plain_assignment(block);
        if (!asg || !may_be_arm_of_select(asg)) return false;
        *arm = {block, join, asg, holds};
        return true;
    }
    return false;
}

bool are_two_arms(const BBLK* bb) {
    const LIST* test = test_of(bb);
    if (!test) return false;
    const NODE* targets = test->first->right;
    const BBLK *a = arm_of(targets->left, bb), *b = arm_of(targets->right, bb);
    if (!a || !b || a == b || !only_block(a->successors) || only_block(a->successors) != only_block(b->successors)) return false;
    const NODE *x = sole_plain_assignment(a), *y = sole_plain_assignment(b);
    return x && y && trees_are_congruent(x->left, y->left, false);
}

} // namespace

bool is_choice_of_value(const BBLK* bb) {
    LONE_ARM arm;
    return are_two_arms(bb) || find_lone_arm(bb, &arm);
}

bool choose_value(BBLK* bb) {
    if (join_diamond(bb)) return true;
    LONE_ARM arm;
    if (!find_lone_arm(bb, &arm)) return false;
    LIST* test = bb->last_statement();
    const NODE *a = arm.asg->right, *b = arm.asg->left;
    if (!arm.holds) std::swap(a, b);
    NODE* value = make_select(test->first->left, a, b, arm.asg->left->type);
    NODE* statement = mk_ASG(copy_tree(arm.asg->left), value);
    drop_arm(bb, arm.block);
    disconnect(bb, arm.join);
    replace_test(bb, test, statement, arm.join);
    return true;
}

bool may_be_arm_of_select(const NODE* t) { return t->op == ASG && is_plain_target(t->left) && is_plain_arm(t->right); }

bool join_diamonds() {
    if (opt_level() == 0) return false;
    bool changed = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (bb->statements) changed |= join_diamond(bb);
    return changed;
}
