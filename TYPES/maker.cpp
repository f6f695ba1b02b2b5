// Makers of types. Each returns a registered type, shared with an equal one that is known already.
//
// The input file names its types in any order and to any depth, so makers check the kinds of their parts and no maker
// walks a chain of types. An absent part reads as void where a type of void makes sense.
#include "TYPES/type_impl.h"
#include "UTIL/abort.h"

#include <algorithm>

static const uint32_t pointer_bits = 32;

// An unknown object size is as large as sizes go, so that it fits nowhere.
static uint64_t times(TYPE_PKG* pkg, uint64_t stride, uint64_t n) {
    uint64_t size;
    if (!__builtin_mul_overflow(stride, n, &size)) return size;
    pkg->set_error(TP_SIZE_NOT_SUPPORTED, "%llu elements of %llu bits", static_cast<unsigned long long>(n),
                   static_cast<unsigned long long>(stride));
    return ~uint64_t{15};
}

static uint64_t power_of_2_at_least(uint64_t v) {
    uint64_t p = 1;
    while (p < v && p >> 63 == 0) p <<= 1;
    return p < v ? v : p;
}

static uint64_t stride_of(const TYPE* elem) { return elem->is_scalar() ? power_of_2_at_least(elem->size) : elem->size; }

// ---- Basic types

TYPE* TYPE_PKG::mk_void() { return close(make(TYPE::tpk_void, nullptr, 0, 0, false)); }

TYPE* TYPE_PKG::mk_int(TYPE::IKIND k, bool expl_sign) {
    uint64_t wchar_bits = abi == 1 ? 32 : 16;
    const uint64_t sizes[] = {16, 16, 16, wchar_bits, 16, 16, 16, 16, 32, 32, 64, 64};
    uint64_t size = sizes[k];
    return mk_int(k, expl_sign, size, size > 32 ? 32 : static_cast<uint32_t>(size), false, false);
}

TYPE* TYPE_PKG::mk_int(TYPE::IKIND k, bool expl_sign, uint64_t size, uint32_t align, bool boolean, bool ptm) {
    TYPE* t = make(TYPE::tpk_int, nullptr, size, align, false);
    t->ikind_m = k;
    t->expl_sign_m = expl_sign;
    t->boolean_m = boolean;
    t->ptm_m = ptm;
    return close(t);
}

TYPE* TYPE_PKG::mk_fltpt(TYPE::FKIND k) {
    uint64_t size = k == TYPE::fk_ldouble || (k == TYPE::fk_double && abi == 1) ? 64 : 32;
    return mk_fltpt(k, size, 32);
}

TYPE* TYPE_PKG::mk_fltpt(TYPE::FKIND k, uint64_t size, uint32_t align) {
    TYPE* t = make(TYPE::tpk_float, nullptr, size, align, false);
    t->fkind_m = k;
    return close(t);
}

TYPE* TYPE_PKG::mk_fxtpt(TYPE* underlying, int binpt) {
    if (!underlying) tp_die("Bad type:  TYPE_PKG::mk_fxtpt()");
    return mk_fxtpt(underlying, binpt, underlying->size, underlying->align);
}

TYPE* TYPE_PKG::mk_fxtpt(TYPE* underlying, int binpt, uint64_t size, uint32_t align) {
    if (!underlying || !underlying->is_int()) tp_die("Bad type:  TYPE_PKG::mk_fxtpt()");
    TYPE* t = make(TYPE::tpk_fixed, underlying, size, align, false);
    t->binpt_m = static_cast<signed char>(binpt);
    return close(t);
}

TYPE* TYPE_PKG::mk_complex(TYPE* part) {
    if (!part) tp_die("Bad type:  TYPE_PKG::mk_complex()");
    return mk_complex(part, times(this, stride_of(part), 2), part->align);
}

TYPE* TYPE_PKG::mk_complex(TYPE* part, uint64_t size, uint32_t align) {
    if (!part || !(part->is_int() || part->is_float() || part->is_fixed())) tp_die("Bad type:  TYPE_PKG::mk_complex()");
    return close(make(TYPE::tpk_complex, part, size, align, false));
}

// ---- Types on another type

TYPE* TYPE_PKG::mk_ptr(TYPE* t) {
    if (!t) t = void_t;
    if (TYPE* known = __atomic_load_n(&t->ptr_to, __ATOMIC_ACQUIRE)) return known;
    std::lock_guard<std::recursive_mutex> hold(mk_ptr_lock);
    if (!t->ptr_to) {
        TYPE* made = close(make(TYPE::tpk_pointer, t, pointer_bits, pointer_bits, false));
        __atomic_store_n(&t->ptr_to, made, __ATOMIC_RELEASE);
    }
    return t->ptr_to;
}

TYPE* TYPE_PKG::mk_ptr(TYPE* t, uint64_t size, uint32_t align) {
    if (size == pointer_bits && align == pointer_bits) return mk_ptr(t);
    return close(make(TYPE::tpk_pointer, t ? t : void_t, size, align, false));
}

