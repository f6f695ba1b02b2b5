// Assignments whose value nothing reads are taken out, in SSA form: of a private variable, by its definitions.
//
// What the program does are the roots: every statement but an assignment of a whole private variable without effects.
// From there uses lead to definitions, phis to their arguments, a may-definition to the definition before it and to the
// tree that it stands on. An assignment that is not reached leaves the effects of its value.
//
// Needs: SSA form, alias marks. Leaves: both; the hierarchy of loops as it was.
// Sound because every read that is wrapped names its definition, and a variable with a bare read keeps all of its
// definitions: one whose address is taken, one that a tree of the hierarchy names, which is not in the form, one that a
// call may leave by an exception before it is assigned. `y = a * 2; x = f(y)` with x dead: the call stays, so y does.
#include "OPT5/dd/ssa.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

#include <unordered_set>
#include <vector>

namespace {

class PURGE {
public:
    void run() {
        find_kept();
        find_roots();
        while (!work.empty()) {
            NODE* definition = work.back();
            work.pop_back();
            follow(definition);
        }
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) sweep(bb);
        if (has_changed) changed(fact::graph | fact::alias_marks);
    }

private:
    struct CANDIDATE {
        NODE* tree;
        bool is_live;
    };

    // ---- Variables that are read by other than SSA_USEs

