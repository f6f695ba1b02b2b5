// What can be asked of one type: classification, parts, names, qualifiers.
#include "TYPES/type_impl.h"

// ---- Classification

bool TYPE::is_arithmetic() const {
    switch (real->kind) {
    case tpk_int:
    case tpk_float:
    case tpk_fixed:
    case tpk_complex:
    case tpk_enum: return true;
    default: return false;
    }
}

bool TYPE::is_plain_char() const { return (is_schar() || is_uchar()) && !real->expl_sign_m; }

bool TYPE::is_complete() const {
    switch (real->kind) {
    case tpk_void: return false;
    case tpk_array:
    case tpk_enum:
    case tpk_class:
    case tpk_struct:
    case tpk_union: return real->complete_m;
    default: return true;
    }
}

bool TYPE::is_lowered() const { return stqs()->lowered_m; }

bool TYPE::is_bool_vector() const { return is_vector() && real->target_m->is_bool(); }

bool TYPE::is_vpred() const { return is_csu() && real->name_m == "__qz_vpred_tp"; }

// An array of unknown or no length where the storage of a structure ends, in the structure or in a part that ends with
// it.
bool TYPE::has_flex_array_member() const {
    std::vector<const TYPE*> todo{real};
    std::set<const TYPE*> seen;
    while (!todo.empty()) {
        const TYPE* t = todo.back()->real;
        todo.pop_back();
        if (!t->is_csu() || !seen.insert(t).second) continue;
        for (fkMDATA* m = t->mdata_m; m; m = m->next) {
            if (t->kind != tpk_union && m->next) continue;
            if (m->type->is_array() && (!m->type->is_complete() || m->type->num_elem() == 0)) return true;
            todo.push_back(m->type);
        }
    }
    return false;
}

int TYPE::rank() const {
    static const int ranks[] = {0, 1, 1, 1, 2, 2, 3, 3, 4, 4, 5, 5};
    const TYPE* t = integer();
    if (!t) tp_die("Bad kind:  TYPE::rank()");
    return ranks[t->ikind_m];
}

int TYPE::ekind() const {
    switch (kind) {
    case tpk_int: return ikind_m;
    case tpk_float: return 12 + fkind_m;
    case tpk_fixed: return 15;
    case tpk_complex: return 16;
    case tpk_pointer: return 17;
    case tpk_ref: return 18;
    case tpk_qual: return 19;
    case tpk_typedef: return 20;
    case tpk_array: return 21;
    case tpk_ptm: return 22;
    case tpk_func: return 23;
    case tpk_enum: return 24;
    case tpk_class:
    case tpk_struct:
    case tpk_union: return 25;
    case tpk_void: return 26;
    }
    return 27;
}

// ---- Parts

TYPE::IKIND TYPE::ikind() const {
    if (!is_int()) tp_die("Bad kind:  TYPE::ikind()");
    return real->ikind_m;
}

TYPE::FKIND TYPE::fkind() const {
    if (!is_float()) tp_die("Bad kind:  TYPE::fkind()");
    return real->fkind_m;
}

bool TYPE::expl_sign() const {
    if (!is_int()) tp_die("Bad kind:  TYPE::expl_sign()");
    return real->expl_sign_m;
}

TYPE* TYPE::type_pointed_to() const {
    if (!is_pointer() && !is_ptm()) tp_die("Bad kind:  TYPE::type_pointed_to()");
    return real->target_m;
}

TYPE* TYPE::type_refd() const {
    if (!is_ref()) tp_die("Bad kind:  TYPE::type_refd()");
    return real->target_m;
}

TYPE* TYPE::type_qualified() const { return kind == tpk_qual ? target_m : const_cast<TYPE*>(this); }

TYPE* TYPE::type_named() const {
    if (kind != tpk_typedef) tp_die("Bad kind:  TYPE::type_named()");
    return target_m;
}

TYPE* TYPE::part_type() const {
    if (!is_complex()) tp_die("Bad kind:  TYPE::part_type()");
    return real->target_m;
}

TYPE* TYPE::underlying_type() const {
    if (!is_enum() && !is_fixed()) tp_die("Bad kind:  TYPE::underlying_type()");
    return real->target_m;
}

