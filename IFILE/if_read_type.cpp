// The type section, and the reader's index of types by number.
//
// A number is defined by a record before another record names it, so a type is always built from finished parts.
// Classes, structs and unions are the exception that makes recursive types possible: their record holds a name and
// sizes only, and the lists of their members come later. Until a function or an enumeration has its list nothing may
// name it. With these two rules every cycle of the type graph leads through a class; `check_containment` then refuses a
// class that holds itself by value, and IF_MAX_TYPE_DEPTH bounds the rest, so that walks over types end and need little
// stack.
#include "IFILE/if_reader.h"

#include <algorithm>
#include <utility>

// ---- The index by number

TYPE_INFO* I_FILE::find_type_info(uint64_t n) {
    if (n < dense_types.size()) return dense_types[n].type ? &dense_types[n] : nullptr;
    auto found = typeref_map.find(n);
    return found == typeref_map.end() ? nullptr : &found->second;
}

void I_FILE::enter_type(uint64_t n, TYPE* type, uint32_t pending) {
    if (n == 0) bad_input("type number 0");
    if (!type) bad_input("type %llu cannot be made", static_cast<unsigned long long>(n));
    if (find_type_info(n)) tp_die("read type twice");
    uint32_t depth = type->kind >= TYPE::tpk_class ? 0 : nesting + 1;
    if (depth > IF_MAX_TYPE_DEPTH) bad_input("type nested deeper than %u", IF_MAX_TYPE_DEPTH);
    TYPE_INFO info{type, pending, depth};
    // A type takes four bytes of the file at least: numbers up to here are as dense as a file can have them.
    uint64_t dense_end = static_cast<uint64_t>(image_end - image.get()) / 4 + 1024;
    if (n >= dense_end) {
        typeref_map.emplace(n, info);
    } else {
        if (n >= dense_types.size())
            dense_types.resize(std::max<uint64_t>(n + 1, std::min(dense_end, dense_types.size() * 2)));
        dense_types[n] = info;
    }
    if (pending) waiting_types++;
    if (type->kind >= TYPE::tpk_enum || type->kind == TYPE::tpk_typedef) type_order.push_back(n);
}

// A type that was merged into another is named by the survivor.
TYPE* I_FILE::find_typeref(uint64_t n) {
    if (n == 0 || !type_pkg) return nullptr;
    const TYPE_INFO* info = find_type_info(n);
    if (!info) guard_types([] { tp_die("invalid forward reference"); });
    TYPE* type = info->type;
    while (type->equiv) type = type->equiv;
    return type;
}

// Numbers are those of the declaration that is named; the member is the survivor's, where declarations were merged.
fkMDATA* I_FILE::find_mdataref(uint64_t type_number, uint64_t member_number) {
    if (!find_typeref(type_number)) return nullptr;
    const TYPE* declared = find_type_info(type_number)->type->real;
    if (!declared->is_csu()) return nullptr;
    MEMBER_TABLE& table = member_tables[declared];
    if (!table.filled) {
        const TYPE* survivor = declared;
        while (survivor->equiv) survivor = survivor->equiv;
        for (fkMDATA* m = survivor->mdata(); m; m = m->next) table.members.push_back(m);
        table.filled = true;
    }
    size_t place = member_number - 1;
    if (!table.numbers.empty())
        place = std::find(table.numbers.begin(), table.numbers.end(), member_number) - table.numbers.begin();
    return place < table.members.size() ? table.members[place] : nullptr;
}

// ---- Fields of type records

TYPE* I_FILE::read_typeref() {
    uint64_t n = i_read_uint();
    if (n == 0) return nullptr;
    const TYPE_INFO* info = find_type_info(n);
    if (!info) tp_die("invalid forward reference");
    if (info->pending && info->type->kind < TYPE::tpk_class) tp_die("invalid forward reference");
    nesting = std::max(nesting, info->depth);
    return info->type;
}

