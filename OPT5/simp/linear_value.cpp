#include "OPT5/simp/linear_value.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/factor.h"

namespace {

constexpr int MOST_PURE_NODES = 48, MOST_NODES = 32, MOST_TERMS = 8;

bool is_number(const TYPE* t) { return has_value_range(t) || t->is_pointer(); }
bool same_form(const TYPE* a, const TYPE* b) {
    return is_integer_with_range(a) && is_integer_with_range(b) && a->size == b->size && wraps_signed(a) == wraps_signed(b);
}

// Opens what wraps no earlier than the sum does, or is exact by the bounds.
class READER final : public LINEAR_READER {
public:
    READER(LINEAR_FORM* f, struct LOOP* in) : LINEAR_READER(f, MOST_NODES), loop(in) {}

private:
    const NODE* without_marks(const NODE* t) const override { return without_wrappers(t); }
    bool leaf(const NODE* t, int64_t k) override { return form.add(t, k) && form.term_count() <= MOST_TERMS; }

    bool opens(const NODE* t, const LINEAR_STEP&) override {
        const bool wraps_late = t->type->size >= form.bits;
        switch (t->op) {
        case SCONV:
        case PCONV: return opens_cast(t, wraps_late);
        case ISP2CHAR: return false;
        case NOTB: return fits(t, t->left) && wraps_late;
        case PMCONV: return fits(t, t->left) && wraps_late;
        case SLL: return fits(t, t->left) && keeps_sum(t, wraps_late);
        default: return fits(t, t->left) && (!t->right || fits(t, t->right)) && keeps_sum(t, wraps_late);
        }
    }

    static bool fits(const NODE* t, const NODE* operand) {
        if (t->type->is_pointer()) return is_number(operand->type) && !operand->type->is_enum();
        return operand->type->is_pointer() ? t->type->size == operand->type->size : same_form(operand->type, t->type);
    }
    bool keeps_sum(const NODE* t, bool wraps_late) const {
        return wraps_late || (is_integer_with_range(t->type) && operation_is_exact(t, loop));
    }
    // A cast's value is its operand's modulo the width of its type.
    bool opens_cast(const NODE* t, bool wraps_late) const {
        const TYPE *to = t->type, *from = t->left->type;
        if (!is_number(from) || from->is_enum() || to->is_bool() || to->is_enum()) return false;
        if (wraps_late) return true;
        return has_value_range(to) && has_value_range(from) &&
               range_of_tree(t->left, loop).is_within(range_of_type(to));
    }

    struct LOOP* loop;
};

} // namespace

bool is_pure_within(const NODE* t, int* nodes_left) {
    for (; t; t = t->left) {
        if (--*nodes_left < 0 || op_has_effect(t->op) || op_is_intrinsic(t->op)) return false;
        if (op_is_lvalue(t->op) && lvalue_is_volatile(t))
            return false;
        if (!is_pure_within(t->right, nodes_left)) return false;
    }
    return true;
}

bool is_small_and_pure(const NODE* t) {
    int nodes_left = MOST_PURE_NODES;
    return is_pure_within(t, &nodes_left);
}

bool LINEAR_VALUE::takes(const NODE* tree) {
    return is_number(tree->type) && !tree->type->is_enum() && is_small_and_pure(tree);
}

LINEAR_VALUE::LINEAR_VALUE(const NODE* tree, struct LOOP* in)
    : loop(in), form(static_cast<unsigned>(tree->type->size)), complete(takes(tree)) {
    if (complete) complete = READER(&form, loop).read(tree, 1);
}

void LINEAR_VALUE::subtract(const NODE* tree) {
    complete = complete && takes(tree) && tree->type->size == form.bits;
    if (complete) complete = READER(&form, loop).read(tree, -1);
}

bool LINEAR_VALUE::constant_is(INT65 v) const {
    LINEAR_FORM difference(form.bits);
    difference.add_constant(form.constant);
    difference.add_constant(difference.reduced(-static_cast<__int128>(v.value)));
    return difference.constant == 0;
}

bool LINEAR_VALUE::sum_range(RANGE* r) const {
    if (!complete) return false;
    *r = {form.constant, form.constant};
    constexpr WIDE limit = WIDE(1) << 100;
    for (const LINEAR_FORM::TERM& term : form) {
        if (!has_value_range(term.tree->type)) return false;
        const RANGE t = range_of_tree(term.tree, loop);
        const WIDE c = term.coefficient;
        WIDE a, b;
        if (__builtin_mul_overflow(c, t.min, &a) || __builtin_mul_overflow(c, t.max, &b)) return false;
        if (std::min(a, b) < -limit || std::max(a, b) > limit) return false; // their sums stay exact
        r->min += std::min(a, b);
        r->max += std::max(a, b);
    }
    return true;
}

bool LINEAR_VALUE::cannot_be_zero() const {
    if (!complete) return false;
    if (form.is_constant()) return form.constant != 0;
    const WIDE turn = WIDE(1) << form.bits;
    RANGE r;
    if (sum_range(&r) && !r.holds(0) && r.min > -turn && r.max < turn) return true;
    // The low bits that no term reaches.
    unsigned low = form.bits;
    for (const LINEAR_FORM::TERM& t : form) {
        const unsigned zeros =
            trailing_zeros(static_cast<uint64_t>(t.coefficient)) + trailing_zeros_of_tree(t.tree, loop);
        low = std::min(low, zeros);
    }
    return low > 0 && (static_cast<uint64_t>(form.constant) & (low >= 64 ? ~uint64_t(0) : (uint64_t(1) << low) - 1));
}
