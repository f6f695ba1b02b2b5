// Assignments whose value only one successor of their block reads.
#pragma once

// Moves each to the edge to that successor. Needs the live sets, and keeps them right; returns whether the graph has new
// blocks.
bool delay_assignments();
