// A hash map of small records, in two vectors: what passes fill and empty for each statement or block.
//
// Places are searched in order from the one that the hash names (open addressing), entries stand in the order in which they
// came, and emptying costs what was entered. Nothing is taken out alone.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <utility>
#include <vector>

template <class K, class V, class HASH = std::hash<K>>
class FLAT_MAP {
public:
    // The value, made if it is not there. A reference is good until the next one is made.
    V& operator[](const K& key) {
        if ((entries.size() + 1) * 2 > places.size()) grow();
        uint32_t& place = places[place_of(key)];
        if (!place) {
            entries.push_back({key, V()});
            place = static_cast<uint32_t>(entries.size());
        }
        return entries[place - 1].second;
    }
    const V* find(const K& key) const {
        if (entries.empty()) return nullptr;
        const uint32_t place = places[place_of(key)];
        return place ? &entries[place - 1].second : nullptr;
    }
    size_t size() const { return entries.size(); }
    bool empty() const { return entries.empty(); }
    void clear() { // keeps its room
        if (entries.size() * 8 > places.size())
            places.assign(places.size(), 0);
        else
            for (size_t i = entries.size(); i-- > 0;) places[place_of(entries[i].first)] = 0; // the last one first
        entries.clear();
    }

private:
    size_t place_of(const K& key) const {
        constexpr uint64_t GOLDEN = 0x9e3779b97f4a7c15; // spreads hashes that are the keys themselves, as those of pointers
        const size_t mask = places.size() - 1;
        size_t at = (HASH()(key) * GOLDEN >> 32) & mask;
        while (places[at] && !(entries[places[at] - 1].first == key)) at = (at + 1) & mask;
        return at;
    }
    void grow() {
        places.assign(places.empty() ? 16 : places.size() * 2, 0);
        for (size_t i = 0; i < entries.size(); ++i) places[place_of(entries[i].first)] = static_cast<uint32_t>(i + 1);
    }

    std::vector<std::pair<K, V>> entries;
    std::vector<uint32_t> places; // number of the entry; 0: none. A power of two, at least half of them empty
};
