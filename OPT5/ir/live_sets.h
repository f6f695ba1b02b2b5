// Which candidates are live at the entry of a block, by `bitnum`: what `fact::live_variables` holds beside the numbers.
//
// Few of a function's candidates are live in any one place, so they are listed: bit vectors for all blocks would take the
// square of the function's size.
#pragma once

#include "BITVEC/bitvec.h"
#include "OPT5/ir/side_table.h"

#include <cstdint>
#include <vector>

struct LIVE_SETS {
    struct ENTRY {
        uint32_t from = 0, count = 0; // in `lists`
        bool is_known = false;        // not of a block that was made since
    };
    SIDE_TABLE<ENTRY> at_entry;
    std::vector<uint16_t> lists; // those of the blocks, each ascending; a list that grows moves to the end
};

bool live_at_entry_is_known(const BBLK* bb);
bool is_live_at_entry(const BBLK* bb, int bit);
void set_live_at_entry(const BBLK* bb, int bit, bool is_live); // of a block whose set is known
// What is live at the block's end: all candidates, if that of a successor is not known.
void add_live_at_exit(const BBLK* bb, BITVEC& live);
// For a new block whose only successor is `bb`.
void copy_live_at_entry(const BBLK* bb, const BBLK* made);
