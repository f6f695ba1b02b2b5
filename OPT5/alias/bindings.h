// What the sources of points-to propagation share: bindings and how they meet, maps from pointers to bindings, and the
// store that keeps them for a function.
#pragma once

#include "OPT5/alias/points_to.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/symbol_table.h"

#include <deque>
#include <functional>
#include <unordered_set>

struct WRITE;

// ---- Bindings

uint32_t class_category(const SYMTAB* base); // the categories that cover an object; a place at any of them may be in it
PTVAR make_target(SYMTAB* base, int64_t offset, int64_t stride);
inline bool is_covered(const PTVAR& t, uint32_t categories) { return (class_category(t.base) & categories) != 0; }
// Puts targets in order and covered ones into the categories; too many of them become categories.
void settle(PTENV& e);
bool equal_bindings(const PTENV& a, const PTENV& b);
PTENV meet_bindings(const PTENV& a, const PTENV& b);
// The pointer plus `constant`, plus any multiple of `stride`.
PTENV shifted(PTENV e, int64_t constant, int64_t stride);
// What holds of a pointer that is both.
PTENV intersection(const PTENV& a, const PTENV& b);

// Equal bindings are one record, so that they are compared by address. The order of the table decides nothing.
class BINDINGS {
public:
    const PTENV* intern(PTENV&& e); // null where it says nothing
    const PTENV* meet(const PTENV* a, const PTENV* b);

private:
    struct HASH {
        size_t operator()(const PTENV* e) const;
    };
    struct EQUAL {
        bool operator()(const PTENV* a, const PTENV* b) const { return equal_bindings(*a, *b); }
    };
    std::deque<PTENV> records;
    std::unordered_set<const PTENV*, HASH, EQUAL> table;
};

// ---- Maps

// From the numbers of pointers to bindings. A map is a tree of cells that are never changed: maps of neighbouring blocks
// share what they agree on, and a meet or a comparison looks only at the rest. Null is the empty map.
class POINTER_MAPS {
public:
    struct CELL {
        static constexpr unsigned WIDTH = 16;
        const void* below[WIDTH] = {};
    };
    using MAP = const CELL*;

    void set_room(unsigned pointers) {
        for (height = 0; (pointers - 1) >> 4 * (height + 1) && height < 7;) ++height;
    }
    const PTENV* get(MAP map, unsigned i) const;
    MAP set(MAP map, unsigned i, const PTENV* e) { return set_at(map, i, e, height); }
    MAP meet(MAP a, MAP b, BINDINGS& bindings) { return meet_at(a, b, height, bindings); }
    bool equal(MAP a, MAP b) const { return equal_at(a, b, height); }
    template <class F>
    void for_each(MAP map, const F& visit) const { // by number
        for_each_at(map, 0, height, visit);
    }
    size_t cell_count() const { return cells.size(); }
    void clear() { cells.clear(); }

private:
    MAP set_at(MAP map, unsigned i, const PTENV* e, unsigned level);
    MAP meet_at(MAP a, MAP b, unsigned level, BINDINGS& bindings);
    bool equal_at(MAP a, MAP b, unsigned level) const;
    MAP kept(const CELL& cell, MAP like_a, MAP like_b);
    template <class F>
    void for_each_at(MAP map, unsigned first, unsigned level, const F& visit) const {
        if (!map) return;
        for (unsigned k = 0; k < CELL::WIDTH; ++k) {
            const unsigned i = first << 4 | k;
            if (!map->below[k]) continue;
            if (level)
                for_each_at(static_cast<MAP>(map->below[k]), i, level - 1, visit);
            else
                visit(i, static_cast<const PTENV*>(map->below[k]));
        }
    }

    unsigned height = 0;
    std::deque<CELL> cells;
};

// ---- The state at a place

// `own`: of pointers that only their NAME writes. `exposed`: of the others, which calls and stores may change.
struct PT_STATE {
    POINTER_MAPS::MAP own = nullptr, exposed = nullptr;
};

// All that is known of a function.
struct PT_STORE {
    struct POINTER {
        SYMTAB* sym;
        bool is_own;
    };
    static constexpr unsigned NONE = ~0u;

    PT_STORE() : run(next_run()) {}
    unsigned number_of(const SYMTAB* sym) const {
        const unsigned* number = numbers.find(sym);
        return number ? *number : NONE;
    }
    const PTENV* binding(const SYMTAB* sym, const PT_STATE& s) const {
        const unsigned i = number_of(sym);
        if (i == NONE) return nullptr;
        return maps.get(pointers[i].is_own ? s.own : s.exposed, i);
    }
    void bind(unsigned i, const PTENV* e, PT_STATE& s) {
        POINTER_MAPS::MAP& map = pointers[i].is_own ? s.own : s.exposed;
        map = maps.set(map, i, e);
    }
    PT_STATE meet(const PT_STATE& a, const PT_STATE& b) {
        return {maps.meet(a.own, b.own, bindings), maps.meet(a.exposed, b.exposed, bindings)};
    }
    bool equal(const PT_STATE& a, const PT_STATE& b) const {
        return maps.equal(a.own, b.own) && maps.equal(a.exposed, b.exposed);
    }

    const uint32_t run;
    BINDINGS bindings;
    POINTER_MAPS maps;
    std::vector<POINTER> pointers;                       // by number, in the order in which they are met
    SYMBOL_TABLE<unsigned> numbers;
    SIDE_TABLE<PT_STATE> PT_IN, PT_OUT;                  // at the start and end of a block

private:
    static uint32_t next_run(); // unique in the process, never 0
};
PT_STORE* PT_store(); // of the current function while the fact is known, or null

// ---- The effect of statements (points_to_transfer.cpp)

class PT_TRANSFER {
public:
    explicit PT_TRANSFER(PT_STORE& s) : store(s) {}
    // `s` becomes what holds behind the statement. `look` gets the tree with what holds while it is evaluated.
    using LOOK = std::function<void(const NODE*, const PT_STATE&)>;
    void statement(const NODE* t, PT_STATE& s, const LOOK& look = {});
    void bind_accesses(const NODE* tree, const PT_STATE& s); // gives its accesses their bindings
    // A pointer expression; null for anything.
    const PTENV* evaluate(const NODE* pointer, const PT_STATE& s);

private:
    const PTENV* of_base(const NODE* base, const PT_STATE& s);
    void drop_exposed(const WRITE& w, PT_STATE& s);
    void drop_written(const WRITE& w, PT_STATE& s);
    const PTENV* assigned_value(const NODE* t, unsigned pointer, const PT_STATE& s);
    void apply_root(const NODE* t, PT_STATE& s);
    void refine(const NODE* condition, PT_STATE& s);
    void refine_pointer(int op, const NODE* pointer, const NODE* other, PT_STATE& s);

    PT_STORE& store;
};
// The pointer variable that a tree is as a whole, if bindings of it are kept; `PT_STORE::NONE` for any other tree.
unsigned simple_pointer(const PT_STORE& store, const NODE* t);

// ---- Across calls (points_to_calls.cpp)

AARG passed_value(FUNINFO* callee, size_t index, const NODE* argument, const PTENV* e); // by the current function
