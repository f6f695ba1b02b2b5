// Signed arithmetic that stays exact. For every pass that builds trees.
//
// The rule: a signed sum, difference, product or negation of a tree never leaves its type where no operation of the
// tree that came in did. Values wrap in both, but the passes conclude from signed arithmetic that a result is the
// number itself: signs of variables, addresses as sums, factors. The language guarantees that of the program as it was
// written, and of nothing that a rewrite makes up.
//
// A rewrite whose operator gives the very number that the former one gave, over operands that are exact, keeps the rule
// by itself: (x + 1) + 2 as x + 3. One that computes another number in between does not: of (x + 1) + y the sum x + y
// may overflow. It must show by the bounds of the operands that nothing does, or compute in the unsigned type, whose
// bits are the same, or leave the tree as it is.
//
// Of shifts to the left, of ABS and of conversions nothing is concluded: they wrap. An operation whose value nobody
// uses does not count.
#pragma once

#include "OPT5/ir/node.h"

struct LOOP;

// Whether such an operation of this type counts as exact: PLUS, MINUS, MULT, UMINUS of a signed integer.
bool is_exact_by_rule(int op, const TYPE* type);

// Whether `a op b` (`b` null for UMINUS) in `type` is the number itself, or of a kind that may wrap.
bool signed_result_is_exact(int op, const NODE* a, const NODE* b, const TYPE* type, struct LOOP* loop);

// The simplified `a op b`, whose operands, of `type`, are consumed: signed where that is exact, otherwise computed in
// the unsigned type and cast.
NODE* made_exact(int op, NODE* a, NODE* b, TYPE* type, struct LOOP* loop);
// The same of a node whose operands a rewrite has changed.
NODE* kept_exact(NODE* t, struct LOOP* loop);
// The same value by unsigned operations: sums, products and negations of the tree's own type, down to what is none.
// Consumes the tree; the result has the tree's type.
NODE* as_wrapping(NODE* t, struct LOOP* loop);