TYPE* TYPE_PKG::mk_ref(TYPE* t) { return mk_ref(t, pointer_bits, pointer_bits); }

TYPE* TYPE_PKG::mk_ref(TYPE* t, uint64_t size, uint32_t align) {
    return close(make(TYPE::tpk_ref, t ? t : void_t, size, align, false));
}

TYPE* TYPE_PKG::mk_ptm(TYPE* pointee, TYPE* cls, uint64_t size, uint32_t align) {
    TYPE* t = make(TYPE::tpk_ptm, pointee ? pointee : void_t, size, align, false);
    t->target2_m = cls ? cls : void_t;
    return close(t);
}

TYPE* TYPE_PKG::mk_qual(TYPE* t, unsigned bits) {
    if (!t) t = void_t;
    if ((t->spine_qual_m & bits) == bits) return t;
    return mk_qual(t, bits, t->size, bits & QUAL_PACKED ? 16 : t->align);
}

TYPE* TYPE_PKG::mk_qual(TYPE* t, unsigned bits, uint64_t size, uint32_t align) {
    if (!t) t = void_t;
    bits &= 0xFF;
    if ((t->spine_qual_m & bits) == bits && (!bits || (size == t->size && align == t->align))) return t;
    bits |= t->own_qual_bits();
    TYPE* q = make(TYPE::tpk_qual, nullptr, size, align, false);
    q->qual_m = bits;
    q->take_component(t->stqs());
    return close(q);
}

// ---- Arrays and vectors

TYPE* TYPE_PKG::mk_array(TYPE* elem, bool cpp) { return mk_array(elem, cpp, 0, false); }

TYPE* TYPE_PKG::mk_array(TYPE* elem, bool cpp, uint32_t n, bool complete) {
    return mk_array(elem, cpp, n, elem ? elem->align : 0, complete);
}

TYPE* TYPE_PKG::mk_array(TYPE* elem, bool cpp, uint32_t n, uint32_t align, bool complete) {
    return mk_array(elem, cpp, n, elem ? times(this, stride_of(elem), n) : 0, align, complete);
}

TYPE* TYPE_PKG::mk_array(TYPE* elem, bool cpp, uint32_t n, uint64_t size, uint32_t align, bool complete) {
    if (!elem || elem->is_func()) tp_die("Bad type:  TYPE_PKG::mk_array()");
    TYPE* t = make(TYPE::tpk_array, elem, size, align, cpp);
    t->num_elem_m = n;
    t->complete_m = complete;
    return close(t);
}

TYPE* TYPE_PKG::mk_vector(TYPE* elem, bool cpp, uint32_t n) {
    if (!elem) tp_die("Bad type:  TYPE_PKG::mk_vector()");
    // The alignment is what the elements in memory are sure to have.
    uint64_t stride = stride_of(elem);
    return mk_vector(elem, cpp, n, times(this, stride, n),
                     stride < elem->align ? static_cast<uint32_t>(stride) : elem->align);
}

TYPE* TYPE_PKG::mk_vector(TYPE* elem, bool cpp, uint32_t n, uint64_t size, uint32_t align) {
    if (!elem || !elem->is_scalar()) tp_die("Bad type:  TYPE_PKG::mk_vector()");
    if (n == 1) tp_die("Illegal vector length 1");
    if (n == 0) tp_die("Illegal vector length 0");
    TYPE* t = make(TYPE::tpk_array, elem, size, align, cpp);
    t->num_elem_m = n;
    t->complete_m = true;
    t->vector_m = true;
    return close(t);
}

TYPE* TYPE_PKG::mk_bool_vector(uint32_t num_lanes) {
    OPT_ASSERT(num_lanes > 1);
    return mk_vector(bool_t, false, num_lanes);
}

// ---- Named types

TYPE* TYPE_PKG::mk_typedef(const std::string& name, bool cpp, TYPE* named, uint64_t size, uint32_t align, bool lowered,
                           PSN* psn) {
    TYPE* t = make(TYPE::tpk_typedef, named ? named : void_t, size, align, cpp);
    t->name_m = tag_name(name);
    t->lowered_m = lowered;
    t->psn = psn;
    return close(t);
}

TYPE* TYPE_PKG::mk_func(TYPE* ret, bool cpp, bool vararg, bool proto, TYPE::CC_KIND cc, uint64_t size, uint32_t align) {
    TYPE* t = make(TYPE::tpk_func, ret ? ret : void_t, size, align, cpp);
    t->vararg_m = vararg;
    t->proto_m = proto;
    t->cc_m = cc;
    t->shape_m = t->shape_hash();
    return t;
}

