// Uses of file-scope data, as the call graph's builder and the reports take them.
#pragma once

// Enters every use of a global in its `cqual` anew, from the functions that are left in the graph and from
// initializers.
void rescan_uses();
// Globals whose uses are known, and those that turned out constant, to the debug and the info stream.
void report_constant_globals();
