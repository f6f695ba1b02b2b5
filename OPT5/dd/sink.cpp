// Not built yet: nothing is known and nothing changes.
#include "OPT5/dd/dd.h"

bool sink_unused_definitions(struct LOOP*) { return false; }
