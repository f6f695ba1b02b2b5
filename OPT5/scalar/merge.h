// Names of variables: separate live ranges get symbols of their own, symbols that never meet share one.
#pragma once

void rename_symbols();
void merge_symbols();
