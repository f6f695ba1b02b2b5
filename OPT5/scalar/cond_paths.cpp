// Conditional paths: a test whose outcome is known on some of the edges into its block, behind a few statements of its
// own.
//
//     if (c) A; T; if (c) B;     becomes     if (c) { A; T; B } else { T }
//
// The block of the second test is copied for the edges whose outcome is known; the copy ends in a jump to where that
// outcome leads, and the edges lead to the copy.
//
// Needs: block numbers. Leaves: a simplified graph with block numbers.
// Sound because the statements in front of the test, the tail, are copied whole and may not change what the condition
// reads: with `T` assigning to `c` the second test would have to be asked again. A test that all edges decide alike, or
// that has no tail, needs no copy: OPT5/scalar/implied_tests.cpp removes it. A test that closes or heads a loop stays,
// so that the loop keeps one entry and one back edge.
//
// Growth is bounded: a tail is a few nodes, all copies together a part of the function, and where size is the goal
// there are none.

#include "OPT5/scalar/simpcfg.h"

#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/scalar/tail_copies.h"
#include "OPT5/simp/seq.h"

#include <algorithm>
#include <vector>

register_option pass_disable_cps("disable:cps");

namespace {

constexpr int MOST_PASSES = 4; // a test behind a copied one may be decided by that
constexpr int SPEED_MATTERS = 3;

struct CANDIDATE {
    BBLK* bb;
    std::vector<DECIDED_EDGE> edges;
    bool all; // no other edge leads into the block
};

class COND_PATHS {
public:
    explicit COND_PATHS(int growth) : growth_left(growth) {}

    bool run_once() {
        TEST_OUTCOMES known;
        outcomes = &known;
        if (print_debug) debug_printf("-- cps search phase --\n");
        std::vector<CANDIDATE> candidates = search();
        if (candidates.empty()) return false;
        if (print_debug) debug_printf("-- cps qualify phase --\n");
        bool changed = false;
        for (CANDIDATE& c : candidates)
            if (qualifies(c)) changed |= combine(c);
        return changed;
    }

private:
    std::vector<CANDIDATE> search() {
        std::vector<CANDIDATE> found;
        for (BBLK* bb = currfuninfo->bb_list->dflink; bb; bb = bb->dflink) {
            LIST* control = outcomes->control_of(bb);
            if (!control || control == bb->statements || !is_test(control->first)) continue;
            if (!bb->predecessors || !bb->predecessors->rest || has_back_edge(bb)) continue;
            if (nodes_of_tail(bb) < 0 || !outcomes->ask_for(control->first->left)) continue;
            CANDIDATE c{bb, {}, false};
            c.all = find_outcomes(*outcomes, bb, &c.edges);
            if (!c.edges.empty()) found.push_back(c);
        }
        return found;
    }

    static BBLK* target(const NODE* test, bool outcome) {
        return (outcome ? test->right->left : test->right->right)->lbl->bblock;
    }

    // An earlier change may have removed edges; those that are left lead where they did.
    bool qualifies(CANDIDATE& c) {
        const NODE* test = outcomes->control_of(c.bb)->first;
        outcomes->ask_for(test->left);
        if (const LIST* kill = outcomes->first_that_may_change(c.bb)) {
            if (print_debug)
                debug_printf("-- %s kills our tail %s, do not combine\n", stmt2infix(kill->first).c_str(),
                             tree_to_infix(test->left).c_str());
            return false;
        }
        auto is_unfit = [&](const DECIDED_EDGE& edge) {
            const BBLK* to = target(test, edge.outcome);
            return to->dfn <= c.bb->dfn || !edge_memberp(c.bb, edge.from->successors) ||
                   joins_selects(*outcomes, edge.from, c.bb);
        };
        const size_t before = c.edges.size();
        c.edges.erase(std::remove_if(c.edges.begin(), c.edges.end(), is_unfit), c.edges.end());
        c.all &= c.edges.size() == before;
        return !c.edges.empty();
    }

    // The edges of each outcome share a copy; where every edge is decided, those of the first outcome keep the block
    // itself.
    bool combine(const CANDIDATE& c) {
        const bool first = c.edges.front().outcome;
        const bool agree = std::all_of(c.edges.begin(), c.edges.end(), [&](auto& e) { return e.outcome == first; });
        if (c.all && agree) return false;
        const int copies = (c.all ? 0 : 1) + (agree ? 0 : 1), nodes = nodes_of_tail(c.bb);
        if (copies * nodes > growth_left) return false;
        growth_left -= copies * nodes;
        const NODE* test = outcomes->control_of(c.bb)->first;
        BBLK* const to[2] = {target(test, false), target(test, true)};
        for (bool outcome : {first, !first}) {
            if (outcome == first ? c.all : agree) continue;
            BBLK* copy = copy_tail(c.bb, to[outcome]);
            for (const DECIDED_EDGE& edge : c.edges)
                if (edge.outcome == outcome) lead_to(edge.from, c.bb, copy);
        }
        if (c.all) make_branch(c.bb, outcomes->control_of(c.bb), to[first]);
        outcomes->refresh(c.bb);
        return true;
    }

    static BBLK* copy_tail(BBLK* bb, BBLK* to) {
        BBLK* copy = insert_new_bb(-1, bb, copy_of_tail(bb, mk_BRANCH(to)));
        connect(copy, to);
        return copy;
    }

    void lead_to(BBLK* from, BBLK* bb, BBLK* copy) {
        subst_bb_for_bb_in_stmts(copy, bb, outcomes->control_of(from));
        disconnect(from, bb);
        connect(from, copy);
    }

    TEST_OUTCOMES* outcomes = nullptr;
    int growth_left;
};

} // namespace

void straighten_cond_paths() {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list || opt_level() < 2 || size_speed_goal() < SPEED_MATTERS || pass_disable_cps) return;
    renumber_bblocks();
    COND_PATHS paths(growth_by_copies());
    bool changed = false;
    for (int i = 0; i < MOST_PASSES && paths.run_once(); ++i) {
        changed = true;
        rebuildcfg();
        simpcfg(false, false);
        renumber_bblocks();
    }
    // An assignment that only the removed test read would make the variable look as if it had several values.
    if (changed) elim_dead_assigns(true, true);
}
