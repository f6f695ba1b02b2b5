// Pragmas of loops: what the source, or an earlier step, says of the loop that follows in the text.
//
// While the hierarchy stands they are fields of the loop's record; `reinsert_loop_pragmas` makes them statements of the
// preheader again. MUST_ITERATE is kept in step with what is known of the trip count, in both directions.
//
// Needs: trees of the hierarchy; `minTrips`, `maxTrips` and `tripFactor` for the promises. Leaves: the same.
// Sound because a promise is never made of what is not proved: of a loop that may be left early the minimum and the
// factor are not written, for they are those of the formula; a promise that contradicts itself or what is known is
// dropped. A minimum of 0 is no reason to expect an iteration, however large the multiple is: MUST_ITERATE(0,100,2) of
// a loop over n == 0 elements runs none.

#include "OPT5/dd/loop.h"

#include "IFILE/pragma.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"

#include <algorithm>

INT65 no_trip_bound() { return int_type_max(tp->ullong_t); }

// ---- Arguments

NODE* set_PPRAGMA_tree_info(NODE* tree, int number, const std::vector<std::string>& args) {
    if (!tree) {
        tree = new_node(PPRAGMA, tp->void_t);
        tree->pragma = new PRAGMA;
    }
    tree->pragma->kind = static_cast<uint8_t>(number);
    tree->pragma->args = args;
    return tree;
}

std::string get_PPRAGMA_tree_arg(const NODE* tree, int n) {
    const auto& args = tree->pragma->args;
    return static_cast<size_t>(n) < args.size() ? args[static_cast<size_t>(n)] : "";
}

void set_PPRAGMA_tree_arg(NODE* tree, int n, const std::string& text) {
    auto& args = tree->pragma->args;
    if (static_cast<size_t>(n) >= args.size()) args.resize(static_cast<size_t>(n) + 1);
    args[static_cast<size_t>(n)] = text;
}

// Numbers beyond the largest one stop there.
INT65 get_PPRAGMA_tree_int_arg(const NODE* tree, int n, INT65 absent) {
    const std::string text = get_PPRAGMA_tree_arg(tree, n);
    size_t at = text.find_first_not_of(' ');
    const bool minus = at != std::string::npos && text[at] == '-';
    if (minus) ++at;
    if (at >= text.size() || text[at] < '0' || text[at] > '9') return absent;
    uint64_t v = 0;
    for (; at < text.size() && text[at] >= '0' && text[at] <= '9'; ++at)
        if (__builtin_mul_overflow(v, uint64_t(10), &v) ||
            __builtin_add_overflow(v, static_cast<uint64_t>(text[at] - '0'), &v)) {
            v = ~uint64_t(0);
            break;
        }
    return minus ? -INT65(v) : INT65(v);
}

namespace {

std::string decimal(INT65 v) {
    const bool minus = v.is_negative();
    return (minus ? "-" : "") + std::to_string(minus ? (-v).value : v.value);
}

INT65 max_of(INT65 a, INT65 b) { return a < b ? b : a; }
INT65 min_of(INT65 a, INT65 b) { return a < b ? a : b; }

void set_icon(NODE** field, INT65 value) {
    erase_tree(*field);
    *field = mk_ICON(value, tp->ullong_t);
}

void erase_field(NODE** field) {
    erase_tree(*field);
    *field = nullptr;
}

} // namespace

void set_PPRAGMA_tree_int_arg(NODE* tree, int n, INT65 value) { set_PPRAGMA_tree_arg(tree, n, decimal(value)); }

// ---- Where each kind is kept. In the order of the text: those of the record, then the lists.

