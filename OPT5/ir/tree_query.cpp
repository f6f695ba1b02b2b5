// Questions about trees, and the substitutions that need no simplifier.
//
// Left operands are followed in loops and right ones by recursion: sums, argument lists and cases lean left, and they
// are the long ones.

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

#include <cstring>

// ---- Volatility and side effects
bool lvalue_is_volatile(const NODE* t) {
    if (t->type->is_volatile()) return true;
    switch (t->op) {
    case NAME: {
        const SYMTAB* sym = t->u.sym;
        if (!sym) return false;
        bool is_static = sym->sclass == SC_EXTDEF || sym->sclass == SC_STATIC || sym->sclass == SC_EXTERN;
        return sym->type->is_volatile() || (volit_vars && is_static && !sym->type->is_func());
    }
    case UMULT: return volit_vars || (t->left->type->is_pointer() && t->left->type->type_pointed_to()->is_volatile());
    case STDOT:
    case STREF: {
        if (t->right && t->right->mval && t->right->mval->type->is_volatile()) return true;
        if (t->op == STDOT) return lvalue_is_volatile(t->left);
        return volit_vars || (t->left->type->is_pointer() && t->left->type->type_pointed_to()->is_volatile());
    }
    default: return false;
    }
}

bool is_def_assert_ICALL_tree(const NODE* t) { return t->op == ICALL && !strcmp(t->u.name, "def$assert"); }

bool tree_is_trivially_invertible(const NODE* t) {
    return boolean_result[t->op] && boolean_inv[t->op] != ILLOP && !t->type->is_vector();
}

bool tree_has_side_effects(const NODE* t) {
    while (t) {
        switch (t->op) {
        case CSE_DUPE:
        case CSE_ORIG: t = t->right; continue;
        case NAME: return lvalue_is_volatile(t);
        case UAND: {
            const NODE* object = without_members(static_cast<const NODE*>(t->left));
            if (object->op == NAME) return false;
            // The address of an indirection is computed, the indirection is not.
            t = op_is_indirection(object->op) ? object->left : object;
            continue;
        }
        case UMULT:
            if (lvalue_is_volatile(t) || tree_has_side_effects(t->right)) return true;
            break;
        case STDOT:
        case STREF:
            if (lvalue_is_volatile(t)) return true;
            break;
        case ICALL:
            if (is_def_assert_ICALL_tree(t)) {
                t = arg_list_lookup(t->left, 0);
                continue;
            }
            break;
        default:
            if (op_has_effect(t->op) || tree_has_side_effects(t->right)) return true;
        }
        t = t->left;
    }
    return false;
}

// ---- Constants
bool expr_is_constant(const NODE* t) {
    switch (t->op) {
    case SCON:
    case ICON:
    case LCON:
    case FCON:
    case ARGREF: return true;
    case NAME: // an automatic `const` has another value each time that its block is entered
        return t->u.sym && (t->u.sym->is_global() || t->u.sym->sclass == SC_STATIC) && !lvalue_is_volatile(t) &&
               lvalue_is_immutable(t);
    case UAND: {
        const NODE* object = without_members(static_cast<const NODE*>(t->left));
        return object->op == NAME || (object->op == UMULT && !object->right && expr_is_constant(object->left));
    }
    case UMULT: return !t->right && !lvalue_is_volatile(t) && lvalue_is_immutable(t) && expr_is_constant(t->left);
    case STREF: return !lvalue_is_volatile(t) && lvalue_is_immutable(t) && expr_is_constant(t->left);
    case STDOT:
        return !lvalue_is_volatile(t) && lvalue_is_immutable(t) && (t->left->op == NAME || expr_is_constant(t->left));
    case ICALL: // by name, of unknown effect on what it reads
    case UICALL:
    case MIXVALUE:
    case EXPRSTUB:
    case LABELREF:
    case FIELD: return false;
    default:
        if (op_has_effect(t->op) || !t->left || t->op >= DFG_DEF) return false;
        return expr_is_constant(t->left) && (!t->right || expr_is_constant(t->right));
    }
}