TYPE* I_FILE::need_typeref(const char* what) {
    TYPE* type = read_typeref();
    if (!type) bad_input("%s without a type", what);
    return type;
}

TYPE* I_FILE::typeref_or_void() {
    TYPE* type = read_typeref();
    return type ? type : type_pkg->void_t;
}

uint64_t I_FILE::read_bits(uint64_t highest, const char* what) {
    uint64_t size = i_read_uint();
    if (size == 0 || size > highest) bad_input("%s of %llu bits", what, static_cast<unsigned long long>(size));
    return size;
}

uint32_t I_FILE::read_align() { return i_read_uint32("alignment"); }

// Older files leave it to the name whether a type comes from C++.
bool I_FILE::if_read_type_is_cpp(const char* name) {
    if (version >= -81) return i_read_bool();
    bool is_cpp = false;
    TYPE_PKG::demangle_type_name(name, &is_cpp);
    return is_cpp;
}

// ---- Types of one record

void I_FILE::if_read_void_type(uint64_t n) { enter_type(n, type_pkg->mk_void()); }

void I_FILE::tp_make_integral_type(uint64_t n, int tag, bool expl_sign, uint64_t size, uint32_t align, bool is_bool,
                                   bool flag) {
    TYPE::IKIND kind = static_cast<TYPE::IKIND>(tag >= IFT_LLONG ? TYPE::ik_llong + (tag - IFT_LLONG) : tag);
    // The first bool says how the type behaves, which `bool` itself always does; the second is a mark on the type, and
    // on an integer that is no boolean there is one other mark.
    bool boolean = kind == TYPE::ik_bool ? flag : is_bool;
    bool ptm = kind != TYPE::ik_bool && flag && !is_bool;
    enter_type(n, type_pkg->mk_int(kind, expl_sign, size, align, boolean, ptm));
}

void I_FILE::if_read_integral_type(uint64_t n, int tag) {
    bool expl_sign = i_read_bool();
    uint64_t size = read_bits(64, "integer type");
    uint32_t align = read_align();
    bool is_bool = i_read_bool();
    bool flag = i_read_bool();
    tp_make_integral_type(n, tag, expl_sign, size, align, is_bool, flag);
}

void I_FILE::tp_make_float_type(uint64_t n, int tag, uint64_t size, uint32_t align) {
    TYPE::FKIND kind = tag == IFT_LDOUBLE ? TYPE::fk_ldouble : tag == IFT_DOUBLE ? TYPE::fk_double : TYPE::fk_float;
    enter_type(n, type_pkg->mk_fltpt(kind, size, align));
}

void I_FILE::if_read_float_type(uint64_t n, int tag) {
    uint64_t size = read_bits(128, "floating type");
    uint32_t align = read_align();
    tp_make_float_type(n, tag, size, align);
}

void I_FILE::if_read_fixedpoint_type(uint64_t n) {
    int binpt = i_read_s8();
    i_read_bool(); // the sign is that of the underlying type
    TYPE* underlying = need_typeref("fixed-point type");
    if (!underlying->is_int()) bad_input("fixed-point type over a type that is no integer");
    uint64_t size = read_bits(64, "fixed-point type");
    enter_type(n, type_pkg->mk_fxtpt(underlying, binpt, size, read_align()));
}

void I_FILE::if_read_complex_type(uint64_t n) {
    uint64_t size = read_bits(256, "complex type");
    uint32_t align = read_align();
    TYPE* part = need_typeref("complex type");
    if (!part->is_int() && !part->is_float()) bad_input("complex type of parts that are no numbers");
    enter_type(n, type_pkg->mk_complex(part, size, align));
}

void I_FILE::if_read_typedef(uint64_t n) {
    std::string name = i_read_string();
    TYPE* named = typeref_or_void();
    uint64_t size = i_read_uint();
    uint32_t align = read_align();
    bool cpp = i_read_bool();
    bool lowered = i_read_bool();
    PSN* psn = i_read_psn();
    enter_type(n, type_pkg->mk_typedef(name, cpp, named, size, align, lowered, psn));
}

