// Loops are unrolled: by request of the source, completely where they are short, and as far as that pays.
//
//     for (i = 0; i < 32; i++) a[i] = i;        for (i = 0; i < 32; i += 4) { a[i] = i; a[i+1] = i+1; ... }
//
// Needs: the loop hierarchy with its counts, trees in normal form. Leaves: blocks numbered, no hierarchy where a loop
// was unrolled: it is made anew. Sound because of what `UNROLLED_BODY` says, and because a test goes only where the
// count is proved, or promised, to be a multiple of the factor, or what is left over runs behind the copies. What was
// promised of the loop is divided.
#include "OPT5/cd/cd.h"

#include "OPT5/cd/unroll_info.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/remark.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/target/target.h"

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <vector>

namespace {

constexpr int MOST_CONDX_COPIES = 63;
constexpr uint64_t MOST_REQUESTED_SPACE = 4000;

// ---- What the programmer is told

void tell(const char* format, ...) __attribute__((format(printf, 1, 2)));
void tell(const char* format, ...) {
    char text[400];
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(text, sizeof text, format, arguments);
    va_end(arguments);
    if (print_debug) debug_printf("%s", text);
    if (write_opt_info && finfo) info_printf("%s", text);
}

void report_loop(const struct LOOP* loop, const char* how, int factor) {
    const PSN place = place_of_loop(loop);
    if (const NODE* p = loop->sourceLoopPragma)
        tell("Unrolling '%s' loop on '%s' at lines %s-%s%s by factor %d.\n", get_PPRAGMA_tree_arg(p, 3).c_str(),
             get_PPRAGMA_tree_arg(p, 1).c_str(), get_PPRAGMA_tree_arg(p, 0).c_str(), get_PPRAGMA_tree_arg(p, 2).c_str(),
             how, factor);
    else if (place.line)
        tell("Unrolling loop at line %lu%s by factor %d.\n", static_cast<unsigned long>(place.line), how, factor);
    else
        tell("Unrolling loop #%d by factor %d.\n", loop->uid, factor);
}

void report_estimated_speedup(const LOOP_UNROLLING_INFO& info) {
    const auto ratio = [](uint64_t a, uint64_t b) { return static_cast<double>(a) / static_cast<double>(b ? b : 1); };
    const uint64_t space = info.unrolledSpaceCost + info.peeledIterationSpaceCost;
    tell("Estimated speedup: %.2fx, code size increase: %.2fx (%lu:->%lu)\n",
         ratio(info.originalTimeCost * info.unrolledFactor, info.unrolledTimeCost),
         ratio(space, info.originalSpaceCost), static_cast<unsigned long>(info.originalSpaceCost),
         static_cast<unsigned long>(space));
}

void report_total_unrolling_factor(const LOOP_UNROLLING_INFO& info) {
    if (info.loop->unrollAmount > 1)
        tell("Total unrolling factor for this loop: %sx\n",
             std::to_string(info.loop->unrollAmount * info.unrolledFactor).c_str());
}

void report_for_unroll_for_speed(const LOOP_UNROLLING_INFO& info) {
    const int factor = static_cast<int>(info.unrolledFactor);
    report_loop(info.loop, info.unrolledCompletely ? " completely" : "", factor);
    report_estimated_speedup(info);
    report_total_unrolling_factor(info);
    if (print_debug && fdebug) info.print("unrolled", fdebug);
    if (!remarks_are_wanted) return;
    const PSN place = place_of_loop(info.loop);
    std::string text = info.unrolledCompletely
                           ? "its " + std::to_string(factor) + " iterations stand one behind the other"
                           : std::to_string(factor) + " iterations in one";
    if (info.peeledIterationCount) text += ", what is left over behind them";
    remark("unroll", &place, REMARK::DONE, text);
}

void refuse(const struct LOOP* loop, const std::string& why) {
    if (!remarks_are_wanted) return;
    const PSN place = place_of_loop(loop);
    remark("unroll", &place, REMARK::MISSED, "not unrolled as the pragma asks: " + why);
}

// ---- One loop

// The pragma's factor, 0 without one.
int64_t requested_factor(const struct LOOP* loop) {
    if (!loop->unrollPragma) return 0;
    INT65 r = get_PPRAGMA_tree_int_arg(loop->unrollPragma, 0);
    if (is_icon(loop->maxTrips)) r = std::min(r, loop->maxTrips->u.lval, [](INT65 a, INT65 b) { return a < b; });
    return r > INT65(0) && r.fits<int32_t>() ? r.fits_in<int32_t>() : 0;
}

bool may_be_looked_at(const struct LOOP* loop) {
    return !loop->is_root() && !loop->contents.empty() && loop->preheader && !loop_has_subloops(loop);
}

// The records of what the loop counted are of the copies, or of none.
void unroll(LOOP_UNROLLING_INFO& info, bool peeled, UNROLLED_BODY& body) {
    struct LOOP* loop = info.loop;
    const int factor = static_cast<int>(info.unrolledFactor);
    report_for_unroll_for_speed(info);
    if (info.unrolledCompletely) {
        body.unroll_completely(factor);
        delete_pragmas_for_loop(loop);
        return;
    }
    if (!peeled)
        body.unroll(factor);
    else
        body.unroll(factor, info.rest());
    update_pragmas_for_loop(loop, factor);
}

} // namespace

// ---- Completely

