// The canonical form of a type, and types derived from others in shape: another sign, another element, fewer
// qualifiers.
//
// Normalization strips typedefs everywhere and collapses integers and floats that the target does not tell apart, so
// that the passes see one type for each machine type. It never changes a size or an alignment of what it replaces: an
// integer whose layout is not the package's own stays as it is. A type that was merged into another takes the other's place.
#include "TYPES/type_impl.h"

void TYPE_PKG::normalize_basic_types() {
    std::lock_guard<std::recursive_mutex> hold(mk_ptr_lock);
    // From the narrow end up, so that a link always goes to a type whose own link is final.
    struct {
        TYPE *type, *narrower;
    } const order[] = {
        {void_t, void_t},    {void_ptr_t, void_ptr_t}, {bool_t, bool_t},   {int_t, int_t},      {uint_t, uint_t},
        {short_t, int_t},    {ushort_t, uint_t},       {schar_t, short_t}, {uchar_t, ushort_t}, {wchar_t_, short_t},
        {long_t, int_t},     {ulong_t, uint_t},        {llong_t, long_t},  {ullong_t, ulong_t}, {float_t, float_t},
        {double_t, float_t}, {ldouble_t, double_t},
    };
    for (auto& o : order)
        o.type->normalized = o.type == o.narrower || o.type->size != o.narrower->size ? o.type : o.narrower->normalized;
}

static TYPE* normalized_basic(const TYPE* t) {
    const TYPE_PKG* p = t->pkg;
    TYPE* own;
    if (t->kind == TYPE::tpk_int) {
        TYPE* const ints[] = {p->bool_t, p->schar_t, p->uchar_t, p->wchar_t_, p->short_t, p->ushort_t,
                              p->int_t,  p->uint_t,  p->long_t,  p->ulong_t,  p->llong_t, p->ullong_t};
        own = ints[t->ikind()];
    } else {
        TYPE* const floats[] = {p->float_t, p->double_t, p->ldouble_t};
        own = floats[t->fkind()];
    }
    bool same_layout = own && own->size == t->size && own->align == t->align;
    return same_layout && own->normalized ? own->normalized : const_cast<TYPE*>(t);
}

TYPE* TYPE_PKG::rebuild_on(TYPE* shape, TYPE* component) {
    switch (shape->kind) {
    case TYPE::tpk_complex: return mk_complex(component, shape->size, shape->align);
    case TYPE::tpk_pointer: return mk_ptr(component, shape->size, shape->align);
    case TYPE::tpk_ref: return mk_ref(component, shape->size, shape->align);
    case TYPE::tpk_qual: return mk_qual(component, shape->qual_m, shape->size, shape->align);
    case TYPE::tpk_array:
        if (shape->vector_m) return mk_vector(component, shape->cpp, shape->num_elem_m, shape->size, shape->align);
        return mk_array(component, shape->cpp, shape->num_elem_m, shape->size, shape->align, shape->complete_m);
    case TYPE::tpk_func: {
        TYPE* f =
            mk_func(component, shape->cpp, shape->vararg_m, shape->proto_m, shape->cc_m, shape->size, shape->align);
        fkPARAM** end = &f->params_m;
        for (fkPARAM* p = shape->params_m; p; p = p->next) {
            *end = new fkPARAM(*p);
            (*end)->next = nullptr;
            end = &(*end)->next;
        }
        f->params_set_m = shape->params_set_m;
        type_frozen(f);
        return f;
    }
    default: tp_die("Bad kind:  TYPE_PKG::rebuild_on()");
    }
}

TYPE* TYPE::normalized_type_uncached() {
    std::lock_guard<std::recursive_mutex> hold(mk_ptr_lock);
    // Down the chain of components to a type whose form is known, then up again.
    std::vector<TYPE*> chain;
    TYPE* form = nullptr;
    for (TYPE* t = this; !form; t = t->target_m) {
        if (t != this && t->normalized) {
            form = t->normalized;
            break;
        }
        switch (t->kind) {
        case tpk_void:
        case tpk_fixed:
        case tpk_ptm:
        case tpk_enum:
        case tpk_class:
        case tpk_struct:
        case tpk_union: form = find_type(t); break;
        case tpk_int:
        case tpk_float: form = normalized_basic(t); break;
        case tpk_func:
            // One that still waits for its parameters can't be copied.
            if (!t->frozen) {
                form = t;
                break;
            }
            chain.push_back(t);
            break;
        case tpk_typedef:
        case tpk_complex:
        case tpk_pointer:
        case tpk_ref:
        case tpk_qual:
        case tpk_array: chain.push_back(t); break;
        default: tp_die("Tried to normalize unknown type kind");
        }
    }
    for (size_t i = chain.size(); i-- > 0;) {
        TYPE* t = chain[i];
        if (t->kind != tpk_typedef) form = form == t->target_m ? t : t->pkg->rebuild_on(t, form);
        if (!form->normalized) __atomic_store_n(&form->normalized, form, __ATOMIC_RELEASE);
        if (t != this) __atomic_store_n(&t->normalized, form, __ATOMIC_RELEASE);
    }
    return form;
}