// Files of the narrow memory model give pointers 22 bits; here they have 32.
void I_FILE::if_read_addr_type(uint64_t n) {
    TYPE* target = typeref_or_void();
    uint64_t size = read_bits(64, "pointer");
    uint32_t align = read_align();
    if (size == 22) size = align = 32;
    enter_type(n, type_pkg->mk_ptr(target, size, align));
}

void I_FILE::if_read_ref_type(uint64_t n) {
    TYPE* target = typeref_or_void();
    uint64_t size = read_bits(64, "reference");
    enter_type(n, type_pkg->mk_ref(target, size, read_align()));
}

void I_FILE::if_read_qual_type(uint64_t n) {
    TYPE* target = typeref_or_void();
    unsigned bits = static_cast<unsigned>(i_read_uint()) & 231; // `near` and `far` mean nothing here
    uint64_t size = i_read_uint();
    uint32_t align = read_align();
    if (target->is_pointer() && size == 22) size = align = 32;
    enter_type(n, type_pkg->mk_qual(target, bits, size, align));
}

void I_FILE::if_read_array_type(uint64_t n) {
    TYPE* elem = need_typeref("array");
    if (elem->is_void() || elem->is_func() || elem->is_ref()) bad_input("array of a type that has no values");
    uint32_t count = i_read_uint32("element count");
    uint64_t size = i_read_uint();
    uint32_t align = read_align();
    bool cpp = i_read_bool();
    bool complete = i_read_bool();
    bool vector = version >= -76 && i_read_bool();
    if (version == -75 || version == -74) i_read_bool();
    if (vector && count < 2) bad_input("vector of length %u", count);
    if (vector && !elem->is_arithmetic()) bad_input("vector of a type that is no number");
    enter_type(n, vector ? type_pkg->mk_vector(elem, cpp, count, size, align)
                         : type_pkg->mk_array(elem, cpp, count, size, align, complete));
}

void I_FILE::if_read_ptm_type(uint64_t n) {
    TYPE* target = typeref_or_void();
    TYPE* cls = need_typeref("pointer to member");
    uint64_t size = i_read_uint();
    enter_type(n, type_pkg->mk_ptm(target, cls, size, read_align()));
}

// ---- Types with lists

void I_FILE::if_read_func_type(uint64_t n) {
    TYPE* ret = typeref_or_void();
    bool vararg = i_read_bool();
    bool proto = i_read_bool();
    TYPE::CC_KIND cc = i_read_u8();
    bool cpp = i_read_bool();
    enter_type(n, type_pkg->mk_func(ret, cpp, vararg, proto, cc, 0, 0), 1);
}

void I_FILE::if_read_enum_type(uint64_t n) {
    std::string name = i_read_string();
    uint64_t size = i_read_uint(); // 0 for one that is declared only
    if (size > 64) bad_input("enumeration of %llu bits", static_cast<unsigned long long>(size));
    uint32_t align = read_align();
    TYPE* underlying = need_typeref("enumeration");
    if (!underlying->is_int()) bad_input("enumeration over a type that is no integer");
    bool cpp = if_read_type_is_cpp(name.c_str());
    PSN* psn = i_read_psn();
    enter_type(n, type_pkg->mk_enum(name, underlying, size, align, cpp, psn), 1);
}

