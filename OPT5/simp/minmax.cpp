// Minima and maxima.
//
// A conditional that chooses the smaller or the larger of what it compares is one instruction of the target: it becomes
// the call of a built-in where the target has one for the type. Of floating pairs the order of the arguments says what
// a NaN or two zeros choose, so that they are never exchanged. Of integers a constant is the second argument; what the
// bounds of the arguments decide is decided; limits of a limited value join.

#include "OPT5/simp/minmax.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"
#include "OPT5/target/bif.h"

#include <algorithm>
#include <utility>

using namespace rules;

namespace {

const char* minmax_name(TYPE* type, bool maximum) {
    if (type->is_float()) {
        static const char* const names[3][2] = {{"FMIN", "FMAX"}, {"DMIN", "DMAX"}, {"LDMIN", "LDMAX"}};
        const int row = type->fkind() == TYPE::fk_float ? 0 : type->fkind() == TYPE::fk_double ? 1 : 2;
        return names[row][maximum];
    }
    static const char* const names[3][2][2] = {{{"MIN", "MAX"}, {"MINU", "MAXU"}},
                                               {{"LMIN", "LMAX"}, {"LMINU", "LMAXU"}},
                                               {{"LLMIN", "LLMAX"}, {"LLMINU", "LLMAXU"}}};
    if (!type->is_int()) return nullptr;
    const int row = type->size == 16 ? 0 : type->size == 32 ? 1 : type->size == 64 ? 2 : -1;
    return row < 0 ? nullptr : names[row][type->is_unsigned()][maximum];
}

// Whether a compare holds where its left side is the smaller (1) or the larger (0); -1 for any other. Of floats only
// the strict compares, which an equal pair and a NaN fail.
int order_of(int op, TYPE* type) {
    switch (op) {
    case FLT: return 1;
    case FGT: return 0;
    case LT:
    case LE: return type->is_unsigned() ? -1 : 1;
    case GT:
    case GE: return type->is_unsigned() ? -1 : 0;
    case ULT:
    case ULE: return type->is_unsigned() ? 1 : -1;
    case UGT:
    case UGE: return type->is_unsigned() ? 0 : -1;
    default: return -1;
    }
}

// Whether the arm `value` is what the compare's side `bound` is. Of integers the neighbour across the border serves as
// well: `y >= 8 ? 7 : y` is the smaller of y and 7, as `y > 7 ? 7 : y` is.
bool is_bound(const NODE* value, const NODE* bound, int op, bool on_the_right) {
    if (trees_are_congruent(value, bound, false)) return true;
    if (value->op != ICON || bound->op != ICON || !on_the_right || !equiv_mtypes(value->type, bound->type))
        return false;
    const INT65 v = value->u.lval, b = bound->u.lval;
    switch (op) {
    case LT:
    case GE:
    case ULT:
    case UGE: return v == b - INT65(1);
    case LE:
    case GT:
    case ULE:
    case UGT: return v == b + INT65(1);
    default: return false;
    }
}

} // namespace

// A compare that holds for equals says as much as the strict one where equal numbers are the same: of an ordinary
// constant, which is no zero.
static int strict_op(const NODE* c) {
    if (c->op != FLE && c->op != FGE) return c->op;
    for (const NODE* side : {c->left, c->right})
        if (side->op == FCON && !f_is_zero(side->u.fval) && !f_is_nan(side->u.fval)) return c->op == FLE ? FLT : FGT;
    return c->op;
}

NODE* make_minmax(const NODE* c, const NODE* a, const NODE* b, TYPE* type) {
    if (!c->left || !c->right || !equiv_mtypes(c->left->type, type) || !equiv_mtypes(c->right->type, type))
        return nullptr;
    int op = strict_op(c);
    if (op == FGEN || op == FLEN) {
        op = boolean_inv[op];
        std::swap(a, b);
    }
    const int less = order_of(op, type);
    if (less < 0) return nullptr;
    const bool straight = is_bound(a, c->left, op, false) && is_bound(b, c->right, op, true);
    const bool crossed = is_bound(a, c->right, op, true) && is_bound(b, c->left, op, false);
    if (!straight && !crossed) return nullptr;
    const bool maximum = (less == 1) == crossed;
    const char* generic = minmax_name(type, maximum);
    const BIF* bif = generic ? find_target_BIF_descriptor(generic) : nullptr;
    if (!bif) return nullptr;
    // Of a floating pair the second argument is the one that must be smaller (larger) to win: the one that the
    // condition chooses, so that a NaN and zeros of both signs choose as before.
    NODE* args = maketree(COMMA, copy_tree(b), copy_tree(a), tp->int_t);
    return fix_BIF_types(mk_ICALL(bif->name.c_str(), args, type));
}

