// Sets of integers as few arithmetic progressions: what a value may be. Pure values, which know nothing of trees.
//
// Members are kept in a width in which the sum of any two values of the target is exact. Every operation gives at least
// the members that the operation on sets gives, and may give more: a set never loses a value.
#pragma once

#include "OPT5/simp/range.h"

#include <string>

class TYPE;

// low, low + step, ... up to high. One member: step 0. None: low above high, in canonical form 1, 0, 1.
struct VPSLICE {
    WIDE low = 1, high = 0, step = 1;

    bool is_empty() const { return low > high; }
    bool holds(WIDE v) const {
        return low <= v && v <= high && (step <= 1 || (v - low) % step == 0);
    }
    bool operator==(const VPSLICE& o) const { return low == o.low && high == o.high && step == o.step; }
};

// Slices that become a set.
class VPSLICE_LIST {
public:
    static constexpr int MOST = 10; // one more merges those that are there
    VPSLICE_LIST() {}
    VPSLICE_LIST(const VPSLICE_LIST&) = delete;
    VPSLICE_LIST& operator=(const VPSLICE_LIST&) = delete;
    void push_back(const VPSLICE& s);
    int size() const { return count; }
    VPSLICE& operator[](int i) { return slices[i]; }
    void erase(int i);
    void sort();
    void merge(int most); // until there are no more than `most`, and no two join without a gap

private:
    union { // beyond `count` there is nothing
        VPSLICE slices[MOST];
    };
    int count = 0;
};

// Slices by their low ends. No slice: nothing is known, which is not "no value".
class vpset {
public:
    static constexpr int MOST_SLICES = 3;

    vpset() {}
    explicit vpset(const VPSLICE& s) { append(s); }
    vpset(const vpset& o) { *this = o; }
    vpset& operator=(const vpset& o) {
        count = o.count;
        std::copy(o.slices, o.slices + o.count, slices);
        return *this;
    }
    const VPSLICE* begin() const { return slices; }
    const VPSLICE* end() const { return slices + count; }
    int size() const { return count; }
    const VPSLICE& operator[](int i) const { return slices[i]; }
    bool holds(WIDE v) const;
    bool operator==(const vpset& o) const;

private:
    friend vpset vpset_of(VPSLICE_LIST& list);
    void append(const VPSLICE& s) {
        if (!s.is_empty()) slices[count++] = s;
    }

    union { // beyond `count` there is nothing
        VPSLICE slices[MOST_SLICES];
    };
    int count = 0;
};

// ---- Slices
bool vpslice_is_single(const VPSLICE& s);
WIDE vpslice_size(const VPSLICE& s); // members
// What is left of `a` without `b`, as one slice: at its ends, or every other member.
void vpslice_difference(VPSLICE* out, const VPSLICE& a, const VPSLICE& b);
// A step that does not divide the distance is reported to the debug stream and taken as 1; reversed ends give the empty
// slice.
VPSLICE make_vpslice(WIDE low, WIDE high, WIDE step);
VPSLICE single_slice(WIDE v);
VPSLICE slice_between(WIDE low, WIDE high, const VPSLICE& grid); // the members of the grid's progression in between

// ---- Sets
WIDE vpset_minimum(const vpset& s); // these two of a set that is not empty
WIDE vpset_maximum(const vpset& s);
WIDE vpset_size(const vpset& s); // the sum of the slices' sizes
WIDE vpset_delta(const vpset& s); // divides the distance of any two members; 0 for at most one
WIDE vpset_gcd(const vpset& s);   // divides every member
void make_vpset_empty(vpset* s);
bool vpset_is_empty(const vpset& s);
bool vpset_is_single(const vpset& s);
bool vpset_equal(const vpset& a, const vpset& b);
bool vpset_is_subset(const vpset& a, const vpset& b); // true only if it is one
std::string vpset2string(const vpset& s);
// The slices, merged with their nearest neighbours until they are few enough.
vpset vpset_of(VPSLICE_LIST& list); // which is used up
void vpset_union(vpset* out, const vpset& a, const vpset& b);
// Null where they share no member; an operand of which nothing is known gives the other.
bool vpset_intersection(vpset* out, const vpset& a, const vpset& b);
bool vpset_without(vpset* out, const vpset& a, WIDE v); // false: no member is left
bool vpset_within(vpset* out, const vpset& a, WIDE low, WIDE high); // the same of the members in between
void vpset_compress(VPSLICE* out, const vpset& s);

// ---- Sets and types. A pointer counts as `long`.
void make_vpset_bottom(vpset* s, const TYPE* type);
bool vpset_is_bottom(const vpset& s, const TYPE* type);
RANGE vpset_limits(const TYPE* type);
void truncate_vpset_to_type(vpset* s, const TYPE* type); // as a conversion of values does
// All that repeated addition of `incr` reaches in the type; an unsigned type is gone through in both directions.
void include_incr_in_vpset(WIDE incr, vpset* s, const TYPE* type);

// ---- Arithmetic on numbers without bounds; false where it has no room
bool vpset_sum(vpset* out, const vpset& a, const vpset& b);
bool vpset_negative(vpset* out, const vpset& a);
bool vpset_product(vpset* out, const vpset& a, const vpset& b);
// Rounded toward zero, by a constant above 0; rounded down, by a power of two.
void vpset_quotient(vpset* out, const vpset& a, WIDE divisor);
void vpset_shifted_down(vpset* out, const vpset& a, int count);
void vpset_remainder(vpset* out, const vpset& a, WIDE divisor); // with the dividend's sign, of a constant above 0
void vpset_absolute(vpset* out, const vpset& a);
