// Factors. A factor of a value that may have wrapped is only sure up to its power of two: wrapping adds a power of two.
//
// Within this file 0 is a factor too, that of a value which is zero: everything divides it, and greatest common
// divisors come out right.

#include "OPT5/ir/trees.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/factor.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/linear_value.h"
#include "OPT5/simp/range.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

namespace {

using FACTOR = uint64_t; // of a magnitude

constexpr int MOST_NODES = 64, MOST_RANGES = 6; // looked at for one factor

FACTOR gcd(FACTOR a, FACTOR b) {
    while (b) {
        a %= b;
        std::swap(a, b);
    }
    return a;
}
FACTOR power_of_2_in(FACTOR f) { return f & -f; }
FACTOR magnitude(INT65 v) { return (v.is_negative() ? -v : v).value; } // at most 2^64 - 1, but of -2^64: 0
FACTOR magnitude(WIDE v) { return static_cast<FACTOR>(v < 0 ? -v : v); }

// A multiple of both; where their least common multiple has no 64 bits, the larger.
FACTOR joined(FACTOR a, FACTOR b) {
    if (!a || !b) return 0;
    const unsigned __int128 m = static_cast<unsigned __int128>(a / gcd(a, b)) * b;
    return m >> 63 ? std::max(a, b) : static_cast<FACTOR>(m);
}
FACTOR product(FACTOR a, FACTOR b) {
    const unsigned __int128 p = static_cast<unsigned __int128>(a) * b;
    if (!(p >> 63)) return static_cast<FACTOR>(p);
    const unsigned zeros = trailing_zeros(a) + trailing_zeros(b); // what still holds of it
    return std::max(std::max(a, b), zeros < 63 ? FACTOR(1) << zeros : FACTOR(1) << 63);
}

// What is left once the value is wrapped at `bits`.
FACTOR after_wrap(FACTOR f, unsigned bits) {
    if (f == 0) return 0;
    const unsigned zeros = trailing_zeros(f);
    return zeros >= bits ? 0 : FACTOR(1) << zeros;
}

class FACTORS {
public:
    FACTORS(struct LOOP* in, bool trusts_signed_arithmetic) : loop(in), trusts_signed(trusts_signed_arithmetic) {}

    FACTOR of(const NODE* t) {
        t = without_wrappers(t);
        if (!has_value_range(t->type)) return 1;
        if (t->op == ICON) return magnitude(to_int65(range_of_tree(t, nullptr).min));
        if (--nodes_left < 0) return 1;
        return joined(structural(t), asserted(t));
    }

    FACTOR asserted(const NODE* t) const {
        FACTOR f = 1;
        for_each_given(loop, [&](const NODE* fact, bool holds) {
            const bool equals = (fact->op == EQ && holds) || (fact->op == NEQ && !holds);
            if (!equals || fact->right->op != ICON) return;
            const INT65 c = fact->right->u.lval;
            const NODE* left = fact->left;
            if (is_same_value(left, t)) f = joined(f, magnitude(c));
            if (!c.is_zero() || !left->left || !left->right || left->right->op != ICON || !is_same_value(left->left, t))
                return;
            const INT65 m = left->right->u.lval;
            if (left->op == MOD && !m.is_zero()) f = joined(f, magnitude(m));
            if (left->op == ANDB && power_of_2(m + INT65(1)) > 0) f = joined(f, magnitude(m + INT65(1)));
        });
        return f;
    }

private:
    static bool has_form_of(const NODE* n, const TYPE* type) {
        return has_value_range(n->type) && n->type->size == type->size && wraps_signed(n->type) == wraps_signed(type) &&
               !n->type->is_bool() && !n->type->is_enum();
    }

    // The factor of an operator's exact result, for the value that the operator gives.
    FACTOR of_result(const NODE* t, FACTOR f) {
        if (power_of_2_in(f) == f && trailing_zeros(f) < t->type->size) return f;
        if (f && ((trusts_signed && is_exact_by_rule(t->op, t->type)) ||
                  (--ranges_left >= 0 && operation_is_exact(t, loop))))
            return f;
        return after_wrap(f, static_cast<unsigned>(t->type->size));
    }

