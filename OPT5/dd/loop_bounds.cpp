// Bounds of the variables of a loop: between which numbers a variable stays at every point of the loop, from its first
// value to the one with which the loop is left.
//
// They come from the ends of the control variable and from accesses of arrays: where one is made in every iteration,
// its subscript lies in the array, and so the loop has no more iterations than the array has places.
//
// Needs: affine variables and trip counts; trees in normal form. Leaves: the same, with narrower bounds and maxima.
// Sound because an access is taken for one of every iteration only if its block is passed between the head and each of
// the tail and the exits, and nothing in the loop may fail to come back: of `if (i == 10) done(); a[i] = 1;` a call
// that ends the program is no edge. The access lies in the whole object, not in the row that it is written with:
// m[0][i] may run through all rows. What holds at the access is widened by a step for the places behind the update.

#include "OPT5/dd/trip.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>
#include <optional>

namespace {

constexpr int64_t MOST_STEP = 50000;

// The step of an affine variable of integers, or nothing.
std::optional<WIDE> constant_step(const LOOPIV* iv) {
    if (!iv->has(IV_affine) || !is_icon(iv->incrtree) || !iv->sym->type->is_int()) return std::nullopt;
    const INT65 step = sign_extend_by_type_size(iv->incrtree->u.lval, iv->incrtree->type);
    if (step.is_zero()) return std::nullopt;
    return to_wide(step);
}

// Each iteration starts with another value.
void bound_trips(const LOOPIV* iv, WIDE low, WIDE high) {
    struct LOOP* loop = iv->loop;
    const auto step = constant_step(iv);
    if (!step || *step > MOST_STEP || *step < -MOST_STEP || is_icon(loop->trips) || !is_icon(loop->minTrips) ||
        !is_icon(loop->maxTrips) || high < low)
        return;
    const WIDE trips = (high - low) / (*step < 0 ? -*step : *step) + 1;
    if (trips < to_wide(loop->minTrips->u.lval) || trips < 1 || trips >= to_wide(loop->maxTrips->u.lval)) return;
    if (loop->trips && to_int65(trips) > int_type_max(loop->trips->type->stqs())) return;
    loop->maxTrips->u.lval = to_int65(trips);
    if (loop->VLCV) loop->VLCV->highval = to_int65(loop->is_bottom_tested() ? trips - 1 : trips);
    reconcile_MUST_ITERATE_pragma(loop);
}

void after_change(const LOOPIV* iv) {
    if (iv == iv->loop->LCV) bound_trips(iv, to_wide(iv->lowval), to_wide(iv->highval));
}

bool takes_bounds(const LOOPIV* iv) { return iv->sym->type->is_int() || iv->sym->type->is_enum(); }

} // namespace

void constrain_LOOPIV_highval(LOOPIV* iv, INT65 value) {
    if (!takes_bounds(iv) || iv->has(IV_high_is_exact) || value < iv->lowval || value >= iv->highval) return;
    iv->highval = value;
    after_change(iv);
}

void constrain_LOOPIV_lowval(LOOPIV* iv, INT65 value) {
    if (!takes_bounds(iv) || iv->has(IV_low_is_exact) || value > iv->highval || value <= iv->lowval) return;
    iv->lowval = value;
    after_change(iv);
}

// ---- By the ends

namespace {

void constrain(LOOPIV* iv, const RANGE& r, uint64_t exact) {
    if (r.min > r.max) return;
    const INT65 low = to_int65(r.min), high = to_int65(r.max);
    constrain_LOOPIV_lowval(iv, low);
    constrain_LOOPIV_highval(iv, high);
    if (iv->lowval == low) iv->flags |= exact & IV_low_is_exact;
    if (iv->highval == high) iv->flags |= exact & IV_high_is_exact;
}

bool is_within(const RANGE& r, TYPE* type) {
    return r.min >= to_wide(int_type_min(type)) && r.max <= to_wide(int_type_max(type));
}

// The values of a tree that is read ahead of the loop.
std::optional<RANGE> values_ahead(const NODE* t, const struct LOOP* loop, TYPE* type) {
    RANGE r{0, 0};
    if (!t || !bounds_of(t, loop->parent, &r)) return std::nullopt;
    if (t->op == ICON)
        return RANGE{to_wide(truncate_to_type(t->u.lval, type)), to_wide(truncate_to_type(t->u.lval, type))};
    return is_within(r, type) ? r : std::optional<RANGE>();
}

// How far behind the limit the test may leave it.
WIDE overshoot(int op, WIDE size) {
    if (op == NEQ) return 0;
    return op == LT || op == ULT || op == GT || op == UGT ? size - 1 : size;
}

} // namespace

