// PBSET. An element is in the set where `sparse` and `dense` point at each other, so that neither needs to be cleared:
// what `sparse` holds for other elements may be anything.

#include "BITVEC/bitvec.h"
#include "UTIL/safemem.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>

namespace {

constexpr uint32_t MAX_ELEMENT = 65535;

uint32_t round_up(uint32_t n, uint32_t unit) { return (n + unit - 1) / unit * unit; }

// The memory is zeroed once, when it is made, for the sake of checkers.
void grow_sparse(PBSET* set, uint32_t elements) {
    uint32_t old = set->max_element + 1;
    if (elements <= old) return;
    set->sparse = static_cast<uint16_t*>(saferealloc(set->sparse, elements * sizeof(uint16_t)));
    memset(set->sparse + old, 0, (elements - old) * sizeof(uint16_t));
    set->max_element = elements - 1;
}

void grow_dense(PBSET* set) {
    set->dense_capacity += std::min(set->dense_capacity, 256u);
    set->dense = static_cast<uint16_t*>(saferealloc(set->dense, set->dense_capacity * sizeof(uint16_t)));
}

} // namespace

PBSET* make_PBSET(int universe, int capacity) {
    if (universe <= 0) universe = 15;
    if (capacity <= 0) capacity = std::min(universe + 1, 16);
    uint32_t elements = round_up(static_cast<uint32_t>(std::min(universe, 65536)), 16);
    uint32_t members = round_up(static_cast<uint32_t>(std::min(capacity, 65536)), 16);
    PBSET* set = static_cast<PBSET*>(safecalloc(1, sizeof(PBSET)));
    set->max_element = elements - 1;
    set->dense_capacity = members;
    set->sparse = static_cast<uint16_t*>(safecalloc(elements, sizeof(uint16_t)));
    set->dense = static_cast<uint16_t*>(safecalloc(members, sizeof(uint16_t)));
    return set;
}

bool element_is_in_PBSET(int e, const PBSET* set) {
    if (e < 0 || static_cast<uint32_t>(e) > set->max_element) return false;
    uint16_t at = set->sparse[e];
    return at < set->count && set->dense[at] == e;
}

void add_element_to_PBSET(int e, PBSET* set) {
    if (e < 0 || static_cast<uint32_t>(e) > MAX_ELEMENT || element_is_in_PBSET(e, set)) return;
    if (static_cast<uint32_t>(e) > set->max_element) grow_sparse(set, round_up(static_cast<uint32_t>(e) + 1, 32));
    if (set->count == set->dense_capacity) grow_dense(set);
    set->sparse[e] = static_cast<uint16_t>(set->count);
    set->dense[set->count++] = static_cast<uint16_t>(e);
}

void remove_element_from_PBSET(int e, PBSET* set) {
    if (!element_is_in_PBSET(e, set)) return;
    uint16_t gap = set->sparse[e];
    uint16_t last = set->dense[--set->count];
    set->dense[gap] = last;
    set->sparse[last] = gap;
}

void make_PBSET_empty(PBSET* set) { set->count = 0; }
bool another_element_in_PBSET(uint32_t i, const PBSET* set) { return i < set->count; }
int next_element_in_PBSET(uint32_t i, const PBSET* set) { return i < set->count ? set->dense[i] : -1; }

void extend_PBSET(PBSET* set, int universe) {
    if (universe > 0) grow_sparse(set, round_up(static_cast<uint32_t>(std::min(universe, 65536)), 16));
}

void erase_PBSET(PBSET* set) {
    if (!set) return;
    free(set->sparse);
    free(set->dense);
    free(set);
}

void dump_PBSET(const PBSET* set, FILE* out) {
    fprintf(out, "%u of %u:", set->count, set->max_element + 1);
    for (uint32_t i = 0; i < set->count; ++i) fprintf(out, " %d", set->dense[i]);
    fputc('\n', out);
}