void I_FILE::if_read_csu(uint64_t n, bool long_form) {
    static constexpr TYPE::KIND kinds[] = {TYPE::tpk_struct, TYPE::tpk_union, TYPE::tpk_class};
    unsigned kind = i_read_u8();
    if (kind > 2) bad_input("structure of kind %u", kind);
    std::string name = i_read_string();
    bool complete = i_read_bool();
    bool lowered = i_read_bool();
    uint64_t size = i_read_uint();
    uint32_t align = read_align();
    uint32_t word = long_form ? i_read_uint32("word of a class record") : 0;
    uint32_t lists = 0;
    for (int i = 0; i < (long_form ? 9 : 1); i++) lists += i_read_bool();
    bool is_struct_vector = version >= -84 && i_read_bool();
    bool cpp = if_read_type_is_cpp(name.c_str());
    PSN* psn = i_read_psn();
    tp_make_csu(n,
                type_pkg->mk_csu(kinds[kind], name, complete, lowered, size, align, cpp, is_struct_vector, word, psn),
                lists);
}

void I_FILE::if_read_csu_short(uint64_t n) { if_read_csu(n, false); }

void I_FILE::if_read_csu_long(uint64_t n) { if_read_csu(n, true); }

void I_FILE::tp_make_csu(uint64_t n, TYPE* type, uint32_t lists) {
    enter_type(n, type, lists);
    if (lists == 0) type_pkg->type_frozen(find_type_info(n)->type);
}

// ---- Lists

namespace {
bool list_fits(const TYPE* type, int list) {
    switch (type->kind) {
    case TYPE::tpk_func: return list == IFL_PARAMS;
    case TYPE::tpk_enum: return list == IFL_ETORS;
    case TYPE::tpk_class:
    case TYPE::tpk_struct:
    case TYPE::tpk_union: return list != IFL_ETORS && list < IF_TYPE_LISTS;
    default: return false;
    }
}

// The mark that a class has its list `list`, other than its data members.
bool& csu_list_mark(CSU_EXTRAS& extras, int list) {
    switch (list) {
    case IFL_BCLASSES: return extras.base_classes.present;
    case IFL_ADECLS: return extras.access_decls.present;
    case IFL_FFRIENDS: return extras.friend_functions.present;
    case IFL_CFRIENDS: return extras.friend_classes.present;
    case IFL_NTYPES: return extras.nested_types.present;
    case IFL_SDATA: return extras.static_data.present;
    case IFL_MFUNCS: return extras.member_functions.present;
    default: return extras.parameters.present;
    }
}

// Hangs `element` behind what `tail` says was the last one.
template <class ELEMENT>
void append(ELEMENT*& first, void*& tail, ELEMENT* element) {
    (tail ? static_cast<ELEMENT*>(tail)->next : first) = element;
    tail = element;
}
} // namespace

void I_FILE::tp_make_list(uint64_t n, int list) {
    TYPE_INFO* info = find_type_info(n);
    if (!info) tp_die("invalid forward reference");
    TYPE* type = info->type;
    if (info->pending == 0 || !list_fits(type, list)) tp_die("Unexpected type attribute");
    bool again = open_list && open_list->number == n && open_list->list == list;
    if (type->kind == TYPE::tpk_func) {
        if (again || type->has_params()) tp_die("Duplicate function parameters");
    } else if (type->kind == TYPE::tpk_enum) {
        if (again) tp_die("Duplicate enumerator attributes");
    } else if (list == 7) {
        if (again || type->has_mdata_list()) tp_die("Duplicate CSU attributes");
    } else {
        bool& mark = csu_list_mark(*type_pkg->make_csu_extras(type), list);
        if (mark) tp_die("Duplicate CSU attributes");
        mark = true;
    }
    if (open_list) bad_input("a list inside a list");
    open_list = std::make_unique<OPEN_LIST>();
    open_list->number = n;
    open_list->list = list;
    open_list->type = type;
}

