// The frames of the steps that work on loops.
#pragma once

#include "OPT5/driver/pipeline.h"

// Trees in normal form and a loop hierarchy. The hierarchy stays from step to step until one erases it.
extern const FRAME D;
// The same with dependence analysis active.
extern const FRAME D_with_dependence;
// D with the full hierarchy built anew, whether there is one or not.
extern const FRAME DF;
// Normal form alone.
extern const FRAME N;
