// What SSA form tracks: entries for objects, their parts, and what pointers point to.
//
// Two references are of one entry if they are of the same bits of the same object, or at the same distance from the
// same pointer variable, and of the same type: a value of the entry is then a value of the reference. Entries of one
// object, or behind one pointer, are in a ring; those that have bits in common overlap.
#include "OPT5/dd/ssa_build.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"

SSA_STATE ssa_state;

namespace {

constexpr int BITS_PER_UNIT = 16;

const NODE* without_pointer_marks(const NODE* p) {
    while (((p->op == PCONV || p->op == ISP2CHAR) && p->left->type->is_pointer()) || p->op == IDENTITY ||
           op_is_SSA(p->op))
        p = p->left;
    return p;
}

bool add_units(INT65* start, const NODE* constant) {
    if (!constant->u.lval.fits<int32_t>()) return false;
    *start += constant->u.lval * INT65(BITS_PER_UNIT);
    return true;
}

bool add_members(const NODE** t, INT65* start) {
    for (; (*t)->op == STDOT; *t = below_SSA(static_cast<const NODE*>((*t)->left))) {
        const fkMDATA* member = (*t)->right->mval;
        if (!member || member->is_bitfld) return false;
        *start += INT65(static_cast<int64_t>(member->offset));
    }
    return true;
}

// What a pointer points at: an object, or a constant distance from where a variable points.
bool find_target(const NODE* p, SSA_PLACE* place) {
    for (;;) {
        p = without_pointer_marks(p);
        if (p->op == PLUS && p->left->type->is_pointer() && p->right->op == ICON) {
            if (!add_units(&place->start, p->right)) return false;
            p = p->left;
        } else if (p->op == UAND) {
            const NODE* object = below_SSA(static_cast<const NODE*>(p->left));
            if (!add_members(&object, &place->start)) return false;
            if (object->op == UMULT && !object->right) {
                p = object->left;
                continue;
            }
            place->sym = object->op == NAME ? object->u.sym : nullptr;
            return place->sym != nullptr;
        } else {
            const NODE* name = name_accessed(p);
            if (!name || !p->type->is_pointer() || lvalue_is_volatile(p)) return false;
            place->pointer = name->u.sym;
            return place->pointer != nullptr;
        }
    }
}

// Scalars that a register holds, and structures as a whole.
bool has_tracked_type(const TYPE* type, const SSA_BUILD& build) {
    if (type->is_vector() || type->is_vpred()) return build.vectorsToo;
    if (type->is_complex()) return false;
    return type->is_scalar() || type->is_csu();
}

// Storage that is the object's own while the function runs.
bool is_tracked_object(const SYMTAB* sym) {
    return sym->level != 1 && !sym->is_function() && !sym->type->is_array() && !sym->lives_in_others &&
           !sym->hosts_others && !sym->type->is_volatile();
}

bool is_wanted(const NODE* lvalue, const SSA_PLACE& place, const SSA_BUILD& build) {
    if (!build.onlySSV && !build.onlyIV) return true;
    const bool is_whole =
        place.sym && place.start.is_zero() && place.length == INT65(static_cast<int64_t>(place.sym->size));
    if (build.onlySSV) return is_whole && place.sym->is_automatic() && lvalue->type->is_scalar();
    return is_whole && scalar_analysis_IV_candidate(lvalue);
}

bool is_same_entry(const SSAVAR* v, const SSA_PLACE& place, const NODE* lvalue) {
    return v->start == place.start && v->length == place.length && compatible_types(v->tree->type, lvalue->type, false);
}

SSAVAR* make_entry(const SSA_PLACE& place, const NODE* lvalue, const SSA_BUILD& build, SSAVAR*& first) {
    auto made = std::make_unique<SSAVAR>(static_cast<uint32_t>(ssa_state.variables.size()));
    SSAVAR* v = made.get();
    ssa_state.variables.push_back(std::move(made));
    v->sym = place.sym;
    v->pointer = place.pointer;
    v->start = place.start;
    v->length = place.length;
    v->tree = copy_tree_removing_SSA_operators(lvalue);
    set_SSAVAR_flags(v);
    if (place.sym && build.indexed.count(place.sym)) v->flags |= SSAVAR_aliased;
    if (first) {
        v->ring = first->ring;
        first->ring = v;
    } else
        first = v->ring = v;
    return v;
}

} // namespace

bool is_SSA_memory(const SYMTAB* sym, const SSA_BUILD& build) {
    return !sym->is_automatic() || may_be_reached_by_pointers(sym) || build.indexed.count(sym);
}

bool find_SSA_place(const NODE* t, SSA_PLACE* place) {
    place->length = INT65(static_cast<int64_t>(t->type->size));
    if (t->op == STDOT && t->right->mval && t->right->mval->is_bitfld) return false;
    if (!add_members(&t, &place->start)) return false;
    if (t->op == NAME)
        place->sym = t->u.sym;
    else if (t->op != UMULT || (t->right && (t->right->op != ICON || !add_units(&place->start, t->right))) ||
             !find_target(t->left, place))
        return false;
    if (place->pointer) return true;
    return place->sym && !place->start.is_negative() &&
           place->start + place->length <= INT65(static_cast<int64_t>(place->sym->size));
}