// Values that other functions could compute as well: nothing of this function's own storage.
bool expr_is_globally_evaluable(const NODE* t) {
    for (; t; t = t->left) {
        if (t->op == NAME) {
            const SYMTAB* sym = t->u.sym;
            return sym && sym->is_global() && !find_pragma(sym, PRG_FL_STATIC);
        }
        if (t->op == SCON) return false; // a copy elsewhere is another object
        if (!expr_is_globally_evaluable(t->right)) return false;
    }
    return true;
}

bool is_magic_EH_MCALL(const NODE* t) {
    return (t->op == MCALL || t->op == UMCALL) && !std::strcmp(t->u.name, MAGIC_EH_NAME);
}

bool vector_types_exist_in_tree(const NODE* t) {
    return any_subtree(t, [](const NODE* n) { return n->type->is_vector(); });
}

bool complex_types_exist_in_tree(const NODE* t) {
    return any_subtree(t, [](const NODE* n) { return n->type->is_complex(); });
}

bool tree_is_EH_SWITCH(const NODE* t) {
    return t && t->op == SWITCH && t->left && t->left->op == UMCALL && is_magic_EH_MCALL(t->left);
}

bool calls_setjmp(const NODE* t) {
    return tree_contains_matching_node(t, [](const NODE* n) {
        const SYMTAB* callee = op_is_call(n->op) ? get_callee_for_call(n) : nullptr;
        return callee && !std::strcmp(skip_name_prefix(callee->name), "setjmp");
    });
}

bool tree_is_ASM_comment(const NODE* t) {
    if (t->op != ASM) return false;
    if (t->u.lval == INT65(47) || !t->text) return true;
    if (*t->text == '*') return true;
    return t->text[strspn(t->text, " \t\n\v\f\r")] == ';';
}

// ---- Argument prolog
namespace {

bool is_wrapper_of_parameter(int op) { return op == SCONV || op == PCONV || op == ISP2CHAR; }

// The parameter that a prolog's right side copies: through casts and UMULT(UAND()).
const NODE* copied_parameter(const NODE* t) {
    for (t = below_SSA(t); t; t = below_SSA(t)) {
        if (is_wrapper_of_parameter(t->op))
            t = t->left;
        else if (t->op == UMULT && !t->right && t->left->op == UAND)
            t = t->left->left;
        else
            break;
    }
    return t && t->op == NAME && t->u.sym && t->u.sym->level == 1 ? t : nullptr;
}

bool copies_parameter(const NODE* t, SYMTAB** local, SYMTAB** parm) {
    if (t->op != ASG && t->op != STASG) return false;
    const NODE* from = copied_parameter(t->right); // first: an operator there settles it for most assignments
    if (!from) return false;
    const NODE* to = below_SSA(t->left);
    if (!to || to->op != NAME || !to->u.sym || to->u.sym->level != 2 || strcmp(to->u.sym->name, from->u.sym->name)) return false;
    *local = to->u.sym;
    *parm = from->u.sym;
    return true;
}

// An inner scope's variable may bear a parameter's name too, so that names and levels alone do not tell the pair: the
// prolog does.
SYMTAB* partner_in_prolog(const NODE* t, const SYMTAB* sym) {
    SYMTAB *local, *parm;
    for (; t; t = t->left) {
        if (copies_parameter(t, &local, &parm)) return local == sym ? parm : parm == sym ? local : nullptr;
        if (t->op != PCOMMA && t->op != COMMA) return nullptr;
        if (SYMTAB* found = partner_in_prolog(t->right, sym)) return found;
    }
    return nullptr;
}

} // namespace

bool tree_is_arg_prolog(const NODE* t) {
    SYMTAB *local, *parm;
    t = below_SSA(t);
    return t && (t->op == PCOMMA || copies_parameter(t, &local, &parm));
}

bool stmt_is_arg_prolog(const LIST* stmt) { return stmt && stmt->first && tree_is_arg_prolog(stmt->first); }

bool tree_is_extended_arg_prolog(const NODE* t, const NODE* first) {
    if (tree_is_arg_prolog(t)) return true;
    if ((t->op != ASG && t->op != STASG) || !first) return false;
    const NODE *to = below_SSA(t->left), *from = below_SSA(t->right);
    return to && to->op == NAME && to->u.sym && to->u.sym->level == 2 && from && from->op == NAME &&
           tree_references_NAME(first, from);
}

