// Shifts by constants. A shift to the left by a constant stays one; a pair of shifts that only clears or copies bits is
// a mask or a pair of casts.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

using namespace rules;

namespace {

NODE* shift_by_nothing(NODE* t, struct LOOP*) {
    if (is_icon(t->left, INT65(0)) && !is_icon(t->right)) return constant_for(t, INT65(0));
    if (is_icon(t->right, INT65(0))) return only_left(t);
    return nullptr;
}

// Two shifts in one direction are one. Past the width, a signed right shift leaves copies of the sign, the others zero.
NODE* join_shifts(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    const int n = shift_count_of(t), m = inner->op == t->op ? shift_count_of(inner) : 0;
    if (!n || !m) return nullptr;
    const int width = static_cast<int>(t->type->size);
    int sum = n + m;
    if (sum >= width) {
        if (t->op == SLL || !is_signed(t->type)) return constant_for(t, INT65(0));
        sum = width - 1;
    }
    t->right->u.lval = INT65(sum);
    erase_node(inner->right);
    t->left = take_left(inner);
    return simp_node(t, loop);
}

// The signed type of exactly `bits` bits that operators compute in, or null.
TYPE* signed_type_of(uint64_t bits) {
    for (TYPE* t : {tp->int_t, tp->long_t, tp->llong_t})
        if (t->size == bits) return t;
    return nullptr;
}

// Whether x << n is the number.
bool shift_loses_nothing(const NODE* x, int n, struct LOOP* loop) {
    INT65 min, max;
    return calculate_bounds(x, loop, &min, &max) && min >= int_type_min(x->type) >> INT65(n) &&
           max <= int_type_max(x->type) >> INT65(n);
}

// (x << n) >> n keeps the low bits: a mask, or for a signed x their extension. (x >> n) << n clears the low bits.
NODE* shift_there_and_back(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    const int n = shift_count_of(t);
    const bool multiplies = t->op == SRL && is_node_with_icon(inner, MULT) && log2_of(inner->right) == n;
    if (!n || (!multiplies && (inner->op == t->op || shift_count_of(inner) != n))) return nullptr;
    TYPE* type = t->type->stqs();
    const uint64_t mask = mask_of(type);
    uint64_t kept = (mask >> n) << n & mask;
    if (t->op == SRL) {
        if (is_signed(type)) {
            if (shift_loses_nothing(inner->left, n, loop)) {
                erase_node(t->right);
                erase_node(inner->right);
                return coerce_to_type(type, take_left(take_left(t)));
            }
            TYPE* narrow = signed_type_of(type->size - static_cast<unsigned>(n));
            if (!narrow) return nullptr;
            erase_node(t->right);
            erase_node(inner->right);
            NODE* x = take_left(take_left(t));
            return coerce_to_type(type, made(SCONV, x, nullptr, narrow, loop));
        }
        kept = mask >> n;
    }
    erase_node(t->right);
    erase_node(inner->right);
    NODE* x = take_left(take_left(t));
    return made(ANDB, x, mk_ICON(INT65(0, kept), type), type, loop);
}

// (T)x >> n of an x that is not wider: shifted before it is cast.
NODE* shift_under_cast(NODE* t, struct LOOP* loop) {
    NODE* cast = t->left;
    int n = shift_count_of(t);
    if (!n || t->op != SRL || cast->op != SCONV || !is_integer(cast->left->type) || is_bitfield_access(cast->left))
        return nullptr;
    TYPE *narrow = cast->left->type->stqs(), *type = t->type;
    if (narrow->size < tp->int_t->size || narrow->size >= type->size) return nullptr;
    if (is_signed(narrow) && !is_signed(type)) return nullptr;
    const int width = static_cast<int>(narrow->size);
    if (n >= width) {
        if (!is_signed(narrow)) return constant_for(t, INT65(0));
        n = width - 1;
    }
    t->right->u.lval = INT65(n);
    cast->left = made(SRL, cast->left, t->right, narrow, loop);
    erase_node(t);
    return coerce_to_type(type, simp_node(cast, loop));
}

// (T)x << n of an x of the same width
NODE* cast_outward(NODE* t, struct LOOP* loop) {
    NODE* cast = t->left;
    if (t->op != SLL || !is_equal_width_cast(cast)) return nullptr;
    TYPE* type = t->type;
    cast->left = made(SLL, cast->left, t->right, cast->left->type->stqs(), loop);
    erase_node(t);
    return coerce_to_type(type, simp_node(cast, loop));
}

// (x * c) << n
NODE* shift_product(NODE* t, struct LOOP* loop) {
    const int n = shift_count_of(t);
    if (!n || t->op != SLL || !is_node_with_icon(t->left, MULT)) return nullptr;
    set_icon(t->left->right, t->left->right->u.lval << INT65(n));
    erase_node(t->right);
    return kept_exact(take_left(t), loop);
}

// What is shifted out need not be computed.
NODE* narrow_operand(NODE* t, struct LOOP* loop) {
    const int n = shift_count_of(t);
    if (!n) return nullptr;
    const uint64_t mask = mask_of(t->type);
    return narrow_to_mask(&t->left, t->op == SLL ? mask >> n : mask << n & mask) ? simp_node(t, loop) : nullptr;
}

const RULE shift_rules[] = {shift_by_nothing, join_shifts,   shift_there_and_back, shift_under_cast,
                            cast_outward,     shift_product, narrow_operand,       by_pattern};

} // namespace

NODE* simp_shift(NODE* t, struct LOOP* loop) {
    if (!operand_has_type(t)) return t;
    t = first_that_applies(shift_rules, t, loop);
    return t->op == SLL || t->op == SRL ? simp_by_known_bits(t) : t;
}
