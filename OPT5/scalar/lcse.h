// Common subexpressions within a block (not built yet), and known values of parts of objects (known_parts.cpp).
#pragma once

void lcse();
void lcse_subrange_assignments();
void elim_dead_subrange_assigns();