SYMTAB* map_sym_to_parm(const SYMTAB* sym) {
    return sym && sym->level == 2 && currfuninfo ? partner_in_prolog(currfuninfo->arg_prolog, sym) : nullptr;
}

SYMTAB* map_parm_to_sym(const SYMTAB* parm) {
    return parm && parm->level == 1 && currfuninfo ? partner_in_prolog(currfuninfo->arg_prolog, parm) : nullptr;
}

bool lvalue_is_a_ref_parm(const NODE* t) {
    if (t->op != UMULT && t->op != STREF) return false;
    const NODE* p = t->left;
    while (p && (is_wrapper_of_parameter(p->op) || p->op == IDENTITY || p->op == NONALIGN || p->op == OUIALIGN))
        p = p->left;
    if (!p || p->op != NAME || !p->u.sym || !(p->type->is_pointer() || p->type->is_ref())) return false;
    return p->u.sym->level == 1 || map_sym_to_parm(p->u.sym);
}

bool tree_addresses_an_argument(const NODE* t) {
    for (; t; t = t->left) {
        if (t->op == UAND || t->op == ARGREF) {
            const NODE* object = without_members(static_cast<const NODE*>(t->left));
            if (object->op == NAME && object->u.sym && (object->u.sym->level == 1 || map_sym_to_parm(object->u.sym)))
                return true;
        }
        if (tree_addresses_an_argument(t->right)) return true;
    }
    return false;
}

// ---- Searches
template <class P>
static bool any_node(const NODE* t, const P& predicate) {
    for (; t; t = t->left)
        if (predicate(t) || any_node(t->right, predicate)) return true;
    return false;
}

bool sym_appears_in_tree(const SYMTAB* sym, const NODE* t) {
    return any_node(t, [sym](const NODE* n) { return n->op == NAME && n->u.sym == sym; });
}
bool tree_references_NAME(const NODE* t, const NODE* name) { return sym_appears_in_tree(name->u.sym, t); }
bool sym_appears_in_list(const SYMTAB* sym, const LIST* list) {
    for (; list; list = list->rest)
        if (sym_appears_in_tree(sym, list->first)) return true;
    return false;
}
bool sym_appears_in_bb(const SYMTAB* sym, const BBLK* bb) { return sym_appears_in_list(sym, bb->statements); }
bool tree_contains_op(const NODE* t, int op) {
    return any_node(t, [op](const NODE* n) { return n->op == op; });
}
bool tree_contains_matching_node(const NODE* t, bool (*predicate)(const NODE*)) { return any_node(t, predicate); }
bool tree_has_DDNODE_subtrees(const NODE* t) { return tree_contains_op(t, DDNODE); }
bool tree_is_subtree_of_tree(const NODE* a, const NODE* b) {
    return any_node(b, [a](const NODE* n) { return n == a; });
}
bool tree_is_strict_subtree_of_tree(const NODE* a, const NODE* b) { return a != b && tree_is_subtree_of_tree(a, b); }

// ---- Counts
static bool is_implicit_state(const NODE* t) {
    if (t->op != ARGREF) return false;
    const NODE* object = t->left;
    while (object && (object->op == UAND || object->op == UMULT)) object = object->left;
    return object && object->op == NAME && object->u.sym && !strcmp(object->u.sym->name, "__MCALL_implicit_state__");
}

static int count_nodes(const NODE* t, bool skip_leaves) {
    int n = 0;
    for (; t; t = t->left) {
        if (skip_leaves && is_implicit_state(t)) return n;
        if (!skip_leaves || t->left || t->right) ++n;
        n += count_nodes(t->right, skip_leaves);
    }
    return n;
}

int count_nodes_in_tree(const NODE* t, bool skip_leaves, bool statement_spine) {
    if (!t) return 0;
    if (!statement_spine) return count_nodes(t, skip_leaves);
    int n = count_nodes(t->left, skip_leaves);
    const NODE* list = t->right;
    for (; list && list->op == COMMA; list = list->left) n += count_nodes(list->right, skip_leaves);
    return n + count_nodes(list, skip_leaves);
}

