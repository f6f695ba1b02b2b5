// Not built yet: nothing is known and nothing changes.
#include "OPT5/dd/loop.h"

void reinsert_loop_pragmas(struct LOOP*) {}
void try_to_make_MUST_ITERATE_pragma(struct LOOP*) {}
void reconcile_MUST_ITERATE_pragma(struct LOOP*) {}
void validate_MUST_ITERATE_pragma(NODE*) {}
void reconcile_PROB_ITERATE_pragma(struct LOOP*) {}
void update_pragmas_for_loop(struct LOOP*, int) {}
void delete_pragmas_for_loop(struct LOOP*) {}
