// What the descriptors say about the calls in trees: types of arguments, bounds of values, fitness for
// common-subexpression work, and the marks that the optimizer puts into trees for itself.

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/bif.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstring>

// ---- Types of arguments and results
namespace {

template <class F>
void for_each_argument(NODE** link, const F& visit) {
    while (*link && (*link)->op == COMMA) {
        visit(&(*link)->right);
        link = &(*link)->left;
    }
    if (*link) visit(link);
}

bool has_vector_operand(const NODE* list) {
    for (; list; list = list->op == COMMA ? list->left : nullptr)
        if ((list->op == COMMA ? list->right : list)->type->is_vector()) return true;
    return false;
}

bool is_pack_name(const char* name) {
    for (const char* pack : {"__packm", "__pack1p", "__pack12", "__pack1234", "__pack12345678"})
        if (!strcmp(name, pack)) return true;
    return false;
}

void coerce_argument(NODE** arg, TYPE* type) {
    if (type->is_void()) return;
    if ((*arg)->op == ARGREF) { // a place that the call writes, not a value
        OPT_ASSERT(type->is_pointer());
        return;
    }
    *arg = coerce_to_type(type, *arg);
}

void coerce_arguments(NODE* call, const BIF* bif) {
    int n = arg_list_count(call->left);
    if (n != bif->nparams) return;
    for_each_argument(&call->left,
                      [&](NODE** arg) { coerce_argument(arg, arg_list_lookup(bif->parameters, --n)->type); });
}

// The node computes what the built-in returns; a cast above it gives the type that it had.
NODE* take_return_type(NODE* call, const BIF* bif) {
    TYPE *old = call->type, *ret = bif->return_type;
    if (old->is_void() || ret->is_void() || compatible_types(old, ret, true)) return call;
    call->type = ret;
    return coerce_to_type(old, call);
}

void undo_widening_of_arguments(NODE* call) {
    for_each_argument(&call->left, [](NODE** arg) {
        if ((*arg)->op != NAME || !(*arg)->u.sym || !currfuninfo) return;
        if (const SYM_RANGE* range = find_widened_symbol_entry((*arg)->u.sym)) *arg = coerce_to_type(range->type, *arg);
    });
}

} // namespace

NODE* fix_pack_types(NODE* call) {
    TYPE* vector = call->type;
    TYPE* elem = vector->elem_type();
    uint32_t lanes = vector->real->num_elem();
    uint32_t n = static_cast<uint32_t>(arg_list_count(call->left));
    bool packs_vectors = !strncmp(call->u.name, "__pack12", 8) && n && n < lanes && lanes % n == 0;
    if (packs_vectors) elem = tp->mk_vector(elem, false, lanes / n);
    for_each_argument(&call->left, [elem](NODE** arg) { *arg = coerce_to_type(elem, *arg); });
    return call;
}

NODE* fix_BIF_types(NODE* call) {
    if (!op_is_intrinsic(call->op)) return call;
    if (call->op == ICALL && call->type->is_vector() && is_pack_name(call->u.name)) return fix_pack_types(call);
    const BIF* bif = find_target_BIF_descriptor(call->u.name);
    if (!bif) {
        if (find_BIF_descriptor(call->u.name)) return call; // the optimizer's own marks take any type
        uint32_t flags = 0;
        bool declared = bif_callbacks.declared_flags && bif_callbacks.declared_flags(call, &flags);
        if (declared && (flags & (IS_PROPER_MINVAL | IS_PROPER_MAXVAL)))
            for_each_argument(&call->left, [call](NODE** arg) { *arg = coerce_to_type(call->type, *arg); });
        else
            undo_widening_of_arguments(call);
        return call;
    }
    if ((call->op != ICALL && call->op != UICALL) || has_vector_operand(call->left)) return call;
    coerce_arguments(call, bif);
    return take_return_type(call, bif);
}

