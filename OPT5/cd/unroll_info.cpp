#include "OPT5/cd/unroll_info.h"

#include "OPT5/dd/loop.h"
#include "OPT5/dd/unrolling_veto.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/opcodes.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/triples.h"
#include "OPT5/simp/symbolic.h"
#include "OPT5/target/accumulators.h"
#include "OPT5/target/target.h"

#include <algorithm>
#include <cinttypes>
#include <limits>

namespace {

constexpr uint64_t MOST_ORIGINAL_SPACE = 55, MOST_UNROLLED_SPACE = 110;
constexpr int MOST_COPIES = 8, MOST_COMPLETE_COPIES = 32;
// A rest is worth its tests, and the growth, for so many copies.
constexpr int MOST_PEELED_COPIES = 4;
constexpr uint64_t DEAREST_COUNT = 8; // to compute, ahead of the loop
constexpr double TRIGGER = 0.02;
constexpr size_t MOST_BLOCKS = 32, MOST_STATEMENTS = 500; // of a body that is looked at

uint64_t time_of(const NODE* t) {
    uint64_t cost = 0;
    for_each_subtree(t, [&cost](const NODE* n) {
        // An address is of its base and offset; in this form the sum is the access's.
        cost += n->op == UMULT  ? 1 + (n->right != nullptr)
                : n->op == UAND ? 0
                                : static_cast<uint64_t>(weight_of_operator(n));
    });
    return cost;
}

uint64_t space_of(const NODE* t) {
    uint64_t cost = 0;
    for_each_subtree(t, [&cost](const NODE* n) {
        cost += n->op == UMULT ? 1 + (n->right != nullptr) : n->op != UAND && weight_of_operator(n) != 0;
    });
    return cost;
}

INT65 modulo(INT65 v, INT65 m) {
    const INT65 r = v % m;
    return r.is_negative() ? r + m : r;
}

} // namespace

// ---- What can be unrolled

namespace {

const char* why_not(struct LOOP* loop, bool requested) {
    if (loop->is_root() || !loop->head || !loop->preheader || loop_has_subloops(loop)) return "it is no innermost loop";
    if (loop->has(LOOP_has_call | LOOP_deprecated)) return "it has calls: inline them";
    if (!loop->is_bottom_tested() || loop->preheader->successors->rest) return "it is not left from its end";
    const NODE* test = loop->tail->branch();
    if (tree_has_side_effects(test->left) || test->left->op == ENDLOOP) return "its test does more than compare";
    size_t statements = 0;
    if (loop->contents.size() > MOST_BLOCKS) return "it is too large";
    for (const BBLK* bb : loop->contents) {
        if (bb->is_in_LIR_form() || tree_is_EH_SWITCH(bb->branch())) return "it handles exceptions";
        for (const LIST* s = bb->statements; s; s = s->rest) {
            if (++statements > MOST_STATEMENTS) return "it is too large";
            if (s->first->op == NASSERT) continue;
            if (s->first->op == PPRAGMA || !tree_is_OK_for_unrolling(s->first) || op_is_call(s->first->op))
                return "it has statements that are not copied, as calls and divisions";
        }
    }
    if (requested) return nullptr;
    return loop_is_OK_for_unrolling_on_target<ZELKOVA>()(loop) ? nullptr : "the target runs it best as it is";
}

// The multiplier adds a product in each iteration, of a loop that has one sum.
bool is_left_to_multiplier(const struct LOOP* loop) {
    for (const BBLK* bb : loop->contents)
        for (const LIST* s = bb->statements; s; s = s->rest) {
            NODE* t = normalize_zelkova_accumulation(copy_tree(s->first));
            const bool is_one = is_mac(t) || has_a_likely_serial_zelkova_mac(t);
            erase_tree(t);
            if (is_one) return true;
        }
    return false;
}

} // namespace

