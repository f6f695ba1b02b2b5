// Compares of integers and pointers.
//
// Canonical forms: a constant on the right; what the known bits and the bounds decide is decided; what is added,
// subtracted or cast on both sides is taken away where the order stays; a compare of a truth value with a constant is
// that value or its opposite; an unsigned compare with 0 or 1 is an equality.

#include "OPT5/simp/compare.h"

#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/linear_value.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>

using namespace rules;

namespace {

bool is_equality(const NODE* t) { return t->op == EQ || t->op == NEQ; }
bool holds_for_equals(int op) { return op == EQ || op == LE || op == GE || op == ULE || op == UGE; }
bool is_unsigned_relop(int op) { return op >= ULE && op <= UGT; }
int with_sign(int op, bool is_unsigned) {
    if (op >= LE && op <= GT && is_unsigned) return op + (ULE - LE);
    return is_unsigned_relop(op) && !is_unsigned ? op - (ULE - LE) : op;
}
// less, equal, greater as a bit each
bool accepts(int op, int order) {
    switch (with_sign(op, false)) {
    case EQ: return order == 0;
    case NEQ: return order != 0;
    case LE: return order <= 0;
    case LT: return order < 0;
    case GE: return order >= 0;
    default: return order > 0;
    }
}

NODE* decided(NODE* t, bool value) { return constant_for(t, INT65(value ? 1 : 0)); }

// ---- Decisions
struct BOUNDS {
    INT65 min, max;
};

// Least and greatest value: by the known bits and the structure, whichever is tighter.
BOUNDS bounds_of(const NODE* t, struct LOOP* loop) {
    const KNOWN_BITS k = known_bits(t);
    TYPE* type = t->type;
    uint64_t least = k.ones, most = ~k.zeros & mask_of(type);
    if (is_signed(type) && !((k.zeros | k.ones) & sign_bit(type))) { // the sign is open: least is negative, most is not
        least |= sign_bit(type);
        most &= ~sign_bit(type);
    }
    BOUNDS b{truncate_to_type(INT65(0, least), type), truncate_to_type(INT65(0, most), type)};
    INT65 min, max;
    if (calculate_bounds(t, loop, &min, &max)) {
        b.min = std::max(b.min, min);
        b.max = std::min(b.max, max);
    }
    return b;
}

// 1: true, -1: false, 0: not decided.
int outcome(int op, BOUNDS a, BOUNDS b) {
    const bool less = a.max<b.min, greater = a.min> b.max, not_less = a.min >= b.max, not_greater = a.max <= b.min;
    switch (with_sign(op, false)) {
    case LT: return less ? 1 : not_less ? -1 : 0;
    case GE: return less ? -1 : not_less ? 1 : 0;
    case GT: return greater ? 1 : not_greater ? -1 : 0;
    case LE: return greater ? -1 : not_greater ? 1 : 0;
    case EQ: return less || greater ? -1 : 0;
    default: return less || greater ? 1 : 0;
    }
}

// A bit that is one on one side and zero on the other.
bool bits_differ(const NODE* a, const NODE* b) {
    const KNOWN_BITS x = known_bits(a), y = known_bits(b);
    return (x.ones & y.zeros) || (x.zeros & y.ones);
}

NODE* decide(NODE* t, struct LOOP* loop) {
    if (same_value(t->left, t->right)) return decided(t, holds_for_equals(t->op));
    if (const int o = outcome(t->op, bounds_of(t->left, loop), bounds_of(t->right, loop))) return decided(t, o > 0);
    if (is_equality(t) && (bits_differ(t->left, t->right) || tree_values_are_not_equal(t->left, t->right, loop)))
        return decided(t, t->op == NEQ);
    return nullptr;
}

// ---- One side a constant
// The compare of a truth value with a constant: the value, its opposite, or decided.
NODE* compare_truth_value(NODE* t, struct LOOP* loop) {
    if (!is_icon(t->right) || !returns_1_or_0(t->left)) return nullptr;
    const INT65 c = t->right->u.lval;
    auto outcome_for = [&](int v) { return accepts(t->op, INT65(v) < c ? -1 : INT65(v) > c); };
    const bool of_0 = outcome_for(0), of_1 = outcome_for(1);
    if (of_0 == of_1) return decided(t, of_0);
    TYPE* type = t->type;
    if (of_1) {
        NODE* value = t->left;
        erase_node(t->right);
        erase_node(t);
        return coerce_to_type(type, simp_node(coerce_to_type(tp->int_t, value), loop));
    }
    if (tree_is_trivially_invertible(t->left)) {
        erase_node(t->right);
        return coerce_to_type(type, simp_node(invert_boolean_tree(take_left(t)), loop));
    }
    if (t->op == EQ && c.is_zero()) return nullptr;
    t->op = EQ; // the one form of an opposite
    set_icon(t->right, INT65(0));
    return simp_node(t, loop);
}

// A value of zero or one bit in an order with a constant: whether it is zero.
NODE* compare_single_bit(NODE* t, struct LOOP* loop) {
    if (!is_icon(t->right) || is_equality(t) || !is_node_with_icon(t->left, ANDB)) return nullptr;
    const INT65 bit = t->left->right->u.lval, c = t->right->u.lval;
    const uint64_t bits = bits_of(t->left->right);
    if ((bits & (bits - 1)) != 0) return nullptr;
    auto outcome_for = [&](INT65 v) { return accepts(t->op, v < c ? -1 : v > c); };
    const bool of_0 = outcome_for(INT65(0)), of_bit = outcome_for(bit);
    if (of_0 == of_bit) return decided(t, of_0);
    t->op = of_bit ? NEQ : EQ;
    set_icon(t->right, INT65(0));
    return simp_node(t, loop);
}

// At the end of the range an order is an equality: u < 1, u >= 1, u <= 0, u > 0, x >= max.
NODE* order_at_the_end(NODE* t, struct LOOP* loop) {
    if (is_equality(t) || !is_icon(t->right)) return nullptr;
    TYPE* type = t->left->type;
    const INT65 c = t->right->u.lval, max = int_type_max(type);
    const int op = with_sign(t->op, false);
    int equality = 0;
    INT65 bound = c;
    if (type->is_unsigned()) {
        if (c == INT65(1) && (op == LT || op == GE)) equality = op == LT ? EQ : NEQ, bound = INT65(0);
        if (c == INT65(0) && (op == LE || op == GT)) equality = op == LE ? EQ : NEQ;
    }
    if (op == GE && c == max) equality = EQ;
    if (op == GT && c == max - INT65(1)) equality = EQ, bound = max;
    if (!equality) return nullptr;
    t->op = equality;
    set_icon(t->right, bound);
    return simp_node(t, loop);
}

// x + c1 rel c2: exact for equality; for an order where neither side wraps.
NODE* move_constant_across(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right) || (inner->op != PLUS && inner->op != MINUS) || !operands_have_type(inner)) return nullptr;
    const INT65 c2 = t->right->u.lval;
    TYPE* type = inner->type;
    if (is_icon(inner->right)) {
        const INT65 c1 = inner->op == PLUS ? inner->right->u.lval : -inner->right->u.lval;
        if (!is_equality(t)) {
            const BOUNDS x = bounds_of(inner->left, loop);
            if (truncate_to_type(x.min + c1, type) != x.min + c1 || truncate_to_type(x.max + c1, type) != x.max + c1 ||
                truncate_to_type(c2 - c1, type) != c2 - c1)
                return nullptr;
        }
        set_icon(t->right, c2 - c1);
        erase_node(inner->right);
        t->left = take_left(inner);
        return simp_node(t, loop);
    }
    if (!is_equality(t) || inner->op != MINUS || !is_icon(inner->left)) return nullptr;
    set_icon(t->right, inner->left->u.lval - c2); // c1 - x == c2
    erase_node(inner->left);
    t->left = take_right(inner);
    return simp_node(t, loop);
}

