// What may be an operand of the multiply-accumulate calls, by their forms:
//
//     __parallel_mpy_add, _sub              s16 UMULT, s16 or s16 constant, s32 register, s32 register, PM constant
//     __parallel_sqr_add, _sub              s16 UMULT, s32 register, s32 register, PM constant
//     __parallel_mpy_add_s32_lo, _hi, ...   s32 UMULT, s32, s32 register, s32 register, PM constant
//     __parallel_mpy_add_f32, _f64          both f32, f64 UMULT or neither, register, register
//     __dmac                                s32 UMULT, s32 UMULT, s32 register, s32 register, PM constant
#pragma once

#include "OPT5/ir/node.h"

// Of a signed or floating type of so many bits.
bool is_an_s16_operand(const NODE* opd);
bool is_an_s32_operand(const NODE* opd);
bool is_an_s64_operand(const NODE* opd);
bool is_an_f32_operand(const NODE* opd);
bool is_an_f64_operand(const NODE* opd);
// From memory.
bool is_an_s16_UMULT_operand(const NODE* opd);
bool is_an_s32_UMULT_operand(const NODE* opd);
bool is_an_f32_UMULT_operand(const NODE* opd);
bool is_an_f64_UMULT_operand(const NODE* opd);
// A register that the call reads and writes: ARGREF of its name.
bool is_an_s32_RW_register_operand(const NODE* opd);
// A constant that fits 16 bits; it may have been converted to 32 already.
bool is_an_s16_constant_operand(const NODE* opd);
// The shift of a product: -1 to 6; with `narrow` to 2.
bool is_an_s16_PM_constant_operand(const NODE* opd, bool narrow);
