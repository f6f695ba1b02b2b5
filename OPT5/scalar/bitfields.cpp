// Accesses of bit-fields become operations on the containers that hold them.
//
//   s.f          (C >> k) & m, or two shifts for a field with a sign
//   s.f = e      C = C & ~(m << k) | (e & m) << k
//
// with C an access of the container, k the field's place in it and m as many ones as it is wide. The container is the
// 16-bit unit that the field lies in. A field that crosses units, and a volatile one, is accessed as its declared type.
// A local structure that is accessed by its members alone becomes a variable for each of them; one that is copied as a
// whole, too, where that costs less than the accesses gain. Another small one, and a union, becomes one integer variable,
// in which the fields lie as they did.
//
// Needs: loops and alias marks. Leaves: what rests on the graph; symbols are split anew where there are new ones.
// Sound because a container holds nothing but fields. Where it would reach past the structure, or hold another member,
// to which the store would write back an old value, the access stays as it is; and so does a field across units on a
// target whose numbers start with the high unit. What is evaluated once stays so: an address or a value with side
// effects is kept in a variable ahead of the store.
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/scalar/structure_copy.h"
#include "OPT5/simp/range.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <unordered_map>
#include <vector>

namespace {

constexpr int UNIT = 16, MOST_MAPPED_BITS = 32, MOST_VARIABLES = 16;
// What an access of a member gains where that is a variable, and what a copy of the structure loses by each member.
constexpr double ACCESS_GAIN = 4, COPY_LOSS = 6;
constexpr double ITERATIONS = 8; // of a loop, as an estimate

bool is_field(const NODE* t) {
    return (t->op == STDOT || t->op == STREF) && t->right && t->right->op == FIELD && t->right->mval &&
           t->right->mval->is_bitfld;
}

TYPE* unsigned_of(int bits) { return bits == 16 ? tp->uint_t : bits == 32 ? tp->ulong_t : tp->ullong_t; }
TYPE* signed_of(int bits) { return bits == 16 ? tp->int_t : bits == 32 ? tp->long_t : tp->llong_t; }
bool is_plain_scalar(TYPE* t) { return t->is_scalar() && !t->is_complex(); }
bool has_sign(TYPE* t) { return int_type_min(normalized_value_type(t)->stqs()).is_negative(); }

INT65 ones(int width) { return width >= 64 ? ~INT65(0) : (INT65(1) << INT65(width)) - INT65(1); }

NODE* convert(TYPE* type, NODE* t) {
    type = type->stqs();
    if (t->op == ICON && t->type->is_int() && type->is_int() && !type->is_bool()) {
        NODE* r = mk_ICON(truncate_to_type(t->u.lval, type), type);
        r->ls = t->ls;
        erase_tree(t);
        return r;
    }
    return equiv_mtypes(t->type->stqs(), type) ? t : maketree(SCONV, t, nullptr, type, t->ls);
}

NODE* shifted(int op, NODE* t, int by) {
    return by ? maketree(op, t, mk_ICON(INT65(by), tp->int_t), t->type->stqs(), t->ls) : t;
}

NODE* masked(NODE* t, INT65 mask) {
    TYPE* type = t->type->stqs();
    return maketree(ANDB, t, mk_ICON(mask, type), type, t->ls);
}

// Where a field lies.
struct PLACE {
    NODE* container = nullptr; // owned; an lvalue
    NODE* content = nullptr;   // owned; what was read of a container that may be read only once, or null
    int bits = 0;              // of the container
    int at = 0;                // of the field in it
    int width = 0;
    TYPE* type = nullptr;  // of the field's value
    bool is_value = false; // the container is a variable that holds the value itself
};

// ---- Containers

struct SPAN {
    int64_t start = 0; // bits from the start of the structure
    int bits = 0;      // 0: there is none
};

bool holds_fields_alone(const TYPE* csu, int64_t start, int bits) {
    if (csu->is_union()) return true; // what it overlays is one object
    for (const fkMDATA* m = csu->real->mdata(); m; m = m->next) {
        const int64_t size = m->is_bitfld ? m->width : static_cast<int64_t>(m->type->size);
        const bool apart = m->offset + size <= start || start + bits <= m->offset;
        if (!apart && (!m->is_bitfld || m->type->is_volatile())) return false;
    }
    return true;
}

SPAN span_of(const fkMDATA* m, const TYPE* csu, bool is_volatile) {
    const int declared = static_cast<int>(m->type->size), width = static_cast<int>(m->width);
    const int64_t unit = m->offset / UNIT * UNIT;
    const bool in_unit = m->offset + width <= unit + UNIT;
    // An access as another type than the declared one counts as one of characters.
    if (in_unit && (declared == UNIT || (chars_alias_other_types && !is_volatile && !memory_is_big_endian)))
        return {unit, UNIT};
    if (memory_is_big_endian || (declared != 32 && declared != 64)) return {};
    const int64_t start = m->offset / declared * declared;
    if (m->offset + width > start + declared || start + declared > static_cast<int64_t>(csu->size)) return {};
    if (csu->align < std::min<uint32_t>(m->type->align, 32)) return {};
    const CSU_EXTRAS* extras = csu->real->csu_extras();
    if (extras && !extras->base_classes.items.empty()) return {};
    return holds_fields_alone(csu, start, declared) ? SPAN{start, declared} : SPAN{};
}

// Whether the address of what a member is selected from can be taken.
bool is_place(const NODE* t) {
    t = without_members(t);
    return t->op == NAME || op_is_indirection(t->op);
}

// What a local structure becomes: a variable for each member by its ordinal, or one for all.
struct MAPPING {
    bool is_copied = false;
    bool fits_integer = true, is_steady = true; // each copy
    double gain = 0, copies = 0;
    SYMTAB* whole = nullptr;
    std::vector<SYMTAB*> parts;
};

class EXPANSION {
public:
    void run();

private:
    void list_candidates();
    void map_symbols();
    bool map_symbol(SYMTAB* sym, MAPPING* mapping);
    void look_at_copy(const NODE* copy);
    void look_at(const NODE* t);
    MAPPING* mapping_of(const NODE* t);
    MAPPING* parts_behind(const NODE* t);
    NODE* expand_copy(NODE* t);
    NODE* expand_copy_by_members(NODE* t);

