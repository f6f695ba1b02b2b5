// Tests that an earlier one decides.
//
// A condition q at the end of a block is decided on an edge behind an earlier IF on p if the side of p that leads there
// implies q or its opposite; it is decided as well behind an assignment of a constant to the one variable that q reads.
// Where every edge into the block is decided alike, the test is removed; where a block is nothing but the test, a
// single edge into it is led past it.
//
// Needs: block numbers. Leaves: unreachable blocks, which `rebuildcfg` removes.
// Sound because nothing between the two tests may change what q reads: in `if (*p > 3) { f(); if (*p > 3) ...}` the
// call may. No edge is led past the head of a loop: the loop would have a second entry.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>

namespace {

constexpr int MAX_BLOCKS_BACK = 8;
constexpr size_t MAX_STATEMENTS_BACK = 24;
constexpr int MAX_NODES = 32; // of a condition: larger ones are seldom repeated and dear to compare

// ---- Implication

// A truth value without the operators that only pass it on or negate it.
const NODE* bare_condition(const NODE* t, bool* negated) {
    for (;;) {
        if (t->op == EXCLAIM) {
            *negated = !*negated;
            t = t->left;
        } else if ((t->op == EQ || t->op == NEQ) && t->right->op == ICON && t->right->u.lval.is_zero() &&
                   !t->left->type->is_pointer() &&
                   (op_is_int_compare(t->left->op) || op_is_float_compare(t->left->op) || t->left->op == EXCLAIM)) {
            *negated ^= t->op == EQ;
            t = t->left;
        } else
            return t;
    }
}

std::optional<bool> implied_by_values(const NODE* p, bool sense, const NODE* q) {
    const int outcome = outcome_under(p, sense, q, nullptr);
    return outcome < 0 ? std::nullopt : std::optional<bool>(outcome != 0);
}

std::optional<bool> implied(const NODE* p, bool sense, const NODE* q);

std::optional<bool> implied_by_parts(const NODE* p, bool sense, const NODE* q) {
    if (p->op != (sense ? ANDAND : OROR)) return std::nullopt;
    if (auto known = implied(p->left, sense, q)) return known;
    return implied(p->right, sense, q);
}

std::optional<bool> implied_parts(const NODE* p, bool sense, const NODE* q) {
    if (q->op != ANDAND && q->op != OROR) return std::nullopt;
    const bool dominant = q->op == OROR; // the value of one part that settles the whole
    auto left = implied(p, sense, q->left), right = implied(p, sense, q->right);
    if ((left && *left == dominant) || (right && *right == dominant)) return dominant;
    if (left && right) return !dominant;
    return std::nullopt;
}

std::optional<bool> implied(const NODE* p, bool sense, const NODE* q) {
    bool p_negated = false, q_negated = false;
    p = bare_condition(p, &p_negated);
    q = bare_condition(q, &q_negated);
    sense ^= p_negated;
    std::optional<bool> known;
    if (bools_are_congruent(p, q, false, false))
        known = sense;
    else if (bools_are_congruent(p, q, true, false))
        known = !sense;
    if (!known) known = implied_by_parts(p, sense, q);
    if (!known) known = implied_parts(p, sense, q);
    if (!known) known = implied_by_values(p, sense, q);
    if (!known) return known;
    return *known != q_negated;
}

// ---- Constants

// What `q` is behind `asg`, an assignment of a constant to the one variable that it reads.
std::optional<bool> outcome_behind(const NODE* asg, const NODE* q) {
    NODE* t = simp_subst_icon(truncate_to_type(asg->right->u.lval, asg->left->type), asg->left->type->stqs(), asg->left,
                              copy_tree(q));
    std::optional<bool> outcome;
    if (t->op == ICON) outcome = !t->u.lval.is_zero();
    erase_tree(t);
    return outcome;
}

bool assigns_constant(const NODE* t, const SYMTAB* sym) {
    return t->op == ASG && t->left->op == NAME && t->left->u.sym == sym && t->left->type->is_int() &&
           t->right->op == ICON && t->right->type->is_int();
}

} // namespace

// ---- Back along the edges

TEST_OUTCOMES::TEST_OUTCOMES() : blocks(static_cast<size_t>(currfuninfo->bb_count) + 1) {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (!bb->is_in_LIR_form()) refresh(bb);
}

void TEST_OUTCOMES::refresh(BBLK* bb) {
    if (LAST_STATEMENTS* last = last_of(bb)) *last = {bb->last_statement(), {}};
}

TEST_OUTCOMES::LAST_STATEMENTS* TEST_OUTCOMES::last_of(const BBLK* bb) {
    const bool is_known = bb->dfn > 0 && static_cast<size_t>(bb->dfn) < blocks.size();
    return is_known ? &blocks[static_cast<size_t>(bb->dfn)] : nullptr;
}

