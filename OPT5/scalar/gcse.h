// Common subexpressions over the whole function, and the loop improvements that use the same data.
#pragma once

void gcse();

// Loops of one iteration, and empty ones (restructure.cpp).
void restructure_loops();
