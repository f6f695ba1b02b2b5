// Runs a tree as the target would, on a memory of its own, and records its side effects in their order.
//
// It shares no rule with the system under test: C's conversions are made by width and sign, integers wrap at the width
// of their type, a single is rounded after each operation by the host, whose formats are the target's.
#pragma once

#include "OPT5/ir/node.h"
#include "tools/treecheck/world.h"

#include <array>
#include <cstdint>
#include <string>
#include <vector>

namespace treecheck {

// What counts of a scalar type.
struct FORM {
    bool is_float = false, is_signed = false, is_bool = false, is_pointer = false;
    int bits = 0; // 0: no scalar
    bool operator==(const FORM& o) const {
        return is_float == o.is_float && is_signed == o.is_signed && is_bool == o.is_bool &&
               is_pointer == o.is_pointer && bits == o.bits;
    }
};
FORM form_of(const TYPE* type);

// An integer as the two's complement bits of its value, extended by its form; a float as the bits of a double.
using BITS = uint64_t;
double as_double(BITS v);
BITS from_double(double v);
bool same_value(BITS a, BITS b, const FORM& form); // one NaN is as good as another
std::string value_text(BITS v, const FORM& form);

using MEMORY = std::array<uint16_t, MEMORY_UNITS>;

// One thing that the world outside sees: a call or an access to a volatile object.
struct EVENT {
    char kind = 0; // 'f', 'g' calls; 'r' volatile read, 'w' volatile write
    BITS what = 0; // arguments, or place and value
    bool operator==(const EVENT& o) const { return kind == o.kind && what == o.what; }
};

class EVALUATOR {
public:
    MEMORY memory{};
    std::vector<EVENT> events;
    // The program may not do what it did: divided by zero, shifted too far, left an object.
    bool undefined = false;
    // Of a rewritten tree: a sum of a pointer and numbers may pass null in between, where the tree as written does not.
    bool null_is_passed = false;
    bool overflowed = false; // a signed operation wrapped
    BITS seed = 0;           // of what calls and volatile reads give

    void begin(const MEMORY& start, BITS run_seed) {
        memory = start;
        events.clear();
        undefined = overflowed = false;
        seed = run_seed;
        steps = 0;
    }
    BITS eval(const NODE* t); // in the form of the tree's type
    bool truth(const NODE* t);

private:
    struct PLACE {
        uint32_t unit = 0;
        unsigned bit = 0, width = 0; // a bit-field, if width is not 0
        FORM form;
        bool is_volatile = false, through_pointer = false;
    };
    PLACE place(const NODE* t);
    PLACE member(const NODE* t);
    BITS read(const PLACE& p);
    BITS write(const PLACE& p, BITS v); // the value as the object then holds it
    bool reaches(const PLACE& p, unsigned units);
    BITS fail() {
        undefined = true;
        return 0;
    }
    BITS convert(BITS v, const FORM& from, const FORM& to);
    BITS arithmetic(int op, BITS a, const FORM& fa, BITS b, const FORM& fb, const FORM& to);
    BITS integer(int op, BITS a, BITS b, const FORM& f);
    BITS power(BITS base, BITS exponent, const FORM& f);
    BITS unary(const NODE* t);
    bool compare(const NODE* t);
    BITS compound(const NODE* t, int op, bool before);
    BITS call(const NODE* t);
    BITS intrinsic(const NODE* t);
    void arguments(const NODE* list, BITS* hash);
    void copy_record(const NODE* t);
    BITS copy_memory(const NODE* t);
    std::vector<BITS> lanes(const NODE* t); // of a vector; the parts of a complex number

    const WORLD& w = world();
    unsigned steps = 0;
};

} // namespace treecheck