LIST* TEST_OUTCOMES::control_of(const BBLK* bb) {
    const LAST_STATEMENTS* last = last_of(bb);
    return last ? last->control : nullptr;
}

bool TEST_OUTCOMES::ask_for(NODE* condition) {
    if (count_nodes_in_tree(condition) > MAX_NODES || tree_has_side_effects(condition)) return false;
    q = condition;
    reads = READ_SET(condition);
    variable = reads.only_variable();
    return reads.is_complete();
}

// The statements ahead of the control statement, the last first: all, or as many as are looked at.
const std::vector<const LIST*>& TEST_OUTCOMES::statements_back(const BBLK* bb) {
    std::vector<const LIST*>& list = last_of(bb)->statements;
    if (!list.empty() || !bb->statements->rest) return list;
    for (const LIST* s = bb->statements; s->rest; s = s->rest) list.push_back(s);
    std::reverse(list.begin(), list.end());
    if (list.size() > MAX_STATEMENTS_BACK) list.resize(MAX_STATEMENTS_BACK + 1);
    list.shrink_to_fit();
    return list;
}

// The blocks behind `test`, down to `last`; each is the sole predecessor of the next.
bool TEST_OUTCOMES::may_change_between(const BBLK* test, const BBLK* last) {
    size_t budget = MAX_STATEMENTS_BACK;
    for (const BBLK* bb = last; bb != test; bb = bb->predecessors->first)
        if (block_may_change(bb, &budget) || reads.may_be_changed_by(control_of(bb)->first->left)) return true;
    return false;
}

bool TEST_OUTCOMES::block_may_change(const BBLK* bb, size_t* budget) {
    for (const LIST* s : statements_back(bb)) {
        if (*budget == 0 || reads.may_be_changed_by(s->first)) return true;
        --*budget;
    }
    return false;
}

const LIST* TEST_OUTCOMES::first_that_may_change(const BBLK* bb) {
    size_t statements = 0;
    for (const LIST* s = bb->statements; s && s->rest; s = s->rest)
        if (++statements > MAX_STATEMENTS_BACK || reads.may_be_changed_by(s->first)) return s;
    return nullptr;
}

// Whether the last change to what the condition reads, in `pred` itself, is an assignment of a constant.
const NODE* TEST_OUTCOMES::constant_assignment(const BBLK* pred) {
    if (!variable) return nullptr;
    const NODE* control = control_of(pred)->first;
    if (control->op != BRANCH && (control->op != IF || reads.may_be_changed_by(control->left))) return nullptr;
    const auto& back = statements_back(pred);
    const auto asg =
        std::find_if(back.begin(), back.end(), [this](const LIST* s) { return assigns_constant(s->first, variable); });
    if (asg == back.end()) return nullptr;
    const bool is_last =
        std::none_of(back.begin(), asg, [this](const LIST* s) { return reads.may_be_changed_by(s->first); });
    return is_last ? (*asg)->first : nullptr;
}

std::optional<bool> TEST_OUTCOMES::behind_constant(const BBLK* pred) {
    const NODE* asg = control_of(pred) ? constant_assignment(pred) : nullptr;
    return asg ? outcome_behind(asg, q) : std::nullopt;
}

std::optional<bool> TEST_OUTCOMES::on_edge(const BBLK* pred, const BBLK* bb) {
    const BBLK* const start = pred;
    for (int steps = 0; steps < MAX_BLOCKS_BACK; ++steps) {
        const LIST* control = control_of(pred);
        if (!control) return std::nullopt;
        const NODE* t = control->first;
        if (is_test(t)) {
            const BBLK *on_true = t->right->left->lbl->bblock, *on_false = t->right->right->lbl->bblock;
            const int outcome = on_true == on_false ? -1 : pred_implies_pred(t->left, on_true == bb, q);
            if (outcome >= 0) {
                if (tree_has_side_effects(t->left) || may_change_between(pred, start)) return std::nullopt;
                return outcome != 0;
            }
        } else if (t->op != BRANCH && t->op != SWITCH)
            return std::nullopt;
        bb = pred;
        pred = only_block(bb->predecessors);
        if (!pred) return std::nullopt;
    }
    return std::nullopt;
}

bool is_test(const NODE* t) { return t->op == IF && t->left->op != ENDLOOP; }

bool has_back_edge(const BBLK* bb) {
    for (const EDGE* e = bb->predecessors; e; e = e->rest)
        if (e->first->dfn >= bb->dfn) return true;
    return false;
}

