// Superblocks of the graph as it is: chains of blocks of which each but the first is entered from the one before alone.
//
// What is known of variables at the end of one block holds at the start of the next, so that constants and copies
// assigned in a chain replace later reads (local_asgs.cpp).
//
// Needs: alias marks. Leaves: a simplified graph with block numbers where anything was replaced.
// Sound because control comes to a block of a chain through all blocks ahead of it, and through nothing in between.

#include "OPT5/scalar/sblk.h"
#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/scalar/local_asgs.h"

#include <memory>

register_option pass_disable_superblock_opt("disable:superblock_opt");

namespace {

// A block joins the chain of its only predecessor if that is the chain's last block. Predecessors come first in the
// order of the graph.
std::vector<std::unique_ptr<SBLK>> form_superblocks() {
    std::vector<std::unique_ptr<SBLK>> superblocks;
    SBLK::next_number = 1;
    SIDE_TABLE<SBLK*> chain_of; // null: not looked at yet
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        const BBLK* before = only_block(bb->predecessors);
        SBLK* chain = before ? chain_of[before] : nullptr;
        if (chain && chain->tail == before) {
            chain->add_basic_block(bb);
        } else {
            superblocks.push_back(std::make_unique<SBLK>(bb));
            chain = superblocks.back().get();
        }
        chain_of[bb] = chain;
    }
    return superblocks;
}

} // namespace

void optimize_superblocks_in_cfg() {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list || pass_disable_superblock_opt) return;
    if (print_debug) debug_printf("\n\n\t\t\t------ ENTERING 'optimize_superblocks_in_cfg' ------\n");
    need(fact::alias_marks);
    bool changed = false;
    const auto superblocks = form_superblocks();
    for (const auto& superblock : superblocks) {
        if (print_debug && fdebug && superblock->contents.size() > 1) superblock->print(false, fdebug);
        LOCAL_ASGS known(ASGS_TO_NAMES);
        for (BBLK* bb : superblock->contents)
            if (!bb->is_in_LIR_form()) walk_block(known, bb, &changed);
    }
    if (!changed) return;
    ::changed(fact::graph);
    simpcfg(false, false);
}
