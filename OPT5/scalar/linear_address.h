// An address that moves by constant steps when the inductions of a loop do.
#pragma once

#include <cstdint>
#include <vector>

class NODE;
class SYMTAB;
class TYPE;

// base + the sum of coefficient * leaf + offset, in address units and in arithmetic that wraps at the width of an
// address. A leaf has the value of its own type. Trees are borrowed.
struct LINEAR_ADDRESS {
    struct TERM {
        const NODE* leaf;
        int64_t coefficient;
        bool is_induction;
    };
    const NODE* base = nullptr; // of pointer type
    std::vector<TERM> terms;    // no two congruent, none with coefficient 0
    int64_t offset = 0;

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
};

// Takes a tree of pointer type apart; false if a part of it is no constant, invariant or induction.
//
// A signed sum in a type narrower than an address is taken to be exact, as the language promises, and so are the steps
// of a signed induction; an unsigned one wraps.
bool linear_address(const NODE* pointer, LINEAR_LEAVES& leaves, LINEAR_ADDRESS* address);

// A fresh tree with the address's value, of pointer type `type`. A value for the inductions that are `sym` may be
// given, a tree of integer or pointer type, borrowed; null: the variable itself.
NODE* tree_of_address(const LINEAR_ADDRESS& address, TYPE* type, const SYMTAB* sym = nullptr,
                      const NODE* value = nullptr);
