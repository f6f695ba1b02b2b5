// An access as a place: the address of an object, a sum of terms and a constant, in bits, and a width.
#pragma once

#include "OPT5/simp/linear.h"
#include "XINT/int65.h"

class NODE;
class SYMTAB;
struct LOOP;

struct ADDRESS_FORM : LINEAR_FORM {
    ADDRESS_FORM() : LINEAR_FORM(64) {}

    SYMTAB* object = nullptr;      // the address of this object is a term
    SYMTAB* points_into = nullptr; // a term is a pointer into this object; null with `object`
    INT65 width;                   // bits; 0: unknown

    SYMTAB* known_object() const { return object ? object : points_into; }
    INT65 modulus() const; // the sum is the address modulo this; 0: exactly
    bool is_absolute() const { return !object && is_constant(); }
};

ADDRESS_FORM address_form(const NODE* lvalue);
ADDRESS_FORM pointer_form(const NODE* pointer); // the place that it points to; no width, no `points_into` of one access

// Whether two accesses are apart wherever the second lies `distance` bits behind the first, plus any multiple of `step`;
// 0: none.
bool accesses_are_apart(INT65 distance, INT65 step, INT65 width_a, INT65 width_b);

// Whether two accesses have no bit in common for certain. A term that is in both stands for one value where `loop` is
// null or the term does not change in it.
bool accesses_are_disjoint(const ADDRESS_FORM& a, const ADDRESS_FORM& b, struct LOOP* loop);