bool loop_is_OK_for_unrolling(struct LOOP* loop, bool requested, std::string* why) {
    const char* reason = why_not(loop, requested);
    if (!reason && !requested && is_left_to_multiplier(loop))
        reason = "the multiplier adds up one product an iteration";
    if (reason && why) *why = reason;
    return !reason;
}

// ---- The count

void LOOP_UNROLLING_INFO::characterize_loop_before_unrolling() {
    loopNestingLevel = loop->level;
    maximumTripCount = is_icon(loop->maxTrips) ? loop->maxTrips->u.lval : INT65(0);
    if (maximumTripCount >= no_trip_bound()) maximumTripCount = INT65(0);
    minimumTripCount = is_icon(loop->minTrips) ? loop->minTrips->u.lval : INT65(0);
    f = is_icon(loop->tripFactor) && loop->tripFactor->u.lval > INT65(0) ? loop->tripFactor->u.lval : INT65(1);
    x = INT65(0);
    const NODE* trips = loop->trips;
    if (!trips) return;
    if (trips->op == ICON) {
        maximumTripCount = minimumTripCount = x = trips->u.lval;
        f = INT65(0);
        return;
    }
    if (trips->op != PLUS || trips->right->op != ICON) return;
    const INT65 factor = max_ICON_factor(trips->left, loop);
    if (!(factor > f)) return;
    f = factor;
    x = modulo(trips->right->u.lval, f);
    minimumTripCount += modulo(x - minimumTripCount, f);
    if (!maximumTripCount.is_zero()) maximumTripCount -= modulo(maximumTripCount - x, f);
}

void LOOP_UNROLLING_INFO::improve_f_and_x_given_uf() {
    if (!f.is_zero() && !x.is_zero()) x = modulo(x, INT65(static_cast<int64_t>(unrolledFactor)));
}

bool LOOP_UNROLLING_INFO::count_is_exact() const { return loop->trips && !loop->has(LOOP_early_exit); }

bool LOOP_UNROLLING_INFO::is_multiple_of(uint32_t uf) const {
    const INT65 u(static_cast<int64_t>(uf));
    if (is_icon(loop->trips)) return (loop->trips->u.lval % u).is_zero();
    return is_icon(loop->tripFactor) && loop->tripFactor->u.lval >= u && (loop->tripFactor->u.lval % u).is_zero();
}

// ---- Costs

namespace {

// What copies in the loop's place execute more in an iteration, for accesses to elements of objects at indexes that are
// known there: in the loop these are made through pointers that step along, in the copies each takes the address anew;
// but an element of a constant object is a constant.
int64_t cost_of_places(const NODE* t, const UNROLLED_BODY& body, int64_t* pointers) {
    int64_t cost = 0;
    for_each_subtree(t, [&](const NODE* access) {
        if (access->op != UMULT || !access->right) return;
        bool has_object = false, is_constant = access->type->is_scalar(), is_known = true, moves = false;
        for_each_subtree(access, [&](const NODE* n) {
            if (n->op == UAND) {
                has_object = true;
                const NODE* object = without_members(static_cast<const NODE*>(n->left));
                is_constant &= object->op == NAME && lvalue_is_immutable(object);
            } else if (n->op == NAME && !n->type->is_array()) {
                const STEPPED* v = body.step_of(n->u.sym);
                moves |= v != nullptr;
                is_known &= v && v->start_is_known;
            } else if (n != access && n->op == UMULT)
                is_known = false;
        });
        *pointers += moves;
        if (has_object && is_known) cost += is_constant ? -2 : 1;
    });
    return cost;
}

} // namespace

