// The frames around steps 28 to 60: their first half brings the trees into normal form and, for the steps that need it,
// builds the loop hierarchy; the second half brings the trees back and simplifies them.
#include "OPT5/driver/frames.h"

#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/alias/alias.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/dd/ssa.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"

#include <algorithm>

namespace {

bool has_hierarchy() { return currfuninfo->bb_list && currfuninfo->bb_list->loop; }

// What is still to be done behind the last row: rows with a frame follow each other, and the form that one leaves the
// next begins with.
enum KEPT : uint8_t { NOTHING, FORM, CHANGED_FORM } kept = NOTHING;

void enter_form() {
    if (kept != NOTHING) return;
    normalize_all_trees();
    changed(fact::graph | fact::alias_marks);
}

void enter_SSA() {
    if (function_is_in_SSA_form) return;
    if (pass_debug_bare_SSA)
        enter_and_leave_SSA_form(false, false, true);
    else
        construct_SSA_form(false, false, true);
}

void begin(bool force) {
    if (kept == NOTHING) {
        if (!has_hierarchy()) simpcfg(0, 0);
        do_dd_for_be = false;
        widen_user_variables();
        split_qualified_parameter_copies();
    }
    enter_form();
    if (force || !has_hierarchy()) build_loop_hierarchy(force, false, force, 1);
}

// SSA form that a row without the normal form left is built anew in it.
bool is_in_SSA_and_normal_form() {
    if (kept == NOTHING) leave_kept_SSA_form();
    return function_is_in_SSA_form;
}

// Neither the form nor simplifying takes an address of an object.
void end() { kept = std::max(kept, FORM); }
void end_of_changes() { kept = CHANGED_FORM; }

} // namespace

register_option pass_debug_bare_SSA("debug:bare_SSA");

void leave_kept_SSA_form() { deconstruct_SSA_form(); }

void leave_kept_form() {
    leave_kept_SSA_form();
    if (kept == NOTHING) return;
    if (kept == CHANGED_FORM)
        denormalize_all_trees(false, true);
    else
        denormalize_unchanged_trees();
    kept = NOTHING;
    widen_user_variables();
    changed(fact::graph | fact::alias_marks);
}

bool has_loops() {
    if (has_hierarchy()) return true;
    need(fact::block_numbers);
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const EDGE* e = bb->predecessors; e; e = e->rest)
            if (e->first->dfn >= bb->dfn) return true;
    return false;
}

void drop_hierarchy() {
    drop_affine_marks();
    forget_hierarchy();
}

void forget_hierarchy() {
    if (!has_hierarchy()) return;
    reinsert_loop_pragmas(currfuninfo->bb_list->loop);
    erase_loop_hierarchy();
    rebuildcfg();
    simpcfg(0, 0);
}

const FRAME D = {[] { begin(false); }, end};
const FRAME D_with_dependence = {[] {
                                     begin(false);
                                     if (has_hierarchy()) init_dependence_analysis();
                                 },
                                 [] {
                                     wrapup_dependence_analysis(false);
                                     end();
                                 }};
const FRAME DF = {[] { begin(true); }, end_of_changes};
const FRAME D_where_loops_are = {[] {
                                     if (L2() && has_loops()) begin(false);
                                 },
                                 [] {
                                     if (trees_are_normalized) end();
                                 }};
const FRAME N = {enter_form, end};
const FRAME S = {enter_SSA, [] {}, true};
const FRAME D_and_S = {[] {
                           if (!is_in_SSA_and_normal_form()) begin(false);
                           enter_SSA();
                       },
                       end, true};
const FRAME N_and_S = {[] {
                           if (!is_in_SSA_and_normal_form()) enter_form();
                           enter_SSA();
                       },
                       end, true};
const FRAME N_and_no_hierarchy = {[] {
                                      if (has_hierarchy()) enter_form();
                                  },
                                  [] {
                                      if (trees_are_normalized) end();
                                      leave_kept_form();
                                      drop_hierarchy();
                                      simpcfg(0, 0);
                                  }};
