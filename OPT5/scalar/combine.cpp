// Neighbouring assignments to one object in memory become one: a store less, and often a load.
//
// Two statements `x = e1` or `x op= e1`, then `x = e2` or `x op= e2`, with the same x. A local in a register gains
// nothing and is left alone.
//
// Needs: alias marks, pointees, pointer groups, where there are two such statements. Leaves: what rests on the graph.
// Sound because the statements have no side effects but the stores, so that only reads of x between the two stores
// matter: those in e2 that name x are given the value of the first, and any other that may read x, as `*p` in `x = 1; x
// = *p` with `p == &x`, keeps both statements.
#include "OPT5/scalar/fcp.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"

namespace {

bool is_bitfield(const NODE* t) {
    for (; t->op == STDOT || t->op == STREF; t = t->left)
        if (t->right && t->right->mval && t->right->mval->is_bitfld) return true;
    return false;
}

bool is_plain_memory(const NODE* t) {
    if (t->op != NAME && t->op != UMULT && t->op != STDOT && t->op != STREF) return false;
    if (t->op == NAME &&
        (t->u.sym->sclass == SC_AUTO || t->u.sym->sclass == SC_REGISTER || t->u.sym->sclass == SC_REGISTER2))
        return false;
    const bool is_scalar = t->type->is_int() || t->type->is_enum() || t->type->is_float() || t->type->is_pointer();
    return is_scalar && !t->type->is_vector() && !is_bitfield(t) && !tree_has_side_effects(t);
}

bool is_candidate(const NODE* t) {
    if (t->op != ASG && op_of_opASG[t->op] == ILLOP) return false;
    return t->right && is_plain_memory(t->left) && !tree_has_side_effects(t->right) && !tree_is_arg_prolog(t);
}

// ---- x op= a; x op= b

bool is_small_shift(INT65 count, const TYPE* type) {
    return !count.is_negative() && count < INT65(static_cast<int64_t>(type->size));
}

// The constant c with (x op a) op b == x op c for every x.
bool join_constants(int op, INT65 a, INT65 b, TYPE* type, INT65* c) {
    switch (op) {
    case PLUS:
    case MINUS: *c = a + b; return true;
    case MULT: *c = a * b; return true;
    case SLL:
    case SRL: *c = a + b; return is_small_shift(a, type) && is_small_shift(b, type) && is_small_shift(*c, type);
    case DIV: *c = a * b; return a > INT65(0) && b > INT65(0) && *c <= int_type_max(type);
    default: return false;
    }
}

bool is_bitwise(int op) { return op == ANDB || op == ORB || op == XORB; }

// The second statement with both right sides in it, or null. Sums of values that may overflow where each step does not
// are left alone; what wraps by definition is not.
NODE* join_operators(const NODE* first, const NODE* second) {
    const int op = op_of_opASG[second->op];
    const NODE *x = second->left, *a = first->right, *b = second->right;
    if (x->type->is_float() || a->type->is_float() || b->type->is_float() || x->type->is_bool()) return nullptr;
    const bool are_constants = a->op == ICON && b->op == ICON;
    if (x->type->is_pointer() && !(are_constants && (op == PLUS || op == MINUS))) return nullptr;
    TYPE* type = op == SLL || op == SRL || x->type->is_pointer() ? a->type->stqs() : combined_type(x, a);
    if (!equiv_mtypes(type, op == SLL || op == SRL || x->type->is_pointer() ? b->type : combined_type(x, b)))
        return nullptr;
    // A result that is cut down between the steps hides what overflows where the cut is left out.
    const bool is_cut = type->size > x->type->size && !type->is_unsigned();
    if (is_cut && (op == PLUS || op == MINUS || op == MULT)) return nullptr;
    NODE* value;
    if (are_constants && !is_bitwise(op)) {
        INT65 joined;
        TYPE* width = op == SLL || op == SRL ? promoted_type(x->type) : type;
        if (!join_constants(op, a->u.lval, b->u.lval, width, &joined)) return nullptr;
        if (truncate_to_type(joined, type) != joined && !type->is_unsigned()) return nullptr;
        value = mk_ICON(joined, type);
    } else {
        const bool wraps =
            (op == PLUS || op == MINUS || op == MULT) && type->is_unsigned() && type->size >= x->type->size;
        if (!is_bitwise(op) && !wraps) return nullptr;
        NODE *left = coerce_to_type(type, copy_tree(a)), *right = coerce_to_type(type, copy_tree(b));
        value = simp_node(maketree(op == MINUS ? static_cast<int>(PLUS) : op, left, right, type, second->ls), nullptr);
    }
    NODE* joined = copy_node(second);
    joined->left = copy_tree(x);
    joined->right = value;
    return joined;
}

// ---- x = e1; x = e2 with x in e2

bool is_leaf(const NODE* t) { return t->op == ICON || t->op == FCON || t->op == NAME; }

// Reads of x in `e2` other than by the target itself could see the first store.
bool reads_otherwise(const NODE* first, const NODE* e2) {
    NODE* rest = copy_tree(e2);
    NODE* other = mk_ICON(INT65(0), tp->int_t);
    rest = subst_tree_for_lvalue_in_tree(other, first->left, rest);
    const bool found = tree_modifies_lvalue_in_tree(first, rest) || count_lvalues_in_tree(rest, first->left) > 0;
    erase_tree(other);
    erase_tree(rest);
    return found;
}

struct OUTCOME {
    NODE* temporary = nullptr; // T = the first value, if that is read more than once
    NODE* store = nullptr;     // null: the two stay
};

OUTCOME chain(const NODE* first, const NODE* second) {
    OUTCOME out;
    NODE *s1 = opASG_to_ASG(copy_tree(first)), *s2 = opASG_to_ASG(copy_tree(second));
    if (s1->op == ASG && s2->op == ASG && !reads_otherwise(s1, s2->right)) {
        const int reads = count_lvalues_in_tree(s2->right, s1->left);
        NODE* value = coerce_to_type(s1->left->type->stqs(), s1->right);
        s1->right = nullptr;
        if (reads > 1 && !is_leaf(value)) {
            SYMTAB* t = sym_temp('T', -1, value->type, s1->ls);
            out.temporary = mk_ASG(mk_NAME(t, s1->ls), value);
            value = mk_NAME(t, s1->ls);
        }
        s2->right = simp_tree(subst_tree_for_lvalue_in_tree(value, s1->left, s2->right), nullptr);
        erase_tree(value);
        out.store = s2;
        s2 = nullptr;
    }
    erase_tree(s1);
    erase_tree(s2);
    return out;
}

// ---- Pairs

bool address_depends_on(const NODE* lvalue, const NODE* store) {
    lvalue = object_of_place(lvalue);
    if (lvalue->op == NAME) return false;
    if (lvalue->op == UMULT && lvalue->right && tree_modifies_lvalue_in_tree(store, lvalue->right)) return true;
    return tree_modifies_lvalue_in_tree(store, lvalue->left);
}

OUTCOME combine(const NODE* first, const NODE* second) {
    OUTCOME out;
    if (address_depends_on(second->left, first)) return out; // the places may differ all the same
    const bool reads_first = tree_modifies_lvalue_in_tree(first, second->right);
    if (second->op == ASG && !reads_first) {
        out.store = copy_tree(second);
        return out;
    }
    if (first->op == second->op && first->op != ASG && !reads_first) out.store = join_operators(first, second);
    return out.store ? out : chain(first, second);
}

void print_outcome(const NODE* first, const NODE* second, const OUTCOME& out) {
    if (!print_debug) return;
    debug_printf("\n\tCombining the assignments %s\n", tree_to_infix(first).c_str());
    debug_printf("\t......................and %s\n", tree_to_infix(second).c_str());
    debug_printf("\t...................to get %s\n", tree_to_infix(out.temporary ? out.temporary : out.store).c_str());
    if (out.temporary) debug_printf("\t......................and %s\n", tree_to_infix(out.store).c_str());
}

// True if the pair at `s` became one, or one and a temporary.
bool combine_at(LIST* s) {
    LIST* next = s->rest;
    if (!next || !is_candidate(s->first) || !is_candidate(next->first)) return false;
    if (!trees_are_congruent(s->first->left, next->first->left, false)) return false;
    need(fact::alias);
    const OUTCOME out = combine(s->first, next->first);
    if (!out.store) return false;
    print_outcome(s->first, next->first, out);
    erase_tree(s->first);
    erase_tree(next->first);
    next->first = out.store;
    s->first = out.temporary;
    return true;
}

} // namespace

void combine_asgs_to_memory() {
    if (opt_level() == 0) return;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'combine_asgs_to_memory' -------\n");
    bool combined = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link;) {
            LIST* s = *link;
            if (!combine_at(s)) {
                link = &s->rest;
                continue;
            }
            combined = true;
            if (s->first) {
                link = &s->rest; // the temporary's definition stands in front of the store
            } else {
                drop_statement(link);
            }
        }
    if (combined) changed(fact::graph);
}
