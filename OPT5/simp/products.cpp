// Products, quotients and remainders of integers, and powers.
//
// Canonical forms: the constant of a product stands outermost, on the right, and positive, under a negation if need be;
// a product with a power of two stays a product; a division of an unsigned or non-negative value by a power of two is a
// shift, a remainder a mask. Nothing is taken from the absence of overflow: where a rule holds for true values only,
// the bounds of the operands must show that nothing wraps. And nothing is made to overflow: see exact.h.

#include "OPT5/ir/global.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

using namespace rules;

namespace {

bool in_type(INT65 v, TYPE* type) { return truncate_to_type(v, type) == v; }

// Whether the negation of the tree is the negative of its value.
bool negates_exactly(const NODE* t, struct LOOP* loop) {
    return is_signed(t->type) && tree_is_not_ivalue(t, int_type_min(t->type), loop);
}

bool is_negatable_constant(const NODE* t) {
    return is_icon(t) && is_signed(t->type) && t->u.lval.is_negative() && t->u.lval != int_type_min(t->type);
}

// ---- Products
NODE* multiply_by_small_constant(NODE* t, struct LOOP* loop) {
    NODE* c = t->right;
    if (!is_icon(c)) return nullptr;
    if (is_icon(c, INT65(0))) return constant_for(t, INT65(0));
    if (is_icon(c, INT65(1))) return only_left(t);
    if (is_all_ones(c)) {
        erase_node(c);
        return simp_node(to_unary(t, UMINUS, t->left), loop);
    }
    if (!is_negatable_constant(c)) return nullptr;
    // The least number has a negative without being one, and is a product of powers of two alone.
    const INT65 magnitude = -c->u.lval;
    set_icon(c, magnitude);
    if (power_of_2(magnitude) > 0 && !signed_result_is_exact(MULT, t->left, c, t->type, loop)) {
        set_icon(c, -magnitude);
        return nullptr;
    }
    TYPE* type = t->type;
    return made(UMINUS, simp_node(t, loop), nullptr, type, loop);
}

// -x * c: the constant takes the sign. -x * -y: none is left.
NODE* multiply_negation(NODE* t, struct LOOP* loop) {
    const bool left = is_unary(t->left, UMINUS), right = is_unary(t->right, UMINUS);
    if (!left && !right) return nullptr;
    if (left && is_icon(t->right)) {
        const INT65 c = -t->right->u.lval;
        if (!fits_or_wraps(c, t->type)) return nullptr;
        t->left = take_left(t->left);
        set_icon(t->right, c);
        return simp_node(t, loop);
    }
    const NODE *x = left ? t->left->left : t->left, *y = right ? t->right->left : t->right;
    if (left != right && !signed_result_is_exact(MULT, x, y, t->type, loop)) return nullptr;
    if (left) t->left = take_left(t->left);
    if (right) t->right = take_left(t->right);
    TYPE* type = t->type;
    t = simp_node(t, loop);
    return left != right ? made(UMINUS, t, nullptr, type, loop) : t;
}

// x * c1 * c2, (x << n) * c, and the constant of either operand moved outward: what is multiplied by it, which is no
// 0, 1 or -1, is smaller than the product.
NODE* join_factors(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (is_icon(t->right)) {
        if (is_node_with_icon(inner, MULT)) {
            const INT65 product = inner->right->u.lval * t->right->u.lval;
            if (!fits_or_wraps(product, t->type)) return nullptr;
            set_icon(t->right, product);
            erase_node(inner->right);
            t->left = take_left(inner);
            return simp_node(t, loop);
        }
        if (const int n = inner->op == SLL ? shift_count_of(inner) : 0) {
            const INT65 product = t->right->u.lval << INT65(n);
            if (!fits_or_wraps(product, t->type)) return nullptr;
            set_icon(t->right, product);
            erase_node(inner->right);
            t->left = take_left(inner);
            return kept_exact(t, loop);
        }
        return nullptr;
    }
    const bool on_left = is_node_with_icon(inner, MULT);
    if (!on_left && !is_node_with_icon(t->right, MULT)) return nullptr;
    if (!on_left) inner = t->right;
    NODE *x = inner->left, *c = inner->right;
    (on_left ? t->left : t->right) = x;
    erase_node(inner);
    TYPE* type = t->type;
    return made(MULT, simp_node(t, loop), c, type, loop);
}

// (x + c1) * c2, (c1 - x) * c2, where neither product loses anything.
NODE* distribute(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right) || (inner->op != PLUS && inner->op != MINUS) || !operands_have_type(inner)) return nullptr;
    const bool on_right = is_icon(inner->right);
    if (!on_right && !is_icon(inner->left)) return nullptr;
    NODE* c1 = on_right ? inner->right : inner->left;
    const INT65 product = c1->u.lval * t->right->u.lval;
    if (!in_type(product, t->type)) return nullptr;
    NODE* x = on_right ? inner->left : inner->right;
    if (!signed_result_is_exact(MULT, x, t->right, t->type, loop)) return nullptr;
    set_icon(c1, product);
    NODE* scaled = made(MULT, x, t->right, t->type, loop);
    (on_right ? inner->left : inner->right) = scaled;
    TYPE* type = t->type;
    erase_node(t);
    return coerce_to_type(type, simp_node(inner, loop));
}

