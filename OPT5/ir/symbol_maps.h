// Two maps of a function by symbol: what a pointer variable points into, and the value that a variable has throughout.
#pragma once

#include "XINT/int65.h"

#include <cstdio>
#include <unordered_map>

class NODE;
class SYMTAB;

INT65 size_in_units(const SYMTAB* object); // 16-bit units

// SPMAP: the object that each pointer variable points into. No entry: nothing was said; bottom: anything.
class SPMAP {
public:
    struct SPINFO {
        SYMTAB* object = nullptr; // null at the bottom
        INT65 offset;             // of the pointer from the object's start, in 16-bit units, if `is_precise`
        INT65 width;              // of the part of the object that it may lie in, from `offset` on, in the same unit
        bool is_precise = false;
    };
    bool is_bound(const SYMTAB* sym) const { return map.count(sym) != 0; }
    bool is_bottom(const SYMTAB* sym) const; // bound, and to anything
    void remove(const SYMTAB* sym) { map.erase(sym); }
    void clear() { std::unordered_map<const SYMTAB*, SPINFO>().swap(map); } // the memory too
    void print(FILE* out) const; // in order of the symbols' indexes

    // Of a bound symbol; at the bottom no object, 0 and false.
    SYMTAB* object(const SYMTAB* sym) const;
    INT65 offset(const SYMTAB* sym) const;
    INT65 width(const SYMTAB* sym) const;
    bool is_precise(const SYMTAB* sym) const;

    void set_mapping(const SYMTAB* sym, SYMTAB* object, INT65 offset, INT65 width, bool precise);
    void set_bottom(const SYMTAB* sym) { map[sym] = SPINFO(); }
    void copy_mapping(const SYMTAB* to, const SYMTAB* from);
    // `to` may also have the values of `from`, or those of a pointer value; true if that changed it. Merging with the
    // bottom, or with what is not bound, gives the bottom.
    bool merge_mapping(const SYMTAB* to, const SYMTAB* from);
    bool merge_mapping(const SYMTAB* to, const SPINFO& info);
    // Pointers into `old_object` now point into `new_object`, `shift` units further on; `precise` false forgets
    // offsets.
    void remap_pointees(const SYMTAB* old_object, SYMTAB* new_object, INT65 shift, INT65 width, bool precise);
    void set_pointee(const SYMTAB* sym, const NODE* pointer);
    SPINFO pointee_of(const NODE* pointer) const; // the bottom where it cannot be told

private:
    std::unordered_map<const SYMTAB*, SPINFO> map; // looked up; walked only where the order decides nothing
};

// SNMAP: the values in force. It owns its trees.
class SNMAP {
public:
    SNMAP() = default;
    SNMAP(const SNMAP&) = delete;
    SNMAP& operator=(const SNMAP&) = delete;
    ~SNMAP() { clear(); }

    // A fresh copy, or null. With `borrowed` the map's own tree. A null symbol ends the run.
    NODE* value(const SYMTAB* sym, bool borrowed = false) const;
    void set_value(const SYMTAB* sym, NODE* tree); // takes the tree
    void remove(const SYMTAB* sym);
    void clear();
    bool empty() const { return map.empty(); }
    void print(FILE* out) const; // in order of the symbols' indexes

private:
    std::unordered_map<const SYMTAB*, NODE*> map; // looked up; walked only where the order decides nothing
};
