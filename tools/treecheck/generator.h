// Random well-typed trees over the objects of the world. A tree is wholly given by its seed.
//
// Two manners take turns. In one every operand has exactly the type that its operator computes in, as trees are between
// passes; in the other operands have the types that C's rules allow and the casts are put in afterwards, as trees are
// read. Few leaves are in play in a tree, constants lie around the boundaries, and subtrees recur: rules that look for
// equal operands, neighbouring constants and nested operators find something.
#pragma once

#include "OPT5/ir/node.h"
#include "tools/treecheck/world.h"

#include <cstdint>
#include <vector>

namespace treecheck {

class RANDOM {
public:
    explicit RANDOM(uint64_t seed) : state(seed) { state = next() ^ seed << 32; } // neighbours have nothing in common
    uint64_t next() {
        uint64_t z = state += 0x9E3779B97F4A7C15u;
        z = (z ^ z >> 30) * 0xBF58476D1CE4E5B9u;
        z = (z ^ z >> 27) * 0x94D049BB133111EBu;
        return z ^ z >> 31;
    }
    unsigned pick(unsigned n) { return static_cast<unsigned>((next() >> 33) % n); }
    bool one_in(unsigned n) { return pick(n) == 0; }
    template <class T>
    const T& of(const std::vector<T>& v) {
        return v[pick(static_cast<unsigned>(v.size()))];
    }

private:
    uint64_t state;
};

// What the trees of a run are made of.
struct GENERATOR_OPTIONS {
    int depth = 4; // most levels of operators
    bool floats = true, pointers = true, effects = true;
};

class GENERATOR {
public:
    GENERATOR(uint64_t seed, const GENERATOR_OPTIONS& o);
    ~GENERATOR();
    GENERATOR(const GENERATOR&) = delete;
    GENERATOR& operator=(const GENERATOR&) = delete;

    NODE* tree();                       // of a random type
    NODE* value(TYPE* type, int depth); // of exactly this type
    NODE* constant(TYPE* type);
    NODE* shape(TYPE* type, int depth, std::size_t pattern); // the left side of a rewrite by pattern
    NODE* given(); // a condition on a favourite variable or on a tree of such, without effects
    SYMTAB* favourite() { return random.of(favourites); }
    INT65 number(TYPE* type); // within the type, most often near a boundary or a power of two
    RANDOM random;

private:
    friend class SHAPE;
    TYPE* integer_type();
    TYPE* arithmetic_type();
    NODE* leaf(TYPE* type);
    NODE* integer(TYPE* type, int depth);
    NODE* integer_operator(TYPE* type, int depth);
    NODE* truth(int depth);
    NODE* comparison(int depth);
    NODE* meeting_pointers(int depth);
    NODE* converted_comparison(int depth);
    NODE* joined_comparisons(TYPE* type, int depth);
    NODE* clamp(TYPE* type, int depth);
    NODE* condition(int depth);
    NODE* floating(TYPE* type, int depth);
    NODE* pointer(TYPE* type, int depth);
    NODE* choice(TYPE* type, int depth);
    NODE* extremum(TYPE* type, int depth);
    NODE* part(TYPE* type, int depth);   // of a complex number
    NODE* vector(TYPE* type, int depth); // of this vector type
    NODE* lane(TYPE* type, int depth);   // of a vector of `int` or `long`
    NODE* choice_by_value(TYPE* type, int depth);
    NODE* effect(TYPE* type, int depth);
    NODE* assignment(NODE* place, int depth);
    NODE* call(SYMTAB* function, int depth);
    NODE* place(TYPE* type, int depth); // an lvalue of an object of this type, or null
    NODE* any_place(int depth);
    NODE* member(bool bit_field, int depth);
    NODE* loose(int depth); // an operator over operands of any types
    NODE* operand(TYPE* type, int depth) { return value(type, depth - 1); }
    SYMTAB* variable(const std::vector<SYMTAB*>& among, TYPE* type);
    void remember(const NODE* t);
    NODE* recall(TYPE* type);

    const WORLD& w;
    GENERATOR_OPTIONS options;
    bool is_loose;
    std::vector<SYMTAB*> favourites;
    std::vector<INT65> numbers;
    std::vector<NODE*> seen; // copies of subtrees, owned
};

// The target's function that gives the smaller or the larger of two values of the type, or null.
const char* extremum_name(TYPE* type, bool maximum);

NODE* cast_to(TYPE* type, NODE* tree); // SCONV or PCONV where the types differ

} // namespace treecheck
