/* float is IEEE single, long double IEEE double, and double the one under the legacy ABI, the other under the new. */
#ifndef _FLOAT_H
#define _FLOAT_H

#define FLT_RADIX 2
#define FLT_ROUNDS 1
#define FLT_EVAL_METHOD 0
#define DECIMAL_DIG 17

#define FLT_MANT_DIG 24
#define FLT_DIG 6
#define FLT_MIN_EXP (-125)
#define FLT_MIN_10_EXP (-37)
#define FLT_MAX_EXP 128
#define FLT_MAX_10_EXP 38
#define FLT_EPSILON 0x1p-23f
#define FLT_MIN 0x1p-126f
#define FLT_MAX 0x1.fffffep+127f

#define LDBL_MANT_DIG 53
#define LDBL_DIG 15
#define LDBL_MIN_EXP (-1021)
#define LDBL_MIN_10_EXP (-307)
#define LDBL_MAX_EXP 1024
#define LDBL_MAX_10_EXP 308
#define LDBL_EPSILON 0x1p-52L
#define LDBL_MIN 0x1p-1022L
#define LDBL_MAX 0x1.fffffffffffffp+1023L

#if __ZELKOVA_EABI__
#define DBL_MANT_DIG 53
#define DBL_DIG 15
#define DBL_MIN_EXP (-1021)
#define DBL_MIN_10_EXP (-307)
#define DBL_MAX_EXP 1024
#define DBL_MAX_10_EXP 308
#define DBL_EPSILON 0x1p-52
#define DBL_MIN 0x1p-1022
#define DBL_MAX 0x1.fffffffffffffp+1023
#else
#define DBL_MANT_DIG 24
#define DBL_DIG 6
#define DBL_MIN_EXP (-125)
#define DBL_MIN_10_EXP (-37)
#define DBL_MAX_EXP 128
#define DBL_MAX_10_EXP 38
#define DBL_EPSILON 0x1p-23
#define DBL_MIN 0x1p-126
#define DBL_MAX 0x1.fffffep+127
#endif

#endif
