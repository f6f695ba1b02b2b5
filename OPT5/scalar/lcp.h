// Copies and constants in place of what reads them, over the whole function.
#pragma once

// Puts in place of reads what assignments along chains of blocks, and those that hold in the whole function, give them.
// `mode` 0: those along chains alone; 2: tests of branches keep the variables that loops step, for passes behind that look
// for loops. Nothing at optimization level 0.
void copyprop(int mode);