EXTREMUM extremum_of(const NODE* t) {
    if (t->op != ICALL || !t->left || t->left->op != COMMA || t->left->left->op == COMMA) return {};
    const BIF* bif = find_target_BIF_descriptor(t->u.name);
    if (!bif || bif->nparams != 2 || !bif->has(IS_PROPER_MINVAL | IS_PROPER_MAXVAL)) return {};
    if (!same_integers(t->left->left->type, t->type) || !same_integers(t->left->right->type, t->type)) return {};
    return {t->left->left, t->left->right, bif->has(IS_PROPER_MAXVAL)};
}

static const BIF* extremum_BIF(bool maximum, TYPE* type) {
    const char* generic = minmax_name(type, maximum);
    return generic ? find_target_BIF_descriptor(generic) : nullptr;
}

bool has_extremum(bool maximum, TYPE* type) { return extremum_BIF(maximum, type) != nullptr; }

NODE* extremum_call(bool maximum, NODE* a, NODE* b, TYPE* type, struct LOOP* loop) {
    const BIF* bif = extremum_BIF(maximum, type);
    if (!bif) return nullptr;
    return simp_node(mk_ICALL(bif->name.c_str(), maketree(COMMA, a, b, tp->int_t), type), loop);
}

namespace {

// One of the arguments, with the effects of the other.
NODE* only_argument(NODE* t, bool first) {
    NODE* args = take_left(t);
    NODE *a = args->left, *b = args->right;
    erase_node(args);
    if (!first) return in_sequence(peel_for_effect(a), b);
    erase_tree(b);
    return a;
}

// ---- Rules of a call whose arguments have the call's type
NODE* known_order(NODE* t, struct LOOP* loop) {
    const EXTREMUM e = extremum_of(t);
    INT65 min_a, max_a, min_b, max_b;
    if (!calculate_bounds(e.a, loop, &min_a, &max_a) || !calculate_bounds(e.b, loop, &min_b, &max_b)) return nullptr;
    const bool same = is_pure(e.a) && same_value(e.a, e.b), a_is_less = max_a <= min_b, b_is_less = max_b <= min_a;
    if (!same && !a_is_less && !b_is_less) return nullptr;
    const bool first = same || a_is_less != e.maximum;
    return !first || is_pure(e.b) ? only_argument(t, first) : nullptr;
}

NODE* constant_to_the_right(NODE* t, struct LOOP* loop) {
    NODE* args = t->left;
    if (!is_icon(args->left) || is_icon(args->right)) return nullptr;
    std::swap(args->left, args->right);
    return simp_node(t, loop);
}

// min(min(x, c), d) is min(x, min(c, d)); max(min(x, c), d) of a d that is above c is d, by the bounds. min(x, max(x,
// y)) is x; min(x, min(x, y)) is the inner one.
NODE* join_limits(NODE* t, struct LOOP* loop) {
    const EXTREMUM outer = extremum_of(t);
    for (bool left : {true, false}) {
        NODE *inner = left ? outer.a : outer.b, *other = left ? outer.b : outer.a;
        const EXTREMUM e = extremum_of(inner);
        if (!e.a) continue;
        if (is_pure(inner) && (same_value(e.a, other) || same_value(e.b, other)))
            return only_argument(t, left == (e.maximum == outer.maximum));
        if (e.maximum != outer.maximum || !is_icon(e.b) || !is_icon(other)) continue;
        const INT65 c = e.b->u.lval, d = other->u.lval;
        e.b->u.lval = outer.maximum ? std::max(c, d) : std::min(c, d);
        return simp_node(only_argument(t, left), loop);
    }
    return nullptr;
}

// Of two values that were widened the narrow ones: the cast keeps their order.
NODE* extremum_under_cast(NODE* t, struct LOOP* loop) {
    const EXTREMUM e = extremum_of(t);
    auto widens = [](const NODE* n) {
        return n->op == SCONV && is_integer(n->left->type) && n->left->type->size < n->type->size &&
               n->left->type->size >= tp->int_t->size && is_signed(n->left->type) && !is_bitfield_access(n->left);
    };
    if (!widens(e.a)) return nullptr;
    TYPE *narrow = e.a->left->type->stqs(), *wide = t->type;
    const bool fits = is_icon(e.b) ? truncate_to_type(e.b->u.lval, narrow) == e.b->u.lval
                                   : widens(e.b) && same_integers(e.b->left->type, narrow);
    if (!fits || !find_target_BIF_descriptor(minmax_name(narrow, e.maximum))) return nullptr;
    erase_node(t->left);
    erase_node(t);
    NODE* b = is_icon(e.b) ? mk_ICON(e.b->u.lval, narrow) : e.b->left;
    erase_node(e.b);
    return coerced(wide, extremum_call(e.maximum, take_left(e.a), b, narrow, loop), loop);
}

} // namespace

