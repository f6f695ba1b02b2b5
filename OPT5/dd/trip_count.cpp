// How often a loop runs: `trips` is the number of executions of the tail for one entry.
//
// The test `v op limit` of the control variable, its value on entry and its step give the count: of constants, and of
// ends at a constant distance, as a constant; otherwise as a tree over invariants of the loop, to be read ahead of it.
//
// Needs: the control variable with its test, limit, step and value on entry; facts of the loop. Leaves: `trips`, and
// the affine flags that are proved.
// Sound because differences are taken in a type that holds them: from -30000 to 30000 an int counter runs 60000 units.
// A counter that may wrap has no count but by exact arithmetic modulo its width, and that only where it is unsigned: of
// `u <= n` with n = 65535 there is no end. A bottom-tested loop runs once whatever its test says, so that its count is
// the formula's only where the test would also pass on entry. Where a loop may be left before its test fails the
// formula is an upper bound; it is none if the test is `!=` and the limit may lie on the other side of the start.

#include "OPT5/dd/trip.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/dd.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/linear.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <memory>
#include <optional>

bool bounds_of(const NODE* tree, const struct LOOP* loop, RANGE* range) {
    if (!tree->type->is_int() || !has_value_range(tree->type)) return false;
    *range = range_of_tree(tree, const_cast<struct LOOP*>(loop));
    return true;
}

bool keeps_values(const NODE* t) {
    if (t->op != SCONV) return false;
    const TYPE *to = t->type, *from = t->left->type;
    if (!to->is_int() || !from->is_int() || from->is_bool() || to->is_bool()) return false;
    if (to->is_unsigned() == from->is_unsigned()) return from->size <= to->size;
    return from->is_unsigned() && from->size < to->size;
}

const NODE* asserted_condition(const NODE* t) {
    if (t->op != NASSERT && t->op != ASSERT) return nullptr;
    const NODE* condition = t->left->op == COMMA ? t->left->left : t->left;
    return tree_has_side_effects(condition) ? nullptr : condition;
}

NODE* denormalized_copy(const NODE* tree) { return denormalize_tree(copy_tree(tree), false); }

namespace {

struct TREE_ERASER {
    void operator()(NODE* t) const { erase_tree(t); }
};
using OWNED_TREE = std::unique_ptr<NODE, TREE_ERASER>;

struct LIMITS {
    WIDE low, high;
};
LIMITS limits_of(TYPE* type) { return {to_wide(int_type_min(type)), to_wide(int_type_max(type))}; }

// The integer type that a variable counts in.
TYPE* counting_type(const SYMTAB* sym) { return sym->type->is_pointer() ? tp->long_t : sym->type->stqs(); }

bool is_inclusive(int op) { return op == LE || op == GE || op == ULE || op == UGE; }
bool goes_up(int op) { return op == LT || op == LE || op == ULT || op == ULE; }
bool goes_down(int op) { return op == GT || op == GE || op == UGT || op == UGE; }

// ---- The control variable's numbers

struct COUNTER {
    const struct LOOP* loop;
    TYPE* type; // that it counts in
    bool is_pointer;
    OWNED_TREE init, limit; // of the variable's own type
    WIDE step;
    int op;
    bool bottom; // tested behind the step