// (x / c) * c of an x that c divides.
NODE* undo_exact_division(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right) || !is_node_with_icon(inner, DIV) || inner->right->u.lval != t->right->u.lval)
        return nullptr;
    const INT65 c = t->right->u.lval;
    if (c <= INT65(0) || !(max_ICON_factor(inner->left, loop) % c).is_zero()) return nullptr;
    t->left = inner->left;
    erase_node(inner->right);
    erase_node(inner);
    return only_left(t);
}

NODE* multiply_truth_values(NODE* t, struct LOOP* loop) {
    if (is_icon(t->right) || !returns_1_or_0(t->left) || !returns_1_or_0(t->right)) return nullptr;
    t->op = ANDB;
    return simp_node(t, loop);
}

// A cast under a constant factor: the factor of what is cast counts too, where that product is exact.
NODE* multiply_under_cast(NODE* t, struct LOOP* loop) {
    NODE* cast = t->left;
    if (!is_icon(t->right) || cast->op != SCONV || !is_integer(cast->left->type)) return nullptr;
    NODE* inner = cast->left;
    if (!is_node_with_icon(inner, MULT) || !is_signed(inner->type) || !is_signed(t->type) ||
        inner->type->size > t->type->size)
        return nullptr;
    if (expr_product_may_overflow(inner, loop)) return nullptr;
    const INT65 product = inner->right->u.lval * t->right->u.lval;
    if (!in_type(product, t->type)) return nullptr;
    set_icon(t->right, product);
    erase_node(inner->right);
    cast->left = take_left(inner);
    t->left = simp_node(cast, loop);
    return simp_node(t, loop);
}

const RULE product_rules[] = {multiply_by_small_constant, multiply_negation,     join_factors,        distribute,
                              undo_exact_division,        multiply_truth_values, multiply_under_cast, by_pattern};

// ---- Powers: x ** n times x ** m
bool same_base(const NODE* power, const NODE* x) { return power->op == EXPT && same_value(power->left, x); }

// Whether x ** n * x ** m is x ** (n + m): of integers only where no exponent is negative and their sum does not wrap.
bool exponents_add(const NODE* n, const NODE* m, const TYPE* type, struct LOOP* loop) {
    if (type->is_float()) return !strict_fp;
    INT65 min_n, max_n, min_m, max_m;
    return calculate_bounds(n, loop, &min_n, &max_n) && calculate_bounds(m, loop, &min_m, &max_m) &&
           !min_n.is_negative() && !min_m.is_negative() && in_type(max_n + max_m, n->type);
}

NODE* simp_powers(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (!is_integer(l->right->type) || !compatible_types(l->type, t->type, true) ||
        !compatible_types(r->type, t->type, true))
        return t;
    const bool once = same_base(l, r), both = !once && r->op == EXPT && same_value(l->left, r->left);
    if (!once && !(both && same_integers(l->right->type, r->right->type))) return t;
    NODE* exponent = once ? mk_ICON(INT65(1), l->right->type->stqs()) : copy_tree(r->right); // x is x ** 1
    if (!exponents_add(l->right, exponent, t->type, loop)) {
        erase_tree(exponent);
        return t;
    }
    erase_tree(r);
    l->right = made(PLUS, l->right, exponent, l->right->type->stqs(), loop);
    return simp_node(take_left(t), loop);
}