void I_FILE::tp_end_list(uint64_t n, int list) {
    if (!open_list || open_list->number != n || open_list->list != list) bad_input("list trailer without its header");
    TYPE_INFO* info = find_type_info(n);
    OPEN_LIST& open = *open_list;
    if (open.type->kind == TYPE::tpk_func) {
        type_pkg->set_params(open.type, std::exchange(open.params, nullptr));
        info->depth = std::max(info->depth, nesting + 1);
        if (info->depth > IF_MAX_TYPE_DEPTH) bad_input("type nested deeper than %u", IF_MAX_TYPE_DEPTH);
    } else if (open.type->kind == TYPE::tpk_enum) {
        type_pkg->set_etors(open.type, std::exchange(open.etors, nullptr));
    } else if (list == 7) {
        type_pkg->set_mdata(open.type, std::exchange(open.members, nullptr));
        for (size_t i = 0; i < open.member_numbers.size(); i++)
            if (open.member_numbers[i] != i + 1) {
                member_tables[open.type].numbers = std::move(open.member_numbers);
                break;
            }
    }
    open_list.reset();
    if (--info->pending == 0) {
        waiting_types--;
        type_pkg->type_frozen(info->type);
    }
}

void I_FILE::if_read_list_header(uint64_t n) {
    int list = i_read_u8();
    nesting = 0; // gathered over the elements
    tp_make_list(n, list);
}

void I_FILE::if_read_list_trailer(uint64_t n) { tp_end_list(n, i_read_u8()); }

// ---- Elements

void I_FILE::if_read_param_elem() {
    auto param = std::make_unique<fkPARAM>();
    param->type = need_typeref("parameter");
    param->flag = i_read_bool();
    param->word = i_read_uint();
    param->name = i_read_string();
    if (open_list->type->kind == TYPE::tpk_func)
        append(open_list->params, open_list->tail, param.release());
    else
        type_pkg->make_csu_extras(open_list->type)->parameters.items.push_back(*param);
}

void I_FILE::if_read_etor_elem() {
    auto etor = std::make_unique<fkETOR>();
    etor->name = i_read_string();
    const TYPE* underlying = open_list->type->underlying_type();
    bool wide = underlying->size > 32;
    if (underlying->is_signed()) {
        int64_t value = i_read_sint();
        etor->value = wide ? value : static_cast<int32_t>(value);
    } else {
        uint64_t value = i_read_uint();
        etor->value = wide ? static_cast<int64_t>(value) : static_cast<uint32_t>(value);
    }
    etor->psn = i_read_psn();
    append(open_list->etors, open_list->tail, etor.release());
}

void I_FILE::if_read_mdata_elem() {
    uint32_t number = i_read_uint32("member number");
    std::string name = i_read_string();
    TYPE* type = need_typeref("member");
    uint32_t access = i_read_u8();
    int32_t offset = static_cast<int32_t>(i_read_sint());
    uint8_t aux = version >= -74 ? i_read_u8() : 0;
    uint32_t width = 0;
    bool is_bitfld = false, flag3 = false, flag4 = false;
    if (version >= -85) {
        width = i_read_uint32("bit-field width");
        is_bitfld = i_read_bool();
        flag3 = i_read_bool();
        flag4 = i_read_bool();
    } else {
        is_bitfld = i_read_bool();
        width = i_read_uint32("bit-field width");
        flag3 = i_read_bool();
    }
    if (is_bitfld && width > 64) bad_input("bit-field of %u bits", width);
    auto member = std::make_unique<fkMDATA>(name, type, access, offset, width, aux != 0, is_bitfld, flag3, flag4);
    member->aux = aux;
    member->psn = i_read_psn();
    append(open_list->members, open_list->tail, member.release());
    open_list->member_numbers.push_back(number);
}

void I_FILE::if_read_bclass_elem() {
    TYPE* type = need_typeref("base class");
    if (!type->is_csu()) bad_input("base class that is no class");
    int64_t offset = i_read_sint();
    uint8_t access = i_read_u8();
    bool is_virtual = i_read_bool();
    open_list->type->csu_extras()->base_classes.items.push_back({type, offset, access, is_virtual});
}

void I_FILE::if_read_adecl_elem() {
    uint64_t word = i_read_uint();
    open_list->type->csu_extras()->access_decls.items.push_back({word, i_read_u8()});
}

