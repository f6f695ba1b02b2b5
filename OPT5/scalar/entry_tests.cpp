// The first test of a loop, by what is assigned ahead of it.
//
//     i = 0; goto test; body: ... test: if (i < 24) goto body;     loses the jump: the loop is entered at its body
//     i = 0; if (i >= 24) goto behind; body: ...                   loses the test, in a block of its own or not
//     if (i < n) { j = i; if (j < n) ...                           as well: an earlier test decides it
//     end = n > 0 ? p + n : p; if (p != end)                       asks n > 0, and `end` is p + n
//
// Earlier in the pipeline this would leave loops with two entries, or a body behind no test at all; here only the
// layout is left to do.
//
// Needs: block numbers, which are layout positions here; alias marks and live variables where there is a test. Leaves:
// unreachable blocks for `rebuildcfg`.
// Sound because the condition is taken back over assignments of what is computed of constants and such variables as
// only their NAMEs reach, to variables of that kind; a statement in between that names one of them in any other form
// ends the search. A limit that is chosen by a condition may be computed without it where the value for the other
// outcome is not read. A promise of iterations is about the loop whose label follows in the text, so behind one only
// what is next in the text may be entered; where it says that there is an iteration, nothing asks.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <cstdlib>
#include <optional>
#include <vector>

namespace {

constexpr int MAX_TEST_NODES = 12, MAX_VALUE_NODES = 12, MAX_BLOCKS_BACK = 4;
constexpr size_t MAX_TAIL = 16; // statements looked at for values

// The IF at the end of a block, if it is a test that can be asked; null otherwise.
NODE* test_of(const BBLK* bb) {
    if (bb->is_in_LIR_form()) return nullptr;
    NODE* test = bb->branch();
    if (!test || test->op != IF || test->left->op == ENDLOOP || tree_has_side_effects(test->left)) return nullptr;
    return count_nodes_in_tree(test->left) <= MAX_TEST_NODES ? test : nullptr;
}

bool promises_an_iteration(const BBLK* bb) {
    for (const LIST* s = bb->statements; s; s = s->rest) {
        const PRAGMA* p = s->first->op == PPRAGMA ? s->first->pragma : nullptr;
        if (p && p->kind == PRG_MUST_ITERATE && !p->args.empty() && std::strtoll(p->args[0].c_str(), nullptr, 10) > 0)
            return true;
    }
    return false;
}

// ---- What was assigned

// The statements that lead to a place, the last first.
using TAIL = std::vector<LIST*>;

void add_statements(const BBLK* bb, TAIL* tail) {
    TAIL list;
    for (LIST* s = bb->statements; s; s = s->rest) list.push_back(s);
    tail->insert(tail->end(), list.rbegin(), list.rend());
}

// Those of `bb`, without its control statement, and of the blocks that alone lead to it.
TAIL statements_ahead(const BBLK* bb) {
    TAIL tail;
    add_statements(bb, &tail);
    tail.erase(tail.begin());
    for (int n = 0; n < MAX_BLOCKS_BACK && bb != currfuninfo->bb_list; ++n) {
        const EDGE* only = bb->predecessors;
        if (!only || only->rest || only->first == bb || only->first->is_in_LIR_form()) break;
        bb = only->first;
        add_statements(bb, &tail);
    }
    return tail;
}

bool is_known_computation(const NODE* t) {
    switch (t->op) {
    case ICON:
    case FCON: return true;
    case NAME: return is_private_name(t);
    case PLUS:
    case MINUS:
    case MULT:
    case SLL:
    case SRL: return is_known_computation(t->left) && is_known_computation(t->right);
    case SCONV:
    case PCONV:
    case PMCONV: return is_known_computation(t->left);
    default:
        if (op_is_int_compare(t->op)) return is_known_computation(t->left) && is_known_computation(t->right);
        return t->type->is_pointer() && pointer_is_an_adcon(t);
    }
}

// Another statement that names a variable of the tree: it is not known what it makes of that. One that names none
// leaves those alone that are reached by their NAMEs only.
bool names_a_variable_of(NODE* tree, const NODE* t) {
    if (t->op == IF && !tree_has_side_effects(t->left)) return false;
    bool names = tree_contains_op(t, ASM) || tree_is_arg_prolog(t);
    for_each_node(tree, [&](const NODE* n) { names |= n->op == NAME && sym_appears_in_tree(n->u.sym, t); });
    return names;
}

bool is_private_assignment(const NODE* t) { return t->op == ASG && !tree_is_arg_prolog(t) && is_private_name(t->left); }

bool gives_value(const NODE* t) {
    return is_private_assignment(t) && count_nodes_in_tree(t->right) <= MAX_VALUE_NODES &&
           is_known_computation(t->right);
}

// limit = condition ? value : other value
bool gives_choice(const NODE* t) {
    if (!is_private_assignment(t) || t->right->op != QUEST) return false;
    const NODE *c = t->right->left, *values = t->right->right;
    return is_known_computation(c) && is_known_computation(values->left) && is_known_computation(values->right);
}

NODE* with_value(NODE* tree, const SYMTAB* sym, const NODE* value) {
    tree = rewrite_tree(tree, [=](NODE* n) {
        if (n->op != NAME || n->u.sym != sym) return n;
        NODE* known = coerce_to_type(n->type->stqs(), copy_tree(value));
        erase_tree(n);
        return known;
    });
    return simp_tree(tree, nullptr);
}

// Trees as they are at some place in a tail, which is walked backward. Owned.
class TAKEN_BACK {
public:
    TAKEN_BACK(const TAIL& statements, size_t from, std::vector<NODE*> copies)
        : trees(std::move(copies)), at(from), tail(statements) {
        for (const size_t end = std::min(tail.size(), from + MAX_TAIL); at < end && take(tail[at]->first); ++at) {
        }
    }
    ~TAKEN_BACK() {
        for (NODE* t : trees) erase_tree(t);
    }
    TAKEN_BACK(const TAKEN_BACK&) = delete;
    TAKEN_BACK& operator=(const TAKEN_BACK&) = delete;