bool is_minmax_call(const NODE* t) { return extremum_of(t).a != nullptr; }

NODE* simp_minmax_ICALL(NODE* t, struct LOOP* loop) {
    if (!is_minmax_call(t)) return t;
    static const RULE table[] = {known_order, constant_to_the_right, join_limits, extremum_under_cast};
    return first_that_applies(table, t, loop);
}

NODE* simp_absolute_ICALL(NODE* t, struct LOOP* loop) {
    NODE* x = t->left;
    if (!x || x->op == COMMA || !same_integers(x->type, t->type) || !is_signed(t->type)) return t;
    if (is_icon(x))
        return replace_by(
            t, icon_of(std::min(int_type_max(t->type), x->u.lval.is_negative() ? -x->u.lval : x->u.lval), t));
    if (tree_is_non_negative(x, loop)) return take_left(t);
    return t;
}

// x < c ? c : min(x, d) with c <= d is max(min(x, d), c), and with the orders exchanged.
static NODE* clamp_of_QUEST(NODE* t, struct LOOP* loop) {
    NODE *c = t->left, *a = t->right->left, *b = t->right->right;
    const bool limit_first = is_icon(a);
    NODE *limit = limit_first ? a : b, *inner = limit_first ? b : a;
    const EXTREMUM e = extremum_of(inner);
    if (!e.a || !is_icon(limit) || !is_icon(e.b) || !is_icon(c->right) || !same_value(c->left, e.a)) return nullptr;
    if (!equiv_mtypes(c->left->type, t->type) || !equiv_mtypes(limit->type, t->type)) return nullptr;
    const int op = limit_first ? c->op : boolean_inv[c->op]; // holds where the limit is the value
    const int less = order_of(op, t->type);
    if (less < 0 || !is_bound(limit, c->right, op, true)) return nullptr;
    const bool maximum = less == 1; // of the outer call
    if (maximum == e.maximum || (maximum ? limit->u.lval > e.b->u.lval : limit->u.lval < e.b->u.lval)) return nullptr;
    NODE* call = extremum_call(maximum, copy_tree(inner), copy_tree(limit), t->type, loop);
    if (call) erase_tree(t);
    return call;
}

