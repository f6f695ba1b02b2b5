// Records of dependences, held against what a run does: whenever two accesses with a number touch the same memory and one
// of them writes, an edge must lead from the first to the second whose vector has the distance of their iterations in
// every loop around both.
//
// A function is watched if it has records of loops and no handlers of exceptions, which are entered where the code has no
// edge. Of each unit of memory the latest accesses by a number are kept, and its first. A load need not be told from a store
// of another type that has been overwritten.
#pragma once

#include "tools/exec/loops.h"
#include "tools/exec/machine.h"

#include <unordered_map>

// An access of the code that has a number.
struct ACCESS {
    uint32_t id;
    bool writes;
    REP rep = R_VOID;
    unsigned bit = 0, width = 0; // from the first bit of the unit at its address
};

class DEPENDENCES {
public:
    void add_vector(const IC_FACTS* v) { vectors[v->word[0]] = v; }
    void add_edge(uint32_t from, uint32_t to, uint32_t vector) { edges[key(from, to)].push_back(vector); }
    // When the code is complete. `innermost`: of two accesses in one loop a dependence need not tell what loops around it
    // carry.
    void find_nests(const std::vector<STMT>& code, bool innermost);

    // By statement: the loops around it, the outermost first.
    const TARGETS& nest(uint32_t statement) const { return nests[statement]; }
    const std::vector<LOOP_BODY>& loops() const { return loops_m; }
    bool tells_of_innermost_alone() const { return is_of_innermost; }
    bool has_edge(uint32_t from, uint32_t to, const std::vector<int64_t>& distances) const; // by level, from 1

private:
    static uint64_t key(uint32_t from, uint32_t to) { return uint64_t(from) << 32 | to; }

    std::unordered_map<uint32_t, const IC_FACTS*> vectors;
    std::unordered_map<uint64_t, std::vector<uint32_t>> edges;
    std::vector<LOOP_BODY> loops_m;
    std::vector<TARGETS> nests;
    bool is_of_innermost = false;
};

// The accesses of one activation.
class ACCESS_WATCH {
public:
    explicit ACCESS_WATCH(const DEPENDENCES& d) : told(d), iteration(d.loops().size()) {}
    void step(uint32_t from, uint32_t to); // control passes from a statement to another
    void note(const ACCESS& access, uint64_t address, MACHINE& m);

private:
    struct SEEN {
        const ACCESS* access;
        uint32_t statement;
        uint16_t bits; // of the unit
        std::vector<uint64_t> iterations;
    };
    void check(const SEEN& first, const SEEN& second, MACHINE& m) const;
    static void keep(std::vector<SEEN>& list, const SEEN& latest);

    const DEPENDENCES& told;
    std::vector<uint64_t> iteration;                   // by loop, from 0 where it is entered
    std::unordered_map<uint64_t, std::vector<SEEN>> memory; // by unit
};