    int first_test() const { return bottom ? 1 : 0; }
    bool is_unsigned() const { return type->is_unsigned() && !is_pointer; }
};

// The numbers of the loop's control variable; none where one is missing or of another kind.
std::optional<COUNTER> counter_of(const struct LOOP* loop) {
    const LOOPIV* iv = loop->LCV;
    if (!iv || !iv->init || !iv->last || !iv->incrtree || iv->incrtree->op != ICON) return std::nullopt;
    const TYPE *own = iv->sym->type, *other = iv->last->type;
    const bool is_pointer = own->is_pointer();
    if (is_pointer ? !other->is_pointer() : !own->is_int() || own->is_bool() || !other->is_int()) return std::nullopt;
    if (iv->init->type->is_pointer() != is_pointer || (!is_pointer && !iv->init->type->is_int())) return std::nullopt;
    if (own->size != other->size) return std::nullopt;
    TYPE* type = counting_type(iv->sym);
    if (loop->test != EQ && loop->test != NEQ && !is_pointer && (loop->test >= ULE) != type->is_unsigned())
        return std::nullopt;
    const INT65 step = sign_extend_by_type_size(iv->incrtree->u.lval, iv->incrtree->type);
    if (step.is_zero()) return std::nullopt;
    COUNTER c{loop,
              type,
              is_pointer,
              OWNED_TREE(denormalized_copy(iv->init)),
              OWNED_TREE(denormalized_copy(iv->last)),
              to_wide(step),
              loop->test,
              loop->is_bottom_tested()};
    if (!is_pointer) { // the value that the variable holds, and that it is compared with
        c.init.reset(coerce_to_type(type, c.init.release()));
        c.limit.reset(coerce_to_type(type, c.limit.release()));
    }
    return c;
}

WIDE value_of(const NODE* icon, TYPE* type) { return to_wide(truncate_to_type(icon->u.lval, type)); }

// ---- Constant ends

bool passes(int op, WIDE v, WIDE limit) {
    switch (op) {
    case EQ: return v == limit;
    case NEQ: return v != limit;
    case LT:
    case ULT: return v < limit;
    case LE:
    case ULE: return v <= limit;
    case GT:
    case UGT: return v > limit;
    default: return v >= limit;
    }
}

} // namespace

std::optional<WIDE> steps_to_exit(WIDE init, WIDE limit, WIDE step, int op, int first) {
    if (!passes(op, init + first * step, limit)) return first;
    const WIDE distance = step > 0 ? limit - init : init - limit, size = step > 0 ? step : -step;
    if (op == EQ) return first + 1;
    if (op == NEQ) {
        if (distance < 0 || distance % size != 0) return std::nullopt;
        return distance / size;
    }
    if (step > 0 ? !goes_up(op) : !goes_down(op)) return std::nullopt;
    return is_inclusive(op) ? floor_div(distance, size) + 1 : ceil_div(distance, size);
}