// ---- Quotients
// Where both have the sign that they seem to have: the greatest dividend in magnitude stays below the divisor.
bool quotient_is_zero(const NODE* x, INT65 divisor, struct LOOP* loop) {
    INT65 min, max;
    if (!calculate_bounds(x, loop, &min, &max)) return false;
    if (divisor.is_negative()) divisor = -divisor;
    return max < divisor && -min < divisor;
}

NODE* divide_trivially(NODE* t, struct LOOP* loop) {
    if (is_icon(t->left, INT65(0)) && !is_icon(t->right)) {
        NODE* zero = icon_of(INT65(0), t);
        erase_node(t->left);
        return mk_COMMAOP(peel_for_effect(take_right(t)), zero);
    }
    if (same_value(t->left, t->right) && !is_icon(t->right)) return constant_for(t, INT65(t->op == DIV ? 1 : 0));
    if (!is_icon(t->right)) return nullptr;
    if (is_icon(t->right, INT65(1))) return t->op == DIV ? only_left(t) : constant_for(t, INT65(0));
    if (!is_icon(t->right, INT65(0)) && quotient_is_zero(t->left, t->right->u.lval, loop))
        return t->op == DIV ? constant_for(t, INT65(0)) : only_left(t);
    return nullptr;
}

// The sign moves outside: a division truncates toward zero whatever the signs.
NODE* divide_negations(NODE* t, struct LOOP* loop) {
    if (t->type->is_unsigned()) return nullptr;
    NODE *l = t->left, *r = t->right;
    TYPE* type = t->type;
    if (is_icon(r, INT65(-1))) {
        t->op = MULT;
        return simp_node(t, loop);
    }
    const bool negative_left = is_negatable_constant(l) || (is_unary(l, UMINUS) && negates_exactly(l->left, loop));
    // Of a divisor the sign counts too: it may become -1, for which the least number has no quotient.
    const bool negative_right =
        is_negatable_constant(r) || (is_unary(r, UMINUS) && negates_exactly(r->left, loop) && negates_exactly(l, loop));
    if (!negative_left && !negative_right) return nullptr;
    auto negate = [](NODE* x) {
        if (!is_icon(x)) return take_left(x);
        set_icon(x, -x->u.lval);
        return x;
    };
    if (negative_left) t->left = negate(l);
    if (negative_right) t->right = negate(r);
    t = simp_node(t, loop);
    return negative_left != negative_right ? made(UMINUS, t, nullptr, type, loop) : t;
}

NODE* divide_by_power_of_2(NODE* t, struct LOOP* loop) {
    const int n = log2_of(t->right);
    if (n <= 0 || !tree_is_non_negative(t->left, loop)) return nullptr;
    erase_node(t->right);
    t->op = SRL;
    t->right = mk_ICON(INT65(n), tp->int_t);
    return simp_node(t, loop);
}

// x / c1 / c2, (x >> n) / c
NODE* join_divisors(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right)) return nullptr;
    INT65 c1;
    if (is_node_with_icon(inner, DIV))
        c1 = inner->right->u.lval;
    else if (inner->op == SRL && shift_count_of(inner) && tree_is_non_negative(inner->left, loop))
        c1 = INT65(1) << INT65(shift_count_of(inner));
    else
        return nullptr;
    const INT65 c2 = t->right->u.lval;
    if (c1 <= INT65(1) || c2 <= INT65(1) || prod_may_overflow(c1, c2, t->type)) return nullptr;
    set_icon(t->right, c1 * c2);
    erase_node(inner->right);
    t->left = take_left(inner);
    return simp_node(t, loop);
}