void LOOP_UNROLLING_INFO::characterize_body(const UNROLLED_BODY& body) {
    for (const BBLK* bb : loop->contents) {
        const bool always = body.runs_always(bb);
        uint64_t time = 0;
        int64_t places = 0;
        for (const LIST* s = bb->statements; s; s = s->rest) {
            const NODE* t = s->first;
            if (t->op == NASSERT || (t->op == BRANCH && bb != loop->tail)) continue;
            numberOfIFs += t->op == IF;
            for_each_subtree(t, [this](const NODE* n) {
                if (n->op != QUEST) return;
                ++numberOfIFs;
                predicatedSpaceCost += space_of(n->right);
            });
            time += time_of(t);
            places += cost_of_places(t, body, &entryTimeCost);
            originalSpaceCost += space_of(t);
        }
        originalTimeCost += always ? time : (time + 1) / 2;
        placesTimeCost += always ? places : places / 2;
    }
    testTimeCost = time_of(loop->tail->branch());
    testSpaceCost = space_of(loop->tail->branch());
    for (const STEPPED& v : body.steps()) {
        ++numberOfSSVs;
        stepTimeCost += time_of(v.statement);
        stepSpaceCost += space_of(v.statement);
    }
}

// Of a factor whose tests are known.
void LOOP_UNROLLING_INFO::characterize_unrolled_loop(int uf, int requested, bool is_peeled) {
    unrolledFactor = static_cast<uint32_t>(uf);
    userRequestedUF = static_cast<uint32_t>(requested);
    peeled = is_peeled;
    const uint64_t copies = static_cast<uint64_t>(uf);
    uint64_t tests = 0;
    for (int k = 0; k < uf; ++k) tests += loop_test_is_needed_for_unrolled_iteration(k);
    if (unrolledCompletely) tests = 0;
    const bool is_merged = tests <= 1;
    unrolledTimeCost = copies * originalTimeCost - (copies - tests) * testTimeCost;
    unrolledSpaceCost = copies * originalSpaceCost - (copies - tests) * testSpaceCost;
    if (is_merged) {
        unrolledTimeCost -= (copies - 1) * stepTimeCost;
        unrolledSpaceCost -= (copies - 1) * stepSpaceCost;
    }
    if (unrolledCompletely)
        unrolledTimeCost = static_cast<uint64_t>(
            std::max<int64_t>(1, static_cast<int64_t>(unrolledTimeCost) + (uf - 1) * placesTimeCost - entryTimeCost));
    peeledIterationCount = is_peeled ? unrolledFactor - 1 : 0;
    peeledIterationTimeCost = is_peeled ? originalTimeCost : 0;
    peeledIterationSpaceCost = peeledIterationCount * (originalSpaceCost - testSpaceCost);
}

// ---- Tests

void LOOP_UNROLLING_INFO::characterize_loop_test_intervals() {
    characterize_loop_before_unrolling();
    improve_f_and_x_given_uf();
    const INT65 uf(static_cast<int64_t>(unrolledFactor));
    auto every = [this](INT65 n) {
        terminationTestFactor = static_cast<uint32_t>(n.fits_in<int64_t>());
        firstTerminationTest = terminationTestFactor - 1;
    };
    every(INT65(1));
    if (f > INT65(1) && !(x % f).is_zero()) f = INT65(1);
    if (unrolledCompletely) return every(uf);
    if (is_icon(loop->tripFactor) && loop->tripFactor->u.lval >= INT65(2)) {
        const INT65 t = loop->tripFactor->u.lval;
        if (t >= uf && (t % uf).is_zero()) return every(uf);
        if (uf >= t && (uf % t).is_zero()) return every(t);
    }
    if (f < INT65(2)) {
        if (f.is_zero() && (x % uf).is_zero()) every(uf);
        return;
    }
    if (!(x % uf).is_zero()) return;
    if ((f % uf).is_zero()) return every(uf);
    if ((uf % f).is_zero()) every(f);
}

bool LOOP_UNROLLING_INFO::loop_test_is_needed_for_unrolled_iteration(int copy) const {
    if (copy == static_cast<int>(unrolledFactor) - 1) return true;
    if (peeled) return false;
    if (!loop->LCV || !loop->LCV->has(IV_affine)) return true;
    const uint32_t i = static_cast<uint32_t>(copy);
    return i >= firstTerminationTest && (i - firstTerminationTest) % terminationTestFactor == 0;
}

