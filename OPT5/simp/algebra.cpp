// Algebra of integers as the target computes them: in two's complement at the operator's width.
//
// Canonical forms that the rules keep and others match: a constant stands on the right of a commutative operator and of
// a compare; constants of a chain of one operator are joined; a multiplication or division of unsigned values by a
// power of two that can be a shift or a mask is one. An operand is only dropped with its side effects kept in front of
// the result. Every rule asks that the operands have the operator's own type, so that no conversion is skipped.

#include "OPT5/simp/algebra.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/simp.h"

#include <utility>

namespace {

bool is_integer(const TYPE* t) { return t->is_int() && !t->is_bool() && t->size <= 64; }
bool same_integers(const TYPE* a, const TYPE* b) {
    return is_integer(a) && is_integer(b) && a->size == b->size && a->is_unsigned() == b->is_unsigned();
}
bool operands_have_type(const NODE* t) {
    return same_integers(t->left->type, t->type) && same_integers(t->right->type, t->type);
}
bool is_icon(const NODE* t) { return t->op == ICON; }
bool is_icon(const NODE* t, INT65 v) { return t->op == ICON && t->u.lval == v; }
bool is_all_ones(const NODE* t) { return t->op == ICON && (t->u.lval & type_mask(t->type)) == type_mask(t->type); }
bool is_pure(const NODE* t) { return !tree_has_side_effects(t); }
// Congruence without effects ends at the first difference, so that asking at every node of a deep tree stays cheap.
bool same_pure_value(const NODE* a, const NODE* b) { return a->op == b->op && trees_are_congruent(a, b, false); }

// Frees the node and one operand, which must have no value that counts and no effects; the other operand stands for it.
NODE* only_left(NODE* t) {
    NODE* kept = t->left;
    TYPE* type = t->type;
    erase_tree(t->right);
    erase_node(t);
    return coerce_to_type(type, kept);
}

// The node's value is `value`; the effects of its operands, left first, come before it.
NODE* constant_for(NODE* t, INT65 value) {
    NODE* result = mk_ICON(value, t->type->stqs());
    result->ls = t->ls;
    NODE* left = t->left ? peel_for_effect(t->left) : nullptr;
    NODE* right = t->right ? peel_for_effect(t->right) : nullptr;
    erase_node(t);
    NODE* effects = left && right ? mk_COMMAOP(left, right) : left ? left : right;
    return mk_COMMAOP(effects, result);
}

void set_icon(NODE* t, INT65 v) { t->u.lval = truncate_to_type(v, t->type); }

void constant_to_the_right(NODE* t) {
    if (is_icon(t->left) && !is_icon(t->right)) std::swap(t->left, t->right);
}

// (x op c1) op c2 with an associative operator: the constants join by `join`.
template <class JOIN>
NODE* join_constants(NODE* t, JOIN join) {
    NODE* inner = t->left;
    if (inner->op != t->op || !is_icon(t->right) || !is_icon(inner->right) || !operands_have_type(inner) ||
        !same_integers(inner->type, t->type))
        return t;
    set_icon(t->right, join(inner->right->u.lval, t->right->u.lval));
    t->left = inner->left;
    erase_tree(inner->right);
    erase_node(inner);
    return t;
}

NODE* to_unary(NODE* t, int op, NODE* operand) {
    t->op = op;
    t->left = operand;
    t->right = nullptr;
    return t;
}

// The power of two of a constant at its type's width: an unsigned 0x8000 is one, a signed -32768 is not.
int log2_of(const NODE* t) { return t->op == ICON ? power_of_2(t->u.lval) : -1; }

NODE* shift_count(int n) { return mk_ICON(INT65(n), tp->int_t); }

} // namespace

NODE* simp_by_known_bits(NODE* t) {
    if (!is_integer(t->type) || is_icon(t)) return t;
    const KNOWN_BITS k = known_bits(t);
    const uint64_t mask = type_mask(t->type).value;
    if ((k.zeros | k.ones) != mask) return t;
    return constant_for(t, truncate_to_type(INT65(0, k.ones), t->type));
}

