// Partial evaluation: a tree with the parts that vary in a loop replaced by their bounds, and a tree simplified by what
// is known of its own value.

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/range.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

namespace {

bool has_form_of(const NODE* n, const TYPE* type) {
    return has_value_range(n->type) && n->type->size == type->size && wraps_signed(n->type) == wraps_signed(type) &&
           !n->type->is_bool() && !n->type->is_enum();
}

// Builds trees whose value is at least (for `up`) or at most that of a tree, in every iteration. A monotone operator
// takes its operands' replacements as long as neither it nor its replacement can wrap; anything else that varies
// becomes its bound.
class PARTIAL {
public:
    PARTIAL(struct LOOP* in, bool bounded) : loop(in), must_be_bounded(bounded) {}

    NODE* build(const NODE* t, bool up, int levels) {
        if (!varies(t)) return copy_tree(t);
        if (!has_value_range(t->type) || t->type->is_enum()) return nullptr;
        if (levels > 0 && !t->type->is_bool())
            if (NODE* r = monotone(t, up, levels - 1)) return r;
        return bound(t, up);
    }

private:
    bool varies(const NODE* t) const {
        if (t->op == ICON || !loop) return false;
        return !loop_callbacks.is_constant_in || !loop_callbacks.is_constant_in(t, loop);
    }

    NODE* bound(const NODE* t, bool up) const {
        const RANGE r = range_of_tree(t, loop), limits = range_of_type(t->type);
        const WIDE v = up ? r.max : r.min;
        if (must_be_bounded && v == (up ? limits.max : limits.min)) return nullptr;
        NODE* constant = mk_ICON(to_int65(v), t->type->stqs());
        constant->ls = t->ls;
        return constant;
    }

    // The operator over new operands, if it then stays exact; null, and they are erased, if not.
    NODE* rebuilt(const NODE* t, NODE* left, NODE* right) {
        if (left && (right || !t->right)) {
            NODE* r = maketree(t->op, left, right, t->type->stqs(), t->ls);
            if (r->op == SRL || r->op == DIV || r->op == SCONV || operation_is_exact(r, loop))
                return simp_node(r, loop);
            erase_tree(r);
            return nullptr;
        }
        if (left) erase_tree(left);
        if (right) erase_tree(right);
        return nullptr;
    }

    NODE* monotone(const NODE* t, bool up, int levels) {
        const bool is_plain = t->left && has_form_of(t->left, t->type);
        switch (t->op) {
        case PLUS:
        case MINUS:
            if (!is_plain || !has_form_of(t->right, t->type) || !operation_is_exact(t, loop)) return nullptr;
            return rebuilt(t, build(t->left, up, levels), build(t->right, t->op == PLUS ? up : !up, levels));
        case UMINUS:
            if (!is_plain || !operation_is_exact(t, loop)) return nullptr;
            return rebuilt(t, build(t->left, !up, levels), nullptr);
        case MULT:
            if (!is_plain || t->right->op != ICON || !has_form_of(t->right, t->type) || !operation_is_exact(t, loop))
                return nullptr;
            return rebuilt(t, build(t->left, t->right->u.lval.is_negative() ? !up : up, levels), copy_tree(t->right));
        case SLL:
            if (!is_plain || t->right->op != ICON || !operation_is_exact(t, loop)) return nullptr;
            return rebuilt(t, build(t->left, up, levels), copy_tree(t->right));
        case SRL:
            if (!is_plain || t->right->op != ICON || t->right->u.lval.is_negative() ||
                t->right->u.lval >= INT65(t->type->size))
                return nullptr;
            return rebuilt(t, build(t->left, up, levels), copy_tree(t->right));
        case DIV:
            if (!is_plain || t->right->op != ICON || t->right->u.lval <= INT65(0)) return nullptr;
            return rebuilt(t, build(t->left, up, levels), copy_tree(t->right));
        case SCONV: return converted(t, up, levels);
        default: return nullptr;
        }
    }

    // A cast that keeps the value, of the tree and of what stands for it.
    NODE* converted(const NODE* t, bool up, int levels) {
        if (!has_value_range(t->left->type) || t->left->type->is_enum()) return nullptr;
        const RANGE limits = range_of_type(t->type);
        if (!range_of_tree(t->left, loop).is_within(limits)) return nullptr;
        NODE* operand = build(t->left, up, levels);
        if (!operand) return nullptr;
        if (range_of_tree(operand, loop).is_within(limits)) return rebuilt(t, operand, nullptr);
        erase_tree(operand);
        return nullptr;
    }

