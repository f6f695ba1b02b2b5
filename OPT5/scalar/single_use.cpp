// Temporaries that are set once and read once, both in one block: the value is computed where it is read.
//
// Needs: live variables. Leaves: what rests on the graph, and live variables: no block's sets hold a temporary that
// lives in one block.
// Sound because what moves has no effects, and past other statements it moves only if it reads nothing but variables
// that their NAMEs alone reach, none of which is assigned in between. A value that is loaded moves into the next
// statement alone, and only if that does nothing before it reads it: in `t = *p; *q = 1; x = t` the store may meet the
// load. The read may stand under a condition: then less is computed.
#include "OPT5/scalar/rename.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <vector>

namespace {

constexpr int MOST_STATEMENTS = 12; // that a value moves past
constexpr int MOST_NODES = 40;      // of a statement that takes a value

struct COUNTS {
    int assignments = 0, mentions = 0;
};

class SUBSTITUTION {
public:
    void run() {
        counts.resize(static_cast<size_t>(currfuninfo->lva_sym_count));
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) count(s->first);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            if (!bb->is_in_LIR_form()) block(bb);
    }

private:
    COUNTS* counts_of(const SYMTAB* sym) {
        const int bit = live_index(sym);
        return bit < 0 ? nullptr : &counts[static_cast<size_t>(bit)];
    }

    void count(const NODE* root) {
        for_each_subtree(root, [this](const NODE* t) {
            if (t->op != NAME) return;
            if (COUNTS* c = counts_of(t->u.sym)) ++c->mentions;
        });
        if (root->op != ASG || root->left->op != NAME || tree_is_arg_prolog(root)) return;
        if (COUNTS* c = counts_of(root->left->u.sym)) ++c->assignments;
    }

    void block(BBLK* bb) {
        for (LIST** link = &bb->statements; *link;) {
            LIST* cell = *link;
            if (!is_temporary(cell->first) || !move(cell)) {
                link = &cell->rest;
                continue;
            }
            drop_statement(link);
        }
    }

    bool is_temporary(const NODE* t) {
        if (t->op != ASG || t->left->op != NAME || tree_is_arg_prolog(t)) return false;
        const SYMTAB* sym = t->left->u.sym;
        const COUNTS* c = counts_of(sym);
        if (!c || c->assignments != 1 || c->mentions != 2 || sym->level != 2) return false;
        if (sym == currfuninfo->csu_return_sym || sym == currfuninfo->ret_by_cctor_sym || sym->size_tree) return false;
        if (sym->type->qual_kind(false) & (QUAL_RESTRICT | QUAL_VOLATILE)) return false;
        const NODE* value = t->right;
        if (!value->type->is_scalar() || !equiv_mtypes(value->type->stqs(), sym->type->stqs())) return false;
        return !tree_has_side_effects(value) && !tree_contains_matching_node(value, is_kept);
    }

    // What is not a plain computation stays where it is.
    static bool is_kept(const NODE* t) {
        return op_has_effect(t->op) || op_is_intrinsic(t->op) || t->op == CSE_ORIG || t->op == CSE_DUPE;
    }

    bool reads_variables_alone(const NODE* value) {
        bool alone = true;
        for_each_subtree(value, [&](const NODE* t) {
            if (op_is_load(t->op) || (t->op == NAME && !counts_of(t->u.sym)))
                alone = false;
        });
        return alone;
    }

    // Whether `statement` may change a variable of the value. The target of its root is written last.
    static bool assigns_part(const NODE* statement, const NODE* value, bool with_root) {
        bool assigns = false;
        for_each_written_name(statement, [&](const NODE* name, const NODE* by) {
            assigns = assigns || ((by != statement || with_root) && sym_appears_in_tree(name->u.sym, value));
        });
        return assigns;
    }

    // A statement that computes, and then stores or branches.
    static bool acts_last(const NODE* statement) {
        return !tree_is_EH_SWITCH(statement) && !tree_acts(statement->left) && !tree_acts(statement->right);
    }

    NODE** read_of(NODE** place, const SYMTAB* sym) {
        NODE* t = *place;
        if (!t) return nullptr;
        if (t->op == NAME) return t->u.sym == sym ? place : nullptr;
        if (!left_names_variable(t))
            if (NODE** found = read_of(&t->left, sym)) return found;
        return read_of(&t->right, sym);
    }

    bool move(LIST* cell) {
        const SYMTAB* sym = cell->first->left->u.sym;
        NODE* value = cell->first->right;
        const bool is_free = reads_variables_alone(value);
        int passed = 0;
        for (LIST* s = cell->rest; s; s = s->rest) {
            NODE* t = s->first;
            if (t->op == PPRAGMA || tree_is_ASM_comment(t)) continue;
            if (t->op == PCOMMA || t->op == ASM || t->op == LOOP || t->op == NASSERT || t->op == ASSERT ||
                (t->op == IF && t->left->op == ENDLOOP))
                return false;
            if (sym_appears_in_tree(sym, t)) {
                if (assigns_part(t, value, false) || (!is_free && !acts_last(t))) return false;
                if (count_nodes_in_tree(t) + count_nodes_in_tree(value) > MOST_NODES) return false;
                return put(cell, s);
            }
            if (!is_free || ++passed > MOST_STATEMENTS || assigns_part(t, value, true)) return false;
        }
        return false;
    }

    // The assignment is left for the caller to remove.
    bool put(LIST* cell, LIST* use) {
        NODE* name = cell->first->left;
        NODE** place = read_of(&use->first, name->u.sym);
        if (!place) return false;
        NODE* value = expunge_IDENTITY_ops_from_tree(copy_tree(cell->first->right));
        if (print_debug) {
            debug_printf("\tEliminating single-use temp: %s", name->u.sym->name);
            debug_printf(" = %s\n", tree_to_infix(value).c_str());
        }
        NODE* old = *place;
        *place = coerce_to_type(old->type->stqs(), value);
        erase_tree(old);
        use->first = simp_tree(use->first, nullptr);
        return true;
    }

    std::vector<COUNTS> counts; // by bit
};

} // namespace

void eliminate_single_use_temps() { SUBSTITUTION().run(); }
