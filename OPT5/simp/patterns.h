// Rewrites as data: a row of patterns.def is a text such as "(x | y) & ~y => x & ~y".
//
// The operators of a row compute in one integer type, whichever it is; compares, casts and conditions set types of
// their own. Letters stand for
//
//   x y z w   operands of that type; one that stands several times is the same value each time, and no constant
//   b         a condition
//   c d e     constants                  n m   numbers that the row's condition computes, on the right side
//   top half  the width less one, and the number with the sign bit alone
//
// and `S(x)`, `U(x)` for casts to the signed and unsigned type of the same width, `abs`, `min`, `max` for the
// operators.
// `#` is either equality, `@` any of the six relations. Operands of commutative operators and compares match in either
// order: each row is expanded into its orders when it is compiled. The right side costs no more than the left one.
//
// What the matcher sees to: an operand that is dropped or changes places has no effects; one that both sides have once,
// first of all or last of all, may have some. Constants of a shift lie within the width. Operands move, or are erased,
// with their tree. A right side of sums, differences, products or negations is computed as exact.h says, except in rows
// that say that their right side is the number that the left one was.
#pragma once

#include "OPT5/simp/rule.h"

#include <array>
#include <cstdint>
#include <vector>

namespace rules {

struct TERM {
    enum KIND : uint8_t { OPERAND, CONSTANT, NUMBER, TOP, HALF, OPERATOR };
    KIND kind = NUMBER;
    uint8_t slot = 0;  // of an operand or a constant
    bool flag = false; // SCONV to the unsigned type; ICALL of a maximum
    short op = 0;      // orders in their signed form; ICALL is a minimum or maximum
    long number = 0;
    const TERM *left = nullptr, *right = nullptr, *third = nullptr; // of QUEST the condition and the arms
};

// What a row has found, for its condition.
struct FOUND {
    enum { X, Y, Z, W, B, OPERANDS };
    enum { C, D, E, N, M, CONSTANTS };
    NODE** operand[OPERANDS] = {};
    INT65 constant[CONSTANTS];
    TYPE* type = nullptr; // of the root's operands
    struct LOOP* loop = nullptr;
};

// A row in one order of its operators.
struct PATTERN {
    int row = 0;
    const TERM *left = nullptr, *right = nullptr;
    uint32_t right_kinds = 0;  // kinds of nodes that the right operand may be
    bool keeps_number = false; // the right side is the number that the left side was
    std::array<int, FOUND::OPERANDS> on_left{}, on_right{};
    std::array<bool, FOUND::OPERANDS> must_be_pure{};
};

void compile_patterns(); // once, at the start
// The rule of all rows: null where none applies to the root, otherwise the simplified result.
NODE* by_pattern(NODE* t, struct LOOP* loop);

// ---- For tests and tools
const std::vector<PATTERN>& all_patterns();
int pattern_rows();
const char* pattern_row_text(int row);
// Where not null: rewrites by each row are counted there.
extern uint64_t* pattern_hits;

} // namespace rules
