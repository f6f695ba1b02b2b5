// An integer or pointer tree as a sum of terms with constant coefficients, in arithmetic that wraps at the tree's
// width. Equal terms are joined, so that what two trees have in common cancels in their difference. For this room.
#pragma once

#include "OPT5/simp/range.h"

#include <cstdint>

class LINEAR {
public:
    static constexpr int MOST_TERMS = 8, MOST_NODES = 32;
    struct TERM {
        const NODE* tree; // borrowed; its value extends by the sign of its own type
        uint64_t coef;    // modulo 2^64
    };

    // Whether the tree can be taken apart: of at most 64 bits, without effects, of moderate size.
    static bool takes(const NODE* tree);
    LINEAR(const NODE* tree, struct LOOP* in); // of a tree that it does not take, nothing is known
    void subtract(const NODE* tree);           // of the same width

    bool is_known() const { return complete; }
    bool is_constant() const;
    bool constant_is(INT65 v) const; // the constant part, modulo the width
    bool cannot_be_zero(struct LOOP* in) const;
    int term_count() const { return count; }
    const TERM& term(int i) const { return terms[i]; }
    WIDE coefficient(int i) const { return centered(terms[i].coef); } // the one nearest to zero
    WIDE constant_part() const { return centered(constant); }
    // Bounds of the sum in exact arithmetic; false where they are too wide to tell.
    bool sum_range(RANGE* r) const;

private:
    void add(const NODE* t, uint64_t coef);
    void add_term(const NODE* t, uint64_t coef);
    bool add_operator(const NODE* t, uint64_t coef);
    bool add_cast(const NODE* t, uint64_t coef);
    bool keeps_sum(const NODE* t) const; // taking the operator apart does not change the value modulo the width
    uint64_t mask() const { return bits >= 64 ? ~uint64_t(0) : (uint64_t(1) << bits) - 1; }
    WIDE centered(uint64_t v) const;

    struct LOOP* loop;
    unsigned bits = 0;
    TERM terms[MOST_TERMS];
    int count = 0, nodes_left = MOST_NODES;
    uint64_t constant = 0;
    bool complete = false;
};
