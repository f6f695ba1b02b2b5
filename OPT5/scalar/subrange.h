// Parts of objects as places.
#pragma once

#include "OPT5/alias/address_form.h"

class NODE;

// The bits that an lvalue accesses: of a named object, or from an address that is a sum of values.
struct SUBRANGE {
    const NODE* lvalue; // borrowed from its statement
    ADDRESS_FORM place;
};

// False for an lvalue that is volatile or has effects, and for one that is too large to be compared often.
bool compute_subrange(const NODE* lvalue, SUBRANGE* s);

// Whether a store to `later` leaves nothing of a store to `s`, where both addresses are evaluated with the same values
// and every read in between that the alias rules let meet `later` is known not to be there.
bool covers(const SUBRANGE& later, const SUBRANGE& s);

// Whether `t` may change what the address of `s` is computed from.
bool address_is_changed_by(const NODE* t, const SUBRANGE& s);

const NODE* get_first_non_stdot_node_down_the_left_side_of_tree(const NODE* t);

bool is_plain_assignment(const NODE* t);    // ASG, STASG or ARASG
bool is_operator_assignment(const NODE* t); // an assignment that also reads its target
