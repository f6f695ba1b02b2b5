#include "OPT5/ir/profile.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>

namespace {

// A back edge is taken. Source: T. Ball, J. R. Larus, "Branch Prediction for Free", 1993.
constexpr double STAYS_IN_LOOP = 0.88;
constexpr int MAX_PASSES = 32;

enum STATUS : uint32_t { NO_DATA, ESTIMATED, COUNTED };

bool has_count(const NODE* ref) { return ref->edge_profile() != NO_PROFILE; }

} // namespace

void initialize_the_profiling_state(const NODE* branch) {
    FUNINFO* f = currfuninfo;
    if (!f) return;
    if (branch) {
        const NODE* ref = branch->op == BRANCH ? branch->left : nullptr;
        // Only the branch in front of everything else counts entries.
        if (!ref || f->entry_count != NO_PROFILE || !f->statements || f->statements->rest) return;
        if (has_count(ref)) {
            f->profile_status = COUNTED;
            f->entry_count = ref->edge_profile();
        } else if (ref->rare().weight >= 0) {
            f->profile_status = ESTIMATED;
            if (print_debug) debug_printf(" This function has been STATICALLY profiled.\n");
            return;
        } else
            return;
    } else {
        f->profile_status = NO_DATA;
        f->entry_count = NO_PROFILE;
        const PRAGMA* p = find_pragma(currfunc, PRG_FUNC_NUM_CALLED);
        if (!p || p->args.empty()) return;
        char* end = nullptr;
        const unsigned long n = std::strtoul(p->args[0].c_str(), &end, 10);
        if (end == p->args[0].c_str() || n >= NO_PROFILE) return;
        f->profile_status = COUNTED;
        f->entry_count = static_cast<uint32_t>(n);
    }
    if (print_debug) debug_printf("  This function has been profiled.\n\tEntry count: %u\n", f->entry_count);
}

void initialize_labelref_probabilities(NODE* control) {
    double total = 0;
    bool complete = true;
    for_each_branch_target(control, [&](const NODE* ref) {
        if (has_count(ref))
            total += ref->edge_profile();
        else
            complete = false;
    });
    if (!complete || total <= 0) return;
    for_each_branch_target(control, [total](NODE* ref) { ref->make_rare().weight = ref->edge_profile() / total; });
}

namespace {

// ---- Probabilities

bool goes_backward(const BBLK* from, const BBLK* to) { return to->dfn <= from->dfn; }

// An edge that stays in a loop is likely; all others are alike.
void predict_block(BBLK* bb) {
    int edges = 0, backward = 0;
    for (const EDGE* e = bb->successors; e; e = e->rest) {
        ++edges;
        backward += goes_backward(bb, e->first);
    }
    for (EDGE* e = bb->successors; e; e = e->rest) {
        if (backward == 0 || backward == edges)
            e->prob = 1.0 / edges;
        else
            e->prob = goes_backward(bb, e->first) ? STAYS_IN_LOOP / backward : (1 - STAYS_IN_LOOP) / (edges - backward);
    }
}

void predict_probabilities() {
    if (print_debug) debug_printf("\n\t ======= ENTERING predict_probabilities() ======\n");
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        const NODE* control = bb->branch();
        if (control && control->op == BRANCH && bb->successors && bb->successors->rest)
            debug_printf("\n\nERROR [predict_probabilities()]: >1 LABELREF for BRANCH?\n");
        bool known = bb->successors != nullptr;
        for (const EDGE* e = bb->successors; e; e = e->rest) known &= e->prob >= 0;
        if (!known) predict_block(bb);
    }
}

// From the counts on the branch to its edges; several cases may share one.
void probabilities_from_counts(BBLK* bb) {
    NODE* control = bb->branch();
    if (!control) return;
    if (control->op == BRANCH) {
        if (bb->successors) bb->successors->prob = 1;
        return;
    }
    initialize_labelref_probabilities(control);
    bool known = true;
    for_each_branch_target(control, [&](const NODE* ref) { known &= ref->rare().weight >= 0; });
    if (!known) return predict_block(bb);
    for (EDGE* e = bb->successors; e; e = e->rest) e->prob = 0;
    for_each_branch_target(control, [bb](const NODE* ref) {
        if (EDGE* e = edge_memberp(ref->lbl->bblock, bb->successors)) e->prob += ref->rare().weight;
    });
}

