// Minima and maxima as calls of the target's built-in functions.
#pragma once

#include "OPT5/ir/node.h"

struct LOOP;

// The call that gives what `c ? a : b` gives where c compares a with b, or null: there is no such built-in for the
// type, or the conditional is none. Everything is borrowed; a and b must have no effects.
NODE* make_minmax(const NODE* c, const NODE* a, const NODE* b, TYPE* type);
// A call of two arguments without effects that gives the smaller or the larger.
bool is_minmax_call(const NODE* t);
struct EXTREMUM {
    NODE *a = nullptr, *b = nullptr; // null: no such call of integers
    bool maximum = false;
};
EXTREMUM extremum_of(const NODE* t);
bool has_extremum(bool maximum, TYPE* type); // whether the target has one
// The simplified call on operands of `type`, which are consumed; null where the target has none.
NODE* extremum_call(bool maximum, NODE* a, NODE* b, TYPE* type, struct LOOP* loop);
NODE* minmax_of_QUEST(NODE* quest, struct LOOP* loop); // also of a clamp; or null
NODE* simp_minmax_ICALL(NODE* call, struct LOOP* loop);
NODE* simp_absolute_ICALL(NODE* call, struct LOOP* loop); // an absolute value that saturates