TYPE* TYPE_PKG::mk_enum(const std::string& name, TYPE* underlying, uint64_t size, uint32_t align, bool cpp, PSN* psn) {
    if (!underlying) underlying = int_t;
    if (!underlying->is_int() && !underlying->is_enum()) tp_die("Bad type:  TYPE_PKG::mk_enum()");
    while (underlying->is_enum()) underlying = underlying->underlying_type();
    TYPE* t = make(TYPE::tpk_enum, underlying, size, align, cpp);
    t->name_m = tag_name(name);
    t->psn = psn;
    t->shape_m = t->shape_hash();
    seen_enum_type = true;
    if (size < int_t->size) seen_small_enums = true;
    return t;
}

TYPE* TYPE_PKG::mk_csu(TYPE::KIND kind, const std::string& name, bool complete, bool lowered, uint64_t size,
                       uint32_t align, bool cpp, bool is_struct_vector, uint32_t word, PSN* psn) {
    if (kind < TYPE::tpk_class || kind > TYPE::tpk_union) tp_die("Bad kind:  TYPE_PKG::mk_csu()");
    TYPE* t = make(kind, nullptr, size, align, cpp);
    t->name_m = tag_name(name);
    t->complete_m = complete;
    t->lowered_m = lowered;
    t->is_struct_vector_m = is_struct_vector;
    t->csu_word_m = word;
    t->psn = psn;
    t->shape_m = t->shape_hash();
    return t;
}

TYPE* TYPE_PKG::mk_class(const std::string& name, uint64_t size, uint32_t align, bool cpp) {
    return mk_csu(TYPE::tpk_class, name, true, false, size, align, cpp);
}

TYPE* TYPE_PKG::mk_struct(const std::string& name, uint64_t size, uint32_t align, bool cpp) {
    return mk_csu(TYPE::tpk_struct, name, true, false, size, align, cpp);
}

TYPE* TYPE_PKG::mk_union(const std::string& name, uint64_t size, uint32_t align, bool cpp) {
    return mk_csu(TYPE::tpk_union, name, true, false, size, align, cpp);
}

// `n` members side by side, each of one element: "float8_t" has "__x0" to "__x7".
TYPE* TYPE_PKG::mk_struct_vector(TYPE* elem, uint32_t n) {
    if (!elem || !elem->is_scalar()) tp_die("Bad type:  TYPE_PKG::mk_struct_vector()");
    uint64_t stride = stride_of(elem), size = times(this, stride, n);
    if (size > INT32_MAX) tp_die("Bad size:  TYPE_PKG::mk_struct_vector()");
    std::string tag = elem->printstr() + std::to_string(n) + "_t";
    std::replace(tag.begin(), tag.end(), ' ', '_');
    TYPE* t = mk_csu(TYPE::tpk_struct, tag, true, false, size, elem->align, false, true);
    fkMDATA* list = nullptr;
    {
        std::lock_guard<std::recursive_mutex> hold(mdata_lock);
        for (uint32_t i = n; i-- > 0;) {
            auto* m = new fkMDATA("__x" + std::to_string(i), elem, 0, static_cast<int32_t>(stride * i), 0, false, false,
                                  false, false);
            m->next = list;
            list = m;
        }
    }
    set_mdata(t, list);
    type_frozen(t);
    return t;
}

// The predicate register has no members that C can name.
TYPE* TYPE_PKG::mk_vpred() {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    if (!vpred_m) {
        TYPE* t = mk_struct("__qz_vpred_tp", 32, 32, false);
        type_frozen(t);
        vpred_m = t;
    }
    return vpred_m;
}

// ---- Filling of open types

static void check_nfrozen(const TYPE* t) {
    if (t->frozen) tp_die("Modifying frozen type:  TYPE::check_nfrozen");
}

void TYPE_PKG::set_params(TYPE* t, fkPARAM* list) {
    check_nfrozen(t);
    if (t->kind != TYPE::tpk_func) tp_die("Bad kind:  TYPE_PKG::set_params()");
    for (fkPARAM* p = list; p; p = p->next)
        if (!p->type) p->type = void_t;
    t->params_m = list;
    t->params_set_m = true;
}

void TYPE_PKG::set_etors(TYPE* t, fkETOR* list) {
    check_nfrozen(t);
    if (t->kind != TYPE::tpk_enum) tp_die("Bad kind:  TYPE_PKG::set_etors()");
    t->etors_m = list;
    t->etors_set_m = true;
}

void TYPE_PKG::set_mdata(TYPE* t, fkMDATA* list) {
    check_nfrozen(t);
    if (t->kind < TYPE::tpk_class) tp_die("Bad kind:  TYPE_PKG::set_mdata()");
    for (fkMDATA* m = list; m; m = m->next)
        if (!m->type) tp_die("Bad type:  TYPE_PKG::set_mdata()");
    t->mdata_m = list;
    t->mdata_set_m = true;
}

CSU_EXTRAS* TYPE_PKG::make_csu_extras(TYPE* t) {
    check_nfrozen(t);
    if (t->kind < TYPE::tpk_class) tp_die("Bad kind:  TYPE_PKG::make_csu_extras()");
    if (!t->extras_m) t->extras_m = new CSU_EXTRAS;
    return t->extras_m;
}