// x < c ? c : fmin(x, d) with c <= d is fmax(fmin(x, d), c), and with the orders exchanged: a NaN and a zero of either
// sign fail the compare with c on both sides, and stay what they are.
static NODE* float_clamp_of_QUEST(const NODE* t, struct LOOP* loop) {
    const NODE *c = t->left, *limit = t->right->left, *inner = t->right->right;
    if (limit->op != FCON || inner->op != ICALL || !inner->left || inner->left->op != COMMA) return nullptr;
    const int less = order_of(strict_op(c), t->type);
    if (less < 0 || !equiv_mtypes(c->left->type, t->type) || !equiv_mtypes(limit->type, t->type)) return nullptr;
    const bool maximum = less == 1; // of the outer call
    const BIF* bif = extremum_BIF(!maximum, t->type);
    const NODE *x = inner->left->left, *other = inner->left->right;
    if (!bif || bif->name != inner->u.name || other->op != FCON || !trees_are_congruent(c->left, x, false) ||
        !trees_are_congruent(c->right, limit, false))
        return nullptr;
    const simul_fval *low = maximum ? limit->u.fval : other->u.fval, *high = maximum ? other->u.fval : limit->u.fval;
    return f_le(low, high) ? extremum_call(maximum, copy_tree(inner), copy_tree(limit), t->type, loop) : nullptr;
}

// Arms that were widened for the result, where the narrow values are compared: widened behind the choice. A new tree in
// the narrow type, or null.
static NODE* narrow_arm(const NODE* arm, TYPE* narrow) {
    if (is_icon(arm) && truncate_to_type(arm->u.lval, narrow) == arm->u.lval) return mk_ICON(arm->u.lval, narrow);
    const bool widened = arm->op == SCONV && same_integers(arm->left->type, narrow) && !is_bitfield_access(arm->left);
    return widened ? copy_tree(arm->left) : nullptr;
}

static NODE* minmax_of_widened(const NODE* t, struct LOOP* loop) {
    const NODE* c = t->left;
    TYPE *narrow = c->left->type->stqs(), *wide = t->type->stqs();
    if (!is_integer(narrow) || !is_integer(wide) || narrow->size >= wide->size) return nullptr;
    if (is_signed(narrow) && !is_signed(wide)) return nullptr;
    NODE *a = narrow_arm(t->right->left, narrow), *b = narrow_arm(t->right->right, narrow);
    NODE* call = a && b ? make_minmax(c, a, b, narrow) : nullptr;
    erase_tree(a);
    erase_tree(b);
    return call ? coerced(wide, simp_node(call, loop), loop) : nullptr;
}

// Arms that were narrowed for the result, where the wide values are compared: narrowed behind the choice. A new tree in
// the wide type, or null.
static NODE* wide_arm(const NODE* arm, TYPE* wide) {
    if (is_icon(arm) && truncate_to_type(arm->u.lval, wide) == arm->u.lval) return mk_ICON(arm->u.lval, wide);
    const bool narrowed = arm->op == SCONV && same_integers(arm->left->type, wide) && !is_bitfield_access(arm->left);
    return narrowed ? copy_tree(arm->left) : nullptr;
}

static NODE* minmax_of_narrowed(const NODE* t, struct LOOP* loop) {
    TYPE *wide = t->left->left->type->stqs(), *narrow = t->type->stqs();
    if (!is_integer(narrow) || !is_integer(wide) || narrow->size >= wide->size || narrow->is_bool()) return nullptr;
    NODE *a = wide_arm(t->right->left, wide), *b = wide_arm(t->right->right, wide);
    if (!a || !b || (is_icon(a) && is_icon(b))) {
        erase_tree(a);
        erase_tree(b);
        return nullptr;
    }
    NODE* choice = maketree(QUEST, copy_tree(t->left), maketree(COLON, a, b, wide), wide);
    NODE* call = minmax_of_QUEST(choice, loop);
    if (!call) erase_tree(choice);
    return call ? coerced(narrow, call, loop) : nullptr;
}

NODE* minmax_of_QUEST(NODE* t, struct LOOP* loop) {
    NODE *c = t->left, *a = t->right->left, *b = t->right->right;
    if ((!op_is_int_compare(c->op) && !op_is_float_compare(c->op)) || !is_pure(t)) return nullptr;
    NODE* call = make_minmax(c, a, b, t->type);
    if (call)
        call = simp_node(call, loop);
    else if (!(call = minmax_of_widened(t, loop)))
        call = minmax_of_narrowed(t, loop);
    if (!call && op_is_int_compare(c->op)) return clamp_of_QUEST(t, loop);
    if (!call) call = float_clamp_of_QUEST(t, loop);
    if (!call) return nullptr;
    erase_tree(t);
    return call;
}