NODE* simp_PLUS(NODE* t) {
    if (t->type->is_pointer()) {
        if (is_icon(t->right, INT65(0)) && t->left->type->is_pointer()) return only_left(t);
        return t;
    }
    if (!operands_have_type(t)) return t;
    constant_to_the_right(t);
    t = join_constants(t, [](INT65 a, INT65 b) { return a + b; });
    if (is_icon(t->right, INT65(0))) return only_left(t);
    // x + -y, and -x + y: a subtraction. Operands are only exchanged where the order of their effects does not show.
    if (t->right->op == UMINUS && same_integers(t->right->left->type, t->type)) {
        NODE* negation = t->right;
        t->op = MINUS;
        t->right = negation->left;
        erase_node(negation);
        return simp_MINUS(t);
    }
    if (t->left->op == UMINUS && same_integers(t->left->left->type, t->type) && is_pure(t->left) && is_pure(t->right)) {
        NODE* negation = t->left;
        t->op = MINUS;
        t->left = t->right;
        t->right = negation->left;
        erase_node(negation);
        return simp_MINUS(t);
    }
    return t;
}

NODE* simp_MINUS(NODE* t) {
    if (t->type->is_pointer()) {
        if (is_icon(t->right, INT65(0)) && t->left->type->is_pointer()) return only_left(t);
        return t;
    }
    if (!operands_have_type(t)) return t;
    if (is_icon(t->right, INT65(0))) return only_left(t);
    if (same_pure_value(t->left, t->right)) return constant_for(t, INT65(0));
    if (is_icon(t->left, INT65(0))) {
        NODE* operand = t->right;
        erase_tree(t->left);
        return to_unary(t, UMINUS, operand);
    }
    if (t->right->op == UMINUS && same_integers(t->right->left->type, t->type)) {
        NODE* negation = t->right;
        t->op = PLUS;
        t->right = negation->left;
        erase_node(negation);
        return simp_PLUS(t);
    }
    // (x + c1) - c2: one constant.
    NODE* inner = t->left;
    if (is_icon(t->right) && inner->op == PLUS && is_icon(inner->right) && operands_have_type(inner)) {
        set_icon(inner->right, inner->right->u.lval - t->right->u.lval);
        return simp_PLUS(only_left(t));
    }
    return t;
}

NODE* simp_MULT(NODE* t) {
    if (!operands_have_type(t)) return t;
    constant_to_the_right(t);
    t = join_constants(t, [](INT65 a, INT65 b) { return a * b; });
    if (is_icon(t->right, INT65(0))) return constant_for(t, INT65(0));
    if (is_icon(t->right, INT65(1))) return only_left(t);
    if (is_all_ones(t->right)) {
        erase_tree(t->right);
        return to_unary(t, UMINUS, t->left);
    }
    if (t->left->op == UMINUS && is_icon(t->right) && same_integers(t->left->left->type, t->type)) {
        NODE* negation = t->left;
        set_icon(t->right, -t->right->u.lval);
        t->left = negation->left;
        erase_node(negation);
    }
    return t;
}

NODE* simp_DIV(NODE* t) {
    if (!operands_have_type(t) || !is_icon(t->right)) return t;
    if (is_icon(t->right, INT65(1))) return only_left(t);
    if (t->type->is_unsigned()) {
        const int n = log2_of(t->right);
        if (n <= 0) return t;
        erase_tree(t->right);
        t->op = SRL;
        t->right = shift_count(n);
        return simp_shift(t);
    }
    if (is_icon(t->right, INT65(-1))) {
        erase_tree(t->right);
        return to_unary(t, UMINUS, t->left);
    }
    return t;
}

NODE* simp_MOD(NODE* t) {
    if (!operands_have_type(t) || !is_icon(t->right)) return t;
    if (is_icon(t->right, INT65(1)) || (!t->type->is_unsigned() && is_icon(t->right, INT65(-1))))
        return constant_for(t, INT65(0));
    const int n = log2_of(t->right);
    if (n <= 0 || !tree_is_non_negative(t->left, nullptr)) return t;
    t->op = ANDB;
    set_icon(t->right, t->right->u.lval - INT65(1));
    return simp_bitop(t);
}

