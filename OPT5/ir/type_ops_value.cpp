// What the types and forms of trees prove about their values.

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

static TYPE* element_type(TYPE* t) { return t->is_vector() ? t->elem_type() : t; }
static bool is_integral(const TYPE* t) { return t->is_int() || t->is_enum(); }

bool type_returns_1_or_0(TYPE* t) { return t && element_type(t)->is_bool(); }

static bool symbol_is_boolean(const SYMTAB* sym) {
    return sym && ((sym->type && sym->type->is_bool()) || (sym->orig_type && sym->orig_type->is_bool()) ||
                   (sym->cpp_type && sym->cpp_type->is_bool()));
}

// Nodes that the question looks at, so that asking at every node of a tree stays linear.
constexpr int MOST_NODES = 24;

static bool returns_1_or_0(const NODE* t, int* budget);

static bool operand_of_ABS_returns_1_or_0(const NODE* t, int* budget) {
    // |x - 1| of a truth value is its opposite.
    bool is_decrement = t->op == PLUS && t->right->op == ICON && t->right->u.lval == INT65(-1) && t->type->is_signed();
    return returns_1_or_0(is_decrement ? t->left : t, budget);
}

static bool known_bits_are_one_bit(const NODE* t) {
    TYPE* type = element_type(t->type);
    if (!type_ops_callbacks.find_known_zeros || t->type->is_vector()) return false;
    INT65 above = type_mask(type) & ~INT65(1);
    return (above & ~type_ops_callbacks.find_known_zeros(t, type)).is_zero();
}

static bool returns_1_or_0(const NODE* t, int* budget) {
    if (--*budget < 0) return false;
    if (!is_integral(element_type(t->type))) return false;
    switch (t->op) {
    case NAME:
        if (t->type->is_bool() || symbol_is_boolean(t->u.sym)) return true;
        break;
    case ICON: return !t->u.lval.is_negative() && t->u.lval < INT65(2);
    case MINUS:
        if (t->left->op == ICON && t->left->u.lval == INT65(1) && returns_1_or_0(t->right, budget)) return true;
        break;
    case MULT:
    case ORB:
    case XORB:
    case COLON:
        if (returns_1_or_0(t->left, budget) && returns_1_or_0(t->right, budget)) return true;
        break;
    case ANDB:
        if (returns_1_or_0(t->left, budget) || returns_1_or_0(t->right, budget)) return true;
        break;
    case UMULT:
        if (t->type->is_bool()) return true;
        if (!t->right && t->left->op == UAND && equiv_mtypes(t->left->left->type, t->type))
            return returns_1_or_0(t->left->left, budget);
        break;
    case QUEST: return returns_1_or_0(t->right, budget);
    case ABS:
        if (operand_of_ABS_returns_1_or_0(t->left, budget)) return true;
        break;
    case STDOT:
    case STREF: {
        const fkMDATA* m = t->right ? t->right->mval : nullptr;
        if (t->type->is_bool() || (m && m->is_bitfld && m->width == 1 && m->type->is_unsigned())) return true;
        break;
    }
    case CALL:
    case UCALL: return type_returns_1_or_0(t->type);
    case SCONV:
        if (t->type->is_bool()) return true;
        [[fallthrough]];
    case ACONV:
    case VPACKM:
    case VSCONV:
    case SSA_USE:
    case SSA_DEF:
    case SSA_MU:
    case SSA_CHI:
        if (returns_1_or_0(t->left, budget)) return true;
        break;
    case ICALL:
    case MCALL:
    case UICALL:
        if (type_ops_callbacks.builtin_returns_1_or_0 && type_ops_callbacks.builtin_returns_1_or_0(t->u.name))
            return true;
        break;
    default:
        if (boolean_result[t->op] && !t->type->is_vector()) return true;
    }
    return known_bits_are_one_bit(t);
}

bool returns_1_or_0(const NODE* t) {
    int budget = MOST_NODES;
    return returns_1_or_0(t, &budget);
}

bool value_fits_in_type(const NODE* tree, TYPE* t, struct LOOP* loop) {
    TYPE* own = tree->type;
    if (compatible_types(own, t, true)) return true;
    if (!own->is_scalar() || !t->is_scalar() || own->is_complex() != t->is_complex()) return false;
    if (own->is_complex()) {
        TYPE *own_part = own->part_type(), *part = t->part_type();
        if (tree->op == COMPLEX)
            return value_fits_in_type(tree->left, part, loop) && value_fits_in_type(tree->right, part, loop);
        bool alike = (own_part->is_float() && part->is_float()) ||
                     (own_part->is_int() && part->is_int() && is_same_sign(own_part, part));
        return alike && own_part->size <= part->size;
    }
    if ((own->is_float() && t->is_float()) || (own->is_pointer() && t->is_pointer())) return own->size <= t->size;
    if (!is_integral(own) || !is_integral(t)) return false;
    if (t->is_bool()) return returns_1_or_0(tree);
    INT65 min = int_type_min(own), max = int_type_max(own), known_min, known_max;
    if (tree->op == ICON)
        min = max = tree->u.lval;
    else if (type_ops_callbacks.calculate_bounds &&
             type_ops_callbacks.calculate_bounds(tree, loop, &known_min, &known_max)) {
        min = known_min;
        max = known_max;
    }
    return min >= int_type_min(t) && max <= int_type_max(t);
}
