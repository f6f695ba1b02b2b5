// The type invariant of trees, re-established: every operator's operands have the types that the operator requires, and
// its own type follows from theirs.
//
// A tree comes here as it was read, or after a rewrite that changed the type of a part. Each node is brought to the
// type that its operands give it, under a cast to the type that it had, so that what stands above sees no change. No
// cast that is put in changes a value: an operator whose node was wider than its operands is computed in the wider type
// where the narrow one could only differ by overflowing, which the program may not rely on in signed types.
//
// Left operands of assignments, and what an address is taken of, are lvalues: they take the type of their object and
// never stand under a cast.

#include "IFILE/ifile.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "UTIL/abort.h"

namespace {

void fix_lvalue(NODE* t);
NODE* fix_value(NODE* t);

bool is_integral(const TYPE* t) { return t->is_int() || t->is_enum(); }
bool is_signed_integer(const TYPE* t) { return is_integral(t) && t->is_signed(); }

void fix_operands(NODE* t) {
    if (t->left) t->left = fix_value(t->left);
    if (t->right) t->right = fix_value(t->right);
}

// ---- Names and members
void take_symbol_type(NODE* t) {
    const SYMTAB* sym = t->u.sym;
    if (!sym || !sym->type || !sym->type->is_scalar() || !t->type->is_scalar()) return;
    bool keeps_volatile = t->type->is_volatile();
    t->type = keeps_volatile ? tp->mk_qual(sym->type, QUAL_VOLATILE) : sym->type;
}

void take_member_type(NODE* t) {
    if (!t->right || !t->right->mval) return;
    bool was_volatile = t->type->is_volatile();
    TYPE* member = merge_qualifiers_for_STDOT(normalized_value_type(t->right->mval->type), t);
    if (member->is_scalar() != t->type->is_scalar()) return;
    t->type = was_volatile ? tp->mk_qual(member, QUAL_VOLATILE) : member;
}

void fix_indirection(NODE* t) {
    t->left = fix_value(t->left);
    if (t->right) t->right = fix_value(t->right);
    OPT_ASSERT(t->left->type->is_pointer() || t->left->type->is_ref());
    if (t->left->type->is_pointer() && !compatible_types(t->left->type->type_pointed_to(), t->type, true))
        t->left = coerce_to_type(tp->mk_ptr(t->type), t->left);
}

void fix_lvalue(NODE* t) {
    switch (t->op) {
    case NAME: return take_symbol_type(t);
    case STDOT: fix_lvalue(t->left); return take_member_type(t);
    case STREF: t->left = fix_value(t->left); return take_member_type(t);
    case UMULT: return fix_indirection(t);
    case COMMAOP:
        t->left = fix_value(t->left);
        fix_lvalue(t->right);
        t->type = t->right->type;
        return;
    case DDNODE:
    case IDENTITY:
    case SSA_USE:
    case SSA_DEF:
    case SSA_MU:
    case SSA_CHI:
        if (!t->left) return;
        fix_lvalue(t->left);
        t->type = t->left->type;
        return;
    default: fix_operands(t);
    }
}

NODE* fix_lvalue_read(NODE* t) {
    TYPE* old = t->type;
    fix_lvalue(t);
    return t->type->is_scalar() && !compatible_types(t->type, old, true) ? coerce_to_type(old->stqs(), t) : t;
}

NODE* fix_address(NODE* t) {
    fix_lvalue(t->left);
    TYPE* object = t->left->type;
    TYPE* old = t->type;
    bool is_array = object->is_array() && !object->is_vector();
    t->type = tp->mk_ptr(is_array ? object->elem_type() : object);
    return coerce_to_type(old, t);
}

// ---- Operators
// The type to compute in, for a node of type `old` over operands of the combined type `own`.
TYPE* computing_type(TYPE* old, TYPE* own) {
    bool widens = is_signed_integer(old) && is_signed_integer(own) && old->size > own->size;
    return widens ? old->stqs() : own;
}

NODE* fix_pointer_arithmetic(NODE* t, TYPE* old) {
    if (is_integral(t->left->type) && t->left->op != PMCONV)
        t->left = coerce_to_type(promoted_type(t->left->type), t->left);
    if (is_integral(t->right->type)) t->right = coerce_to_type(promoted_type(t->right->type), t->right);
    bool is_settled =
        t->left->type->is_pointer() && is_integral(t->right->type) && compatible_types(t->left->type, t->type, true);
    if (!is_settled) t->type = combined_type(t->left, t->right);
    return coerce_to_type(old, t);
}

NODE* fix_binary(NODE* t) {
    fix_operands(t);
    TYPE* old = t->type;
    bool has_pointer = t->left->type->is_pointer() || t->right->type->is_pointer();
    if (t->op == MINUS && t->left->type->is_pointer() && t->right->type->is_pointer()) {
        t->type = tp->long_t;
        return coerce_to_type(old, t);
    }
    if (has_pointer || old->is_pointer()) return fix_pointer_arithmetic(t, old);
    if (!old->is_scalar() || !t->left->type->is_scalar() || !t->right->type->is_scalar()) return t;
    TYPE* type = computing_type(old, combined_type(t->left, t->right));
    t->left = coerce_to_type(type, t->left);
    t->right = coerce_to_type(type, t->right);
    t->type = type;
    return coerce_to_type(old, t);
}

// The arms of a conditional: values of one type, and that is the node's.
NODE* fix_arms(NODE* t) {
    fix_operands(t);
    if (!t->type->is_scalar() || !t->left->type->is_scalar() || !t->right->type->is_scalar()) return t;
    TYPE* type = t->type->stqs();
    t->left = coerce_to_type(type, t->left);
    t->right = coerce_to_type(type, t->right);
    t->type = t->left->type;
    return t;
}

NODE* fix_unary(NODE* t) {
    fix_operands(t);
    TYPE* old = t->type;
    if (!old->is_scalar() || !t->left->type->is_scalar() || t->left->type->is_pointer()) return t;
    t->type = computing_type(old, promoted_type(t->left->type));
    t->left = coerce_to_type(t->type, t->left);
    return coerce_to_type(old, t);
}

// What is shifted in depends on the sign of the left operand, and on its type alone.
NODE* fix_shift(NODE* t) {
    fix_operands(t);
    TYPE* old = t->type;
    if (!is_integral(t->left->type) || !is_integral(t->right->type)) return t;
    t->type = computing_type(old, promoted_type(t->left->type));
    t->left = coerce_to_type(t->type, t->left);
    t->right = coerce_to_type(tp->int_t, t->right);
    return coerce_to_type(old, t);
}

int with_sign_of(int op, const TYPE* type) {
    constexpr int to_unsigned = ULE - LE;
    bool is_unsigned = type->is_unsigned() || type->is_pointer();
    if (op >= LE && op <= GT && is_unsigned) return op + to_unsigned;
    if (op >= ULE && op <= UGT && !is_unsigned && is_signed_integer(type)) return op - to_unsigned;
    return op;
}

NODE* fix_comparison(NODE* t) {
    fix_operands(t);
    if (!t->left->type->is_scalar() || !t->right->type->is_scalar()) return t;
    TYPE* type = combined_type(t->left, t->right);
    t->left = coerce_to_type(type, t->left);
    t->right = coerce_to_type(type, t->right);
    t->op = type->is_float() ? if_float_relop(t->op) : with_sign_of(t->op, type);
    return t;
}

NODE* fix_SWITCH(NODE* t) {
    t->left = fix_value(t->left);
    TYPE* type = promoted_type(t->left->type);
    t->left = coerce_to_type(type, t->left);
    for (NODE* list = t->right; list; list = list->op == COMMA ? list->left : nullptr) {
        NODE* item = list->op == COMMA ? list->right : list;
        if (item->op != CASE || item->left->op != ICON) continue;
        item->left->u.lval = truncate_to_type(item->left->u.lval, type);
        item->left->type = type;
    }
    return t;
}

// ---- Assignments
NODE* with_left_type(NODE* t) {
    TYPE* old = t->type;
    if (!t->left->type->is_scalar() || !old->is_scalar()) return t;
    t->type = t->left->type;
    return coerce_to_type(old, t);
}

NODE* fix_compound(NODE* t) {
    if (t->right) t->right = fix_value(t->right);
    fix_lvalue(t->left);
    TYPE *x = t->left->type, *e = t->right ? t->right->type : nullptr;
    if (!e || !x->is_scalar() || !e->is_scalar()) return t;
    if (x->is_pointer()) {
        if (is_integral(e)) t->right = coerce_to_type(promoted_type(e), t->right);
        if (e->is_pointer()) OPT_ASSERT(t->left->op != SCONV);
    } else if (t->op == SLLASG || t->op == SRLASG) {
        t->right = coerce_to_type(promoted_type(e), t->right);
    } else {
        t->right = coerce_to_type(combined_type(t->left, t->right), t->right);
    }
    return with_left_type(t);
}

bool is_register_bound(const SYMTAB* sym) { return sym->sclass == SC_REGISTER || sym->sclass == SC_REGISTER2; }

// One variable on both sides, not volatile, so that its value is its own copy.
bool same_variable(const NODE* a, const NODE* b) {
    if (a->op != NAME || b->op != NAME || !a->u.sym || !b->u.sym) return false;
    const SYMTAB *x = a->u.sym, *y = b->u.sym;
    bool same_place = x == y || (is_register_bound(x) && x->sclass == y->sclass && x->value == y->value);
    return same_place && compatible_types(a->type->stqs(), b->type->stqs(), false) && !lvalue_is_volatile(a) &&
           !lvalue_is_volatile(b);
}

NODE* drop_assignment(NODE* t) {
    if (print_debug) debug_printf("\n\tREDUNDANT ASSIGNMENT ELIMINATED:\n");
    NODE* value = t->right;
    erase_tree(t->left);
    erase_node(t);
    return value;
}

// x = e op x
void put_variable_first(NODE* t) {
    NODE* rhs = t->right;
    if (!rhs->left || !rhs->right || commute_inv[rhs->op] == ILLOP) return;
    if (!same_variable(t->left, rhs->right) || same_variable(t->left, rhs->left) || tree_has_side_effects(rhs->left))
        return;
    std::swap(rhs->left, rhs->right);
    rhs->op = commute_inv[rhs->op];
}

// x = x op e
void make_compound(NODE* t) {
    NODE* rhs = t->right;
    int compound = opASG_of_op(rhs->op);
    if (compound == ILLOP || !rhs->left || !rhs->right || !same_variable(t->left, rhs->left)) return;
    if (tree_has_side_effects(rhs->right) || !equiv_mtypes(rhs->type, t->left->type)) return;
    if (!compound_ASG_computes_in(rhs->type, rhs->op, t->left, rhs->right)) return;
    t->op = compound;
    t->right = rhs->right;
    rhs->right = nullptr;
    erase_tree(rhs);
}

// The value stored is converted to the type of the place in both cases; the cast says so, except between pointers.
void coerce_stored_value(NODE* t) {
    TYPE *to = t->left->type->stqs(), *from = t->right->type;
    if (!to->is_scalar() || !from->is_scalar() || (to->is_pointer() && from->is_pointer()) || equiv_mtypes(to, from))
        return;
    t->right = coerce_to_type(to, t->right);
}

NODE* fix_ASG(NODE* t) {
    t->right = fix_value(t->right);
    fix_lvalue(t->left);
    coerce_stored_value(t);
    if (same_variable(t->left, t->right)) return drop_assignment(t);
    if (t->right->op == ASG && same_variable(t->left, t->right->left)) return drop_assignment(t);
    put_variable_first(t);
    make_compound(t);
    return with_left_type(t);
}

NODE* fix_RETURN(NODE* t) {
    if (t->right) {
        t->right = fix_value(t->right);
        if (t->type->is_scalar()) t->right = coerce_to_type(t->type, t->right);
    }
    return t;
}

// ---- One node over operands that are right already, or are made so
NODE* fix_value(NODE* t) {
    switch (t->op) {
    case NAME:
    case UMULT:
    case STDOT:
    case STREF:
    case SSA_USE: return fix_lvalue_read(t);
    case UAND: return fix_address(t);
    case ARGREF:
    case STARG: fix_lvalue(t->left); return t;
    case PLUS:
    case MINUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB:
    case DIV:
    case MOD: return fix_binary(t);
    case COLON: return fix_arms(t);
    case UMINUS:
    case ABS:
    case NOTB:
    case SQRT:
    case SQR: return fix_unary(t);
    case SLL:
    case SRL: return fix_shift(t);
    case SWITCH: return fix_SWITCH(t);
    case RETURN: return fix_RETURN(t);
    case ASG: return fix_ASG(t);
    case STASG:
    case ARASG:
        fix_lvalue(t->left);
        if (t->right) t->right = fix_value(t->right);
        return t;
    case ICALL:
    case UICALL:
    case MCALL:
    case UMCALL: fix_operands(t); return type_ops_callbacks.fix_BIF_types ? type_ops_callbacks.fix_BIF_types(t) : t;
    }
    if (op_is_int_compare(t->op) || op_is_float_compare(t->op)) return fix_comparison(t);
    if (opcode_is_ASG(t->op)) return fix_compound(t);
    fix_operands(t);
    return t;
}

} // namespace

