// Bounds of integer trees, as the questions about values compute them. For this room.
#pragma once

#include "OPT5/ir/node.h"

#include <algorithm>
#include <utility>

struct LOOP;

// Wide enough that sums and products of two bounds of 64 bits are exact or tell that they are not.
using WIDE = __int128;

struct RANGE {
    WIDE min, max; // min <= max
    bool is(WIDE v) const { return min == v && max == v; }
    bool holds(WIDE v) const { return min <= v && v <= max; }
    bool is_within(const RANGE& o) const { return o.min <= min && max <= o.max; }
    bool operator==(const RANGE& o) const { return min == o.min && max == o.max; }
};
inline RANGE hull(const RANGE& a, const RANGE& b) { return {std::min(a.min, b.min), std::max(a.max, b.max)}; }
// Both hold; `a` where they contradict each other.
inline RANGE both(const RANGE& a, const RANGE& b) {
    const RANGE r{std::max(a.min, b.min), std::min(a.max, b.max)};
    return r.min <= r.max ? r : a;
}

WIDE to_wide(INT65 v);
INT65 to_int65(WIDE v); // of a value in its range

// Of numbers without bounds: the greatest common divisor, which is not negative, and quotients by a b above 0.
inline WIDE gcd_of(WIDE a, WIDE b) {
    if (a < 0) a = -a;
    if (b < 0) b = -b;
    if (a == 1 || b == 1) return 1;
    while (b) std::swap(a %= b, b);
    return a;
}
inline WIDE floor_div(WIDE a, WIDE b) {
    if (b == 1) return a;
    return a >= 0 ? a / b : -((-a + b - 1) / b);
}
inline WIDE ceil_div(WIDE a, WIDE b) { return -floor_div(-a, b); }

// An integer or enumeration of 1 to 64 bits; `wchar_t` has no known sign.
inline bool has_value_range(const TYPE* t) {
    return (t->is_int() || t->is_enum()) && !t->is_wchar() && t->size >= 1 && t->size <= 64;
}
// Of those an integer: no enumeration, no truth value.
inline bool is_integer_with_range(const TYPE* t) { return has_value_range(t) && !t->is_enum() && !t->is_bool(); }
inline bool wraps_signed(const TYPE* t) { return !t->is_bool() && !t->is_unsigned(); } // of such a type
// The values that a variable of the type can have. An enumeration may hold values of either sign.
inline RANGE range_of_type(const TYPE* t) {
    const WIDE turn = WIDE(1) << t->size;
    if (t->is_bool()) return {0, 1};
    if (t->is_enum()) return {-turn / 2, turn - 1};
    return wraps_signed(t) ? RANGE{-turn / 2, turn / 2 - 1} : RANGE{0, turn - 1};
}
// What is left of exact results from `min` to `max` once they are wrapped into the type.
RANGE wrapped(WIDE min, WIDE max, const TYPE* t);
RANGE range_of_tree(const NODE* tree, struct LOOP* loop); // of a tree whose type has a range
// The values from `r.min` to `r.max` that may compare so with one of `c`'s; `r` where none does.
RANGE narrowed(const RANGE& r, int op, const RANGE& c);
// Whether an operation over exact operands (PLUS, MINUS, MULT, UMINUS, SLL) stays within its type.
bool operation_is_exact(const NODE* tree, struct LOOP* loop);
bool operation_is_exact(int op, const NODE* a, const NODE* b, const TYPE* type, struct LOOP* loop); // b null for UMINUS

// Calls `visit(condition, holds)` for conditions known in the loop and those around it, or in the function; of a
// conjunction for its parts. `holds` tells whether the condition or its opposite is known.
template <class VISIT>
void for_each_given(struct LOOP* loop, VISIT&& visit);

// Whether `a` is `b`, and both have one value wherever they stand.
bool is_same_value(const NODE* a, const NODE* b);

// Neither writes nor reads what is volatile, and has few enough nodes to have been looked at.
bool is_small_and_pure(const NODE* t);
bool is_pure_within(const NODE* t, int* nodes_left); // counts the nodes that it looks at

const NODE* without_wrappers(const NODE* t); // SSA operators and marks that stand for their operand

#include "OPT5/simp/givens.h"
