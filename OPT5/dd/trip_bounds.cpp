// What is known of a trip count that is no constant: its bounds and a factor.
//
// The count is read as T(N) = (u*N + v) / w, with one term N that varies between entries; what facts of the loop, and
// assertions and tests ahead of it, say of N is taken through that. A bound of the count is also how many different
// values the control variable has.
//
// Needs: `trips`, facts, the control variable. Leaves: `minTrips`, `maxTrips`, `tripFactor`; MUST_ITERATE and
// PROB_ITERATE in step with them; `trips` as a constant where the bounds meet.
// Sound because a test or an assertion ahead of the loop counts only if every path from it to the loop leaves N alone:
// in `_nassert(n % 4 == 0); if (c) n++; for (i = 0; i < n; i++)` the arm is on no straight line, and still between the
// two. A test counts only where the line comes through one side of it. Of a loop that may be left early the count is an
// upper bound alone.

#include "OPT5/dd/trip.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/dd.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/givens.h"
#include "OPT5/simp/simp.h"

#include <algorithm>

namespace {

const WIDE UNBOUNDED = (static_cast<WIDE>(1) << 64) - 1;

const NODE* without_conversions(const NODE* t) {
    while (keeps_values(t)) t = t->left;
    return t;
}

// ---- T(N)

struct TRIP_FORM {
    const NODE* term = nullptr; // N
    WIDE u = 1, v = 0, w = 1;

    // Of a dividend that is not negative the quotient is rounded down.
    WIDE at(WIDE n) const {
        const WIDE sum = u * n + v;
        return sum < 0 ? 0 : sum / w;
    }
};

bool is_small(WIDE v) { return v < (static_cast<WIDE>(1) << 48) && v > -(static_cast<WIDE>(1) << 48); }

// One operator below what was read so far; false where it is the term.
bool peel(TRIP_FORM* f, bool* converted) {
    const NODE* t = f->term;
    auto constant = [](const NODE* c) { return c->op == ICON ? to_wide(c->u.lval) : 0; };
    const bool untouched = f->u == 1 && f->v == 0;
    if (keeps_values(t)) {
        *converted = true;
        f->term = t->left;
        return true;
    }
    if (t->type->is_unsigned() && *converted) return false; // it may wrap at another width
    switch (t->op) {
    case DIV:
    case SRL: {
        const WIDE c = constant(t->right);
        if (!untouched || c <= 0 || !is_small(c) || (t->op == SRL && c > 40)) return false;
        f->w *= t->op == DIV ? c : static_cast<WIDE>(1) << c;
        f->term = t->left;
        break;
    }
    case PLUS:
        if (t->right->op != ICON) return false;
        f->v += f->u * constant(t->right);
        f->term = t->left;
        break;
    case MINUS:
        if (t->right->op == ICON) {
            f->v -= f->u * constant(t->right);
            f->term = t->left;
        } else if (t->left->op == ICON) {
            f->v += f->u * constant(t->left);
            f->u = -f->u;
            f->term = t->right;
        } else
            return false;
        break;
    case MULT:
        if (t->right->op != ICON) return false;
        f->u *= constant(t->right);
        f->term = t->left;
        break;
    case UMINUS:
        f->u = -f->u;
        f->term = t->left;
        break;
    default: return false;
    }
    return true;
}

// Whether the tree has this form for every value of the term; the term is a part of the tree.
bool read_form(const NODE* trips, struct LOOP* loop, TRIP_FORM* form, RANGE* term) {
    if (!trips->type->is_int()) return false;
    form->term = trips;
    bool converted = false;
    while (peel(form, &converted))
        if (!is_small(form->u) || !is_small(form->v) || !is_small(form->w) || form->u == 0) return false;
    if (!form->term->type->is_int() || !bounds_of(form->term, loop, term)) return false;
    if (!trips->type->is_unsigned()) return true;
    // Sums of numbers without a sign wrap.
    const WIDE a = form->u * term->min + form->v, b = form->u * term->max + form->v;
    return form->u >= 0 && form->v >= 0 && std::max(a, b) <= to_wide(type_mask(trips->type)) && std::min(a, b) >= 0;
}

void divide_by_gcd(TRIP_FORM* f, const NODE* term) {
    const WIDE g = gcd_of(gcd_of(f->u, f->v), f->w);
    if (print_debug) {
        auto text = [](WIDE v, int slot) { return int2text(to_int65(v), tp->long_t, 10, slot); };
        const std::string n = tree_to_infix(term), u = text(f->u, 0), v = text(f->v, 1), w = text(f->w, 2);
        if (g > 1)
            debug_printf("\tN == %s   u=%s, v=%s, w=%s, gcd=%s\n", n.c_str(), u.c_str(), v.c_str(), w.c_str(),
                         text(g, 3));
        else
            debug_printf("\tN == %s   u=%s, v=%s, w=%s\n", n.c_str(), u.c_str(), v.c_str(), w.c_str());
    }
    f->u /= g;
    f->v /= g;
    f->w /= g;
}

// ---- What is known of N

class TERM_FACTS {
public:
    TERM_FACTS(const TRIP_FORM& f, const RANGE& b) : form(f), range(b) {}