void refine_loop_highlow(struct LOOP* loop) {
    LOOPIV* iv = loop->LCV;
    if (!iv || loop->has(LOOP_early_exit)) return;
    const auto step = constant_step(iv);
    if (!step) return;
    TYPE* type = iv->sym->type->stqs();
    const bool up = *step > 0;
    const auto start = values_ahead(iv->init, loop, type), limit = values_ahead(iv->last, loop, type);
    if (start) {
        RANGE r{to_wide(int_type_min(type)), to_wide(int_type_max(type))};
        (up ? r.min : r.max) = up ? start->min : start->max;
        const bool is_constant = iv->init->op == ICON;
        if (is_constant && is_icon(loop->maxTrips) && loop->maxTrips->u.lval < no_trip_bound()) {
            const WIDE far = start->min + *step * to_wide(loop->maxTrips->u.lval);
            if (up ? far <= r.max : far >= r.min) (up ? r.max : r.min) = far;
        }
        const uint64_t near_end = up ? IV_low_is_exact : IV_high_is_exact,
                       far_end = up ? IV_high_is_exact : IV_low_is_exact;
        constrain(iv, r, is_constant ? near_end | (is_icon(loop->trips) ? far_end : 0) : 0);
    }
    // A test for != keeps the variable on this side of the limit where it comes to meet it.
    const bool is_kept = loop->test == NEQ ? type->is_signed() && always_comes_to_its_test(loop) : loop->test != EQ;
    if (limit && is_kept && first_test_holds(loop)) {
        const WIDE more = overshoot(loop->test, up ? *step : -*step);
        RANGE r{to_wide(int_type_min(type)), to_wide(int_type_max(type))};
        (up ? r.max : r.min) = up ? std::min(r.max, limit->max + more) : std::max(r.min, limit->min - more);
        // Bits that the limit never has bound it from above where it is not negative.
        if (up && limit->min >= 0) {
            const INT65 possible = ~find_known_zeros(iv->last, type) & int_type_max(type);
            r.max = std::min(r.max, to_wide(possible) + more);
        }
        constrain(iv, r, 0);
    }
}

// ---- By subscripts

namespace {

bool passes_control(const BBLK* bb) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (may_not_pass_control(s->first) || tree_contains_op(s->first, ASSERT)) return false;
    return true;
}

} // namespace

bool always_comes_to_its_end(const struct LOOP* loop) {
    return !loop->is_root() && std::all_of(loop->contents.begin(), loop->contents.end(), [loop](const BBLK* bb) {
        return bb->loop == loop && passes_control(bb);
    });
}

bool always_comes_to_its_test(const struct LOOP* loop) {
    return !loop->is_root() && std::all_of(loop->contents.begin(), loop->contents.end(), [loop](const BBLK* bb) {
        return bb->loop == loop ? passes_control(bb) : bb->loop->trips && always_comes_to_its_test(bb->loop);
    });
}

namespace {

class SUBSCRIPTS {
public:
    explicit SUBSCRIPTS(struct LOOP* l) : loop(l) {}

