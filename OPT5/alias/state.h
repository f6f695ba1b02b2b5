// What the sources of this room share: the marks, and how pointers get their values.
#pragma once

#include <unordered_set>
#include <vector>

class FUNINFO;
class NODE;
class SYMTAB;

bool marks_are_known();                             // of the current function
bool groups_are_known();                            // the groups of pointers, for the current function

// How the pointer variables of a function get their values.
struct POINTER_WRITES {
    // One value that a variable is given; null: one that is not known.
    struct DEFINITION {
        SYMTAB* sym;
        const NODE* value;
    };
    std::vector<DEFINITION> definitions; // those that step a pointer along its object left out
    std::unordered_set<const SYMTAB*> stepped;

    void collect(const NODE* t); // of one node
};
POINTER_WRITES pointer_writes(const FUNINFO* f);

void build_groups(const POINTER_WRITES& writes);
// What each pointer variable of the current function points into, in its SPMAP.
void find_pointees(const POINTER_WRITES& writes);
