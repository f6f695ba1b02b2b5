// Equality of types: exact, and the language's compatibility.
#include "TYPES/type_impl.h"

bool compare_type_names(const TYPE* a, const TYPE* b) {
    if (type_is_tagless(a) || type_is_tagless(b)) return type_is_tagless(a) && type_is_tagless(b);
    return a->name() == b->name();
}

// ---- Lists

bool params_alike(const fkPARAM* a, const fkPARAM* b, TYPE_PAIRS& pairs) {
    for (; a && b; a = a->next, b = b->next) {
        if (a->flag != b->flag || a->word != b->word) return false;
        pairs.add(a->type, b->type);
    }
    return !a && !b;
}

bool equal_etors(const fkETOR* a, const fkETOR* b) {
    for (; a && b; a = a->next, b = b->next)
        if (a->value != b->value || a->name != b->name) return false;
    return !a && !b;
}

static bool members_alike(const fkMDATA* a, const fkMDATA* b, TYPE_PAIRS& pairs) {
    for (; a && b; a = a->next, b = b->next) {
        if (a->name != b->name || a->offset != b->offset || a->width != b->width || a->access != b->access ||
            a->aux != b->aux || a->is_bitfld != b->is_bitfld || a->flag1 != b->flag1 || a->flag3 != b->flag3 ||
            a->flag4 != b->flag4)
            return false;
        pairs.add(a->type, b->type);
    }
    return !a && !b;
}

template <class T, class ALIKE>
static bool lists_alike(const CSU_LIST<T>& a, const CSU_LIST<T>& b, ALIKE alike) {
    if (a.present != b.present || a.items.size() != b.items.size()) return false;
    for (size_t i = 0; i < a.items.size(); ++i)
        if (!alike(a.items[i], b.items[i])) return false;
    return true;
}

bool csu_extras_alike(const CSU_EXTRAS* a, const CSU_EXTRAS* b, TYPE_PAIRS& pairs) {
    static const CSU_EXTRAS none;
    if (a == b) return true;
    if (!a) a = &none;
    if (!b) b = &none;
    auto same_types = [&](const TYPE* x, const TYPE* y) {
        if (x && y) pairs.add(x, y);
        return !x == !y;
    };
    return lists_alike(a->base_classes, b->base_classes,
                       [&](auto& x, auto& y) {
                           return x.offset == y.offset && x.access == y.access && x.is_virtual == y.is_virtual &&
                                  same_types(x.type, y.type);
                       }) &&
           lists_alike(a->access_decls, b->access_decls,
                       [](auto& x, auto& y) { return x.word == y.word && x.access == y.access; }) &&
           lists_alike(a->friend_functions, b->friend_functions,
                       [&](auto& x, auto& y) { return x.name == y.name && same_types(x.type, y.type); }) &&
           lists_alike(a->friend_classes, b->friend_classes, same_types) &&
           lists_alike(a->nested_types, b->nested_types, same_types) &&
           lists_alike(a->static_data, b->static_data,
                       [&](auto& x, auto& y) {
                           return x.name == y.name && x.access == y.access && same_types(x.type, y.type);
                       }) &&
           lists_alike(a->member_functions, b->member_functions,
                       [&](auto& x, auto& y) {
                           return x.name == y.name && x.access == y.access && x.word == y.word &&
                                  x.flags[0] == y.flags[0] && x.flags[1] == y.flags[1] && x.flags[2] == y.flags[2] &&
                                  x.flags[3] == y.flags[3] && same_types(x.type, y.type);
                       }) &&
           lists_alike(a->parameters, b->parameters, [&](auto& x, auto& y) {
               return x.flag == y.flag && x.word == y.word && x.name == y.name && same_types(x.type, y.type);
           });
}

// ---- Exact equality

// Compares two nodes but for their parts, which go to `pairs`.
static bool nodes_exact(const TYPE* a, const TYPE* b, TYPE_PAIRS& pairs) {
    if (a->kind != b->kind || a->size != b->size || a->align != b->align) return false;
    switch (a->kind) {
    case TYPE::tpk_void: return true;
    case TYPE::tpk_int:
        return a->ikind() == b->ikind() && a->expl_sign() == b->expl_sign() && a->boolean_flag() == b->boolean_flag() &&
               a->ptm_int_flag() == b->ptm_int_flag();
    case TYPE::tpk_float: return a->fkind() == b->fkind();
    case TYPE::tpk_fixed:
        if (a->binpt() != b->binpt()) return false;
        break;
    case TYPE::tpk_complex:
    case TYPE::tpk_pointer:
    case TYPE::tpk_ref: break;
    case TYPE::tpk_qual:
        if (a->own_qual_bits() != b->own_qual_bits()) return false;
        break;
    case TYPE::tpk_typedef:
        if (!compare_type_names(a, b) || a->is_lowered() != b->is_lowered()) return false;
        break;
    case TYPE::tpk_array:
        if (a->num_elem() != b->num_elem() || a->is_complete() != b->is_complete() || a->is_vector() != b->is_vector())
            return false;
        break;
    case TYPE::tpk_ptm:
        if (!pairs.first_visit(a, b)) return true;
        pairs.add(a->ptm_class(), b->ptm_class());
        break;
    case TYPE::tpk_func:
        if (!a->frozen || !b->frozen) return false;
        if (!pairs.first_visit(a, b)) return true;
        if (a->cc_kind() != b->cc_kind() || a->vararg() != b->vararg() || a->proto() != b->proto() ||
            !params_alike(a->params(), b->params(), pairs))
            return false;
        break;
    case TYPE::tpk_enum:
        if (!a->frozen || !b->frozen) return false;
        if (!compare_type_names(a, b) || a->is_complete() != b->is_complete() || !equal_etors(a->etors(), b->etors()))
            return false;
        break;
    case TYPE::tpk_class:
    case TYPE::tpk_struct:
    case TYPE::tpk_union:
        if (!a->frozen || !b->frozen) return false;
        if (!pairs.first_visit(a, b)) return true;
        return compare_type_names(a, b) && a->is_complete() == b->is_complete() && a->is_lowered() == b->is_lowered() &&
               a->is_struct_vector() == b->is_struct_vector() && a->csu_word() == b->csu_word() &&
               members_alike(a->mdata(), b->mdata(), pairs) &&
               csu_extras_alike(a->csu_extras(), b->csu_extras(), pairs);
    default: tp_die("unhandled type kind: exact_types()");
    }
    pairs.add(a->component(), b->component());
    return true;
}