TYPE* signed_form(TYPE* t) {
    return is_signed(t) ? t : t == tp->uint_t ? tp->int_t : t == tp->ulong_t ? tp->long_t : tp->llong_t;
}

bool is_pointer_difference(const NODE* t) {
    return t->op == MINUS && t->left->type->is_pointer() && t->right->type->is_pointer() &&
           t->left->type->size == t->type->size && t->right->type->size == t->type->size;
}

// Tests against zero, and of one bit.
NODE* test_against_zero(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_icon(t->right, INT65(0)) || !is_equality(t)) {
        // (x & 2^k) == 2^k is (x & 2^k) != 0
        const bool one_bit = is_equality(t) && is_icon(t->right) && is_node_with_icon(inner, ANDB) &&
                             bits_of(inner->right) == bits_of(t->right) && power_of_2(INT65(0, bits_of(t->right))) >= 0;
        if (!one_bit) return nullptr;
        t->op = t->op == EQ ? NEQ : EQ;
        set_icon(t->right, INT65(0));
        return simp_node(t, loop);
    }
    if (is_pointer_difference(inner)) {
        erase_node(t->right);
        t->left = inner->left;
        t->right = take_right(inner);
        return simp_node(t, loop);
    }
    // x % 2^k == 0: the low bits, whatever the sign
    if (is_node_with_icon(inner, MOD) && log2_of(inner->right) > 0) {
        inner->op = ANDB;
        set_icon(inner->right, inner->right->u.lval - INT65(1));
        t->left = simp_node(inner, loop);
        return simp_node(t, loop);
    }
    // (x & sign bit) != 0 of a signed x
    if (is_node_with_icon(inner, ANDB) && bits_of(inner->right) == sign_bit(inner->type)) {
        TYPE* type = signed_form(inner->type->stqs());
        t->op = t->op == EQ ? GE : LT;
        erase_node(inner->right);
        erase_node(t->right);
        t->left = coerced(type, take_left(inner), loop);
        t->right = mk_ICON(INT65(0), type);
        return simp_node(t, loop);
    }
    return nullptr;
}

