// What pointer variables point into, and the values of variables.

#include "OPT5/ir/symbol_maps.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace {

template <class MAP>
auto in_order(const MAP& map) {
    std::vector<std::pair<const SYMTAB*, const typename MAP::mapped_type*>> entries;
    for (const auto& [sym, value] : map) entries.emplace_back(sym, &value);
    std::sort(entries.begin(), entries.end(), [](const auto& a, const auto& b) {
        return std::make_pair(a.first->level, a.first->index) < std::make_pair(b.first->level, b.first->index);
    });
    return entries;
}

bool same_place(const SPMAP::SPINFO& a, const SPMAP::SPINFO& b) {
    return a.object == b.object && a.is_precise == b.is_precise && a.offset == b.offset && a.width == b.width;
}

SPMAP::SPINFO somewhere_in(SYMTAB* object) { return {object, INT65(0), size_in_units(object), false}; }

} // namespace

INT65 size_in_units(const SYMTAB* object) { return INT65(static_cast<int64_t>((object->size + 15) / 16)); }

// ---- SPMAP

bool SPMAP::is_bottom(const SYMTAB* sym) const { return is_bound(sym) && !object(sym); }

SYMTAB* SPMAP::object(const SYMTAB* sym) const {
    auto it = map.find(sym);
    return it == map.end() ? nullptr : it->second.object;
}

INT65 SPMAP::offset(const SYMTAB* sym) const {
    auto it = map.find(sym);
    return it == map.end() ? INT65(0) : it->second.offset;
}

INT65 SPMAP::width(const SYMTAB* sym) const {
    auto it = map.find(sym);
    return it == map.end() ? INT65(0) : it->second.width;
}

bool SPMAP::is_precise(const SYMTAB* sym) const {
    auto it = map.find(sym);
    return it != map.end() && it->second.is_precise;
}

void SPMAP::set_mapping(const SYMTAB* sym, SYMTAB* object, INT65 offset, INT65 width, bool precise) {
    map[sym] = {object, offset, width, precise};
}

void SPMAP::copy_mapping(const SYMTAB* to, const SYMTAB* from) {
    auto it = map.find(from);
    if (it == map.end())
        map.erase(to);
    else
        map[to] = SPINFO(it->second);
}

bool SPMAP::merge_mapping(const SYMTAB* to, const SYMTAB* from) {
    auto it = map.find(from);
    return merge_mapping(to, it == map.end() ? SPINFO() : SPINFO(it->second));
}

bool SPMAP::merge_mapping(const SYMTAB* to, const SPINFO& info) {
    auto [it, is_first] = map.emplace(to, info);
    if (is_first) return true;
    SPINFO& known = it->second;
    if (!known.object || same_place(known, info)) return false;
    SPINFO merged = known.object == info.object ? somewhere_in(known.object) : SPINFO();
    if (same_place(known, merged)) return false;
    known = merged;
    return true;
}

void SPMAP::remap_pointees(const SYMTAB* old_object, SYMTAB* new_object, INT65 shift, INT65 width, bool precise) {
    for (auto& entry : map) {
        SPINFO& info = entry.second;
        if (info.object != old_object) continue;
        info.object = new_object;
        info.is_precise &= precise;
        info.offset = info.is_precise ? info.offset + shift : INT65(0);
        info.width = info.is_precise ? width : size_in_units(new_object);
    }
}

SPMAP::SPINFO SPMAP::pointee_of(const NODE* p) const {
    INT65 offset;
    bool precise = true;
    for (;;) {
        switch (p->op) {
        case IDENTITY:
        case OUIALIGN:
        case NONALIGN: p = p->left; continue;
        case PCONV:
        case ISP2CHAR:
            if (!p->left->type->is_pointer()) return SPINFO();
            p = p->left;
            continue;
        case PLUS:
        case MINUS: {
            const NODE *base = p->left, *index = p->right;
            if (p->op == PLUS && !base->type->is_pointer()) std::swap(base, index);
            if (!base->type->is_pointer()) return SPINFO();
            if (index->op == ICON)
                offset = p->op == PLUS ? offset + index->u.lval : offset - index->u.lval;
            else
                precise = false;
            p = base;
            continue;
        }
        case UAND: {
            int64_t bits = 0;
            const NODE* object = without_members(static_cast<const NODE*>(p->left), &bits);
            offset = offset + INT65(bits >> 4);
            if (object->op == UMULT) { // the address of what a pointer points to
                if (object->right && object->right->op == ICON)
                    offset = offset + object->right->u.lval;
                else
                    precise &= !object->right;
                p = object->left;
                continue;
            }
            if (object->op != NAME || !object->u.sym || object->u.sym->is_function()) return SPINFO();
            SYMTAB* sym = object->u.sym;
            if (!precise) return somewhere_in(sym);
            return {sym, offset, size_in_units(sym) - offset, true};
        }
        case NAME: {
            auto it = map.find(p->u.sym);
            if (it == map.end() || !it->second.object) return SPINFO();
            SPINFO info = it->second;
            if (!precise || !info.is_precise) return somewhere_in(info.object);
            info.offset = info.offset + offset;
            info.width = info.width - offset;
            return info;
        }
        default: return SPINFO();
        }
    }
}

void SPMAP::set_pointee(const SYMTAB* sym, const NODE* pointer) { map[sym] = pointee_of(pointer); }

void SPMAP::print(FILE* out) const {
    for (const auto& [sym, info] : in_order(map)) {
        if (!info->object) {
            std::fprintf(out, "\t%s -> anything\n", sym->name);
            continue;
        }
        std::fprintf(out, "\t%s -> %s", sym->name, info->object->name);
        if (info->is_precise)
            std::fprintf(out, " + %s (%s)\n", int2text(info->offset, tp->long_t, 10, 0),
                         int2text(info->width, tp->long_t, 10, 1));
        else
            std::fprintf(out, " + ?\n");
    }
}

// ---- SNMAP

NODE* SNMAP::value(const SYMTAB* sym, bool borrowed) const {
    if (!sym) abort_optimizer();
    auto it = map.find(sym);
    if (it == map.end()) return nullptr;
    return borrowed ? it->second : copy_tree(it->second);
}

void SNMAP::set_value(const SYMTAB* sym, NODE* tree) {
    if (!sym) abort_optimizer();
    NODE*& slot = map[sym];
    erase_tree(slot);
    slot = tree;
}

void SNMAP::remove(const SYMTAB* sym) {
    if (!sym) abort_optimizer();
    auto it = map.find(sym);
    if (it == map.end()) return;
    erase_tree(it->second);
    map.erase(it);
}

void SNMAP::clear() {
    for (auto& entry : map) erase_tree(entry.second);
    std::unordered_map<const SYMTAB*, NODE*>().swap(map);
}

void SNMAP::print(FILE* out) const {
    for (const auto& [sym, tree] : in_order(map))
        std::fprintf(out, "\t%s = %s\n", sym->name, tree_to_infix(*tree).c_str());
}
