// The call graph as a file for a viewer of graphs.
#pragma once

// Writes `<input>.gdl` beside the input: a node a function, an edge a pair of caller and callee, labelled with its
// calls. A file that cannot be written is reported on stderr; the run continues.
void view_call_graph();
