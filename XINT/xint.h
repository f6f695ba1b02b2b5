// XINT: a 128-bit two's complement integer in 16 bytes, big-endian, the bridge between simulated floats and integers.
// Every operation takes pointers to 16 bytes; the result may be an operand. Errors come back as a non-zero result.
#pragma once

#include <cstdint>
#include <cstdio>

using XINT = uint8_t[16];

extern const XINT xi_zero, xi_one, xi_ten, xi_negone, xi_not1f, xi_minint, xi_maxint, xi_32bitmask;
extern const XINT xi_dig[10];
extern int xi_error; // set when a shift loses the sign

int XI_add(const uint8_t* a, const uint8_t* b, uint8_t* r); // returns the carry out of byte 0
int XI_sub(const uint8_t* a, const uint8_t* b, uint8_t* r);
int XI_neg(const uint8_t* a, uint8_t* r);
int XI_and(const uint8_t* a, const uint8_t* b, uint8_t* r);
int XI_or(const uint8_t* a, const uint8_t* b, uint8_t* r);
int XI_xor(const uint8_t* a, const uint8_t* b, uint8_t* r);
int XI_notb(const uint8_t* a, uint8_t* r);
int XI_mpy(const uint8_t* a, const uint8_t* b, uint8_t* r); // overflow: xi_maxint or xi_minint, and 1
int XI_div(const uint8_t* a, const uint8_t* b, uint8_t* r); // zero divisor: xi_maxint or xi_minint, and 1
int XI_mod(const uint8_t* a, const uint8_t* b, uint8_t* r);
int XI_shl(const uint8_t* a, int n, uint8_t* r);
int XI_shr(const uint8_t* a, int n, uint8_t* r);
int XI_size(const uint8_t* a); // bits to hold the value with its sign; 1 for 0 and -1
int XI_cmp(const uint8_t* a, const uint8_t* b);
int XI_eq(const uint8_t* a, const uint8_t* b);
int XI_ne(const uint8_t* a, const uint8_t* b);
int XI_lt(const uint8_t* a, const uint8_t* b);
int XI_le(const uint8_t* a, const uint8_t* b);
int XI_gt(const uint8_t* a, const uint8_t* b);
int XI_ge(const uint8_t* a, const uint8_t* b);
void XI_asg(const uint8_t* a, uint8_t* r);
void XI_itox(int32_t v, uint8_t* r);
void XI_llitox(int64_t v, uint8_t* r);
void XI_utox(uint32_t v, uint8_t* r);
void XI_llutox(uint64_t v, uint8_t* r);
int32_t XI_xtoi(const uint8_t* a); // low bits
int64_t XI_xtolli(const uint8_t* a);
uint32_t XI_xtou(const uint8_t* a);
uint64_t XI_xtollu(const uint8_t* a);
void XI_dump(const uint8_t* a);