int count_lvalues_in_tree(const NODE* t, const NODE* lvalue) {
    int n = 0;
    for (; t; t = t->left) {
        if (trees_are_congruent_se_ok(t, lvalue)) ++n;
        n += count_lvalues_in_tree(t->right, lvalue);
    }
    return n;
}

int count_calls_in_tree(const NODE* t) {
    int n = 0;
    for (; t; t = t->left) n += op_is_call(t->op) + count_calls_in_tree(t->right);
    return n;
}

// ---- Addresses. Pointer arithmetic on trees is in 16-bit units, members are at bit offsets.
static bool is_transparent(int op) { return op == OUIALIGN || op == NONALIGN || op == IDENTITY; }
static INT65 member_offset(const NODE* t) {
    return t->right && t->right->mval ? INT65(t->right->mval->offset >> 4) : INT65(0);
}

static bool casts_pointer(const NODE* t) {
    return (t->op == PCONV || t->op == ISP2CHAR) && (t->left->type->is_pointer() || t->left->op == ICON);
}

// Adds up the constant terms of a pointer or an offset. `*rest` counts the other terms. A term of an unsigned sum is
// none: the sum may have wrapped before it was widened to a pointer.
static INT65 constant_terms(const NODE* t, int* rest) {
    while (is_transparent(t->op) || casts_pointer(t)) t = t->left;
    if (t->op == ICON) return t->u.lval;
    if (!t->type->is_pointer() && !t->type->is_signed()) {
        ++*rest;
        return 0;
    }
    switch (t->op) {
    case PLUS: {
        INT65 left = constant_terms(t->left, rest);
        return left + constant_terms(t->right, rest);
    }
    case MINUS: {
        INT65 left = constant_terms(t->left, rest);
        return left - constant_terms(t->right, rest);
    }
    case MULT:
        if (t->left->op == ICON && t->right->op == ICON)
            return truncate_to_type(t->left->u.lval * t->right->u.lval, t->type);
        break;
    case UAND: {
        int64_t bits = 0;
        const NODE* object = without_members(static_cast<const NODE*>(t->left), &bits);
        const INT65 sum(bits >> 4);
        if (object->op == STREF) return sum + member_offset(object) + constant_terms(object->left, rest);
        if (object->op == UMULT && !object->right) return sum + constant_terms(object->left, rest);
        ++*rest;
        return sum;
    }
    }
    ++*rest;
    return 0;
}

static INT65 constant_offset(const NODE* t, int* rest) {
    while (is_transparent(t->op)) t = t->left;
    int64_t bits = 0;
    t = without_members(t, &bits);
    const INT65 sum(bits >> 4);
    if (t->op == STREF) return sum + member_offset(t) + constant_terms(t->left, rest);
    if (t->op == UMULT) return sum + constant_terms(t->left, rest);
    if (t->type->is_pointer()) return sum + constant_terms(t, rest);
    ++*rest;
    return sum;
}

long byte_offset_on_indirection(const NODE* t) {
    int rest = 0;
    INT65 sum = constant_offset(t, &rest);
    return sum.fits<long>() ? sum.fits_in<long>() : 0;
}

bool total_pointer_offset_value(const NODE* t, INT65* offset) {
    int rest = 0;
    *offset = constant_offset(t, &rest);
    return rest <= 1 && offset->fits<int32_t>();
}

static bool is_object_address(const NODE* t) {
    if (t->op == SCON) return true;
    if (t->op != UAND) return false;
    const NODE* object = without_members(static_cast<const NODE*>(t->left));
    return object->op == NAME && object->u.sym && !find_pragma(object->u.sym, PRG_WEAK);
}

bool pointer_is_an_adcon(const NODE* t) {
    for (;;) {
        while (is_transparent(t->op)) t = t->left;
        if (is_object_address(t)) return true;
        if (t->op == PCONV || t->op == ISP2CHAR) {
            if (t->left->op == ICON) return true;
            t = t->left;
        } else if ((t->op == PLUS || t->op == MINUS) && t->right->op == ICON) {
            t = t->left;
        } else if (t->op == PLUS && t->left->op == ICON) {
            t = t->right;
        } else {
            return false;
        }
    }
}

