// Common subexpressions within a block, and assignments to parts of a variable.
#pragma once

void lcse();
void lcse_subrange_assignments();
void elim_dead_subrange_assigns();