bool is_register_reference(const NODE* t, const SSA_BUILD& build) {
    const NODE* name = name_accessed(t);
    const SYMTAB* sym = name ? name->u.sym : nullptr;
    return sym && sym->is_automatic() && sym->type->is_scalar() && t->type->is_scalar() && t->type->size == sym->size &&
           t->type->size > 0 && has_tracked_type(t->type, build) && is_tracked_object(sym) && !lvalue_is_volatile(t) &&
           !may_be_reached_by_pointers(sym);
}

SSAVAR* SSAVAR_for_reference(const NODE* lvalue, const SSA_BUILD& build) {
    SSA_PLACE place;
    if (!has_tracked_type(lvalue->type, build) || lvalue_is_volatile(lvalue) || !find_SSA_place(lvalue, &place))
        return nullptr;
    if (place.sym ? !is_tracked_object(place.sym) : place.pointer->type->is_volatile()) return nullptr;
    if (place.length <= INT65(0) || !is_wanted(lvalue, place, build)) return nullptr;
    SSAVAR*& first = place.sym ? ssa_state.direct[place.sym] : ssa_state.indirect[place.pointer];
    SSAVAR* entry = nullptr;
    for_each_in_ring(first, [&](SSAVAR* v) {
        if (is_same_entry(v, place, lvalue)) entry = v;
    });
    if (!entry) return make_entry(place, lvalue, build, first);
    // `restrict` speaks of a scope: the entry has the accesses of several.
    if (entry->tree->ls != lvalue->ls) entry->tree->ls = nullptr;
    return entry;
}

SSAVAR* find_SSAVAR_ring(const SYMTAB* sym) {
    SSAVAR* const* first = ssa_state.direct.find(sym);
    return first ? *first : nullptr;
}

SSAVAR* find_pointed_SSAVAR_ring(const SYMTAB* sym) {
    SSAVAR* const* first = ssa_state.indirect.find(sym);
    return first ? *first : nullptr;
}

bool covers(const SSAVAR* whole, const SSAVAR* part) {
    return whole->start <= part->start && whole->start + whole->length >= part->start + part->length;
}

void set_SSAVAR_flags(SSAVAR* v) {
    const TYPE* type = v->tree->type;
    if (!v->sym) {
        v->flags |= SSAVAR_aliased;
        return;
    }
    v->flags |= SSAVAR_fixed_address;
    if (v->start.is_zero() && v->length == INT65(static_cast<int64_t>(v->sym->size))) v->flags |= SSAVAR_entire_object;
    // What is kept from one call of the function to the next is memory as globals are.
    if (v->sym->level == 0)
        v->flags |= SSAVAR_global;
    else if (!v->sym->is_automatic() || may_be_reached_by_pointers(v->sym))
        v->flags |= SSAVAR_aliased;
    if (may_be_reached_by_pointers(v->sym)) v->flags |= SSAVAR_aliased;
    if (v->has(SSAVAR_entire_object) && !v->is_memory() && type->is_scalar()) v->flags |= SSAVAR_likely_register;
}

SSAVAR::~SSAVAR() { erase_tree(tree); }

bool SSAVAR::overlaps(const SSAVAR* other) const {
    return start < other->start + other->length && other->start < start + length;
}

bool SSAVAR::is_a_simple_IV_candidate() const {
    return sym && has(SSAVAR_entire_object) && !has(SSAVAR_munged) && scalar_analysis_IV_candidate(tree);
}

bool SSAVAR::occurs_in_tree(const NODE* t) const {
    return any_subtree(t, [this](const NODE* n) { return op_is_SSA(n->op) && ssa_variable(n) == this; });
}

bool scalar_analysis_IV_candidate(const NODE* lvalue) {
    const TYPE* type = lvalue->type;
    return (type->is_int() || type->is_pointer() || type->is_float()) && !type->is_complex() && !type->is_vector() &&
           !lvalue_is_volatile(lvalue);
}

bool ssa_value_is_likely_register(const NODE* t) {
    if (t->op == SSA_USE) return ssa_variable(t)->has(SSAVAR_likely_register);
    t = below_SSA(t);
    return t->op == NAME && t->u.sym && t->u.sym->is_automatic() && t->type->is_scalar() &&
           !may_be_reached_by_pointers(t->u.sym);
}

bool tree_is_level_1_parameter(const NODE* t) {
    t = below_SSA(t);
    return t->op == NAME && t->u.sym && t->u.sym->level == 1;
}

void munge_SSAVAR_until_no_good(SSAVAR* v, int keepSelf) {
    if (v->has(SSAVAR_munged)) return;
    for_each_in_ring(v->ring, [v](SSAVAR* w) {
        if (w->overlaps(v)) w->flags |= SSAVAR_munged;
    });
    if (keepSelf) v->flags &= static_cast<uint16_t>(~SSAVAR_munged);
}
