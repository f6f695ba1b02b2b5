#include "OPT5/simp/linear.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/factor.h"

namespace {

constexpr int MOST_PURE_NODES = 48;

bool is_number(const TYPE* t) { return has_value_range(t) || t->is_pointer(); }
bool is_plain_integer(const TYPE* t) { return has_value_range(t) && !t->is_bool() && !t->is_enum(); }

bool extends_alike(const TYPE* a, const TYPE* b) {
    if (a->size != b->size) return false;
    return has_value_range(a) && has_value_range(b)
               ? wraps_signed(a) == wraps_signed(b) && a->is_bool() == b->is_bool() && a->is_enum() == b->is_enum()
               : a->is_pointer() && b->is_pointer();
}

} // namespace

bool is_pure_within(const NODE* t, int* nodes_left) {
    for (; t; t = t->left) {
        if (--*nodes_left < 0 || op_has_effect(t->op) || op_is_intrinsic(t->op)) return false;
        if ((t->op == NAME || t->op == UMULT || t->op == STDOT || t->op == STREF) && lvalue_is_volatile(t))
            return false;
        if (!is_pure_within(t->right, nodes_left)) return false;
    }
    return true;
}

bool is_small_and_pure(const NODE* t) {
    int nodes_left = MOST_PURE_NODES;
    return is_pure_within(t, &nodes_left);
}

bool LINEAR::takes(const NODE* tree) {
    return is_number(tree->type) && !tree->type->is_enum() && is_small_and_pure(tree);
}

LINEAR::LINEAR(const NODE* tree, struct LOOP* in) : loop(in) {
    if (!takes(tree)) return;
    complete = true;
    bits = static_cast<unsigned>(tree->type->size);
    add(tree, 1);
}

void LINEAR::subtract(const NODE* tree) {
    complete = complete && takes(tree) && tree->type->size == bits;
    if (!complete) return;
    nodes_left = MOST_NODES;
    add(tree, ~uint64_t(0));
}

void LINEAR::add_term(const NODE* t, uint64_t coef) {
    for (int i = 0; i < count; ++i)
        if (extends_alike(terms[i].tree->type, t->type) && is_same_value(terms[i].tree, t)) {
            terms[i].coef += coef;
            if ((terms[i].coef & mask()) == 0) terms[i] = terms[--count];
            return;
        }
    if (count == MOST_TERMS)
        complete = false;
    else if (coef & mask())
        terms[count++] = {t, coef};
}

// Below the width of the sum an operator wraps where the sum does not.
bool LINEAR::keeps_sum(const NODE* t) const {
    return t->type->size >= bits || (is_plain_integer(t->type) && operation_is_exact(t, loop));
}

bool LINEAR::add_operator(const NODE* t, uint64_t coef) {
    auto fits = [t](const NODE* n) {
        if (t->type->is_pointer()) return is_number(n->type) && !n->type->is_enum();
        return n->type->is_pointer() ? t->type->size == n->type->size
                                     : is_plain_integer(n->type) && extends_alike(n->type, t->type);
    };
    switch (t->op) {
    case PLUS:
    case MINUS:
        if (!fits(t->left) || !fits(t->right) || !keeps_sum(t)) return false;
        add(t->left, coef);
        add(t->right, t->op == PLUS ? coef : -coef);
        return true;
    case UMINUS:
        if (!fits(t->left) || !keeps_sum(t)) return false;
        add(t->left, -coef);
        return true;
    case NOTB: // -1 - x
        if (!fits(t->left) || t->type->size < bits) return false;
        constant -= coef;
        add(t->left, -coef);
        return true;
    case MULT: {
        const NODE *x = t->left, *c = t->right;
        if (x->op == ICON) std::swap(x, c);
        if (c->op != ICON || !fits(x) || !fits(c) || !keeps_sum(t)) return false;
        add(x, coef * c->u.lval.value);
        return true;
    }
    case SLL: {
        const NODE* n = t->right;
        if (n->op != ICON || n->u.lval.is_negative() || n->u.lval >= INT65(t->type->size) || !fits(t->left))
            return false;
        if (!keeps_sum(t)) return false;
        add(t->left, coef << n->u.lval.value);
        return true;
    }
    case PMCONV:
        if (t->right->op != ICON || !fits(t->left) || t->type->size < bits) return false;
        add(t->left, coef * (t->right->u.lval / INT65(16)).value);
        return true;
    default: return false;
    }
}

// A cast's value is its operand's modulo the width of its type.
bool LINEAR::add_cast(const NODE* t, uint64_t coef) {
    const TYPE *to = t->type, *from = t->left->type;
    if (!is_number(from) || from->is_enum() || to->is_bool() || to->is_enum()) return false;
    const bool is_exact =
        has_value_range(to) && has_value_range(from) && range_of_tree(t->left, loop).is_within(range_of_type(to));
    if (to->size < bits && !is_exact) return false;
    add(t->left, coef);
    return true;
}

void LINEAR::add(const NODE* t, uint64_t coef) {
    t = without_wrappers(t);
    if (!complete) return;
    if (t->op == ICON && has_value_range(t->type)) {
        constant += coef * to_int65(range_of_tree(t, nullptr).min).value;
        return;
    }
    const bool is_done =
        --nodes_left >= 0 && (t->op == SCONV || t->op == PCONV ? add_cast(t, coef) : add_operator(t, coef));
    if (!is_done) add_term(t, coef);
}

bool LINEAR::is_constant() const { return complete && count == 0; }
bool LINEAR::constant_is(INT65 v) const { return ((constant - v.value) & mask()) == 0; }

WIDE LINEAR::centered(uint64_t v) const {
    v &= mask();
    const WIDE turn = WIDE(1) << bits;
    return v >> (bits - 1) ? static_cast<WIDE>(v) - turn : static_cast<WIDE>(v);
}

bool LINEAR::sum_range(RANGE* r) const {
    if (!complete) return false;
    *r = {constant_part(), constant_part()};
    constexpr WIDE limit = WIDE(1) << 100;
    for (int i = 0; i < count; ++i) {
        if (!has_value_range(terms[i].tree->type)) return false;
        const RANGE t = range_of_tree(terms[i].tree, loop);
        const WIDE c = coefficient(i);
        WIDE a, b;
        if (__builtin_mul_overflow(c, t.min, &a) || __builtin_mul_overflow(c, t.max, &b)) return false;
        if (std::min(a, b) < -limit || std::max(a, b) > limit) return false; // their sums stay exact
        r->min += std::min(a, b);
        r->max += std::max(a, b);
    }
    return true;
}

bool LINEAR::cannot_be_zero(struct LOOP* in) const {
    if (!complete) return false;
    if (count == 0) return (constant & mask()) != 0;
    const WIDE turn = WIDE(1) << bits;
    RANGE r;
    if (sum_range(&r) && !r.holds(0) && r.min > -turn && r.max < turn) return true;
    // The low bits that no term reaches.
    unsigned low = bits;
    for (int i = 0; i < count; ++i) {
        const unsigned zeros = trailing_zeros(terms[i].coef) + trailing_zeros_of_tree(terms[i].tree, in);
        low = std::min(low, zeros);
    }
    return low > 0 && (constant & mask() & (low >= 64 ? ~uint64_t(0) : (uint64_t(1) << low) - 1)) != 0;
}
