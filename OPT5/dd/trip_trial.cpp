// The count of a loop whose one variable takes constants in turn, found by taking them.
//
//     for (mask = 4; mask; mask >>= 1)      3 iterations
//
// Needs: the hierarchy; a loop without a control variable. Leaves: everything.
// Sound because nothing but the one statement writes the variable, in each iteration once and ahead of the test, and
// neither reads anything else; the simplifier computes what the program does.
#include "OPT5/dd/trip.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/inductions.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

namespace {

constexpr int64_t MOST_TRIALS = 64;
constexpr int MOST_NODES = 12, SEARCH_BUDGET = 60, SEARCH_DEPTH = 2;

// Of integers and the one variable; null for another tree.
SYMTAB* only_variable(const NODE* t) {
    SYMTAB* sym = nullptr;
    const bool is_other = count_nodes_in_tree(t) > MOST_NODES || any_subtree(t, [&sym](const NODE* n) {
                              if (n->op == NAME && n->u.sym && (!sym || sym == n->u.sym)) {
                                  sym = n->u.sym;
                                  return !n->type->is_int();
                              }
                              const bool computes = op_is_arithmetic(n->op) || op_is_int_compare(n->op) ||
                                                    n->op == EXCLAIM || n->op == SCONV;
                              return n->op != ICON && !(computes && n->type->is_int());
                          });
    return is_other ? nullptr : sym;
}

// The statement that gives the variable its next value, as an assignment; null where others write it, or it may not run
// in an iteration. A new tree.
NODE* step_of(const SYMTAB* sym, const struct LOOP* loop) {
    const NODE* step = nullptr;
    int writes = 0;
    for (const BBLK* bb : loop->contents)
        for (const LIST* s = bb->statements; s; s = s->rest)
            for_each_written_name(s->first, [&](const NODE* name, const NODE* by) {
                if (name->u.sym != sym) return;
                ++writes;
                if (by == s->first && (bb == loop->head || bb == loop->tail)) step = by;
            });
    if (writes != 1 || !step || step->left->op != NAME) return nullptr;
    NODE* t = opASG_to_ASG(copy_tree(step));
    if (t->op == ASG && only_variable(t->right) == sym) return t;
    erase_tree(t);
    return nullptr;
}

// The tree where the variable is `value`, a constant; false if it is none. `t` is borrowed.
bool value_at(const NODE* t, const NODE* name, INT65 value, TYPE* type, INT65* result) {
    NODE* constant = mk_ICON(value, name->type->stqs());
    NODE* at = simp_tree(coerce_to_type(type, subst_tree_for_lvalue_in_tree(constant, name, copy_tree(t))), nullptr);
    const bool is_known = at->op == ICON;
    if (is_known) *result = at->u.lval;
    erase_tree(constant);
    erase_tree(at);
    return is_known;
}

} // namespace

NODE* count_by_trial(struct LOOP* loop) {
    if (!loop->is_bottom_tested() || loop->has(LOOP_early_exit) || loop_has_subloops(loop)) return nullptr;
    const NODE* test = loop->tail->branch();
    SYMTAB* sym = only_variable(test->left);
    if (!sym || !is_private_scalar(sym) || find_widened_symbol_entry(sym) || sym->type->size > 32) return nullptr;
    NODE* step = step_of(sym, loop);
    if (!step) return nullptr;
    NODE *name = mk_NAME(sym), *start = find_symbol_value(sym, loop->preheader, loop, SEARCH_BUDGET, SEARCH_DEPTH);
    const bool stays_if_true = test->right->left->lbl->bblock == loop->head;
    int64_t count = 0;
    INT65 value = start && start->op == ICON ? start->u.lval : INT65(0), stays = 0;
    bool is_known = start && start->op == ICON;
    do {
        is_known = is_known && ++count <= MOST_TRIALS &&
                   value_at(step->right, name, value, sym->type->stqs(), &value) &&
                   value_at(test->left, name, value, test->left->type->stqs(), &stays);
    } while (is_known && stays.is_zero() != stays_if_true);
    for (NODE* t : {step, name, start}) erase_tree(t);
    return is_known ? mk_ICON(INT65(count), wide_enough_int_type(INT65(count))) : nullptr;
}
