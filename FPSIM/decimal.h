// Exact conversion between decimal digits and binary values. Nothing is rounded on the way: a value of the simulator
// has a finite decimal expansion, and a decimal text a quotient whose remainder tells whether digits were cut off.
#pragma once

#include "FPSIM/fpsim.h"

#include <string>

// The decimal digits of |x|, finite and not zero: no leading or trailing zero, value 0.d1d2d3... * 10^`*point`.
std::string decimal_digits(const simul_fval* x, int* point);

// Rounds 0.d1d2d3... * 10^`*point` to `n` digits, ties to even; `n` of 0 or less may leave no digit or one. The result
// has exactly `n` digits if n > 0, with zeros at the end where there were fewer.
std::string round_digits(const std::string& digits, int n, int* point);

// `digits` (only decimal digits, at least one not zero) * 10^`exponent`, rounded to odd.
int decimal_value(const std::string& digits, int exponent, int sign, simul_fval* x);
