// Loops that the passes before have left with little to do: one that runs a single iteration is straight-line code, and one
// whose iterations compute nothing that is read is not run again.
//
// Needs: the expressions of `annotate_cfg`, natural loops. Leaves: a simplified graph where a loop went; the expressions are
// stale then.
// Sound because the promise ahead of a loop, which is of that loop alone, bounds its iterations: a loop without a bound may
// be there to wait forever, and stays. A loop is removed only where it writes nothing but variables that its exit does not find
// live, so that the first iteration alone, or all of them, make no difference.
#include "OPT5/scalar/gcse.h"

#include "IFILE/pragma.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/scalar/subrange.h"
#include "OPT5/scalar/triples.h"

#include <algorithm>
#include <cstdlib>

namespace {

constexpr int MOST_ROUNDS = 3;

// A loop that is entered from one block, which leads nowhere else, and left behind its last block alone.
struct PLAIN_LOOP {
    BBLK *entry = nullptr, *latch = nullptr, *exit = nullptr;
    std::vector<BBLK*> blocks; // the header first
};

bool is_plain(const NATURAL_LOOP& loop, PLAIN_LOOP* plain) {
    if (!loop.is_reducible || loop.inside || loop.latches.size() != 1) return false;
    plain->latch = loop.latches.front();
    for (const EDGE* p = loop.header->predecessors; p; p = p->rest) {
        if (p->first == plain->latch) continue;
        if (plain->entry) return false;
        plain->entry = p->first;
    }
    if (!plain->entry || plain->entry->successors->rest || plain->entry->dflink != loop.header) return false;
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
    plain->blocks = loop.blocks;
    for (BBLK* bb : loop.blocks) {
        const NODE* control = bb->branch();
        if (control && control->op != IF && control->op != BRANCH) return false;
        for (const EDGE* s = bb->successors; s; s = s->rest) {
            if (loops.contains(&loop, s->first)) continue;
            if (bb != plain->latch || control->op != IF || control->left->op == ENDLOOP) return false;
            plain->exit = s->first;
        }
    }
    return plain->exit != nullptr;
}

// The most iterations that are promised, or 0.
long most_iterations(const BBLK* entry) {
    long most = 0;
    for (const LIST* s = entry->statements; s; s = s->rest) {
        const PRAGMA* p = s->first->op == PPRAGMA ? s->first->pragma : nullptr;
        if (p && p->kind == PRG_MUST_ITERATE && p->args.size() > 1) most = std::strtol(p->args[1].c_str(), nullptr, 10);
    }
    return most;
}

// The variables that the block writes, if it does nothing else.
bool writes_variables_alone(const BBLK* bb, std::vector<const NODE*>* written) {
    for (const LIST* s = bb->statements; s; s = s->rest) {
        const NODE* t = s->first;
        if (t->op == BRANCH) continue;
        if (t->op == IF && !tree_has_side_effects(t->left)) continue;
        const bool assigns = t->op == ASG || is_operator_assignment(t);
        if (!assigns || t->left->op != NAME || tree_has_side_effects(t->right)) return false;
        written->push_back(t->left);
    }
    return true;
}

// Ahead of any assignment: it is live then, for which the variables of the whole function need not be asked.
bool block_reads_one_of(const BBLK* bb, const std::vector<const NODE*>& names) {
    auto is_one = [&names](const NODE* t) {
        return t->op == NAME &&
               std::any_of(names.begin(), names.end(), [t](const NODE* n) { return n->u.sym == t->u.sym; });
    };
    for (const LIST* s = bb->statements; s; s = s->rest) {
        const NODE* t = s->first;
        const bool assigns = t->op == ASG && t->left->op == NAME;
        if (any_subtree(assigns ? t->right : t, is_one)) return true;
        if (assigns && is_one(t->left)) return false;
    }
    return false;
}

bool is_essentially_empty(const PLAIN_LOOP& loop) {
    std::vector<const NODE*> written;
    for (const BBLK* bb : loop.blocks)
        if (!writes_variables_alone(bb, &written)) return false;
    if (block_reads_one_of(loop.exit, written)) return false;
    need(fact::alias_marks | fact::live_variables);
    return live_at_entry_is_known(loop.exit) && std::all_of(written.begin(), written.end(), [&loop](const NODE* name) {
        const int bit = is_private_name(name) ? live_index(name->u.sym) : -1;
        return bit >= 0 && !is_live_at_entry(loop.exit, bit);
    });
}

// What was said of the loop, or marks its place.
void drop_pragmas_of_loop(BBLK* entry) {
    drop_promises_in(entry);
    for (LIST** link = &entry->statements; *link;) {
        const NODE* t = (*link)->first;
        if (t->op == PPRAGMA && (t->pragma->kind == PRG_SRC_LOOP || t->pragma->kind == PRG_ALIAS_ADVICE))
            drop_statement(link);
        else
            link = &(*link)->rest;
    }
}

bool improve_single_loop(const PLAIN_LOOP& loop, long most) {
    if (most > 1 && !is_essentially_empty(loop)) return false;
    if (!rewrite_is_allowed(loop.latch->branch())) return false;
    const int header = loop.blocks.front()->dfn;
    if (print_debug && most == 1)
        debug_printf("\n\tThe loop [%d-%d] executes only once.\n\n", header, loop.latch->dfn);
    else if (print_debug)
        debug_printf("\t\tThe loop [%d] is essentially empty.\n", header);
    drop_pragmas_of_loop(loop.entry);
    make_branch(loop.latch, loop.latch->last_statement(), loop.exit);
    return true;
}

// A loop around a removed one is looked at in the next pass.
bool improve_loops() {
    need(fact::loops);
    std::vector<std::pair<PLAIN_LOOP, long>> loops;
    for (const auto& loop : currfuninfo->loops->inner_first()) {
        PLAIN_LOOP plain;
        if (!is_plain(*loop, &plain)) continue;
        if (const long most = most_iterations(plain.entry); most > 0) loops.emplace_back(std::move(plain), most);
    }
    bool any = false;
    for (const auto& [loop, most] : loops) any |= improve_single_loop(loop, most);
    return any;
}

// Whether some loop may go, by its promise and its header.
bool any_loop_may_go() {
    std::vector<const NODE*> written;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        const long most = most_iterations(bb);
        if (most == 1 || (most > 0 && bb->dflink && writes_variables_alone(bb->dflink, &written))) return true;
    }
    return false;
}

} // namespace

void restructure_loops() {
    if (unique_triple_count < 1 || !any_loop_may_go()) return;
    for (int left = MOST_ROUNDS; left > 0 && improve_loops(); --left) {
        elim_dead_assigns(0, 0);
        simpcfg(0, 0);
    }
}
