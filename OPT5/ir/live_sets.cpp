#include "OPT5/ir/live_sets.h"

#include <algorithm>

namespace {

LIVE_SETS::ENTRY* entry_of(LIVE_SETS* sets, const BBLK* bb) {
    return sets && sets->at_entry[bb].is_known ? &sets->at_entry[bb] : nullptr;
}

LIVE_SETS* sets_of(const BBLK* bb) { return bb->owner()->live_sets.get(); }

// A copy of the list at the end of all; where it starts.
uint32_t copy_to_end(std::vector<uint16_t>& lists, const LIVE_SETS::ENTRY& list) {
    const auto from = static_cast<uint32_t>(lists.size());
    lists.resize(from + list.count);
    std::copy_n(lists.begin() + list.from, list.count, lists.begin() + from);
    return from;
}

} // namespace

bool live_at_entry_is_known(const BBLK* bb) { return entry_of(sets_of(bb), bb) != nullptr; }

bool is_live_at_entry(const BBLK* bb, int bit) {
    LIVE_SETS* sets = sets_of(bb);
    const LIVE_SETS::ENTRY& entry = *entry_of(sets, bb);
    const auto first = sets->lists.begin() + entry.from;
    return std::binary_search(first, first + entry.count, bit);
}

void set_live_at_entry(const BBLK* bb, int bit, bool is_live) {
    LIVE_SETS* sets = sets_of(bb);
    LIVE_SETS::ENTRY& entry = *entry_of(sets, bb);
    auto first = sets->lists.begin() + entry.from;
    const auto place = std::lower_bound(first, first + entry.count, bit) - first;
    const bool was_live = place < entry.count && first[place] == bit;
    if (is_live == was_live) return;
    if (is_live) {
        entry.from = copy_to_end(sets->lists, entry);
        sets->lists.insert(sets->lists.begin() + entry.from + place, static_cast<uint16_t>(bit));
        ++entry.count;
    } else {
        std::copy(first + place + 1, first + entry.count, first + place);
        --entry.count;
    }
}

void add_live_at_exit(const BBLK* bb, BITVEC& live) {
    LIVE_SETS* sets = sets_of(bb);
    for (const EDGE* e = bb->successors; e; e = e->rest) {
        const LIVE_SETS::ENTRY* entry = entry_of(sets, e->first);
        if (!entry) return live.set_all();
        for (uint32_t i = 0; i < entry->count; ++i) live.set(sets->lists[entry->from + i]);
    }
}

void copy_live_at_entry(const BBLK* bb, const BBLK* made) {
    LIVE_SETS* sets = sets_of(bb);
    const LIVE_SETS::ENTRY* entry = entry_of(sets, bb);
    if (!entry) return;
    const LIVE_SETS::ENTRY copy{copy_to_end(sets->lists, *entry), entry->count, true};
    sets->at_entry[made] = copy;
}
