// Not built yet: nothing is known and nothing changes.
#include "OPT5/dd/loop.h"

void constrain_LOOPIV_highval(LOOPIV*, INT65) {}
void constrain_LOOPIV_lowval(LOOPIV*, INT65) {}
void refine_loop_highlow(struct LOOP*) {}
void constrain_all_ranges() {}
