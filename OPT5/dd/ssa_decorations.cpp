// Definitions that carry facts, for as long as SSA form needs them.
//
// x = def$assert((x, IDENTITY(c))) gives x the value that it has, and a version of which c is known: in each arm of a
// test of c, and behind an assertion of it. g = def$entry(g) is the definition that reaches what reads a global first.
//
// Leaves: what there was; the statements are taken out again by `remove_SSA_decoration_trees`.
// Sound because they assign to a variable what it holds.
#include "OPT5/alias/effects.h"
#include "OPT5/dd/ssa.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

#include <unordered_set>
#include <vector>

namespace {

constexpr char DEF_ASSERT[] = "def$assert", DEF_ENTRY[] = "def$entry";

bool has_decorated_type(const NODE* lvalue) { return scalar_analysis_IV_candidate(lvalue); }

// The only lvalue of a condition that is computed without effects, or null.
const NODE* only_lvalue(const NODE* condition) {
    const NODE* found = nullptr;
    int count = 0;
    const bool is_plain = !any_subtree(condition, [&](const NODE* t) {
        if (op_has_effect(t->op) || op_is_call(t->op) || op_is_intrinsic(t->op) || t->op == UAND) return true;
        if (op_is_lvalue(t->op)) {
            ++count;
            found = t;
        }
        return false;
    });
    return is_plain && count == 1 && found->op == NAME && has_decorated_type(found) ? found : nullptr;
}

NODE* make_assertion(const NODE* x, NODE* condition) {
    NODE* known = maketree(IDENTITY, condition, nullptr, condition->type, condition->ls);
    NODE* fact = maketree(COMMA, copy_tree(x), known, x->type->stqs(), x->ls);
    return mk_ASG(copy_tree(x), mk_ICALL(DEF_ASSERT, fact, x->type->stqs()));
}

void decorate_arms(BBLK* bb) {
    const NODE* control = bb->branch();
    if (!control || control->op != IF) return;
    const NODE* x = only_lvalue(control->left);
    if (!x) return;
    bool sense = true;
    std::vector<BBLK*> arms;
    for_each_branch_target(const_cast<NODE*>(control), [&](NODE* label) { arms.push_back(label->lbl->bblock); });
    if (arms.size() != 2 || arms[0] == arms[1]) return;
    for (BBLK* arm : arms) {
        if (!arm->predecessors->rest) {
            NODE* condition = copy_tree(control->left);
            if (!sense) condition = invert_boolean_tree(condition);
            insert_before(&arm->statements, make_assertion(x, condition), arm->first_psn);
        }
        sense = false;
    }
}

void decorate_statements(BBLK* bb) {
    for (LIST* s = bb->statements; s; s = s->rest) {
        const NODE* t = s->first;
        if (t->op != ASSERT && t->op != NASSERT) continue;
        const NODE* condition = t->left && t->left->op == COMMA ? t->left->left : t->left;
        const NODE* x = condition && boolean_result[condition->op] ? only_lvalue(condition) : nullptr;
        if (x) s = insert_behind(s, make_assertion(x, copy_tree(condition)), s->psn);
    }
}

void decorate_entry() {
    std::vector<const NODE*> globals;
    std::unordered_set<const SYMTAB*> seen;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest)
            for_each_subtree(static_cast<const NODE*>(s->first), [&](const NODE* t) {
                const NODE* name = name_accessed(t);
                if (!name || !name->u.sym || name->u.sym->level != 0 || !has_decorated_type(t)) return;
                if (!compatible_types(name->u.sym->type, t->type, true) || lvalue_is_volatile(name)) return;
                if (seen.insert(name->u.sym).second) globals.push_back(t);
            });
    BBLK* entry = currfuninfo->bb_list;
    LIST** link = &entry->statements;
    if (stmt_is_arg_prolog(*link)) link = &(*link)->rest;
    for (const NODE* g : globals) {
        NODE* t = mk_ASG(copy_tree(g), mk_ICALL(DEF_ENTRY, copy_tree(g), g->type->stqs()));
        link = insert_before(link, t, entry->first_psn);
    }
}

bool is_decoration(const NODE* t) {
    t = below_SSA(t);
    if (!t || t->op != ASG || !t->right || t->right->op != ICALL) return false;
    return is_def_entry_ICALL_tree(t->right) ||
           (is_def_assert_ICALL_tree(t->right) && t->right->left && below_SSA(t->right->left)->op == COMMA);
}

} // namespace

void insert_SSA_decoration_trees() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) decorate_statements(bb);
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) decorate_arms(bb);
    decorate_entry();
}

void remove_SSA_decoration_trees() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link;)
            if (is_decoration((*link)->first))
                drop_statement(link);
            else
                link = &(*link)->rest;
}
