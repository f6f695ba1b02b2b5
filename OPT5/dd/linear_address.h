// An address that moves by constant steps when the inductions of a loop do.
#pragma once

#include "OPT5/simp/linear.h"

class NODE;
class SYMTAB;
class TYPE;

// base + a sum of invariants and inductions, in address units and modulo the width of an address. Trees are borrowed.
struct LINEAR_ADDRESS : LINEAR_FORM {
    LINEAR_ADDRESS();

    const NODE* base = nullptr; // of pointer type

    bool is_induction_by(const SYMTAB* sym) const;
    int64_t coefficient_of(const SYMTAB* sym) const; // of the term that is the variable; 0 without one
    bool differs_by_constant(const LINEAR_ADDRESS& other) const;
    uint64_t hash() const; // equal for what differs by a constant
};

// What taking an address apart asks of the loop.
class LINEAR_LEAVES {
public:
    virtual ~LINEAR_LEAVES() = default;
    virtual bool is_induction(const SYMTAB* sym) const = 0;
    virtual bool is_invariant(const NODE* tree) = 0; // and may be evaluated ahead of the loop
    // What the variable was set to, where that still is its value; null if that is not known.
    virtual const NODE* value_of(const SYMTAB* sym) = 0;
    // Whether the value of a narrow induction also moves by its steps when it is widened.
    virtual bool stays_linear_when_widened(const SYMTAB* sym) const = 0;

    bool is_induction(const NODE* term) const;
};

// Takes a tree of pointer type apart; false if a part of it is no constant, invariant or induction.
//
// A signed sum in a type narrower than an address is exact, as the simplifier keeps it, and so are the steps of a
// signed induction; an unsigned one wraps.
bool linear_address(const NODE* pointer, LINEAR_LEAVES& leaves, LINEAR_ADDRESS* address);

// A fresh tree with the address's value, of pointer type `type`. A value for the inductions that are `sym` may be
// given, a tree of integer or pointer type, borrowed; null: the variable itself.
NODE* tree_of_address(const LINEAR_ADDRESS& address, TYPE* type, const SYMTAB* sym = nullptr,
                      const NODE* value = nullptr);
