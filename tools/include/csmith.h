/* What a program made by csmith asks of its platform, for 16-bit int.

   The "8-bit" types have 16 bits, the least the target has. Arithmetic that C leaves undefined gives the left operand
   instead; the rest is done in the unsigned type, wide enough not to be promoted to a signed one. */
#ifndef _CSMITH_H
#define _CSMITH_H

#include <stdint.h>
#include <stdio.h>
#include <string.h>
#include <zrun.h>

typedef signed char int8_t;
typedef unsigned char uint8_t;

/* NAME of the type, its unsigned type, its least value, its width in bits. */
#define CSMITH_SIGNED(NAME, UNSIGNED, MIN, BITS)                                                                    \
    static NAME##_t safe_unary_minus_func_##NAME##_t_s(NAME##_t a) { return a == MIN ? a : (NAME##_t)-a; }          \
    static NAME##_t safe_add_func_##NAME##_t_s_s(NAME##_t a, NAME##_t b) { return (UNSIGNED)a + (UNSIGNED)b; }      \
    static NAME##_t safe_sub_func_##NAME##_t_s_s(NAME##_t a, NAME##_t b) { return (UNSIGNED)a - (UNSIGNED)b; }      \
    static NAME##_t safe_mul_func_##NAME##_t_s_s(NAME##_t a, NAME##_t b) { return (UNSIGNED)a * (UNSIGNED)b; }      \
    static NAME##_t safe_div_func_##NAME##_t_s_s(NAME##_t a, NAME##_t b)                                            \
    { return b == 0 || (a == MIN && b == -1) ? a : a / b; }                                                         \
    static NAME##_t safe_mod_func_##NAME##_t_s_s(NAME##_t a, NAME##_t b)                                            \
    { return b == 0 || (a == MIN && b == -1) ? a : a % b; }                                                         \
    static NAME##_t safe_lshift_func_##NAME##_t_s_s(NAME##_t a, int b)                                              \
    { return a < 0 || b < 0 || b >= BITS ? a : (UNSIGNED)a << b; }                                                  \
    static NAME##_t safe_lshift_func_##NAME##_t_s_u(NAME##_t a, unsigned int b)                                     \
    { return a < 0 || b >= BITS ? a : (UNSIGNED)a << b; }                                                           \
    static NAME##_t safe_rshift_func_##NAME##_t_s_s(NAME##_t a, int b)                                              \
    { return a < 0 || b < 0 || b >= BITS ? a : a >> b; }                                                            \
    static NAME##_t safe_rshift_func_##NAME##_t_s_u(NAME##_t a, unsigned int b)                                     \
    { return a < 0 || b >= BITS ? a : a >> b; }

#define CSMITH_UNSIGNED(NAME, BITS)                                                                                 \
    static NAME##_t safe_unary_minus_func_##NAME##_t_u(NAME##_t a) { return 0 - a; }                                \
    static NAME##_t safe_add_func_##NAME##_t_u_u(NAME##_t a, NAME##_t b) { return a + b; }                          \
    static NAME##_t safe_sub_func_##NAME##_t_u_u(NAME##_t a, NAME##_t b) { return a - b; }                          \
    static NAME##_t safe_mul_func_##NAME##_t_u_u(NAME##_t a, NAME##_t b) { return a * b; }                          \
    static NAME##_t safe_div_func_##NAME##_t_u_u(NAME##_t a, NAME##_t b) { return b == 0 ? a : a / b; }             \
    static NAME##_t safe_mod_func_##NAME##_t_u_u(NAME##_t a, NAME##_t b) { return b == 0 ? a : a % b; }             \
    static NAME##_t safe_lshift_func_##NAME##_t_u_s(NAME##_t a, int b) { return b < 0 || b >= BITS ? a : a << b; }  \
    static NAME##_t safe_lshift_func_##NAME##_t_u_u(NAME##_t a, unsigned int b) { return b >= BITS ? a : a << b; }  \
    static NAME##_t safe_rshift_func_##NAME##_t_u_s(NAME##_t a, int b) { return b < 0 || b >= BITS ? a : a >> b; }  \
    static NAME##_t safe_rshift_func_##NAME##_t_u_u(NAME##_t a, unsigned int b) { return b >= BITS ? a : a >> b; }

CSMITH_SIGNED(int8, unsigned int, INT16_MIN, 16)
CSMITH_SIGNED(int16, unsigned int, INT16_MIN, 16)
CSMITH_SIGNED(int32, unsigned long, INT32_MIN, 32)
CSMITH_SIGNED(int64, unsigned long long, INT64_MIN, 64)
CSMITH_UNSIGNED(uint8, 16)
CSMITH_UNSIGNED(uint16, 16)
CSMITH_UNSIGNED(uint32, 32)
CSMITH_UNSIGNED(uint64, 64)

/* Not the polynomial that the name tells: a mix in which each bit counts, and which costs little to run. */
static unsigned long crc32_context = 0xFFFFFFFFUL;

static void csmith_mix(unsigned long word)
{
    crc32_context = ((crc32_context << 5) | (crc32_context >> 27)) * 0x9E3779B1UL ^ word;
}

static void transparent_crc(unsigned long long value, const char *name, int print)
{
    csmith_mix((unsigned long)value);
    csmith_mix((unsigned long)(value >> 32));
    if (print) {
        put_str(name);
        put_u32(crc32_context);
    }
}

static void transparent_crc_bytes(const char *at, int count, const char *name, int print)
{
    int i;
    for (i = 0; i < count; i++) csmith_mix((unsigned int)at[i]);
    if (print) {
        put_str(name);
        put_u32(crc32_context);
    }
}

static void platform_main_begin(void) {}
static void crc32_gentab(void) {}
static void platform_main_end(unsigned long crc, int print)
{
    (void)print;
    put_u32(crc);
}

#endif