    FACTOR of_bits(const NODE* t) {
        const unsigned a = trailing_zeros(of(t->left)), b = trailing_zeros(of(t->right));
        const unsigned n = t->op == ANDB ? std::max(a, b) : std::min(a, b);
        FACTOR f = n >= t->type->size ? 0 : FACTOR(1) << n;
        // A mask of bits that are zero anyway leaves the value.
        const NODE *x = t->left, *m = t->right;
        if (t->op == ANDB && m->op == ICON && power_of_2(-m->u.lval) >= 0 && wraps_signed(t->type)) {
            const FACTOR whole = of(x);
            if (whole && trailing_zeros(whole) >= static_cast<unsigned>(power_of_2(-m->u.lval))) f = joined(f, whole);
        }
        return f;
    }

    FACTOR of_shift(const NODE* t) {
        const INT65 n = t->right->op == ICON ? t->right->u.lval : INT65(-1);
        if (n.is_negative() || n >= INT65(t->type->size) || !has_form_of(t->left, t->type)) return 1;
        const FACTOR f = of(t->left), power = FACTOR(1) << n.value;
        if (t->op == SLL) return of_result(t, product(f, power));
        return f % power ? 1 : f / power;
    }

    // Down to zero, and only a value that the divisor divides is known to be.
    FACTOR of_division(const NODE* t) {
        if (t->right->op != ICON || t->right->u.lval.is_zero()) return 1;
        const FACTOR f = of(t->left), c = magnitude(t->right->u.lval);
        if (t->op == MOD) return f % c ? gcd(f, c) : 0;
        if (f % c) return 1;
        return t->right->u.lval.is_negative() ? after_wrap(f / c, static_cast<unsigned>(t->type->size)) : f / c;
    }

    FACTOR of_cast(const NODE* operand, const TYPE* to) {
        if (!has_value_range(operand->type)) return 1;
        const FACTOR f = of(operand);
        if (to->is_bool() || to->is_enum()) return f == 0 ? 0 : 1;
        const bool is_wide_enough = range_of_type(operand->type).is_within(range_of_type(to));
        if (is_wide_enough) return f;
        const bool keeps_value =
            power_of_2_in(f) != f && --ranges_left >= 0 && range_of_tree(operand, loop).is_within(range_of_type(to));
        return keeps_value ? f : after_wrap(f, static_cast<unsigned>(to->size));
    }

    FACTOR structural(const NODE* t) {
        const TYPE* type = t->type;
        auto plain = [&](const NODE* n) { return has_form_of(n, type); };
        switch (t->op) {
        case SCONV: return of_cast(t->left, type);
        case COMMAOP: return of_cast(t->right, type);
        case QUEST:
            return t->right->op == COLON ? gcd(of_cast(t->right->left, type), of_cast(t->right->right, type)) : 1;
        }
        if (type->is_bool() || type->is_enum() || !t->left || !plain(t->left)) return 1;
        switch (t->op) {
        case UMINUS:
        case ABS: return of_negation(t);
        case PMCONV:
            if (t->right->op != ICON) return 1;
            return after_wrap(product(of(t->left), magnitude(t->right->u.lval / INT65(16))),
                              static_cast<unsigned>(type->size));
        case SLL:
        case SRL: return of_shift(t);
        case SQR: {
            const FACTOR f = of(t->left);
            return after_wrap(product(f, f), static_cast<unsigned>(type->size));
        }
        }
        if (!t->right || !plain(t->right)) return 1;
        switch (t->op) {
        case PLUS:
        case MINUS: return of_result(t, gcd(of(t->right), of(t->left)));
        case MULT: return of_result(t, product(of(t->right), of(t->left)));
        case ANDB:
        case ORB:
        case XORB: return of_bits(t);
        case DIV:
        case MOD: return of_division(t);
        }
        return 1;
    }

    // A signed value keeps its factors under a change of sign: the one that wraps is a power of two and stays.
    FACTOR of_negation(const NODE* t) {
        const FACTOR f = of(t->left);
        return wraps_signed(t->type) || t->op == ABS ? f : after_wrap(f, static_cast<unsigned>(t->type->size));
    }