TYPE* TYPE::normalized_type() {
    if (TYPE* known = __atomic_load_n(&normalized, __ATOMIC_ACQUIRE)) return known;
    std::lock_guard<std::recursive_mutex> hold(mk_ptr_lock);
    if (!normalized) {
        TYPE* form = normalized_type_uncached();
        // A type that is open now may take another form when it is closed.
        if (kind == tpk_func && !frozen) return form;
        __atomic_store_n(&normalized, form, __ATOMIC_RELEASE);
    }
    return normalized;
}

// ---- Integers of another sign or mark

TYPE* TYPE_PKG::int_of_sign(TYPE* t, bool is_signed, const char* who) {
    TYPE* r = t->real;
    unsigned bits = t->spine_qual_m;
    if (r->is_vector()) {
        TYPE* elem = int_of_sign(r->target_m, is_signed, who); // no vector of vectors
        return elem == r->target_m ? t : mk_qual(mk_vector(elem, r->cpp, r->num_elem_m, r->size, r->align), bits);
    }
    if (r->kind == TYPE::tpk_enum) r = r->target_m->real;
    if (r->kind != TYPE::tpk_int) tp_die(who);
    if (is_signed ? r->is_signed() : r->is_unsigned()) return t->real == r ? t : mk_qual(r, bits);
    static const TYPE::IKIND signed_kinds[] = {TYPE::ik_schar, TYPE::ik_schar, TYPE::ik_schar, TYPE::ik_short,
                                               TYPE::ik_short, TYPE::ik_short, TYPE::ik_int,   TYPE::ik_int,
                                               TYPE::ik_long,  TYPE::ik_long,  TYPE::ik_llong, TYPE::ik_llong};
    TYPE::IKIND k = signed_kinds[r->ikind_m];
    if (r->ikind_m == TYPE::ik_wchar && r->size > short_t->size) k = TYPE::ik_long;
    if (!is_signed) k = static_cast<TYPE::IKIND>(k + 1);
    bool is_char = k == TYPE::ik_schar || k == TYPE::ik_uchar;
    return mk_qual(mk_int(k, is_char, r->size, r->align, r->boolean_m, r->ptm_m), bits);
}

TYPE* TYPE_PKG::mk_signed(TYPE* t) { return int_of_sign(t, true, "Bad kind:  TYPE_PKG::mk_signed()"); }
TYPE* TYPE_PKG::mk_unsigned(TYPE* t) { return int_of_sign(t, false, "Bad kind:  TYPE_PKG::mk_unsigned()"); }

TYPE* TYPE_PKG::flagged_int(TYPE* t, bool boolean, bool ptm, const char* who) {
    TYPE* r = t->real;
    if (r->kind != TYPE::tpk_int) tp_die(who);
    boolean |= r->boolean_m;
    ptm |= r->ptm_m;
    if (boolean == r->boolean_m && ptm == r->ptm_m) return t;
    return mk_qual(mk_int(r->ikind_m, r->expl_sign_m, r->size, r->align, boolean, ptm), t->spine_qual_m);
}

TYPE* TYPE_PKG::mk_boolean_int(TYPE* t) { return flagged_int(t, true, false, "Bad kind:  TYPE_PKG::mk_boolean_int()"); }
TYPE* TYPE_PKG::mk_ptm_int(TYPE* t) { return flagged_int(t, false, true, "Bad kind:  TYPE_PKG::mk_ptm_int()"); }

// ---- Other elements, fewer qualifiers

TYPE* TYPE_PKG::replace_array_elem(TYPE* array, TYPE* elem) {
    TYPE* a = array->getr(TYPE::tpk_array);
    if (elem == a->target_m) return array;
    TYPE* made;
    if (elem->size == a->target_m->size)
        made = rebuild_on(a, elem);
    else if (a->vector_m)
        made = mk_vector(elem, a->cpp, a->num_elem_m);
    else
        made = mk_array(elem, a->cpp, a->num_elem_m, a->complete_m);
    return mk_qual(made, array->spine_qual_m);
}

TYPE* TYPE_PKG::remove_known_qual(TYPE* t, unsigned bits) {
    std::vector<TYPE*> chain;
    while (t->deep_qual_m & bits) { // only qualifiers, typedefs and arrays have any
        chain.push_back(t);
        t = t->target_m;
    }
    for (size_t i = chain.size(); i-- > 0;) {
        TYPE* outer = chain[i];
        if (outer->kind == TYPE::tpk_qual)
            t = mk_qual(t, outer->qual_m & ~bits);
        else if (outer->kind == TYPE::tpk_array)
            t = rebuild_on(outer, t);
    }
    return t;
}