bool LOOP_UNROLLING_INFO::has_one_test() const {
    for (int k = 0; k + 1 < static_cast<int>(unrolledFactor); ++k)
        if (loop_test_is_needed_for_unrolled_iteration(k)) return false;
    return true;
}

// A division by a power of two becomes a shift.
static uint64_t cost_of_count(const NODE* trips) {
    constexpr uint64_t LESS_THAN_DIVISION = 12;
    const bool is_shift = trips->op == DIV && is_icon(trips->right) && power_of_2(trips->right->u.lval) > 0;
    return time_of(trips) - (is_shift ? LESS_THAN_DIVISION : 0);
}

// What the main loop's test is made of.
static bool rest_can_be_made(const struct LOOP* loop) {
    const LOOPIV* iv = loop->LCV;
    if (!iv || !is_icon(iv->incrtree) || iv->incrtree->u.lval.is_zero() || find_widened_symbol_entry(iv->sym))
        return false;
    if (!iv->has(IV_affine) || loop->test == EQ || loop->test == ILLOP) return false;
    const NODE* trips = loop->trips;
    return trips->type->is_int() && trips->type->size <= 32 && !tree_has_side_effects(trips);
}

bool LOOP_UNROLLING_INFO::peel_excess_loop_iterationsp() const {
    const uint32_t u = unrolledFactor;
    if (unrolledCompletely || !count_is_exact() || !rest_can_be_made(loop)) return false;
    if (is_multiple_of(u)) return false;
    if (u == userRequestedUF) return true;
    const bool may_be_more = maximumTripCount.is_zero() || maximumTripCount > INT65(static_cast<int64_t>(u));
    return may_be_more && cost_of_count(loop->trips) <= DEAREST_COUNT;
}

REST LOOP_UNROLLING_INFO::rest() const {
    REST r;
    const INT65 u(static_cast<int64_t>(unrolledFactor));
    r.trips = loop->trips;
    if (is_icon(loop->trips)) r.count = (loop->trips->u.lval % u).fits_in<int64_t>();
    if (is_icon(loop->tripFactor) && loop->tripFactor->u.lval.fits<int32_t>())
        r.multiple = std::max<int64_t>(1, loop->tripFactor->u.lval.fits_in<int32_t>());
    r.may_be_less = minimumTripCount < u;
    return r;
}

// ---- The factor

namespace {

bool is_power(int64_t n) { return power_of_2(INT65(n)) >= 0; }

} // namespace

// The tests of what is left over cost more than a short loop gains.
int LOOP_UNROLLING_INFO::most_copies_beside_rest() const {
    INT65 most = maximumTripCount.is_zero() ? no_trip_bound() : maximumTripCount;
    if (loop->probIterate) {
        const INT65 likely = get_PPRAGMA_tree_int_arg(loop->probIterate, 1);
        if (likely > INT65(0)) most = std::min(most, likely, [](INT65 a, INT65 b) { return a < b; });
    }
    if (most >= INT65(8 * MOST_COPIES)) return MOST_COPIES;
    return most > INT65(15) ? (most / INT65(8)).fits_in<int32_t>() : 1;
}