namespace {

// The same of an unsigned variable that is tested for != and wraps: the least n with step * n == distance modulo
// 2^bits.
std::optional<WIDE> modular_steps(WIDE distance, WIDE step, unsigned bits, int first) {
    auto reduced = [bits](WIDE v) {
        return static_cast<unsigned __int128>(v) & ((static_cast<unsigned __int128>(1) << bits) - 1);
    };
    const unsigned __int128 d = reduced(distance), s = reduced(step);
    if (s == 0) return std::nullopt;
    const int twos = __builtin_ctzll(static_cast<uint64_t>(s));
    if (d & ((static_cast<unsigned __int128>(1) << twos) - 1)) return std::nullopt;
    // The odd part to the power 2^(bits - 2) - 1 is its inverse.
    const INT65 odd(0, static_cast<uint64_t>(s >> twos));
    const unsigned left = bits - static_cast<unsigned>(twos);
    unsigned __int128 inverse = 1;
    if (bits > 2) {
        const INT65 power = ulong_expt(odd, (INT65(1) << INT65(bits - 2)) - INT65(1));
        inverse = reduced(to_wide(power));
    } else
        inverse = reduced(to_wide(odd));
    WIDE n = static_cast<WIDE>(((d >> twos) * inverse) & ((static_cast<unsigned __int128>(1) << left) - 1));
    if (n < first) n += static_cast<WIDE>(1) << left;
    if (n > to_wide(no_trip_bound())) return std::nullopt;
    return n;
}

// Whether the value stays within the type until the loop is left behind `n` steps.
bool stays_within(WIDE init, WIDE step, WIDE n, TYPE* type) {
    const LIMITS l = limits_of(type);
    const WIDE end = init + n * step;
    return l.low <= end && end <= l.high;
}

// ---- Ends at a constant distance

// A sum of numbers, by operators that give the number itself; with `wraps` by all, modulo the form's width.
class DISTANCE_READER final : public LINEAR_READER {
public:
    DISTANCE_READER(LINEAR_FORM* f, bool wraps_too) : LINEAR_READER(f, 200), wraps(wraps_too) {}

private:
    bool opens(const NODE* t, const LINEAR_STEP& step) override {
        const TYPE* type = t->type;
        if (wraps)
            return type->size >= form.bits && step.a->type->size >= form.bits &&
                   (!step.b || step.b->type->size >= form.bits);
        if (t->op == SCONV) return keeps_values(t);
        if (type->is_pointer()) return t->op == PLUS || t->op == MINUS || t->op == PCONV;
        return t->op == PMCONV || is_exact_by_rule(t->op, type);
    }
    bool wraps;
};

std::optional<WIDE> constant_difference(const NODE* a, const NODE* b, unsigned bits, bool wraps) {
    if (tree_has_side_effects(a) || tree_has_side_effects(b)) return std::nullopt;
    LINEAR_FORM form(bits);
    DISTANCE_READER reader(&form, wraps);
    if (!reader.read(a, 1) || !reader.read(b, -1) || !form.is_constant() || !(wraps || form.is_exact))
        return std::nullopt;
    return form.constant;
}

// With what the loop's invariants were given ahead of it, in place of their names.
NODE* with_values_of_invariants(NODE* t, const struct LOOP* loop) {
    for (const struct LOOP* l = loop; l && !l->is_root(); l = l->parent)
        for (const auto& iv : l->IVs) {
            if (!iv->has(IV_is_RC) || !iv->init || iv->init->type->size != iv->sym->type->size ||
                !sym_appears_in_tree(iv->sym, t))
                continue;
            if (l != loop && !expr_is_constant(iv->init) && !tree_is_RC_in_loop(iv->init, l, false)) continue;
            OWNED_TREE name(mk_NAME(iv->sym)), value(denormalized_copy(iv->init));
            if (!iv->sym->type->is_pointer() && iv->init->type->is_int())
                value.reset(coerce_to_type(iv->sym->type->stqs(), value.release()));
            if (sym_appears_in_tree(iv->sym, value.get())) continue;
            t = subst_tree_for_lvalue_in_tree(value.get(), name.get(), t);
        }
    return t;
}

std::optional<WIDE> difference_of_ends(const COUNTER& c, unsigned bits, bool wraps) {
    if (auto d = constant_difference(c.limit.get(), c.init.get(), bits, wraps)) return d;
    const OWNED_TREE limit(with_values_of_invariants(copy_tree(c.limit.get()), c.loop));
    const OWNED_TREE init(with_values_of_invariants(copy_tree(c.init.get()), c.loop));
    return constant_difference(limit.get(), init.get(), bits, wraps);
}

// limit - init where that is one number: of the values, not modulo their width.
std::optional<WIDE> known_distance(const COUNTER& c, bool passes_on_entry) {
    if (c.is_pointer || !c.is_unsigned())
        if (auto d = difference_of_ends(c, 64, false)) return d;
    if (!passes_on_entry || (!goes_up(c.op) && !goes_down(c.op))) return std::nullopt;
    auto d = difference_of_ends(c, static_cast<unsigned>(c.type->size), true);
    if (!d || c.type->size > 64) return std::nullopt;
    // The test says on which side the limit lies.
    const WIDE turn = static_cast<WIDE>(1) << c.type->size;
    const WIDE up = (*d % turn + turn) % turn;
    return goes_up(c.op) ? up : up == 0 ? 0 : up - turn;
}

} // namespace

bool read_exact_sum(const NODE* tree, int64_t coefficient, LINEAR_FORM* sum) {
    return DISTANCE_READER(sum, false).read(tree, coefficient) && sum->is_exact;
}