    // Accesses that evaluating the tree makes whatever its conditions are.
    void visit(const NODE* t) {
        if (!t) return;
        switch (t->op) {
        case UAND: // of the place nothing is accessed; of a member's object a part
        case ARGREF:
        case STDOT:
        case ACONV: {
            const NODE* object = object_of_place(t->left);
            if (object->op == NAME) return;
            if (object->op != UMULT) return visit(object);
            visit(object->left);
            return visit(object->right);
        }
        case ANDAND:
        case OROR:
        case QUEST: return visit(t->left);
        case NASSERT:
        case ASSERT: return;
        case UMULT: use(t); break;
        default: break;
        }
        visit(t->left);
        visit(t->right);
    }

private:
    static constexpr int64_t UNIT = 16; // bits

    void use(const NODE* access) {
        LINEAR_FORM sum(64);
        if (access->type->is_func() || access->type->is_array() || access->type->size == 0 ||
            access->type->size % UNIT || !read_exact_sum(access->left, 1, &sum) ||
            (access->right && !read_exact_sum(access->right, 1, &sum)))
            return;
        const SYMTAB* object = nullptr;
        LOOPIV* iv = nullptr;
        int64_t by = 0;
        for (const auto& term : sum) {
            const NODE* t = term.tree;
            if (t->op == UAND && t->left->op == NAME && term.coefficient == 1 && !object)
                object = t->left->u.sym;
            else if (t->op == NAME && !iv && (iv = find_LOOPIV_for_IV(t->u.sym, loop, false)) && iv->has(IV_is_IV))
                by = term.coefficient;
            else
                return;
        }
        if (object && iv && by && (object->type->is_array() || object->type->is_struct()) &&
            object->type->size > access->type->size)
            constrain_by(iv, static_cast<int64_t>((object->type->size - access->type->size) / UNIT), sum.constant, by);
    }

    // 0 <= constant + by * v <= most
    void constrain_by(LOOPIV* iv, WIDE most, WIDE constant, WIDE by) {
        const auto step = constant_step(iv);
        if (!step || *step > MOST_STEP || *step < -MOST_STEP) return;
        auto floor_of = [](WIDE a, WIDE b) { return a / b - (a % b != 0 && (a < 0) != (b < 0) ? 1 : 0); };
        RANGE r{-floor_of(constant, by), floor_of(most - constant, by)};
        if (by < 0) r = {-floor_of(-(most - constant), by), floor_of(-constant, by)};
        TYPE* type = iv->sym->type->stqs();
        if (r.min > r.max || type->is_bool()) return;
        r.min = std::max(r.min, to_wide(iv->lowval));
        r.max = std::min(r.max, to_wide(iv->highval));
        bound_trips(iv, r.min, r.max);
        const WIDE size = *step < 0 ? -*step : *step;
        const RANGE everywhere{std::max(r.min - size, to_wide(iv->lowval)),
                               std::min(r.max + size, to_wide(iv->highval))};
        if (!is_within(everywhere, type) || everywhere.min > everywhere.max) return;
        const bool lower = everywhere.min > to_wide(iv->lowval), upper = everywhere.max < to_wide(iv->highval);
        constrain(iv, everywhere, 0);
        const bool is_unsigned = type->is_unsigned();
        auto assert_bound = [&](int op, WIDE v) {
            add_loop_body_assertion(maketree(op, mk_NAME(iv->sym), mk_ICON(to_int65(v), type), tp->int_t), loop);
        };
        if (upper) assert_bound(is_unsigned ? ULE : LE, everywhere.max);
        if (lower) assert_bound(is_unsigned ? UGE : GE, everywhere.min);
    }

    struct LOOP* const loop;
};

} // namespace

void constrain_all_ranges() {
    struct LOOP* root = loop_root();
    if (!root) return;
    for (struct LOOP* loop : loops_outer_first(root)) {
        if (!always_comes_to_its_end(loop)) continue;
        SUBSCRIPTS subscripts(loop);
        for (BBLK* bb : loop->contents) {
            if (!bb_post_dominates_bb(bb, loop->head) || !bb_dominates_bb(bb, loop->tail)) continue;
            for (const LIST* s = bb->statements; s; s = s->rest)
                if (s->first->op != PPRAGMA) subscripts.visit(s->first->op == IF ? s->first->left : s->first);
        }
    }
}
