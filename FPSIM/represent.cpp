// The representation of simulated floating-point values: constants, alignment, packing.
#include "FPSIM/fpsim_impl.h"

#include <cstdlib>
#include <cstring>

thread_local int fp_error;
std::mutex atof_lock;

#define DIGIT(n)                                                                                                       \
    { {n}, 16, 0 }

const simul_fval pos_zero = {{}, -32767, 0}, neg_zero = {{}, -32767, 1};
const simul_fval pos_infin = {{}, 32767, 0}, neg_infin = {{}, 32767, 1};
const simul_fval a_nan = {{0x8000}, 32767, 0};
const simul_fval pos_huge = {{1}, 32752, 0}, neg_huge = {{1}, 32752, 1};
const simul_fval const_one = DIGIT(1), const_ten = DIGIT(10), const_sixteen = DIGIT(16);
const simul_fval const_dig[16] = {{{}, -32767, 0}, DIGIT(1),  DIGIT(2),  DIGIT(3), DIGIT(4),  DIGIT(5),
                                  DIGIT(6),        DIGIT(7),  DIGIT(8),  DIGIT(9), DIGIT(10), DIGIT(11),
                                  DIGIT(12),       DIGIT(13), DIGIT(14), DIGIT(15)};
const simul_fval one_q = {{0x4000}, 0, 0}, one_half = {{0x8000}, 0, 0}, three_q = {{0xC000}, 0, 0};
const simul_fval one = DIGIT(1), neg_one = {{1}, 16, 1}, one_p_five = {{1, 0x8000}, 16, 0};
const simul_fval two = DIGIT(2), neg_two = {{2}, 16, 1}, four = DIGIT(4);

bool f_is_zero(const simul_fval* x) { return x->exp == exp_zero && x->mant[0] == 0; }
bool f_is_nan(const simul_fval* x) { return x->exp == exp_special && x->mant[0] != 0; }
bool f_is_inf(const simul_fval* x) { return x->exp == exp_special && x->mant[0] == 0; }

int set_zero(simul_fval* r, int sign) {
    *r = sign ? neg_zero : pos_zero;
    return 0;
}

int set_inf(simul_fval* r, int sign) {
    *r = sign ? neg_infin : pos_infin;
    return 0;
}

int set_invalid(simul_fval* r) {
    *r = a_nan;
    return fp_mark(FPE_INVALID);
}

static void set_digits(simul_fval* r, UWIDE m) {
    for (int i = 5; i >= 0; --i, m >>= 16) r->mant[i] = static_cast<uint16_t>(m);
}

int pack(simul_fval* r, int sign, UWIDE m, int64_t e, bool sticky) {
    if (m == 0) return set_zero(r, sign);
    // The digit boundary at or above the top bit.
    int64_t exp = (bit_length(m) + e + 15) & ~int64_t{15};
    if (exp >= exp_special) {
        set_inf(r, sign);
        return fp_mark(FPE_OVER);
    }
    if (exp <= exp_zero) {
        set_zero(r, sign);
        return fp_mark(FPE_UNDER);
    }
    int64_t shift = e + 96 - exp;
    if (shift >= 0) {
        m <<= shift;
    } else {
        sticky |= (m & ((UWIDE{1} << -shift) - 1)) != 0;
        m >>= -shift;
    }
    set_digits(r, m | sticky);
    r->exp = static_cast<int32_t>(exp);
    r->sign = sign;
    return 0;
}

int f_align_radix_pt(simul_fval* x) {
    if (is_special(x) || f_is_zero(x)) return 0;
    if (x->exp > exp_special) {
        set_inf(x, x->sign);
        return fp_mark(FPE_OVER);
    }
    int32_t aligned = (x->exp + 15) & ~15;
    if (aligned >= exp_special) {
        set_inf(x, x->sign);
        return fp_mark(FPE_OVER);
    }
    int shift = aligned - x->exp;
    UWIDE m = digits_of(x);
    bool lost = (m & ((UWIDE{1} << shift) - 1)) != 0;
    set_digits(x, m >> shift | lost);
    x->exp = aligned;
    return 0;
}

int f_left_justify(simul_fval* x) {
    if (is_special(x) || f_is_zero(x)) return 0;
    UWIDE m = digits_of(x);
    if (m >> 16 == 0) {
        fputs(">>>Internal Error: Illegal float representation!\n", stderr);
        exit(1);
    }
    int shift = 96 - bit_length(m);
    if (x->exp - shift < exp_zero) {
        set_zero(x, x->sign);
        return fp_mark(FPE_UNDER);
    }
    set_digits(x, m << shift);
    x->exp -= shift;
    return 0;
}

int f_rnd_prectbl(const precise_sim_fval* table, simul_fval* out, int n) {
    int result = 0;
    for (int i = 0; i < n; ++i) {
        simul_fval* x = &out[i];
        memcpy(x->mant, table[i].mant, sizeof x->mant);
        x->exp = table[i].exp;
        x->sign = table[i].sign;
        if (table[i].mant[6] & 0x8000) {
            UWIDE m = digits_of(x) + 1;
            if (m >> 96) {
                m >>= 16;
                x->exp += 16;
            }
            set_digits(x, m);
        }
        if (x->exp >= exp_special && !is_special(x)) {
            set_inf(x, x->sign);
            fp_error |= FPE_OVER;
            result = 1;
        } else if (f_align_radix_pt(x) != 0) {
            result = 1;
        }
    }
    return result;
}