    struct LOOP* const loop;
    const bool trusts_signed;
    int nodes_left = MOST_NODES, ranges_left = MOST_RANGES;
};

// From the terms of the tree as a sum.
FACTOR factor_of_terms(const NODE* t, struct LOOP* loop) {
    const LINEAR_VALUE form(t, loop);
    if (!form.is_known()) return 1;
    FACTOR f = magnitude(WIDE(form.sum().constant));
    for (const LINEAR_FORM::TERM& term : form.sum())
        if (f != 1) f = gcd(f, product(magnitude(WIDE(term.coefficient)), FACTORS(loop, false).of(term.tree)));
    RANGE sum;
    if (form.sum_range(&sum) && sum.is_within(range_of_type(t->type))) return f;
    return after_wrap(f, static_cast<unsigned>(t->type->size));
}

FACTOR factor_of_known_bits(const NODE* t) {
    const unsigned zeros = trailing_zeros(~known_bits(t).zeros);
    return zeros >= t->type->size ? 0 : FACTOR(1) << zeros;
}

// 0 where the value is zero.
FACTOR factor_of(const NODE* tree, struct LOOP* loop, bool trusts_signed) {
    const NODE* t = without_wrappers(tree);
    if (!has_value_range(t->type)) return 1;
    FACTOR f = FACTORS(loop, trusts_signed).of(t);
    if (!t->left || t->type->is_bool() || t->type->is_enum()) return f;
    f = joined(f, factor_of_known_bits(t));
    return f ? joined(f, factor_of_terms(t, loop)) : 0;
}

// Of the value as converted to `type`.
FACTOR factor_as(const NODE* tree, const TYPE* type, struct LOOP* loop) {
    const FACTOR f = factor_of(tree, loop, false);
    if (!has_value_range(tree->type) || !has_value_range(type) || type->is_bool()) return f == 0 ? 0 : 1;
    if (range_of_tree(tree, loop).is_within(range_of_type(type))) return f;
    return after_wrap(f, static_cast<unsigned>(type->size));
}

INT65 greatest_power(const TYPE* t) { return INT65(1) << INT65(t->size - 1); }

bool is_number_type(const TYPE* t) { return has_value_range(t) && !t->is_bool() && !t->is_enum(); }

} // namespace

unsigned trailing_zeros_of_tree(const NODE* tree, struct LOOP* loop) {
    return has_value_range(tree->type) ? trailing_zeros(factor_of(tree, loop, false)) : 0;
}

INT65 max_ICON_factor(const NODE* tree, struct LOOP* loop, bool no_signed_overflow) {
    while (tree->op == VPACKM || ((tree->op == PCONV || tree->op == ISP2CHAR) && tree->left->type->is_pointer()))
        tree = tree->left;                                        // of each lane; of the address
    if (tree->op == PCONV && has_value_range(tree->left->type)) { // a number as an address
        const FACTOR f = factor_as(tree->left, tp->ulong_t, loop);
        return f ? INT65(0, f) : greatest_power(tree->type);
    }
    if (!has_value_range(tree->type)) return 1;
    const FACTOR f = factor_of(tree, loop, no_signed_overflow);
    return f ? INT65(0, f) : greatest_power(tree->type);
}

INT65 max_asserted_ICON_factor(const NODE* tree, struct LOOP* loop) {
    if (!has_value_range(tree->type)) return 1;
    const FACTOR f = FACTORS(loop, false).asserted(without_wrappers(tree));
    return f ? INT65(0, f) : greatest_power(tree->type);
}

bool constant_divides_expr(INT65 value, TYPE* type, const NODE* tree, struct LOOP* loop) {
    if (value.is_zero()) return tree_is_zero(tree, loop);
    return factor_as(tree, type, loop) % magnitude(value) == 0;
}

bool integer_DIV_is_exact(const NODE* tree, struct LOOP* loop) {
    const NODE* t = without_wrappers(tree);
    if (t->op != DIV || !has_value_range(t->type) || t->right->op != ICON || t->right->u.lval.is_zero()) return false;
    return factor_of(t->left, loop, false) % magnitude(t->right->u.lval) == 0;
}

INT65 max_ICON_delta(const NODE* tree, struct LOOP* loop) {
    if (!has_value_range(tree->type)) return 1;
    const LINEAR_VALUE form(tree, loop);
    if (!form.is_known()) return 1;
    FACTOR f = 0;
    bool varies = false;
    for (const LINEAR_FORM::TERM& term : form.sum()) {
        if (loop && loop_callbacks.is_constant_in && loop_callbacks.is_constant_in(term.tree, loop)) continue;
        varies = true;
        f = gcd(f, product(magnitude(WIDE(term.coefficient)), FACTORS(loop, false).of(term.tree)));
    }
    RANGE sum;
    const bool is_exact = form.sum_range(&sum) && sum.is_within(range_of_type(tree->type));
    if (varies && !is_exact) f = after_wrap(f, static_cast<unsigned>(tree->type->size));
    return f ? INT65(0, f) : greatest_power(tree->type);
}