namespace {

struct PLACE_OF_PRAGMA {
    int kind;
    NODE* LOOP::*field;
};
constexpr PLACE_OF_PRAGMA FIELDS[] = {
    {PRG_NO_NLC, &LOOP::noNlcPragma},
    {PRG_NO_COALESCE_LOOP, &LOOP::noCoalesceLoopPragma},
    {PRG_COALESCE_LOOP, &LOOP::coalesceLoopPragma},
    {PRG_PARALLEL_LOOP, &LOOP::parallelLoopPragma},
    {PRG_SP_HINDRANCES, &LOOP::spHindrancesPragma},
    {PRG_READ_WRITE, &LOOP::readWritePragma},
    {PRG_UNIT_RESOURCES, &LOOP::unitResourcesPragma},
    {PRG_II_ESTIMATE, &LOOP::iiEstimatePragma},
    {PRG_SP_CONSTRAINT, &LOOP::spConstraintPragma},
    {PRG_LOOP_FLAGS, &LOOP::loopFlagsPragma},
    {PRG_TRIP_CNTR_MUNGED, &LOOP::tripCntrMungedPragma},
    {PRG_NO_ALIAS_CLONE, &LOOP::noAliasClonePragma},
    {PRG_SRC_LOOP, &LOOP::sourceLoopPragma},
    {PRG_UNROLL_AMOUNT, &LOOP::unrollAmountPragma},
    {PRG_UNROLL, &LOOP::unrollPragma},
    {PRG_MUST_ITERATE, &LOOP::mustIterate},
    {PRG_PROB_ITERATE, &LOOP::probIterate},
    {PRG_MMA_LOOP, &LOOP::mmaLoopPragma},
    {PRG_LOOP_NO_ALIAS, &LOOP::loopNoAliasPragma},
};

struct LIST_OF_PRAGMAS {
    int kind;
    std::vector<NODE*> LOOP::*list;
};
constexpr LIST_OF_PRAGMAS LISTS[] = {
    {PRG_NO_ALIAS, &LOOP::noAliasAdvice},
    {PRG_ALIAS_ADVICE, &LOOP::aliasAdvice},
    {PRG_ALIGN_ADVICE, &LOOP::alignAdvice},
    {PRG_INLINE_ADVICE, &LOOP::inlineAdvice},
};

NODE* LOOP::*field_of(int kind) {
    for (const PLACE_OF_PRAGMA& p : FIELDS)
        if (p.kind == kind) return p.field;
    return nullptr;
}

std::vector<NODE*> LOOP::*list_of(int kind) {
    for (const LIST_OF_PRAGMAS& l : LISTS)
        if (l.kind == kind) return l.list;
    return nullptr;
}

} // namespace

bool is_loop_pragma(int number) { return field_of(number) || list_of(number); }

// ---- Numbers of the record and their pragmas

namespace {

struct NUMBERS_OF_PRAGMA {
    int kind;
    std::vector<int32_t LOOP::*> numbers;
};
const NUMBERS_OF_PRAGMA& numbers_of(int kind) {
    static const NUMBERS_OF_PRAGMA table[] = {
        {PRG_SP_CONSTRAINT, {&LOOP::constraint_flags}},
        {PRG_II_ESTIMATE,
         {&LOOP::unPartitionedII, &LOOP::partitionedII, &LOOP::resII, &LOOP::recII, &LOOP::minII, &LOOP::estII}},
        {PRG_UNIT_RESOURCES,
         {&LOOP::LUnits, &LOOP::SUnits, &LOOP::DUnits, &LOOP::MUnits, &LOOP::addUnits, &LOOP::logicalUnits}},
        {PRG_SP_HINDRANCES, {&LOOP::reg_pressure, &LOOP::predicatePressure, &LOOP::live2longs, &LOOP::interruptLimit}},
        {PRG_READ_WRITE, {&LOOP::Xpaths, &LOOP::Tpaths, &LOOP::longReads, &LOOP::longWrites}},
        {-1, {}},
    };
    const NUMBERS_OF_PRAGMA* row = table;
    while (row->kind != kind && row->kind != -1) ++row;
    return *row;
}

void take_numbers(const NODE* tree, struct LOOP* loop) {
    int n = 0;
    for (auto number : numbers_of(tree->pragma->kind).numbers) {
        const INT65 v = get_PPRAGMA_tree_int_arg(tree, n++);
        loop->*number = v.fits<int32_t>() ? v.fits_in<int32_t>() : 0;
    }
    if (loop->constraint_flags == -1) loop->constraint_flags = 0;
}

void set_from_numbers(int kind, struct LOOP* loop) {
    NODE*& field = loop->*field_of(kind);
    if (field) return;
    std::vector<std::string> args;
    for (auto number : numbers_of(kind).numbers)
        args.push_back(decimal(INT65(static_cast<uint32_t>(loop->*number)) & type_mask(tp->uint_t)));
    field = set_PPRAGMA_tree_info(nullptr, kind, args);
}

// What a rebuild of the hierarchy does not find by itself.
constexpr uint32_t WRITTEN_FLAGS = LOOP_unroll_requested | LOOP_conservative | LOOP_deprecated | LOOP_favored |
                                   LOOP_unaliased | LOOP_aligned | LOOP_lower_right | LOOP_lower_left |
                                   LOOP_has_trip_predicate;

} // namespace