static bool all_exact(TYPE_PAIRS& pairs) {
    while (!pairs.empty()) {
        TYPE_PAIRS::PAIR p = pairs.take();
        if (!nodes_exact(p.first, p.second, pairs)) return false;
    }
    return true;
}

bool exact_types(const TYPE* a, const TYPE* b) {
    if (same_type(a, b)) return true;
    if (!a || !b) return false;
    TYPE_PAIRS pairs;
    return nodes_exact(a, b, pairs) && all_exact(pairs);
}

bool equal_params(const fkPARAM* a, const fkPARAM* b) {
    TYPE_PAIRS pairs;
    return params_alike(a, b, pairs) && all_exact(pairs);
}

// ---- Compatibility

// A qualifier that changes nothing about the layout doesn't count where types are compared strictly by machine form.
static const TYPE* step_over(const TYPE* t) {
    while (t->kind == TYPE::tpk_qual && t->size == t->component()->size && t->align == t->component()->align)
        t = t->component();
    return t;
}

static bool both_classes(const TYPE* a, const TYPE* b) {
    auto is_class = [](const TYPE* t) { return t->kind == TYPE::tpk_class || t->kind == TYPE::tpk_struct; };
    return is_class(a) && is_class(b);
}

static bool params_compatible(const fkPARAM* a, const fkPARAM* b, TYPE_PAIRS& pairs) {
    for (; a && b; a = a->next, b = b->next) pairs.add(a->type, b->type);
    return !a && !b;
}

static bool nodes_compatible(const TYPE* a, const TYPE* b, TYPE_PAIRS& pairs) {
    if (a->kind != b->kind && !both_classes(a, b)) return false;
    switch (a->kind) {
    case TYPE::tpk_void: return true;
    case TYPE::tpk_int:
        if (a->ikind() != b->ikind()) return false;
        return (a->ikind() != TYPE::ik_schar && a->ikind() != TYPE::ik_uchar) || a->expl_sign() == b->expl_sign();
    case TYPE::tpk_float: return a->fkind() == b->fkind();
    case TYPE::tpk_fixed:
        if (a->binpt() != b->binpt()) return false;
        break;
    case TYPE::tpk_complex:
    case TYPE::tpk_pointer:
    case TYPE::tpk_ref:
    case TYPE::tpk_typedef: break;
    case TYPE::tpk_qual:
        if (a->own_qual_bits() != b->own_qual_bits()) return false;
        pairs.add(a->stqs(), b->stqs());
        return true;
    case TYPE::tpk_array:
        if (a->is_vector() != b->is_vector()) return false;
        if (a->is_complete() && b->is_complete() && a->size != b->size) return false;
        if ((a->cpp || b->cpp) && a->align != b->align) return false;
        break;
    case TYPE::tpk_ptm:
        if (!pairs.first_visit(a, b)) return true;
        pairs.add(a->ptm_class(), b->ptm_class());
        break;
    case TYPE::tpk_func:
        if (!pairs.first_visit(a, b)) return true;
        if ((a->cpp || b->cpp) && !params_compatible(a->params(), b->params(), pairs)) return false;
        break;
    case TYPE::tpk_enum: return a->name() == b->name();
    case TYPE::tpk_class:
    case TYPE::tpk_struct:
    case TYPE::tpk_union:
        if (a->is_complete() && b->is_complete() && (a->size != b->size || a->align != b->align)) return false;
        return a->name() == b->name();
    default: tp_die("unhandled type: compatible_types()");
    }
    pairs.add(a->component(), b->component());
    return true;
}

bool compatible_types(const TYPE* a, const TYPE* b, bool strict) {
    if (!a || !b) return a == b;
    if (!a->frozen || !b->frozen) return false;
    if (same_type(a, b)) return true;
    TYPE_PAIRS pairs; // takes no memory for types of one part
    for (TYPE_PAIRS::PAIR p{a, b};; p = pairs.take()) {
        if (strict) p = {step_over(p.first), step_over(p.second)};
        const bool same = same_type(p.first, p.second);
        if (!same && (!p.first->frozen || !p.second->frozen || !nodes_compatible(p.first, p.second, pairs))) return false;
        if (pairs.empty()) return true;
    }
}

bool equiv_mtypes(TYPE* a, TYPE* b) { return exact_types(a->normalized_type()->stqs(), b->normalized_type()->stqs()); }
