#include "OPT5/vp/vpenv.h"

#include "OPT5/ir/global.h"
#include "OPT5/ir/symtab.h"

#include <algorithm>
#include <memory>

bool sym_uid_less(const SYMTAB* a, const SYMTAB* b) { return a->uid < b->uid; }

size_t VPENV_STORE::HASH::operator()(const vpset& s) const {
    uint64_t h = 0x9E3779B97F4A7C15u;
    for (const VPSLICE& slice : s)
        for (WIDE v : {slice.low, slice.high, slice.step}) {
            h ^= static_cast<uint64_t>(v) + static_cast<uint64_t>(v >> 64);
            h *= 0xFF51AFD7ED558CCDu;
            h ^= h >> 32;
        }
    return h;
}

VPENV_STORE::VPENV_STORE(std::vector<SYMTAB*> tracked, size_t global)
    : symbols(std::move(tracked)), first_global(static_cast<int>(global)) {
    for (size_t i = 0; i < symbols.size(); ++i) numbers[symbols[i]] = static_cast<int>(i);
    while (symbols.size() > size_t(WIDTH) << (BITS * levels)) ++levels;
}

int VPENV_STORE::number_of(const SYMTAB* sym) const {
    const int* number = numbers.find(sym);
    return number ? *number : -1;
}

const vpset* VPENV_STORE::find(vpenv env, int number) const {
    uint32_t part = env.root;
    for (int level = levels; part && level >= 0; --level) part = parts[part].below[(number >> (BITS * level)) & (WIDTH - 1)];
    return set_of(part);
}

uint32_t VPENV_STORE::interned(const vpset& set, int number) {
    if (vpset_is_empty(set) || vpset_is_bottom(set, symbols[static_cast<size_t>(number)]->type)) return 0;
    auto [it, is_new] = ids.try_emplace(set, static_cast<uint32_t>(sets.size()));
    if (is_new) sets.push_back(set);
    return it->second;
}

uint32_t VPENV_STORE::kept(const PART& part) {
    if (std::all_of(part.below, part.below + WIDTH, [](uint32_t p) { return p == 0; })) return 0;
    parts.push_back(part);
    return static_cast<uint32_t>(parts.size() - 1);
}

uint32_t VPENV_STORE::bound(int level, uint32_t part, int number, uint32_t set, bool in_place) {
    if (level < 0) return set;
    const int i = (number >> (BITS * level)) & (WIDTH - 1);
    const uint32_t old = parts[part].below[i], below = bound(level - 1, old, number, set, in_place);
    if (below == old) return part;
    if (in_place && part && parts[part].epoch == epoch && below) {
        parts[part].below[i] = below;
        return part;
    }
    PART changed = parts[part];
    changed.below[i] = below;
    changed.epoch = in_place ? epoch : 0;
    return kept(changed);
}

vpenv VPENV_STORE::bound(vpenv env, int number, const vpset& set, bool in_place) {
    env.root = bound(levels, env.root, number, interned(set, number), in_place);
    return env;
}

uint32_t VPENV_STORE::cut(int level, uint32_t part, int base) {
    const int span = level < 0 ? 1 : WIDTH << (BITS * level);
    if (part == 0 || base >= first_global) return 0;
    if (base + span <= first_global) return part;
    PART changed = parts[part];
    changed.epoch = 0;
    for (int i = 0; i < WIDTH; ++i) changed.below[i] = cut(level - 1, changed.below[i], base + (i << (BITS * level)));
    return std::equal(changed.below, changed.below + WIDTH, parts[part].below) ? part : kept(changed);
}

vpenv VPENV_STORE::without_globals(vpenv env) {
    env.root = cut(levels, env.root, 0);
    return env;
}

uint32_t VPENV_STORE::joined_pair(uint32_t a, uint32_t b) {
    const uint64_t pair = static_cast<uint64_t>(std::min(a, b)) << 32 | std::max(a, b);
    auto it = known_joins.find(pair);
    if (it == known_joins.end()) {
        vpset both;
        vpset_union(&both, sets[pair >> 32], sets[pair & 0xFFFFFFFF]);
        auto [id, is_new] = ids.try_emplace(both, static_cast<uint32_t>(sets.size()));
        if (is_new) sets.push_back(both);
        it = known_joins.emplace(pair, id->second).first;
    }
    return it->second;
}

uint32_t VPENV_STORE::joined_sets(const std::vector<uint32_t>& list, int number) {
    uint32_t all = list[0];
    for (size_t i = 1; i < list.size() && all; ++i) all = joined_pair(all, list[i]);
    return interned(sets[all], number);
}

// The same of two, which is what most joins are of.
uint32_t VPENV_STORE::joined(int level, uint32_t a, uint32_t b, int base) {
    if (a == b || !a || !b) return a == b ? a : 0;
    if (level < 0) return interned(sets[joined_pair(a, b)], base);
    PART all;
    for (int i = 0; i < WIDTH; ++i)
        all.below[i] = joined(level - 1, parts[a].below[i], parts[b].below[i], base + (i << (BITS * level)));
    return kept(all);
}

uint32_t VPENV_STORE::joined(int level, std::vector<uint32_t> list, int base) {
    std::sort(list.begin(), list.end());
    list.erase(std::unique(list.begin(), list.end()), list.end());
    if (list.front() == 0 || list.size() == 1) return list.front();
    if (list.size() == 2) return joined(level, list[0], list[1], base);
    if (level < 0) return joined_sets(list, base);
    PART all;
    for (int i = 0; i < WIDTH; ++i) {
        std::vector<uint32_t> below;
        below.reserve(list.size());
        for (uint32_t part : list) below.push_back(parts[part].below[i]);
        all.below[i] = joined(level - 1, std::move(below), base + (i << (BITS * level)));
    }
    return kept(all);
}

vpenv VPENV_STORE::join(std::vector<vpenv> envs) {
    std::vector<uint32_t> roots;
    roots.reserve(envs.size());
    for (vpenv env : envs) roots.push_back(env.root);
    vpenv all;
    all.root = joined(levels, std::move(roots), 0);
    return all;
}

// ---- Of the current function

VPENV_STORE* vpenv_store = nullptr;
static std::unique_ptr<VPENV_STORE> current_store;

void init_vpenv_allocation(std::vector<SYMTAB*> tracked, size_t first_global) {
    current_store = std::make_unique<VPENV_STORE>(std::move(tracked), first_global);
    vpenv_store = current_store.get();
}

void erase_vpenv() {
    vpenv_store = nullptr;
    current_store.reset();
}

vpenv assign_vpset_in_vpenv(SYMTAB* sym, const vpset& set, vpenv env) {
    const int number = vpenv_store->number_of(sym);
    return number < 0 ? env : vpenv_store->bind(env, number, set);
}

void dump_vpenv(vpenv env, const char* title) {
    if (!fdebug) return;
    debug_printf("%s\n", title);
    vpenv_store->for_each_binding(env, [](int number, const vpset& set) {
        debug_printf("\t   %s\t= %s\n", vpenv_store->symbol(number)->name, vpset2string(set).c_str());
    });
}
