// What the multiply-accumulate hardware can take: which variables are accumulators, which trees are products for them.
//
// A product counts where one factor comes from memory, the other one from anywhere, in 16 by 16 or 32 by 32 bits, or in
// the formats of the floating-point unit. A product mode shifts it before it is added: by one to the left (-1), not, or
// by up to six to the right; of the high half of a 32 by 32 product by 32 to 38.
#pragma once

#include "OPT5/ir/node.h"
#include "OPT5/ir/symtab.h"

bool is_a_zelkova_accumulator_type(const TYPE* type, bool allow_s16);
bool is_a_likely_zelkova_register(const SYMTAB* sym); // nothing keeps the symbol out of a register
bool is_a_likely_zelkova_accumulator(const SYMTAB* sym, bool allow_s16);
bool is_a_likely_zelkova_accumulator(const NODE* t, bool allow_s16); // the NAME of such a symbol

// The operand of a shift that is a product mode, which is stored; the tree itself where there is none, or where `shift`
// isn't 0.
const NODE* strip_left_shift(const NODE* t, int* shift);
const NODE* strip_right_shift(const NODE* t, int* shift);

// The part of the tree that the hardware multiplies, or null; `strip` allows a product mode above it.
const NODE* get_mpy_for_zelkova_mac(const NODE* t, bool strip);
bool is_a_likely_mpy_for_zelkova_mac(const NODE* t, bool strip);
bool has_a_likely_mpy_for_zelkova_mac(const NODE* t, TYPE* type); // also in a sum of terms of `type`

// acc += m or acc -= m of an accumulator that m does not use: of a product m, or of an m that contains one.
bool is_a_likely_serial_zelkova_mac(const NODE* stmt);
bool has_a_likely_serial_zelkova_mac(const NODE* stmt);

// acc = acc + m becomes acc += m. Consumes the statement; another comes back as it is.
NODE* normalize_zelkova_accumulation(NODE* stmt);
