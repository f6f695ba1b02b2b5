// Not built yet: nothing is known and nothing changes.
#include "OPT5/dd/loop.h"

void check_if_LCV_used_in_loop(struct LOOP*, struct LOOP*) {}
void check_if_LCV_dead_on_exit(struct LOOP*) {}
void find_IVs_dead_on_exit(struct LOOP*) {}
void shorten_long_IVs(struct LOOP*) {}
void lengthen_short_IVs(struct LOOP*) {}
void add_downcounters_to_loops(struct LOOP*, bool, bool) {}
void prep_loop_variables(bool) {}
void prop_scalars_in_loop(struct LOOP*, bool, bool) {}
void prop_IVs_and_RCs_in_loop(struct LOOP*, bool) {}
