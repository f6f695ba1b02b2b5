// Common subexpressions over the whole function, and the loop improvements that use the same data.
#pragma once

void gcse();

// Needs the sets of `annotate_cfg`.
void restructure_loops();