TYPE* TYPE::ptm_class() const {
    if (!is_ptm()) tp_die("Bad kind:  TYPE::ptm_class()");
    return real->target2_m;
}

TYPE* TYPE::return_type() const {
    if (!is_func()) tp_die("Bad kind:  TYPE::return_type()");
    return real->target_m;
}

TYPE* TYPE::raw_elem_type() const {
    if (!is_array()) tp_die("Bad kind:  TYPE::raw_elem_type()");
    return real->target_m;
}

TYPE* TYPE::elem_type() const {
    if (!is_array()) tp_die("Bad kind:  TYPE::elem_type()");
    if (!pkg) tp_die("orphan type:  TYPE::elem_type()");
    return pkg->mk_qual(real->target_m, spine_qual_m);
}

uint32_t TYPE::num_elem() const {
    if (!is_array()) tp_die("Bad kind:  TYPE::num_elem()");
    return real->num_elem_m;
}

signed char TYPE::binpt() const {
    if (!is_fixed()) tp_die("Bad kind:  TYPE::binpt()");
    return real->binpt_m;
}

fkPARAM* TYPE::params() const {
    if (!is_func()) tp_die("Bad kind:  TYPE::params()");
    return real->params_m;
}

TYPE::CC_KIND TYPE::cc_kind() const {
    if (!is_func()) tp_die("Bad kind:  TYPE::cc_kind()");
    return real->cc_m;
}

bool TYPE::vararg() const {
    if (!is_func()) tp_die("Bad kind:  TYPE::vararg()");
    return real->vararg_m;
}

bool TYPE::proto() const {
    if (!is_func()) tp_die("Bad kind:  TYPE::proto()");
    return real->proto_m;
}

fkETOR* TYPE::etors() const {
    if (!is_enum()) tp_die("Bad kind:  TYPE::etors()");
    return real->etors_m;
}

fkMDATA* TYPE::mdata() const {
    if (!is_csu()) tp_die("Bad kind:  TYPE::mdata()");
    return real->mdata_m;
}

uint32_t TYPE::csu_word() const {
    if (!is_csu()) tp_die("Bad kind:  TYPE::csu_word()");
    return real->csu_word_m;
}

// ---- Views

TYPE* TYPE::stqs() const {
    const TYPE* t = this;
    while (t->kind == tpk_qual) t = t->target_m;
    return const_cast<TYPE*>(t);
}

TYPE* TYPE::stds() const {
    const TYPE* t = this;
    while (t->kind == tpk_typedef) t = t->target_m;
    return const_cast<TYPE*>(t);
}

TYPE* TYPE::getr(KIND k) const {
    if (real->kind != k) tp_die("Bad kind:  TYPE::getr()");
    return real;
}

TYPE* TYPE::getd(KIND k) const {
    TYPE* t = stds();
    if (t->kind != k) tp_die("Bad kind:  TYPE::getd()");
    return t;
}

TYPE* TYPE::get_csu() const { return kind >= tpk_class ? const_cast<TYPE*>(this) : nullptr; }

TYPE* TYPE::getr_csu() const {
    if (!is_csu()) tp_die("Bad kind:  TYPE::getr_csu()");
    return real;
}

const std::string& TYPE::name() const { return name_m; }

bool type_is_tagless(const TYPE* t) { return t->name().compare(0, 6, "$$fake") == 0; }

bool is_same_sign(const TYPE* a, const TYPE* b) {
    return a->is_signed() == b->is_signed() && a->is_unsigned() == b->is_unsigned();
}

// ---- Members

fkMDATA::fkMDATA(const std::string& member_name, TYPE* member_type, uint32_t access_word, int32_t bit_offset,
                 uint32_t bit_width, bool first_flag, bool bitfld, bool third_flag, bool fourth_flag)
    : type(member_type), name(member_name), access(access_word), offset(bit_offset), width(bit_width),
      flag1(first_flag), is_bitfld(bitfld), flag3(third_flag), flag4(fourth_flag) {
    if (bitfld) TYPE_PKG::seen_bitfield = true;
}

// The lists go with the type.
template <class T>
static void free_list(T* list) {
    while (list) {
        T* next = list->next;
        delete list;
        list = next;
    }
}

TYPE::~TYPE() {
    free_list(params_m);
    free_list(etors_m);
    free_list(mdata_m);
    delete extras_m;
}
