// Environments: which values each tracked variable may have at one point of a function.
//
// An environment binds some of the tracked symbols to sets; a symbol without a binding may have any value of its type. It
// is a handle to a tree over the symbols' numbers, parts of which are shared with other environments and never change:
// binding one symbol copies one path, and where two environments share a part no walk looks into it. So what a function
// costs grows with the bindings that change from block to block, not with blocks times symbols. All environments of a
// function live in one store, from `init_vpenv_allocation` to `erase_vpenv`.
#pragma once

#include "OPT5/ir/symbol_table.h"
#include "OPT5/vp/vpset.h"

#include <cstdint>
#include <deque>
#include <unordered_map>
#include <vector>

class SYMTAB;

class vpenv {
public:
    bool operator==(const vpenv& o) const { return root == o.root; }
    bool operator!=(const vpenv& o) const { return root != o.root; }

private:
    friend class VPENV_STORE;
    uint32_t root = 0; // 0: nothing is bound
};

bool sym_uid_less(const SYMTAB* a, const SYMTAB* b);

class VPENV_STORE {
public:
    // The symbols that environments may bind; those from `first_global` on are what a call may write.
    VPENV_STORE(std::vector<SYMTAB*> tracked, size_t first_global);

    int number_of(const SYMTAB* sym) const; // -1: not tracked
    SYMTAB* symbol(int number) const { return symbols[static_cast<size_t>(number)]; }
    const vpset* find(vpenv env, int number) const; // null without a binding
    // A set that says nothing, bottom of the symbol's type or empty, takes the binding away.
    vpenv bind(vpenv env, int number, const vpset& set) { return bound(env, number, set, false); }
    // The same for the one holder of an environment that was made since `begin_exclusive`: it is changed in place.
    vpenv bind_exclusively(vpenv env, int number, const vpset& set) { return bound(env, number, set, true); }
    void begin_exclusive() { ++epoch; }
    vpenv without_globals(vpenv env);
    vpenv join(std::vector<vpenv> envs); // what holds on each of several edges; at least one

    // `visit(number, a's set or null, b's set or null)` for each symbol whose set differs, in order.
    template <class F>
    void for_each_difference(vpenv a, vpenv b, const F& visit) const {
        difference(levels, a.root, b.root, 0, visit);
    }
    template <class F>
    void for_each_binding(vpenv env, const F& visit) const {
        difference(levels, 0, env.root, 0, [&](int number, const vpset*, const vpset* set) { visit(number, *set); });
    }

private:
    static constexpr int BITS = 3, WIDTH = 1 << BITS;
    struct PART {
        uint32_t below[WIDTH] = {}; // parts, or at level 0 sets
        uint32_t epoch = 0;
    };
    struct HASH {
        size_t operator()(const vpset& s) const;
    };

    vpenv bound(vpenv env, int number, const vpset& set, bool in_place);
    uint32_t bound(int level, uint32_t part, int number, uint32_t set, bool in_place);
    uint32_t cut(int level, uint32_t part, int base);
    uint32_t joined(int level, std::vector<uint32_t> parts, int base);
    uint32_t joined(int level, uint32_t a, uint32_t b, int base);
    uint32_t joined_pair(uint32_t a, uint32_t b); // of sets
    uint32_t joined_sets(const std::vector<uint32_t>& sets, int number);
    uint32_t interned(const vpset& set, int number);
    uint32_t kept(const PART& part); // 0 for one without bindings
    const vpset* set_of(uint32_t id) const { return id ? &sets[id] : nullptr; }

    template <class F>
    void difference(int level, uint32_t a, uint32_t b, int base, const F& visit) const {
        if (a == b) return;
        if (level < 0) return visit(base, set_of(a), set_of(b));
        for (int i = 0; i < WIDTH; ++i)
            difference(level - 1, parts[a].below[i], parts[b].below[i], base + (i << (BITS * level)), visit);
    }

    std::vector<SYMTAB*> symbols;
    int first_global;
    SYMBOL_TABLE<int> numbers;
    int levels = 0;
    uint32_t epoch = 1;
    std::vector<PART> parts{PART()}; // part 0 binds nothing
    std::deque<vpset> sets{vpset()}; // whose addresses stay
    std::unordered_map<vpset, uint32_t, HASH> ids;     // looked up alone
    std::unordered_map<uint64_t, uint32_t> known_joins; // of two sets; looked up alone
};

// ---- Of the current function
extern VPENV_STORE* vpenv_store; // null outside a run
void init_vpenv_allocation(std::vector<SYMTAB*> tracked, size_t first_global);
void erase_vpenv();
vpenv assign_vpset_in_vpenv(SYMTAB* sym, const vpset& set, vpenv env); // what is not tracked is left out
void dump_vpenv(vpenv env, const char* title);
