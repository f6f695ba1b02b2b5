// What the pointers of a function are derived from: their equivalence groups, and the objects that they point into.
//
// Both are facts about all values that a variable ever has, so they hold at every place and need no flow. They see
// assignments to a NAME alone; a pointer that anything else may write is derived from the bottom, and points anywhere.
#include "OPT5/alias/alias.h"

#include "OPT5/alias/effects.h"
#include "OPT5/alias/state.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <map>
#include <set>

// ---- Shapes of pointers

const NODE* pointer_basis(const NODE* p) {
    while (p) {
        switch (p->op) {
        case IDENTITY:
        case OUIALIGN:
        case NONALIGN:
        case SSA_USE:
        case SSA_DEF:
        case SSA_MU:
        case SSA_CHI: p = p->left; continue;
        case PCONV:
        case ISP2CHAR:
            if (!p->left->type->is_pointer()) return nullptr;
            p = p->left;
            continue;
        case PLUS:
        case MINUS:
            if (!p->type->is_pointer()) return nullptr;
            p = p->op == PLUS && !p->left->type->is_pointer() ? p->right : p->left;
            if (!p->type->is_pointer()) return nullptr;
            continue;
        case PLUSPLUS:
        case MINMIN:
        case PLUSASG:
        case MINUSASG: p = p->left; continue;
        case COMMAOP: p = p->right; continue;
        case NAME:
        case UMULT:
        case STDOT:
        case STREF:
        case UAND:
        case SCON: return p;
        default: return nullptr;
        }
    }
    return nullptr;
}

const NODE* address_expr_base(const NODE* pointer) {
    const NODE* base = pointer_basis(pointer);
    while (base && base->op == UAND) {
        const NODE* object = without_members(static_cast<const NODE*>(base->left));
        if (object->op != UMULT && object->op != STREF) return object->op == NAME ? object : nullptr;
        base = pointer_basis(object->left);
    }
    return base;
}

namespace {

bool is_null_constant(const NODE* t) {
    while ((t->op == PCONV || t->op == ISP2CHAR || t->op == SCONV) && t->left) t = t->left;
    return t->op == ICON && t->u.lval.is_zero();
}

} // namespace

void POINTER_WRITES::collect(const NODE* t) {
    if (!writes_left_operand(t->op) || !t->left) return;
    const NODE* to = t->left;
    while (op_wraps_for_SSA(to->op)) to = to->left;
    if (to->op != NAME || !to->u.sym || !to->u.sym->type->is_pointer()) return;
    if (t->op == ASG) {
        definitions.push_back({to->u.sym, t->right});
        return;
    }
    if (t->left == to) stepped.insert(to->u.sym);
    if (t->op != PLUSASG && t->op != MINUSASG && t->op != PLUSPLUS && t->op != MINMIN)
        definitions.push_back({to->u.sym, nullptr});
}

POINTER_WRITES pointer_writes(const FUNINFO* f) {
    POINTER_WRITES writes;
    for_each_tree(f, [&](const NODE* tree) { for_each_subtree(tree, [&](const NODE* t) { writes.collect(t); }); });
    return writes;
}

