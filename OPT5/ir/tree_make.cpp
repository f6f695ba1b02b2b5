// Makers of trees, the two forms of compound assignment, and access to the parts of calls.

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "UTIL/safemem.h"

// ---- Constants and leaves
NODE* mk_ICON(INT65 value, TYPE* type) {
    if (type->is_pointer()) type = tp->long_t;
    OPT_ASSERT(type->is_int() || type->is_enum());
    NODE* t = new_node(ICON, type);
    t->u.lval = truncate_to_type(value, type);
    return t;
}

NODE* mk_integer_constant(INT65 value, TYPE* type) {
    TYPE* elem = type->is_vector() ? type->elem_type() : type;
    NODE* t;
    if (elem->is_int() || elem->is_enum()) {
        t = mk_ICON(value, elem->stqs());
    } else {
        TYPE* own = truncate_to_type(value, tp->int_t) == value ? tp->int_t : tp->long_t;
        t = coerce_to_type(elem, mk_ICON(value, own));
    }
    return type->is_vector() ? maketree(VPACKM, t, nullptr, type) : t;
}

NODE* mk_NAME(SYMTAB* sym, LS* ls) {
    NODE* t = new_node(NAME, sym->type);
    t->mk_name(sym);
    t->ls = ls ? ls : sym->scope;
    return t;
}

// ---- Statements
NODE* mk_ASG(NODE* lhs, NODE* rhs) {
    TYPE* type = lhs->type;
    TYPE* elem = type->is_vector() ? type->elem_type() : type;
    int op = type->is_array() && !type->is_vector() ? ARASG : elem->is_csu() ? STASG : ASG;
    return maketree(op, lhs, rhs, type, lhs->ls);
}

NODE* mk_LABELREF(LBL* lbl, uint32_t profile) {
    NODE* t = new_node(LABELREF, tp->int_t);
    t->lbl = lbl;
    t->u.lval = INT65(lbl->index);
    t->set_edge_profile(profile);
    ++lbl->refcount;
    return t;
}

NODE* mk_LABELREF(int32_t index, uint32_t profile) { return mk_LABELREF(find_label(index), profile); }

NODE* mk_LABELREF_to_bb(BBLK* bb, LS* ls) {
    NODE* t = mk_LABELREF(label_of_bb(bb));
    t->ls = ls;
    return t;
}

NODE* mk_BRANCH(BBLK* bb, LS* ls) { return maketree(BRANCH, mk_LABELREF_to_bb(bb, ls), nullptr, tp->int_t, ls); }

NODE* mk_LABELDEF(LBL* lbl) {
    NODE* t = new_node(LABELDEF, tp->int_t);
    t->lbl = lbl;
    t->u.lval = INT65(lbl->index);
    lbl->tree = t;
    return t;
}

NODE* mk_IF(NODE* cond, NODE* true_labelref, NODE* false_labelref, LS* ls) {
    NODE* targets = maketree(COMMA, true_labelref, false_labelref, tp->int_t, ls);
    return maketree(IF, cond, targets, tp->int_t, ls);
}

NODE* mk_IF(NODE* cond, int32_t true_index, uint32_t true_profile, int32_t false_index, uint32_t false_profile,
            LS* ls) {
    NODE* if_true = mk_LABELREF(true_index, true_profile);
    return mk_IF(cond, if_true, mk_LABELREF(false_index, false_profile), ls);
}

NODE* mk_ASM(int kind, const char* text) {
    NODE* t = new_node(ASM, tp->void_t);
    t->u.lval = INT65(kind);
    t->text = safestrdup(text);
    return t;
}

// ---- Expressions
NODE* mk_COMMAOP(NODE* a, NODE* b) { return a ? maketree(COMMAOP, a, b, b->type, b->ls) : b; }

NODE* mk_EXCLAIM(NODE* t) { return maketree(EXCLAIM, t, nullptr, tp->int_t, t->ls); }

NODE* mk_MINUS(NODE* a, NODE* b) {
    if (!b) return a;
    int op = a ? MINUS : UMINUS;
    TYPE* type = operator_type_for_operand_types(op, a ? a->type : b->type, a ? b->type : nullptr, nullptr, nullptr);
    return a ? maketree(op, a, b, type, a->ls) : maketree(op, b, nullptr, type, b->ls);
}

static NODE* mk_intrinsic(int op, const char* name, NODE* args, TYPE* type) {
    NODE* t = maketree(op, args, nullptr, type);
    t->mk_icall(name);
    return t;
}
NODE* mk_ICALL(const char* name, NODE* args, TYPE* type) {
    return mk_intrinsic(args ? ICALL : UICALL, name, args, type);
}
NODE* mk_MCALL(const char* name, NODE* args, TYPE* type) {
    return mk_intrinsic(args ? MCALL : UMCALL, name, args, type);
}

