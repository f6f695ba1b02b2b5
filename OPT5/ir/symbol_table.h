// Something for each symbol that a pass meets, while the pass runs.
#pragma once

#include "OPT5/ir/symtab.h"

#include <cstddef>
#include <vector>

// Symbols are numbered over the whole run, so that a vector by number would be as long for a small function as for the
// whole program. The symbols of one function have numbers close to each other: their low bits are places of a table that
// is twice as large as its content, and nearly all stand at their own. No memory is taken for a single entry, which is
// what a map of the standard library spends its time on.
template <class V>
class SYMBOL_TABLE {
public:
    // Of a symbol, or of null; made as `V()` where there is none. A reference lives until the next one is made.
    V& operator[](const SYMTAB* sym) {
        if (values.size() * 2 >= slots.size()) grow();
        SLOT& slot = slots[place_of(sym)];
        if (slot.value == NONE) {
            slot = {sym, static_cast<int>(values.size())};
            values.emplace_back();
        }
        return values[static_cast<size_t>(slot.value)];
    }
    const V* find(const SYMTAB* sym) const { // null where there is none
        if (values.empty()) return nullptr;
        const SLOT& slot = slots[place_of(sym)];
        return slot.value == NONE ? nullptr : &values[static_cast<size_t>(slot.value)];
    }
    V* find(const SYMTAB* sym) { return const_cast<V*>(static_cast<const SYMBOL_TABLE*>(this)->find(sym)); }
    void clear() { // keeps the memory
        if (values.empty()) return;
        values.clear();
        slots.assign(slots.size(), SLOT());
    }

private:
    static constexpr int NONE = -1;
    static constexpr size_t FEWEST = 32;
    struct SLOT {
        const SYMTAB* sym = nullptr;
        int value = NONE;
    };

    // Where the symbol stands, or is to be put.
    size_t place_of(const SYMTAB* sym) const {
        size_t i = sym ? sym->uid : 0;
        for (;; ++i) {
            const SLOT& slot = slots[i & (slots.size() - 1)]; // a power of two
            if (slot.value == NONE || slot.sym == sym) return i & (slots.size() - 1);
        }
    }
    void grow() {
        std::vector<SLOT> old(slots.empty() ? FEWEST : 2 * slots.size());
        old.swap(slots);
        for (const SLOT& slot : old)
            if (slot.value != NONE) slots[place_of(slot.sym)] = slot;
        values.reserve(slots.size() / 2);
    }

    std::vector<SLOT> slots;
    std::vector<V> values; // in the order in which they were made
};
