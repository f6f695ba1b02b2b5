// Assignments that only one way out of their block needs.
#pragma once

// Moves each to the way that needs it. Needs the live sets, and keeps them right; says whether the graph has new
// blocks.
bool delay_assignments();
