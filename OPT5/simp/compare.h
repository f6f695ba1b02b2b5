// Compares of integers with constants, as the families of compares and of logical operators share them.
#pragma once

#include "OPT5/ir/node.h"

struct LOOP;

// Whether the integer x lies from `low` to `high`, or whether it does not, as an `int`; consumes x.
NODE* compare_with_interval(NODE* x, INT65 low, INT65 high, bool inside, struct LOOP* loop);
// The compare of a quotient, remainder, shift or product with a constant as a compare of its operand, or null.
NODE* compare_computed(NODE* t, struct LOOP* loop);
NODE* join_compares(NODE* t, struct LOOP* loop); // of two compares under ANDB or ORB one, or null
// The same of two conditions under ANDAND or OROR that look at one value or one pair of values, the second of which is
// evaluated in any case.
NODE* join_tests_of_one_value(NODE* t, struct LOOP* loop);