    bool find_place(NODE* field, PLACE* place);
    NODE* read_of(const PLACE& place);
    NODE* extended(const PLACE& place, NODE* value);
    NODE* store_to(const PLACE& place, NODE* value);
    NODE* into_variable(NODE* value, NODE** ahead);
    NODE* new_value(NODE* t, const PLACE& place, NODE* old);
    NODE* assignment(NODE* t, bool value_is_used);
    NODE* expand(NODE* t, bool value_is_used);

    std::unordered_map<const SYMTAB*, MAPPING> mappings;
    std::vector<SYMTAB*> candidates;
    std::vector<SYMTAB*> wholes;
    double frequency = 1; // of the block in work
    bool found = false;
};

// ---- Structures as variables

void EXPANSION::list_candidates() {
    for (SYMTAB* s = currfuninfo->memory_syms; s; s = s->next) {
        TYPE* type = s->type;
        if (s->level != 2 || s->sclass != SC_AUTO || !type->is_csu() || !type->is_complete() || s->pragma) continue;
        if (type->size == 0 || type_may_contain_volatile(type)) continue;
        if (s == currfuninfo->csu_return_sym || s == currfuninfo->ret_by_cctor_sym || sym_appears_in_EHT(s)) continue;
        mappings[s];
        candidates.push_back(s);
    }
}

MAPPING* EXPANSION::mapping_of(const NODE* t) {
    auto at = t->op == NAME ? mappings.find(t->u.sym) : mappings.end();
    return at == mappings.end() ? nullptr : &at->second;
}

// A scalar member of a candidate.
bool is_scalar_member(const NODE* t) {
    return t->op == STDOT && t->left->op == NAME && t->right && t->right->op == FIELD && t->right->mval &&
           (t->right->mval->is_bitfld || is_plain_scalar(t->right->mval->type)) &&
           t->type->size == normalized_value_type(t->right->mval->type)->size;
}

// A candidate that is named by anything but a member is none.
void EXPANSION::look_at(const NODE* t) {
    for (; t; t = t->left) {
        if (is_scalar_member(t)) {
            if (MAPPING* mapping = mapping_of(t->left)) mapping->gain += ACCESS_GAIN * frequency;
            return;
        }
        const NODE* named = t->op == UAND || t->op == ARGREF ? name_of_place(static_cast<const NODE*>(t->left)) : t;
        if (named && named->op == NAME) mappings.erase(named->u.sym);
        look_at(t->right);
    }
}

void EXPANSION::look_at_copy(const NODE* copy) {
    TYPE* type = copy->left->type;
    const bool is_copy = is_place(copy->left) && is_place(copy->right) && type->real == copy->right->type->real;
    for (const NODE* side : {copy->left, copy->right}) {
        MAPPING* mapping = is_copy ? mapping_of(side) : nullptr;
        if (!mapping) {
            look_at(side);
            continue;
        }
        mapping->is_copied = true;
        mapping->fits_integer &= type->size == 16 || (type->size == 32 && type->align >= 32);
        mapping->copies += frequency;
        mapping->is_steady &= is_steady_place(copy->left) && is_steady_place(copy->right);
    }
}

// Whether each member can have a variable; how many they are.
bool members_are_scalar(const TYPE* type, int* count) {
    *count = 0;
    bool all = true;
    for (const fkMDATA* m = type->real->mdata(); m; m = m->next, ++*count)
        all &= m->is_bitfld || is_plain_scalar(m->type);
    return all;
}

bool EXPANSION::map_symbol(SYMTAB* sym, MAPPING* mapping) {
    int members;
    const bool all_scalar = members_are_scalar(sym->type, &members);
    const bool pays = !mapping->is_copied || (all_scalar && mapping->is_steady &&
                                              mapping->gain > COPY_LOSS * members * mapping->copies);
    if (!sym->type->is_union() && pays && members <= MOST_VARIABLES) {
        for (const fkMDATA* m = sym->type->real->mdata(); m; m = m->next)
            mapping->parts.push_back(m->is_bitfld || is_plain_scalar(m->type)
                                         ? sym_temp('B', -1, normalized_value_type(m->type)->stqs(), sym->scope)
                                         : nullptr);
        return true;
    }
    const auto size = static_cast<int>(sym->type->size);
    if (!mapping->fits_integer || size > MOST_MAPPED_BITS || (memory_is_big_endian && size > UNIT)) return false;
    for (const fkMDATA* m = sym->type->real->mdata(); m; m = m->next)
        if (!m->is_bitfld) return false;
    if (print_debug) debug_printf("\n  CSU symbol mapped to integer type: %s", sym->name);
    mapping->whole = sym_temp('B', -1, unsigned_of(size), sym->scope);
    wholes.push_back(mapping->whole);
    return true;
}

double frequency_of(const BBLK* bb) {
    double f = 1;
    for (const NATURAL_LOOP* loop = currfuninfo->loops->around(bb); loop; loop = loop->parent) f *= ITERATIONS;
    return f;
}

void EXPANSION::map_symbols() {
    list_candidates();
    if (candidates.empty()) return;
    need(fact::loops | fact::alias_marks);
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        frequency = frequency_of(bb);
        for (LIST* s = bb->statements; s; s = s->rest)
            if (s->first->op == STASG && !tree_is_arg_prolog(s->first))
                look_at_copy(s->first);
            else
                look_at(s->first);
    }
    for (SYMTAB* s : candidates) {
        auto at = mappings.find(s);
        if (at == mappings.end()) continue;
        if (!map_symbol(s, &at->second)) {
            mappings.erase(at);
            continue;
        }
        unlink_symbol(s, &currfuninfo->memory_syms);
        currfuninfo->dropped_syms.push_back(s);
    }
}