void set_PPRAGMA_READ_WRITE(struct LOOP* loop) { set_from_numbers(PRG_READ_WRITE, loop); }
void set_PPRAGMA_SP_HINDRANCES(struct LOOP* loop) { set_from_numbers(PRG_SP_HINDRANCES, loop); }
void set_PPRAGMA_UNIT_RESOURCES(struct LOOP* loop) { set_from_numbers(PRG_UNIT_RESOURCES, loop); }
void set_PPRAGMA_II_ESTIMATE(struct LOOP* loop) { set_from_numbers(PRG_II_ESTIMATE, loop); }
void set_PPRAGMA_CONSTRAINT_FLAGS(struct LOOP* loop) { set_from_numbers(PRG_SP_CONSTRAINT, loop); }

void set_PPRAGMA_LOOP_FLAGS(struct LOOP* loop, unsigned flags) {
    loop->loopFlagsPragma =
        set_PPRAGMA_tree_info(loop->loopFlagsPragma, PRG_LOOP_FLAGS, {std::to_string(flags & WRITTEN_FLAGS)});
}

void set_PPRAGMA_TRIP_CNTR_MUNGED(struct LOOP* loop) {
    if (print_debug) debug_printf("Loop #%d's original trip count is irreparably munged!\n", loop->uid);
    loop->tripCntrMungedPragma = set_PPRAGMA_tree_info(loop->tripCntrMungedPragma, PRG_TRIP_CNTR_MUNGED, {});
}

void printIIpragmas(struct LOOP* l) {
    if (!print_debug || loop_has_subloops(l)) return;
    debug_printf("Loop #%d's constraint flags are %d\n", l->uid, l->constraint_flags);
    debug_printf("Loop #%d's IIPragma values are are %d %d %d %d %d %d\n", l->uid, l->unPartitionedII, l->partitionedII,
                 l->resII, l->recII, l->minII, l->estII);
    debug_printf("Loop #%d's unitResourcePragma values are are %d %d %d %d %d %d\n", l->uid, l->LUnits, l->SUnits,
                 l->DUnits, l->MUnits, l->addUnits, l->logicalUnits);
    debug_printf("Loop #%d's hindrancePragma values are are %d %d %d %d\n", l->uid, l->reg_pressure,
                 l->predicatePressure, l->live2longs, l->interruptLimit);
    debug_printf("Loop #%d's readWritePragma values are are %d %d %d %d\n", l->uid, l->Xpaths, l->Tpaths, l->longReads,
                 l->longWrites);
}

// ---- MUST_ITERATE