NODE* simp_shift(NODE* t) {
    if (!same_integers(t->left->type, t->type) || !is_icon(t->right)) return t;
    const INT65 width(t->type->size), n = t->right->u.lval;
    if (n.is_negative() || n >= width) return t;
    if (n.is_zero()) return only_left(t);
    NODE* inner = t->left;
    const bool nests = inner->op == t->op && is_icon(inner->right) && same_integers(inner->left->type, t->type) &&
                       !inner->right->u.lval.is_negative() && inner->right->u.lval < width;
    if (!nests) return t;
    // Two shifts the same way are one. Past the width, a signed right shift leaves copies of the sign, the others zero.
    INT65 sum = n + inner->right->u.lval;
    if (sum >= width) {
        if (t->op == SLL || t->type->is_unsigned()) return constant_for(t, INT65(0));
        sum = width - INT65(1);
    }
    t->right->u.lval = sum;
    t->left = inner->left;
    erase_tree(inner->right);
    erase_node(inner);
    return t;
}

namespace {

NODE* simp_ANDB(NODE* t) {
    t = join_constants(t, [](INT65 a, INT65 b) { return a & b; });
    if (same_pure_value(t->left, t->right)) return only_left(t);
    if (!is_icon(t->right)) return t;
    const uint64_t mask = type_mask(t->type).value, kept = t->right->u.lval.value & mask;
    if (((known_bits(t->left).zeros | kept) & mask) == mask) return only_left(t);
    return t;
}

NODE* simp_ORB(NODE* t) {
    t = join_constants(t, [](INT65 a, INT65 b) { return a | b; });
    if (same_pure_value(t->left, t->right)) return only_left(t);
    if (!is_icon(t->right)) return t;
    const uint64_t mask = type_mask(t->type).value, set = t->right->u.lval.value & mask;
    if ((set & ~known_bits(t->left).ones) == 0) return only_left(t);
    return t;
}

NODE* simp_XORB(NODE* t) {
    t = join_constants(t, [](INT65 a, INT65 b) { return a ^ b; });
    if (same_pure_value(t->left, t->right)) return constant_for(t, INT65(0));
    if (is_icon(t->right, INT65(0))) return only_left(t);
    if (!is_all_ones(t->right)) return t;
    erase_tree(t->right);
    return simp_unary(to_unary(t, NOTB, t->left));
}

} // namespace

NODE* simp_bitop(NODE* t) {
    if (!operands_have_type(t)) return t;
    constant_to_the_right(t);
    NODE* r = t->op == ANDB ? simp_ANDB(t) : t->op == ORB ? simp_ORB(t) : simp_XORB(t);
    return r->op == ANDB || r->op == ORB || r->op == XORB ? simp_by_known_bits(r) : r;
}

NODE* simp_unary(NODE* t) {
    NODE* inner = t->left;
    if (inner->op != t->op || !same_integers(inner->type, t->type) || !same_integers(inner->left->type, t->type))
        return t;
    TYPE* type = t->type;
    NODE* operand = inner->left;
    erase_node(inner);
    erase_node(t);
    return coerce_to_type(type, operand);
}

// ---- Compares

namespace {

// Least and greatest value of a tree, from its known bits.
struct BOUNDS {
    INT65 min, max;
};

BOUNDS bounds_of(const NODE* t) {
    const KNOWN_BITS k = known_bits(t);
    const uint64_t mask = type_mask(t->type).value;
    uint64_t least = k.ones, most = ~k.zeros & mask;
    if (t->type->is_unsigned() || t->type->is_bool()) return {INT65(0, least), INT65(0, most)};
    const uint64_t sign = uint64_t(1) << (t->type->size - 1);
    if (!((k.zeros | k.ones) & sign)) { // the sign is open: least is negative, most is not
        least |= sign;
        most &= ~sign;
    }
    return {truncate_to_type(INT65(0, least), t->type), truncate_to_type(INT65(0, most), t->type)};
}

// -1: false, 1: true, 0: not decided.
int decide(int op, BOUNDS a, BOUNDS b) {
    auto less = [](BOUNDS x, BOUNDS y) { return x.max < y.min ? 1 : x.min >= y.max ? -1 : 0; };
    switch (op) {
    case LT:
    case ULT: return less(a, b);
    case GT:
    case UGT: return less(b, a);
    case GE:
    case UGE: return -less(a, b);
    case LE:
    case ULE: return -less(b, a);
    case EQ: return a.max < b.min || b.max < a.min ? -1 : 0;
    case NEQ: return a.max < b.min || b.max < a.min ? 1 : 0;
    default: return 0;
    }
}

bool holds_for_equals(int op) { return op == EQ || op == LE || op == GE || op == ULE || op == UGE; }

// A bit that is one on one side and zero on the other.
bool bits_differ(const NODE* a, const NODE* b) {
    const KNOWN_BITS x = known_bits(a), y = known_bits(b);
    return (x.ones & y.zeros) || (x.zeros & y.ones);
}

} // namespace

