// Bindings: how they are made, moved along their objects, and how two of them meet.
//
// A binding stands for a set of addresses, and every operation here gives a set that is no smaller than the true one.
#include "OPT5/alias/bindings.h"

#include "OPT5/ir/symtab.h"

#include <boost/container_hash/hash.hpp>

#include <algorithm>
#include <numeric>

namespace {

constexpr size_t MOST_TARGETS = 8;
constexpr int BITS_PER_UNIT = 16;
constexpr int64_t FAR = int64_t(1) << 40; // what is further from an object's start is not followed

uint64_t magnitude(int64_t v) { return v < 0 ? -static_cast<uint64_t>(v) : static_cast<uint64_t>(v); }

// Zero is neutral.
int64_t gcd(int64_t a, int64_t b) { return static_cast<int64_t>(std::gcd(magnitude(a), magnitude(b))); }
unsigned gcd(unsigned a, unsigned b) { return std::gcd(a, b); }

// The offset as the place in its class: a set of every `stride`-th place has one record.
void reduce(int64_t& offset, int64_t& stride) {
    if (magnitude(offset) > FAR || magnitude(stride) > FAR) {
        offset = 0;
        stride = 1;
    }
    stride = static_cast<int64_t>(magnitude(stride));
    if (stride && (offset %= stride) < 0) offset += stride;
}

void merge_pairs(int64_t& offset, int64_t& stride, int64_t other_offset, int64_t other_stride) {
    if (offset == other_offset && stride == other_stride) return;
    stride = gcd(gcd(stride, other_stride), offset - other_offset);
    reduce(offset, stride);
}

unsigned target_align(const SYMTAB* base, int64_t offset, int64_t stride) {
    unsigned align = std::max<unsigned>(base->align, BITS_PER_UNIT);
    if (base->type->is_array()) align = std::max(align, base->type->align);
    return static_cast<unsigned>(gcd(gcd(offset, stride) * BITS_PER_UNIT, static_cast<int64_t>(align)));
}

const PTVAR* find_target(const PTENV& e, const SYMTAB* base) {
    for (const PTVAR& t : e.targets)
        if (t.base == base) return &t;
    return nullptr;
}

} // namespace

uint32_t class_category(const SYMTAB* base) {
    if (base->level == 1 || base->is_automatic()) return PT_AUTOL;
    switch (base->sclass) {
    // The linker may be told to put it at a fixed address.
    case SC_EXTDEF: return PT_EXTERN | PT_ADCON;
    case SC_EXTERN: return PT_EXTERN | PT_ADCON | PT_STATICG; // it may declare one that the file defines as a static
    case SC_STATIC: return base->pragma ? PT_STATICG | PT_STATICL | PT_ADCON : PT_STATICG | PT_STATICL;
    default: return PT_ALL;
    }
}

PTVAR make_target(SYMTAB* base, int64_t offset, int64_t stride) {
    OPT_ASSERT(base != NULL);
    reduce(offset, stride);
    return {base, offset, stride, target_align(base, offset, stride)};
}

void settle(PTENV& e) {
    if (e.targets.size() > MOST_TARGETS)
        for (const PTVAR& t : e.targets) e.categories |= class_category(t.base);
    auto covered = [&e](const PTVAR& t) {
        if (!is_covered(t, e.categories)) return false;
        e.align = gcd(e.align, t.align);
        return true;
    };
    e.targets.erase(std::remove_if(e.targets.begin(), e.targets.end(), covered), e.targets.end());
    std::sort(e.targets.begin(), e.targets.end(),
              [](const PTVAR& a, const PTVAR& b) { return a.base->uid < b.base->uid; });
}

PTENV meet_bindings(const PTENV& a, const PTENV& b) {
    PTENV m = a;
    m.categories |= b.categories;
    m.align = gcd(a.align, b.align);
    if (a.parm != b.parm)
        m.parm = nullptr;
    else if (a.parm)
        merge_pairs(m.parm_offset, m.parm_stride, b.parm_offset, b.parm_stride);
    if (!m.parm) m.parm_offset = m.parm_stride = 0;
    for (const PTVAR& t : b.targets) {
        PTVAR* mine = const_cast<PTVAR*>(find_target(m, t.base));
        if (!mine) {
            m.targets.push_back(t);
            continue;
        }
        merge_pairs(mine->offset, mine->stride, t.offset, t.stride);
        mine->align = target_align(mine->base, mine->offset, mine->stride);
    }
    settle(m);
    return m;
}

PTENV shifted(PTENV e, int64_t constant, int64_t stride) {
    if (!constant && !stride) return e;
    auto move = [constant, stride](int64_t& offset, int64_t& steps) {
        offset += constant;
        steps = gcd(steps, stride);
        reduce(offset, steps);
    };
    for (PTVAR& t : e.targets) {
        move(t.offset, t.stride);
        t.align = target_align(t.base, t.offset, t.stride);
    }
    if (e.parm) move(e.parm_offset, e.parm_stride);
    int64_t distance = constant, steps = stride;
    reduce(distance, steps);
    if (e.align) e.align = static_cast<unsigned>(gcd(static_cast<int64_t>(e.align), gcd(distance, steps) * BITS_PER_UNIT));
    e.categories &= ~PT_NULL; // what can be stepped is in an object
    return e;
}

