// What the files that construct SSA form share. Passes on the form include ssa.h alone.
#pragma once

#include "OPT5/dd/ssa.h"
#include "OPT5/ir/list.h"
#include "OPT5/ir/symbol_table.h"

#include <unordered_set>
#include <vector>

// Where a tracked reference, or something that may write, stands in its tree. In the order of evaluation within a
// block.
struct SSA_SITE {
    enum KIND : uint8_t {
        USE,
        DEF,
        WRITE, // an assignment that is no SSA_DEF, or another operator that may change memory
    };
    KIND kind;
    NODE** link; // holds the operators on the node; stays where it is while the form is built
    NODE* node;  // SSA_USE, SSA_DEF, or the operator that writes
};

struct SSA_BUILD {
    bool onlySSV = false, onlyIV = false, vectorsToo = false, onlyMemory = false;
    size_t left_bare = 0; // references to registers that are not tracked
    // Local structures and the like that are accessed at places which the trees do not show: memory, as what pointers reach.
    std::unordered_set<const SYMTAB*> indexed; // membership only
    std::vector<SSA_SITE> sites;
    std::vector<size_t> first_site; // by the number of the block, which is what ends the sites of the block before it
    std::vector<BBLK*> blocks;      // by number from 1
    int64_t references() const { return static_cast<int64_t>(sites.size() + left_bare); }
};

struct SSA_STATE {
    std::vector<std::unique_ptr<SSAVAR>> variables; // by uid
    std::vector<SSA_DEFINITION> definitions;        // by version
    std::vector<std::unique_ptr<std::vector<SSA_ARG>>> args;
    SYMBOL_TABLE<SSAVAR*> direct, indirect; // the first entry of a ring
};
extern SSA_STATE ssa_state;

// ---- ssa_variables.cpp

// A place that could be tracked: an object or what a pointer variable points to, and the bits from there.
struct SSA_PLACE {
    SYMTAB* sym = nullptr;
    SYMTAB* pointer = nullptr;
    INT65 start, length;
};
// What every write that is no definition is asked about.
bool is_SSA_memory(const SYMTAB* sym, const SSA_BUILD& build);
// False where the tree does not show a fixed place.
bool find_SSA_place(const NODE* lvalue, SSA_PLACE* place);
// Of a local scalar as a whole, which could be tracked, and nothing but its name reaches: a SSAVAR_likely_register's.
bool is_register_reference(const NODE* lvalue, const SSA_BUILD& build);
// The entry of a reference, made if there is none; null for one that is not tracked.
SSAVAR* SSAVAR_for_reference(const NODE* lvalue, const SSA_BUILD& build);
SSAVAR* find_SSAVAR_ring(const SYMTAB* sym);         // the entries of an object, or null
SSAVAR* find_pointed_SSAVAR_ring(const SYMTAB* sym); // the entries behind a pointer, or null
bool covers(const SSAVAR* whole,
            const SSAVAR* part);  // of one ring: a definition of the one leaves nothing of the other
void set_SSAVAR_flags(SSAVAR* v); // those that the symbol and the type decide

template <class F>
void for_each_in_ring(SSAVAR* first, F&& visit) {
    if (!first) return;
    SSAVAR* v = first;
    do {
        SSAVAR* next = v->ring;
        visit(v);
        v = next;
    } while (v != first);
}

// ---- ssa_references.cpp
void wrap_SSA_references(SSA_BUILD& build); // SSA_USE and SSA_DEF; fills the sites
// What evaluating a site may change, of the variables in `live`: `visit(variable)`, each once.
class SSA_CHANGES {
public:
    explicit SSA_CHANGES(const SSA_BUILD& build);
    template <class F>
    void of_site(const SSA_SITE& site, const std::vector<SSAVAR*>& live_memory, F&& visit) {
        found.clear();
        find(site, live_memory);
        for (SSAVAR* v : found) visit(v);
    }

private:
    void find(const SSA_SITE& site, const std::vector<SSAVAR*>& live_memory);
    void add(SSAVAR* v);
    void add_what_overlaps(SSAVAR* v);
    void add_what_is_behind(const SYMTAB* pointer);
    void add_aliases(const NODE* write, const NODE* place, const SSAVAR* written,
                     const std::vector<SSAVAR*>& live_memory);
    bool may_meet(const NODE* write, const NODE* place, const SSAVAR* written, const SSAVAR* v);

    const SSA_BUILD& build;
    std::vector<SSAVAR*> found;
    std::vector<uint32_t> stamp; // by uid: the site that found it
    uint32_t now = 0;
    int64_t questions_left;
};