namespace {

// ---- Ends that the program computes

// The value in a type that holds it, signed.
TYPE* wider_type(const TYPE* type) {
    if (type->size < tp->long_t->size) return tp->long_t;
    if (type->size < tp->llong_t->size) return tp->llong_t;
    return nullptr;
}

RANGE values_of(const NODE* t, const struct LOOP* loop) {
    RANGE r{to_wide(int_type_min(tp->llong_t)), to_wide(int_type_max(tp->ullong_t))};
    bounds_of(t, loop, &r);
    return r;
}

NODE* as_count(const NODE* end, TYPE* type) {
    NODE* t = copy_tree(end);
    if (t->type->is_pointer()) t = maketree(PCONV, t, nullptr, tp->long_t);
    return simp_tree(coerce_to_type(type, t), nullptr);
}

// far - near as a number, which is not negative, and the bounds of that; in the variable's type if it holds it, also
// with `more` added.
NODE* distance_tree(const COUNTER& c, bool passes_on_entry, WIDE more, RANGE* range) {
    struct LOOP* loop = const_cast<struct LOOP*>(c.loop);
    const NODE *far = c.step > 0 ? c.limit.get() : c.init.get(), *near = c.step > 0 ? c.init.get() : c.limit.get();
    TYPE* type = c.type;
    // That != passes does not tell on which side the limit lies.
    const bool ordered = passes_on_entry && c.op != NEQ;
    bool fits = c.is_pointer;
    if (c.is_pointer)
        *range = {limits_of(type).low, limits_of(type).high - more};
    else {
        const RANGE a = values_of(far, c.loop), b = values_of(near, c.loop);
        *range = {a.min - b.max, a.max - b.min};
        fits = (ordered || range->min >= limits_of(type).low) && range->max + more <= limits_of(type).high;
    }
    if (!fits) type = wider_type(type);
    if (!type) return nullptr;
    NODE* t = simp_node(maketree(MINUS, as_count(far, type), as_count(near, type), type), loop);
    const RANGE of_tree = values_of(t, c.loop);
    range->min = std::max(range->min, of_tree.min);
    range->max = std::min(range->max, of_tree.max);
    if (ordered) range->min = std::max(range->min, static_cast<WIDE>(is_inclusive(c.op) ? 0 : 1));
    if (passes_on_entry && c.op == NEQ && range->min == 0) range->min = 1;
    return t;
}

NODE* plus(NODE* t, WIDE v, struct LOOP* loop) {
    if (v == 0) return t;
    TYPE* type = t->type->stqs();
    return simp_node(maketree(PLUS, t, mk_ICON(to_int65(v), type), type), loop);
}

// The tree where it is the count, or null.
NODE* symbolic_count(const COUNTER& c, bool passes_on_entry) {
    struct LOOP* loop = const_cast<struct LOOP*>(c.loop);
    if (c.op != NEQ && (c.step > 0 ? !goes_up(c.op) : !goes_down(c.op))) return nullptr;
    const WIDE size = c.step > 0 ? c.step : -c.step, more = (is_inclusive(c.op) ? 1 : 0) + (c.op == NEQ ? 0 : size - 1);
    RANGE range{0, 0};
    OWNED_TREE t(distance_tree(c, passes_on_entry, more, &range));
    if (!t) return nullptr;
    const WIDE least = c.first_test() - (is_inclusive(c.op) ? 1 : 0);
    const bool must_end = !c.loop->has(LOOP_early_exit) && (c.is_pointer || c.type->is_signed()) &&
                          always_comes_to_its_test(c.loop);
    if (range.min < least && !(c.op == NEQ && must_end)) return nullptr;
    if (range.max < least) return nullptr;
    if (c.op == NEQ && !must_end && !(max_ICON_factor(t.get(), loop) % to_int65(size)).is_zero()) return nullptr;
    range.min = std::max(range.min, least);
    if (!t->type->is_pointer() && range.min <= range.max)
        t.reset(simp_tree_in_range(t.release(), to_int65(range.min), to_int65(range.max), INT65(1)));
    t.reset(plus(t.release(), more, loop));
    if (size == 1) return t.release();
    TYPE* type = t->type->stqs();
    if (size > limits_of(type).high) return nullptr;
    NODE* divisor = mk_ICON(to_int65(size), type);
    return simp_node(maketree(DIV, t.release(), divisor, type), loop);
}

// With a step that the program computes.
NODE* count_by_computed_step(struct LOOP* loop) {
    LOOPIV* iv = loop->LCV;
    if (!iv->sym->type->is_int() || iv->sym->type->is_unsigned() || !iv->has(IV_affine) || !iv->init || loop->trips)
        return nullptr;
    if (iv->last->type->size != iv->sym->type->size || loop->test == NEQ || loop->test == EQ || loop->test >= ULE)
        return nullptr;
    for (const NODE* t : {iv->init, iv->last, iv->incrtree})
        if (!expr_is_constant(t) && !tree_is_RC_in_loop(t, loop, false)) return nullptr;
    const int sign = sign_of_integer_expression(iv->incrtree, loop, false);
    TYPE* type = wider_type(iv->sym->type);
    if (sign == 0 || !type || (sign > 0 ? !goes_up(loop->test) : !goes_down(loop->test))) return nullptr;
    if (!first_test_holds(loop)) return nullptr;
    OWNED_TREE init(denormalized_copy(iv->init)), last(denormalized_copy(iv->last));
    const NODE *far = sign > 0 ? last.get() : init.get(), *near = sign > 0 ? init.get() : last.get();
    NODE* diff = simp_node(maketree(MINUS, as_count(far, type), as_count(near, type), type), loop);
    if (is_inclusive(loop->test)) diff = plus(diff, 1, loop);
    auto step = [&] {
        NODE* t = as_count(iv->incrtree, type);
        return sign > 0 ? t : simp_node(maketree(UMINUS, t, nullptr, type), loop);
    };
    diff = simp_node(
        maketree(MINUS, simp_node(maketree(PLUS, diff, step(), type), loop), mk_ICON(INT65(1), type), type), loop);
    return simp_node(maketree(DIV, diff, step(), type), loop);
}

// ---- The count of a loop by its control variable

struct COUNT {
    NODE* tree = nullptr;
    bool wraps = false; // exact, and the variable wraps on its course
};

NODE* count_icon(WIDE n) { return mk_ICON(to_int65(n), wide_enough_int_type(to_int65(n))); }

COUNT count_of_constants(const COUNTER& c) {
    const WIDE init = value_of(c.init.get(), c.type), limit = value_of(c.limit.get(), c.type);
    const auto n = steps_to_exit(init, limit, c.step, c.op, c.first_test());
    if (n && stays_within(init, c.step, *n, c.type)) return {count_icon(*n), false};
    if (!c.is_unsigned() || c.op != NEQ) return {};
    const auto m = modular_steps(limit - init, c.step, static_cast<unsigned>(c.type->size), c.first_test());
    return m ? COUNT{count_icon(*m), true} : COUNT{};
}

COUNT count_of(const COUNTER& c) {
    if (c.init->op == ICON && c.limit->op == ICON && !c.is_pointer) return count_of_constants(c);
    const bool passes_on_entry = first_test_holds(c.loop);
    if (const auto d = known_distance(c, passes_on_entry)) {
        const auto n = steps_to_exit(0, *d, c.step, c.op, c.first_test());
        return n ? COUNT{count_icon(*n), false} : COUNT{};
    }
    if (c.is_unsigned() && c.op == NEQ && c.type->size <= 64)
        if (const auto d = difference_of_ends(c, static_cast<unsigned>(c.type->size), true)) {
            const auto n = modular_steps(*d, c.step, static_cast<unsigned>(c.type->size), c.first_test());
            return n ? COUNT{count_icon(*n), true} : COUNT{};
        }
    return {symbolic_count(c, passes_on_entry), false};
}

} // namespace

