// Floating point of 256 bits, in which the elementary functions are computed: precise enough that rounding the result
// to the target's double is rounding the true value, short of a tie that only exact results have.
//
// A value is m * 2^(exp - 256), m the four words, least significant first, its top bit set; zero has all words 0.
// Results are cut off, with an error below two units of the last bit.
#pragma once

#include "FPSIM/fpsim_impl.h"

struct BIGF {
    uint64_t m[4] = {0, 0, 0, 0};
    int64_t exp = 0;
    int neg = 0;

    bool is_zero() const { return m[3] == 0; }
};

// The low `n` words w * 2^scale, the top 256 bits of it.
BIGF big_from_words(const uint64_t* w, int n, int64_t scale);
BIGF big_from_int(int64_t v);
BIGF big_from_simul(const simul_fval* x); // finite
// Rounds to odd; a value that agrees with one of the simulator's to 100 bits more than it has is that value.
int big_to_simul(const BIGF& a, simul_fval* x);

BIGF operator+(const BIGF& a, const BIGF& b);
BIGF operator-(const BIGF& a, const BIGF& b);
BIGF operator*(const BIGF& a, const BIGF& b);
BIGF operator/(const BIGF& a, const BIGF& b); // b not zero
BIGF operator-(const BIGF& a);
BIGF big_div_small(const BIGF& a, uint64_t n);
BIGF big_scale(const BIGF& a, int64_t n);      // a * 2^n
BIGF big_sqrt(const BIGF& a);                  // a not negative
int64_t big_nearest(const BIGF& a);            // the nearest integer, which must fit
int big_compare(const BIGF& a, const BIGF& b); // of magnitudes