namespace {

using DEFINITION = POINTER_WRITES::DEFINITION;

bool is_tracked(const SYMTAB* sym) {
    return sym->level > 0 && sym->type->is_pointer() && !sym->type->is_volatile() && !sym->is_aliased() &&
           !sym_appears_in_EHT(sym);
}

// ---- Groups

// The record that a value is derived from, null for none.
PTR* source_of(const NODE* value) {
    const NODE* basis = value ? pointer_basis(value) : nullptr;
    return basis ? find_or_make_PTR_entry(const_cast<NODE*>(basis)) : nullptr;
}

// Derived from no pointer at all: the address of an object, a string, or null.
bool is_address_constant(const NODE* value) {
    if (!value) return false;
    if (is_null_constant(value)) return true;
    const NODE* basis = pointer_basis(value);
    if (basis && basis->op == SCON) return true;
    if (!basis || basis->op != UAND) return false;
    return without_members(static_cast<const NODE*>(basis->left))->op == NAME;
}

PTR* initial_root(PTR* p, PTR* bottom) { return p == bottom || p->member || !is_tracked(p->symbol) ? bottom : nullptr; }

// `is_reassigned`: a parameter that takes another pointer than the one passed, any other variable that takes several.
void mark_reassigned(const std::vector<DEFINITION>& definitions) {
    std::map<PTR*, PTR*> first_source; // looked up alone
    for (const DEFINITION& d : definitions) {
        PTR* p = find_or_make_PTR_entry(d.sym);
        PTR* source = source_of(d.value);
        if (source == p) continue;
        const bool from_prolog = source && source->symbol == map_sym_to_parm(d.sym);
        auto [it, is_first] = first_source.emplace(p, source);
        if (p->flags & PTR_IS_A_PARAMETER ? !from_prolog : !is_first && (it->second != source || !source))
            p->flags |= PTR_IS_REASSIGNED;
    }
}

// The meet of the sources' roots; null is "not yet known", and the bottom meets everything to itself.
PTR* meet(PTR* a, PTR* b, PTR* bottom) {
    if (!a || a == b) return b;
    return b ? bottom : a;
}

void find_roots(FUNINFO* f, const std::vector<DEFINITION>& definitions) {
    PTR* bottom = f->bottom_ptr;
    std::map<PTR*, std::vector<PTR*>> sources; // order decides nothing: the solution is the greatest one
    std::set<PTR*> starts;                     // take values that come from no other pointer
    for (const DEFINITION& d : definitions) {
        PTR* p = find_or_make_PTR_entry(d.sym);
        PTR* source = source_of(d.value);
        if (is_address_constant(d.value))
            starts.insert(p);
        else
            sources[p].push_back(source ? source : bottom);
    }
    for (PTR* p = f->ptrs; p; p = p->next) {
        p->root = initial_root(p, bottom);
        if (!p->root && (!sources.count(p) || starts.count(p) || p->symbol->level == 1)) p->root = p;
    }
    for (bool changed = true; changed;) {
        changed = false;
        for (auto& [p, list] : sources) {
            PTR* root = p->root;
            for (PTR* source : list)
                if (source != p) root = meet(root, source->root, bottom);
            if (root == p->root) continue;
            p->root = root;
            changed = true;
        }
    }
    for (PTR* p = f->ptrs; p; p = p->next)
        if (!p->root) p->root = bottom;
}


void print_group(const PTR* p) {
    debug_printf("\nPTR #%u in scope ", p->number);
    if (p->scope)
        debug_printf("#%u|%u:\t", p->scope->id, p->scope->depth);
    else
        debug_printf("#-|-:\t");
    debug_printf("%s%s%s", p->symbol ? p->symbol->name : "", p->member ? "." : "",
                 p->member ? p->member->name.c_str() : "");
    debug_printf("\n  ROOT:  #%d ", static_cast<int>(p->root->number));
    if (p->root == p) debug_printf("(self)");
    debug_printf("\n  Flags:");
    auto flag = [p](uint8_t bit) { return p->flags & bit ? "" : " not"; };
    debug_printf("%s is_a_root", flag(PTR_IS_A_ROOT));
    debug_printf("%s is_restricted", flag(PTR_IS_RESTRICTED));
    debug_printf("%s is_disjointed", flag(PTR_IS_DISJOINTED));
    debug_printf("%s is_file_level", flag(PTR_IS_FILE_LEVEL));
    debug_printf("%s is_a_parameter", flag(PTR_IS_A_PARAMETER));
    debug_printf("%s is_reassigned", flag(PTR_IS_REASSIGNED));
    debug_printf("%s is_bottom    ", flag(PTR_IS_BOTTOM));
    debug_printf("\n");
}

} // namespace

void LS::build_PTR_equivalence_groups() { build_groups(pointer_writes(currfuninfo)); }

void build_groups(const POINTER_WRITES& writes) {
    FUNINFO* f = currfuninfo;
    OPT_ASSERT(f->bottom_ptr && f->ls_root);
    for (PTR* p = f->ptrs; p; p = p->next) p->flags &= ~PTR_IS_REASSIGNED;
    f->bottom_ptr->scope = f->ls_root;
    mark_reassigned(writes.definitions);
    find_roots(f, writes.definitions);
    uint32_t number = 0;
    for (const PTR* p = f->ptrs; p; p = p->next) ++number;
    for (PTR* p = f->ptrs; p; p = p->next) p->number = --number; // the bottom, which was made first, has 0
    if (print_debug)
        for (const PTR* p = f->ptrs; p; p = p->next) print_group(p);
}

// ---- Objects

namespace {

// All definitions of one variable, taken together; true once it is known what they point into.
bool bind(SPMAP& map, SYMTAB* sym, const std::vector<const NODE*>& values, bool is_stepped) {
    SPMAP::SPINFO all;
    bool precise = !is_stepped;
    for (const NODE* value : values) {
        if (!value) return false;
        const NODE* basis = pointer_basis(value);
        if (basis && basis->op == NAME && basis->u.sym == sym) {
            precise = false;
            continue;
        }
        if (is_null_constant(value)) { // no access through it is defined
            precise = false;
            continue;
        }
        const SPMAP::SPINFO info = map.pointee_of(value);
        if (!info.object || (all.object && all.object != info.object)) return false;
        precise &= !all.object && info.is_precise;
        all = info;
    }
    if (!all.object) return false;
    if (precise)
        map.set_mapping(sym, all.object, all.offset, all.width, true);
    else
        map.set_mapping(sym, all.object, INT65(0), size_in_units(all.object), false);
    return true;
}

} // namespace

void find_pointees(const POINTER_WRITES& writes) {
    FUNINFO* f = currfuninfo;
    f->spmap->clear();
    std::vector<SYMTAB*> waiting; // in order of their first definitions
    std::map<const SYMTAB*, std::vector<const NODE*>> values;
    for (const DEFINITION& d : writes.definitions) {
        if (!is_tracked(d.sym) || d.sym->level == 1) continue;
        auto& list = values[d.sym];
        if (list.empty()) waiting.push_back(d.sym);
        list.push_back(d.value);
    }
    for (bool changed = true; changed;) {
        changed = false;
        for (SYMTAB*& sym : waiting) {
            if (!sym || !bind(*f->spmap, sym, values[sym], writes.stepped.count(sym) != 0)) continue;
            sym = nullptr;
            changed = true;
        }
    }
}
