// Reads of variables and places whose value an assignment behind them on all paths has given: constants and copies.
//
// `x = value` and `part = value` are kept, `variable = part` too; what may change one of the two sides, or the address of
// the part, ends it. The changes of a variable are numbered, so that an entry need not be searched for to be ended.
//
// Needs: alias marks; pointees and pointer groups where parts count. Leaves: what rests on the graph.
// Sound because only variables take part that nothing but their NAME can change, and parts are asked of the alias rules:
// after `x = y` a store through a pointer to y would make them differ. What an assignment below the root writes is neither
// the old nor the new value throughout the statement. A load is replaced only where it is evaluated before its statement
// changes anything: in `a = p->x + f()` the call may store to `p->x`, and the load may come behind it.
#include "OPT5/scalar/local_asgs.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/scope.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/subrange.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

#include <algorithm>

namespace {

constexpr size_t MOST_PARTS = 32; // at a time, which keeps long blocks linear

bool is_manifest_constant(const NODE* t) { return t->op == ICON || t->op == FCON; }

bool is_whole_scalar(const NODE* lvalue) {
    if (!lvalue->type->is_scalar() || lvalue->type->is_complex()) return false;
    if (lvalue->op == UMULT) return true;
    if (lvalue->op != STDOT && lvalue->op != STREF) return false;
    return lvalue->right->op == FIELD && lvalue->right->mval && !lvalue->right->mval->is_bitfld;
}

bool is_restrict_pointer(const NODE* name) {
    return name->u.sym->type->is_pointer() && (name->u.sym->type->qual_kind(false) & QUAL_RESTRICT);
}

} // namespace

// Accesses through a restrict pointer are taken to meet none through another: one of the two must not become the other.
bool ok_to_propagate_for_pointer(const NODE* value, const NODE* target) {
    if (target->op != NAME || !target->u.sym->type->is_pointer()) return true;
    if (is_restrict_pointer(target)) return false;
    const NODE* basis = pointer_basis(value);
    if (!basis || basis->op != NAME || !is_restrict_pointer(basis)) return true;
    const LS *of_value = true_scope(basis), *of_target = true_scope(target);
    return of_value && of_target && (of_value->encloses(of_target) || of_target->encloses(of_value));
}

void report_replacement(const char* head, const char* middle, const char* end, const NODE* old, const NODE* value) {
    static long count = 0;
    if (!print_debug) return;
    debug_printf(head, ++count); // NOLINT: one of the texts of the callers
    debug_printf("%s\n%s%s\n%s", tree_to_infix(old).c_str(), middle, tree_to_infix(value).c_str(), end);
}

NODE* value_in_place_of(NODE* name, const NODE* value) {
    NODE* substitute = copy_tree(value);
    substitute->ls = name->ls;
    substitute = coerce_to_type(name->type->stqs(), substitute);
    erase_tree(name);
    return substitute;
}

namespace {

void report_local_replacement(const char* head, const NODE* old, const NODE* value) {
    report_replacement(head, "\n\t========== with the following substitute:\n",
                       "\n\t=========================================\n", old, value);
}

} // namespace

void LOCAL_ASGS::restart() {
    for (auto& [sym, known] : names) erase_tree(known.value);
    names.clear();
    depnums.clear();
    for (const PART& p : parts) {
        erase_tree(p.lvalue);
        erase_tree(p.value);
    }
    parts.clear();
}

// ---- What a statement ends, and what it makes known

void LOCAL_ASGS::forget_names(const NODE* t) {
    for_each_written_name(t, [this](const NODE* name, const NODE*) { inc_depnum(name->u.sym); });
}

void LOCAL_ASGS::learn_name(const NODE* target, const NODE* value) {
    if (!is_private_name(target)) return;
    const SYMTAB* sym = target->u.sym;
    TYPE* type = target->u.sym->type->stqs();
    NODE* known = nullptr;
    if (value->op == ICON && type->is_int() && value->type->is_int())
        known = mk_integer_constant(value->u.lval, type);
    else if (value->op == FCON && type->is_float() && equiv_mtypes(value->type, type))
        known = copy_tree(value);
    else if (is_private_name(value) && value->u.sym != sym && equiv_mtypes(value->u.sym->type->stqs(), type) &&
             ok_to_propagate_for_pointer(value, target))
        known = copy_tree(value);
    if (!known) return;
    auto [at, is_new] = names.try_emplace(sym);
    if (!is_new) erase_tree(at->second.value);
    at->second = {known, depnums[sym], known->op == NAME ? depnums[known->u.sym] : 0};
}

