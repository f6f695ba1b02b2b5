#include "OPT5/simp/linear.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/range.h"

#include <algorithm>

namespace {

constexpr int64_t ADDRESS_UNIT = 16; // bits

int64_t low_bits(INT65 v) { return static_cast<int64_t>(v.value); }

// Both extend to more bits in the same manner.
bool extends_alike(const TYPE* a, const TYPE* b) {
    if (a->size != b->size || has_value_range(a) != has_value_range(b)) return false;
    return !has_value_range(a) ||
           (wraps_signed(a) == wraps_signed(b) && a->is_bool() == b->is_bool() && a->is_enum() == b->is_enum());
}

} // namespace

bool linear_step(const NODE* t, LINEAR_STEP* step) {
    *step = {t->left, nullptr, 1, 0, 0};
    switch (t->op) {
    case PLUS:
    case MINUS:
        step->b = t->right;
        step->by_b = t->op == PLUS ? 1 : -1;
        return true;
    case UMINUS: step->by_a = -1; return true;
    case NOTB: // -1 - x
        step->by_a = step->constant = -1;
        return true;
    case MULT: {
        const NODE* c = t->right;
        if (c->op != ICON) std::swap(step->a, c);
        step->by_a = low_bits(c->u.lval);
        return c->op == ICON;
    }
    case SLL:
        if (t->right->op != ICON || t->right->u.lval.is_negative() || t->right->u.lval >= INT65(t->type->size))
            return false;
        step->by_a = static_cast<int64_t>(uint64_t(1) << t->right->u.lval.value);
        return true;
    case PMCONV: // by a size in bits
        step->by_a = low_bits(t->right->u.lval) / ADDRESS_UNIT;
        return t->right->op == ICON;
    case SCONV:
    case PCONV:
    case ISP2CHAR: return true;
    default: return false;
    }
}

// ---- The record

LINEAR_FORM& LINEAR_FORM::operator=(const LINEAR_FORM& o) {
    bits = o.bits;
    is_exact = o.is_exact;
    constant = o.constant;
    count = o.count;
    std::copy(o.begin(), o.end(), terms);
    return *this;
}

int64_t LINEAR_FORM::reduced(__int128 v) {
    const unsigned unused = 64 - bits;
    const int64_t r = static_cast<int64_t>(static_cast<uint64_t>(v) << unused) >> unused;
    is_exact = is_exact && r == v;
    return r;
}

void LINEAR_FORM::add_constant(int64_t v) { constant = reduced(static_cast<__int128>(constant) + v); }

const LINEAR_FORM::TERM* LINEAR_FORM::find(const NODE* tree) const {
    const TERM* t = std::find_if(begin(), end(), [tree](const TERM& x) {
        return extends_alike(x.tree->type, tree->type) && is_same_value(x.tree, tree);
    });
    return t == end() ? nullptr : t;
}

bool LINEAR_FORM::has_same_terms(const LINEAR_FORM& other) const {
    return count == other.count && std::all_of(begin(), end(), [&other](const TERM& t) {
               const TERM* met = other.find(t.tree);
               return met && met->coefficient == t.coefficient;
           });
}

void LINEAR_FORM::erase(const TERM* term) {
    std::copy(term + 1, end(), terms + (term - terms));
    --count;
}

bool LINEAR_FORM::add(const NODE* tree, int64_t coefficient) {
    coefficient = reduced(coefficient);
    if (const TERM* met = find(tree)) {
        TERM& t = terms[met - terms];
        t.coefficient = reduced(static_cast<__int128>(t.coefficient) + coefficient);
        if (t.coefficient == 0) erase(met);
        return true;
    }
    if (coefficient == 0) return true;
    if (count == MOST_TERMS) return false;
    terms[count++] = {tree, coefficient};
    return true;
}

// ---- The walk

bool LINEAR_READER::takes_constant(const NODE* icon) { return has_value_range(icon->type); }

bool LINEAR_READER::read(const NODE* t, int64_t k) {
    auto times = [&](int64_t by) { return form.reduced(static_cast<__int128>(k) * by); };
    for (;;) {
        t = without_marks(t);
        LINEAR_STEP step;
        if (t->op == ICON && takes_constant(t)) {
            const INT65 v = t->type->is_bool() ? INT65(t->u.lval.is_zero() ? 0 : 1) : t->u.lval;
            form.add_constant(times(low_bits(v)));
            return true;
        }
        if (--nodes_left < 0 || !linear_step(t, &step) || !opens(t, step)) return leaf(t, k);
        if (step.constant) form.add_constant(times(step.constant));
        if (step.b) {
            if (!read(step.a, times(step.by_a))) return false;
            t = step.b;
            k = times(step.by_b);
        } else {
            t = step.a;
            k = times(step.by_a);
        }
    }
}