bool LOOP_UNROLLING_INFO::select_unrolling_factor(bool completely) {
    unrolledFactor = 1;
    const INT65 amount = loop->unrollAmount >= 2 ? INT65(loop->unrollAmount) : INT65(1);
    int64_t m = MOST_COPIES / std::min<int64_t>(amount.fits_in<int64_t>(), MOST_COPIES + 1);
    const INT65 n = maximumTripCount.is_zero() ? INT65(std::numeric_limits<int64_t>::max()) : maximumTripCount;
    if (n < INT65(2)) return false;
    if (INT65(m) > n / INT65(2) && n > INT65(m)) m = (n / INT65(2)).fits_in<int64_t>();
    std::vector<int> candidates;
    const INT65 coefficient =
        loop->trips ? is_icon(loop->trips) ? loop->trips->u.lval : max_ICON_coef(loop->trips) : INT65(1);
    if (originalSpaceCost <= MOST_ORIGINAL_SPACE)
        for (int64_t u = 2; u <= std::min<int64_t>(m, MOST_COPIES); ++u)
            if (is_power(u) || (coefficient % INT65(u)).is_zero()) candidates.push_back(static_cast<int>(u));
    const bool may_be_complete = n <= INT65(MOST_COMPLETE_COPIES) && minimumTripCount == n && count_is_exact();
    if (may_be_complete && (candidates.empty() || candidates.back() < n.fits_in<int64_t>()))
        candidates.push_back(static_cast<int>(n.fits_in<int64_t>()));

    LOOP_UNROLLING_INFO best = *this;
    float best_z = 1, best_s = 1;
    if (print_debug)
        debug_printf("Trial unrolling: S(1)=%f T(1)=%f Z(1)=%f trigger(1)=%.3f\n", 1.0,
                     static_cast<double>(originalTimeCost), 1.0, TRIGGER);
    for (const int u : candidates) {
        LOOP_UNROLLING_INFO trial = *this;
        trial.unrolledFactor = static_cast<uint32_t>(u);
        trial.unrolledCompletely = may_be_complete && n == INT65(u);
        trial.characterize_loop_test_intervals();
        trial.unrolledTimeCost = originalTimeCost * static_cast<uint64_t>(u);
        trial.unrolledSpaceCost = originalSpaceCost * static_cast<uint64_t>(u);
        const bool p = trial.peel_excess_loop_iterationsp();
        if (p && !is_icon(loop->trips) && u > std::min(MOST_PEELED_COPIES, most_copies_beside_rest())) continue;
        if (p && !loop->trips) break;
        if (p && n < INT65(2 * u)) continue; // the copies would run once
        if (p && !is_icon(loop->trips) && !is_power(u)) continue;
        trial.characterize_unrolled_loop(u, 0, p);
        const float s = static_cast<float>(trial.unrolledSpaceCost + trial.peeledIterationSpaceCost) /
                        static_cast<float>(originalSpaceCost);
        const float z = static_cast<float>(originalTimeCost * static_cast<uint64_t>(u)) /
                        static_cast<float>(std::max<uint64_t>(trial.unrolledTimeCost, 1));
        if (print_debug)
            debug_printf("Trial unrolling: S(%d)=%f T(%d)=%f Z(%d)=%f trigger(%d)=%.3f\n\tufBest = %d   deltaZ=%f "
                         "deltaS=%f  peel@%d?:%s\n\tuf     = %d   deltaZ=%f deltaS=%f\n",
                         u, static_cast<double>(s), u, static_cast<double>(trial.unrolledTimeCost) / u, u,
                         static_cast<double>(z), u, TRIGGER, static_cast<int>(best.unrolledFactor),
                         static_cast<double>(best_z - 1), static_cast<double>(best_s - 1), u, p ? "yes" : "no", u,
                         static_cast<double>(z - best_z), static_cast<double>(s - best_s));
        if (!trial.has_one_test() && !trial.unrolledCompletely) continue;
        const bool gains = z >= best_z && trial.unrolledSpaceCost <= MOST_UNROLLED_SPACE &&
                           (z - best_z >= static_cast<float>(TRIGGER) || best_s >= s);
        const bool is_pair =
            u == 2 && n == INT65(2) && trial.unrolledCompletely && loop->level >= 2 && originalSpaceCost < 78;
        if (!gains && !is_pair) continue;
        best = trial;
        best_z = z;
        best_s = s;
    }
    if (best_z < 1.04f && n > INT65(static_cast<int64_t>(best.unrolledFactor))) return false;
    if (completely && !best.unrolledCompletely) return false;
    *this = best;
    return peeled;
}