// (c ? a : b) rel d of constants: the condition decides.
NODE* compare_arms(NODE* t, struct LOOP* loop) {
    NODE* quest = t->left;
    if (!is_icon(t->right) || quest->op != QUEST || quest->right->op != COLON) return nullptr;
    NODE *a = quest->right->left, *b = quest->right->right;
    if (!is_icon(a) || !is_icon(b) || !same_integers(a->type, quest->type) || !same_integers(b->type, quest->type))
        return nullptr;
    const INT65 d = t->right->u.lval;
    auto holds = [&](const NODE* v) { return accepts(t->op, v->u.lval < d ? -1 : v->u.lval > d); };
    const bool of_a = holds(a), of_b = holds(b);
    if (of_a == of_b) return decided(t, of_a);
    TYPE* type = t->type;
    erase_node(t->right);
    erase_tree(quest->right);
    NODE* condition = take_left(take_left(t));
    condition = make_boolean(condition, loop);
    return coerce_to_type(type, of_a ? condition : simp_node(invert_boolean_tree(condition), loop));
}

// (T)x rel (T)y and (T)x rel c, where the cast widens: compared as the narrow type has it.
NODE* compare_uncast(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (l->op != SCONV || !is_integer(l->left->type) || is_bitfield_access(l->left)) return nullptr;
    TYPE *narrow = l->left->type->stqs(), *wide = l->type;
    if (narrow->size < tp->int_t->size || narrow->size >= wide->size) return nullptr;
    // A negative number cast to unsigned keeps its place in the order only as the unsigned number that it becomes.
    if (is_signed(narrow) && !is_signed(wide)) return nullptr;
    if (is_icon(r)) {
        if (truncate_to_type(r->u.lval, narrow) != r->u.lval) return nullptr; // decided by the bounds
        r->type = narrow;
    } else if (r->op == SCONV && same_integers(r->left->type, narrow) && !is_bitfield_access(r->left)) {
        t->right = take_left(r);
    } else {
        return nullptr;
    }
    t->left = take_left(l);
    t->op = with_sign(t->op, narrow->is_unsigned());
    return simp_node(t, loop);
}

// (x & mask) == c with all bits of a narrower unsigned type: x in that type.
NODE* compare_low_bits(NODE* t, struct LOOP* loop) {
    NODE* inner = t->left;
    if (!is_equality(t) || !is_icon(t->right) || !is_node_with_icon(inner, ANDB)) return nullptr;
    for (TYPE* narrow : {tp->uint_t, tp->ulong_t}) {
        if (narrow->size >= inner->type->size || bits_of(inner->right) != mask_of(narrow)) continue;
        if ((bits_of(t->right) & ~mask_of(narrow)) != 0) return nullptr; // decided by the bits
        NODE* c = mk_ICON(t->right->u.lval, narrow);
        erase_node(t->right);
        erase_node(inner->right);
        t->right = c;
        t->left = coerced(narrow, take_left(inner), loop);
        return simp_node(t, loop);
    }
    return nullptr;
}