    // The condition, or its opposite, holds on entry to the loop.
    void take(const NODE* condition, bool holds) {
        visit_given(condition, holds, MOST_FACT_LEVELS,
                    [this](const NODE* t, bool is_true) { take_simple(t, is_true); });
    }

    const RANGE& bounds() const { return range; }
    WIDE factor() const { return known_factor; }

private:
    // N + k of a tree, which is a number; false for another.
    bool is_term(const NODE* t, WIDE* k) const {
        *k = 0;
        t = without_conversions(t);
        if ((t->op == PLUS || t->op == MINUS) && t->right->op == ICON && is_exact_by_rule(t->op, t->type) &&
            !trees_are_congruent(t, form.term, false)) {
            *k = t->op == PLUS ? to_wide(t->right->u.lval) : -to_wide(t->right->u.lval);
            t = without_conversions(t->left);
        }
        return trees_are_congruent(t, form.term, false);
    }

    void take_simple(const NODE* t, bool holds) {
        if (!op_is_int_compare(t->op)) {
            if (!holds && t->type->is_int()) take_zero(t);
            return;
        }
        int op = holds ? t->op : boolean_inv[t->op];
        const NODE *left = t->left, *right = t->right;
        if (left->op == ICON) {
            std::swap(left, right);
            op = commute_inv[op];
        }
        if (right->op != ICON || !left->type->is_int() || left->type->is_bool()) return;
        const WIDE c = to_wide(truncate_to_type(right->u.lval, left->type->stqs()));
        if (op == EQ && c == 0) take_zero(left);
        if (op != EQ && op != NEQ && (op >= ULE) != left->type->is_unsigned()) return;
        WIDE k;
        if (is_term(left, &k)) range = narrowed(range, op, {c - k, c - k});
    }

    // x % m and x & (2^k - 1) are zero.
    void take_zero(const NODE* t) {
        if ((t->op != MOD && t->op != ANDB) || t->right->op != ICON) return;
        INT65 m = t->right->u.lval;
        if (t->op == ANDB) {
            m += INT65(1);
            if (power_of_2(m) < 1) return;
        }
        WIDE k;
        if (m < INT65(2) || !is_small(to_wide(m)) || !is_term(t->left, &k)) return;
        // N is m*q + r: T is (u*m/w) * q + (u*r + v) / w where w divides u*m.
        const WIDE modulus = to_wide(m), r = ((-k) % modulus + modulus) % modulus;
        if ((form.u * modulus) % form.w != 0) return;
        WIDE rest = form.u * r + form.v;
        rest = rest >= 0 ? rest / form.w : -((-rest + form.w - 1) / form.w);
        const WIDE f = gcd_of(form.u * modulus / form.w, rest);
        if (print_debug)
            debug_printf("\t%d == divisibility of %s by %s\n\n", f > 1, tree_to_infix(t->left).c_str(),
                         int2text(m, tp->long_t, 10, 0));
        const WIDE both = known_factor / gcd_of(known_factor, f) * f;
        if (is_small(both)) known_factor = both;
    }