// The variables that stand for the structure itself; null for anything else.
MAPPING* EXPANSION::parts_behind(const NODE* t) {
    MAPPING* mapping = mapping_of(t);
    return mapping && !mapping->whole ? mapping : nullptr;
}

NODE* EXPANSION::expand_copy_by_members(NODE* t) {
    std::vector<NODE*> copies;
    copy_by_members(t->left, t->right, &copies);
    erase_tree(t);
    NODE* all = nullptr;
    for (NODE* copy : copies) all = mk_COMMAOP(all, copy);
    found = true;
    return all;
}

// Copies from and to what stands for a structure.
NODE* EXPANSION::expand_copy(NODE* t) {
    MAPPING *to = mapping_of(t->left), *from = mapping_of(t->right);
    if (!to && !from) return t;
    if (parts_behind(t->left) || parts_behind(t->right)) return expand_copy_by_members(t);
    TYPE* type = unsigned_of(static_cast<int>(t->left->type->size));
    auto as_integer = [type](NODE* side, const MAPPING* mapping) {
        LS* ls = side->ls;
        if (mapping) {
            erase_tree(side);
            return mk_NAME(mapping->whole, ls);
        }
        TYPE* access = lvalue_is_volatile(side) ? tp->mk_qual(type, QUAL_VOLATILE) : type;
        NODE* address = maketree(PCONV, apply_UAND_to_struct(side), nullptr, tp->mk_ptr(access), ls);
        return maketree(UMULT, address, nullptr, access, ls);
    };
    NODE* r = mk_ASG(as_integer(t->left, to), as_integer(t->right, from));
    r->ls = t->ls;
    erase_node(t);
    found = true;
    return r;
}