    struct LOOP* const loop;
    const bool must_be_bounded;
};

constexpr int MOST_LEVELS = 32;

// ---- A value known to be one of low, low + step, ... high

struct STEPS {
    WIDE low, high, step;
    bool holds_one_of(const RANGE& r) const { // some value of r may be one of these
        const WIDE from = std::max(low, r.min), to = std::min(high, r.max);
        if (from > to) return false;
        return low + (from - low + step - 1) / step * step <= to;
    }
};

NODE* constant_in_place_of(NODE* t, WIDE v) {
    NODE* constant = mk_ICON(to_int65(v), t->type->stqs());
    constant->ls = t->ls;
    return mk_COMMAOP(peel_for_effect(t), constant);
}

// The arm that can give such a value stands for the conditional, the condition's effects before it.
NODE* only_arm(NODE* t, const STEPS& s, struct LOOP* loop) {
    NODE* colon = t->right;
    if (colon->op != COLON || !has_form_of(colon->left, t->type) || !has_form_of(colon->right, t->type)) return t;
    const bool left = s.holds_one_of(range_of_tree(colon->left, loop)),
               right = s.holds_one_of(range_of_tree(colon->right, loop));
    if (left == right) return t;
    NODE *kept = left ? colon->left : colon->right, *dropped = left ? colon->right : colon->left;
    NODE* effects = peel_for_effect(t->left);
    TYPE* type = t->type->stqs();
    erase_tree(dropped);
    erase_node(colon);
    erase_node(t);
    return mk_COMMAOP(effects, coerce_to_type(type, kept));
}

NODE* in_range(NODE* t, const STEPS& s, int levels) {
    if (!has_value_range(t->type) || t->type->is_bool() || t->type->is_enum() || s.low > s.high) return t;
    if (s.high - s.low < s.step) return t->op == ICON ? t : constant_in_place_of(t, s.low);
    if (levels == 0) return t;
    switch (t->op) {
    case COMMAOP:
        if (has_form_of(t->right, t->type)) t->right = in_range(t->right, s, levels - 1);
        return t;
    case QUEST: return only_arm(t, s, nullptr);
    case UMINUS: // its operand is the one value of the type whose negative this is
        if (!has_form_of(t->left, t->type) || !wraps_signed(t->type) || s.low == range_of_type(t->type).min) return t;
        t->left = in_range(t->left, {-(s.low + (s.high - s.low) / s.step * s.step), -s.low, s.step}, levels - 1);
        return simp_node(t, nullptr);
    case PLUS:
    case MINUS: {
        if (t->right->op != ICON || !has_form_of(t->left, t->type) || !has_form_of(t->right, t->type)) return t;
        const WIDE c = (t->op == PLUS ? -1 : 1) * to_wide(t->right->u.lval);
        const RANGE limits = range_of_type(t->type);
        if (s.low + c < limits.min || s.high + c > limits.max) return t;
        t->left = in_range(t->left, {s.low + c, s.high + c, s.step}, levels - 1);
        return simp_node(t, nullptr);
    }
    case SCONV: {
        const NODE* x = t->left;
        if (!has_value_range(x->type) || x->type->is_bool() || x->type->is_enum()) return t;
        const RANGE from = range_of_type(x->type);
        if (!from.is_within(range_of_type(t->type))) return t;
        t->left = in_range(t->left, {std::max(s.low, from.min), std::min(s.high, from.max), 1}, levels - 1);
        return simp_node(t, nullptr);
    }
    default: return t;
    }
}

} // namespace

NODE* partially_eval_for_maximum(const NODE* tree, struct LOOP* loop, bool must_be_bounded) {
    return PARTIAL(loop, must_be_bounded).build(tree, true, MOST_LEVELS);
}
NODE* partially_eval_for_minimum(const NODE* tree, struct LOOP* loop, bool must_be_bounded) {
    return PARTIAL(loop, must_be_bounded).build(tree, false, MOST_LEVELS);
}

NODE* simp_tree_in_range(NODE* tree, INT65 low, INT65 high, INT65 step) {
    tree = simp_tree(tree, nullptr);
    if (!has_value_range(tree->type)) return tree;
    const RANGE limits = range_of_type(tree->type);
    STEPS s{to_wide(low), to_wide(high), std::max(to_wide(step), WIDE(1))};
    if (s.low < limits.min) s.low += (limits.min - s.low + s.step - 1) / s.step * s.step; // the first of the type
    s.high = std::min(s.high, limits.max);
    return in_range(tree, s, MOST_LEVELS);
}
