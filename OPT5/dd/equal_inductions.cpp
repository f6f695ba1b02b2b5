// Two variables of a loop that start at one value and step together are one.
//
// Needs: loops, live variables and alias marks. Leaves: those, but that what became of the other variable's start is dead.
// Sound because the two are equal wherever either is read: ahead of the loop they were given one value, each has one step,
// by the same amount, in the same block, and nothing between the two steps names either. Behind the loop one of them may be
// read, which is then the one that stays.
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/dd/inductions.h"

#include <utility>

namespace {

class UNION {
public:
    UNION(const NATURAL_LOOPS& all, NATURAL_LOOP* of, LOOP_FACTS& f) : loop(of), facts(f) {
        for (const EDGE* e = loop->header->predecessors; e; e = e->rest)
            if (!all.contains(loop, e->first)) ahead = ahead ? nullptr : e->first;
    }

    bool run() {
        const std::vector<INDUCTION*>& all = facts.all_inductions();
        if (!ahead || all.size() > MOST) return false;
        for (size_t i = 0; i < all.size(); ++i)
            for (size_t k = i + 1; k < all.size(); ++k)
                if (step_together(*all[i], *all[k]) && start_alike(all[i]->sym, all[k]->sym) && unite(*all[i], *all[k]))
                    return true;
        return false;
    }

private:
    static constexpr size_t MOST = 16; // pairs are compared

    static bool step_together(const INDUCTION& a, const INDUCTION& b) {
        if (a.steps.size() != 1 || b.steps.size() != 1) return false;
        const INDUCTION::STEP &s = a.steps.front(), &t = b.steps.front();
        if (s.bb != t.bb || s.by != t.by || !s.amount != !t.amount) return false;
        if (s.amount && !trees_are_congruent(s.amount, t.amount, false)) return false;
        if (!compatible_types(a.sym->type->stqs(), b.sym->type->stqs(), true)) return false;
        bool is_between = false;
        for (const LIST* l = s.bb->statements; l; l = l->rest) {
            if (l->first == s.statement || l->first == t.statement) {
                if (is_between) return true;
                is_between = true;
            } else if (is_between && (sym_appears_in_tree(a.sym, l->first) || sym_appears_in_tree(b.sym, l->first)))
                return false;
        }
        return false;
    }

    struct ASSIGNMENT {
        const LIST* cell = nullptr;
        const NODE* value = nullptr; // null: it is no plain one
    };

    // What the block gives a variable last.
    static ASSIGNMENT last_assignment(const SYMTAB* sym, const BBLK* bb) {
        ASSIGNMENT last;
        for (const LIST* l = bb->statements; l; l = l->rest)
            for_each_written_name(l->first, [&](const NODE* name, const NODE*) {
                if (name->u.sym != sym) return;
                const NODE* t = l->first;
                const bool is_plain = t->op == ASG && t->left == name && !tree_has_side_effects(t->right) &&
                                      !sym_appears_in_tree(sym, t->right);
                last = {l, is_plain ? t->right : nullptr};
            });
        return last;
    }

    // Both are set in one block, ahead of which control comes from nowhere else.
    bool start_alike(const SYMTAB* a, const SYMTAB* b) const {
        constexpr int MOST_BLOCKS = 4;
        const BBLK* bb = ahead;
        for (int n = 0; bb && n < MOST_BLOCKS && !last_assignment(a, bb).cell && !last_assignment(b, bb).cell; ++n)
            bb = only_block(bb->predecessors);
        if (!bb) return false;
        ASSIGNMENT first = last_assignment(a, bb), second = last_assignment(b, bb);
        if (!first.value || !second.value) return false;
        for (const LIST* l = second.cell; l && first.cell != l; l = l->rest)
            if (l->rest == first.cell) {
                std::swap(first, second);
                std::swap(a, b);
                break;
            }
        if (second.value->op == NAME && second.value->u.sym == a) return true;
        for (const LIST* l = first.cell; l != second.cell; l = l->rest)
            if (tree_modifies_lvalue_in_tree(l->first, first.value)) return false;
        return trees_are_congruent(first.value, second.value, false);
    }

    bool unite(const INDUCTION& a, const INDUCTION& b) {
        const bool a_goes = !facts.is_used_after(a.sym);
        if (!a_goes && facts.is_used_after(b.sym)) return false;
        const INDUCTION &gone = a_goes ? a : b, &kept = a_goes ? b : a;
        const INDUCTION::STEP step = gone.steps.front();
        for (LIST** link = &step.bb->statements; *link; link = &(*link)->rest)
            if ((*link)->first == step.statement) {
                drop_statement(link);
                break;
            }
        for (BBLK* bb : loop->blocks)
            for (LIST* l = bb->statements; l; l = l->rest)
                l->first = subst_sym_for_sym_in_tree(gone.sym, kept.sym, l->first);
        if (print_debug) debug_printf("\t%s steps as %s does, which takes its place\n", gone.sym->name, kept.sym->name);
        return true;
    }

    NATURAL_LOOP* loop;
    LOOP_FACTS& facts;
    BBLK* ahead = nullptr;
};

} // namespace

bool unite_equal_inductions(const NATURAL_LOOPS& all, NATURAL_LOOP* loop, LOOP_FACTS& facts) {
    return facts.is_usable() && UNION(all, loop, facts).run();
}
