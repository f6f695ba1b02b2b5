// A reference as dependence analysis compares it: its address as a sum of counts of iterations and of values that do
// not change in some loop around it. For dependence analysis alone.
#pragma once

#include "OPT5/dd/dependence.h"
#include "OPT5/dd/dependence_vectors.h"
#include "OPT5/dd/loop.h"
#include "OPT5/simp/linear.h"
#include "OPT5/simp/range.h"

#include <memory>
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
    WIDE modulus = 0, residue = 0; // above 0: the term is `residue` modulo that
};

// Of loops deeper than that nothing is known of what is computed from their counts.
constexpr int MOST_LEVELS = 60;
inline uint64_t level_bit(int level) { return level < MOST_LEVELS ? uint64_t(1) << level : 0; }

struct REFERENCE final : DDEPNODE {
    REFERENCE() : sum(ADDRESS_BITS) {}
    ~REFERENCE() override;

    LINEAR_FORM sum;               // of the UMULT, in address units
    std::vector<TERM_FACTS> facts; // of the terms, in their order
    std::vector<NODE*> made;       // trees that the terms are; owned
};

void make_references(struct LOOP* root); // the records of all references of the function, and what is below

// What holds of a sum of integers and addresses in all iterations of a loop.
struct GIVEN {
    GIVEN() : sum(std::make_unique<REFERENCE>()) {}

    std::unique_ptr<REFERENCE> sum; // no reference: the sum alone
    std::vector<RANGE> ranges;      // it lies in one of these: one or two
    WIDE modulus = 0, residue = 0;  // or, with a modulus above 0: it is `residue` modulo that
};
const std::vector<GIVEN>& givens_for_references(const struct LOOP* loop);
void add_given_for_references(const struct LOOP* loop, GIVEN given);

// A condition as one on a difference: `left` less `right` lies in the ranges, or is that modulo the modulus. The trees
// are parts of the condition, `right` may be null. False where it is none.
struct RELATION {
    const NODE *left = nullptr, *right = nullptr;
    std::vector<RANGE> ranges;
    WIDE modulus = 0, residue = 0;
};
bool relation_of(const NODE* condition, bool holds, RELATION* r);
constexpr WIDE FAR = WIDE(1) << 100; // of a bound: none

// What an access touches behind the address of its UMULT, in address units: from `low` up to `high`.
struct EXTENT {
    int64_t low = 0, high = 0;
};

// Takes out of the vector, whose levels are those of the loops up to `common`, what the addresses exclude. The bases
// and subscripts are taken to be fixed where they are noted to be; `pointersAreFixed`: pointers in all loops.
DDEP_PTR narrow_by_addresses(DDEP_PTR v, const REFERENCE& a, EXTENT ea, const REFERENCE& b, EXTENT eb,
                             struct LOOP* common, bool pointersAreFixed);
// The same by what relates the terms: givens, bounds of loops by counts of others, products with an invariant. `low`
// and `high` are the differences of the two addresses at which the accesses overlap.
DDEP_PTR narrow_by_givens(DDEP_PTR v, const REFERENCE& a, const REFERENCE& b, struct LOOP* common, int64_t low,
                          int64_t high, bool pointersAreFixed);
void allow_work_on_givens(); // as much as an analysis may spend on it
// Whether the term is fixed between two references whose iterations may differ from loop `in` on.
bool term_is_fixed(const TERM_FACTS& f, const NODE* term, const struct LOOP* in, bool pointersAreFixed);
// The loop in which a value must be fixed to be the same for both references: outside of it the iterations are the
// same.
struct LOOP* loop_of_differences(const DDEP& v, struct LOOP* common);

// While the analysis is active, more than `maxTrips` may be known of a loop.
void limit_trips(const struct LOOP* loop, WIDE most);
void forget_facts_for_references(); // these limits, and the givens
WIDE last_iteration(const struct LOOP* loop); // the greatest count of iterations at any point in it; NO_LAST: not known
constexpr WIDE NO_LAST = FAR;
// The counts that a variable counts the iterations of `loop`, or of a loop around it, by; false for another variable.
bool bounds_of_count(const SYMTAB* sym, const struct LOOP* loop, int64_t* low, int64_t* high);
// The loop around `loop`, or itself, of that level.
struct LOOP* loop_of_level(struct LOOP* loop, int level);