namespace {

// Of x % c, and of x & c by the power of two that the ones at the low end of c leave, else 0.
WIDE modulus_of(const NODE* t) {
    if (!t->right || t->right->op != ICON) return 0;
    const INT65 c = t->right->u.lval;
    if (t->op == MOD) return to_wide(c);
    return t->op == ANDB && ~c.value ? WIDE(~c.value & (c.value + 1)) : 0;
}

} // namespace

INT65 expr_modulo_constant(const NODE* tree, TYPE* type, INT65 value, struct LOOP* loop) {
    if (!is_number_type(tree->type) || !is_number_type(type) || value <= INT65(0)) return -1;
    const WIDE m = to_wide(value);
    auto residue = [m](WIDE v) { return to_int65(((v % m) + m) % m); };
    const RANGE r = range_of_tree(tree, loop), limits = range_of_type(type);
    const bool keeps_value = r.is_within(limits);
    if (r.min == r.max) return residue(wrapped(r.min, r.min, type).min);
    if (keeps_value && r.min >= 0 && r.max < m && r.min == r.max) return to_int65(r.min);
    // Modulo a power of two the wraps do not show.
    const unsigned width = static_cast<unsigned>(std::min(type->size, tree->type->size));
    const int power = power_of_2(value);
    const bool survives_wraps = power >= 0 && static_cast<unsigned>(power) <= width;
    INT65 found = -1;
    for_each_given(loop, [&](const NODE* fact, bool holds) {
        const bool equals = (fact->op == EQ && holds) || (fact->op == NEQ && !holds);
        if (!equals || fact->right->op != ICON) return;
        const WIDE modulus = modulus_of(fact->left);
        if (modulus == 0 || modulus % m != 0 || !is_same_value(fact->left->left, tree)) return;
        if (keeps_value || survives_wraps) found = residue(to_wide(fact->right->u.lval));
    });
    if (found >= INT65(0)) return found;
    const LINEAR_VALUE form(tree, loop);
    if (!form.is_known()) return -1;
    RANGE sum;
    const bool is_exact = keeps_value && form.sum_range(&sum) && sum.is_within(range_of_type(tree->type));
    if (!is_exact && !survives_wraps) return -1;
    for (const LINEAR_FORM::TERM& term : form.sum()) {
        const FACTOR f = product(magnitude(WIDE(term.coefficient)), FACTORS(loop, false).of(term.tree));
        if (f % static_cast<FACTOR>(m) != 0) return -1;
    }
    return residue(form.sum().constant);
}

bool expr_cannot_divide_expr(const NODE* a, const NODE* b, struct LOOP* loop) {
    if (!is_number_type(a->type) || !is_number_type(b->type)) return false;
    if (!tree_is_non_zero(b, loop)) return false; // every number divides zero
    const RANGE x = range_of_tree(a, loop), y = range_of_tree(b, loop);
    if (x.is(0)) return true;
    const WIDE most = std::max(y.max, -y.min),
               least = x.holds(0) ? WIDE(0) : std::min(x.min > 0 ? x.min : -x.max, WIDE(1) << 64);
    if (most < least) return true;
    // Modulo what divides both a and the differences of b's values.
    const INT65 m = long_gcd(INT65(0, factor_of(a, loop, false)), max_ICON_delta(b, nullptr));
    return m > INT65(1) && expr_modulo_constant(b, b->type, m, loop) > INT65(0);
}

namespace {

// Looks at a pattern of (x - 1) & x in either order.
bool clears_lowest_bit_of(const NODE* t, const NODE* x) {
    if (t->op != ANDB) return false;
    const NODE *less = t->left, *same = t->right;
    if (!is_same_value(same, x)) std::swap(less, same);
    if (!is_same_value(same, x) || !less->right || less->right->op != ICON || !is_same_value(less->left, x))
        return false;
    return less->op == PLUS ? less->right->u.lval == INT65(-1) : less->op == MINUS && less->right->u.lval == INT65(1);
}

bool is_power_of_2(const NODE* t, struct LOOP* loop, int levels) {
    t = without_wrappers(t);
    if (!has_value_range(t->type) || levels == 0) return false;
    bool is_given = false;
    for_each_given(loop, [&](const NODE* fact, bool holds) {
        is_given = is_given || (fact->op == EQ && holds && fact->right->op == ICON && fact->right->u.lval.is_zero() &&
                                clears_lowest_bit_of(fact->left, t));
    });
    if (is_given) return true;
    auto same = [&](const NODE* n) {
        return has_value_range(n->type) && n->type->size == t->type->size &&
               wraps_signed(n->type) == wraps_signed(t->type) && is_power_of_2(n, loop, levels - 1);
    };
    switch (t->op) {
    case ICON: return power_of_2(t->u.lval) >= 0;
    case SLL: return same(t->left);
    case MULT: return same(t->left) && same(t->right);
    case ANDB: // x & -x
        return (t->right->op == UMINUS && is_same_value(t->right->left, t->left)) ||
               (t->left->op == UMINUS && is_same_value(t->left->left, t->right));
    case QUEST: return t->right->op == COLON && same(t->right->left) && same(t->right->right);
    case SCONV:
        return is_number_type(t->type) && is_number_type(t->left->type) && tree_is_non_negative(t->left, loop) &&
               is_power_of_2(t->left, loop, levels - 1);
    default: return false;
    }
}

} // namespace