    std::vector<NODE*> trees;
    size_t at; // the first statement of the tail that they are not taken back over

private:
    bool take(const NODE* t) {
        if (t->op == BRANCH || t->op == PPRAGMA) return true;
        const bool is_named =
            std::any_of(trees.begin(), trees.end(), [t](NODE* tree) { return names_a_variable_of(tree, t); });
        if (!is_named) return true;
        if (!gives_value(t)) return false;
        for (NODE*& tree : trees) tree = with_value(tree, t->left->u.sym, t->right);
        return true;
    }
    const TAIL& tail;
};

std::optional<bool> constant_truth(const NODE* t) {
    if (t->op != ICON) return std::nullopt;
    return !t->u.lval.is_zero();
}

BBLK* target_of(const NODE* test, bool outcome) {
    return (outcome ? test->right->left : test->right->right)->lbl->bblock;
}

// ---- The tests

class ENTRY_TESTS {
public:
    bool run() {
        bool changed = false;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            NODE* test = test_of(bb);
            if (test) changed |= bb->statements->rest ? decide_at_end(bb, test) : skip(bb, test);
        }
        return changed;
    }

private:
    // A test alone in its block: those who come to it by a jump.
    bool skip(BBLK* bb, NODE* test) {
        std::vector<BBLK*> from;
        for (const EDGE* e = bb->predecessors; e; e = e->rest)
            if (e->first->dfn < bb->dfn && e->first->branch() && e->first->branch()->op == BRANCH)
                from.push_back(e->first);
        bool changed = false;
        for (BBLK* before : from) {
            TAIL tail = statements_ahead(before);
            const auto outcome = constant_truth(TAKEN_BACK(tail, 0, {copy_tree(test->left)}).trees.front());
            if (!outcome) continue;
            BBLK* target = target_of(test, *outcome);
            if (target == bb || (ends_in_promise(before) && target != before->dflink)) continue;
            const bool is_only_way = !bb->predecessors->rest;
            if (is_only_way && !decide(bb, target)) continue;
            if (!is_only_way && !may_enter_at(before, bb, test)) continue;
            if (!is_only_way) redirect(before, bb, target);
            changed = true;
            if (is_only_way) break;
        }
        return changed;
    }

    // Into a loop that its first test may leave: else it would have two entries.
    bool may_enter_at(const BBLK* before, const BBLK* bb, const NODE* test) const {
        const NATURAL_LOOP* loop = loops.around(bb);
        return !loop || loops.contains(loop, before) || !loops.contains(loop, target_of(test, false)) ||
               !loops.contains(loop, target_of(test, true));
    }

    // A test behind statements of its block.
    bool decide_at_end(BBLK* bb, NODE* test) {
        const TAIL tail = statements_ahead(bb);
        simplify_choice(bb, test, tail);
        std::optional<bool> outcome = outcome_at_end(bb, test, tail);
        if (!outcome) return false;
        BBLK* target = target_of(test, *outcome);
        if (target != bb->dflink) drop_promises_in(bb);
        return !(ends_in_promise(bb) && target != bb->dflink) && decide(bb, target);
    }

    std::optional<bool> outcome_at_end(BBLK* bb, const NODE* test, const TAIL& tail) {
        if (promises_an_iteration(bb))
            for (const bool outcome : {true, false})
                if (target_of(test, outcome) == bb->dflink && enters_loop(bb, bb->dflink)) return outcome;
        const TAKEN_BACK condition(tail, 0, {copy_tree(test->left)});
        if (const auto outcome = constant_truth(condition.trees.front())) return outcome;
        return outcome_by_tests(bb, test);
    }

    bool enters_loop(const BBLK* from, const BBLK* to) const {
        const NATURAL_LOOP* loop = loops.around(to);
        return loop && loop->header == to && !loops.contains(loop, from);
    }

