// Not built yet: nothing is known and nothing changes.
#include "OPT5/dd/loop.h"

void characterize_trip_count(struct LOOP*) {}
