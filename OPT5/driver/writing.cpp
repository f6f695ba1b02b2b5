// The last step of every function: what is done for the code generator, then writing.
//
// The rows take back what only the optimizer wants (operators in place of built-ins, scaled subscripts spelled out) and
// settle what the output states of the function as it stands (registers, layout, exception table). The order is part of
// their contract: no row behind "unsimplify" simplifies. Between the two rows for increments, pointers are stepped by
// statements: what removes dead ones, and the analysis of loops, reads those.
#include "OPT5/driver/driver.h"
#include "OPT5/driver/frames.h"
#include "OPT5/driver/pipeline.h"

#include "OPT5/cd/vectors.h"
#include "OPT5/dd/dd.h"
#include "OPT5/io/write.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/profile.h"
#include "OPT5/mvp/mvp.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/fcp.h"
#include "OPT5/scalar/increments.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/target/target.h"

namespace {

// A function that was folded into all its callers leaves no records.
bool is_written() { return !TEST_FLAG(currfuninfo, FUN_is_suppressed); }

constexpr ROW::KIND F = ROW::FUNCTION, FIXED = ROW::FIXED, IDLE = ROW::IDLE;
using fact::alias_marks;
using fact::graph;
using fact::live_variables;
using fact::none;

// clang-format off
const ROW rows[] = {
    // kind, name, frame, condition, action, needs, leaves
    {FIXED, "drop unused locals",     nullptr, always, drop_unused_locals, none, graph},
    {F,     "combine assignments",    nullptr, always, combine_asgs_to_memory, none, graph},
    {F,     "switch cases",           nullptr, always, optimize_SWITCH_cases, none, graph},
    {FIXED, "register definitions",   nullptr, always, [] { init_reg_defs(); }, none, graph},
    {F,     "lower addresses",        nullptr, always, lower_addresses, none, graph},
    {F,     "assignments into tests", nullptr, always, propagate_assignments_into_tests, live_variables, graph | alias_marks | live_variables},
    {F,     "allocate registers",     nullptr, always, allocate_regs, none, graph | alias_marks | live_variables},
    {F,     "spell out increments",   nullptr, always, spell_out_increments, alias_marks, graph | alias_marks | live_variables},
    {F,     "last dead assignments",  nullptr, always, [] { elim_dead_assigns(0, 0); }, live_variables, graph | alias_marks},
    {F,     "clear bits at once",     nullptr, is_written, fold_ANDBASGs, none, graph | alias_marks},
    {F,     "dependence for output",  nullptr, is_written, do_dd_analysis_for_be, none, graph | alias_marks},
    {F,     "last simpcfg",           nullptr, is_written, [] { simpcfg(1, 0); }, none, graph | alias_marks},
    {F,     "rotate loops",           nullptr, is_written, rotate_loops, none, graph | alias_marks},
    {F,     "straighten traces",      nullptr, is_written, straighten_traces_in_cfg, none, graph | alias_marks},
    {F,     "increments again",       nullptr, is_written, propagate_increments_again, alias_marks, graph},
    {IDLE,  "last disclose vectors",  nullptr, is_written, [] { disclose_vector_operations(false); }, none, none},
    {F,     "unsimplify",             nullptr, is_written, unsimplify, none, graph},
    {IDLE,  "last disguise vectors",  nullptr, is_written, disguise_vector_operations, none, none},
    {FIXED, "machine state",          nullptr, is_written, strip_implicit_states, none, graph},
    {IDLE,  "vectors for output",     nullptr, is_written, [] { disclose_vector_operations(false); }, none, none},
    {FIXED, "prune exception table",  nullptr, is_written, prune_exception_table, none, graph},
    {F,     "profile",                nullptr, is_written, [] { initialize_CFG_profiling_annotation(true, true); }, none, graph},
    {F,     "loops for output",       nullptr, is_written, settle_loop_records, none, graph},
    {IDLE,  "dependence edges",       nullptr, is_written, finalize_dd_edges, none, none},
};
// clang-format on

} // namespace

ROWS rows_ahead_of_output() { return rows; }

// One that is suppressed and still in work, as in an order of steps that lacks the one that takes it out, keeps its body: a
// call that is written later may bring it back.
void output_function() {
    if (is_written()) {
        drop_hierarchy(); // of an order of steps that lacks the one behind which it is gone
        run_rows_ahead_of_output();
        write_function();
        erase_all();
    }
    currfuninfo = nullptr;
    currfunc = nullptr;
    restore_global_flags();
}
