// What the code generator is told of the current function beside its trees: loops, dependences of memory accesses, and hints
// for loads. OPT5/dd finds it, OPT5/io writes it.
#pragma once

#include "IFILE/if_client.h"

#include <cstdint>
#include <vector>

class SYMTAB;
class TYPE;

// A loop as its record has it. The first of a function is the function itself, which is its own outer loop.
struct CODE_LOOP {
    uint32_t id = 0, outer = 0;
    uint32_t head = UINT32_MAX; // the serial number of the block that each iteration begins with
    uint32_t min = 1, max = UINT32_MAX, factor = 1; // iterations for each entry
    uint16_t flags = 0;
    SYMTAB* counter = nullptr; // the control variable, null for none
    uint8_t counter_flags = 0;
};

// A dependence between two accesses, by their numbers; of the first one on the second that follows it in time.
struct CODE_EDGE {
    uint32_t from, to, vector; // the index of its vector
};

// In which iterations of the loops around both accesses they may touch one object.
struct CODE_VECTOR {
    uint8_t flags = 0;
    std::vector<DD_ENTRY> elements; // by loop level
};

// Advice on loads ahead of a condition that guards them.
struct ldspec_tuple {
    int kind; // 0 by induction, 1 at random
    uint32_t id, word;
    int32_t step;
    TYPE* type;
    SYMTAB* sym;
};

struct CODE_RECORDS {
    static constexpr uint32_t NOWHERE = UINT32_MAX;
    std::vector<CODE_LOOP> loops;   // by id; empty where nothing is told
    std::vector<uint32_t> loop_of;  // by the serial number of a block: the index of its innermost loop, or NOWHERE
    std::vector<CODE_VECTOR> vectors;
    std::vector<CODE_EDGE> edges;         // pending: passes may still remove accesses
    std::vector<uint32_t> loop_of_access; // by its number: its innermost loop, as the analysis found it
    std::vector<ldspec_tuple> ldspec_advice;

    uint32_t loop_at(unsigned serial) const { return serial < loop_of.size() ? loop_of[serial] : NOWHERE; }
};