// (x * c1) / c2 of a product that cannot wrap, where one constant is a multiple of the other.
NODE* divide_product(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right) || !is_node_with_icon(inner, MULT) || expr_product_may_overflow(inner, loop)) return nullptr;
    const INT65 c1 = inner->right->u.lval, c2 = t->right->u.lval;
    if (c1 <= INT65(0) || c2 <= INT65(0)) return nullptr;
    const bool multiple = (c1 % c2).is_zero(), divisor = (c2 % c1).is_zero();
    if (!multiple && !divisor) return nullptr;
    if (multiple) {
        set_icon(inner->right, c1 / c2);
        return simp_node(only_left(t), loop);
    }
    set_icon(t->right, c2 / c1);
    erase_node(inner->right);
    t->left = take_left(inner);
    return simp_node(t, loop);
}

// (x + c1) / c2 of an x that c2 divides: into both terms, where the sum cannot wrap and its sign is known.
NODE* divide_sum(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right) || !is_node_with_icon(inner, PLUS)) return nullptr;
    const INT65 c1 = inner->right->u.lval, c2 = t->right->u.lval;
    if (c2 <= INT65(1) || c1.is_negative()) return nullptr;
    INT65 min, max;
    if (!calculate_bounds(inner->left, loop, &min, &max) || min.is_negative() || !in_type(max + c1, t->type))
        return nullptr;
    if (!(max_ICON_factor(inner->left, loop) % c2).is_zero()) return nullptr;
    NODE* c = inner->right;
    set_icon(c, c1 / c2);
    t->left = inner->left;
    erase_node(inner);
    TYPE* type = t->type;
    return made(PLUS, simp_node(t, loop), c, type, loop);
}

NODE* simp_DIV_by_ICON(NODE* t, struct LOOP* loop) {
    if (!is_icon(t->right) || is_icon(t->right, INT65(0))) return nullptr;
    for (RULE rule : {join_divisors, divide_product, divide_sum, divide_by_power_of_2})
        if (NODE* r = rule(t, loop)) return r;
    return nullptr;
}

// ---- Remainders
NODE* remainder_of_division(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (!is_icon(r) || is_icon(r, INT65(0))) return nullptr;
    if (is_icon(r, INT65(-1)) && !t->type->is_unsigned()) return constant_for(t, INT65(0));
    // The remainder has the dividend's sign; the divisor's does not count.
    if (is_negatable_constant(r)) {
        set_icon(r, -r->u.lval);
        return simp_node(t, loop);
    }
    if (r->u.lval.is_negative()) return nullptr;
    if (is_node_with_icon(l, MOD) && l->right->u.lval > INT65(0) && (l->right->u.lval % r->u.lval).is_zero()) {
        t->left = l->left;
        erase_node(l->right);
        erase_node(l);
        return simp_node(t, loop);
    }
    if (log2_of(r) > 0 && tree_is_non_negative(l, loop)) {
        t->op = ANDB;
        set_icon(r, r->u.lval - INT65(1));
        return simp_node(t, loop);
    }
    if ((max_ICON_factor(l, loop) % r->u.lval).is_zero()) return constant_for(t, INT65(0));
    return nullptr;
}

} // namespace

NODE* simp_MULT(NODE* t, struct LOOP* loop) {
    order_operands(t);
    if (t->left->op == EXPT) {
        t = simp_powers(t, loop);
        if (t->op != MULT) return t;
    }
    if (t->type->is_float()) return simp_float_MULT(t, loop);
    if (!operands_have_type(t)) return t;
    t = first_that_applies(product_rules, t, loop);
    return t->op == MULT ? simp_by_known_bits(t) : t;
}

NODE* simp_DIV(NODE* t, struct LOOP* loop) {
    if (t->type->is_float()) return simp_float_DIV(t, loop);
    if (!operands_have_type(t)) return t;
    static const RULE table[] = {divide_trivially, divide_negations, simp_DIV_by_ICON, by_pattern};
    t = first_that_applies(table, t, loop);
    return t->op == DIV ? simp_by_known_bits(t) : t;
}

NODE* simp_MOD(NODE* t, struct LOOP* loop) {
    if (!operands_have_type(t)) return t;
    static const RULE table[] = {divide_trivially, remainder_of_division, by_pattern};
    t = first_that_applies(table, t, loop);
    return t->op == MOD ? simp_by_known_bits(t) : t;
}