bool positive_tree_is_power_of_2(const NODE* tree, struct LOOP* loop) { return is_power_of_2(tree, loop, 8); }

// ---- Coefficients, by the form of the tree alone

namespace {

constexpr int MOST_COEF_LEVELS = 32;

bool is_modular_cast(const NODE* t) {
    return t->op == SCONV && is_number_type(t->type) && is_number_type(t->left->type) &&
           t->left->type->size >= t->type->size;
}

// Whether the operator's parts are divided where it is.
bool has_coef(const NODE* t) {
    switch (t->op) {
    case MULT:
        if (t->right->op != ICON || t->right->u.lval > INT65(INT64_MAX)) return false;
        break;
    case PLUS:
    case MINUS:
    case UMINUS:
    case SLL: break;
    default: return is_modular_cast(t);
    }
    auto fits = [t](const NODE* n) { return n->type->size == t->type->size; };
    return fits(t->left) && ((t->op != PLUS && t->op != MINUS) || fits(t->right));
}

FACTOR coef_of(const NODE* t, int levels) {
    if (!is_number_type(t->type)) return 1;
    if (t->op == ICON) return magnitude(t->u.lval);
    LINEAR_STEP step;
    if (levels == 0 || !linear_step(t, &step) || !has_coef(t)) return 1;
    const FACTOR f = product(coef_of(step.a, levels - 1), magnitude(WIDE(step.by_a)));
    return step.b ? gcd(f, product(coef_of(step.b, levels - 1), magnitude(WIDE(step.by_b)))) : f;
}

// A sum that is exact is so once it is divided; not if a part wraps in a shift or a cast: divided, that is another
// number.
NODE* divided(NODE* t, bool is_exact) { return is_exact ? simp_node(t, nullptr) : kept_exact(t, nullptr); }

NODE* divide_coef(NODE* t, FACTOR c, bool is_exact) {
    if (c == 1) return t;
    if (t->op == ICON) {
        t->u.lval = truncate_to_type(t->u.lval / INT65(0, c), t->type);
        return t;
    }
    switch (t->op) {
    case PLUS:
    case MINUS:
        t->left = divide_coef(t->left, c, is_exact);
        t->right = divide_coef(t->right, c, is_exact);
        return divided(t, is_exact);
    case UMINUS: t->left = divide_coef(t->left, c, is_exact); return divided(t, is_exact);
    case SLL: { // as a product, whose constant is divided next
        t->op = MULT;
        const INT65 power = INT65(1) << t->right->u.lval;
        erase_tree(t->right);
        t->right = mk_ICON(power, t->type->stqs());
        return divide_coef(t, c, is_exact);
    }
    case MULT: {
        const FACTOR here = gcd(c, magnitude(t->right->u.lval));
        t->right->u.lval = truncate_to_type(t->right->u.lval / INT65(0, here), t->right->type);
        t->left = divide_coef(t->left, c / here, is_exact);
        return divided(t, is_exact);
    }
    case SCONV: t->left = divide_coef(t->left, c, is_exact); return simp_node(t, nullptr);
    }
    OPT_ASSERT(false);
    return t;
}

} // namespace

INT65 max_ICON_coef(const NODE* tree) { return INT65(0, coef_of(tree, MOST_COEF_LEVELS)); }

NODE* div_ICON_coef(NODE* tree, INT65 value) {
    const FACTOR c = magnitude(value);
    OPT_ASSERT(c != 0 && coef_of(tree, MOST_COEF_LEVELS) % c == 0);
    const bool wraps = tree_contains_matching_node(tree, [](const NODE* n) { return n->op == SLL || n->op == SCONV; });
    NODE* t = divide_coef(tree, c, !wraps);
    return value.is_negative() ? divided(maketree(UMINUS, t, nullptr, t->type->stqs()), !wraps && c > 1) : t;
}