void I_FILE::if_read_ffriend_elem() {
    std::string name = i_read_string();
    open_list->type->csu_extras()->friend_functions.items.push_back({name, need_typeref("friend function")});
}

// Friend classes and nested types: writers may name them ahead of their records, so they are looked up at the end.
void I_FILE::read_forward_ref(CSU_LIST<TYPE*>& elements) {
    forward_refs.push_back({&elements, elements.items.size(), i_read_uint(), record - image.get()});
    elements.items.push_back(nullptr);
}

void I_FILE::if_read_cfriend_elem() { read_forward_ref(open_list->type->csu_extras()->friend_classes); }

void I_FILE::if_read_ntype_elem() { read_forward_ref(open_list->type->csu_extras()->nested_types); }

void I_FILE::if_read_sdata_elem() {
    std::string name = i_read_string();
    TYPE* type = need_typeref("static member");
    open_list->type->csu_extras()->static_data.items.push_back({name, type, i_read_u8()});
}

void I_FILE::if_read_mfunc_elem() {
    fkMFUNC func;
    func.name = i_read_string();
    func.type = need_typeref("member function");
    func.access = i_read_u8();
    func.word = i_read_sint();
    for (bool& flag : func.flags) flag = i_read_bool();
    open_list->type->csu_extras()->member_functions.items.push_back(func);
}

void I_FILE::read_element(uint64_t n, int tag) {
    if (!open_list || open_list->number != n || if_list_tags[open_list->list] != tag)
        tp_die("Unexpected type attribute");
    switch (tag) {
    case IFT_PARAM: return if_read_param_elem();
    case IFT_ETOR: return if_read_etor_elem();
    case IFT_MDATA: return if_read_mdata_elem();
    case IFT_BCLASS: return if_read_bclass_elem();
    case IFT_ADECL: return if_read_adecl_elem();
    case IFT_FFRIEND: return if_read_ffriend_elem();
    case IFT_CFRIEND: return if_read_cfriend_elem();
    case IFT_NTYPE: return if_read_ntype_elem();
    case IFT_SDATA: return if_read_sdata_elem();
    case IFT_MFUNC: return if_read_mfunc_elem();
    }
}

// ---- The section

void I_FILE::read_type(uint64_t n, int tag) {
    if (tag <= IFT_LAST_SHORT_INTEGER || tag == IFT_LLONG || tag == IFT_ULLONG) return if_read_integral_type(n, tag);
    if ((tag > IFT_CSU_LONG && tag < IFT_MDATA) ||
        (tag > IFT_COMPLEX && tag < IFT_VOID)) { // reserved: nothing is known of what they hold
        cursor = limit;
        return;
    }
    switch (tag) {
    case IFT_FLOAT:
    case IFT_DOUBLE:
    case IFT_LDOUBLE: return if_read_float_type(n, tag);
    case IFT_FIXEDPOINT: return if_read_fixedpoint_type(n);
    case IFT_TYPEDEF: return if_read_typedef(n);
    case IFT_ADDR: return if_read_addr_type(n);
    case IFT_REF: return if_read_ref_type(n);
    case IFT_QUAL: return if_read_qual_type(n);
    case IFT_ARRAY: return if_read_array_type(n);
    case IFT_PTM: return if_read_ptm_type(n);
    case IFT_FUNC: return if_read_func_type(n);
    case IFT_ENUM: return if_read_enum_type(n);
    case IFT_CSU_SHORT: return if_read_csu_short(n);
    case IFT_CSU_LONG: return if_read_csu_long(n);
    case IFT_COMPLEX: return if_read_complex_type(n);
    case IFT_VOID: return if_read_void_type(n);
    }
    bad_input("type record of unknown tag %d", tag);
}

