// Integers and addresses as sums of multiples: constant + coefficient * tree + ...
//
// One record, one list of operators that are such sums, and one walk that takes a tree apart. Who asks says which
// operators may be opened, and what a term is.
#pragma once

#include <climits>
#include <cstdint>

class NODE;

// An operator as a sum of multiples of its operands, in arithmetic that wraps at its width.
struct LINEAR_STEP {
    const NODE *a, *b; // b is null where only one operand varies
    int64_t by_a, by_b, constant;
};
// PLUS, MINUS, UMINUS, NOTB, MULT by a constant on either side, SLL by one, PMCONV, and casts of numbers and pointers,
// whatever the types. False for any other operator.
bool linear_step(const NODE* t, LINEAR_STEP* step);

// The value of the sum modulo 2^`bits`. Trees are borrowed; each has the value of its own type.
struct LINEAR_FORM {
    static constexpr int MOST_TERMS = 32;
    struct TERM {
        const NODE* tree;
        int64_t coefficient;
    };

    explicit LINEAR_FORM(unsigned modulus_bits) : bits(modulus_bits) {}
    LINEAR_FORM(const LINEAR_FORM& o) { *this = o; }
    LINEAR_FORM& operator=(const LINEAR_FORM& o);

    unsigned bits;
    // The sum is the value as a number too: nothing was reduced, and no operator that may wrap was opened.
    bool is_exact = true;
    int64_t constant = 0; // this and the coefficients: the numbers nearest to zero

    // No two terms of one value, none with the coefficient 0; in the order in which they were met.
    const TERM* begin() const { return terms; }
    const TERM* end() const { return terms + count; }
    int term_count() const { return count; }
    bool is_constant() const { return count == 0; }
    bool add(const NODE* tree, int64_t coefficient); // false if there is no room
    void add_constant(int64_t v);
    void erase(const TERM* term);
    template <class KEEPS>
    void keep_if(KEEPS&& keeps) {
        for (int i = 0; i < count;)
            if (keeps(terms[i]))
                ++i;
            else
                erase(&terms[i]);
    }
    const TERM* find(const NODE* tree) const; // the term of this value, or null
    bool has_same_terms(const LINEAR_FORM& other) const;
    int64_t reduced(__int128 v);

private:
    TERM terms[MOST_TERMS];
    int count = 0;
};

// Adds a multiple of a tree to a form.
class LINEAR_READER {
public:
    virtual ~LINEAR_READER() = default;
    bool read(const NODE* t, int64_t coefficient); // false, with a part of it added, if a part was refused

protected:
    LINEAR_READER(LINEAR_FORM* f, int most_nodes) : form(*f), nodes_left(most_nodes) {}
    // Whether the step's sum may stand for the operator. It clears `is_exact` of the form where the operator may wrap.
    virtual bool opens(const NODE* t, const LINEAR_STEP& step) = 0;
    virtual bool takes_constant(const NODE* icon); // other ICONs are leaves
    virtual const NODE* without_marks(const NODE* t) const { return t; }
    virtual bool leaf(const NODE* t, int64_t coefficient) { return form.add(t, coefficient); } // false: refused

    LINEAR_FORM& form;
    int nodes_left;
};