void LOCAL_ASGS::forget_parts(const NODE* t) {
    auto gone = [t](const PART& p) {
        if (!tree_modifies_lvalue_in_tree(t, p.lvalue) && !tree_modifies_lvalue_in_tree(t, p.value)) return false;
        erase_tree(p.lvalue);
        erase_tree(p.value);
        return true;
    };
    parts.erase(std::remove_if(parts.begin(), parts.end(), gone), parts.end());
}

void LOCAL_ASGS::learn_part(const NODE* asg) {
    const NODE *part = asg->left, *value = asg->right;
    if (is_whole_scalar(value)) std::swap(part, value);
    if (!is_whole_scalar(part) || !(is_manifest_constant(value) || is_private_name(value))) return;
    SUBRANGE place;
    if (!equiv_mtypes(part->type, value->type) || !compute_subrange(part, &place)) return;
    // The assignment itself must not change the other side, or the address of the part.
    if (tree_modifies_lvalue_in_tree(asg, asg->left == part ? value : part) || address_is_changed_by(asg, place)) return;
    if (parts.size() == MOST_PARTS) {
        erase_tree(parts.front().lvalue);
        erase_tree(parts.front().value);
        parts.erase(parts.begin());
    }
    parts.push_back({copy_tree(part), copy_tree(value)});
}

// A chain `x = y = e` gives y, and through it x.
void LOCAL_ASGS::learn(const NODE* t) {
    if (kinds & ASGS_TO_NAMES) {
        const NODE* inner = t->right;
        if (inner->op == ASG) learn_name(inner->left, inner->right);
        learn_name(t->left, inner->op == ASG ? inner->left : inner);
    }
    if (kinds & ASGS_TO_PARTS) learn_part(t);
}

// ---- Reads of variables

// The value that the variable still has: neither side of the assignment has been changed since.
const NODE* LOCAL_ASGS::value_in_force(const SYMTAB* sym) {
    auto at = names.find(sym);
    if (at == names.end()) return nullptr;
    const NAMED* orig = &at->second;
    OPT_ASSERT(orig->depnum != -1);
    if (orig->depnum != depnums[sym]) return nullptr;
    const bool is_copy = orig->value->op == NAME;
    return is_copy && orig->source_depnum != depnums[orig->value->u.sym] ? nullptr : orig->value;
}

NODE* LOCAL_ASGS::lookup_ASG(NODE* name) {
    const NODE* value = value_in_force(name->u.sym);
    if (!value || (in_test && value->op == NAME) || !rewrite_is_allowed(name)) return name;
    report_local_replacement("\n\t========== (%ld) 'lookup_ASG' is replacing this:\n", name, value);
    any = true;
    return value_in_place_of(name, value);
}

NODE* LOCAL_ASGS::read_names(NODE* t) {
    if (!t) return nullptr;
    switch (t->op) {
    case NAME: return lookup_ASG(t);
    case UAND:
    case ARGREF:
    case LABELREF:
    case FIELD: return t;
    case IF:
    case SWITCH:
        in_test = (kinds & ASGS_KEEP_TESTS) != 0;
        if (t->left->op != ENDLOOP) t->left = read_names(t->left);
        in_test = false;
        return t;
    case RETURN: t->right = read_names(t->right); return t;
    default: break;
    }
    if (!left_names_variable(t)) t->left = read_names(t->left);
    t->right = read_names(t->right);
    return t;
}

// A step of a variable with a known value by a constant is an assignment of a constant.
NODE* LOCAL_ASGS::cp_opASG_RL(NODE* t) {
    if (op_of_opASG[t->op] == ILLOP || !is_private_name(t->left) || !is_manifest_constant(t->right)) return t;
    const SYMTAB* target = t->left->u.sym;
    const NODE* value = value_in_force(target);
    if (!value || !is_manifest_constant(value)) return t;
    t = opASG_to_ASG(t);
    if (t->op != ASG) {
        debug_printf("\n\n!!! COMPILER (OPTIMIZER) ERROR IN 'cp_opASG_RL' !!!\n\n");
        return t;
    }
    if (assigned_variable(t) != target) {
        debug_printf("\n\n!!! COMPILER (OPTIMIZER) ERROR IN 'cp_opASG_RL' %s!!!\n\n", stmt2infix(t).c_str());
        return t;
    }
    t->right = read_names(t->right);
    return simp_tree(t, nullptr);
}

