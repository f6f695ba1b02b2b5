// A reference as dependence analysis compares it: its address as a sum of counts of iterations and of values that do
// not change in some loop around it. For dependence analysis alone.
#pragma once

#include "OPT5/dd/dependence.h"
#include "OPT5/dd/dependence_vectors.h"
#include "OPT5/dd/loop.h"
#include "OPT5/simp/linear.h"
#include "OPT5/simp/range.h"

#include <vector>

constexpr unsigned ADDRESS_BITS = 32;
constexpr int64_t ADDRESS_UNIT_BITS = 16;

// What is known of a term of the sum, wherever it stands.
struct TERM_FACTS {
    struct LOOP* counts = nullptr;   // the term is the count of iterations of this loop, from 0
    struct LOOP* fixed_in = nullptr; // the outermost loop around in which all but counts in the term keeps its value;
                                     // null: it may change in every loop
    uint64_t levels = 0;             // the term is computed from the counts of the loops of these levels
    bool is_bounded = false;         // `range` holds
    RANGE range{0, 0};
};

struct REFERENCE final : DDEPNODE {
    REFERENCE() : sum(ADDRESS_BITS) {}
    ~REFERENCE() override;

    LINEAR_FORM sum;               // of the UMULT, in address units
    std::vector<TERM_FACTS> facts; // of the terms, in their order
    std::vector<NODE*> made;       // trees that the terms are; owned
};

void make_references(struct LOOP* root); // the records of all references of the function

// What an access touches behind the address of its UMULT, in address units: from `low` up to `high`.
struct EXTENT {
    int64_t low = 0, high = 0;
};

// Takes out of the vector, whose levels are those of the loops up to `common`, what the addresses exclude. The bases
// and subscripts are taken to be fixed where they are noted to be; `pointersAreFixed`: pointers in all loops.
DDEP_PTR narrow_by_addresses(DDEP_PTR v, const REFERENCE& a, EXTENT ea, const REFERENCE& b, EXTENT eb,
                             struct LOOP* common, bool pointersAreFixed);

// While the analysis is active, more than `maxTrips` may be known of a loop.
void limit_trips(const struct LOOP* loop, WIDE most);
void forget_trip_limits();
WIDE last_iteration(const struct LOOP* loop); // the greatest count of iterations at any point in it; NO_LAST: not known
constexpr WIDE NO_LAST = WIDE(1) << 100;
// The loop around `loop`, or itself, of that level.
struct LOOP* loop_of_level(struct LOOP* loop, int level);