void I_FILE::if_read_type() {
    uint64_t n = i_read_uint();
    int tag = i_read_u8();
    if (tag == IFT_LIST_HEADER) {
        if_read_list_header(n);
    } else if (tag == IFT_LIST_TRAILER) {
        if_read_list_trailer(n);
    } else if (tag == IFT_PARAM || tag == IFT_ETOR || (tag >= IFT_MDATA && tag <= IFT_MFUNC)) {
        read_element(n, tag);
    } else {
        if (open_list)
            bad_input("a type inside the list of type %llu", static_cast<unsigned long long>(open_list->number));
        nesting = 0;
        read_type(n, tag);
    }
    end_record();
}

void I_FILE::resolve_forward_refs() {
    for (const FORWARD_REF& ref : forward_refs) {
        TYPE_INFO* info = find_type_info(ref.number);
        if (!info) throw if_error("TP>> internal error: invalid forward reference", ref.at);
        ref.elements->items[ref.item] = info->type;
    }
    forward_refs.clear();
}

namespace {
TYPE* contained_csu(TYPE* type) {
    while (type && type->is_array()) type = type->real->raw_elem_type();
    return type && type->is_csu() ? type->real : nullptr;
}

// The structures that `csu` holds by value.
std::vector<TYPE*> contained_in(const TYPE* csu) {
    std::vector<TYPE*> parts;
    for (const fkMDATA* m = csu->mdata(); m; m = m->next)
        if (TYPE* part = contained_csu(m->type)) parts.push_back(part);
    if (const CSU_EXTRAS* extras = csu->csu_extras())
        for (const fkBCLASS& base : extras->base_classes.items) parts.push_back(base.type->real);
    return parts;
}
} // namespace

// A depth-first search over "holds by value". Structures in work are on the stack, those with a height are done.
void I_FILE::check_containment() {
    struct OPEN_CSU {
        TYPE* type;
        std::vector<TYPE*> parts;
        size_t next;
        uint32_t height;
    };
    constexpr uint32_t in_work = 0;
    std::unordered_map<const TYPE*, uint32_t> height;
    std::vector<OPEN_CSU> stack;
    for (uint64_t n : type_order) {
        TYPE* root = find_type_info(n)->type;
        if (root->kind < TYPE::tpk_class || height.count(root)) continue;
        height[root] = in_work;
        stack.push_back({root, contained_in(root), 0, 1});
        while (!stack.empty()) {
            OPEN_CSU& top = stack.back();
            if (top.next < top.parts.size()) {
                TYPE* part = top.parts[top.next++];
                auto [known, fresh] = height.emplace(part, in_work);
                if (fresh)
                    stack.push_back({part, contained_in(part), 0, 1});
                else if (known->second == in_work)
                    bad_input("structure %s contains itself", part->name().c_str());
                else
                    top.height = std::max(top.height, known->second + 1);
            } else {
                uint32_t done = top.height;
                height[top.type] = done;
                stack.pop_back();
                if (!stack.empty()) stack.back().height = std::max(stack.back().height, done + 1);
            }
            if (stack.size() > IF_MAX_TYPE_DEPTH || (!stack.empty() && stack.back().height > IF_MAX_TYPE_DEPTH))
                bad_input("structures nested deeper than %u", IF_MAX_TYPE_DEPTH);
        }
    }
}

// Declarations of one type in several translation units become one type. This must wait until all lists are there,
// since it compares members.
void I_FILE::merge_read_types() {
    for (uint64_t n : type_order) {
        TYPE* type = find_type_info(n)->type;
        if (!type->equiv) find_equivalent_type(type);
    }
}

void I_FILE::if_read_type_defs() {
    if (!off_types || !type_pkg) return;
    SECTION section(*this, off_types, "type");
    while (section.next(IFR_TYPE)) guard_types([this] { if_read_type(); });
    if (open_list)
        bad_input("the list of type %llu has no trailer", static_cast<unsigned long long>(open_list->number));
    if (waiting_types) bad_input("%zu types still expect lists", waiting_types);
    guard_types([this] {
        resolve_forward_refs();
        check_containment();
        merge_read_types();
    });
}
