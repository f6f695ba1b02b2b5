// The objects that random trees are about: variables of every type, a structure with bit-fields, an array, pointers to
// them, volatile objects, two functions that the trees call. Each object has a place in a small memory of 16-bit units.
#pragma once

#include "OPT5/ir/symtab.h"

#include <cstdint>
#include <vector>

namespace treecheck {

constexpr uint32_t MEMORY_UNITS = 256, FIRST_UNIT = 16; // what lies below is no object's

struct WORLD {
    std::vector<SYMTAB*> integers, floats, pointers, volatiles, globals; // scalars
    std::vector<SYMTAB*> complexes, vectors; // of float and double; of two and four `int`, two `long`
    std::vector<SYMTAB*> addressed; // scalars that pointers may lead to, apart from the array and the structures
    std::vector<SYMTAB*> objects;   // everything with a place
    SYMTAB *record = nullptr, *other_record = nullptr, *array = nullptr, *record_pointer = nullptr;
    SYMTAB* functions[2] = {};
    TYPE* record_type = nullptr;
    std::vector<fkMDATA*> members;
    std::vector<TYPE*> integer_types; // of the variables
    uint32_t first_addressed = 0;     // from here on lies what pointers lead to, with gaps in between
    uint32_t end = FIRST_UNIT;        // first free unit

    uint32_t address(const SYMTAB* s) const { return s->scratch_word; }
    // Whether `units` from `unit` on lie within one of the objects that pointers lead to.
    bool pointer_may_reach(uint32_t unit, uint32_t units) const;
};

// The one world; made on the first call, over the global type package, with a current function of its own.
const WORLD& world();

} // namespace treecheck