NODE* simp_relop(NODE* t) {
    if (!t->type->is_int() || t->type->is_vector()) return t;
    if (is_icon(t->left) && !is_icon(t->right) && commute_inv[t->op] != ILLOP) {
        std::swap(t->left, t->right);
        t->op = commute_inv[t->op];
    }
    // Widths and signs of both sides must be the compare's: a mixed pair is converted first.
    if (!same_integers(t->left->type, t->right->type) || t->left->type->size < tp->int_t->size) return t;
    const bool by_sign = t->op == EQ || t->op == NEQ || (t->op >= ULE) == t->left->type->is_unsigned();
    if (!by_sign) return t;
    if (same_pure_value(t->left, t->right)) return constant_for(t, INT65(holds_for_equals(t->op) ? 1 : 0));
    int outcome = decide(t->op, bounds_of(t->left), bounds_of(t->right));
    if (outcome == 0 && (t->op == EQ || t->op == NEQ) && bits_differ(t->left, t->right))
        outcome = t->op == NEQ ? 1 : -1;
    if (outcome) return constant_for(t, INT65(outcome > 0 ? 1 : 0));
    // x + c1 == c2, x ^ c1 == c2: exact in wrapping arithmetic.
    NODE* inner = t->left;
    const bool equality = t->op == EQ || t->op == NEQ;
    if (equality && is_icon(t->right) && (inner->op == PLUS || inner->op == XORB) && is_icon(inner->right) &&
        operands_have_type(inner)) {
        const INT65 c = inner->right->u.lval;
        set_icon(t->right, inner->op == PLUS ? t->right->u.lval - c : t->right->u.lval ^ c);
        t->left = inner->left;
        erase_tree(inner->right);
        erase_node(inner);
    }
    return t;
}

// ---- Conditional values and casts

NODE* simp_arms(NODE* t, struct LOOP* loop) {
    NODE* colon = t->right;
    if (colon->op != COLON) return t;
    // Equal arms: the condition does not matter.
    if (trees_are_congruent(colon->left, colon->right, true) && !tree_has_side_effects(colon->left)) {
        NODE *effects = peel_for_effect(t->left), *value = colon->left;
        TYPE* type = t->type;
        erase_tree(colon->right);
        erase_node(colon);
        erase_node(t);
        return mk_COMMAOP(effects, type->is_scalar() ? coerce_to_type(type, value) : value);
    }
    // c ? 1 : 0 and c ? 0 : 1.
    const bool truth = is_icon(colon->left, INT65(1)) && is_icon(colon->right, INT65(0));
    const bool falsity = is_icon(colon->left, INT65(0)) && is_icon(colon->right, INT65(1));
    if ((!truth && !falsity) || !is_integer(t->type)) return t;
    TYPE* type = t->type;
    NODE* condition = make_boolean(t->left, loop);
    if (falsity) condition = invert_boolean_tree(condition);
    erase_tree(colon);
    erase_node(t);
    return coerce_to_type(type, condition);
}

// A cast of a cast to no fewer bits than the outer one keeps: only the outer counts. The bits that it keeps are the
// operand's own, or copies of its sign that either cast would make. A bit-field keeps the cast that reads it.
NODE* simp_cast_of_cast(NODE* t) {
    NODE* inner = t->left;
    if (inner->op != SCONV || !is_integer(t->type) || !is_integer(inner->type) || !is_integer(inner->left->type))
        return t;
    if (inner->left->op == STDOT || inner->left->op == STREF || inner->type->size < t->type->size) return t;
    TYPE* type = t->type;
    NODE* operand = inner->left;
    erase_node(inner);
    erase_node(t);
    return coerce_to_type(type, operand);
}