namespace {

// Multiples of `m` next to a number that is not negative.
INT65 rounded_down(INT65 v, INT65 m) { return v - v % m; }
// Or what is above every count.
INT65 rounded_up(INT65 v, INT65 m) {
    const INT65 low = rounded_down(v, m);
    return low == v ? v : low > no_trip_bound() - m ? no_trip_bound() : low + m;
}

void write_promise(NODE* pragma, const ITERATE_PROMISE& p) {
    const std::vector<std::string> args = {decimal(p.min), decimal(p.max), decimal(p.multiple)};
    if (pragma->pragma->args == args) return;
    if (print_debug) debug_printf("\nNormalizing %s", stmt2infix(pragma).c_str());
    pragma->pragma->args = args;
    if (print_debug) debug_printf("\nto          %s\n", stmt2infix(pragma).c_str());
}

// Both hold; what contradicts itself says nothing. A multiple that leaves no count between the bounds is dropped.
ITERATE_PROMISE normal_form(ITERATE_PROMISE p) {
    if (p.max < p.min) return {INT65(0), INT65(0), INT65(1)};
    const INT65 low = p.min.is_zero() ? p.min : rounded_up(p.min, p.multiple);
    const INT65 high = p.max == no_trip_bound() ? p.max : rounded_down(p.max, p.multiple);
    if (high < low)
        p.multiple = INT65(1);
    else
        p.min = low, p.max = high;
    return p;
}

ITERATE_PROMISE joined(const ITERATE_PROMISE& a, const ITERATE_PROMISE& b) {
    int overflow = 0;
    INT65 multiple = long_multiply(a.multiple / long_gcd(a.multiple, b.multiple), b.multiple, &overflow);
    if (overflow) multiple = max_of(a.multiple, b.multiple);
    return {max_of(a.min, b.min), min_of(a.max, b.max), multiple};
}

} // namespace

// Of a loop that is left before its tail those iterations are bounded that are executed to their ends. Once its other exits are
// gone it may be left from its tail, where the last one counts, too: the promise stays with it.
static bool may_count_one_more(const struct LOOP* loop, INT65 max) {
    const bool is_of_tail = loop->is_bottom_tested() && is_icon(loop->trips) && loop->trips->u.lval == max;
    return loop->has(LOOP_early_exit) && !is_of_tail && loop->head && loop->head->statements->rest;
}

ITERATE_PROMISE promise_of_MUST_ITERATE(const NODE* pragma) {
    ITERATE_PROMISE p;
    p.min = max_of(get_PPRAGMA_tree_int_arg(pragma, 0), INT65(0));
    p.max = get_PPRAGMA_tree_int_arg(pragma, 1);
    if (p.max <= INT65(0)) p.max = no_trip_bound();
    p.multiple = max_of(get_PPRAGMA_tree_int_arg(pragma, 2), INT65(1));
    return p;
}

void validate_MUST_ITERATE_pragma(NODE* pragma) { write_promise(pragma, normal_form(promise_of_MUST_ITERATE(pragma))); }

// A pragma that would say nothing is not made.
void try_to_make_MUST_ITERATE_pragma(struct LOOP* loop) {
    if (loop->mustIterate || loop->is_root()) return;
    const bool exact = !loop->has(LOOP_early_exit);
    const bool has_min = exact && is_icon(loop->minTrips), has_factor = exact && is_icon(loop->tripFactor);
    INT65 max = is_icon(loop->maxTrips) ? min_of(loop->maxTrips->u.lval, no_trip_bound()) : no_trip_bound();
    if (max <= INT65(0)) max = no_trip_bound(); // that of a loop that has no iteration
    if (max != no_trip_bound() && may_count_one_more(loop, max)) max += INT65(1);
    const bool says_something = (has_min && loop->minTrips->u.lval > INT65(1)) || max != no_trip_bound() ||
                                (has_factor && loop->tripFactor->u.lval > INT65(1));
    if (!says_something) return;
    loop->mustIterate = set_PPRAGMA_tree_info(nullptr, PRG_MUST_ITERATE,
                                              {has_min ? decimal(loop->minTrips->u.lval) : "", decimal(max),
                                               has_factor ? decimal(loop->tripFactor->u.lval) : ""});
}