NODE* insert_mandatory_casts(NODE* tree) {
    if (!tree) return tree;
    bool is_assignment = opcode_is_ASG(tree->op);
    tree = fix_value(tree);
    // An assignment that stands alone has the type of its variable; its value needs no cast.
    while (is_assignment && (tree->op == SCONV || tree->op == PCONV) && opcode_is_ASG(tree->left->op)) {
        NODE* cast = tree;
        tree = cast->left;
        erase_node(cast);
    }
    return tree;
}

// A cast that was moved under a sum is put back above it; the sum gets the type of its own pointer again.
NODE* remove_pushed_down_casts(NODE* tree) {
    if (!tree) return tree;
    TYPE* old = tree->type;
    tree->left = remove_pushed_down_casts(tree->left);
    tree->right = remove_pushed_down_casts(tree->right);
    if ((tree->op == ICALL || tree->op == MCALL) && type_ops_callbacks.fix_BIF_types)
        return type_ops_callbacks.fix_BIF_types(tree);
    if ((tree->op != PLUS && tree->op != MINUS) || !tree->type->is_pointer()) return tree;
    while ((tree->left->op == PCONV || tree->left->op == ISP2CHAR) && tree->left->left->type->is_pointer()) {
        NODE* cast = tree->left;
        tree->left = cast->left;
        erase_node(cast);
    }
    tree->type = operator_type_for_operand_types(tree->op, tree->left->type, tree->right->type, nullptr, nullptr);
    return coerce_to_type(old, tree);
}