const RULE compare_rules[] = {
    decide,        compare_truth_value, compare_single_bit, order_at_the_end, move_constant_across,
    by_pattern,    test_against_zero,   compare_computed,   compare_arms,     compare_low_bits,
    compare_uncast};

// ---- Pointers
bool is_null(const NODE* t) {
    while (t->op == PCONV || t->op == ISP2CHAR) t = t->left;
    return is_icon(t, INT65(0));
}

// What p is the address of, or the pointer that it is the value of, below casts and first members.
struct ORIGIN {
    const NODE* node;
    bool is_object;
};

ORIGIN origin_of(const NODE* p) {
    for (;;) {
        const NODE* place = p->op == UAND ? without_first_members(static_cast<const NODE*>(p->left)) : nullptr;
        if (place && place->op == NAME) return {place, true};
        const bool is_first_member = place && place->op == STREF && place->right->mval &&
                                     place->right->mval->offset == 0 && !is_bitfield_access(place);
        if (p->op == PCONV && p->left->type->is_pointer() && p->left->type->size == p->type->size)
            p = p->left;
        else if (is_first_member || (place && place->op == UMULT && !place->right))
            p = place->left;
        else
            return {p, false};
    }
}

bool addresses_are_same(const NODE* l, const NODE* r) {
    if (l->type->size != r->type->size || !is_pure(l) || !is_pure(r)) return false;
    const ORIGIN a = origin_of(l), b = origin_of(r);
    if (a.is_object || b.is_object) return a.is_object && b.is_object && a.node->u.sym == b.node->u.sym;
    return (a.node != l || b.node != r) && same_value(a.node, b.node);
}

bool is_offset_sum(const NODE* p) { return p->op == PLUS && p->left->type->is_pointer() && is_integer(p->right->type); }

// p + i == p + j, p + i == p: the offsets decide.
NODE* compare_offsets(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    auto base = [](NODE* p) { return (p->op == PLUS || p->op == MINUS) && p->left->type->is_pointer() ? p->left : p; };
    if ((base(l) != l && !is_offset_sum(l)) || (base(r) != r && !is_offset_sum(r)) || !is_pure(l) || !is_pure(r) ||
        !same_value(base(l), base(r)))
        return nullptr;
    auto offset = [&](NODE* p) {
        return is_offset_sum(p) ? coerced(tp->long_t, copy_tree(p->right), loop) : mk_ICON(INT65(0), tp->long_t);
    };
    NODE *i = offset(l), *j = offset(r);
    erase_tree(l);
    erase_tree(r);
    return simp_node(to_binary(t, t->op, i, j), loop);
}

// p + i == q + i: the offset that both are moved by.
NODE* compare_bases(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (!is_offset_sum(l) || !is_offset_sum(r) || !same_integers(l->right->type, r->right->type) ||
        !same_value(l->right, r->right))
        return nullptr;
    if (!is_pure(r->left)) return nullptr;
    erase_tree(l->right);
    erase_tree(r->right);
    t->left = take_left(l);
    t->right = take_left(r);
    return simp_node(t, loop);
}

// A place in an object or just behind it, by its offset.
bool is_place(const NODE* pointer, struct LOOP* loop, const NODE** address, int64_t* offset) {
    const LINEAR_VALUE value(pointer, loop);
    const LINEAR_FORM& sum = value.sum();
    if (!value.is_known() || sum.term_count() != 1 || sum.begin()->coefficient != 1) return false;
    *address = sum.begin()->tree;
    *offset = sum.constant;
    if ((*address)->op != UAND || (*address)->left->op != NAME) return false;
    return *offset >= 0 && INT65(*offset) <= size_in_units((*address)->left->u.sym);
}

// The places of one object are in the order of their offsets: it does not lie around the end of memory.
NODE* compare_places(NODE* t, struct LOOP* loop) {
    const NODE *a, *b;
    int64_t i, j;
    if (!is_unsigned_relop(t->op) || !is_place(t->left, loop, &a, &i) || !is_place(t->right, loop, &b, &j)) return t;
    if (!trees_are_congruent(a, b, false)) return t;
    return decided(t, i == j ? holds_for_equals(t->op) : (i < j) == (t->op == ULT || t->op == ULE));
}