namespace {

// A fact of the number of iterations, if both sides keep their values in the loop. The tree is consumed.
void add_trip_assertion(int op, NODE* left, NODE* right, struct LOOP* loop) {
    if (tree_is_RC_in_loop(left, loop, false) || expr_is_constant(left))
        add_loop_body_assertion(maketree(op, left, right, tp->int_t), loop);
    else {
        erase_tree(left);
        erase_tree(right);
    }
}

constexpr uint64_t MOST_ASSERTED_TRIPS = 0xffffff;

void assert_promises(const ITERATE_PROMISE& p, struct LOOP* loop) {
    NODE* trips = loop->trips;
    if (!trips || trips->op == ICON || !trips->type->is_int()) return;
    TYPE* type = trips->type->stqs();
    const bool is_unsigned = type->is_unsigned();
    auto fits = [type](INT65 v) { return v <= int_type_max(type); };
    if (p.multiple > INT65(1) && fits(p.multiple))
        add_trip_assertion(EQ, maketree(MOD, copy_tree(trips), mk_ICON(p.multiple, type), type),
                           mk_ICON(INT65(0), type), loop);
    if (p.min > INT65(1) && fits(p.min))
        add_trip_assertion(is_unsigned ? UGE : GE, copy_tree(trips), mk_ICON(p.min, type), loop);
    if (p.max <= INT65(MOST_ASSERTED_TRIPS) && fits(p.max))
        add_trip_assertion(is_unsigned ? ULE : LE, copy_tree(trips), mk_ICON(p.max, type), loop);
}

} // namespace

// The pragma counts the iterations that happen, the record those of the formula: of a loop that may be left early the
// latter are more, and only the maximum of both is one of the former.
void reconcile_MUST_ITERATE_pragma(struct LOOP* loop) {
    if (!loop->mustIterate) return;
    const ITERATE_PROMISE stated = promise_of_MUST_ITERATE(loop->mustIterate);
    auto known = [](const NODE* t, INT65 otherwise) { return is_icon(t) ? t->u.lval : otherwise; };
    const ITERATE_PROMISE proved = {max_of(known(loop->minTrips, INT65(0)), INT65(0)),
                                    known(loop->maxTrips, no_trip_bound()),
                                    max_of(known(loop->tripFactor, INT65(1)), INT65(1))};
    ITERATE_PROMISE both = joined(stated, proved);
    if (loop->has(LOOP_early_exit)) {
        both.min = stated.min;
        both.multiple = stated.multiple;
    }
    both = normal_form(both);
    if (both.max.is_zero()) { // they contradict each other: what is proved stands
        if (loop->has(LOOP_early_exit) || proved.max.is_zero()) {
            erase_field(&loop->mustIterate);
            return;
        }
        both = proved;
    }
    set_icon(&loop->maxTrips, both.max);
    if (both.max < stated.max && may_count_one_more(loop, both.max)) both.max += INT65(1);
    write_promise(loop->mustIterate, both);
    if (loop->has(LOOP_early_exit)) return;
    set_icon(&loop->minTrips, both.min);
    set_icon(&loop->tripFactor, both.multiple);
    assert_promises(both, loop);
}

// ---- PROB_ITERATE

namespace {

// Whether bounds remain.
bool clip_prob_iterate(NODE* pragma, INT65 low, INT65 high) {
    INT65 min = get_PPRAGMA_tree_int_arg(pragma, 0), max = get_PPRAGMA_tree_int_arg(pragma, 1);
    if (max <= INT65(0)) max = no_trip_bound();
    if (min < low) set_PPRAGMA_tree_int_arg(pragma, 0, min = low);
    if (max > high) set_PPRAGMA_tree_int_arg(pragma, 1, max = high);
    return min <= max;
}

} // namespace

void reconcile_PROB_ITERATE_pragma(struct LOOP* loop) {
    if (!loop->probIterate || !loop->mustIterate) return;
    const ITERATE_PROMISE p = promise_of_MUST_ITERATE(loop->mustIterate);
    if (!clip_prob_iterate(loop->probIterate, p.min, p.max)) erase_field(&loop->probIterate);
}

void clip_PROB_ITERATE_pragma(struct LOOP* loop) {
    if (!loop->probIterate || !is_icon(loop->minTrips) || !is_icon(loop->maxTrips)) return;
    const INT65 low = loop->minTrips->u.lval, high = loop->maxTrips->u.lval;
    const bool remains = clip_prob_iterate(loop->probIterate, low, high);
    INT65 max = get_PPRAGMA_tree_int_arg(loop->probIterate, 1);
    if (max <= INT65(0)) max = no_trip_bound();
    if (!remains || (get_PPRAGMA_tree_int_arg(loop->probIterate, 0) <= low && max >= high))
        erase_field(&loop->probIterate);
}