    void find_kept() {
        for (struct LOOP* loop : loops_outer_first(loop_root())) {
            keep(loop->trips);
            for (const auto& iv : loop->IVs) {
                for (const NODE* t : {iv->init, iv->last, iv->incrtree, iv->norm, iv->virtualInit}) keep(t);
                for (const NODE* t : iv->entryGivens) keep(t);
            }
            for (const NODE* t : loop->givens) keep(t);
        }
        for (const NODE* t : currfuninfo->givens) keep(t);
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest) {
                if (!tree_is_arg_prolog(s->first)) keep(s->first);
                if (!s->rest || !tree_is_EH_SWITCH(s->rest->first)) continue;
                for_each_written_name(s->first, [this](const NODE* name, const NODE*) { kept.insert(name->u.sym); });
            }
    }

    // `wrapped`: the object of the operator around.
    void keep(const NODE* t, const SYMTAB* wrapped = nullptr) {
        for (; t; t = t->left) {
            if (t->op == NAME) {
                if (t->u.sym != wrapped) kept.insert(t->u.sym);
                return;
            }
            if (t->op == SSA_DEF) {
                keep(t->left->right);
                keep(t->left->left, ssa_variable(t)->sym);
                return;
            }
            if (op_is_SSA(t->op)) wrapped = t->op == SSA_USE ? ssa_variable(t)->sym : nullptr;
            keep(t->right);
        }
    }

    // ---- What is reached

    // The assignment of a statement that may go.
    const NODE* removable(const NODE* t) const {
        while (t->op == SSA_CHI || t->op == SSA_MU) t = t->left;
        if (t->op != SSA_DEF || tree_is_arg_prolog(t->left)) return nullptr;
        const SSAVAR* v = ssa_variable(t);
        if (!v->sym || v->has(SSAVAR_munged) || v->is_memory() || kept.count(v->sym)) return nullptr;
        if (!only_its_name_reaches(v->sym) || lvalue_is_volatile(v->tree)) return nullptr;
        const NODE* asg = t->left;
        const bool returns_structure = asg->op != ASG && asg->right && !asg->right->type->is_scalar();
        if (returns_structure && tree_has_side_effects(asg->right)) return nullptr; // the call needs the place
        return asg;
    }

    void find_roots() {
        reached.resize(ssa_definitions().size(), false);
        of_version.resize(ssa_definitions().size(), -1);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) {
                if (s->first->op == SSA_PHI) continue;
                const NODE* asg = removable(s->first);
                if (!asg) {
                    mark(s->first);
                    continue;
                }
                for (NODE* t = s->first; t != asg; t = t->left)
                    if (op_is_SSA_definition(t->op)) of_version[ssa_version(t)] = static_cast<int>(candidates.size());
                candidates.push_back({s->first, false});
                if (asg->right && tree_has_side_effects(asg->right)) {
                    NODE* effects = peel_for_effect(copy_tree(asg->right));
                    mark(effects);
                    if (effects) erase_tree(effects);
                }
            }
    }

    void mark(NODE* t) {
        for_each_SSA_operator(t, [this](NODE* n) {
            if (n->op == SSA_USE || n->op == SSA_MU) reach(ssa_reach(n));
        });
    }

    void reach(NODE* definition) {
        if (!definition || reached[ssa_version(definition)]) return;
        reached[ssa_version(definition)] = true;
        work.push_back(definition);
    }

    void follow(NODE* def) {
        OPT_ASSERT(def->op == SSA_DEF || def->op == SSA_PHI || def->op == SSA_CHI);
        if (def->op == SSA_PHI) {
            for (const SSA_ARG& arg : ssa_args(def)) reach(arg.definition);
            return;
        }
        if (def->op == SSA_CHI) reach(ssa_reach(def));
        const int at = of_version[ssa_version(def)];
        if (at < 0 || candidates[static_cast<size_t>(at)].is_live) return;
        candidates[static_cast<size_t>(at)].is_live = true;
        mark(candidates[static_cast<size_t>(at)].tree);
    }

    // ---- Removal

    bool is_dead(const NODE* t) const {
        if (t->op == SSA_PHI) return !reached[ssa_version(t)];
        while (t->op == SSA_CHI || t->op == SSA_MU) t = t->left;
        if (t->op != SSA_DEF) return false;
        const int at = of_version[ssa_version(t)];
        return at >= 0 && !candidates[static_cast<size_t>(at)].is_live;
    }

    void sweep(BBLK* bb) {
        bool shortened = false;
        for (LIST** link = &bb->statements; *link;) {
            LIST* s = *link;
            if (is_dead(s->first)) {
                s->first = s->first->op == SSA_PHI ? without_phi(s->first) : effects_of(s, bb);
                if (!s->first) {
                    drop_statement(link);
                    continue;
                }
                shortened = true;
                note_changed_statement(s);
            }
            s->first = without_dead_chis(s->first);
            link = &s->rest;
        }
        if (shortened) promote_toplevel_COMMAOPs_in_list(bb->statements);
    }

    static void forget(const NODE* definition) { ssa_definitions()[ssa_version(definition)].node = nullptr; }

    static NODE* without_phi(NODE* phi) {
        forget(phi);
        erase_tree(phi);
        return nullptr;
    }

    NODE* effects_of(const LIST* s, const BBLK* bb) {
        has_changed = true;
        NODE* t = s->first;
        if (print_debug)
            debug_printf("\nPurging dead subtree at line %ld in BB%d:\n\t%s\n", s->psn ? s->psn->line : 0L, bb->dfn,
                         stmt2infix(t).c_str());
        NODE* asg = t;
        for (; op_is_SSA(asg->op); asg = asg->left)
            if (op_is_SSA_definition(asg->op)) forget(asg);
        NODE* value = asg->right;
        asg->right = nullptr;
        erase_tree(t);
        NODE* tree = value ? peel_for_effect(value) : nullptr;
        OPT_ASSERT(!tree || (tree->op != SSA_DEF));
        return tree;
    }

    // Nothing reads what they define; what they say came before may have gone.
    NODE* without_dead_chis(NODE* t) {
        for (NODE** place = &t; *place;) {
            NODE* n = *place;
            if (n->op == SSA_CHI && !reached[ssa_version(n)]) {
                forget(n);
                *place = n->left;
                erase_node(n);
                continue;
            }
            if (n->right) n->right = without_dead_chis(n->right);
            place = &n->left;
        }
        return t;
    }

    std::unordered_set<const SYMTAB*> kept; // looked up alone
    std::vector<bool> reached;              // by version
    std::vector<int> of_version;            // the candidate that the definition is of, or -1
    std::vector<CANDIDATE> candidates;
    std::vector<NODE*> work; // definitions
    bool has_changed = false;
};

} // namespace

void eliminate_dead_SSA_assignments() {
    if (!function_is_in_SSA_form) return;
    if (print_debug) debug_printf("\n\n\t\t\t------- ENTERING 'elim_dead_SSA_assignments' -------\n");
    PURGE().run();
}