namespace {

// The assignment of a block behind `test` alone that assigns one cheap value and then jumps to `join`, or null.
const NODE* arm_of_select(const BBLK* arm, const BBLK* test, const BBLK* join) {
    if (only_block(arm->predecessors) != test) return nullptr;
    const LIST* s = arm->statements;
    if (!s->rest || s->rest->rest || s->rest->first->op != BRANCH || s->rest->first->left->lbl->bblock != join)
        return nullptr;
    return may_be_arm_of_select(s->first) ? s->first : nullptr;
}

bool is_bounded_by(const NODE* condition, const NODE* assignment) {
    if (!assignment || !(op_is_int_compare(condition->op) || op_is_float_compare(condition->op))) return false;
    return sym_appears_in_tree(assignment->left->u.sym, condition) ||
           trees_are_congruent(assignment->right, condition->right, false);
}

// Whether `bb` ends in a test that bounds a value, `if (x > 9) x = 9;`, or that chooses one of two values for it.
bool ends_in_select(TEST_OUTCOMES& outcomes, const BBLK* bb) {
    const LIST* control = outcomes.control_of(bb);
    if (!control || !is_test(control->first)) return false;
    const NODE *condition = control->first->left, *targets = control->first->right;
    const BBLK *a = targets->left->lbl->bblock, *b = targets->right->lbl->bblock;
    if (is_bounded_by(condition, arm_of_select(a, bb, b)) || is_bounded_by(condition, arm_of_select(b, bb, a)))
        return true;
    const BBLK* join = a->successors ? a->successors->first : nullptr;
    const NODE *x = join ? arm_of_select(a, bb, join) : nullptr, *y = join ? arm_of_select(b, bb, join) : nullptr;
    return x && y && x->left->u.sym == y->left->u.sym;
}

} // namespace

bool joins_selects(TEST_OUTCOMES& outcomes, const BBLK* from, const BBLK* bb) {
    if (!ends_in_select(outcomes, bb)) return false;
    if (ends_in_select(outcomes, from)) return true;
    const EDGE* before = from->predecessors;
    return before && !before->rest && arm_of_select(from, before->first, bb) && ends_in_select(outcomes, before->first);
}

bool find_outcomes(TEST_OUTCOMES& outcomes, const BBLK* bb, std::vector<DECIDED_EDGE>* edges) {
    bool all = true;
    for (const EDGE* e = bb->predecessors; e; e = e->rest) {
        if (static_cast<int>(edges->size()) == MAX_BLOCKS_BACK) return false;
        if (auto outcome = outcomes.behind_constant(e->first))
            edges->push_back({e->first, *outcome, true});
        else if ((outcome = outcomes.on_edge(e->first, bb)))
            edges->push_back({e->first, *outcome, false});
        else
            all = false;
    }
    return all;
}

namespace {

void lead_around(BBLK* pred, BBLK* bb, LIST* control, BBLK* target) {
    subst_bb_for_bb_in_stmts(target, bb, control);
    disconnect(pred, bb);
    connect(pred, target);
}

// Conditions are compared first, since few agree; the statements between two that do are looked at then.
class TEST_REMOVER {
public:
    // The last test first: an edge that is led around one test arrives where those behind it have been left already, so
    // that a row of equal tests is passed in one step.
    bool run() {
        std::vector<BBLK*> blocks;
        for (BBLK* bb = currfuninfo->bb_list->dflink; bb; bb = bb->dflink) blocks.push_back(bb);
        bool changed = false;
        for (auto bb = blocks.rbegin(); bb != blocks.rend(); ++bb)
            if (outcomes.control_of(*bb)) changed |= remove_test(*bb);
        return changed;
    }

private:
    bool remove_test(BBLK* bb) {
        LIST* last = outcomes.control_of(bb);
        NODE* control = last->first;
        if (!is_test(control) || !bb->predecessors || !outcomes.ask_for(control->left)) return false;
        std::vector<DECIDED_EDGE> known;
        const bool all = find_outcomes(outcomes, bb, &known);
        if (known.empty() || outcomes.first_that_may_change(bb) || !rewrite_is_allowed(control)) return false;
        BBLK* targets[2] = {control->right->right->lbl->bblock, control->right->left->lbl->bblock};
        const bool first = known.front().outcome;
        if (all &&
            std::all_of(known.begin(), known.end(), [&](const DECIDED_EDGE& e) { return e.outcome == first; })) {
            make_branch(bb, last, targets[first]);
            outcomes.refresh(bb);
            return true;
        }
        if (last != bb->statements || has_back_edge(bb)) return false;
        bool changed = false;
        for (const DECIDED_EDGE& edge : known) {
            if (edge.by_constant && joins_selects(outcomes, edge.from, bb)) continue;
            lead_around(edge.from, bb, outcomes.control_of(edge.from), targets[edge.outcome]);
            changed = true;
        }
        return changed;
    }

    TEST_OUTCOMES outcomes;
};

} // namespace

int pred_implies_pred(const NODE* p, bool sense, const NODE* q) {
    auto known = implied(p, sense, q);
    return known ? *known : -1;
}

bool remove_redundant_tests() { return opt_level() >= 2 && TEST_REMOVER().run(); }