// ---- Intake

namespace {

void take_source_place(const NODE* tree, struct LOOP* loop) {
    const std::string start = get_PPRAGMA_tree_arg(tree, 0);
    const size_t colon = start.rfind(':');
    if (colon != std::string::npos) loop->sourceStart.file = loop->sourceEnd.file = start.substr(0, colon);
    loop->sourceStart.line = std::strtol(start.c_str() + (colon == std::string::npos ? 0 : colon + 1), nullptr, 10);
    loop->sourceEnd.line = std::strtol(get_PPRAGMA_tree_arg(tree, 2).c_str(), nullptr, 10);
}

// What a further pragma of a kind adds to the one that is there.
void merge_pragma(NODE* present, const NODE* further) {
    switch (further->pragma->kind) {
    case PRG_UNROLL:
        if (get_PPRAGMA_tree_int_arg(further, 0) > get_PPRAGMA_tree_int_arg(present, 0))
            set_PPRAGMA_tree_arg(present, 0, get_PPRAGMA_tree_arg(further, 0));
        break;
    case PRG_MUST_ITERATE:
        write_promise(present, normal_form(joined(promise_of_MUST_ITERATE(present), promise_of_MUST_ITERATE(further))));
        break;
    case PRG_PROB_ITERATE: {
        INT65 max = get_PPRAGMA_tree_int_arg(further, 1);
        if (max <= INT65(0)) max = no_trip_bound();
        clip_prob_iterate(present, get_PPRAGMA_tree_int_arg(further, 0), max);
        break;
    }
    default: break; // the nearest stands
    }
}

void take_first(const NODE* tree, struct LOOP* loop) {
    switch (tree->pragma->kind) {
    case PRG_UNROLL: loop->flags |= LOOP_unroll_requested; break;
    case PRG_UNROLL_AMOUNT: {
        const INT65 v = get_PPRAGMA_tree_int_arg(tree, 0);
        if (v > INT65(0) && v.fits<uint16_t>()) loop->unrollAmount = v.fits_in<uint16_t>();
        break;
    }
    case PRG_SRC_LOOP: take_source_place(tree, loop); break;
    default: take_numbers(tree, loop);
    }
}

} // namespace

void take_loop_pragma(NODE* tree, struct LOOP* loop) {
    const int kind = tree->pragma->kind;
    if (auto list = list_of(kind)) {
        (loop->*list).insert((loop->*list).begin(), tree);
        return;
    }
    if (kind == PRG_LOOP_FLAGS) {
        const uint32_t flags = static_cast<uint32_t>(get_PPRAGMA_tree_int_arg(tree, 0).value);
        loop->flags = (loop->flags & ~WRITTEN_FLAGS) | (flags & WRITTEN_FLAGS);
        erase_tree(tree);
        return;
    }
    if (kind == PRG_MUST_ITERATE) validate_MUST_ITERATE_pragma(tree);
    NODE*& field = loop->*field_of(kind);
    if (field) {
        merge_pragma(field, tree);
        erase_tree(tree);
        return;
    }
    field = tree;
    take_first(tree, loop);
}

// ---- Reinsertion

namespace {

void reinsert(struct LOOP* loop) {
    const NODE* end = loop->tail->branch();
    if (end && end->op == IF && expr_is_constant(end->left)) { // no loop any more
        erase_loop_pragmas(loop);
        return;
    }
    try_to_make_MUST_ITERATE_pragma(loop);
    if (loop->flags & WRITTEN_FLAGS) set_PPRAGMA_LOOP_FLAGS(loop, loop->flags);
    // A test that was just copied from the head leaves that as a guard behind the preheader.
    const bool tests_last = end && end->op == IF && is_edge(loop->tail, loop->head);
    if (loop->mustIterate && tests_last && !loop->has(LOOP_early_exit) &&
        get_PPRAGMA_tree_int_arg(loop->mustIterate, 0) <= INT65(0))
        set_PPRAGMA_tree_arg(loop->mustIterate, 0, "1");
    LIST** link = &loop->preheader->statements;
    if (stmt_is_arg_prolog(*link)) link = &(*link)->rest; // which is the first statement of its function
    auto insert = [&](NODE* tree) { link = insert_before(link, tree, (*link)->psn); };
    for (const PLACE_OF_PRAGMA& p : FIELDS)
        if (NODE*& tree = loop->*p.field) {
            insert(tree);
            tree = nullptr;
        }
    for (const LIST_OF_PRAGMAS& l : LISTS) {
        for (NODE* tree : loop->*l.list) insert(tree);
        (loop->*l.list).clear();
    }
}

} // namespace

