// An access as a place: a sum of terms, a constant, and a width.
#pragma once

#include "XINT/int65.h"

#include <vector>

class NODE;
class SYMTAB;
struct LOOP;

// `coefficient` times the value of `tree`, in bits.
struct ADDRESS_TERM {
    const NODE* tree;
    INT65 coefficient;
};

struct ADDRESS_FORM {
    SYMTAB* object = nullptr;        // the address of this object is a term
    SYMTAB* points_into = nullptr;   // a term is a pointer into this object; null with `object`
    std::vector<ADDRESS_TERM> terms; // no two congruent
    INT65 offset;                    // bits
    INT65 width;                     // bits; 0: unknown

    SYMTAB* known_object() const { return object ? object : points_into; }
    bool is_absolute() const { return !object && terms.empty(); }
};

ADDRESS_FORM address_form(const NODE* lvalue);

// Whether two accesses have no bit in common for certain. A term that is in both stands for one value where `loop` is
// null or the term does not change in it.
bool accesses_are_disjoint(const ADDRESS_FORM& a, const ADDRESS_FORM& b, struct LOOP* loop);