    // What earlier tests say of the condition as it is at the start of the block.
    std::optional<bool> outcome_by_tests(BBLK* bb, const NODE* test) {
        TAIL own;
        add_statements(bb, &own);
        const TAKEN_BACK condition(own, 1, {copy_tree(test->left)});
        if (condition.at < own.size() || !bb->predecessors) return std::nullopt;
        // The values of variables are those at the start; what else it reads must not have changed either.
        if (!outcomes.ask_for(condition.trees.front()) || outcomes.first_that_may_change(bb)) return std::nullopt;
        std::vector<DECIDED_EDGE> edges;
        if (!find_outcomes(outcomes, bb, &edges)) return std::nullopt;
        for (const DECIDED_EDGE& edge : edges)
            if (edge.outcome != edges.front().outcome) return std::nullopt;
        return edges.front().outcome;
    }

    // Where the limit's other value ends the loop at once, and the one that is chosen does not, the condition of the
    // choice is the test's.
    void simplify_choice(BBLK* bb, NODE* test, const TAIL& tail) {
        const TAKEN_BACK condition(tail, 0, {copy_tree(test->left)});
        if (condition.at == tail.size() || !is_in(tail[condition.at], bb)) return;
        LIST* cell = tail[condition.at];
        if (!gives_choice(cell->first)) return;
        const SYMTAB* limit = cell->first->left->u.sym;
        NODE *choice = cell->first->right, *values = choice->right, *tested = condition.trees.front();
        const TAKEN_BACK known(tail, condition.at + 1,
                               {with_value(copy_tree(tested), limit, values->left),
                                with_value(copy_tree(tested), limit, values->right), copy_tree(choice->left)});
        const auto otherwise = constant_truth(known.trees[1]);
        if (!otherwise) return;
        if (!differs_if_chosen(tested, limit, *otherwise) &&
            pred_implies(known.trees[2], known.trees[0]) != !*otherwise)
            return;
        if (is_changed_before(choice->left, tail, condition.at) || is_live_into(limit, target_of(test, *otherwise)))
            return;
        test->left = erased_for(test->left, *otherwise ? mk_EXCLAIM(copy_tree(choice->left)) : copy_tree(choice->left));
        cell->first->right = erased_for(choice, coerce_to_type(limit->type->stqs(), copy_tree(values->left)));
        outcomes.refresh(bb);
    }

    // The test asks whether a variable that has the limit's second value is the limit.
    static bool differs_if_chosen(const NODE* tested, const SYMTAB* limit, bool if_second) {
        if (!limit->is_loop_limit || (tested->op != EQ && tested->op != NEQ) || if_second != (tested->op == EQ))
            return false;
        return (tested->left->op == NAME && tested->left->u.sym == limit) ||
               (tested->right->op == NAME && tested->right->u.sym == limit);
    }

    static NODE* erased_for(NODE* old, NODE* replacement) {
        erase_tree(old);
        return simp_tree(replacement, nullptr);
    }

    static bool is_in(const LIST* cell, const BBLK* bb) {
        for (const LIST* s = bb->statements; s; s = s->rest)
            if (s == cell) return true;
        return false;
    }

    static std::optional<bool> pred_implies(const NODE* p, const NODE* q) {
        if (q->op == ICON) return constant_truth(q);
        const int known = pred_implies_pred(p, true, q);
        return known < 0 ? std::nullopt : std::optional<bool>(known != 0);
    }

    // By one of the first `count` statements of the tail.
    static bool is_changed_before(NODE* condition, const TAIL& tail, size_t count) {
        return std::any_of(tail.begin(), tail.begin() + static_cast<std::ptrdiff_t>(count), [&](const LIST* s) {
            if (is_private_assignment(s->first) && !tree_has_side_effects(s->first->right))
                return sym_appears_in_tree(s->first->left->u.sym, condition);
            return s->first->op != PPRAGMA && names_a_variable_of(condition, s->first);
        });
    }

    static bool is_live_into(const SYMTAB* sym, const BBLK* bb) {
        const int n = live_index(sym);
        return n < 0 || !live_at_entry_is_known(bb) || is_live_at_entry(bb, n);
    }

    // The edge that is removed must not have been the only one into its target.
    bool decide(BBLK* bb, BBLK* target) {
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (e->first != target && !e->first->predecessors->rest) return false;
        make_branch(bb, bb->last_statement(), target);
        outcomes.refresh(bb);
        return true;
    }

    static void redirect(BBLK* before, BBLK* bb, BBLK* target) {
        subst_bb_for_bb_in_bb(target, bb, before);
        disconnect(before, bb);
        connect(before, target);
    }

    const NATURAL_LOOPS& loops = *currfuninfo->loops; // of the graph as it was
    TEST_OUTCOMES outcomes;
};

} // namespace

bool skip_decided_entry_tests() {
    need(fact::alias_marks | fact::live_variables | fact::loops);
    return ENTRY_TESTS().run();
}
