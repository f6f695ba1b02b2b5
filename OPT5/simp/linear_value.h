// The value of a tree as a linear form, and what bounds and factors say of the sum. For this room.
#pragma once

#include "OPT5/simp/linear.h"
#include "OPT5/simp/range.h"

// Modulo the tree's width. What two trees have in common cancels in their difference.
class LINEAR_VALUE {
public:
    // Whether the tree can be taken apart: of at most 64 bits, without effects, of moderate size.
    static bool takes(const NODE* tree);
    LINEAR_VALUE(const NODE* tree, struct LOOP* in); // of a tree that it does not take, nothing is known
    void subtract(const NODE* tree);                 // of the same width

    bool is_known() const { return complete; }
    bool is_constant() const { return complete && form.is_constant(); }
    bool constant_is(INT65 v) const; // the constant part, modulo the width
    bool cannot_be_zero() const;
    const LINEAR_FORM& sum() const { return form; }
    // Bounds of the sum in exact arithmetic; false where they are too wide to tell.
    bool sum_range(RANGE* r) const;

private:
    void read(const NODE* tree, int64_t coefficient);

    struct LOOP* loop;
    LINEAR_FORM form;
    bool complete;
};
