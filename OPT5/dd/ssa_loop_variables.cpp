// Induction variables from the data of SSA form, beside those that the hierarchy finds by their updates.
//
// The hierarchy's own search takes variables that are updated in the head or the tail of a loop. The cycles of SSA form
// also show those that are updated anywhere in the body, in copies, or differently on different paths. Their records
// have an increment and a direction, but are not called affine: a reference in the body may stand before or behind the
// update.
#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/dd/ssa_data.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

namespace {

void fill_ssa_init(struct LOOP* loop) {
    for (const auto& iv : loop->IVs) {
        if (iv->init) continue;
        iv->init = find_SSA_sym_init(iv->sym, loop);
        if (iv->init && print_debug)
            debug_printf("~~~#ADD# IV2 (x%05lx):\t%s", static_cast<unsigned long>(iv->flags),
                         tree_to_infix(iv->init).c_str());
    }
}

void add_constraints(const SSADATA* head, LOOPIV* iv) {
    const bool is_long_copy = is_optimizer_temp(iv->sym->name, 'L', 'l');
    for (const NODE* c : head->constraints) {
        if (is_long_copy && c->op == GT && c->right->op == ICON && c->right->u.lval.is_zero()) continue;
        iv->entryGivens.push_back(copy_tree(c));
    }
}

void add_record(const SSADATA* phi, struct LOOP* loop) {
    SSAVAR* v = ssa_variable(phi->node);
    const bool is_linear = phi->ivClass == IVC_AFFINE_LINEAR || phi->ivClass == IVC_PSEUDO_LINEAR;
    if (!is_linear || !phi->recurrence || !v->is_a_simple_IV_candidate() || v->is_memory()) return;
    if (v->tree->type->is_float() || find_LOOPIV_for_IV(v->sym, loop, false)) return;
    if (print_debug) debug_printf("Adding LOOPIV to L<%d> for %s = ", loop->uid, v->sym->name);
    LOOPIV* iv = alloc_LOOPIV(v->sym, loop);
    iv->flags = IV_is_IV;
    iv->incrtree = copy_tree(phi->recurrence);
    iv->init = find_SSA_sym_init(v->sym, loop);
    // A wider sum that is converted wraps where the variable does.
    const bool wraps = v->tree->type->is_unsigned();
    if (phi->is_monotonic_incr() && !wraps) iv->flags |= IV_increases;
    if (phi->is_monotonic_decr() && !wraps) iv->flags |= IV_decreases;
    add_constraints(phi, iv);
    if (print_debug) debug_printf("%s\n", tree_to_infix(iv->incrtree).c_str());
}

void add_records(struct LOOP* loop) {
    std::vector<const SSADATA*> phis;
    for (const LIST* s = loop->head->statements; s && s->first->op == SSA_PHI; s = s->rest) {
        const SSADATA* d = SSADATA_of(s->first);
        if (d && d->is_loop_merging_phi()) phis.push_back(d);
    }
    for (const SSADATA* d : phis) add_record(d, loop);
}

} // namespace

void find_SSA_loop_vars_and_assertions() {
    struct LOOP* root = loop_root();
    find_region_constants(root);
    find_loop_assertions(nullptr);
    find_loop_IVs(root);
    begin_SSA_data_propagation();
    if (function_is_in_SSA_form) {
        add_rdefs_at_function_entry();
        for (struct LOOP* loop : loops_outer_first(root)) {
            if (loop->is_root()) continue;
            add_rdefs_from_loop_preheader(loop);
            fill_ssa_init(loop);
            add_records(loop);
        }
    }
    wrap_up_SSA_data_propagation();
    find_loop_assertions(nullptr);
}
