// An assertion on a local copy holds of the value that was copied: `x = n; NASSERT(x > 0)` also says n > 0.
//
// Needs: SSA form. Leaves: it, with assertions behind those that were there.
// Sound because n is an unchanging variable with a single definition, the one that the copy read: since the copy
// dominates the assertion, no other execution of that definition can lie between.
#include "OPT5/dd/ssa.h"

#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"

#include <vector>

namespace {

class CLONING {
public:
    void run() {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest)
                if (is_about_values(s->first)) s = assertion(s);
    }

private:
    static bool is_about_values(const NODE* t) { // not a mark of a variable
        return t->op == NASSERT && t->left && t->left->op != ICALL && !tree_has_side_effects(t->left);
    }

    // The last of the assertions that stand for it now.
    LIST* assertion(LIST* s) {
        std::vector<const NODE*> uses;
        for_each_node(s->first->left, [&uses](const NODE* t) {
            if (t->op == SSA_USE) uses.push_back(t);
        });
        LIST* last = s;
        for (const NODE* use : uses)
            if (const NODE* source = copied(use)) {
                NODE* clone = with_source(copy_tree(s->first), use, source);
                if (is_known(s, clone->left))
                    erase_tree(clone);
                else {
                    last = insert_behind(last, clone, s->psn);
                    changed(fact::graph | fact::alias_marks);
                }
            }
        return last;
    }

    // What the definition of the NAME that is used copies, if an assertion on it is sound.
    const NODE* copied(const NODE* use) {
        if (use->left->op != NAME || ssa_variable(use)->is_memory() || !ssa_reach(use)) return nullptr;
        const NODE* asg = ssa_assignment(ssa_reach(use));
        if (!asg || asg->op != ASG || tree_is_arg_prolog(asg)) return nullptr;
        const NODE* y = asg->right;
        if (!compatible_types(y->type, use->type, true)) return nullptr;
        const NODE* name = y->op == SSA_USE ? y->left : y;
        if (name->op != NAME || name->u.sym->level == 1 || !name->u.sym->type->is_const()) return nullptr;
        if (y->op == NAME) return expr_is_constant(y) ? y : nullptr;
        const SSAVAR* v = ssa_variable(y);
        if (!v->has(SSAVAR_likely_register) || v->is_memory() || v->has(SSAVAR_munged | SSAVAR_unioned)) return nullptr;
        return has_one_definition(v, ssa_reach(y)) ? y : nullptr;
    }

    bool has_one_definition(const SSAVAR* v, const NODE* definition) {
        if (definitions.empty()) {
            definitions.resize(ssa_variables().size(), 0);
            for (const SSA_DEFINITION& d : ssa_definitions())
                if (d.node) ++definitions[ssa_variable(d.node)->uid];
        }
        return definitions[v->uid] == (definition ? 1 : 0);
    }

    static NODE* with_source(NODE* clone, const NODE* use, const NODE* source) {
        return rewrite_tree(clone, [&](NODE* t) {
            if (t->op != SSA_USE || !trees_are_congruent(t, use, false)) return t;
            NODE* y = copy_tree(source);
            erase_tree(t);
            return y;
        });
    }

    static bool is_known(const LIST* s, const NODE* condition) {
        for (; s && s->first->op == NASSERT; s = s->rest)
            if (trees_are_congruent(s->first->left, condition, false)) return true;
        return false;
    }

    std::vector<int> definitions; // by variable
};

} // namespace

void clone_SSA_NASSERTs() {
    if (!function_is_in_SSA_form || !currfuninfo->has_nasserts) return;
    if (print_debug) debug_printf("\n\n\t\t\t--------- ENTERING 'clone_SSA_NASSERTs' ---------\n");
    CLONING().run();
}
