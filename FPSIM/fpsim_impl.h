// Shared by the sources of the floating-point simulator, not for its users.
#pragma once

#include "FPSIM/fpsim.h"

using UWIDE = unsigned __int128;

static const int32_t exp_special = 32767, exp_zero = -32767;

// The six digits as one number: a finite value is digits * 2^(exp - 96).
inline UWIDE digits_of(const simul_fval* x) {
    UWIDE m = 0;
    for (uint16_t d : x->mant) m = m << 16 | d;
    return m;
}

inline int bit_length(UWIDE v) {
    uint64_t high = static_cast<uint64_t>(v >> 64), low = static_cast<uint64_t>(v);
    if (high) return 128 - __builtin_clzll(high);
    return low ? 64 - __builtin_clzll(low) : 0;
}

inline bool is_special(const simul_fval* x) { return x->exp == exp_special; }

// Sets an error bit. The result is what an operation that left a mark returns.
inline int fp_mark(int bit) {
    fp_error |= bit;
    return -1;
}

int set_zero(simul_fval* r, int sign);
int set_inf(simul_fval* r, int sign);
int set_invalid(simul_fval* r); // a NaN with FPE_INVALID

// `r` = m * 2^e, plus a remainder below one unit of m if `sticky`, in aligned form, rounded to odd. With `sticky` m
// must have 97 bits or more. Handles zero, overflow and underflow; returns 0 or -1.
int pack(simul_fval* r, int sign, UWIDE m, int64_t e, bool sticky);

// -1, 0 or 1 of the magnitudes of two values that are no NaN.
int compare_magnitudes(const simul_fval* a, const simul_fval* b);