// ---- Accesses. What they are given is consumed.

// False for a field that stays.
bool EXPANSION::find_place(NODE* field, PLACE* place) {
    const fkMDATA* m = field->right->mval;
    place->width = static_cast<int>(m->width);
    place->type = field->type->stqs();
    if (place->width == 0 || !(m->type->is_int() || m->type->is_enum())) return false;
    const MAPPING* mapping = field->op == STDOT ? mapping_of(field->left) : nullptr;
    if (mapping) {
        place->is_value = !mapping->whole;
        SYMTAB* variable = place->is_value ? mapping->parts[m->ordinal - 1] : mapping->whole;
        place->container = mk_NAME(variable, field->ls);
        place->bits = static_cast<int>(variable->size);
        place->at = place->is_value ? 0 : m->offset;
        erase_tree(field);
        return true;
    }
    TYPE* csu = field->op == STREF ? field->left->type->type_pointed_to() : field->left->type;
    const bool is_volatile = lvalue_is_volatile(field);
    const SPAN span = csu->is_csu() ? span_of(m, csu, is_volatile) : SPAN{};
    if (!span.bits || must_preserve_STDOT(field) || (field->op == STDOT && !is_place(field->left))) return false;
    TYPE* type = unsigned_of(span.bits);
    if (is_volatile) type = tp->mk_qual(type, QUAL_VOLATILE);
    NODE* address = field->op == STREF ? field->left : apply_UAND_to_struct(field->left);
    address = maketree(PCONV, address, nullptr, tp->mk_ptr(type), field->ls);
    if (span.start)
        address = maketree(PLUS, address, mk_ICON(INT65(span.start / UNIT), tp->long_t), address->type, field->ls);
    place->container = maketree(UMULT, address, nullptr, type, field->ls);
    place->bits = span.bits;
    place->at = static_cast<int>(m->offset - span.start);
    erase_tree(field->right);
    erase_node(field);
    return true;
}

NODE* EXPANSION::read_of(const PLACE& place) {
    NODE* c = copy_tree(place.content ? place.content : place.container);
    if (place.is_value) return convert(place.type, c);
    if (has_sign(place.type)) {
        c = convert(signed_of(place.bits), shifted(SLL, c, place.bits - place.at - place.width));
        return convert(place.type, shifted(SRL, c, place.bits - place.width));
    }
    c = shifted(SRL, c, place.at);
    return convert(place.type, place.at + place.width == place.bits ? c : masked(c, ones(place.width)));
}

// Whether a field holds every value that the tree can have.
bool fits_field(const PLACE& place, const NODE* value) {
    if (!has_value_range(value->type)) return false;
    const RANGE range = range_of_tree(value, nullptr);
    const bool is_signed = has_sign(place.type);
    const WIDE end = WIDE(1) << (is_signed ? place.width - 1 : place.width);
    return range.max < end && range.min >= (is_signed ? -end : 0);
}

// The value that a field has once `value` is stored to it.
NODE* EXPANSION::extended(const PLACE& place, NODE* value) {
    if (fits_field(place, value)) return value;
    PLACE alone = place;
    alone.container = convert(unsigned_of(place.bits), value);
    alone.content = nullptr;
    alone.at = 0;
    alone.is_value = false;
    NODE* r = read_of(alone);
    erase_tree(alone.container);
    return r;
}

NODE* EXPANSION::store_to(const PLACE& place, NODE* value) {
    TYPE* type = unsigned_of(place.bits);
    const INT65 mask = ones(place.width);
    if (place.is_value) {
        NODE* target = copy_tree(place.container);
        return mk_ASG(target, convert(target->type, extended(place, convert(place.type, value))));
    }
    value = convert(type, convert(place.type, value));
    if (place.width < place.bits) {
        if (value->op == ICON)
            value->u.lval = truncate_to_type((value->u.lval & mask) << INT65(place.at), type);
        else
            value = shifted(SLL, place.at + place.width == place.bits ? value : masked(value, mask), place.at);
        NODE* rest = masked(copy_tree(place.content ? place.content : place.container),
                            truncate_to_type(~(mask << INT65(place.at)), type));
        value = maketree(ORB, rest, value, type, rest->ls);
    }
    return maketree(ASG, copy_tree(place.container), value, type, place.container->ls);
}

// A NAME for the value, which is computed ahead.
NODE* EXPANSION::into_variable(NODE* value, NODE** ahead) {
    SYMTAB* variable = sym_temp('B', -1, value->type->stqs(), value->ls);
    *ahead = mk_COMMAOP(*ahead, mk_ASG(mk_NAME(variable, value->ls), value));
    return mk_NAME(variable, value->ls);
}

