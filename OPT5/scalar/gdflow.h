// Global data flow: available, anticipated and reaching values of a function's blocks.
#pragma once

// Builds the bit vectors of all blocks, and frees them.
void annotate_cfg();
void clean_up_gdflow_bitvecs();

// Releases the bit vectors of the assertion relations.
void clean_up_assert_RELOPs();
