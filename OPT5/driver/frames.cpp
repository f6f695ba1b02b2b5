// The frames around steps 28 to 60: their first half brings the trees into normal form and, for the steps that need it,
// builds the loop hierarchy; the second half brings the trees back and simplifies them.
#include "OPT5/driver/frames.h"

#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/alias/alias.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"

namespace {

// Until what is known of loops reaches the output again, the hierarchy is built on request.
register_option pass_debug_hierarchy("debug:hierarchy");

bool has_hierarchy() { return currfuninfo->bb_list && currfuninfo->bb_list->loop; }

void normalize_statements() {
    init_dd_aliasing();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) s->first = normalize_tree(s->first, s->first);
    trees_are_normalized = true;
}

void denormalize_statements() {
    trees_are_normalized = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) s->first = simp_tree(denormalize_tree(s->first, false), nullptr);
}

void begin(bool force) {
    if (!has_hierarchy()) simpcfg(0, 0);
    do_dd_for_be = false;
    widen_user_variables();
    split_qualified_parameter_copies();
    normalize_statements();
    if (pass_debug_hierarchy && (force || !has_hierarchy())) build_loop_hierarchy(force, false, force, 1);
}

void end() {
    denormalize_statements();
    widen_user_variables();
    changed(fact::graph);
}

} // namespace

const FRAME D = {[] { begin(false); }, end};
const FRAME D_with_dependence = {[] {
                                     begin(false);
                                     init_dependence_analysis();
                                 },
                                 [] {
                                     wrapup_dependence_analysis(false);
                                     end();
                                 }};
const FRAME DF = {[] { begin(true); }, end};
const FRAME N = {normalize_statements, denormalize_statements};