// ---- The guard

bool first_test_holds(const struct LOOP* loop) {
    const LOOPIV* iv = loop->LCV;
    if (!iv || !iv->init || !iv->last || loop->is_root()) return false;
    struct LOOP* in = const_cast<struct LOOP*>(loop);
    OWNED_TREE init(denormalized_copy(iv->init)), limit(denormalized_copy(iv->last));
    if (!iv->sym->type->is_pointer() && init->type->is_int())
        init.reset(coerce_to_type(counting_type(iv->sym), init.release()));
    if (init->type->is_pointer() != limit->type->is_pointer() || init->type->size != limit->type->size) return false;
    auto compared = [&](NODE* v) {
        NODE* t = maketree(loop->test, v, copy_tree(limit.get()), tp->int_t);
        if (t->left->op == ICON && t->right->op != ICON && commute_inv[t->op] != ILLOP) {
            t->op = static_cast<uint8_t>(commute_inv[t->op]);
            std::swap(t->left, t->right);
        }
        return OWNED_TREE(t);
    };
    OWNED_TREE entry = compared(copy_tree(init.get())), named = compared(mk_NAME(loop->LCV->sym));
    if (tree_has_side_effects(entry.get())) return false;
    OWNED_TREE simplified(simp_tree(copy_tree(entry.get()), in));
    if (simplified->op == ICON) return !simplified->u.lval.is_zero();
    constexpr int MOST_LEVELS = 8;
    int levels = MOST_LEVELS;
    for (const struct LOOP* l = loop; l && --levels >= 0; l = l->parent) {
        if (l->givens.size() > 64) break;
        for (const NODE* given : l->givens)
            if (pred_implies_pred(given, true, entry.get()) == 1 ||
                pred_implies_pred(given, true, simplified.get()) == 1)
                return true;
    }
    bool holds = false, named_lives = true, entry_lives = true;
    int budget = 200;
    auto is_implied = [&](const NODE* by, bool sense) {
        auto implies = [&](const OWNED_TREE& q) { return pred_implies_pred(by, sense, q.get()) == 1; };
        return !tree_has_side_effects(by) &&
               ((named_lives && implies(named)) || (entry_lives && (implies(entry) || implies(simplified))));
    };
    for_each_block_ahead(loop, [&](const BBLK* bb, const NODE* test, bool sense) {
        if (test && (holds = is_implied(test->left, sense))) return false;
        std::vector<const NODE*> trees;
        for (const LIST* s = bb->statements; s; s = s->rest) trees.push_back(s->first);
        for (size_t i = trees.size(); i > 0; --i) {
            if (--budget < 0) return false;
            const NODE* t = trees[i - 1];
            if (const NODE* fact = asserted_condition(t); fact && (holds = is_implied(fact, true))) return false;
            named_lives = named_lives && !tree_modifies_lvalue_in_tree(t, named.get());
            entry_lives = entry_lives && !tree_modifies_lvalue_in_tree(t, entry.get());
        }
        return named_lives || entry_lives;
    });
    return holds;
}

