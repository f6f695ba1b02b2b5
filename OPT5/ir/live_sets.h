// Which candidates are live at both ends of a block, by `bitnum`: what `fact::live_variables` holds beside the numbers.
#pragma once

#include "BITVEC/bitvec.h"
#include "OPT5/ir/side_table.h"

struct LIVE_SETS {
    struct ENDS {
        BITVEC entry, exit; // of `FUNINFO::lva_sym_count` bits; of none where a block was made since
    };
    SIDE_TABLE<ENDS> of;
};

// Null where the block has no set. Valid until the next block gets one.
inline BITVEC* live_at_entry(const BBLK* bb) {
    LIVE_SETS* sets = bb->owner()->live_sets.get();
    return sets && sets->of[bb].entry.bits ? &sets->of[bb].entry : nullptr;
}
inline BITVEC* live_at_exit(const BBLK* bb) {
    LIVE_SETS* sets = bb->owner()->live_sets.get();
    return sets && sets->of[bb].exit.bits ? &sets->of[bb].exit : nullptr;
}
