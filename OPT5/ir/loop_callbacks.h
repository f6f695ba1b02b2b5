// What the loop hierarchy tells the rooms below the one that keeps it.
//
// That room, OPT5/dd, installs the callbacks. While one is null, a loop tells nothing of that kind.
#pragma once

#include <cstdint>
#include <vector>

class BBLK;
class NODE;
class SYMTAB;
struct LOOP;

struct LOOP_CALLBACKS {
    struct LOOP* (*parent)(const struct LOOP* loop) = nullptr; // null of the outermost
    // Conditions that hold throughout the loop, and one more of them; the tree is taken.
    const std::vector<NODE*>& (*givens)(const struct LOOP* loop) = nullptr;
    void (*add_given)(struct LOOP* loop, NODE* condition) = nullptr;
    bool (*is_constant_in)(const NODE* tree, const struct LOOP* loop) = nullptr; // one value in all iterations
    bool (*is_counter)(const SYMTAB* sym, const struct LOOP* loop) = nullptr;    // an induction variable without other use
    // Bounds of a variable that no code has but the loop's records: the count of iterations. False for another, or
    // where they are not known.
    bool (*bounds_of_count)(const SYMTAB* sym, const struct LOOP* loop, int64_t* low, int64_t* high) = nullptr;
    bool (*is_back_edge)(const BBLK* from, const BBLK* to) = nullptr;
    void (*edge_was_split)(BBLK* from, BBLK* middle, BBLK* to) = nullptr;
    // Makes the loop run as assumed only where the two turn out disjoint ahead of it; false: that cannot be asked.
    bool (*predicate_disjointness)(const NODE* a, const NODE* b, struct LOOP* loop) = nullptr;
};
extern LOOP_CALLBACKS loop_callbacks;