// ---- Bounds of values
namespace {

struct RANGE {
    INT65 min, max;
};

RANGE range_of_type(TYPE* t) { return {int_type_min(t), int_type_max(t)}; }

RANGE range_of_tree(const NODE* t, struct LOOP* loop) {
    if (t->op == ICON) return {t->u.lval, t->u.lval};
    RANGE r = range_of_type(t->type);
    INT65 min, max;
    if (bif_callbacks.calculate_bounds && bif_callbacks.calculate_bounds(t, loop, &min, &max)) r = {min, max};
    return r;
}

RANGE intersection(RANGE a, RANGE b) { return {std::max(a.min, b.min), std::min(a.max, b.max)}; }

// An absolute value that saturates: the smallest number of the type has the largest as its own.
RANGE range_of_absolute(RANGE x) { return {0, std::max(x.max, -x.min)}; }

RANGE range_of_call(const NODE* call, struct LOOP* loop) {
    RANGE limits = range_of_type(call->type);
    const BIF* bif = find_target_BIF_descriptor(call->u.name);
    if (!bif || !(bif->return_type->is_int() || bif->return_type->is_enum()) ||
        !equiv_mtypes(bif->return_type, call->type))
        return limits;
    if (bif->has(RETURNS_1_OR_0)) return {0, 1};
    const NODE* args = get_arguments_to_call(call);
    int n = arg_list_count(args);
    auto operand = [&](int i) { return range_of_tree(arg_list_lookup(const_cast<NODE*>(args), i), loop); };
    if (bif->has(IS_PROPER_ABSVAL) && n >= 1) return intersection(limits, range_of_absolute(operand(0)));
    if (bif->has(IS_PROPER_MINVAL) && n == 2) {
        RANGE a = operand(0), b = operand(1);
        return intersection(limits, {std::min(a.min, b.min), std::min(a.max, b.max)});
    }
    if (bif->has(IS_PROPER_MAXVAL) && n == 2) {
        RANGE a = operand(0), b = operand(1);
        return intersection(limits, {std::max(a.min, b.min), std::max(a.max, b.max)});
    }
    if (bif->has(MINVAL_IS_KNOWN)) limits.min = bif->minval;
    if (bif->has(MAXVAL_IS_KNOWN)) limits.max = bif->maxval;
    return limits;
}

} // namespace

INT65 calculate_maxval_for_BIF_call(const NODE* call, struct LOOP* loop) { return range_of_call(call, loop).max; }
INT65 calculate_minval_for_BIF_call(const NODE* call, struct LOOP* loop) { return range_of_call(call, loop).min; }

// ---- Common subexpressions
static uint32_t flags_of_call(const NODE* call) {
    if (const BIF* bif = find_BIF_descriptor(call->u.name)) return bif->flags;
    uint32_t flags = 0;
    if (bif_callbacks.declared_flags) bif_callbacks.declared_flags(call, &flags);
    return flags;
}

bool ok_to_CSE_ICALL(const NODE* call) {
    if (call->op != ICALL && call->op != MCALL) return false;
    return strcmp(call->u.name, "DONOTCSE") && !(flags_of_call(call) & MUST_NOT_CSE);
}

bool ok_to_CSE_ICALL_opds(const NODE* call) {
    if (call->op == UICALL || call->op == UMCALL) return true;
    return (call->op == ICALL || call->op == MCALL) && !(flags_of_call(call) & OPDS_MUST_NOT_CSE);
}

uint32_t find_unCSEable_opds(const NODE* call) {
    return bif_callbacks.unCSEable_operands ? bif_callbacks.unCSEable_operands(call) : 255;
}

// ---- Kinds of calls
bool is_ICALL_callee(const NODE* call, const char* name, int nargs) {
    return op_is_intrinsic(call->op) && !strcmp(call->u.name, name) &&
           arg_list_count(get_arguments_to_call(call)) == nargs;
}

bool tree_is_IN_OUT_argument(const NODE* t, SYMTAB** sym) {
    if (t->op != ARGREF) return false;
    const NODE* object = t->left;
    if (object->op == UMULT && !object->right) {
        object = object->left;
        if (object->op == UAND) object = object->left;
    }
    if (object->op != NAME || !(object->type->is_scalar() || object->type->is_vector())) return false;
    *sym = object->u.sym;
    return true;
}

bool is_multiply_accumulate_MCALL(const NODE* t) {
    if (t->op != MCALL) return false;
    const BIF* bif = find_BIF_descriptor(t->u.name);
    return bif && bif->has(IS_MULTIPLY_ACCUMULATE);
}

bool is_barrier_MCALL(const char* name) {
    const BIF* bif = find_target_BIF_descriptor(name);
    return bif && bif->has(IS_BARRIER);
}

static const BIF* descriptor_of_MCALL(const NODE* t) {
    return t->op == MCALL || t->op == UMCALL ? find_BIF_descriptor(t->u.name) : nullptr;
}

