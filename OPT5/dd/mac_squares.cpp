// Squares of what a variable holds become squares of what it was loaded from, where nothing else wants the variable.
//
// Needs: alias marks. Leaves: the graph. Sound because the load moves down to the sum over what is independent of it,
// and is made twice there, of an object that is not volatile; a call of the hardware makes one of both.
#include "OPT5/dd/mac.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/accumulators.h"

#include <utility>

namespace {

// A variable that the tree multiplies by itself.
const SYMTAB* squared_variable(const NODE* t) {
    const SYMTAB* sym = nullptr;
    for_each_subtree(t, [&sym](const NODE* n) {
        if (n->op != MULT) return;
        const NODE *a = n->left, *b = n->right;
        while (a->op == SCONV) a = a->left;
        while (b->op == SCONV) b = b->left;
        if (a->op == NAME && b->op == NAME && a->u.sym == b->u.sym) sym = a->u.sym;
    });
    return sym;
}

// s = *x, or s = (long)*x, of 16 bits.
bool is_load_to_square(const NODE* t) {
    if (t->op != ASG || t->left->op != NAME || !is_a_likely_zelkova_register(t->left->u.sym)) return false;
    const NODE* load = t->right->op == SCONV ? t->right->left : t->right;
    TYPE *type = load->type, *wide = t->left->type;
    const bool keeps_value = equiv_mtypes(wide, type) || (wide->is_int() && wide->is_signed() && wide->size == 32);
    return load->op == UMULT && type->is_int() && type->is_signed() && type->size == 16 && keeps_value &&
           !tree_has_side_effects(load) && !lvalue_is_volatile(load);
}

} // namespace

// The load, and both factors.
bool SQUARES::is_read_here_alone(const SYMTAB* sym) {
    if (mentions.empty())
        for_each_tree(currfuninfo, [this](const NODE* tree) {
            for_each_subtree(tree, [this](const NODE* n) {
                if (n->op == NAME) ++mentions[n->u.sym];
            });
        });
    return mentions[sym] == 3;
}

bool SQUARES::read_from_memory(LIST* load, LIST* sum) {
    SYMTAB* sym = load->first->left->u.sym;
    if (!is_read_here_alone(sym)) return false;
    load = move_statement_down(load, sum);
    if (load->rest != sum) return false;
    NODE *name = mk_NAME(sym), *square = copy_tree(sum->first);
    NODE* value = coerce_to_type(name->type, copy_tree(load->first->right));
    square->right = simp_tree(subst_tree_for_lvalue_in_tree(value, name, square->right), nullptr);
    erase_tree(value);
    erase_tree(name);
    const bool is_one = is_mac(square);
    if (is_one) {
        std::swap(square, load->first);
        drop_statement_behind(load);
    }
    erase_tree(square);
    return is_one;
}

void SQUARES::read_from_memory(LIST* statements) {
    for (LIST* load = statements; load; load = load->rest) {
        if (!is_load_to_square(load->first)) continue;
        for (LIST* sum = load->rest; sum; sum = sum->rest) {
            const NODE* t = sum->first;
            if ((t->op != PLUSASG && t->op != MINUSASG) || squared_variable(t->right) != load->first->left->u.sym)
                continue;
            if (read_from_memory(load, sum)) return;
            break;
        }
    }
}