// ---- Affine variables

namespace {

// Every update of the control variable starts from a value that has passed the test, or from the one on entry.
bool steps_stay_within(const COUNTER& c) {
    const LIMITS l = limits_of(c.type);
    const WIDE size = c.step > 0 ? c.step : -c.step;
    const RANGE init = values_of(c.init.get(), c.loop), limit = values_of(c.limit.get(), c.loop);
    const bool first_fits = c.step > 0 ? init.max + size <= l.high : init.min - size >= l.low;
    const bool tested_first = !c.bottom || first_test_holds(c.loop);
    if (!first_fits && !tested_first) return false;
    const WIDE strict = is_inclusive(c.op) ? 0 : 1;
    if (c.step > 0 && goes_up(c.op)) return limit.max - strict + size <= l.high;
    if (c.step < 0 && goes_down(c.op)) return limit.min + strict - size >= l.low;
    if (c.op != NEQ || size != 1) return false;
    // In steps of one the limit is met, if it lies ahead.
    return c.step > 0 ? init.max + c.first_test() <= limit.min || (tested_first && init.max <= limit.min)
                      : init.min - c.first_test() >= limit.max || (tested_first && init.min >= limit.max);
}

bool constant_course_stays_within(const COUNTER& c) {
    if (c.init->op != ICON || c.limit->op != ICON) return false;
    const WIDE init = value_of(c.init.get(), c.type);
    const auto n = steps_to_exit(init, value_of(c.limit.get(), c.type), c.step, c.op, c.first_test());
    return n && stays_within(init, c.step, *n, c.type);
}

} // namespace

void mark_affine_LCV(struct LOOP* loop) {
    LOOPIV* iv = loop->LCV;
    if (!iv || iv->has(IV_affine)) return;
    const TYPE* type = iv->sym->type;
    const bool may_wrap = type->is_int() && (type->is_unsigned() || type->is_bool()) && unsigned_index_wraps;
    if (!may_wrap && !iv->has(IV_narrowed) && !type->is_volatile()) {
        iv->flags |= IV_affine;
        return;
    }
    const auto c = counter_of(loop);
    if (!c || c->is_pointer || type->is_volatile()) return;
    if (steps_stay_within(*c) || constant_course_stays_within(*c)) iv->flags |= IV_affine;
}

void prove_IV_affine(LOOPIV* iv, const NODE* init, const NODE* last, INT65 incr, const NODE* trips, struct LOOP* loop) {
    const TYPE* own = iv->sym->type;
    if (iv->has(IV_affine) || incr.is_zero() || !own->is_int() || own->is_bool() || own->size > 64) return;
    const SYM_RANGE* widened = find_widened_symbol_entry(iv->sym);
    TYPE* type = widened && widened->type ? widened->type : iv->sym->type->stqs();
    if (!type->is_int() || type->size > own->size || !init) return;
    WIDE most = to_wide(no_trip_bound());
    if (trips && trips->type->is_int()) most = values_of(trips, loop).max;
    if (loop->maxTrips && loop->maxTrips->op == ICON) most = std::min(most, to_wide(loop->maxTrips->u.lval));
    if (most <= 0 || most == to_wide(no_trip_bound())) return;
    // The last, incomplete iteration may still update it.
    if (loop->has(LOOP_early_exit) || !loop->is_bottom_tested()) ++most;
    const WIDE range = (incr.is_negative() ? -to_wide(incr) : to_wide(incr)) * most;
    const LIMITS l = limits_of(type);
    if (range > l.high - l.low) return;
    const RANGE at = values_of(init, loop->parent);
    const bool up = !incr.is_negative();
    bool stays = init->type->is_int() && at.min >= l.low && at.max <= l.high &&
                 (up ? at.max + range <= l.high : at.min - range >= l.low);
    // A value that has wrapped is nearer to the other end.
    if (!stays && last && iv != loop->LCV && last->type->is_int() && own->is_unsigned()) {
        const RANGE end = values_of(last, loop);
        stays = up ? end.min - range >= l.low : end.max + range <= l.high;
    }
    if (stays) iv->flags |= IV_affine;
}