bool MCALL_stands_for_ICALL(const NODE* t) {
    const BIF* bif = descriptor_of_MCALL(t);
    return bif && bif->has(IS_MCALL_FOR_ONE_STAGE);
}

bool is_EFI_MCALL(const NODE* t) {
    const BIF* bif = descriptor_of_MCALL(t);
    return bif && bif->has(is_EFI);
}

bool is_def_assert_ICALL_name(const char* name) { return !strcmp(name, "def$assert"); }
bool is_def_entry_ICALL_name(const char* name) { return !strcmp(name, "def$entry"); }
bool is_def_entry_ICALL_tree(const NODE* t) { return t->op == ICALL && is_def_entry_ICALL_name(t->u.name); }

bool is_magic_EH_MCALL_ASG(const NODE* t) { return t->op == ASG && t->right && is_magic_EH_MCALL(t->right); }

// ---- Conditionals whose arms are both computed
bool is_strict_ternary_ICALL(const NODE* t) { return t->op == ICALL && is_ICALL_callee(t, "quest$colon", 3); }

NODE* make_strict_ternary_ICALL(NODE* quest) {
    NODE *colon = quest->right, *test = quest->left;
    NODE* args = maketree(COMMA, maketree(COMMA, test, colon->left, tp->int_t), colon->right, tp->int_t);
    NODE* call = mk_ICALL("quest$colon", args, quest->type);
    call->ls = quest->ls;
    erase_node(colon);
    erase_node(quest);
    return call;
}

static NODE* to_temporary(NODE* value, NODE** before) {
    if (value->op == ICON || value->op == FCON) return value;
    SYMTAB* temp = sym_temp('A', -1, value->type->stqs(), value->ls);
    *before = mk_COMMAOP(*before, mk_ASG(mk_NAME(temp), value));
    return mk_NAME(temp);
}

NODE* undo_strict_ternary_ICALL(NODE* call, bool arms_to_temps) {
    NODE *outer = call->left, *inner = outer->left;
    NODE *test = inner->left, *then_arm = inner->right, *else_arm = outer->right, *before = nullptr;
    if (arms_to_temps && (tree_has_side_effects(then_arm) || tree_has_side_effects(else_arm))) {
        // All three, in the order of the call: what has no effect may still see one.
        test = to_temporary(test, &before);
        then_arm = to_temporary(then_arm, &before);
        else_arm = to_temporary(else_arm, &before);
    }
    TYPE* type = call->type;
    if (type->is_pointer()) {
        if (then_arm->op == ICON) then_arm = coerce_to_type(type, then_arm);
        if (else_arm->op == ICON) else_arm = coerce_to_type(type, else_arm);
    }
    NODE* quest = maketree(QUEST, test, maketree(COLON, then_arm, else_arm, type, call->ls), type, call->ls);
    erase_node(inner);
    erase_node(outer);
    erase_node(call);
    return mk_COMMAOP(before, quest);
}

// ---- Marks
NODE* make_AFFINE_IV_sym_ICALL(SYMTAB* sym) { return mk_ICALL("SYM_IS_AFFINE_IV", mk_NAME(sym), tp->int_t); }

bool is_AFFINE_IV_sym_ICALL(const NODE* t, const SYMTAB* sym) {
    return t->op == ICALL && is_ICALL_callee(t, "SYM_IS_AFFINE_IV", 1) && t->left->op == NAME &&
           (!sym || t->left->u.sym == sym);
}

NODE* make_ANTIALIASED_ICALL(NODE* p, NODE* q) {
    return mk_ICALL("ANTIALIASED", maketree(COMMA, p, q, tp->int_t), tp->int_t);
}

bool is_ANTIALIASED_ICALL(const NODE* t) { return t->op == ICALL && is_ICALL_callee(t, "ANTIALIASED", 2); }

// ---- What this member of the family lacks
NODE* subst_ICALLs_in_tree(NODE* tree) { return tree; }
NODE* map_16x16_MULT_to_ICALL(NODE* tree) { return tree; }
NODE* prop_values_thru_ICALL(NODE* tree) { return tree; }
NODE* simp_MPY_ICALL(NODE* tree, struct LOOP*) { return tree; }
bool name_is_16x16_MULT(const char*) { return false; }
const char* name_16x16_MULT() { abort_optimizer(); }
