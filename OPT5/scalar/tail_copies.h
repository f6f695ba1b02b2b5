// Copies of the ends of blocks, and how much of them a function may grow by.
#pragma once

class BBLK;
class NODE;
struct LIST;

// The nodes of the statements in front of the control statement, or -1 for what is too large or must stay single.
int nodes_of_tail(const BBLK* bb);
// What all copies of one pass together may add to the current function, in nodes.
int growth_by_copies();
// Those statements, and `control` behind them, for a block to own.
LIST* copy_of_tail(const BBLK* bb, NODE* control);
// A copy of all of `tail` takes the place of the jump to it at the end of `bb`.
void take_copy_of_tail(BBLK* bb, BBLK* tail);

// Jumps to small blocks that end in a test or a return become copies of them. Whether there were any; blocks are to be
// numbered then.
bool duplicate_tails();