    const TRIP_FORM& form;
    RANGE range;
    WIDE known_factor = 1;
};

// ---- Where facts are looked for

constexpr int MOST_BLOCKS = 64, MOST_STATEMENTS = 400;

// Back over the blocks that dominate the preheader, for as long as nothing changes the term.
class DOMINATOR_WALK {
public:
    DOMINATOR_WALK(const NODE* t, TERM_FACTS* f) : term(t), facts(f) {}

    void from(BBLK* bb) {
        while (bb && take_assertions(bb)) bb = before(bb);
    }

private:
    bool changes_term(const NODE* t) { return --statements < 0 || tree_modifies_lvalue_in_tree(t, term); }

    bool take_assertions(const BBLK* bb) {
        std::vector<const NODE*> trees;
        for (const LIST* s = bb->statements; s; s = s->rest) trees.push_back(s->first);
        for (size_t i = trees.size(); i > 0; --i) {
            if (const NODE* condition = asserted_condition(trees[i - 1])) facts->take(condition, true);
            if (changes_term(trees[i - 1])) return false;
        }
        return true;
    }

    BBLK* before(BBLK* bb) {
        if (--blocks < 0 || !bb->predecessors) return nullptr;
        if (bb->predecessors->rest || bb->predecessors->first->dfn >= bb->dfn) return over_paths(bb);
        BBLK* pred = bb->predecessors->first;
        const NODE* test = pred->branch();
        if (test && test->op == IF && test->left->op != ENDLOOP && !tree_has_side_effects(test->left)) {
            const bool on_true = test->right->left->lbl->bblock == bb;
            if (on_true != (test->right->right->lbl->bblock == bb)) facts->take(test->left, on_true);
        }
        return pred;
    }

    // The immediate dominator, if no block on a path from it changes the term.
    BBLK* over_paths(BBLK* bb) {
        if (!is_known(fact::dominators)) return nullptr;
        BBLK* top = currfuninfo->dominators->immediate_dominator(bb);
        if (!top) return nullptr;
        BLOCK_SET seen;
        seen.add(top);
        std::vector<const BBLK*> work;
        auto reach = [&](const BBLK* b) {
            for (const EDGE* e = b->predecessors; e; e = e->rest)
                if (seen.add(e->first)) work.push_back(e->first);
        };
        reach(bb);
        while (!work.empty()) {
            const BBLK* b = work.back();
            work.pop_back();
            if (--blocks < 0) return nullptr;
            for (const LIST* s = b->statements; s; s = s->rest)
                if (changes_term(s->first)) return nullptr;
            reach(b);
        }
        return top;
    }

    const NODE* term;
    TERM_FACTS* facts;
    int blocks = MOST_BLOCKS, statements = MOST_STATEMENTS;
};

// ---- The count

struct KNOWN_TRIPS {
    WIDE factor = 1, min = 0, max = UNBOUNDED;