// What `t`, an assignment to the field, stores; `old` is null for a plain one.
NODE* EXPANSION::new_value(NODE* t, const PLACE& place, NODE* old) {
    NODE* e = t->right;
    t->right = nullptr;
    if (!old) return e;
    const int op = t->op == PLUSPLUS ? static_cast<int>(PLUS)
                   : t->op == MINMIN ? static_cast<int>(MINUS)
                                     : op_of_opASG[t->op];
    const bool is_shift = op == SLL || op == SRL;
    TYPE* type = is_shift ? promoted_type(place.type) : combined_type_for_types(place.type, e->type);
    NODE* r = maketree(op, coerce_to_type(type, old), coerce_to_type(is_shift ? tp->int_t : type, e), type, old->ls);
    return coerce_to_type(place.type, r);
}

NODE* EXPANSION::assignment(NODE* t, bool value_is_used) {
    t->right = expand(t->right, true);
    t->left->left = expand(t->left->left, true);
    PLACE place;
    NODE* ahead = nullptr;
    if (!find_place(t->left, &place)) return t;
    if (tree_has_side_effects(t->right)) t->right = into_variable(t->right, &ahead);
    NODE*& container = place.container;
    if (container->op == UMULT && tree_has_side_effects(container->left))
        container->left = into_variable(container->left, &ahead);
    if (t->op != ASG && container->type->is_volatile()) place.content = into_variable(copy_tree(container), &ahead);
    NODE* old = t->op == ASG ? nullptr : read_of(place);
    const bool gives_old = t->op == PLUSPLUS || t->op == MINMIN;
    NODE* result = nullptr;
    if (old && value_is_used && gives_old) {
        old = into_variable(old, &ahead);
        result = copy_tree(old);
    }
    NODE* value = new_value(t, place, old);
    if (value_is_used && !gives_old && place.is_value) {
        result = copy_tree(container);
    } else if (value_is_used && !gives_old) {
        if (value->op != ICON) value = into_variable(convert(place.type, value), &ahead);
        result = extended(place, copy_tree(value));
    }
    NODE* store = mk_COMMAOP(ahead, store_to(place, value));
    if (result) store = mk_COMMAOP(store, convert(t->type, result));
    erase_tree(container);
    if (place.content) erase_tree(place.content);
    erase_node(t);
    return store;
}

NODE* EXPANSION::expand(NODE* t, bool value_is_used) {
    if (!t) return t;
    const bool assigns = t->op == ASG || t->op == PLUSPLUS || t->op == MINMIN || op_of_opASG[t->op] != ILLOP;
    if (assigns && t->left && is_field(t->left)) {
        found = true;
        return assignment(t, value_is_used);
    }
    t->left = expand(t->left, t->op != COMMAOP && t->op != PCOMMA);
    t->right = expand(t->right, t->op == COMMAOP ? value_is_used : t->op != PCOMMA);
    if (!is_field(t)) {
        MAPPING* mapping = is_scalar_member(t) ? mapping_of(t->left) : nullptr;
        if (!mapping) return t;
        NODE* variable = mk_NAME(mapping->parts[t->right->mval->ordinal - 1], t->ls);
        erase_tree(t);
        found = true;
        return variable;
    }
    PLACE place;
    if (!find_place(t, &place)) return t;
    found = true;
    NODE* r = read_of(place);
    erase_tree(place.container);
    return r;
}

void EXPANSION::run() {
    map_symbols();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) {
            found = false;
            s->first = s->first->op == STASG && !tree_is_arg_prolog(s->first) ? expand_copy(s->first) : s->first;
            s->first = expand(s->first, false);
            if (!found) continue;
            s->first = simp_tree(s->first, nullptr);
            promote_toplevel_COMMAOPs_in_list(s, s->rest);
        }
    sym_split(currfuninfo);
    // A field may be set before the others have any value.
    BBLK* entry = currfuninfo->bb_list;
    for (SYMTAB* variable : wholes) {
        LIST** link = &entry->statements;
        while (*link && tree_is_arg_prolog((*link)->first)) link = &(*link)->rest;
        NODE* zero = mk_ASG(mk_NAME(variable, variable->scope), mk_ICON(INT65(0), variable->type));
        insert_before(link, zero, (*link)->psn);
    }
}

} // namespace

void expand_bitfields() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'expand_bitfields' -----\n");
    if (!currfuninfo->has_bitfield_access || !currfuninfo->bb_list) return;
    EXPANSION().run();
    changed(fact::graph);
}
