// Target floating point in software. No operation uses the host's floating types for its result, `f_ftoh` excepted.
//
// A simul_fval is a base-65536 number of six digits, (mant[0] + mant[1]/65536 + ...) * 2^(exp - 16), with exp a
// multiple of 16 and mant[0] not 0 (the aligned form, which every operation returns): 81 to 96 significant bits. Zero
// has exp -32767, infinity exp 32767 with mant[0] 0, NaN exp 32767 with mant[0] not 0.
//
// A result that does not fit the digits is rounded to odd: cut off, with the last bit set. Since the digits hold more
// than two bits beyond a double, rounding such a value to a float or a double of the target gives what rounding the
// exact result once would give. Rounding to nearest twice would not.
//
// Operations take pointers, and the result may be an operand. They return 0, or a non-zero value when they left a bit
// in `fp_error`, which only the caller clears.
#pragma once

#include <cstdint>
#include <cstdio>
#include <mutex>
#include <string>

class TYPE;

struct simul_fval {
    uint16_t mant[6];
    int32_t exp;
    int32_t sign; // 1 for negative
};

struct trg_fval {
    uint32_t w[2]; // float: w[0]; double: w[0] the high word, w[1] the low
};

struct precise_sim_fval {
    uint16_t mant[7]; // the seventh is the rounding word
    uint16_t pad;
    int32_t exp;
    int32_t sign;
};

enum FP_ERROR { FPE_INVALID = 1, FPE_DIVIDE = 2, FPE_OVER = 4, FPE_UNDER = 8 };
extern thread_local int fp_error; // of the thread that computes
extern std::mutex atof_lock;      // held by callers of the text conversions' static buffers

extern const simul_fval pos_zero, neg_zero, pos_infin, neg_infin, a_nan, pos_huge, neg_huge, const_one, const_ten,
    const_sixteen, const_dig[16], one_q, one_half, three_q, one, neg_one, one_p_five, two, neg_two, four;

// ---- Representation
int f_align_radix_pt(simul_fval* x);
int f_left_justify(simul_fval* x); // top bit of mant[0] set, a form for use within the simulator
int f_rnd_prectbl(const precise_sim_fval* table, simul_fval* out, int n);
bool f_is_zero(const simul_fval* x);
bool f_is_nan(const simul_fval* x);
bool f_is_inf(const simul_fval* x);

// ---- Integers
int f_itof(long v, simul_fval* x);
int f_utof(unsigned long v, simul_fval* x);
int f_ftoi(const simul_fval* x, long* v);
int f_ftou(const simul_fval* x, unsigned long* v);
int f_int(const simul_fval* x, int* v);
int f_xtof(const uint8_t* bytes, simul_fval* x); // 16 bytes of an XINT
int f_ftox(const simul_fval* x, uint8_t* bytes);
int f_trunc(const simul_fval* x, simul_fval* r);
int f_round(const simul_fval* x, simul_fval* r);
int f_floor(const simul_fval* x, simul_fval* r);
int f_ceil(const simul_fval* x, simul_fval* r);
int f_modf(const simul_fval* x, simul_fval* whole, simul_fval* r); // r the fraction

// ---- Arithmetic and compare
int f_add(const simul_fval* a, const simul_fval* b, simul_fval* r);
int f_sub(const simul_fval* a, const simul_fval* b, simul_fval* r);
int f_mul(const simul_fval* a, const simul_fval* b, simul_fval* r);
int f_div(const simul_fval* a, const simul_fval* b, simul_fval* r);
int f_neg(const simul_fval* a, simul_fval* r);
int f_abs(const simul_fval* a, simul_fval* r);
int f_sqrt(const simul_fval* a, simul_fval* r);
int f_fmod(const simul_fval* a, const simul_fval* b, simul_fval* r);
const simul_fval* f_max(const simul_fval* a, const simul_fval* b, int flag); // flag non-zero: a NaN operand loses
const simul_fval* f_min(const simul_fval* a, const simul_fval* b, int flag);
int f_sgn(const simul_fval* a); // -1, 0 or 1
int f_cvf(const simul_fval* a, simul_fval* r);
int f_eq(const simul_fval* a, const simul_fval* b);
int f_ne(const simul_fval* a, const simul_fval* b);
int f_lt(const simul_fval* a, const simul_fval* b);
int f_le(const simul_fval* a, const simul_fval* b);
int f_gt(const simul_fval* a, const simul_fval* b);
int f_ge(const simul_fval* a, const simul_fval* b);
int f_bit_eq(const simul_fval* a, const simul_fval* b);
int f_findexp(const simul_fval* x); // e with 2^e <= |x| < 2^(e+1)
int f_ldexp(const simul_fval* x, int n, simul_fval* r);
int f_frexp(const simul_fval* x, int* n, simul_fval* r);

// ---- Elementary functions, right to the target double in the ordinary range
int f_exp(const simul_fval* x, simul_fval* r);
int f_log(const simul_fval* x, simul_fval* r);
int f_log10(const simul_fval* x, simul_fval* r);
int f_pow(const simul_fval* x, const simul_fval* y, simul_fval* r);
int f_sin(const simul_fval* x, simul_fval* r);
int f_cos(const simul_fval* x, simul_fval* r);
int f_tan(const simul_fval* x, simul_fval* r);
int f_asin(const simul_fval* x, simul_fval* r);
int f_acos(const simul_fval* x, simul_fval* r);
int f_atan(const simul_fval* x, simul_fval* r);
int f_atan2(const simul_fval* y, const simul_fval* x, simul_fval* r);
int f_sinh(const simul_fval* x, simul_fval* r);
int f_cosh(const simul_fval* x, simul_fval* r);
int f_tanh(const simul_fval* x, simul_fval* r);

// ---- Text
int f_atof(const char* text, simul_fval* x);
int f_ftoa(char* out, const char* format, const simul_fval* x); // `out` must have room for the text; %e %f %g %a
int f_f2ascii(char* out, int width, int precision, char conversion, const simul_fval* x);
char* f_ecvt(const simul_fval* x, int n, int* decpt, int* sign); // static buffer
char* f_fcvt(const simul_fval* x, int n, int* decpt, int* sign);
char* f_acvt(const simul_fval* x, int n, int* exp2, int* sign);
char* f_utoa(unsigned long v, char* out, int radix);
void f_print(const simul_fval* x);
void f_dbg(const char* text, const simul_fval* x);
char* normalize_fcon(const char* text, int flag); // canonical literal on the heap (malloc), the caller frees it

// ---- Target formats
int f_cvt_stot(const simul_fval* x, trg_fval* t, int is_double);
int f_cvt_ttos(const trg_fval* t, simul_fval* x, int is_double);
int ieee_cvt_ftos(uint32_t bits, simul_fval* x);
int ieee_cvt_dtos(uint32_t hi, uint32_t lo, simul_fval* x);
int ieee_cvt_stof(const simul_fval* x, uint32_t* bits);
int ieee_cvt_stod(const simul_fval* x, uint32_t* hi, uint32_t* lo);
uint32_t get_ieee_flt_fmt(const simul_fval* x);
uint64_t get_ieee_dbl_fmt(const simul_fval* x);
// Rounds `x` to a value of the target: single precision where the type is 32 bits wide, double precision otherwise.
int truncate_fval_to_target(simul_fval* x, const TYPE* type);
int f_ftoh(const simul_fval* x, double* out); // the one host conversion, for printing and estimates
