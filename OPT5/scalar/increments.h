// Moves pointer steps to the memory references beside them, where the address registers step for free.
#pragma once

void propagate_increments();