NODE* compare_pointers(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (same_value(l, r)) return decided(t, holds_for_equals(t->op));
    if (addresses_are_same(l, r)) return decided(t, holds_for_equals(t->op));
    if (!is_equality(t)) return compare_places(t, loop);
    if (is_null(r) && pointer_contains_adcon_term(l)) return decided(t, t->op == NEQ);
    if (l->type->size == r->type->size) {
        LINEAR_VALUE difference(l, loop);
        difference.subtract(r);
        if (difference.is_constant()) return decided(t, difference.constant_is(INT65(0)) == (t->op == EQ));
    }
    if (!is_offset_sum(l) && !is_offset_sum(r)) return t;
    if (NODE* decision = compare_offsets(t, loop)) return decision;
    NODE* bases = compare_bases(t, loop);
    return bases ? bases : t;
}

void constant_to_the_right(NODE* t) {
    auto is_number = [](const NODE* n) { return is_constant(n, ICON) || is_constant(n, FCON); };
    auto is_null = [](const NODE* n) { return n->op == PCONV && n->left->op == ICON; };
    if (commute_inv[t->op] == ILLOP || is_number(t->right) || is_null(t->right)) return;
    if (!is_number(t->left) && !is_null(t->left)) return;
    std::swap(t->left, t->right);
    t->op = commute_inv[t->op];
}

// ---- Two compares under a bit operator
// (x == 0) & (y == 0) is (x | y) == 0; (x == -1) & (y == -1) is (x & y) == -1; (x < 0) & (y < 0) is (x & y) < 0; and
// the like. Other outcomes are the opposites.
NODE* join_tests_of_zero(NODE* t, struct LOOP* loop) {
    NODE *a = t->left, *b = t->right;
    if (a->op != b->op || !op_is_int_compare(a->op) || !is_icon(a->right) || !is_icon(b->right) ||
        !same_integers(a->left->type, b->left->type) || !same_integers(a->left->type, a->right->type) ||
        !same_integers(b->left->type, b->right->type))
        return nullptr;
    const bool all_ones = is_all_ones(a->right) && is_all_ones(b->right);
    if (!all_ones && (!is_icon(a->right, INT65(0)) || !is_icon(b->right, INT65(0)))) return nullptr;
    const bool orders = a->op == LT || a->op == GE;
    if (orders && !is_signed(a->left->type)) return nullptr;
    int inner = 0;
    if (t->op == ANDB && a->op == EQ) inner = ORB;
    if (t->op == ORB && a->op == NEQ) inner = ORB;
    if (a->op == LT) inner = t->op;
    if (a->op == GE) inner = t->op == ANDB ? ORB : ANDB;
    if (all_ones) inner = a->op == (t->op == ANDB ? EQ : NEQ) ? ANDB : 0;
    if (!inner) return nullptr;
    TYPE *operand = a->left->type->stqs(), *type = t->type;
    NODE* y = b->left;
    erase_node(b->right);
    erase_node(b);
    a->left = made(inner, a->left, y, operand, loop);
    erase_node(t);
    return coerce_to_type(type, simp_node(a, loop));
}

} // namespace

NODE* join_compares(NODE* t, struct LOOP* loop) {
    if (t->op == XORB || !op_is_int_compare(t->left->op) || !op_is_int_compare(t->right->op)) return nullptr;
    if (NODE* r = join_tests_of_zero(t, loop)) return r;
    // Both are computed, and 0 or 1, so that the logical operator is the one on bits.
    TYPE* type = t->type;
    const int op = t->op;
    t->op = op == ANDB ? ANDAND : OROR;
    if (NODE* r = join_tests_of_one_value(t, loop)) return coerced(type, r, loop);
    t->op = op;
    return nullptr;
}

NODE* simp_relop(NODE* t, struct LOOP* loop) {
    if (t->type->is_vector() || !t->type->is_int()) return t;
    constant_to_the_right(t);
    if (op_is_float_compare(t->op)) return simp_float_relop(t, loop);
    if (t->left->type->is_pointer() && t->right->type->is_pointer()) return compare_pointers(t, loop);
    // Widths and signs of both sides must be the compare's: a mixed pair is converted first.
    if (!same_integers(t->left->type, t->right->type) || t->left->type->size < tp->int_t->size) return t;
    if (!is_equality(t) && is_unsigned_relop(t->op) != t->left->type->is_unsigned()) return t;
    return first_that_applies(compare_rules, t, loop);
}