void copy_to_predecessors() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (EDGE* back = edge_memberp(bb, e->first->predecessors)) back->prob = e->prob;
}

// ---- Frequencies

// The fixed point of "what enters a block leaves it by its probabilities", from the entry on; loops need more than one
// pass.
void propagate_frequencies(double entry) {
    FUNINFO* f = currfuninfo;
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) bb->dFreqIn = bb->dFreqOut = 0;
    for (int pass = 0; pass < MAX_PASSES; ++pass) {
        bool changed = false;
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) {
            double in = bb == f->bb_list ? entry : 0;
            for (const EDGE* e = bb->predecessors; e; e = e->rest)
                if (e->prob > 0) in += e->first->dFreqOut * e->prob;
            changed |= std::fabs(in - bb->dFreqIn) > 1e-6 * (1 + in);
            bb->dFreqIn = bb->dFreqOut = in;
        }
        if (!changed) return;
    }
}

// ---- Checks

// The counts on a branch, NO_PROFILE if one is missing.
uint32_t counts_out_of(const BBLK* bb) {
    uint64_t sum = 0;
    bool known = bb->successors != nullptr;
    if (NODE* control = bb->branch())
        for_each_branch_target(control, [&](const NODE* ref) {
            known &= has_count(ref);
            sum += ref->edge_profile();
        });
    return known && sum < NO_PROFILE ? static_cast<uint32_t>(sum) : NO_PROFILE;
}

void check_block(const BBLK* bb) {
    if (!(bb->dFreqIn >= 0)) {
        debug_printf("+++++ BB%d: Invalid incoming profile count.", bb->dfn);
        debug_printf("+++++ Bad dFreqIn for BB%d\n", bb->dfn);
    }
    if (!(bb->dFreqOut >= 0)) debug_printf("+++++ BB%d: Invalid outgoing profile count.", bb->dfn);
    for (const EDGE* e = bb->predecessors; e; e = e->rest)
        if (!(e->prob >= 0 && e->prob <= 1.0001))
            debug_printf("+++++ Bad pred prob from BB%d to BB%d\n", e->first->dfn, bb->dfn);
    for (const EDGE* e = bb->successors; e; e = e->rest)
        if (!(e->prob >= 0 && e->prob <= 1.0001))
            debug_printf("+++++ Bad succ prob from BB%d to BB%d\n", bb->dfn, e->first->dfn);
    const uint32_t out = counts_out_of(bb);
    if (currfuninfo->profile_status != COUNTED || out == NO_PROFILE) return;
    const auto in = static_cast<uint32_t>(std::min(bb->dFreqIn + 0.5, 4294967294.0));
    const double share = in || out ? std::fabs(double(in) - double(out)) / std::max(in, out) : 0;
    if (share > 0.01)
        debug_printf("+++++ BB%d: Inconsistent profile counts - IN=%u OUT=%u DIFF=%d (%e).\n", bb->dfn, in, out,
                     static_cast<int>(in - out), share);
}

void check_annotation() {
    double returns = 0;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        check_block(bb);
        if (!bb->successors) returns += bb->dFreqOut;
    }
    if (currfuninfo->profile_status != COUNTED || currfuninfo->entry_count == NO_PROFILE) return;
    const uint32_t in = currfuninfo->entry_count, out = static_cast<uint32_t>(std::min(returns + 0.5, 4294967294.0));
    const double share = in || out ? std::fabs(double(in) - double(out)) / std::max(in, out) : 0;
    if (share > 0.01)
        debug_printf("+++++ Inconsistent call/return profile counts - IN=%u OUT=%u DIFF=%d (%e).\n", in, out,
                     static_cast<int>(in - out), share);
}

} // namespace

void initialize_CFG_profiling_annotation(bool estimate, bool check) {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list || f->profile_status == NO_DATA) return;
    if (f->profile_status == COUNTED) {
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) probabilities_from_counts(bb);
    } else if (estimate)
        predict_probabilities();
    else
        return;
    copy_to_predecessors();
    propagate_frequencies(f->entry_count == NO_PROFILE ? 1.0 : f->entry_count);
    if (check && print_debug) check_annotation();
}
