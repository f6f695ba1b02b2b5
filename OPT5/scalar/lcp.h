// Copy propagation along the blocks of a function.
#pragma once

// `global`: over block borders too.
void copyprop(int global);
