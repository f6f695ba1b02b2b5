// The frames of the steps that work on loops.
#pragma once

#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/driver/pipeline.h"

// Trees in normal form and a loop hierarchy. The hierarchy stays from step to step until one erases it.
extern const FRAME D;
// The same with dependence analysis active.
extern const FRAME D_with_dependence;
// D with the full hierarchy built anew, whether there is one or not.
extern const FRAME DF;
// D from level 2 on in functions with loops, nothing otherwise.
extern const FRAME D_where_loops_are;
// Normal form alone.
extern const FRAME N;
// SSA form, alone, and on what the frame has. Rows that follow each other share one form; such a row says by itself what
// it changed.
extern const FRAME S, D_and_S, N_and_S;
// N; behind it the hierarchy is removed and the blocks are simplified.
extern const FRAME N_and_no_hierarchy;

// The form that the last row with a frame left for the next is undone: ahead of rows without one, and where the work on a
// function stops.
void leave_kept_form();
void leave_kept_SSA_form(); // of that the operators alone

extern register_option pass_debug_bare_SSA; // into SSA form and out of it, with no work on it

bool has_loops(); // of the current function: a hierarchy, or edges that lead back
// Pragmas go back to the statements, and the blocks are simplified, since no hierarchy is needed any more.
void drop_hierarchy();
// The same for a row that others on loops follow: what is marked in the loops stays.
void forget_hierarchy();
