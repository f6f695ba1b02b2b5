// The first test of a loop, decided by what its counters start from.
//
//     i = 0; goto test; body: ... test: if (i < 24) goto body;     loses the jump: the loop is entered at its body
//     i = 0; if (i >= 24) goto behind; body: ...                   loses the test, in a block of its own or not
//
// Earlier in the pipeline this would leave loops with two entries, or a body behind no test at all; here only the
// layout is left to do.
//
// Needs: block numbers, which are layout positions here, and alias marks.
// Leaves: unreachable blocks, which `rebuildcfg` removes.
// Sound because the condition becomes a constant by values that the block in front assigns to variables that only their
// NAMEs reach, as constants and such variables; a statement in between that names one of them in any other form ends
// the search. A pragma that promises iterations speaks of the loop whose label follows it in the text, so that a block
// which ends in one may only lead to the next block of the text.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"

#include <vector>

namespace {

constexpr int MAX_TEST_NODES = 12, MAX_VALUE_NODES = 8;
constexpr size_t MAX_TAIL = 12; // statements looked at for constants

// The IF at the end of a block, if it is a test that can be asked; null otherwise.
NODE* test_of(const BBLK* bb) {
    if (bb->is_in_LIR_form()) return nullptr;
    NODE* test = bb->branch();
    if (!test || test->op != IF || test->left->op == ENDLOOP || tree_has_side_effects(test->left)) return nullptr;
    return count_nodes_in_tree(test->left) <= MAX_TEST_NODES ? test : nullptr;
}

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
    bool skip(BBLK* bb, NODE* test) {
        std::vector<BBLK*> from;
        for (const EDGE* e = bb->predecessors; e; e = e->rest)
            if (e->first->dfn < bb->dfn && e->first->branch() && e->first->branch()->op == BRANCH)
                from.push_back(e->first);
        bool changed = false;
        for (BBLK* before : from) {
            BBLK* target = decided_target(statements_of(before), test);
            if (!target || target == bb) continue;
            if (ends_in_promise(before) && target != before->dflink) continue;
            const bool is_only_way = !bb->predecessors->rest;
            if (is_only_way && !decide(bb, target)) continue;
            if (!is_only_way) redirect(before, bb, target);
            changed = true;
            if (is_only_way) break;
        }
        return changed;
    }

    bool decide_at_end(BBLK* bb, const NODE* test) {
        std::vector<const NODE*> ahead = statements_of(bb);
        ahead.pop_back();
        BBLK* target = decided_target(ahead, test);
        return target && !(ends_in_promise(bb) && target != bb->dflink) && decide(bb, target);
    }

    static std::vector<const NODE*> statements_of(const BBLK* bb) {
        std::vector<const NODE*> list;
        for (const LIST* s = bb->statements; s; s = s->rest) list.push_back(s->first);
        return list;
    }

    // Where the test leads behind what the statements assign last; null if that is not known.
    BBLK* decided_target(const std::vector<const NODE*>& tail, const NODE* test) {
        NODE* condition = copy_tree(test->left);
        for (size_t n = 0; n < tail.size() && n < MAX_TAIL && condition->op != ICON; ++n) {
            const NODE* t = tail[tail.size() - 1 - n];
            if (t->op == BRANCH || t->op == PPRAGMA || !names_a_variable_of(condition, t)) continue;
            if (!gives_value(t)) break;
            condition = simp_tree(with_value(condition, t->left->u.sym, t->right), nullptr);
        }
        const NODE* targets = test->right;
        BBLK* target = nullptr;
        if (condition->op == ICON) target = (condition->u.lval.is_zero() ? targets->right : targets->left)->lbl->bblock;
        erase_tree(condition);
        return target;
    }

    // Of another statement that names a variable of the condition it is not known what it makes of that; one that names
    // none leaves those alone that are reached by their NAMEs only.
    static bool names_a_variable_of(NODE* condition, const NODE* t) {
        bool names = tree_contains_op(t, ASM) || tree_is_arg_prolog(t);
        for_each_node(condition, [&](const NODE* n) { names |= n->op == NAME && sym_appears_in_tree(n->u.sym, t); });
        return names;
    }

    // A variable is given what is computed of constants and variables that only their NAMEs reach.
    bool gives_value(const NODE* t) {
        if (t->op != ASG || tree_is_arg_prolog(t)) return false;
        need(fact::alias_marks);
        return is_private_name(t->left) && count_nodes_in_tree(t->right) <= MAX_VALUE_NODES &&
               is_known_computation(t->right);
    }

    static bool is_known_computation(const NODE* t) {
        switch (t->op) {
        case ICON: return true;
        case NAME: return is_private_name(t);
        case PLUS:
        case MINUS: return is_known_computation(t->left) && is_known_computation(t->right);
        case SCONV:
        case PCONV: return is_known_computation(t->left);
        default: return t->type->is_pointer() && pointer_is_an_adcon(t);
        }
    }

    static NODE* with_value(NODE* tree, const SYMTAB* sym, const NODE* value) {
        return rewrite_tree(tree, [=](NODE* n) {
            if (n->op != NAME || n->u.sym != sym) return n;
            NODE* known = coerce_to_type(n->type->stqs(), copy_tree(value));
            erase_tree(n);
            return known;
        });
    }

    // The block has one predecessor. The edge that is removed must not have been the only one into its target.
    static bool decide(BBLK* bb, BBLK* target) {
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (e->first != target && !e->first->predecessors->rest) return false;
        make_branch(bb, bb->last_statement(), target);
        return true;
    }

    static void redirect(BBLK* before, BBLK* bb, BBLK* target) {
        subst_bb_for_bb_in_bb(target, bb, before);
        disconnect(before, bb);
        connect(before, target);
    }
};

} // namespace

bool skip_decided_entry_tests() { return ENTRY_TESTS().run(); }