// ---- Completely

bool LOOP_UNROLLING_INFO::unrolling_completely_wins() const {
    if (userRequestedUF) return true;
    const double uf = unrolledFactor;
    const double z = static_cast<double>(originalTimeCost) * uf /
                     static_cast<double>(std::max<uint64_t>(unrolledTimeCost, 1)),
                 s = static_cast<double>(unrolledSpaceCost) / static_cast<double>(originalSpaceCost), r = z / s;
    if (print_debug) {
        debug_printf("\tSpeed increase: %.3f\n", z);
        debug_printf("\tSpace increase: %.3f\t(%.3f amortized)\n", s, s / uf);
        debug_printf("\tSpeed / Space:  %.3f\t(%.3f amortized)\n", r, r * uf);
    }
    const int goal = size_speed_goal();
    if (z <= 1.01) return false;
    if (s <= 1.01) return true;
    if (goal < 2 || s > 10.0 || unrolledSpaceCost > MOST_UNROLLED_SPACE || goal < 3) return false;
    if (goal >= 5 && r * uf < 20.0) return false;
    if (loop->head != loop->tail && unrolledFactor > 4) return false;
    if (!is_icon(loop->trips) || unrolledFactor > 8) return false;
    if (unrolledFactor > 4) {
        const NODE* around = loop->parent ? loop->parent->maxTrips : nullptr;
        if (!is_icon(around) || around->u.lval < INT65(256) || around->u.lval >= no_trip_bound()) return false;
    } else if (loop->level >= 2 && originalSpaceCost <= 77) {
        if (print_debug) debug_printf("  OK to unroll %dx completely.\n", static_cast<int>(unrolledFactor));
        return true;
    }
    return false;
}

// ---- Text

namespace {

std::string decimal(INT65 v) { return std::to_string(v.value); }

} // namespace

void LOOP_UNROLLING_INFO::print(const char* title, FILE* out) const {
    auto line = [out](const char* name, const std::string& value) {
        std::fprintf(out, "  %s: %s\n", name, value.c_str());
    };
    auto number = [&line](const char* name, uint64_t value) { line(name, std::to_string(value)); };
    std::fprintf(out, "\nLOOP CHARACTERIZATION FOR UNROLLING (%s)\n", title);
    number("loop", static_cast<uint64_t>(loop->uid));
    number("loopNestingLevel", static_cast<uint64_t>(loopNestingLevel));
    const std::string trips = loop->trips ? tree_to_infix(loop->trips) : "?";
    if (f.is_zero())
        std::fprintf(out, "  trip count:            %s\n", decimal(x).c_str());
    else
        std::fprintf(out, "  trip count:            %s  <=  TC = %s*N+%s  <=  %s\n", decimal(minimumTripCount).c_str(),
                     decimal(f).c_str(), decimal(x).c_str(), decimal(maximumTripCount).c_str());
    number("originalTimeCost", originalTimeCost);
    number("originalSpaceCost", originalSpaceCost);
    number("predicatedSpaceCost", predicatedSpaceCost);
    number("numberOfIFs", numberOfIFs);
    number("numberOfSSVs", numberOfSSVs);
    number("iCachePercentage", iCachePercentage);
    number("firstTerminationTest", firstTerminationTest);
    number("terminationTestFactor", terminationTestFactor);
    number("unrolledTimeCost", unrolledTimeCost);
    number("unrolledSpaceCost", unrolledSpaceCost);
    number("peeledIterationTimeCost", peeledIterationTimeCost);
    number("peeledIterationSpaceCost", peeledIterationSpaceCost);
    number("peeledIterationCount", peeledIterationCount);
    number("unrolledFactor", unrolledFactor);
    number("userRequestedUF", userRequestedUF);
    number("unrolledCompletely", unrolledCompletely);
}
