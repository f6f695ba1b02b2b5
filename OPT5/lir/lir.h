// The low-level form of a function.
#pragma once

// The steps "early LIR" and "late LIR".
void early_LIR();
void late_LIR();
