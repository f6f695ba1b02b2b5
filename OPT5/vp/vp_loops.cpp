// What value sets and the loop hierarchy tell each other.
//
// The hierarchy knows how its induction variables run, from accesses of arrays too, which no test shows. The sets know what
// does not change in a loop: that becomes assertions, and the counts of iterations are bounded by it.
//
// Needs: the hierarchy with its variables, facts and trip counts. Leaves: it, with more facts.
// Sound because a record's bounds hold at every point of its loop. An assertion is made of the set at a loop's head and of
// a variable that the loop does not change; a loop further out is told instead where its own head has the same set: what a
// test between the two tells is not known there.
#include "OPT5/vp/vp.h"

#include "OPT5/dd/loop.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"

bool find_vpset_in_LOOPIV(vpset* out, const SYMTAB* sym, const struct LOOP* loop, bool at_head) {
    const LOOPIV* iv = loop && !loop->is_root() ? find_LOOPIV_for_IV(sym, loop, false) : nullptr;
    if (!iv || !iv->has(IV_affine) || !has_value_range(sym->type) || sym->type->is_enum() || sym->type->is_bool()) return false;
    const RANGE limits = range_of_type(sym->type);
    const WIDE low = std::max(to_wide(iv->lowval), limits.min), high = std::min(to_wide(iv->highval), limits.max);
    if (low > high) return false;
    VPSLICE grid{low, high, 1};
    // Between two updates it is off the grid.
    if (at_head && iv->init && iv->init->op == ICON && iv->incrtree && iv->incrtree->op == ICON) {
        const WIDE by = to_wide(sign_extend_by_type_size(iv->incrtree->u.lval, iv->incrtree->type)),
                   step = by < 0 ? -by : by, from = to_wide(truncate_to_type(iv->init->u.lval, sym->type));
        if (step > 0) grid = {from, from + step, step};
    }
    *out = vpset(low == high ? single_slice(low) : slice_between(low, high, grid));
    return !vpset_is_empty(*out) && !vpset_is_bottom(*out, sym->type);
}

int insert_vpset_binding_in_loop(const vpset& set, SYMTAB* sym, struct LOOP* loop) {
    auto holds_at_head = [&](const struct LOOP* l) {
        const vpenv* env = bb_vpenv(l->head, false);
        const vpset* known = env ? vpenv_store->find(*env, vpenv_store->number_of(sym)) : nullptr;
        return known && vpset_is_subset(*known, set);
    };
    while (!loop->parent->is_root() && sym_is_RC_in_loop(sym, loop->parent) && holds_at_head(loop->parent)) loop = loop->parent;
    int count = 0;
    for (NODE* predicate : list_VP_predicate_trees(set, nullptr, sym)) {
        add_loop_body_assertion(predicate, loop);
        ++count;
    }
    return count;
}

void tell_loop_of_values(struct LOOP* loop, vpenv env) {
    constexpr int MOST_FACTS = 12;
    int facts = 0;
    for (SYMTAB* sym : std::vector<SYMTAB*>(loop->RC_syms.begin(), loop->RC_syms.end())) {
        const int number = vpenv_store->number_of(sym);
        const vpset* known = number < 0 ? nullptr : vpenv_store->find(env, number);
        if (!known || !sym_is_RC_in_loop(sym, loop)) continue;
        if (facts < MOST_FACTS) facts += insert_vpset_binding_in_loop(*known, sym, loop);
        if (vpset_is_single(*known) && has_value_range(sym->type) && !sym->type->is_enum() && loop->trips && loop->trips->op != ICON) {
            NODE* name = mk_NAME(sym);
            loop->trips = simp_subst_icon(to_int65(vpset_minimum(*known)), sym->type->stqs(), name, loop->trips);
            erase_tree(name);
        }
    }
    if (!loop->trips) return;
    const VALUES_AT values(&env);
    characterize_trip_count(loop);
}
