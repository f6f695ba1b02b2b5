// A loop that is tested on top gets its test at the bottom too; the one on top becomes a guard ahead of the loop.
//
//     head: if (i < n) goto body; else goto exit;        if (i < n) goto preheader; else goto exit;
//     body: ... goto head;                               preheader: body: ... if (i < n) goto body; else goto exit2;
//
// Needs: the hierarchy with its variables. Leaves: a graph for which the hierarchy is built anew.
// Sound because the copies compute what the head computes, in the same order.
#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/simp/simp.h"

namespace {

constexpr int MOST_TEST_NODES = 64;

// Besides its test the head may hold one statement.
bool head_is_small(const BBLK* head) {
    const LIST* s = head->statements;
    if (s->rest) {
        if (s->first->op == PPRAGMA || s->first->op == ASM || tree_is_arg_prolog(s->first) ||
            tree_contains_op(s->first, ASM) || tree_contains_op(s->first, CALL) || tree_contains_op(s->first, UCALL) ||
            count_nodes_in_tree(s->first) > MOST_TEST_NODES)
            return false;
        s = s->rest;
    }
    return !s->rest && s->first->op == IF && s->first->left->op != ENDLOOP &&
           count_nodes_in_tree(s->first->left) <= MOST_TEST_NODES;
}

bool has_shape(const struct LOOP* loop) {
    const BBLK *head = loop->head, *tail = loop->tail;
    return head != tail && tail->loop == loop && !tail->successors->rest && tail->branch()->op == BRANCH &&
           edge_length(head->predecessors) == 2 && edge_length(head->successors) == 2 && head_is_small(head);
}

// Of the condition: a comparison of what moves in the loop with what stays; the side that stays, or null.
NODE** staying_side(NODE* condition, const struct LOOP* loop) {
    if (!op_is_int_compare(condition->op) || tree_has_side_effects(condition) ||
        tree_is_RC_in_loop(condition, loop, false))
        return nullptr;
    for (const NODE* side : {condition->left, condition->right})
        if (!side->type->is_int() && !side->type->is_pointer() && !side->type->is_enum()) return nullptr;
    auto stays = [loop](const NODE* t) { return tree_is_RC_in_loop(t, loop, true); };
    auto moves = [loop](const NODE* t) { return !tree_is_RC_in_loop(t, loop, false); };
    if (moves(condition->left) && stays(condition->right)) return &condition->right;
    return moves(condition->right) && stays(condition->left) ? &condition->left : nullptr;
}

// What stays is computed once, in the guard, if that takes an operation that the loop would repeat.
void keep_in_temporary(NODE** side, const struct LOOP* loop) {
    if (count_nodes_in_tree(*side, true) == 0 || expr_is_constant(*side) || !tree_is_RC_in_loop(*side, loop, false))
        return;
    SYMTAB* sym = sym_temp('T', -1, (*side)->type->stqs(), (*side)->ls);
    BBLK* head = loop->head;
    LIST** link = &head->statements;
    while ((*link)->rest) link = &(*link)->rest;
    insert_before(link, mk_ASG(mk_NAME(sym), *side), (*link)->psn);
    *side = mk_NAME(sym);
}

// Whether a test on top of a loop around decides the condition: in the body its control variable is ahead of its limit
// up to the update at the end.
bool is_implied_around(const NODE* condition, const struct LOOP* loop) {
    constexpr int MOST_LEVELS = 8;
    bool holds = false;
    int levels = MOST_LEVELS;
    for (const struct LOOP* outer = loop->parent; outer && !outer->is_root() && !holds && --levels >= 0;
         outer = outer->parent) {
        if (outer->is_bottom_tested() || !outer->LCV || outer->LCV->has(IV_updated_in_head) || !outer->LCV->last)
            continue;
        if (loop->head == outer->tail || loop->preheader == outer->head) continue;
        NODE* known = maketree(outer->test, mk_NAME(outer->LCV->sym), copy_tree(outer->LCV->last), tp->int_t);
        known = simp_tree(known, nullptr);
        holds = pred_implies_pred(known, true, condition) == 1;
        erase_tree(known);
    }
    return holds;
}

// Whether the first test is decided by what the loop starts with: the condition then, as a constant; null otherwise.
NODE* decided_first_test(struct LOOP* loop) {
    const LIST* s = loop->head->statements;
    const NODE* condition = loop->head->branch()->left;
    if (s->rest && tree_modifies_lvalue_in_tree(s->first, condition)) return nullptr;
    NODE* value = find_expr_init(condition, loop);
    if (!value || value->op == ICON) return value;
    const bool holds = is_implied_around(value, loop);
    erase_tree(value);
    return holds ? mk_ICON(INT65(1), tp->int_t) : nullptr;
}

struct REPLICATION {
    struct LOOP* loop;
    BBLK *body, *exit;
    NODE* decided; // what the first test is, if that is known; owned
};

// What is tested for truth is compared with 0: a variable, or one behind a step, n + 1, which is n != -1.
void compare_with_zero(NODE* test) {
    NODE* value = test->left;
    if (!value->type->is_int() || value->type->is_bool() ||
        (value->op != NAME && value->op != PLUS && value->op != MINUS))
        return;
    TYPE* type = value->type->stqs();
    NODE* t = value->op == NAME ? maketree(NEQ, value, mk_ICON(INT65(0), type), tp->int_t)
                                : simp_tree(maketree(NEQ, value, mk_ICON(INT65(0), type), tp->int_t), nullptr);
    test->left = t;
}

bool is_replicable(struct LOOP* loop, REPLICATION* r) {
    if (has_shape(loop)) compare_with_zero(loop->head->branch());
    if (!has_shape(loop) || !staying_side(loop->head->branch()->left, loop)) return false;
    const NODE* targets = loop->head->branch()->right;
    BBLK *yes = targets->left->lbl->bblock, *no = targets->right->lbl->bblock;
    const bool yes_stays = loop_is_subloop_of_loop(yes->loop, loop, true),
               no_stays = loop_is_subloop_of_loop(no->loop, loop, true);
    if (yes_stays == no_stays) return false;
    *r = {loop, yes_stays ? yes : no, yes_stays ? no : yes, decided_first_test(loop)};
    return true;
}

// The tail gets the head's first statement, if that has two, and a copy of its test in place of the branch.
void copy_test_to_tail(const REPLICATION& r) {
    BBLK *head = r.loop->head, *tail = r.loop->tail;
    NODE** side = staying_side(head->branch()->left, r.loop);
    debug_printf("\n\tReplicating WHILE loop test (loop #%d):\n\t%s\n\n", r.loop->uid,
                 tree_to_infix(head->branch()->left).c_str());
    if (head->statements->rest) insert_at_end_of_body(tail, copy_tree(head->statements->first));
    keep_in_temporary(side, r.loop);
    LIST* last = tail->last_statement();
    erase_tree(last->first);
    last->first = copy_tree(head->branch());
    change_successors(tail, {{head, r.body}});
    connect(tail, r.exit);
    edges_were_changed(currfuninfo);
    if (NODE* branch = head->branch(); r.decided) {
        erase_tree(branch->left);
        branch->left = r.decided;
    }
    debug_printf("\n\tNew WHILE loop:\n\n");
}

} // namespace

// First tests are looked at while the graph stands.
bool replicate_while_tests(struct LOOP* root) {
    std::vector<REPLICATION> found;
    keep_symbol_values(true);
    for (struct LOOP* loop : loops_inner_first(root))
        if (REPLICATION r; !loop->is_root() && is_replicable(loop, &r)) found.push_back(r);
    keep_symbol_values(false);
    for (const REPLICATION& r : found) copy_test_to_tail(r);
    return !found.empty();
}
