// Loops that multiply and accumulate become one block, where their branches but choose values.
//
//     do { acc += *p++ * buf[i]; if (++i == 32) i = 0; } while (...);   ... i++; i = i == 32 ? 0 : i; ...
//
// as a wrapped index or a sum that is limited is written. The hardware's loops have one block.
//
// Needs: nothing. Leaves: where it changes a loop, an unsimplified graph.
// Sound because an arm is one assignment that is cheap and safe where it is not reached, to a variable that is only
// read then (see scalar/simpcfg.h).
#include "OPT5/dd/mac.h"

#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/simpcfg.h"

#include <algorithm>

namespace {

constexpr size_t MOST_CHOICES = 4;

// A loop whose blocks follow each other, but for branches that choose values.
struct CHAIN {
    std::vector<BBLK*> blocks;  // that each iteration passes
    std::vector<BBLK*> choices; // those of them that end in such a branch
};

// Where the arms of the branch that ends the block meet, or null; how many arms there are.
BBLK* join_of(const BBLK* bb, size_t* arms) {
    const EDGE* e = bb->successors;
    if (!e || !e->rest || e->rest->rest || !is_choice_of_value(bb)) return nullptr;
    BBLK *a = e->first, *b = e->rest->first;
    const bool a_is_arm = only_block(a->predecessors) && only_block(a->successors),
               b_is_arm = only_block(b->predecessors) && only_block(b->successors);
    *arms = 1;
    if (a_is_arm && only_block(a->successors) == b) return b;
    if (b_is_arm && only_block(b->successors) == a) return a;
    *arms = 2;
    return a_is_arm && b_is_arm && only_block(a->successors) == only_block(b->successors) ? only_block(a->successors) : nullptr;
}

bool find_chain(const NATURAL_LOOP& loop, const NATURAL_LOOPS& loops, CHAIN* chain) {
    if (loop.inside > 0 || loop.latches.size() != 1 || loop.blocks.size() > 1 + 3 * MOST_CHOICES) return false;
    size_t seen = 0;
    for (BBLK* at = loop.header;;) {
        chain->blocks.push_back(at);
        ++seen;
        if (at == loop.latches[0]) break;
        size_t arms = 0;
        BBLK* next = only_block(at->successors);
        if (!next) {
            next = join_of(at, &arms);
            chain->choices.push_back(at);
        }
        if (!next || next == loop.header || !loops.contains(&loop, next)) return false;
        const bool is_joined_here = arms ? edge_length(next->predecessors) == 2 : only_block(next->predecessors) == at;
        if (!is_joined_here || ends_in_promise(at)) return false;
        seen += arms;
        at = next;
    }
    return seen == loop.blocks.size() && !chain->choices.empty() && chain->choices.size() <= MOST_CHOICES;
}

// One sum of products alone, that each iteration adds to.
bool accumulates(const CHAIN& chain) {
    int products = 0;
    bool has_mac = false;
    for (const BBLK* bb : chain.blocks) {
        products += multiplications_in(bb);
        for (const LIST* s = bb->statements; s; s = s->rest) {
            LIST* copy = mkelist(copy_tree(s->first), nullptr, s->psn);
            split_accumulations_in_stmt(copy);
            for (const LIST* part = copy; part; part = part->rest) has_mac |= is_mac(part->first);
            erase_tree_list(copy);
        }
    }
    return has_mac && products == 1;
}

} // namespace

bool straighten_loops_of_accumulators() {
    need(fact::loops);
    bool any = false;
    for (const auto& loop : currfuninfo->loops->inner_first()) {
        CHAIN chain;
        if (!find_chain(*loop, *currfuninfo->loops, &chain) || !accumulates(chain)) continue;
        if (!rewrite_is_allowed(loop->header->branch())) continue;
        for (BBLK* bb : chain.choices) any |= choose_value(bb);
    }
    return any;
}