bool cd_condx_unroll_loop_completely(struct LOOP* loop) {
    const int64_t requested = requested_factor(loop);
    if (!may_be_looked_at(loop) || loop->has(LOOP_early_exit) ||
        !loop_is_OK_for_unrolling(loop, requested > 0, nullptr))
        return false;
    LOOP_UNROLLING_INFO info(loop);
    info.characterize_loop_before_unrolling();
    const INT65 n = info.maximumTripCount;
    if (n < INT65(2) || n > INT65(MOST_CONDX_COPIES) || info.minimumTripCount != n) return false;
    if (requested > 0 && INT65(requested) < n) return false;
    const int goal = size_speed_goal();
    if (requested == 0) {
        if (goal < 1 || (goal < 2 && n >= INT65(3)) || (goal < 3 && n >= INT65(5)) || loop->unrollAmount > 1)
            return false;
    }
    UNROLLED_BODY body(loop);
    info.characterize_body(body);
    info.unrolledCompletely = true;
    info.characterize_unrolled_loop(n.fits_in<int32_t>(), static_cast<int>(requested), false);
    if (!info.unrolling_completely_wins() || !rewrite_is_allowed(loop->tail->branch())) return false;
    unroll(info, false, body);
    return true;
}

namespace {

std::vector<struct LOOP*> innermost_loops() {
    std::vector<struct LOOP*> loops;
    if (struct LOOP* root = loop_root())
        for (struct LOOP* loop : loops_inner_first(root))
            if (may_be_looked_at(loop)) loops.push_back(loop);
    return loops;
}

bool has_work() {
    return loop_root() && opt_level() >= 2 && !currfuninfo->saves_environment &&
           !currfuninfo->bb_list->is_in_LIR_form();
}

// New symbols get their places, and blocks their numbers.
bool finish(bool any) {
    if (!any) return false;
    sym_split(currfuninfo);
    renumber_bblocks();
    changed(fact::none);
    return true;
}

} // namespace

bool cd_unroll_inner_loops_completely() {
    if (print_debug) debug_printf("\n\t\t ----- ENTERING cd_unroll_inner_loops_completely() -----\n");
    bool any = false;
    if (!has_work()) return false;
    for (struct LOOP* loop : innermost_loops()) any |= cd_condx_unroll_loop_completely(loop);
    return finish(any);
}

// ---- By request

namespace {

// `work` tells whether it unrolled the loop; it may count it by what its variable has on entry.
template <class F>
bool with_count(struct LOOP* loop, F work) {
    const bool is_counted_here = count_from_entry(loop);
    if (work()) return true;
    if (is_counted_here) forget_count_from_entry(loop);
    return false;
}

bool unroll_counted_by_request(struct LOOP* loop, int factor) {
    std::string why;
    if (!loop_is_OK_for_unrolling(loop, true, &why)) {
        refuse(loop, why);
        return false;
    }
    if (cd_condx_unroll_loop_completely(loop)) return true;
    UNROLLED_BODY body(loop);
    LOOP_UNROLLING_INFO info(loop);
    info.characterize_body(body);
    info.unrolledFactor = info.userRequestedUF = static_cast<uint32_t>(factor);
    info.characterize_loop_test_intervals();
    const bool peeled = info.peel_excess_loop_iterationsp();
    info.characterize_unrolled_loop(factor, factor, peeled);
    if (!info.has_one_test()) {
        refuse(loop, "its number of iterations is not known ahead of it");
        return false;
    }
    if (factor > MOST_COPIES_OF_A_BODY ||
        info.unrolledSpaceCost + info.peeledIterationSpaceCost > MOST_REQUESTED_SPACE) {
        refuse(loop, "it is too large for so many copies");
        return false;
    }
    if (!rewrite_is_allowed(loop->tail->branch())) return false;
    unroll(info, peeled, body);
    return true;
}

bool unroll_by_request(struct LOOP* loop, int factor) {
    return with_count(loop, [=] { return unroll_counted_by_request(loop, factor); });
}

} // namespace

bool cd_unroll_loops_by_request() {
    if (print_debug) debug_printf("\n\n\t\t\t------- ENTERING 'cd_unroll_loops_by_request' ------\n");
    if (!has_work()) return false;
    bool any = false;
    for (struct LOOP* loop : innermost_loops())
        if (const int64_t factor = requested_factor(loop); factor > 1)
            any |= unroll_by_request(loop, static_cast<int>(factor));
    return finish(any);
}

// ---- For speed

namespace {

bool unroll_counted_for_speed(struct LOOP* loop, bool completely) {
    std::string why;
    if (!loop_is_OK_for_unrolling(loop, false, &why)) {
        if (print_debug) debug_printf("\tNot unrolling loop #%d: %s\n", loop->uid, why.c_str());
        return false;
    }
    UNROLLED_BODY body(loop);
    LOOP_UNROLLING_INFO info(loop);
    info.characterize_body(body);
    info.characterize_loop_before_unrolling();
    const bool peeled = info.select_unrolling_factor(completely);
    if (info.unrolledFactor < 2 && print_debug) {
        debug_printf("\tNot unrolling loop #%d: no factor pays\n", loop->uid);
        info.print("not unrolled", fdebug);
    }
    if (info.unrolledFactor < 2 || !rewrite_is_allowed(loop->tail->branch())) return false;
    unroll(info, peeled, body);
    return true;
}

bool unroll_for_speed(struct LOOP* loop, bool completely) {
    if (requested_factor(loop) != 0) return false;
    return with_count(loop, [=] { return unroll_counted_for_speed(loop, completely); });
}

} // namespace

bool cd_unroll_loops_for_speed(bool completely) {
    if (!has_work() || size_speed_goal() < 3) return false;
    bool any = false;
    for (struct LOOP* loop : innermost_loops()) any |= unroll_for_speed(loop, completely);
    return finish(any);
}