void reinsert_loop_pragmas(struct LOOP* loop) {
    for (struct LOOP* l : loops_inner_first(loop))
        if (!l->is_root()) reinsert(l);
}

// ---- Copies of the body

void update_pragmas_for_loop(struct LOOP* loop, int factor) {
    const INT65 f = factor;
    loop->unrollAmount = static_cast<uint16_t>(loop->unrollAmount * factor);
    // All counts are multiples of the factor, but perhaps not their bounds; the factor of a count with a rest is none of that of
    // the copies.
    if (is_icon(loop->tripFactor) && !(loop->tripFactor->u.lval % f).is_zero()) erase_field(&loop->tripFactor);
    for (NODE* LOOP::*field : {&LOOP::trips, &LOOP::tripFactor, &LOOP::maxTrips, &LOOP::minTrips})
        if (is_icon(loop->*field))
            set_icon(&(loop->*field), (loop->*field)->u.lval / f);
        else
            erase_field(&(loop->*field));
    if (NODE* p = loop->unrollPragma) {
        const INT65 left = get_PPRAGMA_tree_int_arg(p, 0) / f;
        if (left == INT65(1) && p->pragma->args.size() >= 2) {
            erase_field(&loop->unrollPragma);
            loop->flags &= ~LOOP_unroll_requested;
        } else
            set_PPRAGMA_tree_int_arg(p, 0, left);
    }
    if (NODE* p = loop->mustIterate) {
        const ITERATE_PROMISE old = promise_of_MUST_ITERATE(p);
        set_PPRAGMA_tree_int_arg(p, 0, old.min / f);
        set_PPRAGMA_tree_int_arg(p, 1, old.max == no_trip_bound() ? old.max : old.max / f);
        set_PPRAGMA_tree_int_arg(p, 2, (old.multiple % f).is_zero() ? old.multiple / f : INT65(1));
    }
    if (NODE* p = loop->probIterate)
        for (int n : {0, 1})
            if (!get_PPRAGMA_tree_arg(p, n).empty()) set_PPRAGMA_tree_int_arg(p, n, get_PPRAGMA_tree_int_arg(p, n) / f);
    if (NODE* p = loop->unrollAmountPragma)
        set_PPRAGMA_tree_int_arg(p, 0, get_PPRAGMA_tree_int_arg(p, 0, INT65(1)) * f);
    else
        loop->unrollAmountPragma = set_PPRAGMA_tree_info(nullptr, PRG_UNROLL_AMOUNT, {decimal(f)});
}

void delete_pragmas_for_loop(struct LOOP* loop) {
    for (NODE* LOOP::*field : {&LOOP::sourceLoopPragma, &LOOP::mustIterate, &LOOP::probIterate, &LOOP::unrollPragma,
                               &LOOP::unrollAmountPragma})
        erase_field(&(loop->*field));
    auto is_of_counts = [](int kind) {
        return (kind >= PRG_UNROLL && kind <= PRG_SRC_LOOP) || kind == PRG_TRIP_CNTR_MUNGED || kind == PRG_LOOP_FLAGS ||
               kind == PRG_LOOP_NO_ALIAS;
    };
    for (LIST** link = &loop->preheader->statements; (*link)->rest;)
        if ((*link)->first->op == PPRAGMA && is_of_counts((*link)->first->pragma->kind))
            drop_statement(link);
        else
            link = &(*link)->rest;
}
