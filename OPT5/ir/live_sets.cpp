#include "OPT5/ir/live_sets.h"

#include <algorithm>

namespace {

LIVE_SETS::ENTRY* entry_of(const BBLK* bb) {
    LIVE_SETS* sets = bb->owner()->live_sets.get();
    return sets && sets->at_entry[bb].is_known ? &sets->at_entry[bb] : nullptr;
}

} // namespace

bool live_at_entry_is_known(const BBLK* bb) { return entry_of(bb) != nullptr; }

bool is_live_at_entry(const BBLK* bb, int bit) {
    const std::vector<uint16_t>& live = entry_of(bb)->live;
    return std::binary_search(live.begin(), live.end(), bit);
}

void set_live_at_entry(const BBLK* bb, int bit, bool is_live) {
    std::vector<uint16_t>& live = entry_of(bb)->live;
    const auto at = std::lower_bound(live.begin(), live.end(), bit);
    const bool was_live = at != live.end() && *at == bit;
    if (is_live && !was_live) live.insert(at, static_cast<uint16_t>(bit));
    if (!is_live && was_live) live.erase(at);
}

void add_live_at_exit(const BBLK* bb, BITVEC& live) {
    for (const EDGE* e = bb->successors; e; e = e->rest) {
        const LIVE_SETS::ENTRY* entry = entry_of(e->first);
        if (!entry) return live.set_all();
        for (uint16_t bit : entry->live) live.set(bit);
    }
}

void copy_live_at_entry(const BBLK* bb, const BBLK* made) {
    if (const LIVE_SETS::ENTRY* entry = entry_of(bb)) {
        LIVE_SETS::ENTRY copy = *entry;
        bb->owner()->live_sets->at_entry[made] = std::move(copy);
    }
}
