// Not built yet: nothing is known and nothing changes.
#include "OPT5/dd/loop.h"

void mark_affine_LCV(struct LOOP*) {}
void prove_IV_affine(LOOPIV*, const NODE*, const NODE*, INT65, const NODE*, struct LOOP*) {}
NODE* loop_trip_count(struct LOOP*) { return nullptr; }
void calculate_trip_count(struct LOOP*) {}