PTENV intersection(const PTENV& a, const PTENV& b) {
    PTENV both = a;
    both.categories &= b.categories;
    auto excluded = [&b](const PTVAR& t) { return !find_target(b, t.base) && !is_covered(t, b.categories); };
    both.targets.erase(std::remove_if(both.targets.begin(), both.targets.end(), excluded), both.targets.end());
    for (const PTVAR& t : b.targets)
        if (is_covered(t, a.categories)) both.targets.push_back(make_target(t.base, 0, 1));
    settle(both);
    return both;
}

// ---- Records

size_t BINDINGS::HASH::operator()(const PTENV* e) const {
    size_t h = e->categories;
    for (const PTVAR& t : e->targets) {
        boost::hash_combine(h, t.base->uid);
        boost::hash_combine(h, t.offset);
        boost::hash_combine(h, t.stride);
    }
    boost::hash_combine(h, e->parm);
    boost::hash_combine(h, e->parm_offset);
    boost::hash_combine(h, e->parm_stride);
    boost::hash_combine(h, e->align);
    return h;
}

bool equal_bindings(const PTENV& a, const PTENV& b) {
    return a.categories == b.categories && a.align == b.align && a.parm == b.parm && a.parm_offset == b.parm_offset &&
           a.parm_stride == b.parm_stride &&
           std::equal(a.targets.begin(), a.targets.end(), b.targets.begin(), b.targets.end(),
                      [](const PTVAR& x, const PTVAR& y) {
                          return x.base == y.base && x.offset == y.offset && x.stride == y.stride && x.align == y.align;
                      });
}

const PTENV* BINDINGS::intern(PTENV&& e) {
    if (!e.parm && (e.categories == PT_ALL || (!e.categories && e.targets.empty()))) return nullptr;
    auto at = table.find(&e);
    if (at != table.end()) return *at;
    records.push_back(std::move(e));
    return *table.insert(&records.back()).first;
}

const PTENV* BINDINGS::meet(const PTENV* a, const PTENV* b) {
    if (a == b || !a || !b) return a == b ? a : nullptr;
    return intern(meet_bindings(*a, *b));
}

// ---- Maps

const PTENV* POINTER_MAPS::get(MAP map, unsigned i) const {
    for (unsigned level = height; map; --level) {
        const void* below = map->below[i >> 4 * level & 15];
        if (level == 0) return static_cast<const PTENV*>(below);
        map = static_cast<MAP>(below);
    }
    return nullptr;
}

POINTER_MAPS::MAP POINTER_MAPS::kept(const CELL& cell, MAP like_a, MAP like_b) {
    bool is_empty = true, is_a = like_a != nullptr, is_b = like_b != nullptr;
    for (unsigned k = 0; k < CELL::WIDTH; ++k) {
        is_empty = is_empty && !cell.below[k];
        is_a = is_a && cell.below[k] == like_a->below[k];
        is_b = is_b && cell.below[k] == like_b->below[k];
    }
    if (is_empty) return nullptr;
    if (is_a) return like_a;
    if (is_b) return like_b;
    cells.push_back(cell);
    return &cells.back();
}

POINTER_MAPS::MAP POINTER_MAPS::set_at(MAP map, unsigned i, const PTENV* e, unsigned level) {
    CELL cell = map ? *map : CELL();
    const void*& below = cell.below[i >> 4 * level & 15];
    if (level == 0)
        below = e;
    else
        below = set_at(static_cast<MAP>(below), i, e, level - 1);
    return kept(cell, map, nullptr);
}

POINTER_MAPS::MAP POINTER_MAPS::meet_at(MAP a, MAP b, unsigned level, BINDINGS& bindings) {
    if (a == b || !a || !b) return a == b ? a : nullptr;
    CELL cell;
    for (unsigned k = 0; k < CELL::WIDTH; ++k) {
        const void *x = a->below[k], *y = b->below[k];
        cell.below[k] = level ? static_cast<const void*>(meet_at(static_cast<MAP>(x), static_cast<MAP>(y), level - 1, bindings))
                              : bindings.meet(static_cast<const PTENV*>(x), static_cast<const PTENV*>(y));
    }
    return kept(cell, a, b);
}

bool POINTER_MAPS::equal_at(MAP a, MAP b, unsigned level) const {
    if (a == b || !a || !b) return a == b;
    for (unsigned k = 0; k < CELL::WIDTH; ++k) {
        const void *x = a->below[k], *y = b->below[k];
        if (x != y && (level == 0 || !equal_at(static_cast<MAP>(x), static_cast<MAP>(y), level - 1))) return false;
    }
    return true;
}