// ---- Compound assignment
//
// `x op= e` evaluates e before it reads x, and computes in the combined type of both before it converts to x's type;
// `x = x op e` reads x first and computes in the operator's type. One may replace the other only where neither
// difference can be seen.
bool compound_ASG_computes_in(TYPE* wanted, int op, const NODE* x, const NODE* e) {
    if (x->type->is_vector() || wanted->is_vector())
        return equiv_mtypes(x->type, wanted) && equiv_mtypes(e->type, wanted);
    if (x->type->is_pointer()) return (op == PLUS || op == MINUS) && e->type->is_int() && equiv_mtypes(x->type, wanted);
    bool is_shift = op == SLL || op == SRL;
    return x->type->is_arithmetic() && e->type->is_arithmetic() &&
           equiv_mtypes(is_shift ? promoted_type(x->type) : combined_type(x, e), wanted);
}

namespace {

// The operands that an lvalue's address is computed from.
bool address_has_side_effects(const NODE* lvalue) {
    switch (lvalue->op) {
    case NAME: return false;
    case STDOT: return address_has_side_effects(lvalue->left);
    case UMULT: return tree_has_side_effects(lvalue->left) || tree_has_side_effects(lvalue->right);
    case STREF: return tree_has_side_effects(lvalue->left);
    default: return tree_has_side_effects(lvalue);
    }
}

} // namespace

NODE* ASG_to_opASG(NODE* tree) {
    if (tree->op != ASG || !tree->right) return tree;
    NODE *x = tree->left, *rhs = tree->right;
    int compound = opASG_of_op(rhs->op);
    if (compound == ILLOP || !rhs->left || !rhs->right || !equiv_mtypes(x->type, rhs->type)) return tree;
    // A member's own width and type decide how a compound assignment to a bit-field converts.
    if ((x->op == STDOT || x->op == STREF) && x->right && x->right->mval && x->right->mval->is_bitfld) return tree;
    if (commute_inv[rhs->op] == rhs->op && trees_are_congruent(x, rhs->right, false) &&
        !trees_are_congruent(x, rhs->left, false)) {
        if (tree_has_side_effects(rhs->left)) return tree;
        std::swap(rhs->left, rhs->right);
    }
    if (!trees_are_congruent(x, rhs->left, false) || tree_has_side_effects(rhs->right)) return tree;
    if (!compound_ASG_computes_in(rhs->type, rhs->op, x, rhs->right)) return tree;
    tree->op = compound;
    tree->right = rhs->right;
    rhs->right = nullptr;
    erase_tree(rhs);
    return tree;
}

NODE* opASG_to_ASG(NODE* tree) {
    int op = tree->op >= 0 && tree->op < NO_OPCODES ? op_of_opASG[tree->op] : static_cast<int>(ILLOP);
    if (op == ILLOP) return tree;
    NODE *x = tree->left, *e = tree->right;
    if (x->op == DDNODE || address_has_side_effects(x)) return tree;
    if (tree_has_side_effects(e) && !(is_private_name(x) && !sym_appears_in_tree(x->u.sym, e))) return tree;
    NODE* value = copy_tree(x);
    TYPE* inner;
    if (op == SLL || op == SRL) {
        inner = promoted_type(x->type);
        value = coerce_to_type(inner, value);
        e = coerce_to_type(tp->int_t, e);
    } else if (x->type->is_pointer()) {
        inner = x->type->stqs();
        if (e->type->is_int() || e->type->is_enum()) e = coerce_to_type(promoted_type(e->type), e);
    } else {
        inner = combined_type(x, e);
        value = coerce_to_type(inner, value);
        e = coerce_to_type(inner, e);
    }
    tree->op = ASG;
    tree->right = coerce_to_type(x->type, maketree(op, value, e, inner, tree->ls));
    return tree;
}

// ---- Statement lists
void insert_stmt_before_stmt_in_bb(NODE* stmt, LIST* before, BBLK* bb, PSN* psn) {
    LIST** link = &bb->statements;
    while (*link && *link != before) link = &(*link)->rest;
    *link = mkelist(stmt, *link, psn);
}

void promote_toplevel_COMMAOPs_in_list(LIST* list, const LIST* end) {
    for (; list != end; list = list->rest)
        while (list->first && list->first->op == COMMAOP) {
            NODE* comma = list->first;
            list->rest = mkelist(comma->right, list->rest, list->psn);
            list->first = comma->left;
            erase_node(comma);
        }
}

// ---- Calls
int arg_list_count(const NODE* list) {
    if (!list) return 0;
    int n = 1;
    for (; list->op == COMMA; list = list->left) ++n;
    return n;
}

NODE* arg_list_lookup(NODE* list, int n) {
    int behind = arg_list_count(list) - 1 - n;
    if (n < 0 || behind < 0) return nullptr;
    for (int i = 0; i < behind; ++i) list = list->left;
    return list->op == COMMA && n > 0 ? list->right : list;
}

NODE* arg_list_append(NODE* list, NODE* arg) { return list ? maketree(COMMA, list, arg, tp->int_t, arg->ls) : arg; }

SYMTAB* get_callee_for_call(const NODE* call) {
    if (!op_is_call(call->op)) return nullptr;
    const NODE* callee = call->left;
    return callee->op == UAND && callee->left->op == NAME ? callee->left->u.sym : nullptr;
}

NODE* get_arguments_to_call(const NODE* call) {
    switch (call->op) {
    case CALL: return call->right;
    case MEMCPY:
    case ICALL:
    case MCALL: return call->left;
    default: return nullptr;
    }
}
