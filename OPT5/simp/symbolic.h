// Questions about the value of an integer tree that hold whatever its variables hold: bounds, signs, factors, overflow.
//
// Trees are borrowed and never changed, but by the last group. Values are the target's: arithmetic wraps at the width
// of the operator's type, so that nothing is concluded from the absence of overflow unless a function says so.
//
// "Don't know" is the safe answer: false of a predicate, the limits of the type of a bound, 1 of a factor. Every answer
// holds for each evaluation of the tree that has no undefined operation (a division by zero, an overlong shift). Of a
// tree that is no integer or enumeration of at most 64 bits nothing is known.
//
// `loop`, where not null, is the loop that the tree stands in: the facts that hold there and in the loops around it are
// used; otherwise those of the current function. A question looks at a bounded number of nodes, so that asking at every
// node of a tree stays linear.
#pragma once

#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/node.h"

#include <cstdint>
#include <vector>

class BBLK;
class SYMTAB;
struct LOOP;

// ---- Bounds, both attained or not; the lower is never above the upper.
INT65 calculate_minval_for_tree(const NODE* tree, struct LOOP* loop);
INT65 calculate_maxval_for_tree(const NODE* tree, struct LOOP* loop);
// Both at once; false, and nothing stored, for what is no integer. The form for `type_ops_callbacks` and
// `bif_callbacks`.
bool calculate_bounds(const NODE* tree, struct LOOP* loop, INT65* min, INT65* max);

// The values that variables may have at the point of the program that is looked at, as whoever stands there knows them:
// bounds take them in. Null at other times.
class VARIABLE_VALUES {
public:
    virtual ~VARIABLE_VALUES() = default;
    virtual bool bounds_of_variable(const SYMTAB* sym, INT65* min, INT65* max) const = 0; // false: its type's
    // Of an integer tree that is evaluated here, whose signed sums and products are the numbers themselves, as a pass may
    // conclude that puts another tree in its place.
    virtual bool bounds_of_tree(const NODE* tree, INT65* min, INT65* max) const = 0;
};
extern const VARIABLE_VALUES* values_of_variables;
// Who walks over the statements of the current function in order, and says so ahead of each before it changes it, has the
// values there. Null until the room that knows is there.
struct VALUE_WALK {
    void (*begin)() = nullptr;
    void (*at)(const BBLK* bb, const NODE* statement) = nullptr;
    void (*end)() = nullptr;
};
extern VALUE_WALK value_walk;

// ---- Sign and zero
bool tree_is_non_negative(const NODE* tree, struct LOOP* loop);
bool tree_is_negative(const NODE* tree, struct LOOP* loop);
bool tree_is_positive(const NODE* tree, struct LOOP* loop);
bool tree_is_zero(const NODE* tree, struct LOOP* loop);
bool tree_is_non_zero(const NODE* tree, struct LOOP* loop);
// 1 positive, or not negative where `non_negative_counts`; -1 negative; 0 not known.
int sign_of_integer_expression(const NODE* tree, struct LOOP* loop, bool non_negative_counts);

// ---- Values. Of two trees: both evaluated at one point of the program. A difference is taken as the target takes it,
// wrapping at the width of the trees, which must be the same; pointers have one too.
bool tree_is_ivalue(const NODE* tree, INT65 value, struct LOOP* loop);
bool tree_is_not_ivalue(const NODE* tree, INT65 value, struct LOOP* loop);
bool tree_difference_is_ivalue(const NODE* a, const NODE* b, INT65 value, struct LOOP* loop);
bool tree_values_are_not_equal(const NODE* a, const NODE* b, struct LOOP* loop);

// Of two conditions evaluated on the same values: what `q` is where `p` has the truth value `holds`, by the numbers that
// this leaves of what they read. 1 true, 0 false, -1 not known.
int outcome_under(const NODE* p, bool holds, const NODE* q, struct LOOP* loop);

// ---- Factors
// The largest constant that is known to divide the value: at least 1. A value that is zero for certain gives the
// highest power of two in its type. With `no_signed_overflow` signed sums and products are taken to be exact, as the
// language guarantees; without, an odd factor only stays where the bounds show that nothing wraps.
INT65 max_ICON_factor(const NODE* tree, struct LOOP* loop, bool no_signed_overflow = false);
// The greatest common divisor of the constant coefficients of the tree's terms, from its shape alone: at least 1; 0
// where every term is zero. What it divides is the tree as a formula: the value itself only if no operation wraps.
INT65 max_ICON_coef(const NODE* tree);
// Consumes the tree and simplifies what changes. Each coefficient is divided by `value`, which must divide
// `max_ICON_coef`: the result times `value` is the tree, in arithmetic that wraps.
NODE* div_ICON_coef(NODE* tree, INT65 value);
// Whether `value` (not 0) divides the tree's value as converted to `type`.
bool constant_divides_expr(INT65 value, TYPE* type, const NODE* tree, struct LOOP* loop);
// The largest constant that divides the difference of any two values that the tree has in `loop` (at all, for null).
INT65 max_ICON_delta(const NODE* tree, struct LOOP* loop);
// The largest factor that facts about this very tree assert: at least 1.
INT65 max_asserted_ICON_factor(const NODE* tree, struct LOOP* loop);
bool integer_DIV_is_exact(const NODE* tree, struct LOOP* loop);                // DIV without a remainder
bool expr_cannot_divide_expr(const NODE* a, const NODE* b, struct LOOP* loop); // no multiple of a is b
// The tree's value as converted to `type`, modulo `value` (above 0): from 0 to value - 1; -1 where that isn't known.
INT65 expr_modulo_constant(const NODE* tree, TYPE* type, INT65 value, struct LOOP* loop);
// Whether the value, if it is positive, is a power of two.
bool positive_tree_is_power_of_2(const NODE* tree, struct LOOP* loop);

// ---- Overflow
bool expr_product_may_overflow(const NODE* tree, struct LOOP* loop); // also true of what is no MULT of integers

// ---- Partial evaluation
// A new tree without the parts that vary in `loop`, whose value is never below (above) the tree's in any iteration.
// Parts are replaced by their bounds. Null if a part that varies is no integer; where `must_be_bounded`, also if it has
// no better bound than its type's.
NODE* partially_eval_for_maximum(const NODE* tree, struct LOOP* loop, bool must_be_bounded);
NODE* partially_eval_for_minimum(const NODE* tree, struct LOOP* loop, bool must_be_bounded);
// Consumes the tree, whose value is known to be one of low, low + step, ... up to high; the result has that value
// wherever that is so. `step` is above 0.
NODE* simp_tree_in_range(NODE* tree, INT65 low, INT65 high, INT65 step);

// ---- Helpers
uint32_t clp2(uint32_t v); // the least power of two that is not below v; 0 where that has no 32 bits, and of 0
uint32_t uint_gcd(uint32_t a, uint32_t b);
uint32_t uint_lcm(uint32_t a, uint32_t b);               // 0 if one is 0, or where it has no 32 bits
int compare_SLLONG_values(INT65 a, INT65 b, TYPE* type); // -1, 0, 1: both as `type` holds them

void install_symbolic_callbacks(); // once: other rooms' questions are answered here

