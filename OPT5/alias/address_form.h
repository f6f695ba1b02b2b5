// An access as a place: the address of an object, a sum of terms and a constant, in bits, and a width.
#pragma once

#include "OPT5/simp/linear.h"
#include "XINT/int65.h"

#include <optional>

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
// An lvalue that is compared with many: what the comparisons ask of it alone is found once. The tree must stand, and what
// is known of pointers.
class COMPARED_LVALUE {
public:
    explicit COMPARED_LVALUE(const NODE* lvalue);
    const NODE* tree() const { return lvalue; } // without wrappers
    bool is_lvalue() const { return is_place; }
    bool is_volatile() const { return volatile_place; }
    const SYMTAB* object_named() const { return named; } // by the lvalue itself, or null
    const ADDRESS_FORM& form() const {
        if (!known_form) known_form.emplace(address_form(lvalue));
        return *known_form;
    }

private:
    const NODE* lvalue;
    bool is_place, volatile_place = false;
    const SYMTAB* named = nullptr;
    mutable std::optional<ADDRESS_FORM> known_form;
};
// What `lvalues_may_be_aliased` (alias.h) answers.
bool lvalues_may_be_aliased(const COMPARED_LVALUE& a, const COMPARED_LVALUE& b, struct LOOP* loop = nullptr,
                            bool by_type = true, bool* unsure = nullptr);

// The lvalue or value below what stands for its operand: marks, and operators of SSA form.
const NODE* below_transparent(const NODE* t);
ADDRESS_FORM pointer_form(const NODE* pointer); // the place that it points to; no width, no `points_into` of one access

// Whether two accesses are apart wherever the second lies `distance` bits behind the first, plus any multiple of `step`;
// 0: none.
bool accesses_are_apart(INT65 distance, INT65 step, INT65 width_a, INT65 width_b);

// Whether two accesses have no bit in common for certain. A term that is in both stands for one value where `loop` is
// null or the term does not change in it.
bool accesses_are_disjoint(const ADDRESS_FORM& a, const ADDRESS_FORM& b, struct LOOP* loop);