    void bound(WIDE low, WIDE high) {
        low = std::max(min, low);
        high = std::min(max, high);
        if (low > high) return; // they contradict each other: what was known stands
        min = low;
        max = high;
    }
    void keep_multiples() {
        if (factor <= 1) return;
        const WIDE low = (min + factor - 1) / factor * factor, high = max == UNBOUNDED ? max : max / factor * factor;
        if (low <= high) min = low, max = high;
    }
};

// The control variable starts each iteration with another value; one that wraps has taken all of them.
void bound_by_variable(struct LOOP* loop, KNOWN_TRIPS* known) {
    const LOOPIV* iv = loop->LCV;
    if (!iv || !iv->incrtree || iv->incrtree->op != ICON || iv->incrtree->u.lval.is_zero()) return;
    TYPE* type = iv->sym->type->stqs();
    WIDE range = to_wide(type_mask(type)),
         step = to_wide(sign_extend_by_type_size(iv->incrtree->u.lval, iv->incrtree->type));
    if (!iv->has(IV_affine)) {
        // Only the test can end it, and does so within one turn or never.
        if (type->size < 64 && type->is_int() && !loop->has(LOOP_early_exit)) known->bound(0, range + 1);
        return;
    }
    if (type->is_int()) {
        NODE* name = mk_NAME(iv->sym);
        RANGE b{0, range};
        if (bounds_of(name, loop, &b)) range = b.max - b.min;
        erase_tree(name);
    }
    known->bound(0, range / (step < 0 ? -step : step) + 1);
}

void refine_by_facts(const NODE* trips, struct LOOP* loop, KNOWN_TRIPS* known) {
    if (print_debug) {
        debug_printf("\n    Trip count characterization for loop %d", loop->uid);
        debug_printf("\n\tT(N) == %s\n", tree_to_infix(trips).c_str());
    }
    TRIP_FORM form;
    RANGE term;
    if (!read_form(trips, loop, &form, &term)) return;
    divide_by_gcd(&form, form.term);
    TERM_FACTS facts(form, term);
    for (int n = 0; n < 2; ++n) // what is not equal counts at an end that another fact gives
        for_each_given(loop, [&](const NODE* condition, bool holds) { facts.take(condition, holds); });
    DOMINATOR_WALK(form.term, &facts).from(loop->preheader);
    const RANGE& n = facts.bounds();
    const WIDE a = form.at(n.min), b = form.at(n.max);
    known->bound(std::min(a, b), std::max(a, b));
    const WIDE both = known->factor / gcd_of(known->factor, facts.factor()) * facts.factor();
    if (both <= UNBOUNDED) known->factor = both;
}

void set_icon(NODE** field, WIDE value) {
    erase_tree(*field);
    *field = mk_ICON(to_int65(value), tp->ullong_t);
}

KNOWN_TRIPS known_of_tree(struct LOOP* loop) {
    KNOWN_TRIPS known;
    NODE* trips = loop->trips ? denormalized_copy(loop->trips) : nullptr;
    if (trips) {
        RANGE b;
        if (bounds_of(trips, loop, &b)) known.bound(b.min, b.max);
        known.factor = std::max(to_wide(max_ICON_factor(trips, loop, true)), static_cast<WIDE>(1));
    }
    if (loop->is_bottom_tested()) known.bound(1, UNBOUNDED);
    bound_by_variable(loop, &known);
    known.keep_multiples();
    if (trips && !tree_has_side_effects(trips)) refine_by_facts(trips, loop, &known);
    known.keep_multiples();
    erase_tree(trips);
    return known;
}

} // namespace

void characterize_trip_count(struct LOOP* loop) {
    KNOWN_TRIPS known;
    if (loop->trips && loop->trips->op == ICON) {
        known.min = known.max = to_wide(loop->trips->u.lval);
        known.factor = std::max(known.min, static_cast<WIDE>(1));
    } else if (!loop->is_root())
        known = known_of_tree(loop);
    if (loop->has(LOOP_early_exit)) {
        known.min = 0;
        known.factor = 1;
    }
    set_icon(&loop->minTrips, known.min);
    set_icon(&loop->maxTrips, known.max);
    set_icon(&loop->tripFactor, known.factor);
    reconcile_MUST_ITERATE_pragma(loop);
    if (loop->minTrips->u.lval == loop->maxTrips->u.lval && !loop->has(LOOP_early_exit) &&
        !(loop->trips && loop->trips->op == ICON)) {
        erase_tree(loop->trips);
        loop->trips = mk_ICON(loop->minTrips->u.lval, wide_enough_int_type(loop->minTrips->u.lval));
        set_icon(&loop->tripFactor, std::max(to_wide(loop->minTrips->u.lval), static_cast<WIDE>(1)));
    }
    clip_PROB_ITERATE_pragma(loop);
}
