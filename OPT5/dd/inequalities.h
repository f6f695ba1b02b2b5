// Systems of linear inequalities over integers: bounds of one variable over all solutions of the others.
//
// Variables are eliminated one by one (Fourier and Motzkin), and each inequality is tightened to the integers that it
// allows. What is found holds for every solution in integers; there may be none although bounds are found.
#pragma once

#include "OPT5/simp/range.h"

#include <array>
#include <vector>

class INEQUALITIES {
public:
    static constexpr int MOST_VARIABLES = 24;
    static constexpr WIDE NO_BOUND = WIDE(1) << 100;

    struct TERM {
        int variable;
        WIDE by;
    };
    using SUM = std::vector<TERM>; // a variable may be there twice

    int add_variable(WIDE low = -NO_BOUND, WIDE high = NO_BOUND);
    void add(const SUM& sum, WIDE constant);          // sum + constant >= 0
    void add_equality(const SUM& sum, WIDE constant); // sum + constant == 0
    // Narrows the bounds by what the system says of the variable; false: there is no solution. `work` is what may still
    // be spent: with nothing left nothing is found out.
    bool bound(int variable, WIDE* low, WIDE* high, long* work) const;
    // What could not be written down (too many variables, too large numbers) is left out: the system then says less.
private:
    struct ROW {
        std::array<int64_t, MOST_VARIABLES> by{};
        int64_t constant = 0;
    };
    using ROWS = std::vector<ROW>;
    class ELIMINATION;

    static bool make(const SUM& sum, WIDE constant, ROW* row);

    int variables = 0;
    ROWS rows, equalities;
};
