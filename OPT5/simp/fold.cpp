// Constant folding of integers and addresses.
//
// The operands of a node have the type that the operator computes in (`insert_mandatory_casts` sees to it), and their
// values are truncated to it. The operation is exact in 65 bits, up to bits above the 64th that no result has, and is
// then truncated to the node's type. A division by zero, and a shift by a negative count, are left for the run.

#include "OPT5/simp/fold.h"

#include "OPT5/ir/type_ops.h"

#include <optional>

namespace {

using VALUE = std::optional<INT65>;

bool is_integral(const TYPE* t) { return t->is_int() || t->is_enum(); }

VALUE truth(bool b) { return INT65(b ? 1 : 0); }

VALUE power(INT65 base, INT65 exponent) {
    if (base == INT65(1) || exponent.is_zero()) return INT65(1);
    if (base == INT65(-1)) return (exponent & INT65(1)).is_zero() ? INT65(1) : INT65(-1);
    if (exponent.is_negative()) return {};
    INT65 result(1);
    for (; !exponent.is_zero(); exponent = exponent >> INT65(1)) {
        if (!(exponent & INT65(1)).is_zero()) result = result * base;
        base = INT65(0, (base * base).value); // the low bits are all that count
    }
    return result;
}

VALUE shift_right(INT65 v, INT65 count, const TYPE* type) {
    if (count.is_negative()) return {};
    if (!type->is_signed()) v = v & type_mask(type);
    if (count >= INT65(64)) return v.is_negative() ? INT65(-1) : INT65(0);
    return v >> count;
}

VALUE unary_value(int op, INT65 v) {
    switch (op) {
    case UMINUS: return -v;
    case ABS: return v.is_negative() ? -v : v;
    case NOTB: return ~v;
    case SQR: return v * v;
    case EXCLAIM: return truth(v.is_zero());
    default: return {};
    }
}

VALUE binary_value(int op, INT65 v, INT65 w, const TYPE* type) {
    switch (op) {
    case PLUS: return v + w;
    case MINUS: return v - w;
    case MULT: return v * w;
    case ANDB: return v & w;
    case ORB: return v | w;
    case XORB: return v ^ w;
    case DIV: return w.is_zero() ? VALUE() : v / w;
    case MOD: return w.is_zero() ? VALUE() : v % w;
    case SLL: return w.is_negative() ? VALUE() : v << w;
    case SRL: return shift_right(v, w, type);
    case ANDAND: return truth(!v.is_zero() && !w.is_zero());
    case OROR: return truth(!v.is_zero() || !w.is_zero());
    case EXPT: return power(v, w);
    case EQ: return truth(v == w);
    case NEQ: return truth(v != w);
    case LE:
    case ULE: return truth(v <= w);
    case LT:
    case ULT: return truth(v < w);
    case GE:
    case UGE: return truth(v >= w);
    case GT:
    case UGT: return truth(v > w);
    default: return {};
    }
}

// A number as an address, through casts: 32 bits without sign.
bool is_address_constant(const NODE* t, INT65* value) {
    if (!t->type->is_pointer()) return false;
    while ((t->op == PCONV || t->op == ISP2CHAR) && t->left) t = t->left;
    if (t->op != ICON) return false;
    *value = t->u.lval & type_mask(tp->void_ptr_t);
    return true;
}

NODE* fold_address_comparison(NODE* t) {
    INT65 v, w;
    if (!op_is_int_compare(t->op) || !is_address_constant(t->left, &v) || !is_address_constant(t->right, &w)) return t;
    return integer_in_place_of(t, *binary_value(t->op, v, w, tp->ulong_t), t->type);
}

// An integer constant as its type holds it.
bool is_integer_constant(const NODE* t) { return t->op == ICON && is_integral(t->type); }
INT65 value_of(const NODE* t) { return truncate_to_type(t->u.lval, t->type); }

NODE* fold_integer_node(NODE* t) {
    if (!is_integral(t->type) || !is_integer_constant(t->left) || (t->right && !is_integer_constant(t->right)))
        return t;
    INT65 v = value_of(t->left);
    if (t->op == SCONV) return integer_in_place_of(t, v, t->type);
    VALUE value = t->right ? binary_value(t->op, v, value_of(t->right), t->type) : unary_value(t->op, v);
    return value ? integer_in_place_of(t, *value, t->type) : t;
}

bool is_constant_operand(const NODE* t) {
    INT65 address;
    return t->op == ICON || t->op == FCON || is_address_constant(t, &address);
}

// The node, and the casts on constants under it.
NODE* fold_node(NODE* t) {
    if (!t->left) return t;
    if (!is_constant_operand(t->left)) t->left = fold_node(t->left);
    if (t->right && !is_constant_operand(t->right)) t->right = fold_node(t->right);
    if (!is_constant_operand(t->left) || (t->right && !is_constant_operand(t->right))) return t;
    if (is_float_fold(t)) return fold_float_node(t);
    if (t->left->type->is_pointer() || (t->right && t->right->type->is_pointer())) return fold_address_comparison(t);
    return fold_integer_node(t);
}

bool is_foldable_operator(int op) {
    if (op_is_int_compare(op) || op_is_float_compare(op)) return true;
    switch (op) {
    case PLUS:
    case MINUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB:
    case UMINUS:
    case ABS:
    case NOTB:
    case ANDAND:
    case OROR:
    case EXCLAIM:
    case DIV:
    case MOD:
    case SLL:
    case SRL:
    case EXPT:
    case SQR:
    case SQRT:
    case RECIP:
    case SCONV: return true;
    default: return false;
    }
}

} // namespace

bool is_float_fold(const NODE* t) {
    return t->type->is_float() || t->left->op == FCON || (t->right && t->right->op == FCON);
}

NODE* fold_constants(NODE* t) {
    if (!t || !t->left) return t;
    t->left = fold_constants(t->left);
    t->right = fold_constants(t->right);
    if (!is_foldable_operator(t->op) || t->type->is_vector()) return t;
    if (!is_constant_operand(t->left) || (t->right && !is_constant_operand(t->right))) return t;
    return fold_node(insert_mandatory_casts(t));
}