// ---- Reads of parts

NODE* LOCAL_ASGS::cp_indirect_RL(NODE* t) {
    if (!is_whole_scalar(t) || lvalue_is_volatile(t)) return nullptr;
    for (const PART& p : parts) {
        if (!equiv_mtypes(p.lvalue->type, t->type) || !trees_are_congruent(p.lvalue, t, false)) continue;
        report_local_replacement("\n\t========== (%ld) 'cp_indirect_RL' is replacing this:\n", t, p.value);
        erase_tree(t);
        any = true;
        return copy_tree(p.value);
    }
    return nullptr;
}

NODE* LOCAL_ASGS::parts_in(NODE* t) {
    if (!t) return t;
    if (NODE* value = cp_indirect_RL(t)) return value;
    if (t->op == UAND || t->op == ARGREF) {
        t->left = parts_in_place(t->left);
        return t;
    }
    if (t->op == STDOT) return parts_in_place(t);
    t->left = parts_in(t->left);
    if (t->op != STREF) t->right = parts_in(t->right);
    return t;
}

// The place is not read, but a pointer that its address is computed from is.
NODE* LOCAL_ASGS::parts_in_place(NODE* t) {
    auto* object = const_cast<NODE*>(get_first_non_stdot_node_down_the_left_side_of_tree(t));
    if (op_is_indirection(object->op)) object->left = parts_in(object->left);
    if (object->op == UMULT) object->right = parts_in(object->right);
    return t;
}

NODE* LOCAL_ASGS::parts_in_value(NODE* t) { return !t || !tree_changes_nothing(t) ? t : parts_in(t); }

void LOCAL_ASGS::read_parts(NODE* t) {
    switch (t->op) {
    case RETURN: t->right = parts_in_value(t->right); return;
    case IF:
    case SWITCH:
        if (t->left->op != ENDLOOP) t->left = parts_in_value(t->left);
        return;
    case CALL: t->right = parts_in_value(t->right); return;
    default: break;
    }
    if (!(is_plain_assignment(t) || is_operator_assignment(t)) || tree_has_side_effects(t->left)) return;
    if (t->right && t->right->op == CALL)
        t->right->right = parts_in_value(t->right->right);
    else
        t->right = parts_in_value(t->right);
    if (t->op == ASG) t->right = coerce_to_type(t->left->type, t->right);
    t->left = parts_in_place(t->left);
}

// ---- Statements

// Of a statement that became several.
bool LOCAL_ASGS::split(LIST* s) {
    const LIST* const end = s->rest;
    promote_toplevel_COMMAOPs_in_list(s, end);
    for (; s != end; s = s->rest) {
        forget_names(s->first);
        forget_parts(s->first);
    }
    return true;
}

bool LOCAL_ASGS::statement(LIST* s) {
    NODE* t = s->first;
    any = false;
    const bool is_plain = t->op != PPRAGMA && t->op != ASM && t->op != BRANCH && t->op != PCOMMA &&
                          !tree_is_arg_prolog(t) && !tree_is_EH_SWITCH(t);
    if (is_plain) {
        forget_names(t->left);
        forget_names(t->right);
        if (!names.empty()) s->first = t = cp_opASG_RL(read_names(t));
        if (!parts.empty() && !tree_contains_op(t, ASM)) read_parts(t);
        if (any) {
            s->first = t = peel_for_effect(simp_tree(t, nullptr));
            if (!t) return true;
            if (t->op == COMMAOP) return split(s);
        }
    }
    forget_names(t);
    forget_parts(t);
    if (is_plain && t->op == ASG) learn(t);
    return any;
}

void walk_block(LOCAL_ASGS& known, BBLK* bb, bool* any) {
    for (LIST *s = bb->statements, *next; s; s = next) {
        next = s->rest;
        *any |= known.statement(s);
    }
    if (*any) drop_empty_cells(&bb->statements);
}
