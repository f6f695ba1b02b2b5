// Shared by the sources of the type package, not for its users.
#pragma once

#include "TYPES/type.h"

#include <set>
#include <utility>

uint64_t tp_bytes_in_use();

inline uint64_t mix_hash(uint64_t h, uint64_t v) {
    h ^= v + 0x9E3779B97F4A7C15u + (h << 6) + (h >> 2);
    h *= 0xFF51AFD7ED558CCDu;
    return h ^ h >> 33;
}

// One object, or two that were merged or found equal when they were registered.
inline bool same_type(const TYPE* a, const TYPE* b) { return a == b || (a && b && a->uid && a->uid == b->uid); }

// Pairs of types that a comparison still has to look at. Comparing two types is a walk over pairs, not a recursion:
// chains of types may be as long as the input file, and structures refer to themselves. A pair met again while it is
// being compared counts as equal, which is right since the walk fails as a whole if any pair differs.
class TYPE_PAIRS {
public:
    using PAIR = std::pair<const TYPE*, const TYPE*>;

    void add(const TYPE* a, const TYPE* b) {
        if (!same_type(a, b)) todo_m.push_back({a, b});
    }
    bool empty() const { return todo_m.empty(); }
    PAIR take() {
        PAIR p = todo_m.back();
        todo_m.pop_back();
        return p;
    }
    // True the first time that the pair is asked for. Needed at types with more than one part only.
    bool first_visit(const TYPE* a, const TYPE* b) { return seen_m.insert({a, b}).second; }

private:
    std::vector<PAIR> todo_m;
    std::set<PAIR> seen_m; // membership only, its order decides nothing
};

// Makes `from` stand for `to`, for good. The caller has taken it from its base's list and holds rt_lock.
void link_types(TYPE* from, TYPE* to);

// Compares everything of two extras records but the types in them, which go to `pairs`.
bool csu_extras_alike(const CSU_EXTRAS* a, const CSU_EXTRAS* b, TYPE_PAIRS& pairs);
bool params_alike(const fkPARAM* a, const fkPARAM* b, TYPE_PAIRS& pairs);