// ---- Interfaces

NODE* loop_trip_count(struct LOOP* loop) {
    if (loop->mustIterate && !loop->has(LOOP_early_exit)) {
        const ITERATE_PROMISE p = promise_of_MUST_ITERATE(loop->mustIterate);
        if (p.min == p.max && p.min > INT65(0)) return mk_ICON(p.min, wide_enough_int_type(p.min));
    }
    LOOPIV* iv = loop->LCV;
    if (!iv) return count_by_trial(loop);
    if (!iv->last || !iv->incrtree) {
        erase_tree(iv->last);
        iv->last = nullptr;
        return nullptr;
    }
    if (iv->incrtree->op != ICON) {
        NODE* t = count_by_computed_step(loop);
        return t ? normalize_tree(t, nullptr) : nullptr;
    }
    const auto c = counter_of(loop);
    if (!c) return nullptr;
    const COUNT count = count_of(*c);
    if (!count.tree) return nullptr;
    const bool is_constant = count.tree->op == ICON;
    if (is_constant && (count.tree->u.lval < INT65(c->first_test()) || count.tree->u.lval > no_trip_bound())) {
        erase_tree(count.tree);
        return nullptr;
    }
    if (!count.wraps) prove_IV_affine(iv, c->init.get(), c->limit.get(), iv->incrtree->u.lval, count.tree, loop);
    if (!iv->has(IV_affine) && !(is_constant && c->is_unsigned() && c->op == NEQ)) {
        erase_tree(count.tree);
        return nullptr;
    }
    return normalize_tree(count.tree, nullptr);
}

namespace {

// Of a loop without a count: it may wrap, or its ends are constants and it never meets the test.
bool is_untrusted(const LOOPIV* iv) {
    if (!iv || !iv->incrtree || iv->incrtree->op != ICON || !iv->init || !iv->last) return false;
    return !iv->has(IV_affine | IV_narrowed) || (iv->init->op == ICON && iv->last->op == ICON);
}

void drop_LCV(struct LOOP* loop) {
    LOOPIV* iv = loop->LCV;
    for (NODE** t : {&iv->init, &iv->last, &iv->incrtree}) {
        erase_tree(*t);
        *t = nullptr;
    }
    iv->flags &= ~(IV_affine | IV_is_LCV | IV_is_ULCV);
    loop->LCV = nullptr;
    loop->test = ILLOP;
}

} // namespace

void calculate_trip_count(struct LOOP* loop) {
    erase_tree(loop->trips);
    loop->trips = nullptr;
    if (!loop->is_root()) {
        loop->trips = loop_trip_count(loop);
        if (!loop->trips && is_untrusted(loop->LCV)) drop_LCV(loop);
    }
    characterize_trip_count(loop);
}

bool count_from_entry(struct LOOP* loop) {
    LOOPIV* iv = loop->LCV;
    if (loop->is_root() || loop->trips || !iv || iv->init || !iv->last || !iv->incrtree || loop->has(LOOP_early_exit))
        return false;
    iv->init = mk_NAME(iv->sym);
    NODE* trips = loop_trip_count(loop);
    if (trips) {
        loop->trips = trips;
        characterize_trip_count(loop);
    }
    erase_tree(iv->init);
    iv->init = nullptr;
    return trips != nullptr;
}

void forget_count_from_entry(struct LOOP* loop) {
    if (loop->trips && loop->trips->op == ICON) return;
    erase_tree(loop->trips);
    loop->trips = nullptr;
}