bool pointer_contains_adcon_term(const NODE* t) {
    for (;;) {
        while (is_transparent(t->op) || ((t->op == PCONV || t->op == ISP2CHAR) && t->left->type->is_pointer()))
            t = t->left;
        if (is_object_address(t)) return true;
        if ((t->op != PLUS && t->op != MINUS) || !t->type->is_pointer()) return false;
        if (t->op == PLUS && !t->left->type->is_pointer())
            t = t->right;
        else
            t = t->left;
    }
}

const NODE* pointer_behind_builtin(const NODE* t) {
    if ((t->op != ICALL && t->op != MCALL) || !t->left || !type_ops_callbacks.builtin_points_into_operand_0)
        return nullptr;
    if (!type_ops_callbacks.builtin_points_into_operand_0(t->u.name)) return nullptr;
    return arg_list_lookup(t->left, 0);
}

SYMTAB* pointee_name_if_known(const NODE* p) {
    for (;;) {
        while (is_transparent(p->op) || ((p->op == PCONV || p->op == ISP2CHAR) && p->left->type->is_pointer()))
            p = p->left;
        if (const NODE* operand = pointer_behind_builtin(p))
            p = operand;
        else if (p->op == PLUS || p->op == MINUS)
            p = p->op == PLUS && !p->left->type->is_pointer() ? p->right : p->left;
        else
            break;
    }
    return p->op == UAND ? object_name_if_known(p->left) : nullptr;
}

static bool is_part(int op) {
    return op == STDOT || op == REAL || op == IMAG || op == VFIELD || op == VRCONV || op == SIMDHI || op == SIMDLO ||
           op == DDNODE;
}

SYMTAB* object_name_if_known(const NODE* t) {
    while (t && (is_transparent(t->op) || is_part(t->op) || op_wraps_for_SSA(t->op))) t = t->left;
    if (!t) return nullptr;
    if (t->op == NAME) return t->u.sym;
    return op_is_indirection(t->op) ? pointee_name_if_known(t->left) : nullptr;
}

// ---- Substitution
static void rename(NODE* name, SYMTAB* to) {
    free(name->text);
    name->text = nullptr;
    name->mk_name(to);
}

NODE* subst_sym_for_sym_in_tree(SYMTAB* from, SYMTAB* to, NODE* t) {
    for (NODE* n = t; n; n = n->left) {
        if (n->op == NAME && n->u.sym == from) rename(n, to);
        subst_sym_for_sym_in_tree(from, to, n->right);
    }
    return t;
}

NODE* subst_sym_pairs_in_tree(NODE* t, const SYMPAIRLIST* pairs) {
    for (NODE* n = t; n; n = n->left) {
        if (n->op == NAME)
            for (const SYMPAIRLIST* p = pairs; p; p = p->next)
                if (p->a == n->u.sym) {
                    rename(n, p->b);
                    break;
                }
        subst_sym_pairs_in_tree(n->right, pairs);
    }
    return t;
}

NODE* subst_tree_for_lvalue_in_tree(const NODE* replacement, const NODE* lvalue, NODE* t) {
    if (!t) return nullptr;
    if (trees_are_congruent_se_ok(t, lvalue)) {
        NODE* fresh = copy_tree(replacement);
        if (!fresh->ls) fresh->ls = t->ls;
        erase_tree(t);
        return fresh;
    }
    bool needs_lvalue = opcode_is_ASG(t->op) || t->op == UAND || t->op == ARGREF || t->op == STARG || t->op == STDOT;
    bool keeps_left =
        needs_lvalue && t->left && !op_is_lvalue(replacement->op) && trees_are_congruent_se_ok(t->left, lvalue);
    if (!keeps_left) t->left = subst_tree_for_lvalue_in_tree(replacement, lvalue, t->left);
    t->right = subst_tree_for_lvalue_in_tree(replacement, lvalue, t->right);
    return t;
}

NODE* expunge_IDENTITY_ops_from_tree(NODE* t) {
    NODE* root = t;
    for (NODE** link = &root; *link; link = &(*link)->left) {
        while (*link && (*link)->op == IDENTITY) {
            NODE* gone = *link;
            *link = gone->left;
            erase_node(gone);
        }
        if (!*link) break;
        (*link)->right = expunge_IDENTITY_ops_from_tree((*link)->right);
    }
    return root;
}
